"""Files as answers, through the web server to real clients."""

import email.message
import hashlib
import os
import shutil
import socket
import subprocess
import unittest
import urllib.parse

import device
import webclient
import webserver

API = "ZOVA.Test.Probe.Download"
FOLDER = "/var/lib/zova-test-downloads"
PARTS = "/var/tmp"


def query(method="path", **parameters):
    return urllib.parse.urlencode({"api": API, "version": 1, "method": method,
                                   **{name: webclient.quoted(value) if isinstance(value, str) else value
                                      for name, value in parameters.items()}})


def get(method="path", headers=None, verb="GET", **parameters):
    return webclient.request(verb, query(method, **parameters), headers=headers)


def peak_memory(process):
    """Most bytes that the process ever had in memory at once."""
    with open(f"/proc/{process}/status", encoding="utf-8") as status:
        for line in status:
            if line.startswith("VmHWM:"):
                return int(line.split()[1]) * 1024
    raise AssertionError("no figure")


class Reader:
    """A client that reads as much as it is told to."""

    def __init__(self, target, **headers):
        url = urllib.parse.urlsplit(device.URL)
        self.connection = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
        lines = "".join(f"{name}: {value}\r\n" for name, value in headers.items())
        self.connection.sendall(f"GET {url.path}?{target} HTTP/1.1\r\nHost: device\r\nConnection: close\r\n{lines}\r\n"
                                .encode())
        self.head = b""
        while b"\r\n\r\n" not in self.head:
            self.head += self.connection.recv(1)

    def read(self, length):
        data = bytearray()
        while len(data) < length and (part := self.connection.recv(min(65536, length - len(data)))):
            data += part
        return bytes(data)

    def close(self):
        self.connection.close()


def room_of_web_server():
    """Bytes on the disk in the files that lighttpd holds."""
    room = 0
    for name in os.listdir(PARTS):
        if name.startswith("lighttpd-upload"):
            try:
                room += os.stat(os.path.join(PARTS, name)).st_blocks * 512
            except FileNotFoundError:
                pass  # gone meanwhile
    return room


class Downloads(webserver.ServedTestCase):
    large = 300 << 20
    # The line of the response, which a method replaces if it wants another, comes first; the last one counts.
    types = ['application/json; charset="UTF-8"', "video/mp4"]
    # The date does not count beside the tag.
    tag_beside_date = 200
    # What the web server adds to a type that the method does not set itself.
    charset = ""
    # What the method sets beside the file's lines.
    own_header = ["header"]

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        # A run that was killed leaves it in the device's layer.
        shutil.rmtree(FOLDER, ignore_errors=True)
        os.makedirs(FOLDER, 0o755)
        cls.addClassCleanup(shutil.rmtree, FOLDER)
        cls.content = os.urandom(3_000_017)
        cls.path = cls.make("movie.mp4", cls.content)

    @classmethod
    def make(cls, name, content):
        path = os.path.join(FOLDER.encode(), os.fsencode(name))
        with open(path, "wb") as file:
            file.write(content)
        os.chmod(path, 0o644)
        os.utime(path, (1_600_000_000, 1_600_000_000))
        return os.fsdecode(path)

    def tearDown(self):
        device.wait_for(lambda: not device.hosts_running(), "all host programs end")
        super().tearDown()

    # ---- whole files ----

    def test_a_file_arrives_whole_with_its_headers(self):
        response = get(path=self.path)
        self.assertEqual(200, response.status)
        self.assertEqual(hashlib.sha256(self.content).digest(), hashlib.sha256(response.body).digest())
        self.assertEqual(self.own_header, response.values("X-Probe"))
        for name, value in (("Content-Length", "3000017"), ("Accept-Ranges", "bytes"),
                            ("Last-Modified", "Sun, 13 Sep 2020 12:26:40 GMT"), ("X-Content-Type-Options", "nosniff"),
                            ("Content-Disposition", 'attachment; filename="movie.mp4"')):
            self.assertEqual([value], response.values(name), name)
        self.assertEqual([], response.values("Set-Cookie"), "cookies do not go out with a download")
        self.assertEqual([], response.values("Pragma"), "the fixed lines of a JSON answer")
        self.assertEqual(self.types, response.values("Content-Type"))

    def test_a_type_that_was_set_is_sent(self):
        self.assertEqual({"text/x-probe"}, set(get(path=self.path, type="text/x-probe").values("Content-Type")))

    def test_a_stream_arrives_whole_as_octet_stream(self):
        response = get("stream", path=self.path)
        self.assertEqual(self.content, response.body)
        self.assertEqual("application/octet-stream" + self.charset, response.values("Content-Type")[-1])
        self.assertEqual([], response.values("Content-Disposition"))

    def test_what_a_program_writes_arrives_whole_although_its_length_is_not_known(self):
        response = get("pipe", headers={"Range": "bytes=0-1"}, last=200_000)
        self.assertEqual(200, response.status)
        self.assertEqual("".join(f"{number}\n" for number in range(1, 200_001)).encode(), response.body)

    def test_a_head_has_the_lines_of_a_get_and_no_content(self):
        other = ("Date",) if self.own_header else ("Date", "X-Probe")
        lines = [sorted((name, value) for name, value in get(verb=verb, path=self.path).headers if name not in other)
                 for verb in ("GET", "HEAD")]
        self.assertEqual(*lines)
        self.assertEqual(b"", get(verb="HEAD", path=self.path).body)

    def test_a_post_gets_the_file_too(self):
        body = query(path=self.path).encode()
        response = webclient.request("POST", body=body, headers={"Content-Type": "application/x-www-form-urlencoded",
                                                                 "Range": "bytes=0-1"})
        self.assertEqual((200, self.content), (response.status, response.body))

    # ---- ranges ----

    def test_one_range_is_that_part(self):
        for value, part in (("bytes=0-0", (0, 1)), ("bytes=1000-1999", (1000, 2000)), ("bytes=3000000-", (3000000, None)),
                            ("bytes=-5", (3000012, None)), ("bytes=2999999-9999999", (2999999, None)),
                            ("bytes=0-9,5-99,100-199", (0, 200))):
            with self.subTest(value):
                response = get(path=self.path, headers={"Range": value})
                expected = self.content[part[0]:part[1]]
                self.assertEqual((206, expected), (response.status, response.body))
                self.assertEqual([f"bytes {part[0]}-{part[0] + len(expected) - 1}/3000017"],
                                 response.values("Content-Range"))
                self.assertEqual([str(len(expected))], response.values("Content-Length"))

    def test_several_ranges_are_parts_of_one_answer(self):
        response = get(path=self.path, type="a/b", headers={"Range": "bytes=2000000-2000009,0-4,-3"})
        self.assertEqual(206, response.status)
        whole = b"Content-Type: " + response.values("Content-Type")[-1].encode() + b"\r\n\r\n" + response.body
        parts = email.message_from_bytes(whole).get_payload()
        self.assertEqual(["bytes 2000000-2000009/3000017", "bytes 0-4/3000017", "bytes 3000014-3000016/3000017"],
                         [part["Content-Range"] for part in parts])
        # Not by the parser, which takes the bytes for text.
        for begin, end in ((2000000, 2000010), (0, 5), (3000014, 3000017)):
            self.assertIn(b"\r\n\r\n" + self.content[begin:end] + b"\r\n--", response.body)

    def test_ranges_outside_give_416_and_bad_ones_the_whole_file(self):
        response = get(path=self.path, headers={"Range": "bytes=3000017-"})
        self.assertEqual((416, ["bytes */3000017"], b""),
                         (response.status, response.values("Content-Range"), response.body))
        many = ",".join(f"{number * 3}-{number * 3}" for number in range(5000))
        for value in ("bytes=5-4", "lines=0-1", "bytes=a-b", "bytes=", "bytes=" + many,
                      "bytes=" + ",".join(["0-9"] * 10000), "bytes=" + ",".join(["9-0"] * 10000)):
            with self.subTest(value[:20]):
                response = get(path=self.path, headers={"Range": value})
                self.assertEqual((200, len(self.content)), (response.status, len(response.body)))

    def test_curl_resumes_after_a_broken_connection_and_has_the_same_digest(self):
        target = f"{FOLDER}/resumed"
        self.addCleanup(os.unlink, target)
        reader = Reader(query(path=self.path))
        with open(target, "wb") as file:
            file.write(reader.read(1_234_567))
        reader.close()
        run = subprocess.run(["curl", "--silent", "--show-error", "--fail", "-C", "-", "-o", target, "-w",
                              "%{http_code} %{size_download}", f"{device.URL}?{query(path=self.path)}"],
                             capture_output=True, check=True, timeout=device.TIME_LIMIT)
        self.assertEqual(f"206 {3_000_017 - 1_234_567}", run.stdout.decode())
        with open(target, "rb") as file:
            self.assertEqual(hashlib.sha256(self.content).digest(), hashlib.sha256(file.read()).digest())

    def test_a_resume_after_a_change_starts_anew(self):
        path = self.make("changing", b"old content")
        tag = get(path=path).values("ETag")[0]
        response = get(path=path, headers={"Range": "bytes=4-", "If-Range": tag})
        self.assertEqual((206, b"content"), (response.status, response.body))
        self.make("changing", b"new content")
        os.utime(path, (1_600_000_001, 1_600_000_001))
        response = get(path=path, headers={"Range": "bytes=4-", "If-Range": tag})
        self.assertEqual((200, b"new content"), (response.status, response.body))

    # ---- conditions ----

    def test_conditions_are_answered_by_their_status(self):
        tag = get(path=self.path).values("ETag")[0]
        date = "Sun, 13 Sep 2020 12:26:40 GMT"
        before = "Sun, 13 Sep 2020 12:26:39 GMT"
        for headers, status in (({"If-None-Match": tag}, 304), ({"If-None-Match": '"x", W/' + tag}, 304),
                                ({"If-None-Match": '"x"'}, 200), ({"If-Modified-Since": date}, 304),
                                ({"If-Modified-Since": before}, 200), ({"If-Match": tag}, 200),
                                ({"If-Match": '"x"'}, 412), ({"If-Unmodified-Since": date}, 200),
                                ({"If-Unmodified-Since": before}, 412),
                                ({"If-None-Match": '"x"', "If-Modified-Since": date}, 200),
                                ({"If-Match": tag, "If-Unmodified-Since": before}, self.tag_beside_date),
                                ({"If-Match": '"x"', "If-None-Match": tag}, 412)):
            with self.subTest(headers):
                response = get(path=self.path, headers=headers)
                self.assertEqual(status, response.status)
                self.assertEqual(len(self.content) if status == 200 else 0, len(response.body))
                if status != 412:
                    self.assertEqual([tag], response.values("ETag"))

    # ---- names ----

    def test_names_reach_the_client_and_break_out_of_nothing(self):
        for name, expected in ((("\u20ac \u65e5\u672c.txt"),
                                "attachment; filename=\"_ __.txt\"; filename*=UTF-8''%E2%82%AC%20%E6%97%A5%E6%9C%AC.txt"),
                               ('a"; filename="b.exe',
                                "attachment; filename=\"a_; filename=_b.exe\"; "
                                "filename*=UTF-8''a%22%3B%20filename%3D%22b.exe"),
                               ("a\r\nSet-Cookie: x=1\r\n\r\n<b>", 'attachment; filename="a__Set-Cookie: x=1____<b>"'),
                               ("back\\slash", 'attachment; filename="back_slash"'),
                               ("100%41.txt",
                                "attachment; filename=\"100%41.txt\"; filename*=UTF-8''100%2541.txt"),
                               ("-rf", 'attachment; filename="-rf"')):
            with self.subTest(name):
                response = get(path=self.make(name, b"content"))
                self.assertEqual((200, b"content"), (response.status, response.body))
                self.assertEqual([expected], response.values("Content-Disposition"))
                self.assertEqual([], response.values("Set-Cookie"))

    # ---- errors ----

    def test_an_error_before_the_output_is_json(self):
        response = get("stream", path=FOLDER + "/missing")
        self.assertEqual((200, {"error": {"code": 1005}, "success": False}), (response.status, response.json()))
        self.assertEqual(['application/json; charset="UTF-8"'], response.values("Content-Type"))

    def test_what_is_no_file_to_send_is_a_status_without_content(self):
        secret = self.make("secret", b"secret")
        os.chmod(secret, 0o600)
        link = FOLDER + "/link"
        os.symlink("movie.mp4", link)
        os.mkfifo(FOLDER + "/fifo")
        for path, status in ((FOLDER + "/missing", 404), ("", 404), (secret, 403), (link, 403), (FOLDER + "/fifo", 403),
                             (FOLDER, 403), ("/dev/zero", 403), ("/etc/shadow", 403), (self.path + "\0.txt", 404)):
            with self.subTest(path):
                response = get(path=path)
                self.assertEqual((status, b""), (response.status, response.body))

    # ---- large files, clients that go ----

    def test_a_large_file_needs_little_memory_and_no_room_on_the_disk(self):
        path = self.make("large", b"")
        size = self.large
        os.truncate(path, size)
        reader = Reader(query(path=path))
        reader.read(1_000_000)
        host = device.wait_for(device.hosts_running, "the host program sends")[0]
        # It waits for the client, whatever the length of the file: lighttpd may put a piece aside, not the whole.
        self.assertLess(room_of_web_server(), 8 << 20)
        digest = hashlib.sha256(bytes(1_000_000))
        left = size - 1_000_000
        peak = 0
        while part := reader.connection.recv(1 << 20):
            digest.update(part)
            left -= len(part)
            if left > 1 << 24:
                peak = peak_memory(host)
        reader.close()
        expected = hashlib.sha256()
        for _ in range(size >> 20):
            expected.update(bytes(1 << 20))
        self.assertEqual((0, expected.digest()), (left, digest.digest()))
        self.assertGreater(peak, 0)
        self.assertLess(peak, 100 * 1024 * 1024)

    def test_a_client_that_breaks_off_leaves_no_process(self):
        path = self.make("endless", b"")
        os.truncate(path, 1 << 40)
        for method in ("path", "stream"):
            with self.subTest(method):
                reader = Reader(query(method, path=path))
                reader.read(100_000)
                device.wait_for(device.hosts_running, "the host program sends")
                reader.close()
                device.wait_for(lambda: not device.hosts_running(), "the host program ends")
        reader = Reader(query("pipe", last=2_000_000_000))
        reader.read(100_000)
        reader.close()
        device.wait_for(lambda: not device.hosts_running() and not device.running("/usr/bin/seq"), "both end")

    def test_a_file_that_shrinks_ends_the_answer_early(self):
        path = self.make("shrinking", b"x")
        os.truncate(path, 1 << 30)
        reader = Reader(query(path=path))
        reader.read(1000)
        os.truncate(path, 2000)
        rest = reader.read(1 << 30)
        reader.close()
        self.assertLess(len(rest), (1 << 30) - 1000)
        self.assertEqual(b"", rest.strip(b"\0"))


class FastDownloads(Downloads):
    """All of the same where the web server sends whole files itself, and what only then holds."""

    server_type = webserver.Lighttpd
    fast_folder = FOLDER

    def test_a_large_file_needs_little_memory_and_no_room_on_the_disk(self):
        path = self.make("large", b"")
        size = self.large
        os.truncate(path, size)
        reader = Reader(query(path=path))
        reader.read(1_000_000)
        device.wait_for(lambda: not device.hosts_running(), "the host program ends before the file has been sent")
        self.assertEqual(size - 1_000_000, len(reader.read(size)))
        reader.close()

    def test_a_client_that_breaks_off_leaves_no_process(self):
        path = self.make("endless", b"")
        os.truncate(path, 1 << 40)
        reader = Reader(query(path=path))
        reader.read(1000)
        device.wait_for(lambda: not device.hosts_running(), "the host program has left it to the web server")
        reader.close()
        reader = Reader(query(path=path, fast=False))
        reader.read(1000)
        device.wait_for(device.hosts_running, "the host program sends, as the method wants it to")
        reader.close()
        device.wait_for(lambda: not device.hosts_running(), "the host program ends")

    def test_a_file_that_a_user_could_exchange_is_sent_by_the_host_program(self):
        folder = FOLDER + "/open"
        os.mkdir(folder)
        path = self.make("open/endless", b"")
        os.truncate(path, 1 << 40)
        os.chmod(folder, 0o777)
        reader = Reader(query(path=path))
        reader.read(100_000)
        device.wait_for(device.hosts_running, "the host program sends")
        reader.close()

    def test_no_path_of_the_device_reaches_the_client(self):
        response = get(path=self.path)
        self.assertEqual([], response.values(self.server.fast_header))
        self.assertNotIn(FOLDER, repr(response.headers))


if __name__ == "__main__":
    unittest.main()
