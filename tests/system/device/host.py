"""The host program started alone, as a web server starts it."""

import re
import subprocess

import device

BLOCK = re.compile(rb"((?:[^\r\n\0]+: [^\r\n\0]*\r\n)+)\r\n(.*)\Z", re.DOTALL)

# All header names that may come with an error.
NAMES = {
    b"Content-type", b"x-request-error", b"X-Content-Type-Options", b"X-XSS-Protection", b"Cache-Control", b"Pragma",
    b"Expires",
}


def is_sanitized():
    with open(device.HOST, "rb") as file:
        return b"libasan.so" in file.read()


class Outcome:
    """What one host process wrote, and how it ended."""

    def __init__(self, output, errors, status):
        self.output = output
        self.errors = errors
        self.status = status

    def parts(self):
        """Header lines and body, or None if the output is no header block with a body."""
        match = BLOCK.match(self.output)
        return None if match is None else (match.group(1).split(b"\r\n")[:-1], match.group(2))


def run(environment, body=b""):
    """One host process with this environment and nothing else. Fails if it does not end by itself in time."""
    process = subprocess.run([device.HOST], env=environment, input=body, capture_output=True, cwd=device.FOLDER,
                             timeout=device.TIME_LIMIT, check=False)
    return Outcome(process.stdout, process.stderr, process.returncode)


def get(query, **more):
    return run({"REQUEST_METHOD": "GET", "QUERY_STRING": query, **more})


def post(body, **more):
    return run({"REQUEST_METHOD": "POST", "QUERY_STRING": "", "CONTENT_LENGTH": str(len(body)), **more}, body)
