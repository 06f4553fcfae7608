"""A search of a hundred thousand files: answered at once, watched while it goes on, stopped, and run to its end."""

import os
import shutil
import tempfile
import time
import unittest

import device
import webclient

SEARCH = "ZOVA.Storage.Search"
FOLDERS = 100
FILES_EACH = 1000
# Sparse, one in each folder: reading all of them takes far longer than this test, and one of them no long time.
SLOW_EACH = 512 * 1024 * 1024


class LargeSearch(device.DeviceTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.addClassCleanup(device.remove_tasks)
        cls.alice = webclient.logged_in("alice")
        # Files in memory are made in seconds.
        cls.tree = tempfile.mkdtemp(dir="/tmp")
        cls.addClassCleanup(shutil.rmtree, cls.tree)
        os.chmod(cls.tree, 0o755)
        for folder in range(FOLDERS):
            path = f"{cls.tree}/{folder}"
            os.mkdir(path)
            for number in range(FILES_EACH):
                with open(f"{path}/{number}.txt", "wb") as file:
                    file.write(b"hay")
            with open(path + "/slow.bin", "wb") as file:
                file.truncate(SLOW_EACH)

    def start(self, **parameters):
        begin = time.monotonic()
        answer = self.alice.call(SEARCH, "start", folder=webclient.quoted(self.tree), **parameters).json()
        self.assertTrue(answer["success"], answer)
        task = answer["data"]["task_id"]
        self.addCleanup(self.call, "stop", task)
        return task, time.monotonic() - begin

    def call(self, method, task):
        return self.alice.call(SEARCH, method, task_id=webclient.quoted(task))

    def state(self, task):
        return self.call("status", task).json()["data"]

    def test_it_is_answered_within_a_second_grows_and_ends_when_stopped(self):
        task, seconds = self.start(pattern=webclient.quoted("*"), content="needle")
        self.assertLess(seconds, 1)
        states = [self.state(task)]

        def has_grown():
            state = self.state(task)
            if state["data"]["files"] > states[-1]["data"]["files"]:
                states.append(state)
            return len(states) == 4

        device.wait_for(has_grown, "growth of what is reported")
        self.assertEqual([False] * 4, [state["finish"] for state in states])
        for name in ("files", "folders", "bytes", "share"):
            values = [state["data"][name] for state in states]
            self.assertEqual(sorted(values), values, name)
            self.assertLess(values[0], values[-1], name)
        self.assertLess(states[-1]["data"]["files"], FOLDERS * FILES_EACH)
        self.assertLess(states[-1]["data"]["share"], 1)

        self.assertEqual(0, self.call("stop", task).code())
        device.wait_for(lambda: not device.hosts_running(), "the end of the task's process")
        device.wait_for(lambda: not device.zombies(), "somebody to wait for all processes")
        stopped = self.state(task)
        self.assertTrue(stopped["finish"])
        # It ended in the middle, and says so.
        self.assertFalse(stopped["data"]["done"])
        self.assertLess(stopped["data"]["files"], FOLDERS * FILES_EACH)

    def test_it_counts_every_file_once_and_names_the_first_thousand(self):
        task, _ = self.start(pattern=webclient.quoted("*.txt"))
        device.wait_for(lambda: self.state(task)["finish"], "the end of the search")
        data = self.state(task)["data"]
        found = data.pop("found")
        self.assertEqual({"found_count": FOLDERS * FILES_EACH, "files": FOLDERS * (FILES_EACH + 1),
                          "folders": FOLDERS + 1, "bytes": FOLDERS * (FILES_EACH * 3 + SLOW_EACH), "skipped": 0,
                          "share": 1, "done": True}, data)
        self.assertEqual(1000, len(set(found)))
        self.assertTrue(all(os.path.isfile(path) for path in found))


if __name__ == "__main__":
    unittest.main()
