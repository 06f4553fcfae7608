"""Calls from end to end: login, identity, errors, figures."""

import grp
import json
import os
import pwd
import socket
import subprocess
import tempfile
import unittest

import device
import webclient


def groups_of(name):
    primary = pwd.getpwnam(name).pw_gid
    return sorted([grp.getgrgid(primary).gr_name] + [entry.gr_name for entry in grp.getgrall()
                                                     if name in entry.gr_mem and entry.gr_gid != primary])


class Login(device.DeviceTestCase):
    def test_alice_logs_in_with_curl_and_gets_her_real_uid_and_groups(self):
        with tempfile.TemporaryDirectory() as folder:
            secret, jar = folder + "/password", folder + "/cookies"
            with open(secret, "w", encoding="utf-8") as file:
                file.write(device.PASSWORD)
            subprocess.run(["curl", "-sS", "-c", jar, "-d", "api=ZOVA.Core.Session&version=1&method=login",
                            "--data-urlencode", "account=alice", "--data-urlencode", "passwd@" + secret, device.URL],
                           check=True, capture_output=True)
            answer = json.loads(subprocess.run(
                ["curl", "-sS", "-b", jar, device.URL + "?api=ZOVA.Core.User&version=1&method=get"],
                check=True, capture_output=True).stdout)
        self.assertIs(answer["success"], True)
        account = pwd.getpwnam("alice")
        data = answer["data"]
        self.assertEqual(("alice", account.pw_uid, account.pw_gid), (data["name"], data["uid"], data["gid"]))
        self.assertEqual(groups_of("alice"), sorted(data["groups"]))

    def test_login_answers_the_session_and_sets_it_as_a_cookie_for_http_only(self):
        client = webclient.Client()
        response = client.login("alice")
        data = response.json()["data"]
        self.assertRegex(data["sid"], r"\A[0-9a-f]{64}\Z")
        self.assertEqual(("alice", False), (data["user"], data["is_admin"]))
        self.assertNotIn("token", data)
        self.assertEqual([f"id={data['sid']}; path=/; SameSite=Strict; httponly"], response.values("Set-Cookie"))

    def test_the_session_file_is_readable_for_root_only(self):
        sid = webclient.logged_in("alice").cookies["id"]
        for path, mode in ((device.SESSIONS, 0o40700), (f"{device.SESSIONS}/{sid}", 0o100600)):
            state = os.lstat(path)
            self.assertEqual((oct(mode), 0), (oct(state.st_mode), state.st_uid))

    def test_a_wrong_password_is_refused_as_an_unknown_account_is(self):
        answers = []
        for account, password in (("alice", "not" + device.PASSWORD), ("no-such-account", device.PASSWORD)):
            response = webclient.Client().call("ZOVA.Core.Session", "login", post=True, account=account,
                                               passwd=webclient.quoted(password))
            self.assertEqual([], response.values("Set-Cookie"))
            answers.append(response.body)
        self.assertEqual([b'{"error":{"code":400},"success":false}'] * 2, answers)

    def test_after_five_wrong_passwords_the_right_one_is_refused_too(self):
        client = webclient.Client()
        for _ in range(5):
            self.assertEqual(400, client.call("ZOVA.Core.Session", "login", post=True, account="alice",
                                              passwd=webclient.quoted("wrong")).code())
        response = client.login("alice")
        self.assertEqual((407, []), (response.code(), response.values("Set-Cookie")))

    def test_a_session_with_a_token_needs_it_with_each_call(self):
        client = webclient.Client()
        token = client.login("alice", csrf="true").json()["data"]["token"]
        self.assertEqual(105, client.call("ZOVA.Core.User", "get").code())
        client.token = token[:-1] + ("0" if token[-1] != "0" else "1")
        self.assertEqual(105, client.call("ZOVA.Core.User", "get").code())
        client.token = token
        self.assertEqual(0, client.call("ZOVA.Core.User", "get").code())

    def test_after_logout_the_session_counts_no_more(self):
        client = webclient.logged_in("alice")
        sid = client.cookies["id"]
        self.assertEqual(0, client.call("ZOVA.Core.Session", "logout").code())
        client.cookies["id"] = sid
        self.assertEqual(119, client.call("ZOVA.Core.User", "get").code())
        self.assertFalse(os.path.exists(f"{device.SESSIONS}/{sid}"))

    def test_session_get_tells_whose_session_it_is(self):
        self.assertEqual({"user": "admin", "is_admin": True},
                         webclient.logged_in("admin").call("ZOVA.Core.Session", "get").json()["data"])


class Permission(device.DeviceTestCase):
    def test_without_a_cookie_the_answer_is_119_with_the_word_unauth(self):
        response = webclient.Client().call("ZOVA.Core.User", "get")
        self.assertEqual(b'{"error":{"code":119},"success":false}', response.body)
        self.assertEqual(["unauth"], response.values("x-request-error"))

    def test_alice_may_ask_for_herself_only(self):
        client = webclient.logged_in("alice")
        self.assertEqual(0, client.call("ZOVA.Core.User", "get", name="alice").code())
        self.assertEqual(105, client.call("ZOVA.Core.User", "get", name="admin").code())
        self.assertEqual(105, client.call("ZOVA.Core.User", "list").code())

    def test_admin_may_ask_for_anybody(self):
        client = webclient.logged_in("admin")
        data = client.call("ZOVA.Core.User", "get", name="alice").json()["data"]
        self.assertEqual(pwd.getpwnam("alice").pw_uid, data["uid"])
        self.assertEqual(0, client.call("ZOVA.Core.User", "list").code())

    def test_the_parameter_sid_stands_for_the_cookie(self):
        sid = webclient.logged_in("alice").cookies["id"]
        self.assertEqual(0, webclient.Client().call("ZOVA.Core.User", "get", _sid=webclient.quoted(sid)).code())

    def test_a_session_is_bound_to_its_address(self):
        client = webclient.logged_in("alice")
        response = webclient.request("GET", "api=ZOVA.Core.User&version=1&method=get",
                                     headers={**client.headers(), "X-Forwarded-For": "192.0.2.1"})
        # No proxy is configured, so that the header is nothing but what a client says of itself.
        self.assertEqual(0, response.code())


class SystemFigures(device.DeviceTestCase):
    def test_alice_is_refused(self):
        self.assertEqual(105, webclient.logged_in("alice").call("ZOVA.Core.System", "info").code())

    def test_admin_gets_real_figures(self):
        data = webclient.logged_in("admin").call("ZOVA.Core.System", "info").json()["data"]
        self.assertEqual(socket.gethostname(), data["hostname"])
        with open("/proc/uptime", encoding="ascii") as file:
            self.assertAlmostEqual(float(file.read().split()[0]), data["uptime"], delta=30)
        with open("/proc/meminfo", encoding="ascii") as file:
            total = int(file.readline().split()[1]) * 1024
        self.assertEqual(total, data["memory"]["total"])
        self.assertLessEqual(data["memory"]["available"], total)
        self.assertEqual({"1", "5", "15"}, set(data["load"]))
        volumes = {volume["mount_point"]: volume for volume in data["volumes"]}
        root = os.statvfs("/")
        self.assertEqual(root.f_blocks * root.f_frsize, volumes["/"]["total"])


if __name__ == "__main__":
    unittest.main()
