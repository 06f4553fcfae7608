"""Each system call of a call fails once, or is the last one of its process. The client gets a clear answer or, from a
killed process, a beginning of one; nothing is left behind, and the device serves on."""

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

# The system calls that a method's answer may depend on, each with the error that is worst for it.
ERRORS = {"openat": "EMFILE", "read": "EIO", "write": "EIO", "mmap": "ENOMEM", "newfstatat": "EIO", "flock": "EWOULDBLOCK",
          "fchmod": "EPERM", "linkat": "EIO", "getrandom": "ENOSYS", "setresuid": "EPERM", "setresgid": "EPERM",
          "setgroups": "EPERM", "fchown": "EPERM", "sendfile": "EIO", "chdir": "EACCES", "prlimit64": "EPERM",
          "fcntl": "EINVAL", "pread64": "EIO", "pwrite64": "ENOSPC", "fdatasync": "EIO", "rt_sigaction": "EINVAL"}
KILLED_AT = ("openat", "write", "fchmod", "flock", "linkat", "unlink", "newfstatat", "setresuid", "sendfile", "pwrite64",
             "fdatasync", "fcntl", "close")
# Every so many-th of the system calls of one kind under the sanitizers, which take their time.
STEP = 9 if host.is_sanitized() else 1
MOST_OF_A_KIND = 400
BEGINNING = re.compile(rb"(?:[^\r\n\0]+: [^\r\n\0]*\r\n)+\r\n", re.DOTALL)


def traced(environment, body, call, what, number):
    """One host program whose `number`-th system call of that kind is met by `what`. Its outcome, and whether there was
    such a call."""
    with tempfile.TemporaryDirectory(dir="/run") as folder:
        # The leak check of the sanitizers and a tracer exclude each other.
        process = subprocess.run(
            ["strace", "-f", "--seccomp-bpf", "-qq", "-o", f"{folder}/trace", "-E", "ASAN_OPTIONS=detect_leaks=0", "-e",
             f"trace={call}", "-e", f"inject={call}:{what}:when={number}", device.HOST], env=environment, input=body,
            capture_output=True, cwd=device.FOLDER, timeout=device.TIME_LIMIT, check=False)
        with open(f"{folder}/trace", encoding="utf-8", errors="replace") as trace:
            text = trace.read()
    met = "(INJECTED)" in text if what.startswith("error") else "killed by SIGKILL" in text
    return host.Outcome(process.stdout, process.stderr, process.returncode), met


class Faults:
    """A call as CGI variables and a body, and what a whole answer to it looks like."""

    def environment(self):
        raise NotImplementedError

    def body(self):
        return b""

    def content(self):
        """Of a file that is the answer; none for JSON alone."""
        return None

    def assert_sane(self, outcome):
        if outcome.status == 127 and not outcome.output:
            return  # a library could not be loaded: it never began
        block = BEGINNING.match(outcome.output)
        if block is None:
            # Nothing at all where nothing could be written.
            self.assertEqual(b"", outcome.output)
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
        met = 0
        for call, what in calls:
            for number in range(1, MOST_OF_A_KIND, STEP):
                outcome, isMet = traced(self.environment(), self.body(), call, what, number)
                if not isMet:
                    break
                met += 1
                with self.subTest(call=call, what=what, number=number):
                    check(outcome, call)
            else:
                self.fail(f"more than {MOST_OF_A_KIND} times {call}")
        return met

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

        def check(outcome, call):
            self.assertIn(outcome.status, (0, 1, 127), outcome.errors[:500])
            self.assert_sane(outcome)
            self.assert_nothing_left()
        met = self.sweep([(call, f"error={error}") for call, error in ERRORS.items()], check)
        self.assertGreater(met, 20)
        self.assertEqual(before, self.state())
        self.assert_serves_on()

    def test_a_process_killed_at_any_system_call_leaves_nothing_for_long(self):
        before = self.state()

        def check(outcome, call):
            self.assertEqual(-signal.SIGKILL, outcome.status)
            self.assertLessEqual(len(test_uploads.part_files()), 1)
            if test_uploads.part_files():
                self.clean_up_like_the_next_call()
        met = self.sweep([(call, "signal=SIGKILL") for call in KILLED_AT], check)
        self.assertGreater(met, 20)
        self.assertEqual(before, self.state())
        self.assert_serves_on()

    def state(self):
        return device.watched_files()


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
        return device.watched_files() | {("links", *(row["hash"] for row in self.alice.call(
            test_sharing.OWNER_API, "list").json()["data"]["links"]))}


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
        return {entry[0] for entry in device.watched_files()}


if __name__ == "__main__":
    unittest.main()
