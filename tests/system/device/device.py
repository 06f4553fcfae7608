"""The device as the tests see it: its places, its files, and the base class of all test cases inside it."""

import os
import unittest

HOST = "/usr/zova/zovaman/webapi/front.cgi"
FOLDER = os.path.dirname(HOST)
SESSIONS = "/run/zova/sessions"
FAILURES = "/run/zova/login-failures"
LOGS = "/var/log/zova"
HOST_LOG = LOGS + "/host-error.log"

# Far above what any call takes, also under the sanitizers; a process still running then does not end by itself.
TIME_LIMIT = 60

URL = os.environ["WEBAPI_URL"]
PASSWORD = os.environ["WEBAPI_PASSWORD"]

WATCHED = ("/etc", "/home", "/root", "/run", "/tmp", "/usr/lib/zova", "/usr/zova", "/var")
# The project may lie under a watched folder, and with it the layer that the device itself is kept in.
PROJECT = os.path.dirname(os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__)))))
# Logs, and the counts of login attempts, are written whatever the call.
PASSED_OVER = (LOGS, FAILURES, PROJECT)


def watched_files():
    """Path, kind, size and time of change of all that a call could write, as a set of tuples."""
    found = set()
    for top in WATCHED:
        for folder, folders, files in os.walk(top):
            if folder in PASSED_OVER:
                folders.clear()
                continue
            for name in folders + files:
                path = os.path.join(folder, name)
                if path in PASSED_OVER:
                    continue
                state = os.lstat(path)
                # Of a folder only its existence: the ones above a log file change with it.
                change = (state.st_size, state.st_mtime_ns) if name in files else ()
                found.add((path, state.st_mode, state.st_uid) + change)
    return found


def hosts_running():
    """Process numbers of the host programs that are under way."""
    running = []
    for entry in os.listdir("/proc"):
        if not entry.isdigit():
            continue
        try:
            if os.readlink(f"/proc/{entry}/exe") == HOST:
                running.append(int(entry))
        except OSError:
            continue  # ended meanwhile, or a thread of the kernel
    return running


class DeviceTestCase(unittest.TestCase):
    """Besides each test's own statements: the host program wrote nothing to its error stream (where a sanitizer would
    report too)."""

    maxDiff = None

    def setUp(self):
        self.log_size = os.path.getsize(HOST_LOG)
        # All tests come from one address: the failed logins of one must not block the next.
        if os.path.isdir(FAILURES):
            for name in os.listdir(FAILURES):
                if not name.startswith("."):
                    os.unlink(f"{FAILURES}/{name}")

    def tearDown(self):
        with open(HOST_LOG, "rb") as log:
            log.seek(self.log_size)
            self.assertEqual(b"", log.read(), "the host program complained")
