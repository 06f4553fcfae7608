"""Calls with a bearer token: what it stands for is asked of OAuth servers, what it opens of the device's own list."""

import json
import os
import pwd
import re
import socket
import syslog
import tempfile
import threading
import time
import unittest
import urllib.parse
import uuid

import device
import oauth
import webclient

SERVER, SCOPE, USER = "ZOVA.Core.OAuth.Server", "ZOVA.Core.OAuth.Scope", "ZOVA.Core.User"
# For servers that know one answer.
TOKEN = "token-of-a-scripted-server"
GET_USER = {"api": USER, "version": 1, "method": "get"}
SCOPES = [
    {"id": "users", "apis": [{"params": [f"api={USER}&method=get&version=1"]}]},
    {"id": "users.list", "apis": [{"params": [f"api={USER}&method=list"]}]},
    {"id": "core", "apis": [{"params": ["api=ZOVA.Core."]}]},
    {"id": "batches", "apis": [{"params": ["api=ZOVA.Entry.Request"]}]},
    {"id": "elsewhere", "apis": [{"endpoint": "photos/", "params": ["api=ZOVA.Core."]}]},
    {"id": "own", "apis": [{"params": [f"api={USER}&name=\"alice\""]}]},
    {"id": "/bin/bash", "apis": [{"params": ["api=ZOVA.Core."]}]},
]


def call(token=None, entry=None, header=None, cookies=None, **parameters):
    """A call with the token in the header `Authorization`."""
    headers = {}
    if token is not None:
        headers["Authorization"] = "Bearer " + token
    if header is not None:
        headers["Authorization"] = header
    if cookies:
        headers["Cookie"] = "; ".join(f"{name}={value}" for name, value in cookies.items())
    pairs = {**(entry or GET_USER), **parameters}
    return webclient.request("GET", urllib.parse.urlencode(pairs), headers=headers)


class TokenCase(device.DeviceTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        folder = tempfile.TemporaryDirectory()
        cls.addClassCleanup(folder.cleanup)
        cls.folder = folder.name
        cls.admin = webclient.logged_in("admin")
        cls.addClassCleanup(cls.set_servers, [])
        cls.addClassCleanup(cls.set_scopes, [])

    @classmethod
    def set_list(cls, api, **parameters):
        answer = cls.admin.call(api, "set", post=True, **{name: json.dumps(value) for name, value in parameters.items()})
        if answer.code() != 0:
            raise AssertionError(answer.body)

    @classmethod
    def set_servers(cls, servers):
        cls.set_list(SERVER, servers=servers)

    @classmethod
    def set_scopes(cls, scopes):
        cls.set_list(SCOPE, scope=scopes)

    def setUp(self):
        super().setUp()
        self.set_scopes(SCOPES)
        self.messages = device.LOGS + "/messages"
        self.logged_before = os.path.getsize(self.messages)

    def log(self):
        """What was logged since the test began. A line of its own, waited for, stands behind all that came before."""
        marker = uuid.uuid4().hex
        syslog.syslog(syslog.LOG_INFO, marker)
        deadline = time.monotonic() + device.TIME_LIMIT
        while time.monotonic() < deadline:
            with open(self.messages, "rb") as file:
                file.seek(self.logged_before)
                text = file.read().decode("utf-8", "replace")
            if marker in text:
                return text
            time.sleep(0.01)
        raise AssertionError("the log is not written")

    def assert_logged(self, *expected):
        """These lines of the token check, and no others of it."""
        self.assertEqual(list(expected), re.findall(r"\]: AccessToken\.cpp:\d+ (.*)$", self.log(), re.MULTILINE))

    def assert_user(self, response, name="alice"):
        self.assertEqual((0, []), (response.code(), response.values("x-request-error")), response.body)
        data = response.json()["data"]
        self.assertEqual((name, pwd.getpwnam(name).pw_uid), (data["name"], data["uid"]))

    def assert_refused(self, response, *logged):
        """As for every outcome that is no pass; the log says which it was."""
        self.assertEqual((200, b'{"error":{"code":105},"success":false}', ["noprivilege"]),
                         (response.status, response.body, response.values("x-request-error")))
        self.assert_logged(*logged)

    def scripted(self, answer):
        server = oauth.ScriptedServer(self.folder, answer)
        self.addCleanup(server.stop)
        return server


class RealServer(TokenCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.server = oauth.Server(cls.folder)
        cls.addClassCleanup(cls.server.stop)

    def setUp(self):
        super().setUp()
        self.set_servers([self.server.record()])

    def tearDown(self):
        text = self.log()
        self.assertNotIn(self.server.device["secret"], text)
        self.assertNotIn(oauth.basic(self.server.device), text)
        super().tearDown()

    def test_a_token_in_the_header_makes_the_call_its_users(self):
        token = self.server.token("alice", "users")
        self.assert_user(call(token))
        self.assert_logged()
        self.assertNotIn(token, self.log())

    def test_a_token_as_a_parameter_does_too(self):
        token = self.server.token("alice", "users")
        self.assert_user(call(_oat=token))
        body = urllib.parse.urlencode({**GET_USER, "_oat": token}).encode()
        self.assert_user(webclient.request("POST", body=body))

    def test_an_empty_token_in_the_header_leaves_it_to_the_parameter(self):
        self.assert_user(call(header="Bearer ", _oat=self.server.token("alice", "users")))

    def test_a_token_in_the_header_is_found_behind_another_scheme(self):
        self.assert_user(call(header="Basic x, Bearer " + self.server.token("alice", "users")))

    def test_a_token_of_several_scopes_opens_what_each_of_them_opens(self):
        token = self.server.token("admin", "unknown users users.list")
        self.assert_user(call(token), "admin")
        self.assertEqual(0, call(token, method="list").code())

    def test_a_scope_of_an_api_prefix_opens_all_methods_below_it(self):
        token = self.server.token("admin", "core")
        for api, method in ((USER, "get"), (USER, "list"), ("ZOVA.Core.System", "info")):
            self.assertEqual(0, call(token, api=api, method=method).code())

    def test_outside_its_scopes_a_token_opens_nothing(self):
        for scope in ("users.list", "unknown", "elsewhere"):
            with self.subTest(scope):
                self.assert_refused(call(self.server.token("admin", scope)))
        self.assert_refused(call(self.server.token("admin", "users"), method="list"))

    def test_a_scope_opens_to_its_user_only_what_that_kind_of_user_may_call(self):
        response = call(self.server.token("alice", "users.list"), method="list")
        self.assertEqual((105, []), (response.code(), response.values("x-request-error")))

    def test_a_revoked_token_opens_nothing(self):
        token = self.server.token("alice", "users")
        self.assert_user(call(token))
        self.server.revoke(token)
        expect = json.dumps(self.server.record()["expect"], separators=(",", ":"), sort_keys=True)
        refusal = f'Resolve {{"active":false}} with {expect} failed. Can not found userName or scope'
        self.assert_refused(call(token), refusal)
        self.assert_refused(call("never-issued"), refusal, refusal)

    def test_a_token_of_a_user_whom_the_device_does_not_know_opens_nothing(self):
        token = self.server.token("nobody-here", "users")
        self.assert_refused(call(token), "Can not find user (nobody-here). ")

    def test_a_server_that_refuses_the_devices_own_secret_opens_nothing(self):
        token = self.server.token("alice", "users")
        wrong = {"id": self.server.device["id"], "secret": "x"}
        self.set_servers([self.server.record(header="Authorization: Basic " + oauth.basic(wrong))])
        response = call(token)
        self.assertEqual((105, ["noprivilege"]), (response.code(), response.values("x-request-error")))
        self.assertIn('Resolve {"error":"invalid_client"', self.log())

    def test_without_a_server_that_is_up_a_token_opens_nothing(self):
        other = oauth.Server(self.folder)
        self.addCleanup(other.stop)
        token = other.token("alice", "users")
        self.set_servers([other.record()])
        self.assert_user(call(token))
        other.stop()
        self.assert_refused(call(token))

    def test_a_refused_token_is_not_rescued_by_a_session(self):
        cookies = webclient.logged_in("alice").cookies
        self.assert_user(call(cookies=cookies))
        self.assert_refused(call(self.server.token("alice", "unknown"), cookies=cookies))

    def test_of_two_servers_the_second_is_asked_where_the_first_refuses(self):
        other = oauth.Server(self.folder)
        self.addCleanup(other.stop)
        self.set_servers([other.record(), self.server.record()])
        self.assert_user(call(self.server.token("alice", "users")))
        self.assert_user(call(other.token("alice", "users")))

    def test_a_batch_runs_as_the_tokens_user_if_a_scope_opens_the_batch(self):
        batch = {"api": "ZOVA.Entry.Request", "version": 1, "method": "request", "compound": json.dumps([GET_USER] * 2)}
        result = call(self.server.token("alice", "batches"), batch).json()["data"]["result"]
        self.assertEqual(["alice"] * 2, [row["data"]["name"] for row in result])
        result = call(self.server.token("alice", "users"), batch).json()["data"]["result"]
        self.assertEqual([105] * 2, [row["error"]["code"] for row in result])


class AnyServer(TokenCase):
    GOOD = {"user": "alice", "scope": "users"}

    def set_answer(self, answer):
        server = self.scripted(answer)
        self.set_servers([server.record()])
        return server

    def test_the_server_is_asked_with_the_record_header_and_template(self):
        server = self.scripted(oauth.answering(self.GOOD))
        self.set_servers([server.record(endpoint=f"HTTPS://127.0.0.1:{server.server_port}/ask?a=b",
                                        header="X-First: 1\nContent-Type: application/json\n",
                                        params={"token": "{access_token}", "again": ["{access_token}"]})])
        self.assert_user(call("a%&+b"))
        (path, headers, body), = server.asked
        self.assertEqual(("/ask?a=b", "1", "application/json"), (path, headers["X-First"], headers["Content-Type"]))
        # The first place only, in the order in which the template's text has its members; nothing is encoded.
        self.assertEqual(b'{"again":["a%&+b"],"token":"{access_token}"}', body)

    def test_a_filter_holds_parameters_too(self):
        self.set_answer(oauth.answering({"user": "alice", "scope": "own"}))
        self.assert_user(call(TOKEN, name="alice"))
        self.assert_refused(call(TOKEN))
        self.assert_refused(call(TOKEN, name="admin"))

    def test_an_answer_that_is_no_json_is_logged_by_its_endpoint(self):
        for garbage in (b"", b"<html>no</html>", b'{"user":', b"\0" + json.dumps(self.GOOD).encode()):
            with self.subTest(garbage=garbage):
                self.logged_before = os.path.getsize(self.messages)
                server = self.set_answer(oauth.answering(garbage))
                self.assert_refused(call(TOKEN), f"Can not read response from https://127.0.0.1:{server.server_port}/")

    def test_the_status_of_an_answer_does_not_count(self):
        self.set_answer(oauth.answering(self.GOOD, 500))
        self.assert_user(call(TOKEN))

    def test_a_redirection_is_not_followed(self):
        second = self.scripted(oauth.answering(self.GOOD))

        def redirect(handler):
            handler.send_response(307)
            handler.send_header("Location", f"https://127.0.0.1:{second.server_port}/")
            handler.send_header("Content-Length", "0")
            handler.end_headers()
        first = self.set_answer(redirect)
        self.assert_refused(call(TOKEN), f"Can not read response from https://127.0.0.1:{first.server_port}/")
        self.assertEqual([], second.asked)

    def test_an_answer_without_user_or_scope_or_with_other_types_is_refused(self):
        for answer in ({}, [], 7, None, {"user": "alice"}, {"scope": "users"}, {"user": 7, "scope": "users"},
                       {"user": "alice", "scope": ["users"]}, {"user": {"name": "alice"}, "scope": "users"}):
            with self.subTest(answer):
                self.logged_before = os.path.getsize(self.messages)
                self.set_answer(oauth.answering(answer))
                shown = json.dumps(answer, separators=(",", ":"), sort_keys=True)
                self.assert_refused(call(TOKEN), f'Resolve {shown} with {{"scope":"{{scope}}","user":"{{userName}}"}} failed.'
                                               ' Can not found userName or scope')

    def test_an_empty_user_or_scope_is_refused(self):
        for answer in ({"user": "", "scope": "users"}, {"user": "alice", "scope": ""}):
            with self.subTest(answer):
                self.logged_before = os.path.getsize(self.messages)
                self.set_answer(oauth.answering(answer))
                shown = json.dumps({"scope": answer["scope"], "userName": answer["user"]}, separators=(",", ":"))
                self.assert_refused(call(TOKEN), f"FATAL: response invalid. {shown}")

    def test_user_names_that_no_account_has_are_refused_and_printable_in_the_log(self):
        for name, shown in (("root\n", "root?"), ("../alice", "../alice"), ("alice\x7f", "alice?")):
            with self.subTest(name):
                self.logged_before = os.path.getsize(self.messages)
                self.set_answer(oauth.answering({"user": name, "scope": "users"}))
                self.assert_refused(call(TOKEN), f"Can not find user ({shown}). ")

    def test_ten_megabytes_are_refused_as_any_text_is(self):
        server = self.set_answer(oauth.answering(b"x" * (10 << 20)))
        self.assert_refused(call(TOKEN), f"Can not read response from https://127.0.0.1:{server.server_port}/")

    def test_an_answer_that_never_ends_is_broken_off_and_leaves_the_calls_own_answer_whole(self):
        def flood(handler):
            handler.send_response(200)
            handler.end_headers()
            while True:
                handler.wfile.write(b" " * 65536)
        self.set_answer(flood)
        self.assert_refused(call(TOKEN))

    def test_a_slow_answer_is_waited_for(self):
        def slow(handler):
            time.sleep(2)
            oauth.answering(self.GOOD)(handler)
        self.set_answer(slow)
        start = time.monotonic()
        self.assert_user(call(TOKEN))
        self.assertGreaterEqual(time.monotonic() - start, 2)

    def test_a_server_that_breaks_off_is_refused(self):
        def in_the_middle(handler):
            handler.send_response(200)
            handler.send_header("Content-Length", "1000")
            handler.end_headers()
            handler.wfile.write(json.dumps(self.GOOD).encode())
            handler.close_connection = True
        for answer in (lambda handler: handler.connection.shutdown(socket.SHUT_RDWR), in_the_middle):
            self.set_answer(answer)
            self.assert_refused(call(TOKEN))

    def test_a_server_without_tls_is_refused(self):
        listener = socket.create_server(("127.0.0.1", 0))
        self.addCleanup(listener.close)

        def hang_up():
            with listener.accept()[0] as connection:
                connection.sendall(b"HTTP/1.1 200 OK\r\n\r\n" + json.dumps(self.GOOD).encode())
        thread = threading.Thread(target=hang_up, daemon=True)
        thread.start()
        self.set_servers([{"enabled": True, "endpoint": f"https://127.0.0.1:{listener.getsockname()[1]}/",
                           "params": "{access_token}", "expect": {"user": "{userName}", "scope": "{scope}"}}])
        self.assert_refused(call(TOKEN))
        thread.join(device.TIME_LIMIT)

    def test_what_a_refusing_server_left_does_not_count_for_the_next(self):
        user = self.scripted(oauth.answering({"user": "admin"}))
        scope = self.scripted(oauth.answering({"scope": "users"}))
        good = self.scripted(oauth.answering(self.GOOD))
        self.set_servers([user.record(), scope.record()])
        response = call(TOKEN)
        self.assertEqual((105, ["noprivilege"]), (response.code(), response.values("x-request-error")))
        self.set_servers([user.record(), good.record(), scope.record()])
        self.assert_user(call(TOKEN))
        self.assertEqual([2, 1, 1], [len(server.asked) for server in (user, scope, good)])

    def test_a_server_that_is_not_enabled_is_not_asked(self):
        server = self.scripted(oauth.answering(self.GOOD))
        self.set_servers([server.record(enabled=False)])
        self.assert_refused(call(TOKEN))
        self.assertEqual([], server.asked)

    def test_an_api_that_is_open_to_everybody_asks_no_server(self):
        server = self.set_answer(oauth.answering(self.GOOD))
        self.assertEqual(0, call(TOKEN, {"api": "ZOVA.Core.Session", "version": 1, "method": "cipher"}).code())
        self.assertEqual([], server.asked)

    def test_each_call_asks_anew_and_a_batch_once(self):
        server = self.set_answer(oauth.answering({"user": "alice", "scope": "users batches"}))
        call(TOKEN)
        call(TOKEN)
        self.assertEqual(2, len(server.asked))
        call(TOKEN, {"api": "ZOVA.Entry.Request", "version": 1, "method": "request", "compound": json.dumps([GET_USER] * 5)})
        self.assertEqual(3, len(server.asked))

    def test_a_path_is_asked_at_the_devices_own_https_port(self):
        server = self.scripted(oauth.answering(self.GOOD))
        self.set_https_port(server.server_port)
        self.set_servers([server.record(endpoint="ask?a=b")])
        self.assert_user(call(TOKEN))
        self.assertEqual("/ask?a=b", server.asked[-1][0])

    def set_https_port(self, port):
        """As the maker of a device does; what stood there before comes back."""
        path = "/etc/zova/web-server.json"
        before = None
        if os.path.exists(path):
            with open(path, encoding="utf-8") as file:
                before = file.read()
        settings = json.loads(before) if before else {}
        with open(path, "w", encoding="utf-8") as file:
            json.dump({**settings, "https_port": port}, file)
        os.chmod(path, 0o600)

        def put_back():
            if before is None:
                os.remove(path)
            else:
                with open(path, "w", encoding="utf-8") as file:
                    file.write(before)
        self.addCleanup(put_back)

    def test_an_api_of_the_device_can_stand_for_a_server(self):
        self.set_servers([{"enabled": True, "params": f"api={USER}&version=1&method=get&name={{access_token}}",
                           "expect": {"data": {"name": "{userName}", "shell": "{scope}"}}}])
        self.assert_user(call("alice"))
        self.assert_refused(call("alice&name=admin"), "the token is no single value")


class Settings(TokenCase):
    def test_without_scopes_no_server_is_asked(self):
        server = self.scripted(oauth.answering(AnyServer.GOOD))
        self.set_servers([server.record()])
        self.set_scopes([])
        self.assert_refused(call(TOKEN), 'Can not find scope ({"data":{"scope":[]},"success":true}).')
        self.assertEqual([], server.asked)

    def test_without_servers_a_token_opens_nothing(self):
        self.set_servers([])
        self.assert_refused(call(TOKEN))

    def test_a_list_that_was_open_to_others_is_an_error(self):
        for name, line in (("oauth-servers.json", "Can not get oauth server information."),
                           ("oauth-scopes.json", 'Can not find scope ({"error":{"code":402},"success":false}).')):
            with self.subTest(name):
                self.set_servers([])
                self.logged_before = os.path.getsize(self.messages)
                os.chmod("/etc/zova/" + name, 0o644)
                try:
                    self.assert_refused(call(TOKEN), line)
                finally:
                    os.chmod("/etc/zova/" + name, 0o600)

    def test_only_an_administrator_reads_and_sets_them(self):
        self.set_servers([])
        alice = webclient.logged_in("alice")
        for api, parameter in ((SERVER, "servers"), (SCOPE, "scope")):
            for client, code in ((alice, 105), (webclient.Client(), 119)):
                self.assertEqual(code, client.call(api, "get").code())
                self.assertEqual(code, client.call(api, "set", post=True, **{parameter: "[]"}).code())
        self.assertEqual(SCOPES, self.admin.call(SCOPE, "get").json()["data"]["scope"])
        self.assertEqual([], self.admin.call(SERVER, "get").json()["data"])

    def test_their_files_are_readable_for_root_only(self):
        self.set_servers([])
        for name in ("oauth-servers.json", "oauth-scopes.json"):
            state = os.lstat("/etc/zova/" + name)
            self.assertEqual((0o100600, 0, 0), (state.st_mode, state.st_uid, state.st_gid))

    def test_a_refused_list_says_where_and_changes_nothing(self):
        answer = self.admin.call(SCOPE, "set", post=True, scope=json.dumps(SCOPES + [{"id": "a b", "apis": []}])).json()
        self.assertEqual({"code": 401, "errors": {"record": len(SCOPES), "member": "id", "reason": "characters"}},
                         answer["error"])
        self.assertEqual(SCOPES, self.admin.call(SCOPE, "get").json()["data"]["scope"])

    def test_many_at_once_leave_one_of_the_lists_as_a_whole(self):
        lists = [[{"id": f"scope{number}", "apis": []}, {"id": f"second{number}", "apis": []}]
                 for number in range(8)]
        clients = [threading.Thread(target=self.set_scopes, args=(scopes,)) for scopes in lists]
        for client in clients:
            client.start()
        for client in clients:
            client.join(device.TIME_LIMIT)
        self.assertIn(self.admin.call(SCOPE, "get").json()["data"]["scope"], lists)
        self.assertEqual([], [name for name in os.listdir("/etc/zova") if name.startswith(".new-")])


if __name__ == "__main__":
    unittest.main()
