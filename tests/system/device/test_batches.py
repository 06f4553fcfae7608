"""Batches of calls through the web server: order, failures, identities, time."""

import json
import os
import pwd
import time
import unittest

import device
import probe
import webclient


def entry(method, api=probe.API, version=1, **parameters):
    return {"api": api, "version": version, "method": method, **parameters}


def batches(depth):
    """A call inside this many batches of one entry each."""
    innermost = GET_USER
    for _ in range(depth):
        innermost = entry("request", "ZOVA.Entry.Request", compound=[innermost])
    return innermost


GET_USER = entry("get", "ZOVA.Core.User")
GET_INFO = entry("info", "ZOVA.Core.System")


class Batches(probe.ProbeTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.alice = webclient.logged_in("alice")

    def answer(self, entries, client=None, **parameters):
        return (client or self.alice).call("ZOVA.Entry.Request", "request", post=True, compound=json.dumps(entries),
                                           **parameters)

    def batch(self, entries, **parameters):
        """Data of a batch that went through, and whether it reports a failure."""
        answer = self.answer(entries, **parameters).json()
        self.assertTrue(answer["success"], answer)
        self.assertEqual({"has_fail", "result"}, set(answer["data"]))
        return answer["data"]["result"], answer["data"]["has_fail"]

    def test_three_calls_of_which_one_fails_answer_exactly_in_both_modes(self):
        uid = pwd.getpwnam("alice").pw_uid
        for mode in ("sequential", "parallel"):
            with self.subTest(mode):
                result, has_fail = self.batch([GET_USER, GET_INFO, entry("none", "ZOVA.Core.User")], mode=mode)
                self.assertTrue(has_fail)
                self.assertEqual(uid, result[0].pop("data")["uid"])
                self.assertEqual([{**GET_USER, "success": True},
                                  {**GET_INFO, "success": False, "error": {"code": 105}},
                                  {**entry("none", "ZOVA.Core.User"), "success": False, "error": {"code": 103}}], result)

    def test_stop_when_error_refuses_the_rest(self):
        result, has_fail = self.batch([GET_INFO, GET_USER], stop_when_error="true")
        self.assertTrue(has_fail)
        self.assertEqual([105, 112], [row["error"]["code"] for row in result])
        self.assertEqual("ZOVA.Core.User", result[1]["api"])

    def test_a_batch_inside_a_batch_answers_inside_it(self):
        inner = entry("request", "ZOVA.Entry.Request", compound=[GET_USER, entry("granted")])
        result, has_fail = self.batch([inner, GET_USER])
        self.assertFalse(has_fail)
        rows = result[0]["data"]["result"]
        self.assertEqual(["alice", "ZOVA.Test.Probe"], [rows[0]["data"]["name"], rows[1]["api"]])
        self.assertEqual("alice", result[1]["data"]["name"])

    def test_twenty_calls_of_half_a_second_take_about_that_time_in_parallel(self):
        start = time.monotonic()
        result, has_fail = self.batch([entry("wait")] * 20, mode="parallel")
        self.assertFalse(has_fail)
        self.assertEqual(20, len(result))
        # One after the other they take 10 seconds at the least, on any machine.
        self.assertLess(time.monotonic() - start, 5)

    def test_after_a_lasting_identity_the_next_entry_runs_under_the_batchs_own(self):
        nobody = pwd.getpwnam("nobody").pw_uid
        alice = pwd.getpwnam("alice").pw_uid
        result, has_fail = self.batch([entry("lasting"), entry("by_default"), entry("by_user_lasting"), entry("granted")])
        self.assertFalse(has_fail)
        self.assertEqual([[nobody] * 3, [0, 0, 0], [alice] * 3, [0, nobody, 0]], [row["data"]["user"] for row in result])

    def test_a_child_that_dies_leaves_the_other_answers(self):
        for mode, dead in (("sequential", None), ("parallel", entry("dies"))):
            with self.subTest(mode):
                result, has_fail = self.batch([GET_USER, entry("dies"), GET_USER], mode=mode)
                self.assertEqual(["alice", "alice"], [result[0]["data"]["name"], result[2]["data"]["name"]])
                self.assertEqual(dead, result[1])
                self.assertFalse(has_fail)

    def test_each_entry_passes_the_gate_of_its_own_api(self):
        stranger = webclient.Client()
        answer = self.answer([GET_USER, entry("get", "ZOVA.Core.Session"), entry("granted")], client=stranger)
        codes = [row.get("error", {}).get("code", 0) for row in answer.json()["data"]["result"]]
        self.assertEqual([119, 119, 0], codes)
        self.assertEqual(["unauth"], answer.values("x-request-error"))

    def test_entries_of_any_form_get_an_error_of_their_own(self):
        deep = []
        for _ in range(200):
            deep = [deep]
        odd = [7, None, "text", [], {}, deep, {"api": "../x", "version": 1, "method": "get"}, {"api": {}, "version": []}]
        for mode in ("sequential", "parallel"):
            with self.subTest(mode):
                result, has_fail = self.batch(odd + [GET_USER], mode=mode)
                self.assertTrue(has_fail)
                self.assertEqual([101] * 6 + [102, 101], [row["error"]["code"] for row in result[:-1]])
                self.assertEqual([True] * 6, [set(row) == {"success", "error"} for row in result[:6]])
                self.assertEqual("alice", result[-1]["data"]["name"])

    def test_what_is_no_list_of_calls_is_refused_as_a_whole(self):
        for text in ("7", '"text"', "{}", "null", "[" * 1000 + "]" * 1000):
            with self.subTest(text[:10]):
                self.assertEqual(110, self.alice.call("ZOVA.Entry.Request", "request", post=True, compound=text).code())
        self.assertEqual(110, self.alice.call("ZOVA.Entry.Request", "request", post=True).code())

    def test_batches_inside_batches_are_answered_to_the_depth_that_can_be_read(self):
        result, has_fail = self.batch([batches(127), GET_USER])
        self.assertFalse(has_fail)
        self.assertEqual("alice", result[1]["data"]["name"])
        row = result[0]
        for _ in range(127):
            row = row["data"]["result"][0]
        self.assertEqual("alice", row["data"]["name"])
        for depth in (128, 300):
            with self.subTest(depth):
                self.assertEqual(110, self.answer([batches(depth), GET_USER]).code())

    def test_an_answer_from_a_child_that_is_nested_too_deep_to_be_read_is_lost_alone(self):
        result, has_fail = self.batch([batches(127), GET_USER], mode="parallel")
        self.assertFalse(has_fail)
        self.assertEqual(entry("request", "ZOVA.Entry.Request"), result[0])
        self.assertEqual("alice", result[1]["data"]["name"])

    def test_one_entry_of_a_thousand_levels_refuses_the_batch(self):
        for deep in ("[" * 1000 + "]" * 1000, '{"a":' * 1000 + "1" + "}" * 1000):
            with self.subTest(deep[:5]):
                text = json.dumps([GET_USER])[:-1] + "," + deep + "]"
                self.assertEqual(110, self.alice.call("ZOVA.Entry.Request", "request", post=True, compound=text).code())

    def test_a_batch_that_names_the_one_around_it_gets_nothing_of_it(self):
        inner = [entry("request", "ZOVA.Entry.Request", **parameters) for parameters in (
            {}, {"compound": "compound"}, {"compound": {"$ref": "#"}}, {"compound": "[]"}, {"compound": 0},
            {"compound": None})]
        for mode in ("sequential", "parallel"):
            with self.subTest(mode):
                result, has_fail = self.batch([*inner, GET_USER], mode=mode)
                self.assertTrue(has_fail)
                self.assertEqual([110] * 6, [row["error"]["code"] for row in result[:6]])
                self.assertEqual("alice", result[6]["data"]["name"])

    def test_ten_thousand_entries_are_answered_one_by_one(self):
        # Of a method that gives its identity back, so that none of them costs a process.
        result, has_fail = self.batch([entry("without_row")] * 10000)
        self.assertTrue(has_fail)
        self.assertEqual({121}, {row["error"]["code"] for row in result})
        self.assertEqual(10000, len(result))

    def test_no_process_is_left_behind(self):
        self.batch([entry("wait"), entry("lasting"), entry("dies")] * 3, mode="parallel")
        limit = time.monotonic() + 10
        while device.hosts_running() and time.monotonic() < limit:
            os.sched_yield()
        self.assertEqual([], device.hosts_running())


if __name__ == "__main__":
    unittest.main()
