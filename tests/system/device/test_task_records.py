"""Records of tasks that were damaged, replaced or forged: each counts as none, and costs no other task anything."""

import json
import os
import pwd
import re
import subprocess
import unittest

import device
import probe
import webclient

TASK = "ZOVA.Core.Task"


def path_of(task):
    owner, _, number = task.partition("/")
    return f"{device.TASKS}/{owner.encode().hex()}.{number}"


class TaskRecords(probe.ProbeTestCase):
    """Around one real task of alice's, finished and kept. The others are copies of its record."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.addClassCleanup(device.remove_tasks)
        device.remove_tasks()
        cls.alice = webclient.logged_in("alice")
        cls.admin = webclient.logged_in("admin")
        cls.real = cls.alice.call(probe.API, "start_task").json()["data"]["task_id"]
        device.wait_for(lambda: cls.call("status", cls.real).json()["data"]["finish"], "the end of the task")
        with open(path_of(cls.real), encoding="utf-8") as file:
            cls.record = json.load(file)

    def setUp(self):
        super().setUp()
        self.addCleanup(self.remove_all_but_the_real_one)

    @classmethod
    def remove_all_but_the_real_one(cls):
        device.remove_tasks(but=path_of(cls.real))

    @classmethod
    def call(cls, method, task, client=None):
        return (client or cls.alice).call(TASK, method, task_id=webclient.quoted(task))

    def make(self, task, user="alice", text=None, **changes):
        """A record as a process of the user would have made it."""
        owner, _, number = task.partition("/")
        if text is None:
            text = json.dumps({**self.record, "owner": owner, "id": number, **changes})
        with open(path_of(task), "x", encoding="utf-8") as file:
            file.write(text)
        os.chmod(path_of(task), 0o600)
        os.chown(path_of(task), pwd.getpwnam(user).pw_uid, -1)
        return path_of(task)

    def listed(self, client=None, group="user"):
        return (client or self.alice).call(TASK, "list", groups=f'["{group}"]').json()["data"][group]

    def state_of_folder(self):
        state = {}
        for name in os.listdir(device.TASKS):
            found = os.lstat(f"{device.TASKS}/{name}")
            state[name] = (found.st_ino, found.st_mode, found.st_uid, found.st_size, found.st_mtime_ns)
        return state

    def damage(self):
        """One record for each way in which a file can be none. Returns the task ids."""
        whole = json.dumps({**self.record, "id": "whole"})
        texts = {"emptied": "", "cut": whole[:-1], "half": whole[:len(whole) // 2], "doubled": whole * 2,
                 "of-another": whole, "nul": whole + "\0", "no-json": "\x01\x02", "deep": "[" * 100000}
        for name, text in texts.items():
            self.make(f"alice/{name}", text=text)
        members = {"format-2": {"format": 2}, "pid-text": {"pid": "1"}, "pid-negative": {"pid": -1},
                   "properties-null": {"properties": None}, "one-more": {"more": 1}, "owner-other": {"owner": "admin"},
                   "owner-number": {"owner": 7}, "finished-number": {"finished": 1}}
        for name, changes in members.items():
            self.make(f"alice/{name}", **changes)
        os.truncate(self.make("alice/huge"), 16 * 1024 * 1024)
        os.chmod(self.make("alice/readable"), 0o644)
        os.chmod(self.make("alice/writable"), 0o620)
        self.make("alice/of-nobody", user="nobody")
        self.make("alice/of-admin", user="admin")
        os.link(self.make("alice/linked"), path_of("alice/link"))
        self.make("alice/whole")
        # To a good record of just that name.
        os.rename(self.make("alice/symlink"), device.TASKS + "/target")
        os.symlink(device.TASKS + "/target", path_of("alice/symlink"))
        os.symlink("/etc/shadow", path_of("alice/symlink-out"))
        os.symlink(path_of("alice/loop"), path_of("alice/loop"))
        os.mkdir(path_of("alice/folder"), 0o700)
        os.mkfifo(path_of("alice/fifo"), 0o600)
        for name in ("folder", "fifo"):
            os.chown(path_of(f"alice/{name}"), pwd.getpwnam("alice").pw_uid, -1)
        return [f"alice/{name}" for name in (
            *texts, *members, "huge", "readable", "writable", "of-nobody", "of-admin", "linked", "link", "symlink",
            "symlink-out", "loop", "folder", "fifo")]

    def test_a_damaged_record_is_no_task_and_costs_the_others_nothing(self):
        damaged = self.damage()
        before = self.state_of_folder()
        log = device.SystemLog()
        for task in damaged:
            with self.subTest(task):
                self.assertEqual([508, 508], [self.call(method, task).code() for method in ("status", "stop")])
        asked = self.alice.call(TASK, "status", post=True, task_id=json.dumps([*damaged, "alice/whole"])).json()["data"]
        self.assertTrue(asked.pop("alice/whole")["finish"])
        self.assertEqual({task: {} for task in damaged}, asked)
        self.assertEqual(sorted(["alice/whole", self.real]), self.listed())
        self.assertEqual(before, self.state_of_folder())
        log.wait_for("task record symlink-out of alice cannot be used")
        self.assertEqual(0, self.call("stop", "alice/whole").code())

    def test_a_record_that_its_owner_closed_to_himself_is_still_one_for_root(self):
        os.chmod(self.make("alice/closed", finished=False), 0)
        self.assertFalse(self.call("status", "alice/closed").json()["data"]["finish"])
        self.assertEqual(0, self.call("stop", "alice/closed").code())
        self.assertTrue(self.call("status", "alice/closed").json()["data"]["finish"])

    def test_a_user_cannot_forge_tasks_of_the_administrators_or_of_another_user(self):
        for owner, group in (("@administrators", "admin"), ("admin", "user")):
            with self.subTest(owner):
                self.make(f"{owner}/forged")
                self.assertEqual(508, self.call("status", f"{owner}/forged", self.admin).code())
                self.assertEqual(508, self.call("stop", f"{owner}/forged", self.admin).code())
                self.assertIsNone(self.listed(self.admin, group))

    def test_a_forged_record_aims_no_signal_at_a_process_of_root(self):
        with subprocess.Popen(["sleep", "600"]) as process:
            try:
                aimed = {"finished": False, "pid": process.pid,
                         "process_start": int(device.process_fields(process.pid)[19])}
                self.make("alice/aimed", **aimed)
                self.assertEqual(0, self.call("stop", "alice/aimed").code())
                self.assertTrue(self.call("status", "alice/aimed").json()["data"]["finish"])
                self.assertIsNone(process.poll())
                # The same record in root's hands counts.
                self.make("alice/of-root", user="root", **aimed)
                self.assertEqual(0, self.call("stop", "alice/of-root").code())
                device.wait_for(lambda: process.poll() is not None, "the end of the process")
            finally:
                process.kill()

    def test_no_id_forges_a_line_in_the_log(self):
        log = device.SystemLog()
        forged = "Jan  1 00:00:00 kern.emerg kernel: forged"
        ids = [f"alice/x\n{forged} {number}" + end for number, end in enumerate(("", "\r\n", "\0", "\x1b[2J", "%s%n"))]
        ids += [f"alice\n{forged} owner/x", f"{forged} alone\nx"]
        for task in ids:
            with self.subTest(task):
                self.assertIn(self.call("status", task).code(), (503, 508))
                self.assertIn(self.call("stop", task).code(), (502, 503, 508))
        self.call("status", "alice/the-end")
        log.wait_for("alice/the-end")
        # The framework's own doing, whatever else the log's service would pass on.
        named = [f"task id[{re.sub('[^ -~]', '?', task)}]" for task in ids]
        lines = [line for line in log.lines() if "forged" in line]
        for line in lines:
            self.assertRegex(line, r"APIPolling:\d+ (No such|Invalid) task id\[")
            self.assertTrue(line.endswith(tuple(named)), line)
        for name in named:
            self.assertTrue(any(name in line for line in lines), name)


if __name__ == "__main__":
    unittest.main()
