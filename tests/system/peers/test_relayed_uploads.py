"""Uploads that go on to another device: they arrive as they are, and neither device holds them in memory."""

import hashlib
import os
import subprocess
import tempfile
import threading
import time
import unittest

import peers
from peers import SECOND, device, query, webclient

import host  # noqa: E402

BOUNDARY = "edge-of-a-part"
NOBODY = 65534
MOST_DIFFERENCE_KIB = 4 * 1024
SANITIZER_KIB = 320 * 1024


def head(name, filename=None):
    lines = f'--{BOUNDARY}\r\nContent-Disposition: form-data; name="{name}"'
    return (lines + (f'; filename="{filename}"' if filename is not None else "") + "\r\n\r\n").encode()


def form(*parts):
    """A body of parts: name and content, or name, file name and content."""
    return b"".join(head(*part[:-1]) + part[-1] + b"\r\n" for part in parts) + f"--{BOUNDARY}--\r\n".encode()


class GreatestMemory:
    """The greatest memory that a host program of this device came to meanwhile, in KiB."""

    def __enter__(self):
        self.kibibytes = 0
        self.ended = threading.Event()
        self.thread = threading.Thread(target=self.watch)
        self.thread.start()
        return self

    def __exit__(self, *_):
        self.ended.set()
        self.thread.join()

    def watch(self):
        while not self.ended.is_set():
            for process in device.hosts_running():
                try:
                    with open(f"/proc/{process}/status", encoding="ascii", errors="replace") as file:
                        lines = [line for line in file if line.startswith("VmHWM:")]
                except OSError:
                    continue
                if lines:
                    self.kibibytes = max(self.kibibytes, int(lines[0].split()[1]))
            time.sleep(0.02)


class UploadsTestCase(peers.PeersTestCase):
    def setUp(self):
        super().setUp()
        self.client = webclient.logged_in("alice")

    def post(self, request, body, **headers):
        return webclient.request("POST", request, body, {
            **self.client.headers(), "Content-Type": f"multipart/form-data; boundary={BOUNDARY}", **headers})


class Whole(UploadsTestCase):
    CONTENT = "line\r\n--edge-of-a-par\r\n--" + "x" * 70 + "\r\n\ttext with é and 😀\n"

    def test_a_method_of_the_peer_finds_fields_and_file(self):
        answer = self.post(query("upload", local="parameter"),
                           form(("note", b"hello"), ("file", "x.txt", self.CONTENT.encode())))
        told = answer.json()["data"]
        self.assertEqual("hello", told["params"]["note"])
        self.assertNotIn("local", told["params"])
        file = told["files"]["file"]
        self.assertEqual((self.CONTENT, NOBODY), (file["text"], file["uid"]))
        self.assertFalse(os.path.exists(file["path"]), "it is at the other device")
        self.assertEqual(['text/plain; charset="UTF-8"'], answer.values("Content-type"))

    def test_an_upload_to_a_method_that_takes_the_body_itself(self):
        body = form(("a", b"1"), ("file", "x", b"first"), ("b", b"2"), ("file", "y", b"second"))
        told = self.post(query("upload_deferred"), body).json()["data"]
        self.assertEqual(["first", "second"], [step["file"]["text"] for step in told["steps"] if "file" in step])
        self.assertEqual(len(body), told["total"])

    def test_the_first_three_fields_may_name_the_call(self):
        naming = (("api", b"ZOVA.Test.Probe"), ("version", b"1"), ("method", b"upload"))
        relay = f"relay_zn={SECOND}"
        told = self.post(relay, form(*naming, ("file", "x", b"content"), ("late", b"field"))).json()["data"]
        self.assertEqual(("content", "field"), (told["files"]["file"]["text"], told["params"]["late"]))
        told = self.post(relay, form(*naming, ("only", b"field"))).json()["data"]
        self.assertEqual(("field", {}), (told["params"]["only"], told["files"]))
        self.assertEqual({}, self.post(relay, form(*naming)).json()["data"]["files"], "nothing else came")

    def test_a_file_that_was_begun_here_is_not_relayed_in_half(self):
        request = f"relay_zn={SECOND}&api=ZOVA.Test.Probe&version=1"
        answer = self.post(request, form(("method", b"upload"), ("file", "x", b"content")))
        self.assert_relay_failed(answer, 5)

    def test_a_slice_is_not_relayed(self):
        answer = self.post(query("upload"), b"bytes", **{"X-Type-Name": "SliceUpload",
                                                         "Content-Type": "application/octet-stream"})
        self.assert_relay_failed(answer, 5)

    def test_a_method_that_takes_no_upload_is_refused_here(self):
        self.assertEqual(115, self.post(query("params"), form(("file", "x", b"content"))).code())

    def test_without_a_login_no_byte_goes_on(self):
        self.client = webclient.Client()
        self.assertEqual(119, self.post(query("upload"), form(("file", "x", b"content"))).code())


class ThroughAStandIn(UploadsTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.stand_in = peers.StandIn()
        cls.addClassCleanup(cls.stand_in.close)

    def test_every_byte_arrives_as_it_was_sent(self):
        self.enter(self.stand_in.record("/count"))
        body = form(("file", "x", bytes(range(256)) * 8192 + os.urandom(3_000_001)))
        told = self.post(query("upload", peer=peers.STAND_IN), body).json()
        self.assertEqual({"length": len(body), "sha256": hashlib.sha256(body).hexdigest()}, told)

    def test_a_peer_that_answers_at_once_is_heard(self):
        self.enter(self.stand_in.record("/early"))
        answer = self.post(query("upload", peer=peers.STAND_IN), form(("file", "x", b"x" * 20_000_000)))
        self.assertEqual(b'{"early":true}', answer.body)

    def test_a_peer_that_ends_the_connection(self):
        self.enter(self.stand_in.record("/gone"))
        answer = self.post(query("upload", peer=peers.STAND_IN), form(("file", "x", b"x" * 20_000_000)))
        self.assert_relay_failed(answer, 10)


class Large(UploadsTestCase):
    def relay(self, size):
        """What the peer tells of a file of that size, and the greatest memory of the hosts here, in KiB."""
        with tempfile.NamedTemporaryFile(dir="/var/tmp") as file, GreatestMemory() as memory:
            file.truncate(size)
            answer = subprocess.run(
                ["curl", "--silent", "--show-error", "--cookie", f"id={self.client.cookies['id']}",
                 "--form", f"file=@{file.name}", f"{device.URL}?{query('upload')}"],
                capture_output=True, timeout=600, check=True)
        told = webclient.Response(200, [], answer.stdout).json()["data"]
        self.assertEqual(size, told["files"]["file"]["size"])
        return told["memory"], memory.kibibytes

    def test_a_large_file_needs_no_more_memory_than_a_small_one_on_either_device(self):
        # Long enough for the small one to be seen.
        small_there, small_here = self.relay(64 << 20)
        large_there, large_here = self.relay(500 << 20)
        self.assertGreater(small_here, 0)
        self.assertLess(large_there, small_there + MOST_DIFFERENCE_KIB)
        if host.is_sanitized():
            # The sanitizer holds back what was freed, up to 256 MiB.
            self.assertLess(large_here, small_here + SANITIZER_KIB)
        else:
            self.assertLess(large_here, small_here + MOST_DIFFERENCE_KIB)
            self.assertLess(large_here, 24 * 1024)

    def test_an_upload_that_the_peer_refuses_is_its_answer(self):
        def change(table):
            table[str(SECOND)]["users"]["alice"]["token"] = "0" * 64
        self.change_table(change)
        answer = self.post(query("upload"), form(("file", "x", b"x" * 50_000_000)))
        self.assertEqual(119, answer.code())


if __name__ == "__main__":
    unittest.main()
