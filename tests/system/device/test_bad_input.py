"""Whatever a client sends, the answer is a header block and a JSON error, and the process ends by itself."""

import json
import unittest

import bad_input
import device
import host
import webclient

# One string of the environment of a new process holds at most 128 KiB.
LONGEST_QUERY = 100000


def setUpModule():
    """The device's secrets are made at their first use, which is none of the writings looked for here."""
    host.get("api=ZOVA.Core.Session&version=1&method=cipher")
    host.get("__nEkOtReHpIc=t&__tXeTrEhPiC=AAAA")


class HostCase(device.DeviceTestCase):
    def assert_error(self, outcome, code):
        self.assertEqual((b"", 0), (outcome.errors, outcome.status))
        parts = outcome.parts()
        self.assertIsNotNone(parts, f"no header block and body: {outcome.output[:500]!r}")
        lines, body = parts
        names = {line.split(b":")[0] for line in lines}
        self.assertEqual(set(), names - host.NAMES)
        answer = json.loads(body)
        self.assertEqual((False, code), (answer["success"], answer["error"]["code"]))


class BadInputToTheHostAlone(HostCase):
    def test_each_row_gets_its_error_and_writes_nothing(self):
        before = device.watched_files()
        for row in bad_input.ROWS:
            with self.subTest(row.name):
                environment = {"REQUEST_METHOD": "GET", "QUERY_STRING": row.query}
                if row.body is not None:
                    environment.update(REQUEST_METHOD="POST", CONTENT_LENGTH=str(len(row.body)))
                self.assert_error(host.run(environment, row.body or b""), row.code)
        self.assertEqual(before, device.watched_files())

    def test_a_content_length_that_is_no_number_of_bytes_to_read_counts_as_no_body(self):
        for claimed in ("-1", "-99999999999", "0", "", "abc", "12abc", "1e3", " ", "99999999999999999999", "4294967340",
                        "0x20", "+", "2147483648"):
            with self.subTest(claimed):
                outcome = host.post(bad_input.CALL, CONTENT_LENGTH=claimed)
                self.assert_error(outcome, bad_input.BAD_REQUEST)

    def test_a_content_length_above_the_body_takes_what_came(self):
        for claimed in (len(bad_input.CALL) + 1, 1000000, 2147483646):
            with self.subTest(claimed):
                self.assert_error(host.post(bad_input.CALL, CONTENT_LENGTH=str(claimed)), bad_input.NO_LOGIN)

    def test_a_content_length_below_the_body_takes_no_more_than_it_says(self):
        body = b"api=ZOVA.Core.User&version=1&method=get&api=Other"
        outcome = host.post(body, CONTENT_LENGTH=str(len(bad_input.CALL)))
        self.assert_error(outcome, bad_input.NO_LOGIN)

    def test_an_environment_without_anything_is_a_bad_request(self):
        self.assert_error(host.run({}), bad_input.BAD_REQUEST)

    def test_any_request_method_gets_an_answer(self):
        for method in ("", "get", "HEAD", "PUT", "DELETE", "POST\n", "\xff", "M" * 10000):
            with self.subTest(method):
                outcome = host.get(bad_input.CALL.decode(), REQUEST_METHOD=method)
                self.assert_error(outcome, bad_input.NO_LOGIN)

    def test_variables_of_any_bytes_get_an_answer(self):
        texts = {"long": "a" * 65536, "line ends": "x\r\nInjected: 1\r\n\r\n{}", "bytes": bytes(range(1, 256)),
                 "brackets": "[" * 50000, "escapes": "%" * 10000, "separators": ";=;,=;" * 5000}
        names = ("HTTP_COOKIE", "HTTP_USER_AGENT", "HTTP_HOST", "HTTP_X_FORWARDED_FOR", "HTTP_X_FORWARDED_PROTO",
                 "HTTP_AUTHORIZATION", "HTTP_X_ZOVA_TOKEN", "HTTP_ACCEPT_LANGUAGE", "HTTP_X_TYPE_NAME", "REQUEST_URI",
                 "REMOTE_ADDR", "CONTENT_TYPE", "HTTPS", "REWRITE_APP", "HOST")
        for name in names:
            for kind, text in texts.items():
                with self.subTest(name=name, kind=kind):
                    outcome = host.get(bad_input.CALL.decode(), **{name: text})
                    lines, body = outcome.parts()
                    self.assertEqual((b"", 0), (outcome.errors, outcome.status))
                    self.assertEqual(set(), {line.split(b":")[0] for line in lines} - host.NAMES)
                    self.assertIs(json.loads(body)["success"], False)


class BadInputThroughTheWebServer(device.DeviceTestCase):
    rows = bad_input.ROWS
    watched = device.WATCHED

    def test_each_row_gets_its_error_and_writes_nothing(self):
        before = device.watched_files(self.watched)
        for row in self.rows:
            if len(row.query) > LONGEST_QUERY or any(byte <= 32 or byte >= 127 for byte in row.query):
                continue
            with self.subTest(row.name):
                method = "GET" if row.body is None else "POST"
                response = webclient.request(method, row.query.decode(), row.body)
                self.assertEqual((200, row.code), (response.status, response.code()))
        self.assertEqual(before, device.watched_files(self.watched))

    def test_a_query_too_long_for_a_process_is_refused_before_one_starts(self):
        for length in (70000, 131072, 1000000):
            with self.subTest(length):
                response = webclient.request("GET", "x=" + "a" * length)
                self.assertIn(response.status, (413, 414, 431))

    def test_a_body_too_large_for_memory_is_refused_before_it_is_sent(self):
        response = webclient.request("POST", headers={"Content-Length": str(10**12)})
        self.assertEqual(413, response.status)

    def test_a_content_length_that_is_no_number_is_refused(self):
        for claimed in ("-1", "abc", "1 1"):
            with self.subTest(claimed):
                self.assertEqual(400, webclient.request("POST", headers={"Content-Length": claimed}).status)


if __name__ == "__main__":
    unittest.main()
