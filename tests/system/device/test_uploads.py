"""Uploads through the web server: what a method finds, what is refused, and that no part file stays in any case."""

import glob
import hashlib
import os
import signal
import socket
import subprocess
import tempfile
import time
import unittest
import urllib.parse

import device
import host
import probe
import webclient
import webserver

PARTS = ("/tmp/zova-upload-*", "/var/tmp/zova-upload-*", "/run/probe-volume/@tmp/zova-upload-*")
BOUNDARY = "probe-boundary"
NOBODY = 65534
MOST_MEMORY_KIB = 16 * 1024
MOST_DIFFERENCE_KIB = 2 * 1024
VOLUMES = "/etc/zova/volumes.json"


def part_files():
    return sorted(path for pattern in PARTS for path in glob.glob(pattern))


def head(name, filename=None):
    lines = f'--{BOUNDARY}\r\nContent-Disposition: form-data; name="{name}"'
    return (lines + (f'; filename="{filename}"' if filename is not None else "") + "\r\n\r\n").encode()


def form(*parts):
    """A body of parts: name and content, or name, file name and content."""
    body = b"".join(head(*part[:-1]) + part[-1] + b"\r\n" for part in parts)
    return body + f"--{BOUNDARY}--\r\n".encode()


def query(method, **more):
    return urllib.parse.urlencode({"api": probe.API, "version": 1, "method": method, **more})


def post(method, body, headers=None, **more):
    return webclient.request("POST", query(method, **more) if method else "", body, {
        "Content-Type": f"multipart/form-data; boundary={BOUNDARY}", **(headers or {})})


def upload_error(response):
    answer = response.json()["error"]
    return (answer["code"], answer["errors"]["upload_err"])


def open_files(process):
    """Paths of what the process holds open; nothing if it is gone."""
    try:
        return [os.readlink(f"/proc/{process}/fd/{number}") for number in os.listdir(f"/proc/{process}/fd")]
    except OSError:
        return []


class BrokenOff:
    """An upload that announces more than it sends, on a connection that stays open."""

    def __init__(self, method, sent, announced=10_000_000):
        url = urllib.parse.urlsplit(device.URL)
        self.socket = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
        self.socket.sendall(
            f"POST {url.path}?{query(method)} HTTP/1.1\r\nHost: {url.netloc}\r\nContent-Length: {announced}\r\n"
            f"Content-Type: multipart/form-data; boundary={BOUNDARY}\r\n\r\n".encode() + sent)

    def answer(self):
        """What comes back, up to its body."""
        data = b""
        while b'"success"' not in data:
            more = self.socket.recv(65536)
            if not more:
                break
            data += more
        return data

    def close(self):
        self.socket.close()


class UploadTestCase(webserver.ServedTestCase):
    # Whether an answer reaches the client that the host program gives while a body is still on its way.
    answers_early = True

    def setUp(self):
        super().setUp()
        self.assertEqual([], part_files())

    def tearDown(self):
        device.wait_for(lambda: not device.hosts_running(), "the end of all host programs")
        self.assertEqual([], part_files())
        super().tearDown()

    def is_heard(self, response):
        """Whether the answer is the host program's, where that gave it without a look at the body."""
        return self.answers_early or response.status != 502

    def set_volumes(self, volumes):
        os.makedirs(os.path.dirname(VOLUMES), mode=0o700, exist_ok=True)
        with open(VOLUMES, "w", encoding="utf-8") as table:
            table.write(f'{{"volumes": {volumes}}}')
        os.chmod(VOLUMES, 0o600)
        self.addCleanup(os.unlink, VOLUMES)


class Stored(UploadTestCase):
    def test_a_method_finds_fields_and_files_that_its_identity_can_read(self):
        told = post("upload", form(("note", b"hello"), ("file", "x.txt", b"content"))).json()["data"]
        self.assertEqual("hello", told["params"]["note"])
        file = told["files"]["file"]
        self.assertEqual(told["params"]["file"], file["path"])
        self.assertEqual((True, NOBODY, 0o100600, "content"), (file["opens"], file["uid"], file["mode"], file["text"]))
        self.assertRegex(file["path"], r"\A/(var/)?tmp/zova-upload-[0-9a-f]{32}\Z")

    def test_the_first_three_fields_can_name_the_call(self):
        answer = post(None, form(("api", probe.API.encode()), ("version", b"1"), ("method", b"upload"),
                                 ("file", "x", b"content"), ("late", b"field")))
        told = answer.json()["data"]
        self.assertEqual("content", told["files"]["file"]["text"])
        self.assertEqual("field", told["params"]["late"])

    def test_the_fourth_field_comes_too_late_to_name_the_call(self):
        self.assertEqual(101, post(None, form(("a", b""), ("b", b""), ("c", b""), ("api", probe.API.encode()),
                                              ("version", b"1"), ("method", b"upload"))).code())

    def test_an_empty_file_is_a_file_and_none_chosen_is_an_empty_field(self):
        told = post("upload", form(("file", "empty", b""), ("none", "", b""))).json()["data"]
        self.assertEqual(0, told["files"]["file"]["size"])
        self.assertEqual("", told["params"]["none"])

    def test_a_thousand_small_files_in_one_form(self):
        parts = [(f"file{number}", f"{number}.txt", str(number).encode()) for number in range(1000)]
        files = post("upload", form(*parts)).json()["data"]["files"]
        self.assertEqual({f"file{number}": str(number) for number in range(1000)},
                         {name: file["text"] for name, file in files.items()})

    def test_of_two_files_under_one_field_the_last_stays(self):
        told = post("upload", form(("file", "a", b"first"), ("file", "b", b"second"))).json()["data"]
        self.assertEqual("second", told["files"]["file"]["text"])

    def test_client_names_of_files_are_in_no_path(self):
        for name in ("../../etc/cron.d/x", "/etc/passwd", "a%22b%0D%0Ac", "\\\"quoted\\\"", "😀.jpg", "a;b", "."):
            told = post("upload", form(("file", name, b"content"))).json()["data"]
            self.assertRegex(told["params"]["file"], r"/zova-upload-[0-9a-f]{32}\Z", name)

    def test_a_field_that_claims_to_be_a_file_is_none(self):
        told = post("upload", form(("file", b"/etc/shadow"))).json()["data"]
        self.assertEqual(("/etc/shadow", {}), (told["params"]["file"], told["files"]))

    def test_the_method_can_keep_a_file_by_moving_it(self):
        with tempfile.TemporaryDirectory(dir="/tmp") as folder:
            os.chown(folder, NOBODY, -1)
            kept = folder + "/kept"
            self.assertTrue(post("upload", form(("keep", kept.encode()), ("file", "x", b"content")))
                            .json()["data"]["moved"])
            with open(kept, encoding="utf-8") as file:
                self.assertEqual("content", file.read())
            self.assertEqual((NOBODY, 0o100600), (os.stat(kept).st_uid, os.stat(kept).st_mode))

    def test_no_file_stays_after_a_lasting_change_of_identity(self):
        told = post("upload_lasting", form(("file", "x", b"content"))).json()["data"]
        self.assertEqual((True, NOBODY), (told["files"]["file"]["opens"], told["files"]["file"]["uid"]))

    def test_no_file_stays_after_a_refusal(self):
        response = post("upload_refused", form(("file", "x", b"content")))
        if self.is_heard(response):
            self.assertEqual(1002, response.code())

    def test_a_slice_is_the_whole_body(self):
        answer = webclient.request("POST", query("upload"), b"\x00raw\r\n--bytes", {
            "X-Type-Name": "SliceUpload", "Content-Type": "application/octet-stream"})
        self.assertEqual("\x00raw\r\n--bytes", answer.json()["data"]["files"]["file"]["text"])

    def test_a_data_volume_comes_first_and_its_folder_becomes_sticky(self):
        os.makedirs("/run/probe-volume")
        self.addCleanup(subprocess.run, ["rm", "-r", "/run/probe-volume"], check=True)
        self.set_volumes('["/nowhere", "/run/probe-volume"]')
        file = post("upload", form(("file", "x", b"content"))).json()["data"]["files"]["file"]
        self.assertTrue(file["path"].startswith("/run/probe-volume/@tmp/zova-upload-"))
        self.assertEqual("content", file["text"])
        self.assertEqual(0o41777, os.stat("/run/probe-volume/@tmp").st_mode)


class Large(UploadTestCase):
    large = 300 << 20

    def memory_of(self, method, size):
        """The largest memory of a host that took a file of that size, in KiB."""
        with tempfile.NamedTemporaryFile(dir="/var/tmp") as file:
            file.truncate(size)
            answer = subprocess.run(
                ["curl", "--silent", "--show-error", "--form", f"file=@{file.name}", f"{device.URL}?{query(method)}"],
                capture_output=True, timeout=600, check=True)
        told = webclient.Response(200, [], answer.stdout).json()["data"]
        stored = told["files"]["file"] if method == "upload" else told["steps"][0]["file"]
        self.assertEqual(size, stored["size"])
        return told["memory"]

    def test_a_large_file_needs_no_more_memory_than_a_small_one(self):
        for method in ("upload", "upload_deferred"):
            with self.subTest(method):
                small = self.memory_of(method, 1 << 20)
                large = self.memory_of(method, self.large)
                self.assertLess(large, small + MOST_DIFFERENCE_KIB)
                # The sanitizers keep memory of their own.
                if not host.is_sanitized():
                    self.assertLess(large, MOST_MEMORY_KIB)


    def test_a_large_file_arrives_with_its_digest(self):
        with tempfile.TemporaryDirectory(dir="/tmp") as folder, tempfile.NamedTemporaryFile(dir="/var/tmp") as file:
            os.chown(folder, NOBODY, -1)
            file.truncate(self.large)
            # Something to find on both sides of each border.
            for place in range(0, self.large, (1 << 20) + 1):
                file.seek(place)
                file.write(b"\r\n--" + BOUNDARY[:-1].encode() + os.urandom(64))
            file.flush()
            subprocess.run(
                ["curl", "--silent", "--show-error", "--fail", "--form", f"keep={folder}/kept", "--form",
                 f"file=@{file.name}", "-o", "/dev/null", f"{device.URL}?{query('upload')}"], timeout=600, check=True)
            digests = []
            for path in (file.name, f"{folder}/kept"):
                with open(path, "rb") as content:
                    digests.append(hashlib.file_digest(content, "sha256").digest())
            self.assertEqual(*digests)


class Refused(UploadTestCase):
    def test_bad_bodies(self):
        good = form(("file", "x", b"content"))
        rows = {
            "no last delimiter": (good[:-20], -3),
            "line ends": (good.replace(b"\r\n", b"\n"), -1),
            "another boundary": (good.replace(BOUNDARY.encode(), b"other"), -3),
            "too many fields": (form(*[("n", b"v")] * 100000), -5),
            "too many files": (form(*[("n", "f", b"v")] * 1001), -5),
            "long headers": (f"--{BOUNDARY}\r\nX: ".encode() + b"x" * 1048576, -5),
            "a good file before a bad part": (good[:-20] + b"\r\n--" + BOUNDARY.encode() + b"\r\nbad\r\n\r\n", -1),
        }
        for name, (body, status) in rows.items():
            with self.subTest(name):
                begun = time.monotonic()
                response = post("upload", body)
                if self.answers_early or len(body) < 300_000:
                    self.assertEqual((108, status), upload_error(response))
                else:
                    self.assertEqual(502, response.status)
                self.assertLess(time.monotonic() - begun, 30)
                self.assertEqual([], part_files())

    def test_an_empty_body(self):
        self.assertEqual((108, -6), upload_error(post("upload", b"")))

    def test_a_type_without_a_boundary(self):
        response = post("upload", b"x", {"Content-Type": "multipart/form-data"})
        if self.is_heard(response):
            self.assertEqual((108, -7), upload_error(response))

    def test_a_method_without_uploads(self):
        response = post("granted", form(("file", "x", b"content")))
        if self.is_heard(response):
            self.assertEqual(115, response.code())

    def test_a_plain_body_has_its_limit_still(self):
        answer = webclient.request("POST", query("upload"), b"", {
            "Content-Type": "text/plain", "Content-Length": str(65 * 1024 * 1024)})
        self.assertEqual(413, answer.status)


class Deferred(UploadTestCase):
    def test_a_method_takes_the_body_step_by_step(self):
        body = form(("a", b"1"), ("file", "x.txt", b"first"), ("b", b"2"), ("file", "y.txt", b"second"), ("c", b"3"))
        told = post("upload_deferred", body).json()["data"]
        self.assertEqual(-8, told["too_early"])
        steps = told["steps"]
        self.assertEqual([{"a": "1", "file": "x.txt"}, {"b": "2", "file": "y.txt"}, {"c": "3"}],
                         [step["fields"] for step in steps])
        self.assertEqual([0, 0, 1], [step["status"] for step in steps])
        self.assertEqual([("first", NOBODY), ("second", NOBODY)],
                         [(step["file"]["text"], step["file"]["uid"]) for step in steps[:2]])
        self.assertEqual((len(body), len(body)), (told["read"], told["total"]))

    def test_a_file_that_is_not_wanted_is_passed_over(self):
        told = post("upload_deferred", form(("skip", b"yes"), ("file", "x", b"first"), ("file", "y", b"second")))
        steps = told.json()["data"]["steps"]
        self.assertNotIn("file", steps[0])
        self.assertEqual("second", steps[1]["file"]["text"])

    def test_the_call_may_be_named_by_the_first_fields(self):
        told = post(None, form(("api", probe.API.encode()), ("version", b"1"), ("method", b"upload_deferred"),
                               ("file", "x", b"content"))).json()["data"]
        self.assertEqual("content", told["steps"][0]["file"]["text"])


class EarlyAnswers(UploadTestCase):
    def test_a_file_that_fits_nowhere_is_refused_before_it_is_sent(self):
        upload = BrokenOff("upload", head("file", "x"), announced=1 << 50)
        self.assertIn(b'"upload_err":-2', upload.answer())
        upload.close()

    def test_a_rest_that_is_not_read_is_no_fault(self):
        body = form(("file", "x", b"first"), ("file", "y", b"s" * 10_000_000))
        self.assertEqual(0, post("upload_deferred", body, stops="true").code())


class BrokenOffUploads(UploadTestCase):
    def test_a_client_that_breaks_off_leaves_nothing(self):
        for method in ("upload", "upload_deferred"):
            upload = BrokenOff(method, form(("one", "a", b"complete"))[:-20] + head("two", "b") + b"x" * 3_000_000)
            device.wait_for(device.hosts_running, "the host program")
            upload.close()
            device.wait_for(lambda: not device.hosts_running(), "the end of the host program")
            self.assertEqual([], part_files())

    def test_a_host_killed_while_it_reads_leaves_nothing(self):
        upload = BrokenOff("upload", head("file", "x") + b"x" * 3_000_000)
        host, = device.wait_for(device.hosts_running, "the host program")
        device.wait_for(lambda: any("(deleted)" in path for path in open_files(host)), "its file")
        os.kill(host, signal.SIGKILL)
        device.wait_for(lambda: not device.hosts_running(), "the end of the host program")
        self.assertEqual([], part_files())
        upload.close()

    def test_a_host_told_to_end_while_its_method_runs_takes_its_file_along(self):
        with tempfile.TemporaryDirectory(dir="/run") as folder:
            held = query("upload_held", begun=f"{folder}/begun", go=f"{folder}/go")
            with subprocess.Popen(["curl", "--silent", "--form", "file=content;filename=x", f"{device.URL}?{held}"],
                                  stdout=subprocess.DEVNULL):
                device.wait_for(lambda: os.path.exists(f"{folder}/begun"), "the method")
                host, = device.hosts_running()
                self.assertEqual(1, len(part_files()))
                os.kill(host, signal.SIGTERM)
                device.wait_for(lambda: not device.hosts_running(), "the end of the host program")
        self.assertEqual([], part_files())

    def test_what_a_killed_host_left_goes_with_the_next_upload_and_what_a_live_one_holds_stays(self):
        with tempfile.TemporaryDirectory(dir="/run") as folder:
            calls = []
            for number in range(2):
                calls.append(subprocess.Popen(
                    ["curl", "--silent", "--form", "file=content;filename=x",
                     f"{device.URL}?{query('upload_held', begun=f'{folder}/begun{number}', go=f'{folder}/go{number}')}"],
                    stdout=subprocess.DEVNULL))
                device.wait_for(lambda number=number: os.path.exists(f"{folder}/begun{number}"), "the method")
                if number == 0:
                    killed, = device.hosts_running()
                    left, = part_files()
            os.kill(killed, signal.SIGKILL)
            calls[0].wait(device.TIME_LIMIT)
            device.wait_for(lambda: killed not in device.hosts_running(), "the end of the host program")
            held, = set(part_files()) - {left}
            for path in (left, held):
                os.utime(path, (0, 0))
            self.assertEqual(0, post("upload", form(("file", "x", b"content"))).code())
            self.assertEqual([held], part_files())
            with open(f"{folder}/go1", "w", encoding="utf-8"):
                pass
            calls[1].wait(device.TIME_LIMIT)

    def test_a_full_disk_is_refused_and_leaves_nothing(self):
        os.makedirs("/run/probe-volume")
        subprocess.run(["mount", "-t", "tmpfs", "-o", "size=16m", "tmpfs", "/run/probe-volume"], check=True)
        self.addCleanup(os.rmdir, "/run/probe-volume")
        self.addCleanup(subprocess.run, ["umount", "/run/probe-volume"], check=True)
        self.set_volumes('["/run/probe-volume"]')
        body = form(("one", "x", b"content"), ("two", "y", b"y" * 8_000_000))
        # The room is taken after the host has looked for it.
        # More than the host takes at once, so that it has begun the file.
        upload = BrokenOff("upload", body[:1_000_000], announced=len(body))
        device.wait_for(lambda: any("/run/probe-volume/@tmp/" in path for host in device.hosts_running()
                                    for path in open_files(host)), "the file")
        with open("/run/probe-volume/other", "wb") as other:
            other.write(b"o" * 14_000_000)
        upload.socket.sendall(body[1_000_000:])
        self.assertIn(b'"upload_err":-2' if self.answers_early else b"502", upload.answer())
        upload.close()
        self.assertEqual(["@tmp", "other"], sorted(os.listdir("/run/probe-volume")))


if __name__ == "__main__":
    unittest.main()
