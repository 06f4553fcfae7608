"""Sharing links from end to end: made by their owner, opened by visitors, checked by their project."""

import contextlib
import json
import os
import pwd
import shutil
import sqlite3
import time

import device
import webclient

BUILD = os.environ["WEBAPI_BUILD"]
API = "ZOVA.Test.Sharing"
OWNER_API = "ZOVA.Core.Sharing"
VISIT_API = "ZOVA.Core.Sharing.Visit"
PROBE = os.path.join(os.path.dirname(os.path.dirname(os.path.abspath(__file__))), "probe")
CHECKS = "/usr/lib/sharing/permission_lib"
PLACES = {
    f"/usr/lib/zova/webapi/{API}.so": f"{BUILD}/bin/{API}.so",
    f"{device.FOLDER}/{API}.lib": f"{PROBE}/{API}.lib",
    f"{CHECKS}/probe.so": f"{BUILD}/bin/{API}.so",
}
STORE = "/var/lib/zova/sharing"
DATABASE = f"{STORE}/sharing.db"
ALBUM = "/home/alice/album"
PHOTO = f"{ALBUM}/photo.txt"
UNKNOWN = "0123456789abcdef0123456789abcdef"


class Visitor(webclient.Client):
    """Somebody who follows a link."""

    def __init__(self, link):
        super().__init__()
        self.link = link

    def headers(self):
        return {**super().headers(), "X-Sharing-Id": self.link}

    def open(self, **parameters):
        client = webclient.Client()
        response = client.call(VISIT_API, "open", post=True, hash=webclient.quoted(self.link), **parameters)
        self.cookies.update(client.cookies)
        return response

    def read(self, path=PHOTO):
        return self.call(API, "read", path=path)


class SharingTestCase(device.DeviceTestCase):
    """With the package and its project, an album of alice's, and no link yet."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        os.makedirs(CHECKS, exist_ok=True)
        for place, source in PLACES.items():
            shutil.copyfile(source, place)
            cls.addClassCleanup(os.unlink, place)
        cls.alice = webclient.logged_in("alice")
        cls.admin = webclient.logged_in("admin")

    def setUp(self):
        super().setUp()
        for folder in (STORE, ALBUM):
            shutil.rmtree(folder, ignore_errors=True)
        os.mkdir(ALBUM)
        with open(PHOTO, "w", encoding="utf-8") as file:
            file.write("a photo")
        self.give_to_alice(ALBUM, PHOTO)

    @staticmethod
    def give_to_alice(*paths):
        alice = pwd.getpwnam("alice")
        for path in paths:
            os.chown(path, alice.pw_uid, alice.pw_gid, follow_symlinks=False)

    def make(self, project="probe", **fields):
        response = self.alice.call(OWNER_API, "create", post=True, project=project, paths=json.dumps([ALBUM]),
                                   **{name: json.dumps(value) for name, value in fields.items()})
        self.assertEqual(0, response.code(), response.body)
        return response.json()["data"]["hash"]

    def update(self, link, **fields):
        response = self.alice.call(OWNER_API, "update", post=True, hash=webclient.quoted(link),
                                   **{name: json.dumps(value) for name, value in fields.items()})
        self.assertEqual(0, response.code(), response.body)

    def opened(self, link, **parameters):
        visitor = Visitor(link)
        response = visitor.open(**parameters)
        self.assertEqual(0, response.code(), response.body)
        return visitor

    @staticmethod
    def change(statement, *values):
        """What time or another place would have done to the database."""
        with contextlib.closing(sqlite3.connect(DATABASE)) as database, database:
            database.execute(statement, values)


class Sharing(SharingTestCase):
    # ---- who gets through ----

    def test_a_visitor_reads_what_a_public_link_shares_without_a_login(self):
        response = Visitor(self.make()).read()
        self.assertEqual({"content": "a photo", "user": ""}, response.json()["data"])

    def test_without_a_link_the_login_decides(self):
        self.assertEqual(119, webclient.Client().call(API, "read", path=PHOTO).code())
        self.assertEqual("alice", self.alice.call(API, "read", path=PHOTO).json()["data"]["user"])

    def test_link_and_session_arrive_as_parameters_too(self):
        link = self.make(protect_type=1, password="secret")
        visitor = self.opened(link, password="secret")
        plain = webclient.Client()
        answer = plain.call(API, "read", path=PHOTO, _sharing_id=webclient.quoted(link),
                            _sharing_sid=webclient.quoted(visitor.cookies["sharing_sid"]))
        self.assertEqual("a photo", answer.json()["data"]["content"])
        self.assertEqual(122, plain.call(API, "read", path=PHOTO, _sharing_id=webclient.quoted(link)).code())

    def test_a_link_for_a_user_makes_the_visitor_that_user(self):
        link = self.make(protect_type=2, users=["admin"])
        self.assertEqual(122, Visitor(link).read().code())
        self.assertEqual(400, Visitor(link).open(user="admin", password="wrong").code())
        self.assertEqual(400, Visitor(link).open(user="alice", password=webclient.quoted(device.PASSWORD)).code())
        visitor = self.opened(link, user="admin", password=webclient.quoted(device.PASSWORD))
        self.assertEqual("admin", visitor.read().json()["data"]["user"])
        told = visitor.call(API, "unchecked").json()["data"]
        self.assertEqual({"sharing": True, "user": "admin", "authorized": True, "project": "probe"}, told)

    def test_a_login_beside_a_link_does_not_count(self):
        visitor = Visitor(UNKNOWN)
        visitor.cookies = dict(self.alice.cookies)
        visitor.token = self.alice.token
        self.assertEqual(126, visitor.call("ZOVA.Core.User", "get").code())
        visitor.link = self.make()
        self.assertEqual("", visitor.read().json()["data"]["user"])

    # ---- each answer of the gate ----

    def test_a_method_that_does_not_allow_links_answers_126(self):
        link = self.make()
        self.assertEqual(126, Visitor(link).call(API, "closed").code())
        self.assertEqual(126, Visitor(link).call("ZOVA.Core.User", "list").code())
        self.assertEqual(126, Visitor(link).call(OWNER_API, "list").code())

    def test_an_unknown_or_malformed_hash_answers_101(self):
        link = self.make()
        for other in (UNKNOWN, link[:-1], link + "0", link.upper(), "x", "'; DROP TABLE entries; --", "../" + link,
                      "a" * 5000):
            with self.subTest(other[:60]):
                self.assertEqual(101, Visitor(other).read().code())
        self.assertEqual(0, Visitor(link).read().code())

    def test_before_any_link_was_made_every_hash_answers_101_and_no_database_is_made(self):
        self.assertEqual(101, Visitor(UNKNOWN).read().code())
        self.assertEqual(402, Visitor(UNKNOWN).open().code())
        self.assertFalse(os.path.exists(STORE))

    def test_a_link_that_has_expired_or_is_off_answers_126(self):
        link = self.make(expires=int(time.time()) + 3600)
        visitor = Visitor(link)
        self.assertEqual(0, visitor.read().code())
        self.change("UPDATE entries SET expires = ?", int(time.time()) - 1)
        self.assertEqual(126, visitor.read().code())
        self.update(link, expires=0, enabled=False)
        self.assertEqual(126, visitor.read().code())
        self.update(link, enabled=True)
        self.assertEqual(0, visitor.read().code())

    def test_a_wrong_password_opens_nothing_and_the_call_answers_122(self):
        link = self.make(protect_type=1, password="secret")
        visitor = Visitor(link)
        for parameters in ({"password": "wrong"}, {}, {"password": webclient.quoted("Secret")}):
            self.assertEqual(400, visitor.open(**parameters).code())
            self.assertNotIn("sharing_sid", visitor.cookies)
            self.assertEqual(122, visitor.read().code())
        visitor.cookies["sharing_sid"] = "0" * 64
        self.assertEqual(122, visitor.read().code())
        self.assertEqual(0, visitor.open(password="secret").code())
        self.assertEqual(0, visitor.read().code())

    def test_guessing_is_blocked(self):
        visitor = Visitor(self.make(protect_type=1, password="secret"))
        codes = [visitor.open(password=f"guess{number}").code() for number in range(6)]
        self.assertEqual([400] * 5 + [407], codes)
        self.assertEqual(407, visitor.open(password="secret").code())

    def test_the_session_of_another_link_answers_123(self):
        first = self.make(protect_type=1, password="one")
        second = self.make(protect_type=1, password="two")
        visitor = self.opened(first, password="one")
        self.assertEqual(0, visitor.read().code())
        visitor.link = second
        self.assertEqual(123, visitor.read().code())

    def test_a_session_that_has_ended_answers_125(self):
        visitor = self.opened(self.make(protect_type=1, password="one"), password="one")
        self.change("UPDATE sessions SET expires = ?", int(time.time()) - 1)
        self.assertEqual(125, visitor.read().code())

    def test_another_address_answers_150(self):
        elsewhere = self.make(addresses=["192.0.2.1"])
        self.assertEqual(150, Visitor(elsewhere).read().code())
        self.assertEqual(402, Visitor(elsewhere).open().code())
        visitor = self.opened(self.make(match_ip=True))
        self.assertEqual(0, visitor.read().code())
        self.change("UPDATE sessions SET address = '192.0.2.1'")
        self.assertEqual(150, visitor.read().code())

    def test_a_database_that_cannot_be_used_answers_124_and_is_logged(self):
        visitor = Visitor(self.make())
        os.chmod(DATABASE, 0o644)
        log = device.SystemLog()
        self.assertEqual(124, visitor.read().code())
        log.wait_for(f"database {DATABASE} cannot be used")
        os.chmod(DATABASE, 0o600)
        self.assertEqual(0, visitor.read().code())

    def test_the_project_decides_for_each_method(self):
        visitor = Visitor(self.make())
        self.assertEqual(127, visitor.call(API, "refused").code())
        self.assertEqual(127, visitor.call(API, "unlisted").code())
        self.assertEqual(0, visitor.call(API, "unchecked").code())

    def test_a_link_of_another_project_gets_nothing_here(self):
        visitor = Visitor(self.make(project="other"))
        log = device.SystemLog()
        self.assertEqual(127, visitor.read().code())
        log.wait_for(f"cannot open library: {CHECKS}/other.so")
        self.assertEqual(0, visitor.call(API, "unchecked").code())

    def test_nothing_but_what_is_shared_can_be_read(self):
        visitor = Visitor(self.make())
        os.symlink("/etc/shadow", f"{ALBUM}/soft")
        os.symlink("/etc", f"{ALBUM}/way")
        with open("/home/alice/private.txt", "w", encoding="utf-8") as file:
            file.write("private")
        with open("/home/somebody.txt", "w", encoding="utf-8") as file:
            file.write("somebody else's")
        self.addCleanup(os.unlink, "/home/somebody.txt")
        self.addCleanup(os.unlink, "/home/alice/private.txt")
        os.link("/home/somebody.txt", f"{ALBUM}/hard")
        self.give_to_alice("/home/alice/private.txt", f"{ALBUM}/soft", f"{ALBUM}/way")
        for path in ("/etc/shadow", "/home/alice/private.txt", f"{ALBUM}/../private.txt", f"{ALBUM}/soft",
                     f"{ALBUM}/way/shadow", f"{ALBUM}/hard", f"{ALBUM}/./photo.txt", f"{ALBUM}//photo.txt",
                     "album/photo.txt", "", f"{ALBUM}x"):
            with self.subTest(path):
                self.assertEqual(127, visitor.read(path).code())
        self.assertEqual(0, visitor.read().code())

    def test_a_batch_through_a_link_checks_each_entry(self):
        visitor = Visitor(self.make())
        entries = [{"api": API, "version": 1, "method": method, "path": PHOTO} for method in ("read", "closed")]
        answer = visitor.call("ZOVA.Entry.Request", "request", post=True, compound=json.dumps(entries)).json()
        self.assertEqual([0, 126],
                         [row.get("error", {}).get("code", 0) for row in answer["data"]["result"]], answer)

    # ---- owners and their links ----

    def test_a_used_up_link_serves_those_who_used_it_and_nobody_else(self):
        link = self.make(visit_limit=1)
        visitor = self.opened(link)
        self.assertEqual(0, visitor.read().code())
        self.assertEqual(402, Visitor(link).open().code())
        self.assertEqual(126, Visitor(link).read().code())

    def test_a_change_of_the_password_ends_the_visits(self):
        link = self.make(protect_type=1, password="one")
        visitor = self.opened(link, password="one")
        self.update(link, password="two")
        self.assertEqual(123, visitor.read().code())
        self.assertEqual(0, self.opened(link, password="two").read().code())

    def test_links_are_their_owners_alone(self):
        link = self.make()
        for method in ("get", "update", "delete"):
            self.assertEqual(402, self.admin.call(OWNER_API, method, post=True, hash=webclient.quoted(link)).code())
        self.assertEqual([], self.admin.call(OWNER_API, "list").json()["data"]["links"])
        listed = self.alice.call(OWNER_API, "list").json()["data"]["links"]
        self.assertEqual([link], [row["hash"] for row in listed])
        self.assertTrue(listed[0]["url"].endswith("/sharing/" + link), listed[0]["url"])
        self.assertEqual(0, self.alice.call(OWNER_API, "delete", post=True, hash=webclient.quoted(link)).code())
        self.assertEqual(101, Visitor(link).read().code())

    def test_links_are_made_by_those_who_are_logged_in_and_of_their_own_files(self):
        wish = {"project": "probe", "paths": json.dumps([ALBUM])}
        self.assertEqual(119, webclient.Client().call(OWNER_API, "create", post=True, **wish).code())
        response = self.admin.call(OWNER_API, "create", post=True, **wish)
        self.assertEqual({"code": 101, "errors": {"parameter": "paths"}}, response.json()["error"])

    def test_the_database_is_roots_alone_and_holds_no_secret(self):
        visitor = self.opened(self.make(protect_type=1, password="secretsecret"), password="secretsecret")
        for path, mode in ((STORE, 0o40700), (DATABASE, 0o100600)):
            state = os.lstat(path)
            self.assertEqual((oct(mode), 0), (oct(state.st_mode), state.st_uid))
        with open(DATABASE, "rb") as file:
            content = file.read()
        self.assertNotIn(b"secretsecret", content)
        self.assertNotIn(visitor.cookies["sharing_sid"].encode(), content)
