"""Calls that one device passes on to another: what arrives, what comes back, who may."""

import json
import os
import subprocess
import time
import unittest

import peers
from peers import SECOND, call, device, query, webclient

# A login that was idle for longer than any device allows.
LONG_AGO = 24 * 3600


class Plain(peers.PeersTestCase):
    def test_the_answer_is_the_one_that_the_peer_gives_to_the_user_there(self):
        for user in ("alice", "admin"):
            here = webclient.logged_in(user)
            there = peers.PeerClient()
            self.assertEqual(0, there.call("ZOVA.Core.Session", "login", account=user,
                                           passwd=webclient.quoted(peers.PEER_PASSWORD)).code())
            direct = there.call("ZOVA.Core.User", "get")
            self.assertEqual(user, direct.json()["data"]["name"])
            for post in (False, True):
                relayed = call(here, "get", api="ZOVA.Core.User", post=post)
                self.assertEqual((200, direct.body), (relayed.status, relayed.body))

    def test_it_is_the_second_device_that_answers(self):
        client = webclient.logged_in("alice")
        folder = "/home/alice/only-here"
        os.mkdir(folder, 0o755)
        self.addCleanup(os.rmdir, folder)
        self.addCleanup(device.remove_tasks)
        search = {"folder": folder, "pattern": "x"}
        self.assertEqual(0, client.call("ZOVA.Storage.Search", "start", **search).code())
        self.assertEqual(401, call(client, "start", api="ZOVA.Storage.Search", **search).code())

    def test_the_headers_are_those_of_this_device(self):
        client = webclient.logged_in("alice")
        relayed = call(client, "get", api="ZOVA.Core.User")
        own = client.call("ZOVA.Core.User", "get")
        passed_over = {"date", "content-length", "transfer-encoding"}
        self.assertEqual([line for line in own.headers if line[0].lower() not in passed_over],
                         [line for line in relayed.headers if line[0].lower() not in passed_over])

    def test_parameters_arrive_as_the_values_that_they_are(self):
        values = {
            "number": 5, "negative": -7, "real": 0.25, "digits": "1", "true": True, "word": "true", "null": None,
            "quotes": '"quoted" \\ \'', "utf8": "grüß 😀", "list": [1, "1", [], {}, "é"], "object": {"a": {"b": None}},
            "json": '{"a":1}', "empty": "", "form": "a=b&c=d+e%20f", "lines": "a\r\nb\tc", "a name &=": "x",
        }
        client = webclient.logged_in("alice")
        parameters = {name: json.dumps(value, ensure_ascii=False) for name, value in values.items()}
        for post in (False, True):
            arrived = call(client, "params", post=post, **parameters).json()["data"]["params"]
            arrived.pop("tid")
            self.assertEqual({**values, "api": "ZOVA.Test.Probe", "version": 1, "method": "params"}, arrived)

    def test_an_error_of_the_peer_is_its_answer_and_no_failure(self):
        answer = call(webclient.logged_in("alice"), "get", api="ZOVA.Core.OAuth.Server")
        self.assertEqual((200, b'{"error":{"code":105},"success":false}', []),
                         (answer.status, answer.body, answer.values("x-request-error")))

    def test_a_session_parameter_stays_here(self):
        client = webclient.logged_in("alice")
        answer = webclient.request("GET", query("params", _sid=client.cookies["id"]))
        told = answer.json()["data"]["params"]
        self.assertNotIn("_sid", told)
        self.assertIn(told["tid"], peers.tokens())

    def test_a_device_token_of_this_device_relays_what_it_covers(self):
        client = webclient.logged_in("alice")
        apis = json.dumps([{"api": "ZOVA.Core.User", "methods": ["get"]}])
        token = client.call("ZOVA.Core.Token", "create", post=True, apis=apis, expires_in=600).json()["data"]["token"]
        relayed = webclient.request("GET", query("get", api="ZOVA.Core.User", tid=token))
        self.assertEqual("alice", relayed.json()["data"]["name"])
        self.assertEqual(119, webclient.request("GET", query("list", api="ZOVA.Core.User", tid=token)).code())

    def test_the_token_is_in_no_log(self):
        self.assertEqual(0, call(webclient.logged_in("alice"), "params").code())
        for name in os.listdir(device.LOGS):
            with open(f"{device.LOGS}/{name}", "rb") as log:
                content = log.read()
            self.assertEqual([], [token for token in peers.tokens() if token.encode() in content], name)


class Refused(peers.PeersTestCase):
    def test_an_api_that_is_not_known_here_is_not_relayed(self):
        client = webclient.logged_in("alice")
        self.assertEqual(102, call(client, "get", api="ZOVA.Not.Here").code())
        self.assertEqual(103, call(client, "not_there", api="ZOVA.Core.User").code())

    def test_an_api_that_the_peer_does_not_know_is_the_peers_102(self):
        place = f"{device.FOLDER}/ZOVA.Test.Here.lib"
        with open(f"{device.FOLDER}/ZOVA.Core.User.lib", encoding="utf-8") as file:
            text = file.read()
        with open(place, "w", encoding="utf-8") as file:
            file.write(text.replace("ZOVA.Core.User", "ZOVA.Test.Here"))
        self.addCleanup(os.unlink, place)
        relayed = call(webclient.logged_in("alice"), "get", api="ZOVA.Test.Here")
        self.assertEqual(102, relayed.code())

    def test_without_a_login_nothing_is_relayed(self):
        answer = webclient.request("GET", query("params"))
        self.assertEqual((119, []), (answer.code(), answer.values("x-request-error")))

    def test_a_user_without_a_credential_is_refused(self):
        self.change_table(lambda table: table[str(SECOND)]["users"].pop("alice"))
        self.assert_relay_failed(call(webclient.logged_in("alice"), "params"), 4)
        self.assertEqual(0, call(webclient.logged_in("admin"), "params").code())

    def test_a_credential_for_an_earlier_account_of_that_name_is_none(self):
        def change(table):
            table[str(SECOND)]["users"]["alice"]["uid"] += 1000
        self.change_table(change)
        self.assert_relay_failed(call(webclient.logged_in("alice"), "params"), 4)

    def test_a_revoked_token_is_the_peers_119(self):
        def change(table):
            table[str(SECOND)]["users"]["alice"]["token"] = "0" * 64
        self.change_table(change)
        self.assertEqual(119, call(webclient.logged_in("alice"), "get", api="ZOVA.Core.User").code())

    def test_a_peer_that_is_not_in_the_table_is_refused(self):
        client = webclient.logged_in("alice")
        for number in (99, 0, -1, "nas", 1):
            self.assert_relay_failed(call(client, "params", peer=number), 2)

    def test_a_table_that_others_can_read_is_not_used(self):
        client = webclient.logged_in("alice")
        os.chmod(peers.TABLE, 0o644)
        self.assert_relay_failed(call(client, "params"), 1)
        os.unlink(peers.TABLE)
        self.assert_relay_failed(call(client, "params"), 1)

    def test_a_batch_entry_that_relays_is_refused_with_109(self):
        entries = [{"api": "ZOVA.Core.User", "version": 1, "method": "get", "relay_zn": SECOND},
                   {"api": "ZOVA.Core.User", "version": 1, "method": "get"}]
        answer = webclient.logged_in("alice").call("ZOVA.Entry.Request", "request", compound=json.dumps(entries))
        results = answer.json()["data"]["result"]
        self.assertEqual([109, None], [entry.get("error", {}).get("code") for entry in results])

    def test_a_batch_as_a_whole_is_relayed_but_no_token_opens_its_entries(self):
        entries = [{"api": "ZOVA.Core.User", "version": 1, "method": "get"},
                   {"api": "ZOVA.Core.User", "version": 1, "method": "get", "relay_zn": 1}]
        answer = call(webclient.logged_in("alice"), "request", api="ZOVA.Entry.Request", compound=json.dumps(entries))
        self.assertEqual([119, 109], [entry["error"]["code"] for entry in answer.json()["data"]["result"]])

    def test_a_session_that_timed_out_relays_where_skip_timeout_says_so(self):
        client = webclient.logged_in("alice")
        session = f"{device.SESSIONS}/{client.cookies['id']}"
        place = f"{device.FOLDER}/ZOVA.Test.Probe.lib"
        with open(place, encoding="utf-8") as file:
            description = json.load(file)
        for skips, code in ((False, 106), (True, 0)):
            description["ZOVA.Test.Probe"]["skipTimeout"] = skips
            with open(place, "w", encoding="utf-8") as file:
                json.dump(description, file)
            os.utime(session, (time.time() - LONG_AGO,) * 2)
            self.assertEqual(code, call(client, "params").code())


class BadPeers(peers.PeersTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.stand_in = peers.StandIn()
        cls.addClassCleanup(cls.stand_in.close)

    def ask(self, path, record=None, **more):
        self.enter({**self.stand_in.record(path), **(record or {})})
        return call(webclient.logged_in("alice"), "params", peer=peers.STAND_IN, **more)

    def test_a_good_answer_is_passed_on_whatever_it_holds(self):
        self.assertEqual("/echo", self.ask("/echo").json()["target"])
        self.assertEqual(b"", self.ask("/empty").body)
        self.assertEqual(b"x" * (16 << 20), self.ask("/largest").body)

    def test_every_bad_answer_is_109_with_its_number_in_the_log(self):
        for path, number in (("/status", 11), ("/redirect", 11), ("/garbage", 10), ("/close", 10), ("/short", 10),
                             ("/chunk", 10), ("/cut", 10), ("/large", 12), ("/endless", 12), ("/headers", 12)):
            with self.subTest(path):
                self.log = device.SystemLog()
                self.assert_relay_failed(self.ask(path), number)

    def test_a_peer_that_is_down(self):
        self.assert_relay_failed(self.ask("/echo", {"port": 1}), 7)

    def test_a_peer_with_another_key_or_name_or_without_tls_is_told_nothing(self):
        second = peers.read_table()["peers"][str(SECOND)]
        for record in ({"pin": second["pin"]}, {"host": "device-2"}, {"port": self.stand_in.plain_port}):
            with self.subTest(record):
                self.log = device.SystemLog()
                self.assert_relay_failed(self.ask("/echo", record), 8)

    def test_a_slow_peer_is_waited_for_as_long_as_asked(self):
        for path in ("/slow", "/drip"):
            with self.subTest(path):
                self.log = device.SystemLog()
                begun = time.monotonic()
                self.assert_relay_failed(self.ask(path, relay_timeout=2), 9)
                self.assertLess(time.monotonic() - begun, 15)

    def test_a_slow_answer_is_good_without_a_time_out_and_with_a_longer_one(self):
        for more in ({}, {"relay_timeout": 30}, {"relay_timeout": 0}, {"relay_timeout": -1}):
            self.assertEqual("POST", self.ask("/pause", **more).json()["method"], more)
        self.assert_relay_failed(self.ask("/pause", relay_timeout=1), 9)

    def test_a_client_that_leaves_ends_the_relay_when_its_time_is_over(self):
        self.enter(self.stand_in.record("/slow"))
        client = webclient.logged_in("alice")
        with subprocess.Popen(["curl", "--silent", "--cookie", f"id={client.cookies['id']}",
                               f"{device.URL}?{query('params', peer=peers.STAND_IN, relay_timeout=3)}"]) as process:
            device.wait_for(device.hosts_running, "the host program")
            process.kill()
        device.wait_for(lambda: not device.hosts_running(), "the end of the host program")


if __name__ == "__main__":
    unittest.main()
