"""Removing files and trees: at once or in the background, watched, stopped, and never outside."""

import os
import signal
import subprocess
import threading
import unittest

import device
import files
import webclient
from files import HOME, PLACE


def fill(top, folders=20, each=1000):
    for folder in range(folders):
        os.makedirs(f"{top}/{folder}")
        for number in range(each):
            os.close(os.open(f"{top}/{folder}/{number}", os.O_CREAT | os.O_WRONLY))
    files.give_tree("alice", top)


class Removal(files.FilesTestCase):
    def removed(self, *paths):
        task = self.data("delete", paths=list(paths), recursive=True)["task_id"]
        self.assertTrue(task.startswith("alice/delete-"))
        return self.finished(task)["data"]

    def test_files_links_and_empty_folders_are_removed_at_once(self):
        files.write(f"{PLACE}/file")
        os.symlink("/etc/passwd", f"{PLACE}/link")
        os.mkdir(f"{PLACE}/folder")
        os.mkfifo(f"{PLACE}/pipe")
        paths = [f"{PLACE}/{name}" for name in ("file", "link", "folder", "pipe")]
        self.assertEqual({"results": [{"path": path} for path in paths]}, self.data("delete", paths=paths))
        self.assertEqual([], os.listdir(PLACE))
        self.assertTrue(os.path.exists("/etc/passwd"))

    def test_what_cannot_be_removed_is_told_and_the_rest_goes(self):
        os.makedirs(f"{PLACE}/full/in")
        files.write(f"{PLACE}/file")
        files.give_tree("alice", PLACE)
        paths = [f"{PLACE}/full", f"{PLACE}/file", f"{PLACE}/none", HOME, "/etc/passwd", "x"]
        errors = self.refused(407, "delete", paths=paths)
        self.assertEqual([407, None, 403, 409, 402, 401], [row.get("error") for row in errors["results"]])
        self.assertEqual(["full"], os.listdir(PLACE))

    def test_a_tree_of_twenty_thousand_goes_in_the_background(self):
        fill(f"{PLACE}/tree")
        files.write(f"{PLACE}/stays")
        os.symlink("/etc", f"{PLACE}/tree/0/link")
        data = self.removed(f"{PLACE}/tree")
        self.assertEqual({"files": 20001, "folders": 21, "failed": 0, "failures": [], "done": True}, data)
        self.assertEqual(["stays"], os.listdir(PLACE))
        self.assertTrue(os.path.exists("/etc/passwd"))

    def test_it_is_seen_how_far_a_removal_is_and_it_can_be_stopped(self):
        fill(f"{PLACE}/tree", folders=40)
        task = self.data("delete", paths=[f"{PLACE}/tree"], recursive=True)["task_id"]
        process, = device.hosts_running()
        os.kill(process, signal.SIGSTOP)
        status = self.alice.call(files.TASK, "status", task_id=webclient.quoted(task)).json()["data"]
        self.assertEqual((False, False), (status["finish"], status["data"]["done"]))
        self.assertEqual({"files", "folders", "failed", "failures", "done"}, set(status["data"]))
        self.assertEqual(503, self.admin.call(files.TASK, "stop", task_id=webclient.quoted(task)).code())
        self.assertEqual(0, self.alice.call(files.TASK, "stop", task_id=webclient.quoted(task)).code())
        os.kill(process, signal.SIGCONT)
        device.wait_for(lambda: not device.hosts_running(), "the end of the task's process")
        state = self.alice.call(files.TASK, "status", task_id=webclient.quoted(task)).json()["data"]
        self.assertEqual((True, False), (state["finish"], state["data"]["done"]))
        self.assertTrue(os.path.isdir(f"{PLACE}/tree"))

    def test_a_removal_reports_how_many_are_gone(self):
        fill(f"{PLACE}/tree", folders=40)
        task = self.data("delete", paths=[f"{PLACE}/tree"], recursive=True)["task_id"]
        seen = set()

        def ended():
            state = self.alice.call(files.TASK, "status", task_id=webclient.quoted(task)).json()["data"]
            seen.add(state["data"]["files"])
            return state["finish"]

        device.wait_for(ended, "the end of the removal")
        self.assertIn(40000, seen)

    def test_several_trees_and_files_go_in_one_task(self):
        fill(f"{PLACE}/a", 2, 3)
        fill(f"{PLACE}/b", 1, 1)
        files.write(f"{PLACE}/c")
        data = self.removed(f"{PLACE}/a", f"{PLACE}/b", f"{PLACE}/c")
        self.assertEqual((8, 5, 0), (data["files"], data["folders"], data["failed"]))
        self.assertEqual([], os.listdir(PLACE))

    def test_nothing_is_started_where_a_path_leads_nowhere(self):
        files.write(f"{PLACE}/file")
        for path, code in ((f"{PLACE}/none", 403), ("/etc", 402), (HOME, 409), (f"{PLACE}/..", 401)):
            errors = self.refused(code, "delete", paths=[f"{PLACE}/file", path], recursive=True)
            self.assertEqual([None, code], [row.get("error") for row in errors["results"]])
        self.assertEqual(["file"], os.listdir(PLACE))

    def test_what_the_user_may_not_remove_stays_and_is_told(self):
        fill(f"{PLACE}/tree", 2, 2)
        os.chown(f"{PLACE}/tree/0", 0, 0)
        os.chmod(f"{PLACE}/tree/0", 0o755)
        data = self.removed(f"{PLACE}/tree")
        self.assertEqual((2, 1, 2), (data["files"], data["folders"], data["failed"]))
        self.assertEqual({(f"{PLACE}/tree/0/0", 404), (f"{PLACE}/tree/0/1", 404)},
                         {(row["path"], row["error"]) for row in data["failures"]})
        self.assertEqual({b"0": None, b"0/0": b"", b"0/1": b""}, files.tree(f"{PLACE}/tree"))

    def test_what_is_mounted_in_a_tree_stays(self):
        os.makedirs(f"{PLACE}/tree/mounted")
        os.mkdir(f"{PLACE}/elsewhere")
        files.write(f"{PLACE}/elsewhere/file")
        files.give_tree("alice", PLACE)
        subprocess.run(["mount", "--bind", f"{PLACE}/elsewhere", f"{PLACE}/tree/mounted"], check=True)
        self.addCleanup(subprocess.run, ["umount", f"{PLACE}/tree/mounted"], check=True)
        data = self.removed(f"{PLACE}/tree")
        self.assertEqual([{"path": f"{PLACE}/tree/mounted", "error": 410}], data["failures"])
        self.assertEqual({b"file": b"content"}, files.tree(f"{PLACE}/elsewhere"))

    def test_a_folder_that_is_swapped_for_a_link_while_it_is_removed_leads_nowhere(self):
        victim = "/home/alice/victim"
        fill(victim, 1, 50)
        self.addCleanup(subprocess.run, ["rm", "-rf", victim], check=True)
        before = files.tree(victim)
        for _ in range(10):
            fill(f"{PLACE}/tree", 20, 20)
            os.symlink(victim, f"{PLACE}/link")
            stop = threading.Event()

            def swap():
                while not stop.is_set():
                    for number in range(20):
                        try:
                            os.rename(f"{PLACE}/tree/{number}", f"{PLACE}/aside")
                            os.rename(f"{PLACE}/link", f"{PLACE}/tree/{number}")
                            os.rename(f"{PLACE}/tree/{number}", f"{PLACE}/link")
                            os.rename(f"{PLACE}/aside", f"{PLACE}/tree/{number}")
                        except OSError:
                            continue

            thread = threading.Thread(target=swap)
            thread.start()
            try:
                self.removed(f"{PLACE}/tree")
            finally:
                stop.set()
                thread.join()
            self.assertEqual(before, files.tree(victim))
            subprocess.run(["rm", "-rf", f"{PLACE}/tree", f"{PLACE}/link", f"{PLACE}/aside"], check=True)

    def test_a_deep_tree_goes(self):
        folder = os.open(PLACE, os.O_RDONLY)
        for _ in range(400):
            os.mkdir("d", dir_fd=folder)
            inner = os.open("d", os.O_RDONLY, dir_fd=folder)
            os.close(folder)
            folder = inner
        os.close(folder)
        subprocess.run(["chown", "-R", "alice", PLACE], check=True)
        data = self.removed(f"{PLACE}/d")
        self.assertEqual((400, 0), (data["folders"], data["failed"]))

    def test_bad_parameters_are_named(self):
        for paths in ([], [7], None, {"a": 1}, [f"{PLACE}/x"] * 1001):
            self.assertEqual({"parameter": "paths"}, self.refused(101, "delete", paths=paths))
        for value in ("true", 1, None):
            self.assertEqual({"parameter": "recursive"},
                             self.refused(101, "delete", paths=[f"{PLACE}/x"], recursive=value))


if __name__ == "__main__":
    unittest.main()
