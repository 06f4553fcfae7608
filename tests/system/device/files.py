"""What the tests of ZOVA.Storage.File have in common: folders of two users, a table of shared folders, and uploads."""

import grp
import json
import os
import pwd
import shutil
import urllib.parse

import device
import webclient

API = "ZOVA.Storage.File"
TASK = "ZOVA.Core.Task"
HOME = "/home/alice"
PLACE = f"{HOME}/files"
# alice reads and admin writes the first, the second is admin's alone.
COMMON = "/srv/test-common"
HIDDEN = "/srv/test-hidden"
TABLE = "/etc/zova/shared-folders.json"
FOLDERS = [
    {"name": "common", "path": COMMON, "read": {"users": ["alice"]}, "write": {"groups": ["administrators"]}},
    {"name": "hidden", "path": HIDDEN, "write": {"users": ["admin"]}},
]
BOUNDARY = "file-boundary"


def part(name, content, filename=None):
    line = f'Content-Disposition: form-data; name="{name}"'
    if filename is not None:
        line += f'; filename="{filename}"'
    return f"--{BOUNDARY}\r\n{line}\r\n\r\n".encode() + content + b"\r\n"


def form(*parts):
    return b"".join(parts) + f"--{BOUNDARY}--\r\n".encode()


def query(method, **parameters):
    return urllib.parse.urlencode({"api": API, "version": 1, "method": method,
                                   **{name: json.dumps(value) for name, value in parameters.items()}})


def write(path, content=b"content"):
    with open(path, "wb") as file:
        file.write(content)


def give(user, *paths):
    account = pwd.getpwnam(user)
    for path in paths:
        os.chown(path, account.pw_uid, account.pw_gid, follow_symlinks=False)


def give_tree(user, top):
    give(user, top)
    for folder, folders, names in os.walk(top):
        give(user, *(os.path.join(folder, name) for name in folders + names))


def tree(top):
    """Every path below with its content, None for a folder."""
    found = {}
    for folder, folders, names in os.walk(os.fsencode(top)):
        for name in folders:
            found[os.path.relpath(os.path.join(folder, name), os.fsencode(top))] = None
        for name in names:
            with open(os.path.join(folder, name), "rb") as file:
                found[os.path.relpath(os.path.join(folder, name), os.fsencode(top))] = file.read()
    return found


class FilesTestCase(device.DeviceTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.alice = webclient.logged_in("alice")
        cls.admin = webclient.logged_in("admin")
        cls.addClassCleanup(device.remove_tasks)

    def setUp(self):
        super().setUp()
        administrators = grp.getgrnam("administrators").gr_gid
        for folder, mode in ((PLACE, 0o700), (COMMON, 0o2775), (HIDDEN, 0o777)):
            shutil.rmtree(folder, ignore_errors=True)
            os.mkdir(folder)
            self.addCleanup(shutil.rmtree, folder)
            os.chmod(folder, mode)
        os.chown(COMMON, 0, administrators)
        os.chmod(COMMON, 0o2775)
        give("alice", PLACE)
        with open(TABLE, encoding="utf-8") as table:
            self.addCleanup(self.write_table, table.read())
        self.write_table(json.dumps({"folders": FOLDERS}))

    def tearDown(self):
        device.wait_for(lambda: not device.hosts_running(), "the end of all host programs")
        super().tearDown()

    @staticmethod
    def write_table(text):
        with open(TABLE, "w", encoding="utf-8") as table:
            table.write(text)

    def call(self, method, client=None, **parameters):
        return (client or self.alice).call(API, method, post=True,
                                           **{name: json.dumps(value) for name, value in parameters.items()})

    def data(self, method, client=None, **parameters):
        response = self.call(method, client, **parameters)
        self.assertEqual(0, response.code(), response.body)
        return response.json().get("data")

    def refused(self, code, method, client=None, **parameters):
        response = self.call(method, client, **parameters)
        self.assertEqual(code, response.code(), (method, parameters, response.body))
        return response.json()["error"].get("errors")

    def upload(self, body, client=None, method="upload", headers=None, **parameters):
        return webclient.request("POST", query(method, **parameters), body, {
            **(client or self.alice).headers(), "Content-Type": f"multipart/form-data; boundary={BOUNDARY}",
            **(headers or {})})

    def names(self, path=PLACE, **parameters):
        return [entry["name"] for entry in self.data("list", path=path, **parameters)["entries"]]

    def finished(self, task):
        def ended():
            state = self.alice.call(TASK, "status", task_id=webclient.quoted(task)).json()["data"]
            return state if state["finish"] else None
        return device.wait_for(ended, "the end of the task")
