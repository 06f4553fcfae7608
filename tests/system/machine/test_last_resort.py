"""What a client gets when a call ends by an exception that nobody caught."""

import os
import pathlib
import subprocess
import unittest

PROBE = pathlib.Path(__file__).resolve().parents[3] / "build" / os.environ["WEBAPI_PRESET"] / "bin/last-resort-probe"

ANSWER = (b'Content-type: application/json; charset="UTF-8"\r\n'
          b"X-Content-Type-Options: nosniff\r\n"
          b"Cache-Control: max-age=0, no-cache, no-store, must-revalidate\r\n"
          b"\r\n"
          b'{"error":{"code":117},"success":false}')

MOMENTS = {
    "before any output": ANSWER,
    "after a header block": ANSWER,
    "in a destructor": ANSWER,
    "after output has left": b"Content-type: text/plain\r\n\r\npart",
}


class LastResort(unittest.TestCase):
    def test_the_client_gets_one_whole_answer_unless_a_part_has_left(self):
        for moment, expected in MOMENTS.items():
            with self.subTest(moment):
                result = subprocess.run([PROBE, moment], capture_output=True, check=False)
                self.assertEqual((expected, b"", 1), (result.stdout, result.stderr, result.returncode))


if __name__ == "__main__":
    unittest.main()
