"""./serve --peers 2: two devices that know each other, in every way of starting and ending them."""

import pathlib
import signal
import socket
import stat
import subprocess
import tempfile
import unittest

from test_serve import (TIME_LIMIT, ServeCase, free_port, listens, mount_space, os, processes_with, wait_until)

LOGIN = ('curl -s -c /tmp/jar -d "api=ZOVA.Core.Session&version=1&method=login&account=alice"'
         ' --data-urlencode "passwd=\\"$WEBAPI_PASSWORD\\"" $WEBAPI_URL >/dev/null; ')


class PeersCase(ServeCase):
    def command(self, *arguments, device=None):
        return super().command("--peers", "2", *arguments, device=device)

    def assert_nothing_left(self):
        wait_until(lambda: not processes_with(str(self.device)), "no process is left")
        self.assertNotIn(self.device.name, pathlib.Path("/proc/self/mounts").read_text(encoding="utf-8"))
        for folder in ("exchange", "1/root", "1/system", "2/root", "2/system"):
            self.assertEqual([], list((self.device / folder).iterdir()), folder)


class Arguments(ServeCase):
    def test_help_names_both_options(self):
        help_text = self.run_serve("--help").stdout
        for option in ("--peers 2", "--peer-setup FILE", "WEBAPI_PEER_URL", "WEBAPI_PEER_PASSWORD"):
            self.assertIn(option, help_text)

    def test_bad_arguments_are_refused_before_anything_starts(self):
        for arguments in (["--peers"], ["--peers", "1"], ["--peers", "3"], ["--peers", "two"], ["--peers", ""],
                          ["--peers", "2", "--port", "65535"], ["--peer-setup", "/bin/true"], ["--peer-setup"],
                          ["--peers", "2", "--peer-setup", "/no/such/program"],
                          ["--peers", "2", "--peer-setup", "/etc/passwd"], ["--peers", "2", "--peer-setup", "/usr"]):
            with self.subTest(arguments):
                result = self.run_serve(*arguments)
                self.assertEqual((2, ""), (result.returncode, result.stdout))
                self.assertTrue(result.stderr.startswith("serve: "), result.stderr)
        self.assertFalse(self.device.exists())


class Exec(PeersCase):
    def test_the_command_runs_in_the_first_and_reaches_the_second(self):
        script = 'printf "%s\\n" "$WEBAPI_URL" "$WEBAPI_PEER_URL"; cat; curl -s $WEBAPI_PEER_URL; exit 7'
        result = subprocess.run(self.command("--exec", "sh", "-c", script), input="typed\n", capture_output=True,
                                text=True, timeout=TIME_LIMIT, check=False)
        self.assertEqual((["http://127.0.0.1:8080/webapi/front.cgi", "http://127.0.0.2:8080/webapi/front.cgi", "typed",
                           '{"error":{"code":101},"success":false}'], "", 7),
                         (result.stdout.splitlines(), result.stderr, result.returncode))
        self.assert_nothing_left()

    def test_each_keeps_accounts_and_a_password_and_a_key_of_its_own(self):
        script = 'echo "$WEBAPI_PASSWORD"; echo "$WEBAPI_PEER_PASSWORD"'
        first = self.run_serve("--exec", "sh", "-c", script).stdout
        self.assertEqual(2, len(set(first.splitlines())), first)
        keys = [(self.device / number / "certificate.pem").read_bytes() for number in "12"]
        self.assertNotEqual(keys[0], keys[1])
        self.assertEqual(first, self.run_serve("--exec", "sh", "-c", script).stdout)
        self.assertEqual(keys, [(self.device / number / "certificate.pem").read_bytes() for number in "12"])
        for number in "12":
            for name in (f"{number}/certificate.pem", f"{number}/password", f"{number}/upper/etc/zova/peers.json"):
                state = (self.device / name).stat()
                self.assertEqual((0, 0o600), (state.st_uid, stat.S_IMODE(state.st_mode)), name)

    def test_tokens_of_earlier_starts_are_revoked(self):
        for _ in range(2):
            listed = self.run_serve("--exec", "sh", "-c", LOGIN + (
                'curl -s -b /tmp/jar "$WEBAPI_URL?api=ZOVA.Core.Token&version=1&method=list"')).stdout
            self.assertEqual(1, listed.count('"label":"relay from device 2"'), listed)

    def test_calls_are_relayed_both_ways(self):
        relay = LOGIN + 'curl -s -b /tmp/jar "$WEBAPI_URL?api=ZOVA.Core.User&version=1&method=get&relay_zn=%s"'
        self.assertIn('"name":"alice"', self.run_serve("--exec", "sh", "-c", relay % 2).stdout)
        back = LOGIN.replace("$WEBAPI_PASSWORD", "$WEBAPI_PEER_PASSWORD").replace("$WEBAPI_URL", "$WEBAPI_PEER_URL")
        back += (relay % 1).removeprefix(LOGIN).replace("$WEBAPI_URL", "$WEBAPI_PEER_URL")
        self.assertIn('"name":"alice"', self.run_serve("--exec", "sh", "-c", back).stdout)

    def test_a_setup_that_fails_ends_both(self):
        result = self.run_serve("--peer-setup", "/bin/false", "--exec", "true")
        self.assertEqual(1, result.returncode)
        self.assertIn("the second device has ended", result.stderr)
        self.assert_nothing_left()


class Serve(PeersCase):
    def test_the_printed_lines_log_in_and_relay_when_they_are_pasted(self):
        _, printed = self.start(free_port())
        lines = [line.strip() for line in printed.splitlines() if line.startswith("    curl")]
        self.assertEqual(3, len(lines))
        with tempfile.TemporaryDirectory() as folder:
            answers = [subprocess.run(["bash", "-c", line], cwd=folder, capture_output=True, text=True,
                                      check=True).stdout for line in lines]
        for answer in answers:
            self.assertIn('"success":true', answer)

    def test_each_way_of_ending_leaves_no_process_and_no_mount(self):
        for number, status in ((signal.SIGINT, 130), (signal.SIGTERM, 143), (signal.SIGHUP, 129),
                               (signal.SIGKILL, -signal.SIGKILL)):
            with self.subTest(number.name):
                port = free_port()
                process, _ = self.start(port)
                spaces = {mount_space(inside) for inside in processes_with(str(self.device))}
                spaces -= {mount_space(process.pid)}
                self.assertEqual(3, len(spaces))
                process.send_signal(number)
                self.assertEqual(status, process.wait(TIME_LIMIT))
                wait_until(lambda: not spaces & {mount_space(entry) for entry in os.listdir("/proc") if entry.isdigit()},
                           "nobody is left in the devices' namespaces")
                self.assert_nothing_left()
                wait_until(lambda: not listens(port) and not listens(port + 1), "nobody listens on the ports")

    def test_a_port_in_use_is_an_error_and_leaves_nothing(self):
        with socket.socket() as taken:
            taken.bind(("127.0.0.2", 0))
            taken.listen()
            result = self.run_serve("--port", str(taken.getsockname()[1]))
        self.assertEqual(1, result.returncode)
        self.assertIn("Address already in use", result.stderr)
        self.assert_nothing_left()


if __name__ == "__main__":
    unittest.main()
