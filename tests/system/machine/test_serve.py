"""./serve as a user starts it on the machine: what it prints, how it ends, and that it leaves nothing behind."""

import os
import pathlib
import re
import secrets
import shutil
import signal
import socket
import stat
import subprocess
import tempfile
import time
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[3]
PRESET = os.environ["WEBAPI_PRESET"]
TIME_LIMIT = 120


def free_port():
    """A port that nobody listens on."""
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def listens(port):
    with socket.socket() as probe:
        return probe.connect_ex(("127.0.0.1", port)) == 0


def processes_with(mark):
    """The processes of the machine whose command line holds the mark."""
    found = []
    for entry in filter(str.isdigit, os.listdir("/proc")):
        try:
            command = pathlib.Path(f"/proc/{entry}/cmdline").read_bytes()
        except OSError:
            continue  # ended meanwhile
        if mark.encode() in command and int(entry) != os.getpid():
            found.append(int(entry))
    return found


def mount_space(process):
    """The mount namespace of a process, or None if it has ended."""
    try:
        return os.readlink(f"/proc/{process}/ns/mnt")
    except OSError:
        return None


def wait_until(condition, what):
    deadline = time.monotonic() + TIME_LIMIT
    while not condition():
        if time.monotonic() > deadline:
            raise AssertionError(f"waited in vain until {what}")
        os.sched_yield()


class ServeCase(unittest.TestCase):
    def setUp(self):
        # Beside the build, where the layer of a device can lie; the name marks its processes and mounts.
        self.device = PROJECT / "build" / f"device-{secrets.token_hex(8)}"
        self.addCleanup(shutil.rmtree, self.device, ignore_errors=True)

    def command(self, *arguments, device=None):
        return [str(PROJECT / "serve"), "--no-build", "--preset", PRESET, "--device", str(device or self.device),
                *arguments]

    def run_serve(self, *arguments, environment=None, **options):
        return subprocess.run(self.command(*arguments), capture_output=True, text=True, timeout=TIME_LIMIT,
                              stdin=options.pop("stdin", subprocess.DEVNULL), check=False,
                              env={**os.environ, **(environment or {})}, **options)

    def start(self, port, environment=None, device=None):
        """A running ./serve and what it printed, once it says that it can be stopped."""
        # A shell cannot catch a signal that it was started with as ignored, as under nohup or in a job of a script.
        command = ["env", "--default-signal=HUP,INT,TERM", *self.command("--port", str(port), device=device)]
        process = subprocess.Popen(command, stdout=subprocess.PIPE,
                                   stderr=subprocess.STDOUT, stdin=subprocess.DEVNULL, text=True,
                                   env={**os.environ, **(environment or {})})
        self.addCleanup(self.end, process)
        printed = ""
        for line in process.stdout:
            printed += line
            if line.startswith("Ctrl-C"):
                return process, printed
        raise AssertionError(f"serve ended with {process.wait()}: {printed}")

    @staticmethod
    def end(process):
        process.stdout.close()
        if process.poll() is None:
            process.kill()
            process.wait(TIME_LIMIT)

    def assert_nothing_left(self):
        wait_until(lambda: not processes_with(str(self.device)), "no process is left")
        self.assertNotIn(self.device.name, pathlib.Path("/proc/self/mounts").read_text(encoding="utf-8"))
        self.assertEqual([], list((self.device / "root").iterdir()))
        self.assertEqual([], list((self.device / "system").iterdir()))


class Arguments(ServeCase):
    def test_help_names_every_option(self):
        result = self.run_serve("--help")
        self.assertEqual((0, ""), (result.returncode, result.stderr))
        for option in ("--exec", "--shell", "--port", "--preset", "--device", "--no-build", "WEBAPI_PASSWORD"):
            self.assertIn(option, result.stdout)

    def test_bad_arguments_are_refused_before_anything_starts(self):
        for arguments in (["--port", "0"], ["--port", "65536"], ["--port", "99999999999999999999"], ["--port", "80x"],
                          ["--port", "-1"], ["--port", ""], ["--port"], ["--port", "010"], ["--exec"],
                          ["--preset", "x"], ["--preset", "../release"], ["--preset"], ["--device"], ["--unknown"],
                          ["word"]):
            with self.subTest(arguments):
                result = self.run_serve(*arguments)
                self.assertEqual((2, ""), (result.returncode, result.stdout))
                self.assertTrue(result.stderr.startswith("serve: "), result.stderr)
        self.assertFalse(self.device.exists())

    def test_a_password_that_no_client_could_send_is_refused(self):
        for password in ("", "a\nb", "a\x01", "a" * 129):
            with self.subTest(password):
                result = self.run_serve("--exec", "true", environment={"WEBAPI_PASSWORD": password})
                self.assertEqual(2, result.returncode)
                self.assertIn("WEBAPI_PASSWORD", result.stderr)


class Exec(ServeCase):
    def test_the_command_runs_as_root_with_its_arguments_input_and_environment_and_gives_its_status(self):
        script = 'id -u; pwd; printf "%s\\n" "$1" "$WEBAPI_URL"; cat; test -n "$WEBAPI_PASSWORD"; exit 7'
        result = subprocess.run(self.command("--exec", "sh", "-c", script, "sh", "two  words"), input="typed\n",
                                cwd=PROJECT / "docs", capture_output=True, text=True, timeout=TIME_LIMIT, check=False)
        lines = ["0", str(PROJECT / "docs"), "two  words", "http://127.0.0.1:8080/webapi/front.cgi", "typed"]
        self.assertEqual((lines, "", 7), (result.stdout.splitlines(), result.stderr, result.returncode))
        self.assert_nothing_left()

    def test_a_command_ended_by_a_signal_is_no_success(self):
        self.assertEqual(128 + signal.SIGKILL, self.run_serve("--exec", "sh", "-c", "kill -9 $$").returncode)

    def test_a_command_that_does_not_exist_is_no_success(self):
        self.assertEqual(127, self.run_serve("--exec", "no-such-command").returncode)

    def test_a_process_that_the_command_left_behind_ends_with_it(self):
        # Named after the device, so that it can be looked for among all processes of the machine.
        script = f"setsid bash -c 'exec -a {self.device} sleep 1000' </dev/null >/dev/null 2>&1 &"
        self.assertEqual(0, self.run_serve("--exec", "bash", "-c", script).returncode)
        self.assert_nothing_left()

    def test_a_working_directory_in_the_private_folders_is_visible_and_safe(self):
        with tempfile.TemporaryDirectory() as folder:
            pathlib.Path(folder, "seen").write_text("here", encoding="ascii")
            result = self.run_serve("--exec", "sh", "-c", "cat seen; echo x >seen", cwd=folder)
            self.assertEqual(("here", "here"),
                             (result.stdout, pathlib.Path(folder, "seen").read_text(encoding="ascii")))

    def test_nothing_that_the_command_writes_reaches_the_machine(self):
        name = f"written-{secrets.token_hex(8)}"
        folders = ("/etc", "/usr/bin", "/var/tmp", "/tmp", "/run", "/root")
        script = f"for folder in {' '.join(folders)}; do echo x >$folder/{name} || exit 1; done"
        result = self.run_serve("--exec", "sh", "-c", script)
        self.assertEqual((0, ""), (result.returncode, result.stderr))
        for folder in folders:
            self.assertFalse(pathlib.Path(folder, name).exists(), folder)

    def test_two_at_the_same_time_have_the_same_port_each_for_itself(self):
        other = PROJECT / "build" / f"{self.device.name}-other"
        self.addCleanup(shutil.rmtree, other, ignore_errors=True)
        script = "echo ready; read line; curl -s $WEBAPI_URL"
        running = [subprocess.Popen(self.command("--exec", "sh", "-c", script, device=device), text=True,
                                    stdin=subprocess.PIPE, stdout=subprocess.PIPE) for device in (self.device, other)]
        for process in running:
            self.assertEqual("ready\n", process.stdout.readline())
        for process in running:
            answer, _ = process.communicate("go\n", timeout=TIME_LIMIT)
            self.assertEqual(('{"error":{"code":101},"success":false}', 0), (answer, process.returncode))


class Password(ServeCase):
    def check(self):
        return ('curl -s -d "api=ZOVA.Core.Session&version=1&method=login&account=alice"'
                ' --data-urlencode "passwd=\\"$WEBAPI_PASSWORD\\"" $WEBAPI_URL')

    def test_it_is_made_once_and_kept_for_root_only(self):
        first, second = (self.run_serve("--exec", "sh", "-c", 'printf %s "$WEBAPI_PASSWORD"') for _ in range(2))
        self.assertRegex(first.stdout, r"\A[A-Za-z][A-Za-z0-9]{23}\Z")
        self.assertEqual(first.stdout, second.stdout)
        path = self.device / "password"
        self.assertEqual((first.stdout, 0o600),
                         (path.read_text(encoding="ascii"), stat.S_IMODE(path.stat().st_mode)))

    def test_two_devices_have_different_ones(self):
        other = PROJECT / "build" / f"{self.device.name}-other"
        self.addCleanup(shutil.rmtree, other, ignore_errors=True)
        made = set()
        for device in (self.device, other):
            made.add(subprocess.run(self.command("--exec", "sh", "-c", 'echo "$WEBAPI_PASSWORD"', device=device),
                                    capture_output=True, timeout=TIME_LIMIT, check=True).stdout)
        self.assertEqual(2, len(made))

    def test_one_from_the_caller_holds_for_that_start_and_is_kept_nowhere(self):
        chosen = "chosen: " + secrets.token_hex(8) + " $'\\;"
        result = self.run_serve("--exec", "python3", "-c", (
            "import json, os, urllib.parse, urllib.request as r; print(r.urlopen(os.environ['WEBAPI_URL'],"
            "urllib.parse.urlencode({'api': 'ZOVA.Core.Session', 'version': 1, 'method': 'login', 'account': 'alice',"
            "'passwd': json.dumps(os.environ['WEBAPI_PASSWORD'])}).encode()).read().decode())"),
            environment={"WEBAPI_PASSWORD": chosen})
        self.assertIn('"success":true', result.stdout + result.stderr)
        found = subprocess.run(["grep", "-rlF", "--", chosen, str(self.device)], capture_output=True, text=True,
                               check=False)
        self.assertEqual((1, ""), (found.returncode, found.stdout))
        self.assertIn('"success":true', self.run_serve("--exec", "sh", "-c", self.check()).stdout)

    def test_accounts_stay_between_starts(self):
        first, second = (self.run_serve("--exec", "sh", "-c", "id alice; id admin").stdout for _ in range(2))
        self.assertEqual(first, second)
        self.assertIn("(administrators)", first.splitlines()[1])
        self.assertNotIn("(administrators)", first.splitlines()[0])


class Serve(ServeCase):
    def test_the_printed_lines_log_in_when_they_are_pasted(self):
        port = free_port()
        _, printed = self.start(port)
        lines = [line.strip() for line in printed.splitlines() if line.startswith("    curl")]
        self.assertEqual(2, len(lines))
        with tempfile.TemporaryDirectory() as folder:
            answers = [subprocess.run(["bash", "-c", line], cwd=folder, capture_output=True, text=True,
                                      check=True).stdout for line in lines]
        self.assertIn('"user":"alice"', answers[0])
        self.assertIn('"name":"alice"', answers[1])

    def test_the_printed_lines_log_in_with_a_chosen_password_which_is_shown_nowhere(self):
        chosen = {"WEBAPI_PASSWORD": "p" + secrets.token_hex(12)}
        process, printed = self.start(free_port(), environment=chosen)
        self.assertNotIn(chosen["WEBAPI_PASSWORD"], printed)
        line = next(line.strip() for line in printed.splitlines() if line.startswith("    curl"))
        with tempfile.TemporaryDirectory() as folder:
            answer = subprocess.run(["bash", "-c", line], cwd=folder, capture_output=True, text=True, check=True,
                                    env={**os.environ, **chosen}).stdout
        self.assertIn('"user":"alice"', answer)
        self.assertEqual([], processes_with(chosen["WEBAPI_PASSWORD"]))
        process.terminate()
        process.wait(TIME_LIMIT)
        logs = self.device / "upper/var/log"
        found = subprocess.run(["grep", "-rlF", "--", chosen["WEBAPI_PASSWORD"], str(logs)], check=False)
        self.assertEqual(1, found.returncode)

    def test_each_way_of_ending_leaves_no_process_and_no_mount(self):
        for number, status in ((signal.SIGINT, 130), (signal.SIGTERM, 143), (signal.SIGHUP, 129),
                               (signal.SIGKILL, -signal.SIGKILL)):
            with self.subTest(number.name):
                port = free_port()
                process, _ = self.start(port)
                spaces = {mount_space(inside) for inside in processes_with(str(self.device))}
                spaces -= {mount_space(process.pid)}
                self.assertEqual(1, len(spaces))
                process.send_signal(number)
                self.assertEqual(status, process.wait(TIME_LIMIT))
                # A mount of the device lives as long as a process that sees it.
                wait_until(lambda: not spaces & {mount_space(entry) for entry in os.listdir("/proc") if entry.isdigit()},
                           "nobody is left in the device's namespaces")
                self.assert_nothing_left()
                # An ending process gives its sockets back last.
                wait_until(lambda: not listens(port), "nobody listens on the port")

    def test_a_port_in_use_is_an_error_and_leaves_nothing(self):
        with socket.socket() as taken:
            taken.bind(("127.0.0.1", 0))
            taken.listen()
            result = self.run_serve("--port", str(taken.getsockname()[1]))
        self.assertEqual(1, result.returncode)
        self.assertIn("Address already in use", result.stderr)
        self.assert_nothing_left()

    def test_two_devices_serve_at_the_same_time(self):
        other = PROJECT / "build" / f"{self.device.name}-other"
        self.addCleanup(shutil.rmtree, other, ignore_errors=True)
        for device in (self.device, other):
            port = free_port()
            _, printed = self.start(port, device=device)
            self.assertTrue(re.search(f"http://127.0.0.1:{port}/webapi/front.cgi", printed))
        self.assertTrue(processes_with(str(other)))

    def test_a_device_in_use_is_not_started_a_second_time(self):
        self.start(free_port())
        result = self.run_serve("--exec", "true")
        self.assertEqual(1, result.returncode)
        self.assertIn("is in use", result.stderr)

    def test_the_installed_system_is_laid_out_anew_at_each_start(self):
        folder = "/usr/zova/zovaman/webapi"
        script = f"cd {folder} && touch Stale.lib && rm ZOVA.Core.User.lib && echo x >front.cgi && ls"
        self.assertIn("Stale.lib", self.run_serve("--exec", "sh", "-c", script).stdout.split())
        second = self.run_serve("--exec", "ls", folder)
        self.assertEqual(0, second.returncode, second.stderr)
        self.assertIn("ZOVA.Core.User.lib", second.stdout.split())
        self.assertNotIn("Stale.lib", second.stdout.split())


if __name__ == "__main__":
    unittest.main()
