"""The long-lived services, as their clients and those who start them see them."""

import json
import os
import socket
import subprocess
import time

import device

LOG = device.LOGS + "/messages"


def wait_until(condition, what):
    """The condition's first true value."""
    limit = time.monotonic() + device.TIME_LIMIT
    while time.monotonic() < limit:
        value = condition()
        if value:
            return value
        time.sleep(0.002)
    raise AssertionError(f"waited in vain until {what}")


def framed(text):
    return len(text).to_bytes(8, "little") + text


class Connection:
    """One connection to a service."""

    def __init__(self, path):
        self.socket = socket.socket(socket.AF_UNIX)
        self.socket.settimeout(device.TIME_LIMIT)
        try:
            self.socket.connect(path)
        except OSError:
            self.socket.close()
            raise

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.socket.close()

    def send(self, data):
        """A service that drops its peer may have gone before all has been sent."""
        try:
            self.socket.sendall(data)
        except (BrokenPipeError, ConnectionResetError):
            pass

    def receive(self):
        """All that comes until the end of the connection."""
        parts = []
        try:
            while part := self.socket.recv(1 << 16):
                parts.append(part)
        except ConnectionResetError:
            pass
        return b"".join(parts)

    def answer(self):
        """The one text that comes, or None for nothing at all."""
        data = self.receive()
        if not data:
            return None
        if len(data) < 8 or len(data) != 8 + int.from_bytes(data[:8], "little"):
            raise AssertionError(f"no whole text: {data!r}")
        return data[8:]


def ask(path, text):
    with Connection(path) as connection:
        connection.send(framed(text))
        return connection.answer()


def ask_json(path, value):
    answer = ask(path, json.dumps(value).encode())
    return None if answer is None else json.loads(answer)


class Service:
    """A service of the test's own."""

    def __init__(self, program, path, *options, command=None, **more):
        self.path = path
        self.process = subprocess.Popen(command or [f"/usr/sbin/{program}", "--socket", path, *options],
                                        stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                                        env={"PATH": os.environ["PATH"]}, **more)
        wait_until(lambda: self.process.poll() is not None or self.listens(), "the service listens")

    def listens(self):
        try:
            with Connection(self.path):
                return True
        except OSError:
            return False

    def children(self):
        """Process ids and states of its children."""
        number = self.process.pid
        found = {}
        with open(f"/proc/{number}/task/{number}/children", encoding="ascii") as file:
            for child in file.read().split():
                try:
                    with open(f"/proc/{child}/stat", encoding="ascii", errors="replace") as stat:
                        found[int(child)] = stat.read().rpartition(") ")[2][0]
                except OSError:
                    continue  # ended meanwhile
        return found

    def descriptors(self):
        return sorted(os.listdir(f"/proc/{self.process.pid}/fd"))

    def end(self):
        """Exit status and what it wrote; ends it if nothing else has."""
        if self.process.poll() is None:
            self.process.terminate()
        try:
            output, _ = self.process.communicate(timeout=device.TIME_LIMIT)
        finally:
            self.process.kill()
        return self.process.returncode, output.decode()


class Log:
    """What is logged from now on."""

    def __init__(self):
        self.place = os.path.getsize(LOG)

    def lines(self):
        with open(LOG, encoding="utf-8", errors="replace") as file:
            file.seek(self.place)
            return file.read().splitlines()

    def wait_for(self, text):
        """The lines with this text, once there is one."""
        return wait_until(lambda: [line for line in self.lines() if text in line], f"the log says: {text}")
