"""What the web server passes on and what it keeps from the client; what runs under which name; what the logs hold."""

import json
import os
import socket
import time
import unittest
import urllib.parse

import device
import webclient


def wait_for(condition, what):
    """Waits until the condition holds."""
    deadline = time.monotonic() + device.TIME_LIMIT
    while not condition():
        if time.monotonic() > deadline:
            raise AssertionError(f"waited in vain: {what}")
        os.sched_yield()


def raw_exchange(data):
    """Sends bytes on a connection, closes its sending side and returns all that comes back."""
    url = urllib.parse.urlsplit(device.URL)
    with socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT) as connection:
        connection.sendall(data)
        connection.shutdown(socket.SHUT_WR)
        answer = b""
        while chunk := connection.recv(65536):
            answer += chunk
    return answer


class Places(device.DeviceTestCase):
    def test_only_the_host_program_is_served(self):
        base = os.path.dirname(urllib.parse.urlsplit(device.URL).path)
        for name in ("/lib.def", "/ZOVA.Core.User.lib", "/", "", "/front.cgi/", "/front.cgi/x", "/front.cgi.lib",
                     "/../webapi/lib.def", "/./lib.def", "/%6cib.def", "/front.cgi/../lib.def", "/front.cgi;x"):
            with self.subTest(name):
                response = webclient.request("GET", path=base + name)
                self.assertIn(response.status, (403, 404))
                self.assertNotIn(b"allowUser", response.body)
        for path in ("/", "/etc/passwd", "/usr/zova/zovaman/webapi/lib.def"):
            with self.subTest(path):
                self.assertIn(webclient.request("GET", path=path).status, (403, 404))

    def test_the_server_listens_on_loopback_only(self):
        port = urllib.parse.urlsplit(device.URL).port
        listening = []
        for table in ("/proc/net/tcp", "/proc/net/tcp6"):
            with open(table, encoding="ascii") as lines:
                for line in list(lines)[1:]:
                    address, state = line.split()[1], line.split()[3]
                    if state == "0A" and int(address.split(":")[1], 16) == port:
                        listening.append(address.split(":")[0])
        self.assertEqual(["0100007F"], listening)


class HostProcess(device.DeviceTestCase):
    def start_waiting_host(self):
        """A connection whose host program waits for nothing but stands still, stopped, until continued."""
        url = urllib.parse.urlsplit(device.URL)
        connection = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
        # A refused password takes a second, in which the process can be looked at.
        body = b"api=ZOVA.Core.Session&version=1&method=login&account=no-such&passwd=x"
        connection.sendall(b"POST /webapi/front.cgi HTTP/1.1\r\nHost: device\r\nProxy: http://192.0.2.1/\r\n"
                           b"Connection: close\r\nContent-Length: %d\r\n\r\n" % len(body) + body)
        self.addCleanup(connection.close)
        wait_for(lambda: device.hosts_running(), "the host program starts")
        return connection, device.hosts_running()[0]

    def test_it_runs_as_root_in_its_folder_without_the_secrets_of_the_start(self):
        connection, process = self.start_waiting_host()
        with open(f"/proc/{process}/environ", "rb") as file:
            environment = dict(entry.split(b"=", 1) for entry in file.read().split(b"\0") if b"=" in entry)
        folder = os.readlink(f"/proc/{process}/cwd")
        owner = os.stat(f"/proc/{process}").st_uid
        while connection.recv(65536):
            pass
        self.assertEqual((device.FOLDER, 0), (folder, owner))
        self.assertNotIn(b"HTTP_PROXY", environment)
        self.assertNotIn(b"WEBAPI_PASSWORD", environment)
        self.assertEqual(b"127.0.0.1", environment[b"REMOTE_ADDR"])
        wait_for(lambda: not device.hosts_running(), "the host program ends")

    def test_it_ends_by_itself_when_the_client_breaks_off(self):
        connection, _ = self.start_waiting_host()
        connection.close()
        wait_for(lambda: not device.hosts_running(), "the host program ends")


class Headers(device.DeviceTestCase):
    def test_the_header_block_comes_through_in_its_order(self):
        answer = raw_exchange(b"GET /webapi/front.cgi?api=ZOVA.Core.User&version=1&method=get HTTP/1.0\r\n"
                              b"Host: device\r\nConnection: close\r\n\r\n")
        block, body = answer.split(b"\r\n\r\n", 1)
        own = (b"HTTP/1.0", b"Connection:", b"Content-Length:", b"Date:", b"Server:")
        lines = [line for line in block.split(b"\r\n") if not line.startswith(own)]
        self.assertEqual([
            b'Content-type: application/json; charset="UTF-8"', b"x-request-error: unauth",
            b"X-Content-Type-Options: nosniff", b"X-XSS-Protection: 1; mode=block",
            b"Cache-Control: max-age=0, no-cache, no-store, must-revalidate", b"Pragma: no-cache", b"Expires: 0",
        ], lines)
        self.assertEqual(b'{"error":{"code":119},"success":false}', body)

    def test_no_value_of_a_client_makes_a_header_line(self):
        evil = "alice\r\nInjected: 1\r\n\r\n<html>"
        client = webclient.Client()
        client.cookies["id"] = urllib.parse.quote(evil)
        for api, method, parameters in (("ZOVA.Core.Session", "login", {"account": evil, "passwd": evil}),
                                        ("ZOVA.Core.Session", "logout", {}), ("ZOVA.Core.User" + evil, "get", {}),
                                        ("ZOVA.Core.User", "get" + evil, {"_sid": evil, "tid": evil})):
            with self.subTest(api + "." + method):
                response = client.call(api, method, post=True, **parameters)
                self.assertEqual([], response.values("Injected"))
                self.assertIn("success", response.json())


class Secrets(device.DeviceTestCase):
    def test_no_password_stands_in_a_log_or_in_a_command_line(self):
        webclient.logged_in("alice")
        client = webclient.Client()
        client.call("ZOVA.Core.Session", "login", account="alice", passwd=device.PASSWORD)
        client.call("ZOVA.Core.Session", "login", account=device.PASSWORD, passwd=webclient.quoted("x"))
        secret = device.PASSWORD.encode()
        # What was given as an account name may be logged as one.
        for name in ("lighttpd-access.log", "lighttpd-error.log", "host-error.log"):
            with open(f"{device.LOGS}/{name}", "rb") as log:
                self.assertNotIn(secret, log.read(), name)
        for entry in filter(str.isdigit, os.listdir("/proc")):
            try:
                with open(f"/proc/{entry}/cmdline", "rb") as file:
                    self.assertNotIn(secret, file.read())
            except FileNotFoundError:
                continue  # ended meanwhile

    def test_a_failed_login_is_logged_without_its_password(self):
        mark = "mark-of-this-test"
        webclient.Client().call("ZOVA.Core.Session", "login", post=True, account="alice",
                                passwd=webclient.quoted(mark))
        path = f"{device.LOGS}/messages"

        def log():
            with open(path, encoding="utf-8", errors="replace") as file:
                return file.read()
        wait_for(lambda: "ZOVA.Core.Session_1_login" in log(), "the log tells of the call")
        self.assertNotIn(mark, log())
        self.assertEqual(0o600, os.stat(path).st_mode & 0o777)


class Parallel(device.DeviceTestCase):
    def test_calls_at_the_same_time_do_not_mix(self):
        clients = {name: webclient.logged_in(name) for name in ("alice", "admin")}
        url = urllib.parse.urlsplit(device.URL)
        connections = []
        for number in range(40):
            name = ("alice", "admin")[number % 2]
            connection = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
            connection.sendall(f"GET {url.path}?api=ZOVA.Core.User&version=1&method=get HTTP/1.0\r\nHost: device\r\n"
                               f"Cookie: id={clients[name].cookies['id']}\r\nConnection: close\r\n\r\n".encode())
            connections.append((name, connection))
        for name, connection in connections:
            answer = b""
            while chunk := connection.recv(65536):
                answer += chunk
            connection.close()
            self.assertEqual(name, json.loads(answer.split(b"\r\n\r\n", 1)[1])["data"]["name"])


if __name__ == "__main__":
    unittest.main()
