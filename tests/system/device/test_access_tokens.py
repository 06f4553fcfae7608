"""Device access tokens from end to end: made in a session, used by the parameter "tid", ended."""

import hashlib
import json
import os
import pwd
import shutil
import subprocess
import unittest

import device
import webclient

API = "ZOVA.Core.Token"
TOKENS = "/var/lib/zova/access-tokens"
GET_USER = [{"api": "ZOVA.Core.User", "methods": ["get"]}]


def record_of(token):
    return f"{TOKENS}/{hashlib.sha256(token.encode()).hexdigest()}"


def use(token, api="ZOVA.Core.User", method="get", client=None, **parameters):
    return (client or webclient.Client()).call(api, method, post=True, tid=webclient.quoted(token), **parameters)


class AccessTokens(device.DeviceTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.alice = webclient.logged_in("alice")
        cls.admin = webclient.logged_in("admin")

    def setUp(self):
        super().setUp()
        shutil.rmtree(TOKENS, ignore_errors=True)

    def make(self, client=None, apis=None, **parameters):
        response = (client or self.alice).call(API, "create", post=True, apis=json.dumps(apis or GET_USER),
                                               **{"expires_in": 3600, **parameters})
        self.assertEqual(0, response.code(), response.body)
        return response.json()["data"]

    def listed(self, client, **parameters):
        return client.call(API, "list", post=True, **parameters).json()["data"]["tokens"]

    def test_a_token_calls_in_the_name_of_its_user_without_a_session(self):
        response = use(self.make()["token"])
        self.assertEqual(0, response.code(), response.body)
        self.assertEqual(("alice", pwd.getpwnam("alice").pw_uid),
                         tuple(response.json()["data"][name] for name in ("name", "uid")))
        self.assertEqual([], response.values("Set-Cookie"))

    def test_a_token_is_refused_outside_its_apis_and_methods(self):
        token = self.make(self.admin)["token"]
        self.assertEqual(0, use(token).code())
        for api, method in (("ZOVA.Core.User", "list"), ("ZOVA.Core.System", "info"), ("ZOVA.Core.Task", "list")):
            with self.subTest(api=api, method=method):
                response = use(token, api, method)
                self.assertEqual((119, ["unauth"]), (response.code(), response.values("x-request-error")))

    def test_a_token_gives_its_user_no_more_than_the_user_may(self):
        token = self.make(apis=[{"api": "ZOVA.Core.System", "methods": "*"},
                                {"api": "ZOVA.Core.User", "methods": "*"}])["token"]
        self.assertEqual(105, use(token, "ZOVA.Core.System", "info").code())
        self.assertEqual(105, use(token, "ZOVA.Core.User", "list").code())
        self.assertEqual(105, use(token, name="admin").code())
        self.assertEqual(0, use(token, name="alice").code())

    def test_what_is_no_token_is_refused(self):
        token = self.make()["token"]
        for other in ("x", token[:-1], token + "0", token.upper(), "../" + token, "0" * 64,
                      hashlib.sha256(token.encode()).hexdigest(), "a" * 100000):
            with self.subTest(other[:80]):
                self.assertEqual(119, use(other).code())

    def test_a_token_counts_until_it_expires_and_is_then_swept(self):
        made = self.make()
        path = record_of(made["token"])
        with open(path, encoding="utf-8") as file:
            record = json.load(file)
        for ago, code in ((-60, 0), (1, 119)):
            now = int(subprocess.run(["date", "+%s"], check=True, capture_output=True).stdout)
            record.update(created=now - 100, expires=now - ago)
            with open(path, "w", encoding="utf-8") as file:
                json.dump(record, file)
            self.assertEqual(code, use(made["token"]).code())
        self.assertEqual([], self.listed(self.alice))
        self.assertFalse(os.path.exists(path))

    def test_a_revoked_token_counts_no_more(self):
        made, other = self.make(), self.make()
        self.assertEqual(0, use(made["token"]).code())
        self.assertEqual(402, self.admin.call(API, "revoke", post=True, id=webclient.quoted(made["id"])).code())
        self.assertEqual(0, self.alice.call(API, "revoke", post=True, id=webclient.quoted(made["id"])).code())
        self.assertEqual(119, use(made["token"]).code())
        self.assertEqual(0, use(other["token"]).code())
        self.assertEqual(402, self.alice.call(API, "revoke", post=True, id=webclient.quoted(made["id"])).code())

    def test_a_list_tells_all_but_the_token(self):
        made = self.make(label=webclient.quoted("my phone"))
        self.make(self.admin)
        tokens = self.listed(self.alice)
        self.assertEqual([{"id": made["id"], "label": "my phone", "apis": GET_USER, "expires": made["expires"],
                           "created": made["expires"] - 3600}], tokens)
        self.assertEqual(tokens, self.listed(self.admin, user="alice"))
        self.assertEqual(105, self.alice.call(API, "list", post=True, user="admin").code())

    def test_an_administrator_revokes_the_token_of_somebody_else(self):
        made = self.make()
        self.assertEqual(0, self.admin.call(API, "revoke", post=True, user="alice",
                                            id=webclient.quoted(made["id"])).code())
        self.assertEqual(119, use(made["token"]).code())

    def test_the_store_is_readable_for_root_only_and_holds_no_token(self):
        token = self.make()["token"]
        for path, mode in ((TOKENS, 0o40700), (record_of(token), 0o100600)):
            state = os.lstat(path)
            self.assertEqual((oct(mode), 0), (oct(state.st_mode), state.st_uid))
        self.assertEqual({os.path.basename(record_of(token)), ".lock"}, set(os.listdir(TOKENS)))
        with open(record_of(token), encoding="utf-8") as file:
            self.assertNotIn(token, file.read())

    def test_a_session_beside_a_bad_token_counts(self):
        for token in ("x", "0" * 64):
            self.assertEqual(0, use(token, client=self.alice).code())
            self.assertEqual(0, use(token, API, "list", client=self.alice).code())

    def test_a_token_rescues_a_session_that_counts_no_more(self):
        gone = webclient.Client()
        gone.cookies["id"] = "0" * 64
        self.assertEqual(119, gone.call("ZOVA.Core.User", "get").code())
        self.assertEqual("alice", use(self.make()["token"], client=gone).json()["data"]["name"])

    def test_tokens_are_not_managed_by_means_of_a_token(self):
        for api in (API, "ZOVA.Core.Session", "ZOVA.Entry.Request"):
            wish = json.dumps([{"api": api, "methods": "*"}])
            response = self.alice.call(API, "create", post=True, apis=wish, expires_in=3600)
            self.assertEqual(b'{"error":{"code":101,"errors":{"parameter":"apis"}},"success":false}', response.body)
        made = self.make()
        with open(record_of(made["token"]), encoding="utf-8") as file:
            record = json.load(file)
        record["apis"].append({"api": API, "methods": "*"})
        with open(record_of(made["token"]), "w", encoding="utf-8") as file:
            json.dump(record, file)
        with self.subTest("nor by one whose record was changed so"):
            for method in ("create", "list", "revoke"):
                self.assertEqual(119, use(made["token"], API, method, apis=json.dumps(GET_USER), expires_in=3600,
                                          id=webclient.quoted(made["id"])).code())

    def test_a_token_opens_no_entry_of_a_batch_and_a_session_each_by_its_own_gate(self):
        entries = [{"api": "ZOVA.Core.User", "version": 1, "method": method} for method in ("get", "list")]
        batch = {"compound": json.dumps(entries)}
        token = self.make(apis=[{"api": "ZOVA.Core.User", "methods": "*"}])["token"]
        for client, codes in ((webclient.Client(), [119, 119]), (self.alice, [0, 105])):
            answer = use(token, "ZOVA.Entry.Request", "request", client=client, **batch).json()
            self.assertEqual(codes, [row.get("error", {}).get("code", 0) for row in answer["data"]["result"]])

    def test_tokens_are_made_in_a_batch_of_a_session_too(self):
        entry = {"api": API, "version": 1, "method": "create", "apis": GET_USER, "expires_in": 60}
        answer = self.alice.call("ZOVA.Entry.Request", "request", post=True, compound=json.dumps([entry])).json()
        self.assertEqual(0, use(answer["data"]["result"][0]["data"]["token"]).code())

    def test_who_is_not_logged_in_gets_no_token(self):
        response = webclient.Client().call(API, "create", post=True, apis=json.dumps(GET_USER), expires_in=3600)
        self.assertEqual((119, ["unauth"]), (response.code(), response.values("x-request-error")))

    def test_wishes_that_cannot_be_fulfilled_name_the_parameter(self):
        good = {"apis": json.dumps(GET_USER), "expires_in": 3600}
        for name, value in (("apis", "[]"), ("apis", "*"), ("expires_in", 0), ("expires_in", 59),
                            ("expires_in", 315360001), ("expires_in", "soon"),
                            ("label", webclient.quoted("x" * 129))):
            with self.subTest(name=name, value=value):
                response = self.alice.call(API, "create", post=True, **{**good, name: value})
                self.assertEqual({"code": 101, "errors": {"parameter": name}}, response.json()["error"])
        response = self.alice.call(API, "create", post=True, apis=good["apis"])
        self.assertEqual({"code": 101, "errors": {"parameter": "expires_in"}}, response.json()["error"])
        self.assertEqual([], self.listed(self.alice))


if __name__ == "__main__":
    unittest.main()
