"""Files as they are, with ranges, and archives of many: whole, lazy, and honest about what is not in them."""

import glob
import io
import os
import socket
import subprocess
import tarfile
import threading
import time
import unittest
import urllib.parse
import zipfile

import device
import files
import webclient
from files import PLACE

NOTE = "not-in-this-archive.txt"
MOST_MEMORY = 48 << 20


def status_of(process, key):
    with open(f"/proc/{process}/status", encoding="utf-8") as status:
        return next(int(line.split()[1]) * 1024 for line in status if line.startswith(key))


def maps_of(process):
    with open(f"/proc/{process}/maps", encoding="utf-8") as maps:
        return maps.read()


class Reader:
    """A client that reads as much as it is told to."""

    def __init__(self, client, **parameters):
        url = urllib.parse.urlsplit(device.URL)
        self.connection = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
        lines = "".join(f"{name}: {value}\r\n" for name, value in client.headers().items())
        self.connection.sendall(f"GET {url.path}?{files.query('download', **parameters)} HTTP/1.0\r\n"
                                f"Host: device\r\n{lines}\r\n".encode())
        head = b""
        while b"\r\n\r\n" not in head:
            head += self.connection.recv(1)
        # By now the archive has begun.
        self.begin = self.connection.recv(1)

    def rest(self):
        data = bytearray(self.begin)
        while piece := self.connection.recv(65536):
            data += piece
        return bytes(data)

    def close(self):
        self.connection.close()


class DownloadTestCase(files.FilesTestCase):
    def get(self, *paths, client=None, headers=None, verb="GET", **parameters):
        return webclient.request(verb, files.query("download", paths=list(paths), **parameters),
                                 headers={**(client or self.alice).headers(), **(headers or {})})

    def archive(self, *paths, **parameters):
        response = self.get(*paths, **parameters)
        self.assertEqual(200, response.status)
        if parameters.get("format") == "tar":
            with tarfile.open(fileobj=io.BytesIO(response.body), mode="r:") as tar:
                return {entry.name.rstrip("/"): tar.extractfile(entry).read() if entry.isfile() else None
                        for entry in tar.getmembers()}
        with zipfile.ZipFile(io.BytesIO(response.body)) as packed:
            self.assertIsNone(packed.testzip())
            return {name.rstrip("/"): None if name.endswith("/") else packed.read(name) for name in packed.namelist()}


class Files(DownloadTestCase):
    def test_a_file_comes_whole_under_its_name(self):
        content = os.urandom(3_000_017)
        files.write(f"{PLACE}/zwölf \"2\" 100%.bin", content)
        response = self.get(f"{PLACE}/zwölf \"2\" 100%.bin")
        self.assertEqual((200, content), (response.status, response.body))
        self.assertEqual(["attachment; filename=\"zw_lf _2_ 100_.bin\"; filename*=UTF-8''zw%C3%B6lf%20%222%22%20100%25.bin"],
                         response.values("Content-Disposition"))
        self.assertEqual("application/octet-stream", response.values("Content-Type")[-1])
        self.assertEqual(["nosniff"], response.values("X-Content-Type-Options"))
        self.assertEqual([str(len(content))], response.values("Content-Length"))

    def test_ranges_and_conditions_hold(self):
        files.write(f"{PLACE}/file", b"0123456789")
        response = self.get(f"{PLACE}/file", headers={"Range": "bytes=2-4"})
        self.assertEqual((206, b"234", ["bytes 2-4/10"]),
                         (response.status, response.body, response.values("Content-Range")))
        tag, = response.values("ETag")
        self.assertEqual(304, self.get(f"{PLACE}/file", headers={"If-None-Match": tag}).status)
        self.assertEqual(416, self.get(f"{PLACE}/file", headers={"Range": "bytes=10-"}).status)
        response = self.get(f"{PLACE}/file", verb="HEAD")
        self.assertEqual((200, b"", ["10"]), (response.status, response.body, response.values("Content-Length")))

    def test_what_is_no_file_is_refused_and_never_waited_for(self):
        os.mkfifo(f"{PLACE}/pipe")
        os.mknod(f"{PLACE}/disk", 0o666 | 0o020000, os.makedev(1, 5))
        os.symlink("/etc/passwd", f"{PLACE}/link")
        os.link("/etc/shadow", f"{PLACE}/hard")
        begin = time.monotonic()
        for name, code in (("pipe", 406), ("disk", 406), ("link", 406), ("hard", 404), ("none", 403)):
            with self.subTest(name):
                self.assertEqual(code, self.get(f"{PLACE}/{name}").code())
                self.assertEqual(code, self.get(PLACE, f"{PLACE}/{name}").code())
        self.assertLess(time.monotonic() - begin, 20)

    def test_the_first_path_that_cannot_be_read_is_the_answer(self):
        files.write(f"{PLACE}/file")
        answer = self.get(f"{PLACE}/file", f"{PLACE}/none", "/etc/passwd").json()
        self.assertEqual({"code": 403, "errors": {"results": [{"path": f"{PLACE}/file"},
                                                              {"path": f"{PLACE}/none", "error": 403}]}}, answer["error"])

    def test_bad_parameters_are_named(self):
        files.write(f"{PLACE}/file")
        for value in ("rar", "", 7, None, ["zip"]):
            self.assertEqual({"parameter": "format"}, self.refused(101, "download", paths=[f"{PLACE}/file"], format=value))
        for value in ([], None, [None], 7, [PLACE] * 1001):
            self.assertEqual({"parameter": "paths"}, self.refused(101, "download", paths=value))

    def test_nobody_downloads_without_a_login_or_anothers_files(self):
        files.write(f"{PLACE}/file")
        self.assertEqual(119, self.get(f"{PLACE}/file", client=webclient.Client()).code())
        self.assertEqual(402, self.get(f"{PLACE}/file", client=self.admin).code())


class Archives(DownloadTestCase):
    def fill(self):
        os.makedirs(f"{PLACE}/tree/empty")
        os.makedirs(f"{PLACE}/tree/über/deep")
        names = {"a.txt": b"text" * 1000, "über/ö 😀.bin": os.urandom(300_000), "über/deep/zero": b"",
                 "über/deep/" + "n" * 200: b"long"}
        for name, content in names.items():
            files.write(f"{PLACE}/tree/{name}", content)
        files.give_tree("alice", f"{PLACE}/tree")
        return {"tree/" + os.fsdecode(name): content for name, content in files.tree(f"{PLACE}/tree").items()}

    def test_a_folder_comes_as_an_archive_that_holds_what_it_holds(self):
        expected = {"tree": None, **self.fill()}
        self.assertEqual(expected, self.archive(f"{PLACE}/tree"))
        self.assertEqual(expected, self.archive(f"{PLACE}/tree", format="zip"))
        self.assertEqual(expected, self.archive(f"{PLACE}/tree", format="tar"))

    def test_it_has_a_name_and_a_type(self):
        self.fill()
        for parameters, name, kind in (({}, "tree.zip", "application/zip"),
                                       ({"format": "tar"}, "tree.tar", "application/x-tar")):
            response = self.get(f"{PLACE}/tree", **parameters)
            self.assertEqual([f'attachment; filename="{name}"'], response.values("Content-Disposition"))
            self.assertEqual(kind, response.values("Content-Type")[-1])

    def test_times_come_along_and_owners_do_not(self):
        files.write(f"{PLACE}/file")
        files.give("alice", f"{PLACE}/file")
        os.chmod(f"{PLACE}/file", 0o4750)
        os.utime(f"{PLACE}/file", (1_000_000_000, 1_000_000_000))
        response = self.get(f"{PLACE}/file", format="tar")
        with tarfile.open(fileobj=io.BytesIO(response.body)) as tar:
            entry = tar.getmember("file")
        self.assertEqual((1_000_000_000, 0, 0, "", "", oct(0o755)),
                         (entry.mtime, entry.uid, entry.gid, entry.uname, entry.gname, oct(entry.mode)))

    def test_several_things_of_one_name_are_told_apart(self):
        for folder in ("a", "b"):
            os.mkdir(f"{PLACE}/{folder}")
            files.write(f"{PLACE}/{folder}/x", folder.encode())
        files.write(f"{PLACE}/{NOTE}", b"own")
        self.assertEqual({"x": b"a", "x (2)": b"b", NOTE + " (2)": b"own"},
                         self.archive(f"{PLACE}/a/x", f"{PLACE}/b/x", f"{PLACE}/{NOTE}"))

    def test_what_is_not_in_it_is_told(self):
        self.fill()
        os.symlink("/etc/passwd", f"{PLACE}/tree/link")
        os.symlink("/etc", f"{PLACE}/tree/folder-link")
        os.mkfifo(f"{PLACE}/tree/pipe")
        files.write(f"{PLACE}/tree/roots")
        os.chmod(f"{PLACE}/tree/roots", 0o600)
        os.chown(f"{PLACE}/tree/roots", 0, 0)
        os.mkdir(f"{PLACE}/tree/closed", 0o700)
        for form in ("zip", "tar"):
            found = self.archive(f"{PLACE}/tree", format=form)
            note = found.pop(NOTE).decode().splitlines()
            self.assertEqual({"tree/link: neither a file nor a folder", "tree/folder-link: neither a file nor a folder",
                              "tree/pipe: neither a file nor a folder", "tree/roots: may not be read",
                              "tree/closed: may not be read"}, set(note))
            self.assertNotIn("tree/link", found)

    def test_names_that_are_no_utf8_do_not_spoil_it(self):
        files.write(os.fsencode(PLACE) + b"/\xff\xfe")
        for form in ("zip", "tar"):
            self.assertEqual({"files", "files/\ufffd\ufffd"}, set(self.archive(PLACE, format=form)))

    def begin(self, *then):
        """An archive whose first file is so large that the others are read only when this client reads."""
        files.write(f"{PLACE}/first", os.urandom(60_000_000))
        reader = Reader(self.alice, paths=[f"{PLACE}/first", *then], format="tar")
        self.addCleanup(reader.close)
        return reader

    def test_a_file_that_vanishes_midway_is_told_and_the_rest_is_whole(self):
        whole = os.urandom(70_000)
        for name in ("gone", "whole"):
            files.write(f"{PLACE}/{name}", whole)
        reader = self.begin(f"{PLACE}/gone", f"{PLACE}/whole")
        os.unlink(f"{PLACE}/gone")
        data = reader.rest()
        with tarfile.open(fileobj=io.BytesIO(data)) as tar:
            self.assertEqual(["first", "whole", NOTE], tar.getnames())
            self.assertEqual(whole, tar.extractfile("whole").read())
            self.assertEqual(b"gone: cannot be read any more\n", tar.extractfile(NOTE).read())

    def test_a_file_that_gets_shorter_while_it_is_read_is_filled_up_and_told(self):
        files.write(f"{PLACE}/after", b"after")
        reader = self.begin(f"{PLACE}/after")
        os.truncate(f"{PLACE}/first", 10_000_000)
        data = reader.rest()
        with tarfile.open(fileobj=io.BytesIO(data)) as tar:
            self.assertEqual(["first", "after", NOTE], tar.getnames())
            self.assertEqual(60_000_000, tar.getmember("first").size)
            self.assertEqual(b"after", tar.extractfile("after").read())
            self.assertIn(b"first: got shorter", tar.extractfile(NOTE).read())

    def test_a_client_that_breaks_off_leaves_no_process(self):
        for form in ("zip", "tar"):
            files.write(f"{PLACE}/first", os.urandom(60_000_000))
            reader = Reader(self.alice, paths=[PLACE], format=form)
            reader.close()
            device.wait_for(lambda: not device.hosts_running(), "the end of the download")

    def test_a_large_archive_takes_little_memory_and_only_it_maps_the_library(self):
        with open(f"{PLACE}/large", "wb") as file:
            file.truncate(300_000_000)
        os.mkdir(f"{PLACE}/many")
        for number in range(3000):
            os.close(os.open(f"{PLACE}/many/{number}", os.O_CREAT | os.O_WRONLY))
        files.write(f"{PLACE}/noise", os.urandom(60_000_000))
        reader = Reader(self.alice, paths=[f"{PLACE}/large", f"{PLACE}/many", f"{PLACE}/noise"], format="tar")
        process, = device.hosts_running()
        self.assertIn("libarchive", maps_of(process))
        self.assertLess(status_of(process, "VmHWM:"), MOST_MEMORY)
        data = reader.rest()
        with tarfile.open(fileobj=io.BytesIO(data)) as tar:
            self.assertEqual(3003, len(tar.getnames()))
        reader.close()
        reader = Reader(self.alice, paths=[f"{PLACE}/large"])
        process, = device.hosts_running()
        maps = maps_of(process)
        reader.close()
        self.assertNotIn("libarchive", maps)

    def test_without_the_library_the_answer_says_so(self):
        library = os.path.realpath(glob.glob("/usr/lib/*/libarchive.so.13")[0])
        subprocess.run(["mount", "--bind", "/dev/null", library], check=True)
        try:
            files.write(f"{PLACE}/file")
            log = device.SystemLog()
            self.assertEqual(413, self.get(PLACE).code())
            log.wait_for("no archives can be made")
            self.assertEqual(b"content", self.get(f"{PLACE}/file").body)
        finally:
            subprocess.run(["umount", library], check=True)

    def test_a_folder_that_is_swapped_for_a_link_while_it_is_packed_leads_nowhere(self):
        victim = "/home/alice/victim"
        os.mkdir(victim)
        self.addCleanup(subprocess.run, ["rm", "-rf", victim], check=True)
        files.write(f"{victim}/secret", b"the secret")
        os.mkdir(f"{PLACE}/tree")
        for number in range(200):
            os.mkdir(f"{PLACE}/tree/{number}")
            files.write(f"{PLACE}/tree/{number}/harmless")
        os.symlink(victim, f"{PLACE}/link")
        files.give_tree("alice", PLACE)
        files.give_tree("alice", victim)
        stop = threading.Event()

        def swap():
            while not stop.is_set():
                for number in range(200):
                    os.rename(f"{PLACE}/tree/{number}", f"{PLACE}/aside")
                    os.rename(f"{PLACE}/link", f"{PLACE}/tree/{number}")
                    os.rename(f"{PLACE}/tree/{number}", f"{PLACE}/link")
                    os.rename(f"{PLACE}/aside", f"{PLACE}/tree/{number}")

        thread = threading.Thread(target=swap)
        thread.start()
        try:
            for _ in range(20):
                found = self.archive(f"{PLACE}/tree", format="tar")
                self.assertFalse([name for name in found if "secret" in name])
        finally:
            stop.set()
            thread.join()


if __name__ == "__main__":
    unittest.main()
