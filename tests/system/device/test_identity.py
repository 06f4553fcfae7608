"""Under which identity, and in which state of its process, a real method runs, and what is left of it afterwards."""

import grp
import json
import os
import pwd
import subprocess
import unittest

import device
import probe
import webclient

def account(name):
    """User id, group id and all groups of an account, as the machine's own database has them."""
    entry = pwd.getpwnam(name)
    return entry.pw_uid, entry.pw_gid, sorted(os.getgrouplist(name, entry.pw_gid))


class Outcome:
    def __init__(self, output, report):
        self.answer = json.loads(output.partition(b"\r\n\r\n")[2])
        self.before = report["before"]
        self.after = report["after"]
        self.streams_back = report["streams_back"]

    @property
    def inside(self):
        return self.answer["data"]

    @property
    def code(self):
        return 0 if self.answer["success"] else self.answer["error"]["code"]


class Identity(probe.ProbeTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.sid = webclient.logged_in("alice").cookies["id"]

    def call(self, method, cookie=None):
        environment = {"REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1",
                       "QUERY_STRING": f"api=ZOVA.Test.Probe&version=1&method={method}"}
        if cookie is not None:
            environment["HTTP_COOKIE"] = cookie
        reader, writer = os.pipe()
        with os.fdopen(reader, "rb") as report:
            try:
                process = subprocess.run(
                    ["/bin/sh", "-c", f"exec {probe.BUILD}/bin/probe-host 3>&{writer} {writer}>&-"], env=environment,
                    stdin=subprocess.DEVNULL, capture_output=True, cwd=device.FOLDER, pass_fds=(writer,),
                    timeout=device.TIME_LIMIT, check=False)
            finally:
                os.close(writer)
            self.assertEqual((b"", 0), (process.stderr, process.returncode))
            outcome = Outcome(process.stdout, json.load(report))
        self.assertNotIn(b"nowhere to go", process.stdout)
        self.assertTrue(outcome.streams_back)
        return outcome

    def alice(self, method):
        return self.call(method, f"id={self.sid}")

    def assert_ran(self, outcome, user, group, groups):
        self.assertEqual(0, outcome.code)
        inside = outcome.inside
        self.assertEqual((user, group, groups), (inside["user"], inside["group"], inside["groups"]))
        self.assertEqual((5, True, device.FOLDER), (inside["nice"], inside["input_at_end"], inside["directory"]))

    def assert_as_before(self, outcome):
        self.assertEqual(outcome.before, outcome.after)

    def assert_lasting(self, outcome, name):
        uid, gid, groups = account(name)
        self.assert_ran(outcome, [uid] * 3, [gid] * 3, groups)
        after = outcome.after
        self.assertEqual(([uid] * 3, [gid] * 3, groups), (after["user"], after["group"], after["groups"]))
        self.assertEqual((device.FOLDER, outcome.before["descriptors"]), (after["directory"], after["descriptors"]))

    def test_a_grantable_method_runs_as_its_user_and_the_process_is_as_before(self):
        uid, gid, groups = account("nobody")
        outcome = self.call("granted")
        self.assert_ran(outcome, [0, uid, 0], [0, gid, 0], groups)
        self.assert_as_before(outcome)

    def test_a_method_granted_by_user_runs_as_the_one_who_is_logged_in(self):
        uid, gid, groups = account("alice")
        outcome = self.alice("by_user")
        self.assert_ran(outcome, [0, uid, 0], [0, gid, 0], groups)
        self.assert_as_before(outcome)

    def test_a_method_granted_by_default_stays_root(self):
        outcome = self.alice("by_default")
        self.assert_ran(outcome, [0, 0, 0], [0, 0, 0], outcome.before["groups"])
        self.assert_as_before(outcome)

    def test_without_a_grant_the_process_stays_the_user_that_the_method_names(self):
        self.assert_lasting(self.call("lasting"), "nobody")

    def test_without_a_grant_the_process_stays_the_user_who_is_logged_in(self):
        self.assert_lasting(self.alice("by_user_lasting"), "alice")

    def test_a_method_that_names_nobody_runs_as_the_user_of_its_api(self):
        self.assert_lasting(self.call("api_user"), "games")

    def test_supplementary_groups_come_from_the_real_database(self):
        member = grp.getgrnam("administrators").gr_gid
        admin = webclient.logged_in("admin").cookies["id"]
        self.assertIn(member, self.call("by_user", f"id={admin}").inside["groups"])
        self.assertNotIn(member, self.alice("by_user").inside["groups"])

    def test_a_call_that_fails_leaves_the_process_as_before(self):
        rows = {"by_user": 117, "unknown_user": 117, "throws": 117, "refused": 1002, "check_throws": 117,
                "without_row": 121, "unlisted": 103}
        for method, code in rows.items():
            with self.subTest(method):
                outcome = self.call(method)
                self.assertEqual(code, outcome.code)
                self.assert_as_before(outcome)


if __name__ == "__main__":
    unittest.main()
