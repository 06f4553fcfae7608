"""Tasks of groups: who may start, see, list and stop them, and a task that dies before it has said anything."""

import os
import time
import unittest

import device
import probe
import webclient

TASK = "ZOVA.Core.Task"


class SharedTasks(probe.ProbeTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.alice = webclient.logged_in("alice")
        cls.admin = webclient.logged_in("admin")

    def setUp(self):
        super().setUp()
        self.addCleanup(device.remove_tasks)

    def start(self, client, group, **parameters):
        answer = client.call(probe.API, "start_task", group=webclient.quoted(group), **parameters).json()
        self.assertTrue(answer["success"], answer)
        task = answer["data"]["task_id"]
        self.addCleanup(client.call, TASK, "stop", task_id=webclient.quoted(task))
        return task

    @staticmethod
    def code(client, method, task):
        return client.call(TASK, method, task_id=webclient.quoted(task)).code()

    @staticmethod
    def listed(client, *groups):
        return client.call(TASK, "list", groups="[" + ",".join(webclient.quoted(group) for group in groups) + "]").json()

    def is_finished(self, client, task):
        return client.call(TASK, "status", task_id=webclient.quoted(task)).json()["data"]["finish"]

    def test_a_task_of_the_administrators_is_seen_and_stopped_by_them_alone(self):
        task = self.start(self.admin, "admin", stays="true")
        self.assertRegex(task, r"\A@administrators/probe-[0-9a-f]{32}\Z")
        self.assertEqual([503, 503], [self.code(self.alice, method, task) for method in ("status", "stop")])
        self.assertEqual(505, self.listed(self.alice, "user", "admin")["error"]["code"])
        both = self.alice.call(TASK, "status", task_id="[" + webclient.quoted(task) + "]").json()
        self.assertEqual({}, both["data"])
        self.assertEqual({"user": None, "everyone": None}, self.listed(self.alice, "user", "everyone")["data"])
        self.assertEqual({"admin": [task], "user": None}, self.listed(self.admin, "admin", "user")["data"])
        self.assertFalse(self.is_finished(self.admin, task))
        self.assertEqual(0, self.code(self.admin, "stop", task))
        self.assertTrue(self.is_finished(self.admin, task))

    def test_a_task_of_everyone_is_seen_and_stopped_by_all_who_are_logged_in(self):
        task = self.start(self.alice, "everyone", stays="true")
        self.assertTrue(task.startswith("@users/"))
        self.assertEqual({"everyone": [task]}, self.listed(self.admin, "everyone")["data"])
        stranger = webclient.Client()
        self.assertEqual([119, 119], [self.code(stranger, method, task) for method in ("status", "stop")])
        self.assertFalse(self.is_finished(self.alice, task))
        self.assertEqual(0, self.code(self.admin, "stop", task))
        self.assertTrue(self.is_finished(self.alice, task))

    def test_what_others_may_not_start_leaves_no_record(self):
        rows = {"admin": 505, "Admin": 502, "@administrators": 502, "user": 502}
        for group, code in rows.items():
            with self.subTest(group):
                answer = self.alice.call(probe.API, "start_task", group=webclient.quoted(group))
                self.assertEqual(code, answer.code())
        self.assertEqual([], os.listdir(device.TASKS))

    def test_a_task_that_dies_before_its_first_report_is_not_waited_for(self):
        begin = time.monotonic()
        task = self.start(self.alice, "", dies="true")
        # One that lives on without a word is given a minute.
        self.assertLess(time.monotonic() - begin, 20)
        state = self.alice.call(TASK, "status", task_id=webclient.quoted(task)).json()["data"]
        self.assertEqual({"finish", "auto_remove", "info"}, set(state))
        self.assertFalse(state["finish"])
        self.assertEqual(0, self.code(self.alice, "stop", task))
        self.assertTrue(self.is_finished(self.alice, task))


if __name__ == "__main__":
    unittest.main()
