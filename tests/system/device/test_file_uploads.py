"""Uploads to the files of a user: placed whole or not at all, under the names that were asked for, and watched."""

import glob
import http.client
import json
import os
import pwd
import socket
import subprocess
import threading
import time
import unittest
import urllib.parse

import device
import files
import webclient
from files import COMMON, PLACE, form, part

PARTS = ("/tmp/zova-upload-*", "/var/tmp/zova-upload-*")
VOLUMES = "/etc/zova/volumes.json"


class SlowUpload:
    """An upload whose body is sent piece by piece."""

    def __init__(self, client, announced, **parameters):
        url = urllib.parse.urlsplit(device.URL)
        self.socket = socket.create_connection((url.hostname, url.port), timeout=device.TIME_LIMIT)
        lines = "".join(f"{name}: {value}\r\n" for name, value in client.headers().items())
        target = files.query("upload_deferred", **parameters)
        self.socket.sendall(f"POST {url.path}?{target} HTTP/1.1\r\nHost: {url.netloc}\r\nContent-Length: {announced}\r\n"
                            f"{lines}Content-Type: multipart/form-data; boundary={files.BOUNDARY}\r\n"
                            "Connection: close\r\n\r\n".encode())

    def send(self, data):
        self.socket.sendall(data)

    def answer(self):
        response = http.client.HTTPResponse(self.socket)
        response.begin()
        return json.loads(response.read())

    def close(self):
        self.socket.close()


class UploadTestCase(files.FilesTestCase):
    def tearDown(self):
        super().tearDown()
        self.assertEqual([], [path for pattern in PARTS for path in glob.glob(pattern)])
        for folder in (PLACE, COMMON):
            if os.path.isdir(folder):
                self.assertEqual([], [name for name in os.listdir(folder) if name.startswith(".")])

    def sent(self, body, **parameters):
        response = self.upload(body, **parameters)
        self.assertEqual(0, response.code(), response.body)
        return response.json()["data"]["results"]

    def mount(self, folder, size):
        subprocess.run(["mount", "-t", "tmpfs", "-o", f"size={size},mode=0777", "tmpfs", folder], check=True)
        self.addCleanup(subprocess.run, ["umount", folder], check=True)


class Uploads(UploadTestCase):
    def test_a_file_gets_name_time_owner_and_the_rights_of_its_folder(self):
        for folder_mode, mode in ((0o700, 0o600), (0o755, 0o644), (0o777, 0o664)):
            os.chmod(PLACE, folder_mode)
            row, = self.sent(form(part("file", b"photo", "ignored.jpg")), path=PLACE, name=f"{mode:o}.jpg",
                             mtime=1234567890)
            path = f"{PLACE}/{mode:o}.jpg"
            self.assertEqual({"field": "file", "path": path, "size": 5, "skipped": False}, row)
            state = os.stat(path)
            self.assertEqual((oct(0o100000 | mode), pwd.getpwnam("alice").pw_uid, 1234567890),
                             (oct(state.st_mode), state.st_uid, state.st_mtime))

    def test_the_parameters_may_be_fields_of_the_form(self):
        self.sent(form(part("path", PLACE.encode()), part("name", b"2024"), part("mtime", b"77"),
                       part("existing", b"overwrite"), part("file", b"text", "x")))
        self.assertEqual({b"2024": b"text"}, files.tree(PLACE))
        self.assertEqual(77, os.stat(f"{PLACE}/2024").st_mtime)

    def test_several_files_in_one_form(self):
        names = {"a": "first", "b": "zweite ö", "c": "{third}"}
        rows = self.sent(form(*(part(field, field.encode(), "x") for field in names),
                              part("names", json.dumps(names).encode()), part("mtimes", b'{"b": 5}')), path=PLACE)
        self.assertEqual([("a", f"{PLACE}/first"), ("b", f"{PLACE}/zweite ö"), ("c", f"{PLACE}/{{third}}")],
                         [(row["field"], row["path"]) for row in rows])
        self.assertEqual({"first".encode(): b"a", "zweite ö".encode(): b"b", b"{third}": b"c"}, files.tree(PLACE))
        self.assertEqual(5, os.stat(f"{PLACE}/zweite ö").st_mtime)

    def test_the_call_may_be_named_by_the_first_fields_and_a_file_may_come_as_a_slice(self):
        body = form(part("api", files.API.encode()), part("version", b"1"), part("method", b"upload"),
                    part("path", PLACE.encode()), part("name", b"form"), part("file", b"one", "x"))
        headers = {**self.alice.headers(), "Content-Type": f"multipart/form-data; boundary={files.BOUNDARY}"}
        self.assertEqual(0, webclient.request("POST", "", body, headers).code())
        headers = {**self.alice.headers(), "Content-Type": "application/octet-stream", "X-Type-Name": "SLICEUPLOAD"}
        for method, parameters in (("upload", {"name": "slice"}), ("upload_deferred", {"name": "late", "ticket": "t"})):
            answer = webclient.request("POST", files.query(method, path=PLACE, **parameters), b"two", headers)
            self.assertEqual(0, answer.code(), answer.body)
        self.assertEqual({b"form": b"one", b"slice": b"two", b"late": b"two"}, files.tree(PLACE))

    def test_what_is_there_is_refused_skipped_or_overwritten(self):
        files.write(f"{PLACE}/there", b"old")
        files.give("alice", f"{PLACE}/there")
        body = form(part("a", b"new", "x"), part("b", b"other", "x"))
        names = {"a": "there", "b": "new"}
        answer = self.upload(body, path=PLACE, names=names).json()["error"]
        self.assertEqual((405, [405, None]), (answer["code"], [row.get("error") for row in answer["errors"]["results"]]))
        self.assertEqual({b"there": b"old", b"new": b"other"}, files.tree(PLACE))
        rows = self.sent(body, path=PLACE, names=names, existing="skip")
        self.assertEqual([True, True], [row["skipped"] for row in rows])
        self.assertEqual(b"old", files.tree(PLACE)[b"there"])
        self.sent(body, path=PLACE, names=names, existing="overwrite")
        self.assertEqual({b"there": b"new", b"new": b"other"}, files.tree(PLACE))

    def test_a_link_in_the_place_is_replaced_and_not_followed(self):
        files.write("/home/alice/target", b"safe")
        self.addCleanup(os.unlink, "/home/alice/target")
        files.give("alice", "/home/alice/target")
        os.symlink("/home/alice/target", f"{PLACE}/link")
        self.assertEqual(405, self.upload(form(part("f", b"x", "x")), path=PLACE, name="link").code())
        self.sent(form(part("f", b"x", "x")), path=PLACE, name="link", existing="overwrite")
        self.assertFalse(os.path.islink(f"{PLACE}/link"))
        with open("/home/alice/target", "rb") as file:
            self.assertEqual(b"safe", file.read())

    def test_a_folder_is_not_overwritten(self):
        os.mkdir(f"{PLACE}/folder")
        self.assertEqual(406, self.upload(form(part("f", b"x", "x")), path=PLACE, name="folder",
                                          existing="overwrite").code())

    def test_nothing_is_placed_where_a_parameter_cannot_be_used(self):
        body = form(part("a", b"x", "x"))
        two = form(part("a", b"x", "x"), part("b", b"x", "x"))
        good = {"path": PLACE, "name": "n"}
        rows = [(body, {"name": "n"}, 101, "path"), (body, {"path": PLACE}, 101, "name"),
                (body, {**good, "path": 7}, 101, "path"), (body, {**good, "name": 7}, 101, "name"),
                (body, {**good, "name": ["n"]}, 101, "name"), (body, {**good, "existing": "replace"}, 101, "existing"),
                (body, {**good, "existing": 1}, 101, "existing"), (body, {**good, "mtime": -1}, 101, "mtime"),
                (body, {**good, "mtime": "x"}, 101, "mtime"), (body, {**good, "mtime": 1 << 40}, 101, "mtime"),
                (body, {**good, "names": []}, 101, "names"), (body, {**good, "names": {"a": 7}}, 101, "names"),
                (body, {**good, "mtimes": {"a": "x"}}, 101, "mtimes"), (two, good, 101, "names"),
                (two, {"path": PLACE, "names": {"a": "n"}}, 101, "names"), (form(part("a", b"x")), good, 101, "file")]
        for name in ("", ".", "..", "a/b", "/etc/passwd", "../x", "a\0b", "a\nb", "n" * 256, "\x7f"):
            rows.append((body, {**good, "name": name}, 401, None))
        for path in ("", "x", "//", f"{PLACE}/..", f"{PLACE}/"):
            rows.append((body, {**good, "path": path}, 401, None))
        rows += [(body, {**good, "path": "/etc"}, 402, None), (body, {**good, "path": f"{PLACE}/none"}, 403, None),
                 (body, {**good, "path": COMMON}, 404, None)]
        for content, parameters, code, parameter in rows:
            with self.subTest(parameters):
                error = self.upload(content, **parameters).json()["error"]
                self.assertEqual((code, parameter), (error["code"], error.get("errors", {}).get("parameter")))
        self.assertEqual({}, files.tree(PLACE))

    def test_a_field_that_claims_to_be_a_stored_file_is_none(self):
        error = self.upload(form(part("file", b"/home/alice/.profile")), path=PLACE, name="n").json()["error"]
        self.assertEqual({"code": 101, "errors": {"parameter": "file"}}, error)
        self.assertTrue(os.path.exists("/home/alice/.profile"))

    def test_without_a_login_nothing_is_stored(self):
        self.assertEqual(119, self.upload(form(part("f", b"x", "x")), client=webclient.Client(), path=PLACE,
                                          name="n").code())

    def test_a_shared_folder_gives_its_group(self):
        row, = self.sent(form(part("f", b"x", "x")), client=self.admin, path=COMMON, name="n")
        state = os.stat(row["path"])
        self.assertEqual((os.stat(COMMON).st_gid, oct(0o100664)), (state.st_gid, oct(state.st_mode)))

    def test_from_another_file_system_a_file_comes_whole_with_its_time(self):
        os.mkdir(f"{PLACE}/mounted")
        self.mount(f"{PLACE}/mounted", "64m")
        content = os.urandom(3_000_017)
        for existing in ("error", "overwrite"):
            self.sent(form(part("f", content, "x")), path=f"{PLACE}/mounted", name="n", mtime=99, existing=existing)
        self.assertEqual({b"n": content}, files.tree(f"{PLACE}/mounted"))
        self.assertEqual(99, os.stat(f"{PLACE}/mounted/n").st_mtime)
        self.assertEqual(405, self.upload(form(part("f", b"x", "x")), path=f"{PLACE}/mounted", name="n").code())

    def test_a_full_disk_takes_nothing_and_leaves_nothing(self):
        os.mkdir(f"{PLACE}/small")
        self.mount(f"{PLACE}/small", "1m")
        files.write(f"{PLACE}/small/n", b"old")
        files.give("alice", f"{PLACE}/small/n")
        body = form(part("f", os.urandom(2_000_000), "x"))
        self.assertEqual(408, self.upload(body, path=f"{PLACE}/small", name="n", existing="overwrite").code())
        self.assertEqual({b"n": b"old"}, files.tree(f"{PLACE}/small"))

    def test_of_two_who_send_one_name_at_once_one_wins(self):
        os.mkdir(f"{PLACE}/mounted")
        self.mount(f"{PLACE}/mounted", "64m")
        for folder in (PLACE, f"{PLACE}/mounted"):
            for number in range(10):
                answers = {}

                def send(letter):
                    body = form(part("f", letter.encode() * 300_000, "x"))
                    answers[letter] = self.upload(body, path=folder, name=f"n{number}").code()

                threads = [threading.Thread(target=send, args=letter) for letter in "ab"]
                for thread in threads:
                    thread.start()
                for thread in threads:
                    thread.join()
                self.assertEqual([0, 405], sorted(answers.values()))
                winner = min(answers, key=answers.get)
                with open(f"{folder}/n{number}", "rb") as file:
                    self.assertEqual(winner.encode() * 300_000, file.read())


class Deferred(UploadTestCase):
    def test_it_places_the_files_under_the_names_that_the_client_has_for_them(self):
        response = self.upload(form(part("a", b"first", "one.txt"), part("b", b"", "leer"), part("c", b"third", "x")),
                               method="upload_deferred", path=PLACE, ticket="t1", names={"c": "drei"}, mtimes={"c": 9})
        self.assertEqual(0, response.code(), response.body)
        data = response.json()["data"]
        self.assertEqual({b"one.txt": b"first", b"leer": b"", b"drei": b"third"}, files.tree(PLACE))
        self.assertEqual(9, os.stat(f"{PLACE}/drei").st_mtime)
        self.assertEqual([f"{PLACE}/one.txt", f"{PLACE}/leer", f"{PLACE}/drei"], [row["path"] for row in data["results"]])
        self.assertTrue(data["task_id"].startswith("alice/upload-t1-"))
        state = self.finished(data["task_id"])
        self.assertEqual((True, data["results"]), (state["data"]["done"], state["data"]["results"]))

    def test_a_bad_name_costs_its_file_alone(self):
        response = self.upload(form(part("a", b"1", "../evil"), part("b", b"2", "good")), method="upload_deferred",
                               path=PLACE, ticket="t")
        error = response.json()["error"]
        self.assertEqual((401, [401, None]), (error["code"], [row.get("error") for row in error["errors"]["results"]]))
        self.assertEqual({b"good": b"2"}, files.tree(PLACE))
        self.assertFalse(os.path.exists("/home/alice/evil"))

    def test_existing_files_are_refused_skipped_or_overwritten(self):
        files.write(f"{PLACE}/n", b"old")
        files.give("alice", f"{PLACE}/n")
        body = form(part("f", b"new", "n"))
        for existing, code, content in (("error", 405, b"old"), ("skip", 0, b"old"), ("overwrite", 0, b"new")):
            response = self.upload(body, method="upload_deferred", path=PLACE, ticket="t", existing=existing)
            self.assertEqual((code, {b"n": content}), (response.code(), files.tree(PLACE)))

    def test_bad_parameters_are_refused_before_a_file_is_taken(self):
        body = form(part("f", b"x", "n"))
        for parameters, code, parameter in (
                ({"ticket": "t"}, 101, "path"), ({"path": PLACE}, 101, "ticket"),
                ({"path": PLACE, "ticket": ""}, 101, "ticket"), ({"path": PLACE, "ticket": "a-b"}, 101, "ticket"),
                ({"path": PLACE, "ticket": "t" * 17}, 101, "ticket"), ({"path": PLACE, "ticket": ["t"]}, 101, "ticket"),
                ({"path": PLACE, "ticket": "t", "existing": "no"}, 101, "existing"),
                ({"path": "x", "ticket": "t"}, 401, None), ({"path": "/etc", "ticket": "t"}, 402, None),
                ({"path": COMMON, "ticket": "t"}, 404, None), ({"path": f"{PLACE}/none", "ticket": "t"}, 403, None)):
            with self.subTest(parameters):
                error = self.upload(body, method="upload_deferred", **parameters).json()["error"]
                self.assertEqual((code, parameter), (error["code"], error.get("errors", {}).get("parameter")))
        error = self.upload(form(part("f", b"x")), method="upload_deferred", path=PLACE, ticket="t").json()["error"]
        self.assertEqual({"code": 101, "errors": {"parameter": "file"}}, error)
        self.assertEqual({}, files.tree(PLACE))

    def task(self, ticket):
        def listed():
            answer = self.alice.call(files.TASK, "list", prefix=webclient.quoted(f"upload-{ticket}-")).json()
            return (answer["data"]["user"] or [None])[0]
        return device.wait_for(listed, "the task of the upload")

    def progress(self, task):
        return self.alice.call(files.TASK, "status", task_id=webclient.quoted(task)).json()["data"]

    def begin(self, ticket, length):
        body = form(part("f", b"x" * length, "large"))
        upload = SlowUpload(self.alice, len(body), path=PLACE, ticket=ticket)
        self.addCleanup(upload.close)
        upload.send(body[:length // 2])
        return upload, body, length // 2

    def test_its_progress_is_seen_while_the_body_is_on_its_way(self):
        upload, body, sent = self.begin("seen", 40_000_000)
        task = self.task("seen")
        seen = device.wait_for(lambda: self.progress(task)["data"]["taken"], "bytes that were taken")
        self.assertLessEqual(seen, sent)
        while sent < 30_000_000:
            upload.send(body[sent:sent + 1_000_000])
            sent += 1_000_000
            time.sleep(0.1)  # reports come twice a second
        device.wait_for(lambda: self.progress(task)["data"]["taken"] > seen, "more bytes that were taken")
        state = self.progress(task)
        self.assertEqual((False, False, len(body)), (state["finish"], state["data"]["done"], state["data"]["length"]))
        self.assertEqual(503, self.admin.call(files.TASK, "status", task_id=webclient.quoted(task)).code())
        self.assertEqual({}, files.tree(PLACE))
        upload.send(body[sent:])
        self.assertTrue(upload.answer()["success"])
        self.assertTrue(self.finished(task)["data"]["done"])
        self.assertEqual(40_000_000, os.path.getsize(f"{PLACE}/large"))

    def test_stopping_the_task_stops_the_upload(self):
        upload, body, sent = self.begin("stopped", 40_000_000)
        task = self.task("stopped")
        self.assertEqual(0, self.alice.call(files.TASK, "stop", task_id=webclient.quoted(task)).code())
        try:
            while sent < len(body):
                upload.send(body[sent:sent + 1_000_000])
                sent += 1_000_000
                time.sleep(0.05)
        except OSError:
            pass  # nobody takes the rest
        device.wait_for(lambda: not device.hosts_running(), "the end of the upload")
        self.assertEqual({}, files.tree(PLACE))

    def test_a_client_that_breaks_off_leaves_nothing_and_a_task_that_says_so(self):
        upload, _, _ = self.begin("broken", 40_000_000)
        task = self.task("broken")
        upload.close()
        state = self.finished(task)
        self.assertIn(state["error"]["code"], (108, 414))
        self.assertEqual({}, files.tree(PLACE))


if __name__ == "__main__":
    unittest.main()
