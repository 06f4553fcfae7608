"""The API daemon and the fast API service: what they serve, whom they refuse, and how they start and end."""

import json
import os
import signal
import socket
import stat
import subprocess
import sys
import threading
import time
import unittest

import daemon
import device
import host
import probe

API = "ZOVA.Test.Probe.Daemon"
SOCKET = "/run/probe-zovaapid.sock"
FAST_SOCKET = "/run/zovascgi-fastapi.sock"
FOLDER = "/tmp/daemon-tests"

# Connects as whoever runs it, sends a text and says what comes back.
VISITOR = """
import socket, sys
visitor = socket.socket(socket.AF_UNIX)
visitor.settimeout(60)
try:
    visitor.connect(sys.argv[1])
    text = sys.argv[2].encode()
    visitor.sendall(len(text).to_bytes(8, "little") + text)
    answer = b""
    while part := visitor.recv(1 << 16):
        answer += part
    print("dropped" if not answer else answer[8:].decode())
except PermissionError:
    print("no access")
except (BrokenPipeError, ConnectionResetError):
    print("dropped")
"""


def visit(path, value, **identity):
    return subprocess.run([sys.executable, "-c", VISITOR, path, json.dumps(value)], capture_output=True, text=True,
                          check=True, timeout=device.TIME_LIMIT, **identity).stdout.strip()


def message(method, **parameters):
    """A call as the front end forwards it."""
    call = {"api": API, "version": 1, "method": method}
    sections = {name: {} for name in ("environ", "cookie", "reqLib", "session", "attr", "url", "userAgent")}
    return {"req": {**sections, "param": {**call, **parameters}, "private": call}, "resp": {}}


class DaemonCase(probe.ProbeTestCase):
    def setUp(self):
        super().setUp()
        os.makedirs(FOLDER, exist_ok=True)
        self.addCleanup(subprocess.run, ["rm", "-rf", FOLDER], check=True)
        self.log = daemon.Log()

    def start(self, program, path, *options, **more):
        service = daemon.Service(program, path, *options, **more)
        self.addCleanup(service.end)
        return service

    def in_background(self, function):
        """Runs the function beside the test; what it returns is in the list at the end."""
        results = []
        thread = threading.Thread(target=lambda: results.append(function()))
        thread.start()
        self.addCleanup(thread.join)
        return thread, results

    def hold(self, call):
        """A call that has begun and goes on until `release`."""
        begun, self.go = FOLDER + "/begun", FOLDER + "/go"
        thread, results = self.in_background(lambda: call(begun, self.go))
        self.addCleanup(self.release)
        daemon.wait_until(lambda: os.path.exists(begun), "the call has begun")
        return thread, results

    def release(self):
        os.makedirs(FOLDER, exist_ok=True)
        with open(self.go, "w", encoding="ascii"):
            pass


class ApiDaemon(DaemonCase):
    def setUp(self):
        super().setUp()
        self.service = self.start("zovaapid", SOCKET, "--children", "2")

    def call(self, method, **parameters):
        query = "&".join([f"api={API}&version=1&method={method}", *(f"{key}={parameters[key]}" for key in parameters)])
        return json.loads(host.get(query).parts()[1])

    def assert_serves(self):
        answer = self.call("place")
        self.assertTrue(answer["success"], answer)
        self.assertTrue(answer["data"]["in_daemon"])

    def assert_internal(self, answer):
        self.assertEqual({"success": False, "error": {"code": 117}}, answer)

    def test_a_call_is_run_by_a_child_of_the_daemon(self):
        places = [self.call("place")["data"] for _ in range(2)]
        for place in places:
            self.assertTrue(place["in_daemon"])
            self.assertEqual(self.service.process.pid, place["parent"])
            self.assertEqual("/dev/null /dev/null", place["streams"])
            self.assertEqual([0, 0, 0], place["user"])
        self.assertNotEqual(places[0]["process"], places[1]["process"])

    def test_a_method_takes_its_identity_there_and_leaves_the_next_call_alone(self):
        place = self.call("as_nobody")["data"]
        self.assertTrue(place["in_daemon"])
        self.assertEqual([65534] * 3, place["user"])
        self.assertEqual([0, 0, 0], self.call("place")["data"]["user"])

    def test_a_method_that_is_kept_from_the_socket_runs_in_the_front_end(self):
        self.assertFalse(self.call("kept")["data"]["in_daemon"])

    def test_a_large_answer_arrives_whole(self):
        answer = self.call("large")
        self.assertTrue(answer["success"], answer)
        self.assertTrue(answer["data"] == "x" * 300000)

    def test_without_the_socket_the_library_serves_and_the_log_says_so(self):
        self.assertEqual((0, ""), self.service.end())
        self.assertFalse(os.path.exists(SOCKET))
        place = self.call("place")["data"]
        self.assertFalse(place["in_daemon"])
        self.log.wait_for(f"socket is not ready: {SOCKET}")

    def test_a_socket_that_a_dead_daemon_left_answers_117_and_the_next_daemon_takes_it(self):
        self.service.process.kill()
        self.service.process.wait()
        daemon.wait_until(lambda: not self.service.listens(), "the waiting children have ended too")
        self.assert_internal(self.call("place"))
        self.log.wait_for(f"Failed to connect domain socket: {SOCKET}")
        self.service = self.start("zovaapid", SOCKET)
        self.assert_serves()

    def test_a_daemon_beside_a_running_one_is_refused_and_leaves_its_socket(self):
        second = subprocess.run(["/usr/sbin/zovaapid", "--socket", SOCKET], capture_output=True, text=True,
                                timeout=device.TIME_LIMIT, check=False)
        self.assertEqual(1, second.returncode)
        self.assertIn("zovaapid: another service holds", second.stderr)
        self.assert_serves()

    def test_a_call_whose_child_dies_answers_117_and_no_other_does(self):
        thread, held = self.hold(lambda begun, go: self.call("hold", begun=begun, go=go))
        for _ in range(3):
            self.assert_internal(self.call("dies"))
            self.log.wait_for("Failed to recv data from socket")
            self.assert_serves()
        self.log.wait_for("ended by signal 9 while it served")
        self.release()
        thread.join()
        self.assertEqual([{"success": True, "data": "held"}], held)

    def test_on_sigterm_a_running_call_finishes_and_answers(self):
        thread, held = self.hold(lambda begun, go: self.call("hold", begun=begun, go=go))
        self.service.process.send_signal(signal.SIGTERM)
        daemon.wait_until(lambda: not os.path.exists(SOCKET), "the socket is gone")
        daemon.wait_until(lambda: len(self.service.children()) == 1, "the waiting children have ended")
        self.release()
        thread.join()
        self.assertEqual([{"success": True, "data": "held"}], held)
        self.assertEqual((0, ""), self.service.end())

    def test_a_call_above_the_time_limit_is_ended_with_117(self):
        self.service.end()
        self.service = self.start("zovaapid", SOCKET, "--time-limit", "1")
        self.assert_internal(self.call("hold", begun=FOLDER + "/begun", go=FOLDER + "/go"))
        self.log.wait_for("it served for longer than its time limit")
        self.assert_serves()

    def test_a_bad_message_is_dropped_with_one_line_and_the_daemon_serves_on(self):
        good = json.dumps(message("place")).encode()
        rows = {
            "no JSON": b"text", "empty": b"", "NUL bytes": b"\0\0", "not UTF-8": b'{"req":"\xff',
            "null": b"null", "array": b"[]", "text": b'"req"', "number": b"5",
            "without a request": b'{"resp":{}}', "without a response": b'{"req":{}}',
            "request of other type": b'{"req":"x","resp":{}}', "response of other type": b'{"req":{},"resp":[]}',
            "cut short": good[:-1], "too deep": b'{"req":' + b"[" * 300 + b"]" * 300 + b',"resp":{}}',
        }
        for name, text in rows.items():
            with self.subTest(name):
                log = daemon.Log()
                self.assertIsNone(daemon.ask(SOCKET, text))
                self.assertEqual(1, len(log.wait_for("is no object with")))
        self.assert_serves()

    def test_sections_of_any_type_in_a_request_cost_that_call_alone(self):
        for section in (None, [], "x", 5, True, {"api": []}, {"api": API, "method": 1, "version": "x"}):
            request = {name: section for name in ("environ", "cookie", "reqLib", "session", "param", "attr", "url",
                                                  "userAgent", "private")}
            with self.subTest(section):
                for response in ({}, {name: section for name in ("body", "headers", "cookies", "error", "status")}):
                    answer = daemon.ask_json(SOCKET, {"req": request, "resp": response})
                    self.assertIsInstance(answer, dict)
        self.assertNotIn("ended by signal", "\n".join(self.log.lines()))
        self.assert_serves()

    def test_a_broken_frame_is_dropped_with_one_line_and_the_daemon_serves_on(self):
        rows = {
            "1 GB announced": (1 << 30).to_bytes(8, "little") + b"x" * 1000,
            "just above the limit": ((64 << 20) + 1).to_bytes(8, "little"),
            "all bits": b"\xff" * 8,
        }
        for name, data in rows.items():
            with self.subTest(name):
                log = daemon.Log()
                with daemon.Connection(SOCKET) as connection:
                    connection.send(data)
                    self.assertEqual(b"", connection.receive())
                self.assertEqual(1, len(log.wait_for("no whole message came from process")))
        for name, data in {"length cut short": b"\5\0\0", "text cut short": daemon.framed(b"text")[:-1]}.items():
            with self.subTest(name):
                log = daemon.Log()
                with daemon.Connection(SOCKET) as connection:
                    connection.send(data)
                    connection.socket.shutdown(socket.SHUT_WR)
                    self.assertEqual(b"", connection.receive())
                self.assertEqual(1, len(log.wait_for("no whole message came from process")))
        self.assert_serves()

    def test_connections_that_are_held_open_keep_nobody_from_being_served(self):
        half = [daemon.Connection(SOCKET) for _ in range(10)]
        silent = [daemon.Connection(SOCKET) for _ in range(10)]
        try:
            for connection in half:
                connection.send(daemon.framed(b"a message")[:-1])
            begin = time.monotonic()
            for _ in range(5):
                self.assert_serves()
            self.assertLess(time.monotonic() - begin, 10)
            for connection in silent:
                self.assertEqual(b"", connection.receive())
            self.log.wait_for("sent nothing in 10 s")
            self.assertGreater(time.monotonic() - begin, 9)
        finally:
            for connection in half + silent:
                connection.socket.close()

    def test_a_peer_that_says_nothing_and_goes_is_not_worth_a_line(self):
        for _ in range(5):
            daemon.Connection(SOCKET).socket.close()
        self.assert_serves()
        self.assertEqual([], [line for line in self.log.lines() if " zovaapid[" in line])

    def test_a_peer_that_goes_before_the_answer_costs_nobody_anything(self):
        with daemon.Connection(SOCKET) as connection:
            connection.send(daemon.framed(json.dumps(message("large")).encode()))
        self.assert_serves()

    def test_nobody_but_root_is_served(self):
        self.assertEqual(0o600, stat.S_IMODE(os.stat(SOCKET).st_mode))
        call = message("place")
        self.assertEqual("no access", visit(SOCKET, call, user="alice", group="alice", extra_groups=[]))
        os.chmod(SOCKET, 0o666)
        self.assertEqual("dropped", visit(SOCKET, call, user="alice", group="root", extra_groups=["administrators"]))
        self.assertEqual(1, len(self.log.wait_for("is not allowed to call")))
        self.assertTrue(json.loads(visit(SOCKET, call))["body"]["success"])

    def test_after_many_calls_no_zombie_and_no_descriptor_is_left(self):
        daemon.wait_until(lambda: len(self.service.children()) == 2, "the children wait")
        before = self.service.descriptors()
        for _ in range(200):
            answer = daemon.ask_json(SOCKET, message("place"))
            self.assertTrue(answer["body"]["success"], answer)
        daemon.wait_until(lambda: sorted(self.service.children().values()) == ["S", "S"], "two children wait again")
        self.assertEqual(before, self.service.descriptors())

    def test_the_parent_opens_no_library_of_a_package(self):
        self.assert_serves()
        with open(f"/proc/{self.service.process.pid}/maps", encoding="utf-8") as maps:
            self.assertNotIn("/usr/lib/zova/webapi/", maps.read())


class Starting(DaemonCase):
    def test_a_socket_that_a_manager_hands_over_is_served_and_stays_the_managers(self):
        path = FOLDER + "/activated"
        with socket.socket(socket.AF_UNIX) as listening:
            listening.bind(path)
            listening.listen()
            number = listening.fileno()
            command = f"exec 3<&{number}; LISTEN_PID=$$ LISTEN_FDS=1 exec /usr/sbin/zovaapid"
            service = self.start("zovaapid", path, command=["/bin/bash", "-c", command], pass_fds=(number,))
            self.assertTrue(daemon.ask_json(path, message("place"))["body"]["data"]["in_daemon"])
            self.assertEqual((0, ""), service.end())
            self.assertTrue(os.path.exists(path))
            with daemon.Connection(path):
                listening.accept()[0].close()

    def test_what_is_no_listening_socket_is_not_taken_over(self):
        command = "exec 3</dev/null; LISTEN_PID=$$ LISTEN_FDS=1 exec /usr/sbin/zovaapid"
        process = subprocess.run(["/bin/bash", "-c", command], capture_output=True, text=True, check=False,
                                 timeout=device.TIME_LIMIT)
        self.assertEqual((1, ""), (process.returncode, process.stdout))
        self.assertIn("no stream socket that listens", process.stderr)

    def test_what_cannot_start_says_why(self):
        regular = FOLDER + "/regular"
        with open(regular, "w", encoding="ascii") as file:
            file.write("content")
        rows = {("--socket", regular): (1, "is there and no socket"), ("--socket", "relative"): (1, "is no path"),
                ("--socket", "/" + "x" * 108): (1, "is no path"), ("--socket", "/no/such/folder"): (1, "cannot open"),
                (): (1, "--socket is missing"), ("--socket",): (2, "needs a value"), ("--unknown",): (2, "not known"),
                ("word",): (2, "not known"), ("--children", "0"): (2, "no value for --children"),
                ("--group", "root"): (2, "not known")}
        for arguments, (status, text) in rows.items():
            with self.subTest(arguments):
                process = subprocess.run(["/usr/sbin/zovaapid", *arguments], capture_output=True, text=True,
                                         check=False, timeout=device.TIME_LIMIT)
                self.assertEqual((status, ""), (process.returncode, process.stdout))
                self.assertIn(text, process.stderr)
        with open(regular, encoding="ascii") as file:
            self.assertEqual("content", file.read())

    def test_help_is_no_error(self):
        for program in ("zovaapid", "zovascgi-fastapi"):
            process = subprocess.run([f"/usr/sbin/{program}", "--help"], capture_output=True, text=True, check=True)
            self.assertTrue(process.stdout.startswith(f"Usage: {program} "))

    def test_the_devices_own_services_listen_for_root_alone(self):
        for path in ("/run/zovaapid.sock", FAST_SOCKET):
            state = os.stat(path)
            self.assertEqual((0, 0, stat.S_IFSOCK | 0o600), (state.st_uid, state.st_gid, state.st_mode))


class FastApi(DaemonCase):
    @staticmethod
    def description(method, user, **params):
        return {"params": {"api": API, "version": 1, "method": method, **params}, "runner": {"username": user}}

    def ask(self, description):
        return daemon.ask_json(FAST_SOCKET, description)

    def test_a_call_runs_in_the_name_of_the_stated_user(self):
        for user, admin in (("alice", False), ("admin", True)):
            answer = self.ask(self.description("place", user))
            self.assertEqual({"success", "data"}, set(answer))
            place = answer["data"]
            self.assertEqual((user, admin, True), (place["login"], place["admin"], place["authorized"]))
            self.assertFalse(place["in_daemon"])
            self.assertEqual("/dev/null /dev/null", place["streams"])

    def test_a_method_that_gives_its_identity_up_for_good_answers_too(self):
        self.assertEqual([65534] * 3, self.ask(self.description("as_nobody", "alice"))["data"]["user"])

    def test_a_large_answer_arrives_whole(self):
        answer = self.ask(self.description("large", "alice"))
        self.assertTrue(answer["success"], answer)
        self.assertTrue(answer["data"] == "x" * 300000)

    def test_without_api_method_or_runner_the_answer_is_101(self):
        whole = self.description("place", "alice")
        bad = {"success": False, "error": {"code": 101}}
        rows = [{}, {"params": whole["params"]}, {"runner": whole["runner"]},
                {**whole, "runner": {"username": ""}}, {**whole, "runner": "alice"}, {**whole, "runner": {"uid": 1}},
                {**whole, "params": {"version": 1, "method": "place"}}, {**whole, "params": {"api": API, "version": 1}},
                {**whole, "params": [API]}]
        for row in rows:
            with self.subTest(row):
                self.assertEqual(bad, self.ask(row))

    def test_what_is_no_run_description_is_dropped_with_one_line_and_the_service_serves_on(self):
        for text in (b"", b"no JSON", b"null", b"[]", b"5", b'"text"', b'{"params":', b"\0\0", b"[" * 300):
            with self.subTest(text):
                log = daemon.Log()
                self.assertIsNone(daemon.ask(FAST_SOCKET, text))
                self.assertEqual(1, len(log.wait_for("is no run description")))
        self.assertTrue(self.ask(self.description("place", "alice"))["success"])

    def test_what_is_not_there_answers_as_for_a_client(self):
        rows = {102: {"api": "ZOVA.Nobody.Knows"}, 103: {"method": "unknown"}, 104: {"version": 7},
                101: {"version": 0}}
        for code, change in rows.items():
            description = self.description("place", "alice")
            description["params"].update(change)
            self.assertEqual({"success": False, "error": {"code": code}}, self.ask(description))

    def test_a_descriptor_named_for_the_output_is_not_looked_at(self):
        self.assertTrue(self.ask({**self.description("place", "alice"), "output": {"fd": 5}})["success"])

    def test_a_call_whose_child_dies_has_no_answer_and_the_next_one_has(self):
        self.assertIsNone(self.ask(self.description("dies", "alice")))
        self.assertTrue(self.ask(self.description("place", "alice"))["success"])

    def test_only_members_of_the_named_group_may_call_beside_root(self):
        path = "/run/probe-fast.sock"
        self.start("zovascgi-fastapi", path, "--group", "games")
        description = self.description("place", "admin")
        for groups in ({"group": "games", "extra_groups": []}, {"group": "alice", "extra_groups": ["users", "games"]}):
            answer = json.loads(visit(path, description, user="alice", **groups))
            self.assertEqual("admin", answer["data"]["login"])
        outside = {"user": "alice", "group": "alice", "extra_groups": ["users"]}
        self.assertEqual("no access", visit(path, description, **outside))
        os.chmod(path, 0o666)
        self.assertEqual("dropped", visit(path, description, **outside))
        self.log.wait_for("is not allowed to call")
        self.assertTrue(json.loads(visit(path, description))["success"])

    def test_an_unknown_group_is_refused(self):
        status, output = daemon.Service("zovascgi-fastapi", "/run/probe-fast.sock", "--group", "no-such-group").end()
        self.assertEqual((1, 'zovascgi-fastapi: there is no group "no-such-group"\n'), (status, output))


if __name__ == "__main__":
    unittest.main()
