"""Logins whose parameters are enciphered for the device."""

import json
import os
import unittest
import urllib.parse

import device
import envelope
import webclient


def public_key():
    return webclient.Client().call("ZOVA.Core.Session", "cipher").json()["data"]["envelope"]["public_key"]


def login_line():
    return urllib.parse.urlencode({"api": "ZOVA.Core.Session", "version": 1, "method": "login", "account": "alice",
                                   "passwd": json.dumps(device.PASSWORD)}).encode()


class EnvelopeLogin(device.DeviceTestCase):
    def test_the_cipher_of_these_tests_is_gcm(self):
        # The mode's published test cases 13 and 14.
        for plain, sealed in ((b"", "530f8afbc74536b9a963b4f1c4cb738b"),
                              (bytes(16), "cea7403d4d606b6e074ec5d3baf39d18d0d1c8a799996bf0265b98b5d48ab919")):
            self.assertEqual(sealed, envelope.seal(bytes(32), bytes(12), plain, b"").hex())

    def test_a_body_that_is_one_envelope_logs_in(self):
        response = webclient.request("POST", body=envelope.make(public_key(), login_line()))
        self.assertEqual((0, "alice"), (response.code(), response.json()["data"]["user"]))

    def test_an_envelope_inside_webapi_logs_in(self):
        text = envelope.make(public_key(), login_line()).split(b"=", 1)[1].decode()
        body = urllib.parse.urlencode({"api": "ZOVA.Core.Session", "version": 1, "method": "login",
                                       "webapi": json.dumps({"__cIpHeRtExT": text})})
        response = webclient.request("POST", body=body.encode())
        self.assertEqual((0, "alice"), (response.code(), response.json()["data"]["user"]))

    def test_an_envelope_with_one_bit_changed_is_refused_wherever_the_bit_stands(self):
        good = envelope.make(public_key(), login_line())
        start = len(b"__cIpHeRtExT=")
        for place in (start + 1, start + 5, start + 100, len(good) - 30, len(good) - 2):
            with self.subTest(place):
                other = b"A" if good[place:place + 1] != b"A" else b"B"
                response = webclient.request("POST", body=good[:place] + other + good[place + 1:])
                self.assertEqual(101, response.code())

    def test_the_private_key_is_readable_for_root_only(self):
        public_key()
        for path, mode in (("/etc/zova", 0o40700), ("/etc/zova/envelope-key.pem", 0o100600)):
            state = os.lstat(path)
            self.assertEqual((oct(mode), 0), (oct(state.st_mode), state.st_uid))


if __name__ == "__main__":
    unittest.main()
