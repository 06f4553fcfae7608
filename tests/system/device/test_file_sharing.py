"""Files through sharing links: exactly what was shared, to whom it was shared, and as the link's owner."""

import io
import json
import os
import pwd
import shutil
import subprocess
import tarfile
import threading
import time
import unittest
import zipfile

import device
import files
import test_sharing
import webclient
from files import API, COMMON, PLACE

ALBUM = f"{PLACE}/album"
PHOTO = f"{ALBUM}/photo.jpg"
OTHER = f"{PLACE}/other"
OUTSIDE = ("/etc/passwd", PLACE, OTHER, "/home/alice", COMMON, f"{ALBUM}x", f"{ALBUM}/../other", f"{ALBUM}/..",
           f"{ALBUM}/./photo.jpg", f"{ALBUM}//photo.jpg", f"{ALBUM}/", "", "album", f"{ALBUM}/none", f"{PHOTO}\0",
           f"{ALBUM}/" + "n" * 256)


class FileSharing(files.FilesTestCase):
    def setUp(self):
        super().setUp()
        shutil.rmtree(test_sharing.STORE, ignore_errors=True)
        os.makedirs(f"{ALBUM}/deep")
        files.write(PHOTO, b"the photo")
        files.write(f"{ALBUM}/deep/more.jpg", b"more")
        files.write(OTHER, b"private")
        files.give_tree("alice", PLACE)

    def make(self, *paths, client=None, project=API, **fields):
        response = (client or self.alice).call(
            "ZOVA.Core.Sharing", "create", post=True, project=project, paths=json.dumps(list(paths) or [ALBUM]),
            **{name: json.dumps(value) for name, value in fields.items()})
        self.assertEqual(0, response.code(), response.body)
        return response.json()["data"]["hash"]

    def visitor(self, *paths, **fields):
        return test_sharing.Visitor(self.make(*paths, **fields))

    def opened(self, visitor, **parameters):
        response = visitor.open(**parameters)
        self.assertEqual(0, response.code(), response.body)
        return visitor

    def download(self, visitor, *paths, **parameters):
        return webclient.request("GET", files.query("download", paths=list(paths), **parameters),
                                 headers=visitor.headers())

    def read(self, visitor, path=PHOTO):
        """The content, or the error number."""
        response = self.download(visitor, path)
        return response.body if response.values("Content-Disposition") else response.code()

    def reaches(self, visitor):
        """Each way to what is shared answers the same."""
        answers = {self.call("list", visitor, path=ALBUM).code(), self.call("list", visitor).code(),
                   self.call("stat", visitor, paths=[PHOTO]).code()}
        content = self.read(visitor)
        answers.add(0 if content == b"the photo" else content)
        self.assertEqual(1, len(answers), answers)
        return answers.pop()

    # ---- what is shared ----

    def test_a_shared_folder_is_listed_looked_at_and_downloaded_with_all_that_lies_in_it(self):
        visitor = self.visitor()
        top = self.data("list", visitor)
        self.assertEqual(["album"], [entry["name"] for entry in top["entries"]])
        self.assertEqual(ALBUM, top["entries"][0]["path"])
        entries = self.data("list", visitor, path=ALBUM)["entries"]
        self.assertEqual(["deep", "photo.jpg"], [entry["name"] for entry in entries])
        self.assertEqual({"name", "path", "type", "size", "mtime"}, set(entries[1]))
        self.assertEqual(4, self.data("list", visitor, path=f"{ALBUM}/deep")["entries"][0]["size"])
        self.assertEqual("file", self.data("stat", visitor, paths=[PHOTO])["results"][0]["type"])
        self.assertEqual(b"the photo", self.read(visitor))
        self.assertEqual(b"more", self.read(visitor, f"{ALBUM}/deep/more.jpg"))
        with zipfile.ZipFile(io.BytesIO(self.download(visitor, ALBUM).body)) as packed:
            self.assertEqual({"album/", "album/deep/", "album/photo.jpg", "album/deep/more.jpg"}, set(packed.namelist()))
            self.assertEqual(b"more", packed.read("album/deep/more.jpg"))

    def test_a_shared_file_is_that_file_alone(self):
        visitor = self.visitor(PHOTO)
        self.assertEqual(["photo.jpg"], [entry["name"] for entry in self.data("list", visitor)["entries"]])
        self.assertEqual(b"the photo", self.read(visitor))
        for path in (ALBUM, f"{ALBUM}/deep", f"{ALBUM}/deep/more.jpg", OTHER, f"{PHOTO}/x"):
            self.assertEqual(127, self.read(visitor, path), path)
            self.assertEqual(127, self.call("list", visitor, path=path).code(), path)

    def test_nothing_else_can_be_reached_by_any_path(self):
        visitor = self.visitor()
        os.symlink("/etc/passwd", f"{ALBUM}/file-link")
        os.symlink(OTHER, f"{ALBUM}/near")
        os.symlink("/etc", f"{ALBUM}/way")
        os.symlink("photo.jpg", f"{ALBUM}/inside")
        os.mkfifo(f"{ALBUM}/pipe")
        files.write("/home/admin/admins", b"admin's")
        files.give("admin", "/home/admin/admins")
        self.addCleanup(os.unlink, "/home/admin/admins")
        os.link("/home/admin/admins", f"{ALBUM}/hard")
        for path in OUTSIDE + tuple(f"{ALBUM}/{name}" for name in ("file-link", "near", "way", "way/passwd", "inside",
                                                                   "pipe", "hard")):
            with self.subTest(path[:60]):
                self.assertEqual(127, self.read(visitor, path))
                self.assertEqual(127, self.download(visitor, ALBUM, path).code())
                self.assertEqual(127, self.call("stat", visitor, paths=[PHOTO, path]).code())
                self.assertEqual(127, self.call("list", visitor, path=path).code())
        self.assertEqual(0, self.reaches(visitor))

    def test_the_method_keeps_to_the_link_by_itself_where_nobody_asks_the_check(self):
        description = f"{device.FOLDER}/{API}.lib"
        with open(description, encoding="utf-8") as file:
            text = file.read()
        self.addCleanup(self.replace, description, text)
        self.replace(description, text.replace('"allowSharing": true', '"allowSharing": true, "skipSharingAppCheck": true'))
        visitor = self.visitor()
        os.symlink("photo.jpg", f"{ALBUM}/link")
        files.write(f"{ALBUM}/admins")
        files.give("admin", f"{ALBUM}/admins")
        os.chmod(f"{ALBUM}/admins", 0o644)
        for path in OUTSIDE + (f"{ALBUM}/link", f"{ALBUM}/admins"):
            with self.subTest(path[:60]):
                # What is no path at all is told before anything else.
                codes = {401, 402}
                self.assertIn(self.read(visitor, path), codes)
                self.assertIn(self.download(visitor, ALBUM, path).code(), codes)
                self.assertIn(self.call("stat", visitor, paths=[PHOTO, path]).code(), codes)
                self.assertIn(self.call("list", visitor, path=path).code(), codes)
        self.assertEqual(0, self.reaches(visitor))

    @staticmethod
    def replace(path, text):
        with open(path, "w", encoding="utf-8") as file:
            file.write(text)

    def test_what_lies_there_but_is_not_the_owners_is_neither_listed_nor_packed(self):
        visitor = self.visitor()
        os.symlink("/etc/passwd", f"{ALBUM}/link")
        os.symlink("/etc", f"{ALBUM}/deep/link")
        os.mkfifo(f"{ALBUM}/pipe")
        os.mkdir(f"{ALBUM}/admins-folder")
        files.write(f"{ALBUM}/admins-folder/file")
        files.give("admin", f"{ALBUM}/admins-folder", f"{ALBUM}/admins-folder/file")
        files.write(f"{ALBUM}/deep/admins")
        files.give("admin", f"{ALBUM}/deep/admins")
        for sort in ("name", "size", "mtime", "type"):
            data = self.data("list", visitor, path=ALBUM, sort=sort)
            self.assertEqual(({"deep", "photo.jpg"}, 2),
                             ({entry["name"] for entry in data["entries"]}, data["total"]))
        with tarfile.open(fileobj=io.BytesIO(self.download(visitor, ALBUM, format="tar").body)) as tar:
            self.assertEqual({"album", "album/deep", "album/photo.jpg", "album/deep/more.jpg"}, set(tar.getnames()))

    def test_what_was_moved_away_or_replaced_is_shared_no_more(self):
        visitor = self.visitor(PHOTO)
        os.rename(PHOTO, OTHER)
        self.assertEqual(127, self.read(visitor))
        self.assertEqual([], self.data("list", visitor)["entries"])
        os.symlink(OTHER, PHOTO)
        self.assertEqual(127, self.read(visitor))
        folder = self.visitor()
        os.rename(ALBUM, f"{PLACE}/moved")
        os.symlink(f"{PLACE}/moved", ALBUM)
        self.assertEqual(127, self.read(folder, f"{ALBUM}/deep/more.jpg"))
        self.assertEqual(127, self.read(folder, f"{PLACE}/moved/deep/more.jpg"))

    def test_what_the_method_sends_is_what_the_check_saw_whoever_swaps_meanwhile(self):
        visitor = self.visitor()
        files.write("/home/alice/victim", b"private")
        files.give("alice", "/home/alice/victim")
        self.addCleanup(os.unlink, "/home/alice/victim")
        os.symlink("/home/alice", f"{ALBUM}/link")
        os.mkdir(f"{ALBUM}/folder")
        files.write(f"{ALBUM}/folder/victim", b"harmless")
        files.give_tree("alice", ALBUM)
        stop = threading.Event()

        def swap():
            while not stop.is_set():
                os.rename(f"{ALBUM}/folder", f"{ALBUM}/aside")
                os.rename(f"{ALBUM}/link", f"{ALBUM}/folder")
                os.rename(f"{ALBUM}/folder", f"{ALBUM}/link")
                os.rename(f"{ALBUM}/aside", f"{ALBUM}/folder")

        thread = threading.Thread(target=swap)
        thread.start()
        seen = set()
        try:
            for _ in range(150):
                seen.add(self.read(visitor, f"{ALBUM}/folder/victim"))
                packed = self.download(visitor, ALBUM, format="tar").body
                self.assertNotIn(b"private", packed)
        finally:
            stop.set()
            thread.join()
        self.assertLessEqual(seen, {b"harmless", 127, 402, 403, 406})
        self.assertIn(b"harmless", seen)

    def test_several_paths_of_one_link(self):
        visitor = self.visitor(PHOTO, OTHER)
        self.assertEqual([PHOTO, OTHER], [entry["path"] for entry in self.data("list", visitor)["entries"]])
        with zipfile.ZipFile(io.BytesIO(self.download(visitor, PHOTO, OTHER).body)) as packed:
            self.assertEqual({"photo.jpg": b"the photo", "other": b"private"},
                             {name: packed.read(name) for name in packed.namelist()})
        os.unlink(OTHER)
        self.assertEqual([PHOTO], [entry["path"] for entry in self.data("list", visitor)["entries"]])

    # ---- as whom ----

    def test_files_are_read_as_the_owner_who_may_have_lost_access(self):
        self.assertEqual(b"the photo", self.read(self.visitor()))
        os.chmod(PHOTO, 0)
        self.assertEqual(404, self.read(self.visitor()))
        os.chmod(PHOTO, 0o600)
        visitor = self.visitor()
        os.chown(PLACE, 0, 0)
        self.assertEqual(404, self.read(visitor))

    def test_a_shared_folder_of_the_device_serves_as_long_as_the_owner_may_read_it(self):
        files.write(f"{COMMON}/file", b"common")
        files.give("alice", f"{COMMON}/file")
        visitor = self.visitor(f"{COMMON}/file")
        self.assertEqual(b"common", self.read(visitor, f"{COMMON}/file"))
        self.write_table(json.dumps({"folders": []}))
        self.assertEqual(402, self.read(visitor, f"{COMMON}/file"))
        self.assertEqual([], self.data("list", visitor)["entries"])

    def test_what_lies_in_none_of_the_owners_folders_is_not_served(self):
        files.write("/srv/alices", b"alice's")
        files.give("alice", "/srv/alices")
        self.addCleanup(os.unlink, "/srv/alices")
        self.assertEqual(402, self.read(self.visitor("/srv/alices"), "/srv/alices"))

    def test_an_owner_who_is_locked_or_gone_closes_the_link(self):
        subprocess.run(["useradd", "--create-home", "owner"], check=True)
        try:
            files.write("/home/owner/file", b"owner's")
            files.give("owner", "/home/owner/file")
            subprocess.run(["chpasswd"], input=f"owner:{device.PASSWORD}", text=True, check=True)
            visitor = self.visitor("/home/owner/file", client=webclient.logged_in("owner"))
            self.assertEqual(b"owner's", self.read(visitor, "/home/owner/file"))
            subprocess.run(["usermod", "--expiredate", "1", "owner"], check=True)
            self.assertEqual(126, self.read(visitor, "/home/owner/file"))
            subprocess.run(["usermod", "--expiredate", "", "owner"], check=True)
            self.assertEqual(b"owner's", self.read(visitor, "/home/owner/file"))
        finally:
            subprocess.run(["userdel", "--force", "owner"], check=True)
        self.addCleanup(shutil.rmtree, "/home/owner")
        self.assertEqual(126, self.read(visitor, "/home/owner/file"))

    def test_a_visitor_who_is_logged_in_gets_no_more_for_it(self):
        visitor = self.visitor()
        visitor.cookies = dict(self.admin.cookies)
        self.assertEqual(127, self.call("list", visitor, path="/home/admin").code())
        self.assertEqual([ALBUM], [entry["path"] for entry in self.data("list", visitor)["entries"]])

    # ---- each answer of the gate ----

    def test_only_what_is_open_to_links_can_be_called(self):
        visitor = self.visitor()
        for method, parameters in (("mkdir", {"path": f"{ALBUM}/new"}), ("delete", {"paths": [PHOTO]}),
                                   ("rename", {"path": PHOTO, "to": f"{ALBUM}/x"})):
            self.assertEqual(126, self.call(method, visitor, **parameters).code(), method)
        for method in ("upload", "upload_deferred"):
            response = self.upload(files.form(files.part("f", b"x", "x")), visitor, method, path=ALBUM, name="n",
                                   ticket="t")
            self.assertEqual(126, response.code(), method)
        self.assertEqual({b"photo.jpg", b"deep", b"deep/more.jpg"}, set(files.tree(ALBUM)))

    def test_a_public_link_serves_at_once_and_an_unknown_one_never(self):
        self.assertEqual(0, self.reaches(self.visitor()))
        self.assertEqual(101, self.reaches(test_sharing.Visitor(test_sharing.UNKNOWN)))

    def test_a_password_has_to_be_given(self):
        visitor = self.visitor(protect_type=1, password="secret")
        self.assertEqual(122, self.reaches(visitor))
        self.assertEqual(400, visitor.open(password="wrong").code())
        self.assertEqual(122, self.reaches(visitor))
        self.assertEqual(0, self.reaches(self.opened(visitor, password="secret")))

    def test_a_link_for_a_user_reads_as_its_owner_and_not_as_that_user(self):
        visitor = self.visitor(protect_type=2, users=["admin"])
        self.assertEqual(122, self.reaches(visitor))
        self.assertEqual(400, visitor.open(user="alice", password=webclient.quoted(device.PASSWORD)).code())
        self.opened(visitor, user="admin", password=webclient.quoted(device.PASSWORD))
        # Only alice may enter the folder above.
        self.assertEqual(0, self.reaches(visitor))
        self.assertEqual(127, self.call("list", visitor, path="/home/admin").code())
        self.assertEqual(126, self.call("mkdir", visitor, path="/home/admin/new").code())

    def test_an_expired_link_and_one_that_is_off_answer_126(self):
        visitor = self.visitor(expires=int(time.time()) + 3600)
        self.assertEqual(0, self.reaches(visitor))
        test_sharing.Sharing.change("UPDATE entries SET expires = ?", int(time.time()) - 1)
        self.assertEqual(126, self.reaches(visitor))
        self.assertEqual(126, self.reaches(self.visitor(enabled=False)))

    def test_a_session_of_another_link_and_one_that_has_ended(self):
        visitor = self.opened(self.visitor(protect_type=1, password="one"), password="one")
        other = self.make(protect_type=1, password="two")
        visitor.link, first = other, visitor.link
        self.assertEqual(123, self.reaches(visitor))
        visitor.link = first
        test_sharing.Sharing.change("UPDATE sessions SET expires = ?", int(time.time()) - 1)
        self.assertEqual(125, self.reaches(visitor))

    def test_another_address_answers_150(self):
        self.assertEqual(150, self.reaches(self.visitor(addresses=["192.0.2.1"])))
        visitor = self.opened(self.visitor(match_ip=True))
        test_sharing.Sharing.change("UPDATE sessions SET address = '192.0.2.1'")
        self.assertEqual(150, self.reaches(visitor))

    def test_a_database_that_cannot_be_asked_answers_124(self):
        visitor = self.visitor()
        os.chmod(test_sharing.DATABASE, 0o644)
        self.assertEqual(124, self.reaches(visitor))
        os.chmod(test_sharing.DATABASE, 0o600)
        self.assertEqual(0, self.reaches(visitor))

    def test_a_link_of_another_project_answers_127(self):
        self.assertEqual(127, self.reaches(self.visitor(project="other")))

    def test_what_is_no_path_is_refused_by_the_check(self):
        visitor = self.visitor()
        for value in (7, None, True, {"a": 1}, [7], [[ALBUM]]):
            with self.subTest(value):
                self.assertEqual(127, self.call("download", visitor, paths=value).code())
                self.assertEqual(127, self.call("stat", visitor, paths=value).code())
                self.assertEqual(127, self.call("list", visitor, path=value).code())
        self.assertEqual(101, self.call("download", visitor, paths=[]).code())
        self.assertEqual(101, self.call("stat", visitor).code())

    def test_links_are_made_of_the_paths_that_the_list_shows(self):
        for entry in self.data("list", path=ALBUM)["entries"]:
            self.assertEqual(0, self.call("stat", self.visitor(entry["path"]), paths=[entry["path"]]).code())


if __name__ == "__main__":
    unittest.main()
