"""Each system call of a call fails once, or is the last one of its process. The client gets a clear answer or, from a
killed process, a beginning of one; nothing is left behind, and the device serves on."""

import collections
import json
import os
import re
import signal
import subprocess
import tempfile
import unittest
import urllib.parse

import device
import host
import probe
import test_downloads
import test_sharing
import test_uploads
import webclient

# The system calls that an answer may depend on, each with an error that it can meet.
ERRORS = {"openat": "EMFILE", "read": "EIO", "write": "EIO", "newfstatat": "EIO", "flock": "EAGAIN", "fchmod": "EPERM",
          "linkat": "EIO", "getrandom": "ENOSYS", "setresuid": "EPERM", "setresgid": "EPERM", "setgroups": "EPERM",
          "fchown": "EPERM", "sendfile": "EIO", "prlimit64": "EPERM", "pread64": "EIO", "pwrite64": "ENOSPC",
          "fdatasync": "EIO"}
KILLED_AT = ("openat", "write", "fchmod", "flock", "linkat", "unlink", "newfstatat", "setresuid", "sendfile",
             "pwrite64", "fdatasync", "close")
# Under the sanitizers, which take their time, one in so many is met.
SANITIZED_STEP = 15
BEGINNING = re.compile(rb"(?:[^\r\n\0]+: [^\r\n\0]*\r\n)+(\r\n)?", re.DOTALL)


def traced(environment, body, *options):
    """One host program under strace. Its outcome, and the lines of the trace."""
    with (tempfile.NamedTemporaryFile(dir="/dev/shm", mode="r", errors="replace") as trace,
          tempfile.TemporaryFile(dir="/dev/shm") as sent, tempfile.TemporaryFile(dir="/dev/shm") as answer):
        sent.write(body)
        sent.seek(0)
        # Files in place of pipes, so that the same system calls come in each run. The leak check of the sanitizers and
        # a tracer exclude each other.
        process = subprocess.run(
            ["strace", "-f", "-qq", "-o", trace.name, "-E", "ASAN_OPTIONS=detect_leaks=0", *options, device.HOST],
            env=environment, stdin=sent, stdout=answer, stderr=subprocess.PIPE, cwd=device.FOLDER,
            timeout=device.TIME_LIMIT, check=False)
        answer.seek(0)
        return host.Outcome(answer.read(), process.stderr, process.returncode), trace.readlines()


def system_calls(environment, body):
    """Name and number, counted by name, of each system call behind those that load the program's libraries."""
    _, lines = traced(environment, body)
    counts = collections.Counter()
    found = []
    is_loaded = False
    for line in lines:
        if match := re.match(r"\d+ +(\w+)\(", line):
            name = match.group(1)
            counts[name] += 1
            # The last that the loader does is to let go of its list of libraries.
            is_loaded = is_loaded or name == "munmap"
            if is_loaded:
                found.append((name, counts[name]))
    return found


class Faults:
    """A call as CGI variables and a body, and what a whole answer to it looks like."""

    # One in so many of the system calls is met.
    step = 1

    def environment(self):
        raise NotImplementedError

    def body(self):
        return b""

    def content(self):
        """Of a file that is the answer; none for JSON alone."""
        return None

    def assert_sane(self, outcome):
        block = BEGINNING.match(outcome.output)
        if block is None or block.group(1) is None:
            # A web server makes an error of its own of it.
            self.assertEqual(block.group(0) if block else b"", outcome.output)
            return
        head, rest = block.group(0), outcome.output[block.end():]
        if b"Content-Disposition:" in head:
            self.assertTrue(self.content().startswith(rest))
            if len(rest) < len(self.content()):
                self.assertIn(b"Content-Length: %d\r\n" % len(self.content()), head, "the client sees what is missing")
        elif b"Status: 4" in head or b"Status: 5" in head:
            self.assertEqual(b"", rest)
        elif rest:
            self.assertIn(json.loads(rest)["success"], (True, False))

    def sweep(self, calls, check):
        """Runs the call once for each of its system calls that `calls` names, and lets it meet there what they say."""
        rows = [row for row in system_calls(self.environment(), self.body()) if row[0] in calls]
        self.assertGreater(len(rows), 20)
        for call, number in rows[::SANITIZED_STEP if host.is_sanitized() else self.step]:
            with self.subTest(call=call, number=number, what=calls[call]):
                outcome, _ = traced(self.environment(), self.body(), "-e", f"trace={call}", "-e",
                                    f"inject={call}:{calls[call]}:when={number}")
                check(outcome)

    def assert_nothing_left(self):
        self.assertEqual([], test_uploads.part_files())

    def clean_up_like_the_next_call(self):
        """What a killed process left, the next upload a minute later takes away."""
        for path in test_uploads.part_files():
            os.utime(path, (0, 0))
        self.assertEqual(0, test_uploads.post("upload", test_uploads.form(("file", "x", b"x"))).code())
        self.assert_nothing_left()

    def assert_serves_on(self):
        self.assertEqual([], device.hosts_running())
        outcome = host.run(self.environment(), self.body())
        self.assertEqual((b"", 0), (outcome.errors, outcome.status))
        self.assert_whole(outcome)

    def assert_whole(self, outcome):
        self.assertIs(True, json.loads(outcome.parts()[1])["success"], outcome.output[:500])

    def test_a_system_call_that_fails_is_answered_and_leaves_nothing(self):
        self.assert_serves_on()
        before = self.state()

        def check(outcome):
            if b"SanitizerTool: CHECK failed" in outcome.errors:
                # The call was one of the sanitizers' runtime, which ends the process then.
                self.clean_up_like_the_next_call()
                return
            self.assertEqual(b"", outcome.errors)
            self.assertIn(outcome.status, (0, 1))
            self.assert_sane(outcome)
            self.assert_nothing_left()
        self.sweep({call: f"error={error}" for call, error in ERRORS.items()}, check)
        self.assertEqual(before, self.state())
        self.assert_serves_on()

    def test_a_process_killed_at_any_system_call_leaves_nothing_for_long(self):
        self.assert_serves_on()
        before = self.state()

        def check(outcome):
            self.assertEqual(-signal.SIGKILL, outcome.status)
            self.assert_sane(outcome)
            self.assertLessEqual(len(test_uploads.part_files()), 2)
            if test_uploads.part_files():
                self.clean_up_like_the_next_call()
        self.sweep(dict.fromkeys(KILLED_AT, "signal=SIGKILL"), check)
        self.assertEqual(before, self.state())
        self.assert_serves_on()

    def state(self):
        """Of the sessions their names: a use of one shows in its file."""
        return {entry[0] if entry[0].startswith(device.SESSIONS) else entry
                for entry in device.watched_files(device.WRITTEN)}


class UploadFaults(Faults, probe.ProbeTestCase):
    def environment(self):
        return {"REQUEST_METHOD": "POST", "QUERY_STRING": test_uploads.query("upload"), "REMOTE_ADDR": "127.0.0.1",
                "CONTENT_TYPE": f"multipart/form-data; boundary={test_uploads.BOUNDARY}",
                "CONTENT_LENGTH": str(len(self.body()))}

    def body(self):
        return test_uploads.form(("note", b"hello"), ("one", "x", b"content"), ("two", "y", b"y" * 300_000))


class DownloadFaults(Faults, probe.ProbeTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        with tempfile.NamedTemporaryFile(dir="/var/tmp", delete=False) as file:
            file.write(cls.content())
        os.chmod(file.name, 0o644)
        cls.path = file.name
        cls.addClassCleanup(os.unlink, file.name)

    @classmethod
    def content(cls):
        return bytes(range(256)) * 1000

    def environment(self):
        return {"REQUEST_METHOD": "GET", "QUERY_STRING": test_downloads.query(path=self.path),
                "REMOTE_ADDR": "127.0.0.1"}

    def assert_whole(self, outcome):
        self.assertTrue(outcome.output.endswith(b"\r\n\r\n" + self.content()))


class SharingFaults(Faults, test_sharing.SharingTestCase):
    step = 3

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        probe.install(cls)

    def setUp(self):
        super().setUp()
        self.link = self.make()

    def environment(self):
        query = {"api": test_sharing.API, "version": 1, "method": "read", "path": test_sharing.PHOTO}
        return {"REQUEST_METHOD": "GET", "QUERY_STRING": urllib.parse.urlencode(query), "REMOTE_ADDR": "127.0.0.1",
                "HTTP_X_SHARING_ID": self.link}

    def state(self):
        links = self.alice.call(test_sharing.OWNER_API, "list").json()["data"]["links"]
        return super().state() | {("link", row["hash"]) for row in links}


class SharingVisitFaults(SharingFaults):
    """A call that writes into the database."""

    def environment(self):
        return {"REQUEST_METHOD": "POST", "QUERY_STRING": "", "REMOTE_ADDR": "127.0.0.1",
                "CONTENT_LENGTH": str(len(self.body()))}

    def body(self):
        return urllib.parse.urlencode({"api": test_sharing.VISIT_API, "version": 1, "method": "open",
                                       "hash": webclient.quoted(self.link)}).encode()

    def state(self):
        """The database grows with the visits."""
        self.assertEqual(0, self.opened(self.link).read().code())
        return {entry[0] for entry in device.watched_files(device.WRITTEN)}


if __name__ == "__main__":
    unittest.main()
