"""The device as the tests see it: its places, its files, and the base class of all test cases inside it."""

import os
import time
import unittest

HOST = "/usr/zova/zovaman/webapi/front.cgi"
FOLDER = os.path.dirname(HOST)
SESSIONS = "/run/zova/sessions"
FAILURES = "/run/zova/login-failures"
TASKS = "/run/zova/tasks"
LOGS = "/var/log/zova"
HOST_LOG = LOGS + "/host-error.log"
SYSTEM_LOG = LOGS + "/messages"

# Far above what any call takes, also under the sanitizers; a process still running then does not end by itself.
TIME_LIMIT = 60

URL = os.environ["WEBAPI_URL"]
PASSWORD = os.environ["WEBAPI_PASSWORD"]

WATCHED = ("/etc", "/home", "/root", "/run", "/tmp", "/usr/lib/zova", "/usr/zova", "/var")
# Of these, what a call of a shipped package or of the probe could write: soon looked through.
WRITTEN = ("/etc/zova", "/home", "/run", "/tmp", "/usr/zova", "/var/lib/zova", "/var/tmp")
# The project may lie under a watched folder, and with it the layer that the device itself is kept in.
PROJECT = os.path.dirname(os.path.dirname(os.path.dirname(os.path.dirname(os.path.abspath(__file__)))))
# Logs, and the counts of login attempts, are written whatever the call.
PASSED_OVER = (LOGS, FAILURES, PROJECT)


def watched_files(tops=WATCHED):
    """Path, kind, size and time of change of all that a call could write, as a set of tuples."""
    found = set()
    for top in tops:
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


def processes():
    return [int(entry) for entry in os.listdir("/proc") if entry.isdigit()]


def running(program):
    """Process numbers of what runs this program."""
    found = []
    for process in processes():
        try:
            if os.readlink(f"/proc/{process}/exe") == program:
                found.append(process)
        except OSError:
            continue  # ended meanwhile, or a thread of the kernel
    return found


def hosts_running():
    """Process numbers of the host programs that are under way."""
    return running(HOST)


def process_fields(process):
    """The fields of /proc/<process>/stat behind the name: state first, the time of its start at 19. Empty if it is
    gone."""
    try:
        with open(f"/proc/{process}/stat", encoding="utf-8", errors="replace") as file:
            return file.read().rpartition(") ")[2].split()
    except OSError:
        return []


def zombies():
    """Process numbers of what has ended and was not waited for."""
    return [process for process in processes() if process_fields(process)[:1] == ["Z"]]


def remove_tasks(but=None):
    """All records of tasks but the one in that file, as a restart of the device would do."""
    for entry in list(os.scandir(TASKS)):
        if entry.path != but:
            os.rmdir(entry.path) if entry.is_dir(follow_symlinks=False) else os.unlink(entry.path)


def wait_for(condition, what):
    """Until the condition's value counts as true, which is returned. Fails when the time is over."""
    limit = time.monotonic() + TIME_LIMIT
    while not (value := condition()):
        if time.monotonic() > limit:
            raise AssertionError(f"in vain: {what}")
        time.sleep(0.02)
    return value


class SystemLog:
    """What the services write to the device's log from here on."""

    def __init__(self):
        self.size = os.path.getsize(SYSTEM_LOG)

    def lines(self):
        with open(SYSTEM_LOG, "rb") as log:
            log.seek(self.size)
            return log.read().decode("utf-8", "replace").splitlines()

    def wait_for(self, text):
        """Until a line holds the text: the service writes in its own time, but in order."""
        wait_for(lambda: any(text in line for line in self.lines()), f"{text} in the log")


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
