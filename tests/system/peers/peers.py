"""The first of two devices as the tests see it: its table of peers, the second device, and peers that answer badly."""

import json
import os
import subprocess
import sys
import tempfile
import urllib.parse

SYSTEM = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))
sys.path.insert(0, f"{SYSTEM}/device")

import device  # noqa: E402
import probe  # noqa: E402
import webclient  # noqa: E402

TABLE = "/etc/zova/peers.json"
PEER_URL = os.environ["WEBAPI_PEER_URL"]
PEER_PASSWORD = os.environ["WEBAPI_PEER_PASSWORD"]
SERVER = os.path.join(os.path.dirname(SYSTEM), "reference", "helpers", "peer_server.py")
# The number of the second device, and one for a peer that a test enters.
SECOND = 2
STAND_IN = 77


def read_table():
    with open(TABLE, encoding="utf-8") as file:
        return json.load(file)


def write_table(table):
    fresh = TABLE + ".new"
    with open(os.open(fresh, os.O_WRONLY | os.O_CREAT | os.O_TRUNC, 0o600), "w", encoding="utf-8") as file:
        json.dump(table, file)
    os.rename(fresh, TABLE)


def tokens():
    """All tokens that this device keeps for the second one."""
    return [user["token"] for user in read_table()["peers"][str(SECOND)]["users"].values()]


class StandIn:
    """A peer that answers badly, on this machine."""

    def __init__(self):
        # Not where a test looks for the files of a call.
        self.folder = tempfile.TemporaryDirectory(dir="/dev/shm")
        self.process = subprocess.Popen([SERVER, self.folder.name], stdout=subprocess.PIPE, text=True)
        port, plain_port, self.pin = self.process.stdout.readline().split()
        self.port, self.plain_port = int(port), int(plain_port)

    def close(self):
        self.process.terminate()
        self.process.wait(device.TIME_LIMIT)
        self.process.stdout.close()
        self.folder.cleanup()

    def record(self, path):
        """What the table holds of it; the users are those of the second device."""
        return {"host": "peer.example", "address": "127.0.0.1", "port": self.port, "path": path, "pin": self.pin,
                "users": read_table()["peers"][str(SECOND)]["users"]}


class PeersTestCase(probe.ProbeTestCase):
    def setUp(self):
        super().setUp()
        self.addCleanup(write_table, read_table())
        self.log = device.SystemLog()

    def change_table(self, change):
        """Until the end of the test the table is what `change` makes of it."""
        table = read_table()
        change(table["peers"])
        write_table(table)

    def enter(self, record):
        self.change_table(lambda table: table.update({str(STAND_IN): record}))

    def assert_relay_failed(self, response, number):
        """Answer 109, and the number in the log, of the framework where the peer was asked."""
        self.assertEqual((200, 109), (response.status, response.code()), response.body)
        self.log.wait_for(f"[{number}, ")
        asked = number >= 6
        self.assertEqual(asked, any(f"relay request fail[{number}]" in line for line in self.log.lines()))


def query(method, peer=SECOND, api=probe.API, **more):
    return urllib.parse.urlencode({"api": api, "version": 1, "method": method, "relay_zn": peer, **more})


def call(client, method, peer=SECOND, api=probe.API, post=False, **more):
    return client.call(api, method, post=post, relay_zn=peer, **more)


class PeerClient(webclient.Client):
    """A visitor of the second device itself."""

    def call(self, api, method, version=1, post=False, **parameters):
        form = urllib.parse.urlencode({"api": api, "version": version, "method": method, **parameters}).encode()
        response = webclient.request("POST", body=form, url=PEER_URL, headers={
            **self.headers(), "Content-Type": "application/x-www-form-urlencoded"})
        self.take_cookies(response)
        return response
