"""Background tasks through the web server: started, watched, stopped, and kept from others."""

import os
import signal
import shutil
import time
import unittest

import device
import webclient

SEARCH = "ZOVA.Storage.Search"
TASK = "ZOVA.Core.Task"
TREE = "/home/alice/searched"
# Sparse, so that it costs no room; reading through it takes far longer than this test.
LARGE = 1 << 40


class Tasks(device.DeviceTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.alice = webclient.logged_in("alice")
        cls.admin = webclient.logged_in("admin")
        os.makedirs(TREE + "/small")
        cls.addClassCleanup(shutil.rmtree, TREE)
        for number in range(3):
            with open(f"{TREE}/small/{number}.txt", "w", encoding="ascii") as file:
                file.write("needle" if number == 1 else "hay")
        with open(TREE + "/large.bin", "wb") as file:
            file.truncate(LARGE)

    def setUp(self):
        super().setUp()
        self.addCleanup(device.remove_tasks)

    def start(self, folder, **parameters):
        answer = self.alice.call(SEARCH, "start", folder=webclient.quoted(folder), **parameters).json()
        self.assertTrue(answer["success"], answer)
        return answer["data"]["task_id"]

    def status(self, task, client=None):
        return (client or self.alice).call(TASK, "status", task_id=webclient.quoted(task))

    def wait_until_finished(self, task):
        limit = time.monotonic() + device.TIME_LIMIT
        while time.monotonic() < limit:
            state = self.status(task).json()["data"]
            if state["finish"]:
                return state
        raise AssertionError("the task does not end")

    @staticmethod
    def files():
        # Each call renews the idle time of its session, and one in half a minute looks after the store.
        renewed = (device.SESSIONS, device.TASKS + ".swept")
        return {entry for entry in device.watched_files() if not entry[0].startswith(renewed)}

    def process_of_the_only_task(self):
        # The processes of earlier calls and stopped tasks end by themselves.
        limit = time.monotonic() + device.TIME_LIMIT
        running = device.hosts_running()
        while len(running) != 1 and time.monotonic() < limit:
            running = device.hosts_running()
        self.assertEqual(1, len(running))
        return running[0]

    def start_a_long_one(self):
        task = self.start(TREE, pattern="large.bin", content="needle")
        self.addCleanup(self.alice.call, TASK, "stop", task_id=webclient.quoted(task))
        return task

    def test_a_search_finds_what_fits_and_finishes(self):
        state = self.wait_until_finished(self.start(TREE + "/small", pattern=webclient.quoted("*.txt"), content="needle"))
        self.assertEqual([TREE + "/small/1.txt"], state["data"]["found"])
        self.assertTrue(state["data"]["done"])

    def test_a_task_that_goes_on_is_answered_at_once_and_can_be_stopped(self):
        task = self.start_a_long_one()
        self.assertFalse(self.status(task).json()["data"]["finish"])
        self.assertEqual(0, self.alice.call(TASK, "stop", task_id=webclient.quoted(task)).code())
        self.assertTrue(self.status(task).json()["data"]["finish"])

    def test_another_user_sees_and_stops_no_task_of_alice_administrator_or_not(self):
        task = self.start_a_long_one()
        self.assertEqual(503, self.status(task, self.admin).code())
        self.assertEqual(503, self.admin.call(TASK, "stop", task_id=webclient.quoted(task)).code())
        self.assertFalse(self.status(task).json()["data"]["finish"])

    def test_a_task_whose_process_was_killed_still_has_a_status_and_can_be_stopped(self):
        task = self.start_a_long_one()
        os.kill(self.process_of_the_only_task(), signal.SIGKILL)
        self.assertEqual(0, self.status(task).code())
        self.assertEqual(0, self.alice.call(TASK, "stop", task_id=webclient.quoted(task)).code())
        self.assertTrue(self.status(task).json()["data"]["finish"])

    def test_ids_that_name_nothing_are_errors_of_their_own(self):
        # What "status" and "stop" answer.
        rows = {"alice/../../etc/passwd": (508, 508), "alice/none": (508, 508), "alice/": (508, 508),
                "none": (503, 502), "/x": (503, 503), "root/1": (503, 503), "alice/a\nb": (508, 508),
                "alice/a\0b": (508, 508), "alice/" + "x" * 5000: (508, 508), "@administrators/x": (503, 503),
                "alice/a/../b": (508, 508), "../alice/x": (503, 503), "alice\0/x": (503, 503)}
        before = self.files()
        for task, codes in rows.items():
            with self.subTest(task[:20]):
                stopped = self.alice.call(TASK, "stop", task_id=webclient.quoted(task))
                self.assertEqual(codes, (self.status(task).code(), stopped.code()))
        self.assertEqual(before, self.files())

    def test_prefixes_that_fit_nothing_list_nothing(self):
        self.start_a_long_one()
        for prefix in ("../", "/", "search-\0", "search-\n", "x" * 5000, ".", "*", "search-?"):
            with self.subTest(prefix[:20]):
                answer = self.alice.call(TASK, "list", prefix=webclient.quoted(prefix)).json()
                self.assertEqual({"user": None}, answer["data"])


if __name__ == "__main__":
    unittest.main()
