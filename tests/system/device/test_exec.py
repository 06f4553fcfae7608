"""Calls from a program outside the web server, in the name of a user: identity, output, errors, and what is left."""

import json
import os
import pwd
import subprocess
import tempfile
import unittest

import device
import probe

PROGRAM = probe.BUILD + "/bin/probe-exec"
# Descriptors to which the method's output may go.
NOWHERE = -1
OWN = 1
CAPTURED = 4
HEADER = b"Content-Type: text/plain\r\n\r\n"
# What a pump that looks for ends of texts or headers stumbles over.
TEXT = "a\0b\r\n\r\nc\n\u00e4"


class Outcome:
    """What the call answered, and what its program wrote to its own output and to the target."""

    def __init__(self, report, output, captured):
        self.result = report["result"]
        self.output = output
        self.captured = captured

    @property
    def code(self):
        return 0 if self.result["success"] else self.result["error"]["code"]


class OutOfBand(probe.ProbeTestCase):
    def call(self, method, form="param", target=NOWHERE, redirections="", caller="root", user="alice", api=probe.API,
             version=1, **params):
        """One call by a program of its own, whose process comes out of it as it went in."""
        call = {"user": user, "api": api, "version": version, "method": method, "params": params}
        with tempfile.TemporaryDirectory() as folder:
            os.chmod(folder, 0o777)
            process = subprocess.run(
                ["/bin/sh", "-c", f'exec "$0" "$@" 3>report {CAPTURED}>captured {redirections}', PROGRAM, form,
                 str(target), json.dumps(call)], env={}, cwd=folder, stdin=subprocess.DEVNULL,
                capture_output=True, timeout=device.TIME_LIMIT, check=False, user=caller, group=caller, extra_groups=[])
            self.assertEqual((b"", 0), (process.stderr, process.returncode))
            with open(folder + "/report", encoding="utf-8") as file:
                report = json.load(file)
            with open(folder + "/captured", "rb") as file:
                captured = file.read()
            self.assertEqual(folder, report["before"]["directory"])
        if caller != "root":
            # The nice value of the API: only root may take a higher one back.
            self.assertIn(report["after"].pop("nice"), (report["before"].pop("nice"), 5))
        self.assertEqual(report["before"], report["after"])
        self.assertIs(False, report["child_left"])
        return Outcome(report, process.stdout, captured)

    def tearDown(self):
        # A child belongs to nobody here; its end is its own affair, but it has to come.
        device.wait_for(lambda: not device.running(PROGRAM), "the end of the children")
        device.wait_for(lambda: not device.zombies(), "somebody to wait for all processes")
        super().tearDown()

    def test_a_method_runs_as_the_user_named_in_every_form(self):
        entry = pwd.getpwnam("alice")
        uid, gid = entry.pw_uid, entry.pw_gid
        groups = sorted(os.getgrouplist("alice", gid))
        rows = {"by_user": ([0, uid, 0], [0, gid, 0]), "by_user_lasting": ([uid] * 3, [gid] * 3)}
        for method, ids in rows.items():
            for form in ("param", "short"):
                for target in (NOWHERE, CAPTURED):
                    with self.subTest(method=method, form=form, target=target):
                        outcome = self.call(method, form, target)
                        inside = outcome.result["data"]
                        self.assertEqual((*ids, groups), (inside["user"], inside["group"], inside["groups"]))
                        self.assertIs(True, inside["input_at_end"])
                        # It writes to the stream object, which leads nowhere without "allowDownload".
                        self.assertEqual((b"", b""), (outcome.output, outcome.captured))

    def test_a_method_that_names_its_own_user_runs_as_that_one(self):
        nobody = pwd.getpwnam("nobody").pw_uid
        self.assertEqual([0, nobody, 0], self.call("granted").result["data"]["user"])
        self.assertEqual([nobody] * 3, self.call("lasting").result["data"]["user"])

    def test_captured_output_arrives_exactly_without_its_header(self):
        # One piece, and far more than a pipe holds.
        for times in (1, 100000):
            for method in ("write", "write_lasting"):
                for form in ("param", "short"):
                    with self.subTest(times=times, method=method, form=form):
                        outcome = self.call(method, form, target=CAPTURED, text=TEXT, times=times)
                        self.assertEqual(0, outcome.code)
                        self.assertEqual(TEXT.encode() * times, outcome.captured)
                        self.assertEqual(b"", outcome.output)

    def test_output_without_a_target_goes_to_the_programs_own_from_its_process_and_nowhere_from_a_child(self):
        rows = {"write": HEADER + TEXT.encode() * 3, "write_lasting": b""}
        for method, output in rows.items():
            with self.subTest(method):
                outcome = self.call(method, text=TEXT, times=3)
                self.assertEqual((0, output, b""), (outcome.code, outcome.output, outcome.captured))

    def test_captured_output_can_go_to_the_programs_own(self):
        outcome = self.call("write", target=OWN, text=TEXT, times=100000)
        self.assertEqual((0, b""), (outcome.code, outcome.captured))
        self.assertEqual(TEXT.encode() * 100000, outcome.output)

    def test_a_target_that_takes_nothing_costs_the_call_nothing(self):
        # One that is not open, and one that is open for reading only.
        for target, redirection in ((77, ""), (CAPTURED, f"{CAPTURED}</dev/null")):
            with self.subTest(target):
                outcome = self.call("write", target=target, redirections=redirection, text=TEXT, times=100000)
                self.assertEqual((0, b"", b""), (outcome.code, outcome.output, outcome.captured))

    def test_a_program_without_standard_descriptors_makes_the_same_calls(self):
        closed = "<&- >&- 2>&-"
        for method in ("write", "write_lasting"):
            with self.subTest(method):
                outcome = self.call(method, target=CAPTURED, redirections=closed, text=TEXT, times=100000)
                self.assertEqual((0, TEXT.encode() * 100000), (outcome.code, outcome.captured))
        uid = pwd.getpwnam("alice").pw_uid
        for method, ids in (("by_user", [0, uid, 0]), ("by_user_lasting", [uid] * 3)):
            with self.subTest(method):
                self.assertEqual(ids, self.call(method, redirections=closed).result["data"]["user"])

    def test_a_method_that_dies_answers_117_and_what_it_wrote_has_arrived(self):
        failure = {"success": False, "error": {"code": 117}}
        self.assertEqual(failure, self.call("dies").result)
        outcome = self.call("write_lasting", target=CAPTURED, text=TEXT, times=50000, dies=True)
        self.assertEqual(failure, outcome.result)
        self.assertEqual(TEXT.encode() * 50000, outcome.captured)

    def test_a_result_from_a_child_that_no_pipe_holds_answers_117(self):
        self.assertEqual(60000, len(self.call("answer_long", size=60000).result["data"]))
        for size in (70000, 10000000):
            for target in (NOWHERE, CAPTURED):
                with self.subTest(size=size, target=target):
                    self.assertEqual(117, self.call("answer_long", target=target, size=size).code)

    def test_what_cannot_be_called_is_an_error_of_its_own(self):
        rows = {
            "unknown user": (117, {"method": "by_user", "user": "nobody-knows-me"}),
            "unknown user, in a child": (117, {"method": "by_user_lasting", "user": "nobody-knows-me"}),
            "a user with a line end": (117, {"method": "by_user", "user": "alice\nroot"}),
            "no user": (101, {"method": "by_user", "user": ""}),
            "unknown API": (102, {"method": "by_user", "api": "ZOVA.Test.None"}),
            "an API outside the folder": (102, {"method": "by_user", "api": "../webapi/" + probe.API}),
            "no API": (101, {"method": "by_user", "api": ""}),
            "version too high": (104, {"method": "by_user", "version": 2}),
            "version 0": (101, {"method": "by_user", "version": 0}),
            "negative version": (101, {"method": "by_user", "version": -1}),
            "unknown method": (103, {"method": "none"}),
            "no method": (101, {"method": ""}),
            "a method that throws": (117, {"method": "throws"}),
        }
        for name, (code, call) in rows.items():
            for target in (NOWHERE, CAPTURED):
                with self.subTest(name, target=target):
                    outcome = self.call(target=target, **call)
                    self.assertEqual((code, b"", b""), (outcome.code, outcome.output, outcome.captured))

    def test_a_program_that_is_not_root_cannot_take_an_identity(self):
        for method in ("by_user", "by_user_lasting", "by_default", "granted"):
            with self.subTest(method):
                self.assertEqual(117, self.call(method, caller="alice", user="admin").code)


if __name__ == "__main__":
    unittest.main()
