"""Session ids as a hostile client makes them up."""

import os
import unittest

import bad_input
import device
import host
import webclient

IDS = {
    "path to another file": "../../../etc/passwd",
    "absolute path": "/etc/passwd",
    "path that comes back": "../sessions/{sid}",
    "dot before it": "./{sid}",
    "slash behind it": "{sid}/",
    "dot": ".",
    "two dots": "..",
    "one digit short": "{short}",
    "one digit long": "{sid}0",
    "capital letters": "{capitals}",
    "a line end behind it": "{sid}%0d%0aSet-Cookie:%20x=y",
    "format": "%25s%25n%25x" + "0" * 50,
    "64 zeros": "0" * 64,
    "64 KB of digits": "0" * 65536,
    "64 KB of path": "../" * 21845,
    "empty": "",
}


class SessionIds(device.DeviceTestCase):
    def setUp(self):
        super().setUp()
        self.sid = webclient.logged_in("alice").cookies["id"]

    def made_up(self):
        for name, pattern in IDS.items():
            yield name, pattern.format(sid=self.sid, short=self.sid[:-1], capitals=self.sid[:-1] + "A")

    def assert_refused(self, outcome):
        self.assertEqual((b"", 0), (outcome.errors, outcome.status))
        lines, body = outcome.parts()
        self.assertEqual(set(), {line.split(b":")[0] for line in lines} - host.NAMES)
        self.assertEqual(b'{"error":{"code":119},"success":false}', body)

    def test_the_id_itself_is_good(self):
        outcome = host.get(bad_input.CALL.decode(), HTTP_COOKIE="id=" + self.sid, REMOTE_ADDR="127.0.0.1")
        self.assertIn(b'"success":true', outcome.output)

    def test_made_up_ids_in_the_cookie_are_no_login_and_write_nothing(self):
        before = device.watched_files()
        for name, sid in self.made_up():
            with self.subTest(name):
                self.assert_refused(host.get(bad_input.CALL.decode(), HTTP_COOKIE="id=" + sid,
                                             REMOTE_ADDR="127.0.0.1"))
        self.assertEqual(before, device.watched_files())

    def test_made_up_ids_in_the_parameter_are_no_login_and_write_nothing(self):
        before = device.watched_files()
        for name, sid in self.made_up():
            with self.subTest(name):
                body = bad_input.CALL + b'&_sid="' + sid.encode() + b'"'
                self.assert_refused(host.post(body, REMOTE_ADDR="127.0.0.1"))
        self.assertEqual(before, device.watched_files())

    def test_logout_with_a_made_up_id_removes_no_file(self):
        query = "api=ZOVA.Core.Session&version=1&method=logout"
        before = device.watched_files()
        for name, sid in self.made_up():
            with self.subTest(name):
                outcome = host.get(query, HTTP_COOKIE="id=" + sid, REMOTE_ADDR="127.0.0.1")
                self.assertEqual((b"", 0), (outcome.errors, outcome.status))
        self.assertEqual(before, device.watched_files())

    def test_a_link_to_a_good_session_is_none(self):
        name = f"{device.SESSIONS}/{'ab' * 32}"
        os.symlink(f"{device.SESSIONS}/{self.sid}", name)
        self.addCleanup(os.unlink, name)
        outcome = host.get(bad_input.CALL.decode(), HTTP_COOKIE="id=" + "ab" * 32, REMOTE_ADDR="127.0.0.1")
        self.assertIn(b'"success":false', outcome.output)

    def test_a_session_file_of_another_user_is_none(self):
        name = f"{device.SESSIONS}/{'cd' * 32}"
        with open(f"{device.SESSIONS}/{self.sid}", "rb") as good, open(name, "wb") as copy:
            copy.write(good.read())
        self.addCleanup(os.unlink, name)
        os.chown(name, 65534, 65534)
        outcome = host.get(bad_input.CALL.decode(), HTTP_COOKIE="id=" + "cd" * 32, REMOTE_ADDR="127.0.0.1")
        self.assertIn(b'"success":false', outcome.output)

    def test_a_session_from_another_address_is_refused_with_150(self):
        outcome = host.get(bad_input.CALL.decode(), HTTP_COOKIE="id=" + self.sid, REMOTE_ADDR="192.0.2.7")
        lines, body = outcome.parts()
        self.assertIn(b"x-request-error: errorip", lines)
        self.assertEqual(b'{"error":{"code":150},"success":false}', body)

    def test_the_first_of_two_cookies_does_not_let_a_made_up_one_pass(self):
        outcome = host.get(bad_input.CALL.decode(), HTTP_COOKIE="id=../x; id=" + "0" * 64, REMOTE_ADDR="127.0.0.1")
        self.assert_refused(outcome)


if __name__ == "__main__":
    unittest.main()
