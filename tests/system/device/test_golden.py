"""The transcripts in tests/golden, byte for byte, from the host program alone and through the web server."""

import os
import pathlib
import unittest

import device
import host
import webclient

CASES = pathlib.Path(__file__).resolve().parents[2] / "golden"
# Lines that the web server adds for the connection.
OWN_LINES = {"connection", "content-length", "date", "transfer-encoding"}


class Transcript:
    def __init__(self, folder):
        self.name = f"{folder.parent.name}/{folder.name}"
        self.environment = dict(
            line.split("=", 1) for line in (folder / "environment").read_text(encoding="utf-8").splitlines())
        body = folder / "stdin"
        self.body = body.read_bytes() if body.exists() else None
        self.expected = (folder / "expected").read_bytes()

    def http_headers(self):
        headers = {}
        for variable, name in (("CONTENT_TYPE", "Content-Type"), ("HTTP_COOKIE", "Cookie")):
            if variable in self.environment:
                headers[name] = self.environment[variable]
        return headers


def transcripts(area):
    found = [Transcript(folder) for folder in sorted((CASES / area).iterdir())]
    if not found:
        raise AssertionError(f"no cases in {CASES / area}")
    return found


class GoldenTranscripts(device.DeviceTestCase):
    def test_the_host_alone_writes_exactly_the_expected_bytes(self):
        for case in transcripts("call") + transcripts("host"):
            with self.subTest(case.name):
                outcome = host.run(case.environment, case.body or b"")
                self.assertEqual((case.expected, b"", 0), (outcome.output, outcome.errors, outcome.status))

    def test_the_web_server_passes_header_lines_and_body_on_unchanged(self):
        for case in transcripts("call"):
            with self.subTest(case.name):
                response = webclient.request(case.environment["REQUEST_METHOD"], case.environment["QUERY_STRING"],
                                             case.body, case.http_headers())
                self.assertEqual(200, response.status)
                lines = [f"{name}: {value}" for name, value in response.headers if name.lower() not in OWN_LINES]
                received = "".join(line + "\r\n" for line in lines).encode("latin-1") + b"\r\n" + response.body
                self.assertEqual(case.expected, received)

    def test_every_case_says_why_it_is_there(self):
        for folder in sorted(CASES.glob("*/*/")):
            with self.subTest(os.path.basename(folder)):
                self.assertEqual(1, len((folder / "why").read_text(encoding="utf-8").splitlines()))


if __name__ == "__main__":
    unittest.main()
