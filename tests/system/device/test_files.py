"""Files and folders by calls: listing, looking, making and renaming, and what no path and no race leads to."""

import grp
import json
import os
import pwd
import socket
import subprocess
import threading
import time
import unittest

import device
import files
import webclient
from files import COMMON, HIDDEN, HOME, PLACE

BAD_PATHS = ("", "files", "./files", "//", "/home//alice", f"{PLACE}/", f"{PLACE}/.", f"{PLACE}/..", f"{PLACE}/./a",
             f"{PLACE}/../files", f"{PLACE}//a", f"{PLACE}/a\0b", "\0", f"{PLACE}/" + "n" * 256, "/" + "p/" * 2048 + "p")
OUTSIDE = ("/", "/etc/passwd", "/home", "/home/admin", "/home/alicex", "/root", "/proc/self/root", HIDDEN, "/srv",
           "/none/at/all", "/home/ALICE")
NO_TEXT = (7, None, True, ["/home"], {"path": "/"}, 1.5)


class Listing(files.FilesTestCase):
    def fill(self):
        for size, name in ((30, "b"), (10, "c"), (20, "a")):
            files.write(f"{PLACE}/{name}", b"x" * size)
            os.utime(f"{PLACE}/{name}", (size, 1000 - size))
        os.mkdir(f"{PLACE}/d")
        os.utime(f"{PLACE}/d", (1, 5))
        os.symlink("/etc/shadow", f"{PLACE}/e")
        os.utime(f"{PLACE}/e", (2, 2), follow_symlinks=False)
        files.give_tree("alice", PLACE)

    def test_the_top_lists_the_home_and_the_shared_folders_that_one_may_read(self):
        def top(client):
            return [(entry["name"], entry["path"], entry["writable"])
                    for entry in self.data("list", client)["entries"]]

        self.assertEqual([("home", HOME, True), ("common", COMMON, False)], top(self.alice))
        self.assertEqual([("home", "/home/admin", True), ("common", COMMON, True), ("hidden", HIDDEN, True)],
                         top(self.admin))

    def test_a_folder_is_listed_with_what_lies_in_it(self):
        self.fill()
        data = self.data("list", path=PLACE)
        self.assertEqual((5, 0, PLACE), (data["total"], data["offset"], data["path"]))
        account = pwd.getpwnam("alice")
        rest = {"uid": account.pw_uid, "gid": account.pw_gid}
        by_name = {entry["name"]: entry for entry in data["entries"]}
        self.assertEqual({"name": "a", "path": f"{PLACE}/a", "type": "file", "size": 20, "mtime": 980, "mode": 0o644,
                          **rest}, by_name["a"])
        self.assertEqual({"name": "d", "path": f"{PLACE}/d", "type": "folder", "mtime": 5, "mode": 0o755, **rest},
                         by_name["d"])
        self.assertEqual({"name": "e", "path": f"{PLACE}/e", "type": "link", "mtime": 2, "mode": 0o777, **rest},
                         by_name["e"])

    def test_each_order_and_its_reverse(self):
        self.fill()
        for key, order in {"name": "abcde", "size": "decab", "mtime": "edbac", "type": "dabce"}.items():
            with self.subTest(key):
                self.assertEqual(list(order), self.names(sort=key))
                self.assertEqual(list(order)[::-1], self.names(sort=key, order="desc"))

    def test_pages_fit_together_and_end(self):
        self.fill()
        for limit in (1, 2, 3, 5, 6):
            pages = [self.names(offset=offset, limit=limit) for offset in range(0, 8, limit)]
            self.assertEqual(list("abcde"), sum(pages, []))
        self.assertEqual([], self.names(offset=1000000))

    def test_a_folder_of_a_hundred_thousand_is_listed_page_by_page(self):
        for number in range(100000):
            os.close(os.open(f"{PLACE}/{number:06}", os.O_CREAT | os.O_WRONLY))
        begin = time.monotonic()
        data = self.data("list", path=PLACE, offset=99990, limit=5000)
        self.assertEqual([f"{number:06}" for number in range(99990, 100000)],
                         [entry["name"] for entry in data["entries"]])
        self.assertEqual(100000, data["total"])
        self.assertEqual(["099999", "099998"], self.names(order="desc", limit=2))
        self.assertEqual(["000000"], self.names(sort="size", limit=1))
        self.assertLess(time.monotonic() - begin, 20)

    def test_a_name_that_is_no_utf8_is_shown_and_can_be_asked_for_by_its_bytes(self):
        files.write(os.fsencode(PLACE) + b"/\xff\x01 %.txt")
        entry = self.data("list", path=PLACE)["entries"][0]
        self.assertEqual(("\ufffd\x01 %.txt", "%FF%01%20%25.txt"), (entry["name"], entry["name_bytes"]))
        self.assertEqual(f"{PLACE}/%FF%01%20%25.txt", entry["path_bytes"])
        answer = webclient.request("GET", files.query("stat") + "&paths=" + entry["path_bytes"],
                                   headers=self.alice.headers())
        self.assertEqual(7, answer.json()["data"]["results"][0]["size"])

    def test_bad_parameters_are_named(self):
        for name, values in {"offset": (-1, 1000001, "1", None, 1.5), "limit": (0, 5001, "x", None),
                             "sort": ("owner", "", 1, None, ["name"]), "order": ("up", 1, None),
                             "path": NO_TEXT}.items():
            for value in values:
                with self.subTest(name=name, value=value):
                    parameters = {"path": PLACE, name: value}
                    self.assertEqual({"parameter": name}, self.refused(101, "list", **parameters))

    def test_what_cannot_be_listed_says_why(self):
        self.fill()
        os.mkdir(f"{PLACE}/closed", 0o000)
        for path, code in ((f"{PLACE}/none", 403), (f"{PLACE}/a", 406), (f"{PLACE}/e", 406), (f"{PLACE}/a/b", 406),
                           (f"{PLACE}/e/x", 406), (f"{PLACE}/closed", 404)):
            with self.subTest(path):
                self.refused(code, "list", path=path)

    def test_nobody_lists_without_a_login(self):
        self.assertEqual(119, self.call("list", webclient.Client()).code())


class Batches(files.FilesTestCase):
    def batch(self, client, *entries):
        calls = [{"api": files.API, "version": 1, **entry} for entry in entries]
        answer = client.call("ZOVA.Entry.Request", "request", post=True, compound=json.dumps(calls)).json()
        return [row.get("error", {}).get("code", row.get("data")) for row in answer["data"]["result"]]

    def test_each_call_of_a_batch_runs_as_the_user_whatever_the_one_before_became(self):
        rows = self.batch(self.alice, {"method": "list", "path": PLACE},
                          {"method": "mkdir", "path": f"{PLACE}/new"}, {"method": "stat", "paths": f"{PLACE}/new"},
                          {"method": "list", "path": "/home/admin"}, {"method": "mkdir", "path": "/etc/new"},
                          {"method": "download", "paths": PLACE})
        self.assertEqual(0, rows[0]["total"])
        self.assertEqual({"path": f"{PLACE}/new"}, rows[1])
        self.assertEqual("folder", rows[2]["results"][0]["type"])
        self.assertEqual([402, 402, 113], rows[3:])
        self.assertEqual(pwd.getpwnam("alice").pw_uid, os.stat(f"{PLACE}/new").st_uid)


class Looking(files.FilesTestCase):
    def test_several_paths_are_each_told_or_refused(self):
        files.write(f"{PLACE}/a")
        os.mkfifo(f"{PLACE}/pipe")
        listener = socket.socket(socket.AF_UNIX)
        self.addCleanup(listener.close)
        listener.bind(f"{PLACE}/socket")
        os.mknod(f"{PLACE}/disk", 0o600 | 0o060000, os.makedev(7, 0))
        paths = [f"{PLACE}/a", f"{PLACE}/none", "/etc/passwd", "bad", f"{PLACE}/pipe", f"{PLACE}/socket",
                 f"{PLACE}/disk", PLACE]
        rows = self.data("stat", paths=paths)["results"]
        self.assertEqual(paths, [row["path"] for row in rows])
        self.assertEqual([None, 403, 402, 401, None, None, None, None], [row.get("error") for row in rows])
        self.assertEqual(["file", None, None, None, "other", "other", "other", "folder"],
                         [row.get("type") for row in rows])

    def test_one_path_needs_no_array(self):
        answer = webclient.request("GET", files.query("stat") + "&paths=" + PLACE, headers=self.alice.headers())
        self.assertEqual("folder", answer.json()["data"]["results"][0]["type"])

    def test_too_many_paths_none_and_what_is_no_text_are_refused(self):
        for paths in ([], [f"{PLACE}"] * 1001, [7], [PLACE, None], {"a": PLACE}, 7, None, True):
            with self.subTest(str(paths)[:40]):
                self.assertEqual({"parameter": "paths"}, self.refused(101, "stat", paths=paths))
        self.assertEqual(1000, len(self.data("stat", paths=[PLACE] * 1000)["results"]))


class Confinement(files.FilesTestCase):
    """Of every method that takes a path."""

    METHODS = {
        "list": lambda path: {"path": path},
        "mkdir": lambda path: {"path": path},
        "rename": lambda path: {"path": path, "to": f"{PLACE}/new"},
        "rename to": lambda path: {"path": f"{PLACE}/file", "to": path},
        "delete": lambda path: {"paths": [path]},
        "delete all": lambda path: {"paths": [path], "recursive": True},
        "download": lambda path: {"paths": [path]},
    }

    def code(self, method, path, client=None):
        return self.call(method.split()[0], client, **self.METHODS[method](path)).code()

    def test_paths_of_bad_form_are_refused_by_every_method(self):
        files.write(f"{PLACE}/file")
        for method in self.METHODS:
            for path in BAD_PATHS:
                with self.subTest(method=method, path=path[:60]):
                    self.assertEqual(401, self.code(method, path))

    def test_paths_outside_are_refused_alike_whether_or_not_they_exist(self):
        files.write(f"{PLACE}/file")
        for method in self.METHODS:
            for path in OUTSIDE:
                if (method, path) != ("list", "/"):
                    with self.subTest(method=method, path=path):
                        self.assertEqual(402, self.code(method, path))

    def test_no_symbolic_link_leads_anywhere(self):
        os.mkdir(f"{PLACE}/real")
        files.write(f"{PLACE}/real/file")
        for name, target in (("out", "/etc"), ("inside", f"{PLACE}/real"), ("near", "real"), ("up", ".."),
                             ("magic", "/proc/self/root"), ("round", "round")):
            os.symlink(target, f"{PLACE}/{name}")
            for path in (f"{PLACE}/{name}/passwd", f"{PLACE}/{name}/file"):
                for method in ("list", "mkdir", "rename", "rename to", "delete", "delete all", "download"):
                    with self.subTest(method=method, path=path):
                        self.assertEqual(406, self.code(method, path))
            for method in ("list", "download"):
                self.assertEqual(406, self.code(method, f"{PLACE}/{name}"), (method, name))
        self.assertTrue(os.path.exists("/etc/passwd"))
        self.assertEqual(b"content", files.tree(f"{PLACE}/real")[b"file"])

    def test_the_kernel_checks_as_the_user(self):
        files.write(f"{PLACE}/roots", b"secret")
        os.chmod(f"{PLACE}/roots", 0o600)
        os.chown(f"{PLACE}/roots", 0, 0)
        self.refused(404, "download", paths=[f"{PLACE}/roots"])
        os.mkdir(f"{PLACE}/roots-folder", 0o755)
        self.refused(404, "mkdir", path=f"{PLACE}/roots-folder/new")
        self.refused(404, "mkdir", path=f"{PLACE}/roots-folder/new/deep", parents=True)
        files.write(f"{PLACE}/file")
        self.refused(404, "rename", path=f"{PLACE}/file", to=f"{PLACE}/roots-folder/file")

    def test_a_shared_folder_is_written_by_those_whom_the_table_names(self):
        files.write(f"{COMMON}/file", b"everybody's")
        os.chmod(COMMON, 0o2777)
        for method, parameters in (("mkdir", {"path": f"{COMMON}/new"}), ("delete", {"paths": [f"{COMMON}/file"]}),
                                   ("mkdir", {"path": f"{COMMON}/new/deep", "parents": True}),
                                   ("rename", {"path": f"{COMMON}/file", "to": f"{COMMON}/other"})):
            self.assertEqual(404, self.call(method, **parameters).code() if method != "delete" else
                             self.call(method, **parameters).json()["error"]["code"], method)
        self.assertEqual(b"everybody's", webclient.request(
            "GET", files.query("download", paths=[f"{COMMON}/file"]), headers=self.alice.headers()).body)
        self.data("mkdir", self.admin, path=f"{COMMON}/new")
        state = os.stat(f"{COMMON}/new")
        self.assertEqual((grp.getgrnam("administrators").gr_gid, oct(0o42775)), (state.st_gid, oct(state.st_mode)))

    def test_a_folder_that_is_swapped_for_a_link_again_and_again_never_leads_out(self):
        os.mkdir(f"{PLACE}/a")
        os.mkdir(f"{PLACE}/a/sub")
        os.symlink("/home/admin", f"{PLACE}/b")
        files.give_tree("alice", PLACE)
        before = files.tree("/home/admin")
        stop = threading.Event()

        def swap():
            while not stop.is_set():
                os.rename(f"{PLACE}/a", f"{PLACE}/c")
                os.rename(f"{PLACE}/b", f"{PLACE}/a")
                os.rename(f"{PLACE}/a", f"{PLACE}/b")
                os.rename(f"{PLACE}/c", f"{PLACE}/a")

        thread = threading.Thread(target=swap)
        thread.start()
        self.addCleanup(thread.join)
        self.addCleanup(stop.set)
        codes = set()
        # As root's administrator could: alice's own rights are no help here.
        os.chmod("/home/admin", 0o777)
        self.addCleanup(os.chmod, "/home/admin", 0o700)
        for number in range(60):
            codes.add(self.call("mkdir", path=f"{PLACE}/a/new{number}").code())
            listed = self.call("list", path=f"{PLACE}/a")
            if listed.code() == 0:
                names = {entry["name"] for entry in listed.json()["data"]["entries"]}
                self.assertTrue(all(name == "sub" or name.startswith("new") for name in names), names)
        self.assertEqual(before, files.tree("/home/admin"))
        self.assertLessEqual(codes, {0, 403, 406})

    def test_a_table_that_cannot_be_used_closes_the_shared_folders_and_is_logged(self):
        good = json.dumps({"folders": files.FOLDERS})
        entry = files.FOLDERS[0]
        for bad in ("", "{", "[]", "null", '{"folders": null}', '{"folders": [], "more": 1}',
                    json.dumps({"folders": [{**entry, "path": "relative"}]}),
                    json.dumps({"folders": [{**entry, "path": "/"}]}),
                    json.dumps({"folders": [{**entry, "path": COMMON + "/.."}]}),
                    json.dumps({"folders": [{**entry, "name": "a/b"}]}),
                    json.dumps({"folders": [{**entry, "owner": "alice"}]}),
                    json.dumps({"folders": [{**entry, "read": ["alice"]}]}),
                    json.dumps({"folders": [entry, entry]}),
                    json.dumps({"folders": [entry, {**entry, "name": "in", "path": COMMON + "/in"}]})):
            with self.subTest(bad):
                self.write_table(bad)
                log = device.SystemLog()
                self.refused(412, "list", path=COMMON)
                log.wait_for("shared-folders.json cannot be used")
                self.assertEqual(["home"], self.names("/"))
                self.assertEqual(0, self.call("list", path=PLACE).code())
        self.write_table(good)
        self.assertEqual(0, self.call("list", path=COMMON).code())
        os.chmod(files.TABLE, 0o644)
        self.refused(412, "list", path=COMMON)
        os.chmod(files.TABLE, 0o600)
        os.chown(files.TABLE, pwd.getpwnam("alice").pw_uid, 0)
        self.refused(412, "list", path=COMMON)
        os.chown(files.TABLE, 0, 0)

    def test_a_shared_folder_behind_a_link_is_none(self):
        os.symlink("/etc", "/srv/test-link")
        self.addCleanup(os.unlink, "/srv/test-link")
        self.write_table(json.dumps({"folders": [{**files.FOLDERS[0], "path": "/srv/test-link"}]}))
        self.refused(406, "list", path="/srv/test-link")
        self.assertEqual(["home"], self.names("/"))


class Making(files.FilesTestCase):
    def test_a_folder_gets_the_rights_of_the_one_above_but_strangers_may_not_write(self):
        for above, made in ((0o700, 0o700), (0o755, 0o755), (0o777, 0o775), (0o500 | 0o200, 0o700)):
            os.chmod(PLACE, above)
            self.assertEqual({"path": f"{PLACE}/{made:o}"}, self.data("mkdir", path=f"{PLACE}/{made:o}"))
            state = os.stat(f"{PLACE}/{made:o}")
            self.assertEqual((oct(0o40000 | made), pwd.getpwnam("alice").pw_uid), (oct(state.st_mode), state.st_uid))
            os.rmdir(f"{PLACE}/{made:o}")

    def test_with_parents_all_that_is_missing_is_made_and_what_is_there_stays(self):
        self.refused(403, "mkdir", path=f"{PLACE}/a/b/c")
        for _ in range(2):
            self.data("mkdir", path=f"{PLACE}/a/b/c", parents=True)
        self.assertEqual({b"a": None, b"a/b": None, b"a/b/c": None}, files.tree(PLACE))
        self.refused(405, "mkdir", path=f"{PLACE}/a")
        files.write(f"{PLACE}/file")
        self.refused(406, "mkdir", path=f"{PLACE}/file/x", parents=True)
        self.refused(406, "mkdir", path=f"{PLACE}/file", parents=True)
        self.refused(409, "mkdir", path=HOME)

    def test_new_names_are_utf8_without_control_bytes(self):
        for name in ("a\nb", "tab\t", "\x7f", "\x01"):
            self.refused(401, "mkdir", path=f"{PLACE}/{name}")
            self.refused(401, "mkdir", path=f"{PLACE}/{name}/x", parents=True)
        answer = webclient.request("GET", files.query("mkdir") + f"&path={PLACE}/%FF", headers=self.alice.headers())
        self.assertEqual(401, answer.code())
        self.data("mkdir", path=f"{PLACE}/ö 😀 ' \" %41 ; & # ?")
        self.assertEqual(["ö 😀 ' \" %41 ; & # ?"], os.listdir(PLACE))
        self.data("mkdir", path=f"{PLACE}/" + "n" * 255)

    def test_bad_parameters_are_named(self):
        for value in NO_TEXT:
            self.assertEqual({"parameter": "path"}, self.refused(101, "mkdir", path=value))
        for value in ("true", 1, None):
            self.assertEqual({"parameter": "parents"}, self.refused(101, "mkdir", path=f"{PLACE}/x", parents=value))
        self.assertEqual({"parameter": "path"}, self.refused(101, "mkdir"))


class Renaming(files.FilesTestCase):
    def test_a_file_or_folder_is_renamed_and_moved(self):
        os.mkdir(f"{PLACE}/folder")
        files.write(f"{PLACE}/folder/file")
        files.give_tree("alice", PLACE)
        self.assertEqual({"path": f"{PLACE}/file"}, self.data("rename", path=f"{PLACE}/folder/file",
                                                              to=f"{PLACE}/file"))
        self.data("rename", path=f"{PLACE}/folder", to=f"{PLACE}/ordner ö")
        self.assertEqual({b"file": b"content", "ordner ö".encode(): None}, files.tree(PLACE))

    def test_what_is_there_stays_unless_it_is_to_be_overwritten(self):
        files.write(f"{PLACE}/a", b"a")
        files.write(f"{PLACE}/b", b"b")
        self.refused(405, "rename", path=f"{PLACE}/a", to=f"{PLACE}/b")
        self.assertEqual({b"a": b"a", b"b": b"b"}, files.tree(PLACE))
        self.data("rename", path=f"{PLACE}/a", to=f"{PLACE}/b", existing="overwrite")
        self.assertEqual({b"b": b"a"}, files.tree(PLACE))

    def test_a_link_is_renamed_itself(self):
        os.symlink("/etc/passwd", f"{PLACE}/link")
        self.data("rename", path=f"{PLACE}/link", to=f"{PLACE}/other")
        self.assertEqual("/etc/passwd", os.readlink(f"{PLACE}/other"))

    def test_what_cannot_be_renamed_says_why(self):
        os.makedirs(f"{PLACE}/full/sub")
        os.mkdir(f"{PLACE}/empty")
        files.write(f"{PLACE}/file")
        files.give_tree("alice", PLACE)
        rows = (("none", "x", 403), ("full", "full/sub/x", 411), ("empty", "full", 405), ("file", "none/x", 403),
                ("file", "full/a\n", 401))
        for source, target, code in rows:
            with self.subTest(source=source, target=target):
                self.refused(code, "rename", path=f"{PLACE}/{source}", to=f"{PLACE}/{target}")
        for source, target, code in (("empty", "full", 405), ("empty", "file", 406), ("file", "empty", 406)):
            with self.subTest(source=source, target=target):
                self.refused(code, "rename", path=f"{PLACE}/{source}", to=f"{PLACE}/{target}", existing="overwrite")
        self.refused(409, "rename", path=HOME, to=f"{PLACE}/x")
        self.refused(409, "rename", path=f"{PLACE}/file", to=HOME)
        for value in ("skip", 1, None):
            self.assertEqual({"parameter": "existing"}, self.refused(101, "rename", path=f"{PLACE}/file",
                                                                     to=f"{PLACE}/x", existing=value))
        for value in NO_TEXT:
            self.assertEqual({"parameter": "to"}, self.refused(101, "rename", path=f"{PLACE}/file", to=value))

    def test_nothing_moves_from_one_of_the_callers_folders_to_another(self):
        files.write("/home/admin/file")
        files.give("admin", "/home/admin/file")
        self.addCleanup(os.unlink, "/home/admin/file")
        self.refused(410, "rename", self.admin, path="/home/admin/file", to=f"{COMMON}/file")
        self.assertEqual([], os.listdir(COMMON))

    def test_nothing_moves_to_another_file_system_and_a_mounted_one_is_not_renamed(self):
        os.mkdir(f"{PLACE}/mounted")
        subprocess.run(["mount", "-t", "tmpfs", "tmpfs", f"{PLACE}/mounted"], check=True)
        self.addCleanup(subprocess.run, ["umount", f"{PLACE}/mounted"], check=True)
        files.write(f"{PLACE}/file")
        files.give("alice", f"{PLACE}/file", f"{PLACE}/mounted")
        self.refused(410, "rename", path=f"{PLACE}/file", to=f"{PLACE}/mounted/file")
        self.refused(410, "rename", path=f"{PLACE}/mounted", to=f"{PLACE}/other")
        self.assertEqual(["file", "mounted"], sorted(os.listdir(PLACE)))

    def test_of_two_who_rename_to_one_name_at_once_one_wins(self):
        for number in range(20):
            for name in ("a", "b"):
                files.write(f"{PLACE}/{name}", name.encode())
            codes = {}

            def rename(name):
                codes[name] = self.call("rename", path=f"{PLACE}/{name}", to=f"{PLACE}/to{number}").code()

            threads = [threading.Thread(target=rename, args=name) for name in "ab"]
            for thread in threads:
                thread.start()
            for thread in threads:
                thread.join()
            self.assertEqual([0, 405], sorted(codes.values()))
            winner = min(codes, key=codes.get)
            self.assertEqual(winner.encode(), files.tree(PLACE)[f"to{number}".encode()])
            os.unlink(f"{PLACE}/" + ("b" if winner == "a" else "a"))


if __name__ == "__main__":
    unittest.main()
