"""The host program as a process: its streams, its signals, its end when there is no memory."""

import json
import os
import resource
import signal
import subprocess
import unittest

import bad_input
import device
import host

MEGABYTE = 1024 * 1024
BODY = bad_input.CALL + b"&x=" + b"a" * (4 * MEGABYTE)
CALL_ENVIRONMENT = {"REQUEST_METHOD": "GET", "QUERY_STRING": bad_input.CALL.decode()}


def run_with_memory(megabytes):
    """The host program with a large body, when this much memory can be had: in all, or, for a sanitized one, whose
    runtime reserves terabytes, at once."""
    environment = {"REQUEST_METHOD": "POST", "QUERY_STRING": "", "CONTENT_LENGTH": str(len(BODY))}
    limit = None
    if host.is_sanitized():
        environment["ASAN_OPTIONS"] = f"allocator_may_return_null=1:max_allocation_size_mb={megabytes}"
    else:
        limit = megabytes * MEGABYTE
    process = subprocess.run(
        [device.HOST], env=environment, input=BODY, capture_output=True, cwd=device.FOLDER,
        timeout=device.TIME_LIMIT, check=False,
        preexec_fn=lambda: limit is None or resource.setrlimit(resource.RLIMIT_AS, (limit, limit)))
    return host.Outcome(process.stdout, process.stderr, process.returncode)


class Memory(device.DeviceTestCase):
    def test_with_any_amount_of_memory_the_answer_is_a_header_block_and_json(self):
        amounts = range(1, 12) if host.is_sanitized() else range(8, 80)
        answered = {}
        for megabytes in amounts:
            with self.subTest(megabytes=megabytes):
                outcome = run_with_memory(megabytes)
                if outcome.status == 127 and outcome.output == b"":
                    continue  # too little to load the libraries: it never began
                self.assertIn(outcome.status, (0, 1), outcome.errors)
                parts = outcome.parts()
                self.assertIsNotNone(parts, outcome.output[:300])
                answered[megabytes] = json.loads(parts[1])["error"]["code"]
        self.assertLessEqual(set(answered.values()), {101, 117, 119})
        # The range is wide enough to hold both ends: a call that cannot be served, and one that can.
        self.assertIn(answered[min(answered)], (101, 117))
        self.assertEqual(119, answered[max(answered)])


class Streams(device.DeviceTestCase):
    def test_with_its_descriptors_closed_it_ends_well_and_writes_nowhere(self):
        before = device.watched_files()
        for closed in ("<&-", ">&-", "2>&-", "<&- >&- 2>&-"):
            with self.subTest(closed):
                process = subprocess.run(["/bin/sh", "-c", f"exec {device.HOST} {closed}"], env=CALL_ENVIRONMENT,
                                         cwd=device.FOLDER, capture_output=True, stdin=subprocess.DEVNULL,
                                         timeout=device.TIME_LIMIT, check=False)
                expected = b"" if ">&-" in closed.split() else b'{"error":{"code":119},"success":false}'
                self.assertEqual((0, expected), (process.returncode, process.stdout.split(b"\r\n\r\n")[-1]))
        self.assertEqual(before, device.watched_files())

    def test_a_reader_that_is_gone_does_not_kill_it(self):
        reading, writing = os.pipe()
        os.close(reading)
        try:
            # As a web server starts it: with the signal's usual effect.
            process = subprocess.run([device.HOST], env=CALL_ENVIRONMENT, cwd=device.FOLDER, stdout=writing,
                                     stdin=subprocess.DEVNULL, timeout=device.TIME_LIMIT, check=False,
                                     preexec_fn=lambda: signal.signal(signal.SIGPIPE, signal.SIG_DFL))
        finally:
            os.close(writing)
        self.assertEqual(0, process.returncode)

    def test_it_maps_no_library_that_only_some_calls_need(self):
        listing = subprocess.run(["ldd", device.HOST], capture_output=True, text=True, check=True).stdout
        for name in ("libcurl", "libssl", "libcrypto", "libsqlite3", "libpam"):
            self.assertNotIn(name, listing)


if __name__ == "__main__":
    unittest.main()
