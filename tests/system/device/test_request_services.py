"""What a method is told of a request: checks of its texts, the device it comes from, enciphered parameters."""

import json
import subprocess
import unittest
import urllib.parse

import device
import envelope
import probe
import webclient

API = probe.API + ".Request"


def call(method, headers=None, **parameters):
    query = urllib.parse.urlencode({"api": API, "version": 1, "method": method, **parameters})
    return webclient.request("GET", query, headers=headers)


def tell(*pairs, **parameters):
    """What reaches a method of the query: its parameters."""
    query = urllib.parse.urlencode({"api": API, "version": 1, "method": "tell", **parameters})
    return webclient.request("GET", "&".join((query, *pairs))).json()["data"]["params"]


# What passes each text, by the device's own libraries.
CHECKS = {
    "disk": "IsHostname IsNetbios IsWorkGroup IsTetherLinkId",
    "disk.example.com": "IsHostname IsDomain IsWorkGroup",
    "Disk-1.Example": "IsHostname IsDomain IsWorkGroup",
    "xn--bcher-kva.example": "IsHostname IsDomain IsWorkGroup",
    "disk.": "IsWorkGroup",
    "-disk": "IsWorkGroup IsTetherLinkId",
    "my_disk": "IsNetbios IsWorkGroup",
    "a" * 63: "IsHostname IsNetbios IsWorkGroup IsTetherLinkId",
    "a" * 64: "IsNetbios IsWorkGroup IsTetherLinkId",
    "a" * 255: "IsNetbios IsWorkGroup IsTetherLinkId",
    "a" * 256: "IsWorkGroup IsTetherLinkId",
    "192.0.2.1": "IsIP IsIPv4 IsWorkGroup",
    "192.0.2.256": "IsWorkGroup",
    "192.0.2": "IsWorkGroup",
    "0x7f.1": "IsWorkGroup",
    "192.0.2.0/24": "IsWorkGroup",
    "192.0.2.1:80": "IsWorkGroup",
    "2001:db8::1": "IsIP IsIPv6 IsWorkGroup",
    "::ffff:192.0.2.1": "IsIP IsIPv6 IsWorkGroup",
    "[::1]": "IsWorkGroup",
    "fe80::1%eth0": "IsWorkGroup",
    "alice@example.com": "IsEMail IsWorkGroup",
    "a@b@c": "IsEMail IsWorkGroup",
    "alice@": "IsWorkGroup",
    "a b@c": "IsWorkGroup",
    ";;": "",
    "1234": "IsWorkGroup IsDigit IsTetherLinkId",
    "-1234": "IsWorkGroup IsTetherLinkId",
    "12\u0664": "IsWorkGroup",
    "disk\n": "IsWorkGroup",
    "disk\0": "",
    "": "",
    "B\u00fccher": "IsWorkGroup",
    "$(id)": "IsWorkGroup",
}
PORTS = {"0": True, "80": True, "65535": True, "65536": False, "-1": False, "1.5": False, "80x": False,
         "4294967376": False, '"80"': False, "": False}

# Headers as clients of 2026 send them, beside what the rules give.
PHONE = "IsMobile IsMobileDevice "
AGENTS = {
    "curl/8.18.0": "",
    "Mozilla/5.0 (X11; Linux x86_64) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/148.0.0.0 Safari/537.36": "IsWebKit",
    "Mozilla/5.0 (Windows NT 10.0; Win64; x64; rv:150.0) Gecko/20100101 Firefox/150.0": "",
    "Mozilla/5.0 (Macintosh; Intel Mac OS X 10_15_7) AppleWebKit/605.1.15 (KHTML, like Gecko) Version/26.1 "
    "Safari/605.1.15": "IsWebKit",
    "Mozilla/5.0 (iPhone; CPU iPhone OS 18_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) Version/26.1 "
    "Mobile/15E148 Safari/604.1": PHONE + "IsIPhone IsWebKit IsSupportWebApp",
    "Mozilla/5.0 (iPad; CPU OS 18_7 like Mac OS X) AppleWebKit/605.1.15 (KHTML, like Gecko) CriOS/148.0.7778.42 "
    "Mobile/15E148 Safari/604.1": PHONE + "IsIPhone IsIPad IsWebKit IsSupportWebApp",
    "Mozilla/5.0 (Linux; Android 10; K) AppleWebKit/537.36 (KHTML, like Gecko) Chrome/148.0.0.0 Mobile "
    "Safari/537.36": PHONE + "IsAndroid IsWebKit IsSupportWebApp",
    "Mozilla/5.0 (Android 16; Mobile; rv:150.0) Gecko/150.0 Firefox/150.0": PHONE + "IsAndroid",
    "Mozilla/5.0 (SMART-TV; LINUX; Tizen 9.0) AppleWebKit/537.36 (KHTML, like Gecko) Version/9.0 "
    "Chrome/120.0.6099.5 TV Safari/537.36": "IsWebKit",
    "Mozilla/5.0 (compatible; bingbot/2.0; +http://www.bing.com/bingbot.htm)": "",
    "Mozilla/5.0 (BlackBerry; U; BlackBerry 9800; en) AppleWebKit/534.1+ (KHTML, like Gecko) Version/6.0.0.337 "
    "Mobile Safari/534.1+": PHONE + "IsBlackBerry6 IsWebKit IsSupportWebApp",
    "Mozilla/4.0 (compatible; MSIE 6.0; Windows CE; IEMobile 7.11)": PHONE + "IsIEMobile",
    "Opera/9.80 (J2ME/MIDP; Opera Mini/7.1.32052/29.3709; U; en) Presto/2.8.119 Version/11.10": PHONE.strip(),
}


class Checks(probe.ProbeTestCase):
    def test_each_text_passes_its_checks(self):
        for text, names in CHECKS.items():
            with self.subTest(text[:70]):
                passed = call("checks", text=webclient.quoted(text)).json()["data"]
                self.assertEqual(names.split(), passed)

    def test_each_port_passes_or_not(self):
        for text, passes in PORTS.items():
            with self.subTest(text):
                self.assertEqual(["IsPort"] if passes else [], call("checks", port=text).json()["data"])

    def test_a_check_of_a_text_of_many_bytes_is_answered(self):
        for text in ("a" * 60000, "@" * 60000, ("a" * 63 + ".") * 900, "1" * 60000):
            with self.subTest(text[:5]):
                body = urllib.parse.urlencode({"api": API, "version": 1, "method": "checks",
                                               "text": webclient.quoted(text)})
                self.assertEqual(0, webclient.request("POST", body=body.encode()).code())


class Agents(probe.ProbeTestCase):
    def test_each_client_gets_its_answers(self):
        for header, names in AGENTS.items():
            with self.subTest(header):
                self.assertEqual(names.split(), call("agent", {"User-Agent": header}).json()["data"])

    def test_without_the_header_no_answer_is_yes(self):
        for headers in ({}, {"X-Wap-Profile": "http://192.0.2.1/x.xml", "UA-OS": "x"}):
            self.assertEqual([], call("agent", headers).json()["data"])

    def test_other_headers_of_a_phone_count_beside_it(self):
        for name in ("X-Wap-Profile", "UA-OS"):
            self.assertEqual(PHONE.split(), call("agent", {"User-Agent": "x", name: "y"}).json()["data"])

    def test_the_desktop_view_is_a_wish_and_no_device(self):
        phone = "Mozilla/5.0 (iPhone) AppleWebKit"
        for cookie, is_mobile in (("forceDesktop=1", False), ("forceDesktop=0", True), ("forceDesktop=yes", True)):
            with self.subTest(cookie):
                answers = call("agent", {"User-Agent": phone, "Cookie": cookie}).json()["data"]
                self.assertEqual(is_mobile, "IsMobile" in answers)
                self.assertIn("IsMobileDevice", answers)

    def test_a_header_of_sixty_thousand_bytes_is_answered(self):
        for text in ("(" * 60000, "opera min" * 6000, "\xff" * 60000, "Android " * 7000):
            self.assertEqual(0, call("agent", {"User-Agent": text.encode("latin-1")}).code())


class Enciphered(probe.ProbeTestCase):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        data = webclient.Client().call("ZOVA.Core.Session", "cipher").json()["data"]
        cls.key = data["envelope"]["public_key"]

    def sealed(self, line):
        """The pair of the name and cipher text."""
        return envelope.make(self.key, line.encode()).decode()

    def text(self, line):
        return self.sealed(line).partition("=")[2]

    def assert_pairs(self, expected, params):
        self.assertEqual(expected, {name: value for name, value in params.items()
                                    if name not in ("api", "version", "method")})

    def test_a_parameter_among_others_is_deciphered_into_them(self):
        self.assert_pairs({"open": "1 2", "secret": "s\u00e4", "number": 7},
                          tell(self.sealed("secret=s%C3%A4&number=7"), open="1 2"))

    def test_an_enciphered_text_wins_over_the_open_one(self):
        self.assert_pairs({"x": "sealed"}, tell(self.sealed("x=sealed"), x="open"))

    def test_a_cipher_text_of_another_key_or_none_is_left_out(self):
        good = self.text("secret=s")
        for bad in (good[:-2] + ("AA" if good[-2:] != "AA" else "BB"), "AAAA", "", "\u20ac", good + good):
            with self.subTest(bad[:10]):
                self.assert_pairs({"open": "x"}, tell(urllib.parse.urlencode({"__cIpHeRtExT": bad}), open="x"))

    def test_an_enciphered_call_has_to_be_admitted_as_what_it_is(self):
        line = "api=ZOVA.Core.User&method=list&version=1"
        for query in (self.sealed(line), f"api={API}&version=1&method=tell&{self.sealed(line)}"):
            self.assertEqual(119, webclient.request("GET", query).code())

    def test_an_entry_of_a_batch_is_deciphered(self):
        entries = [{"api": API, "version": 1, "method": "tell", "open": "o", "__cIpHeRtExT": self.text(line)}
                   for line in ("secret=one", "secret=two&open=sealed")]
        entries.append({"api": API, "version": 1, "method": "tell", "open": "o", "__cIpHeRtExT": "AAAA"})
        for mode in ("sequential", "parallel"):
            with self.subTest(mode):
                answer = webclient.logged_in("alice").call("ZOVA.Entry.Request", "request", post=True, mode=mode,
                                                           compound=json.dumps(entries)).json()
                for row, expected in zip(answer["data"]["result"], (
                        {"secret": "one", "open": "o"}, {"secret": "two", "open": "sealed"}, {"open": "o"}),
                        strict=True):
                    self.assert_pairs(expected, row["data"]["params"])

    def test_a_run_description_is_deciphered_one_level_inside_the_other(self):
        inner = {"__cIpHeRtExT": self.text("deep=1")}
        description = {"user": "alice", "api": API, "version": 1, "method": "tell", "params": {
            "open": "o", "__cIpHeRtExT": self.text("secret=one"), "webapi": inner}}
        with subprocess.Popen(["/bin/sh", "-c", 'exec "$0" param -1 "$1" 3>&1 >/dev/null',
                               probe.BUILD + "/bin/probe-exec", json.dumps(description)], env={},
                              stdin=subprocess.DEVNULL, stdout=subprocess.PIPE) as process:
            report = json.loads(process.communicate(timeout=device.TIME_LIMIT)[0])
        self.assert_pairs({"open": "o", "secret": "one", "webapi": {"deep": 1}}, report["result"]["data"]["params"])


if __name__ == "__main__":
    unittest.main()
