"""What holds behind each web server. The modules that run these cases name the server."""

import socket
import urllib.parse

import device
import test_uploads
import test_web_server
import webclient
import webserver

BODY = test_uploads.form(("note", b"hello"), ("file", "x.txt", b"content"))
TYPE = f"multipart/form-data; boundary={test_uploads.BOUNDARY}"
# The host program answered, and the body was none of the form that was announced.
REFUSED_BODY = 108


def connect():
    url = urllib.parse.urlsplit(device.URL)
    connection = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
    connection.setsockopt(socket.IPPROTO_TCP, socket.TCP_NODELAY, 1)
    return connection


def exchange(data):
    """Sends bytes on a connection and returns all that comes back until the server closes it."""
    with connect() as connection:
        connection.sendall(data)
        answer = b""
        try:
            while part := connection.recv(65536):
                answer += part
        except ConnectionResetError:
            pass  # it had not read all
    return answer


def head(length=None, content_type=TYPE, query=None, **headers):
    lines = [f"POST /webapi/front.cgi?{test_uploads.query('upload') if query is None else query} HTTP/1.1",
             "Host: device", "Connection: close", f"Content-Type: {content_type}"]
    if length is not None:
        lines.append(f"Content-Length: {length}")
    lines += [f"{name.replace('_', '-')}: {value}" for name, value in headers.items()]
    return "\r\n".join(lines).encode() + b"\r\n\r\n"


def status_of(answer):
    return int(answer.split(b" ", 2)[1]) if answer.startswith(b"HTTP/1.") else 0


def chunked(body, size):
    pieces = [body[start:start + size] for start in range(0, len(body), size)]
    return b"".join(b"%x\r\n%b\r\n" % (len(piece), piece) for piece in [*pieces, b""])


def tell(headers=None, query="x=1"):
    answer = webclient.request("GET", f"api=ZOVA.Test.Probe.Request&version=1&method=tell&{query}", headers=headers)
    return answer.json()["data"]


class Exchange(webserver.ServedTestCase):
    """Requests that no well-behaved client sends, and what the web server adds to the others."""

    # What a body in chunks gets: an answer of the host program where the web server finds out its length.
    chunked_status = 411
    believes_forwarded = False

    def tearDown(self):
        device.wait_for(lambda: not device.hosts_running(), "the end of all host programs")
        self.assertEqual([], test_uploads.part_files())
        super().tearDown()

    def test_the_host_program_gets_the_query_and_the_headers_that_clients_prove_themselves_by(self):
        query = "x=%0a%00&y=a+b&z=%2F..%2F&w=%zz&v=\"'<>|\\^"
        told = tell({"Authorization": "Basic YTpi", "Proxy": "http://192.0.2.1/"}, query)
        self.assertEqual(f"api=ZOVA.Test.Probe.Request&version=1&method=tell&{query}",
                         told["variables"]["QUERY_STRING"])
        host = urllib.parse.urlsplit(device.URL).netloc
        self.assertEqual(("Basic YTpi", None, host, "127.0.0.1", "/webapi/front.cgi"), tuple(
            told["variables"][name] for name in ("HTTP_AUTHORIZATION", "HTTP_PROXY", "HTTP_HOST", "REMOTE_ADDR",
                                                 "SCRIPT_NAME")))
        self.assertTrue(told["variables"]["REQUEST_URI"].startswith("/webapi/front.cgi?api="))

    def test_what_a_client_says_of_its_own_address_is_not_passed_on(self):
        told = tell({"X-Forwarded-For": "192.0.2.1", "X-Forwarded-Proto": "https", "X_Forwarded_For": "192.0.2.2"})
        expected = ("192.0.2.1", "https") if self.believes_forwarded else ("127.0.0.1", "http")
        self.assertEqual(expected, tuple(told["variables"][name] for name in (
            "HTTP_X_FORWARDED_FOR", "HTTP_X_FORWARDED_PROTO")))

    def test_the_headers_of_an_answer_come_through(self):
        answer = webclient.request("GET", "api=ZOVA.Core.User&version=1&method=get")
        for name, value in (("Content-Type", 'application/json; charset="UTF-8"'), ("x-request-error", "unauth"),
                            ("X-Content-Type-Options", "nosniff"), ("X-XSS-Protection", "1; mode=block"),
                            ("Cache-Control", "max-age=0, no-cache, no-store, must-revalidate"), ("Pragma", "no-cache"),
                            ("Expires", "0")):
            self.assertEqual([value], answer.values(name), name)

    def test_a_body_in_chunks_is_answered_and_never_spooled_without_a_limit(self):
        for body, content_type in ((BODY, TYPE), (b"x=" + b"1" * 200_000, "application/x-www-form-urlencoded")):
            with self.subTest(content_type):
                answer = exchange(head(content_type=content_type, Transfer_Encoding="chunked") + chunked(body, 1000))
                self.assertEqual(self.chunked_status, status_of(answer), answer[:500])
        with connect() as connection:
            connection.sendall(head(Transfer_Encoding="chunked"))
            piece = b"%x\r\n%b\r\n" % (1 << 20, bytes(1 << 20))
            try:
                for _ in range(80):
                    connection.sendall(piece)
                connection.sendall(b"0\r\n\r\n")
                answer = connection.recv(65536)
            except (BrokenPipeError, ConnectionResetError):
                answer = b""
            if answer:
                self.assertIn(status_of(answer), (411, 413), answer[:500])

    def test_a_body_shorter_than_announced_is_no_upload(self):
        for length in (len(BODY) + 1, len(BODY) + 1000, 1 << 40):
            with self.subTest(length):
                answer = test_web_server.raw_exchange(head(length) + BODY[:-10])
                if b"\r\n\r\n{" in answer:
                    self.assertIn(b'"success":false', answer)
                else:
                    self.assertIn(status_of(answer), (0, 400, 408), answer[:500])

    def test_a_body_longer_than_announced_is_cut_there(self):
        answer = exchange(head(len(BODY) - 30) + BODY)
        self.assertIn(b'"upload_err":-3', answer)
        answer = exchange(head(len(BODY)) + BODY + b"GET / HTTP/1.1\r\nHost: device\r\n\r\n")
        self.assertEqual((200, 1), (status_of(answer), answer.count(b"HTTP/1.1 ")))
        self.assertIn(b'"success":true', answer)

    def test_two_lengths_are_refused(self):
        for lengths in ((len(BODY), 5), (5, len(BODY))):
            answer = exchange(head(lengths[0], Content_Length=lengths[1]) + BODY)
            self.assertEqual(400, status_of(answer), answer[:500])

    def test_header_lines_of_a_megabyte_are_refused_before_a_process_starts(self):
        for lines in (f"X-Long: {'x' * 1048576}", "\r\n".join(f"X-{number}: {'x' * 1000}" for number in range(1000))):
            with connect() as connection:
                try:
                    connection.sendall(b"GET /webapi/front.cgi HTTP/1.1\r\nHost: device\r\n" + lines.encode() +
                                       b"\r\n\r\n")
                    answer = connection.recv(65536)
                except (BrokenPipeError, ConnectionResetError):
                    continue
                if answer:
                    self.assertIn(status_of(answer), (400, 413, 414, 431), answer[:300])
        self.assertEqual([], device.hosts_running())

    def test_a_multipart_body_inside_a_part_is_its_content(self):
        inner = BODY.replace(test_uploads.BOUNDARY.encode(), b"inner")
        told = test_uploads.post("upload", test_uploads.form(("outer", "x", inner))).json()["data"]
        self.assertEqual({"outer": inner.decode()}, {name: file["text"] for name, file in told["files"].items()})

    def test_a_client_that_sends_byte_by_byte_holds_nobody_up(self):
        with connect() as connection:
            for place, byte in enumerate(head(len(BODY)) + BODY):
                connection.sendall(bytes((byte,)))
                if place % 100 == 0:
                    self.assertEqual(101, webclient.request("GET").code())
            answer = b""
            while part := connection.recv(65536):
                answer += part
        self.assertIn(b'"text":"content"', answer)


class EarlyAnswers(webserver.ServedTestCase):
    """Answers that the host program gives while the body is still on its way."""

    def test_a_refused_upload_is_answered_before_its_body_is_there(self):
        with connect() as connection:
            connection.sendall(head(5 << 30, query="api=ZOVA.Core.User&version=1&method=get"))
            connection.sendall(BODY)
            answer = b""
            while b'"success"' not in answer:
                part = connection.recv(65536)
                self.assertTrue(part, answer)
                answer += part
            self.assertIn(b'"code":115', answer)

    def test_curl_reads_the_refusal_of_a_large_upload(self):
        for method, code in (("granted", 115), ("none", 103)):
            answer = test_uploads.post(method, test_uploads.form(("file", "x", bytes(20_000_000))))
            self.assertEqual((200, code), (answer.status, answer.code()))


class LateAnswers(webserver.ServedTestCase):
    """fcgiwrap hears the host program after the whole body. Where that has ended before, it tells of a failure."""

    def test_a_refused_upload_is_answered_or_a_failure_of_the_web_server_and_leaves_nothing(self):
        for size, method, code in ((10, "granted", 115), (10, "none", 103), (20_000_000, "granted", 115)):
            with self.subTest(size=size, method=method):
                answer = test_uploads.post(method, test_uploads.form(("file", "x", bytes(size))))
                if answer.status != 502:
                    self.assertEqual((200, code), (answer.status, answer.code()))
        self.assertEqual(502, answer.status)
        device.wait_for(lambda: not device.hosts_running(), "the end of all host programs")
        self.assertEqual([], test_uploads.part_files())


class Secrets(webserver.ServedTestCase):
    def test_no_password_stands_in_a_log_of_the_web_server(self):
        password = device.PASSWORD
        login = f"api=ZOVA.Core.Session&version=1&method=login&account=alice&passwd={password}"
        self.assertEqual(0, webclient.request("GET", login).code())
        for headers in ({"Referer": f"http://device/webapi/front.cgi?{login}"}, {"Content-Length": str(10**12)},
                        {"Host": "a/b"}, {"Content-Length": "x"}):
            webclient.request("POST", login, headers=headers)
        exchange(head(content_type="text/plain", query=login, Transfer_Encoding="chunked") + b"0\r\n\r\n")
        for path in ("/other", "/webapi/front.cgi/x", "/webapi/%00", "/webapi/lib.def"):
            webclient.request("GET", login, path=path)
        test_web_server.raw_exchange(f"NONSENSE\x01 /webapi/front.cgi?{login} HTTP/9.9\r\n\r\n".encode())
        test_web_server.raw_exchange(f"GET /webapi/front.cgi?{login}".encode() + b"&" + b"x" * 200_000)
        found = 0
        for path in self.server.logs():
            with open(path, "rb") as log:
                content = log.read()
            self.assertNotIn(password.encode(), content, path)
            found += b"/webapi/front.cgi" in content
        self.assertGreater(found, 0, "the access log tells of no call")
