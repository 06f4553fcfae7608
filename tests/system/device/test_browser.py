"""What a browser really sends and keeps: forms, files with odd names, downloads, ciphers of its own making."""

import hashlib
import json
import os
import re
import unittest
import urllib.parse

import device
import probe
import test_downloads
import test_uploads
import webclient
import webdriver
import webserver

FORM = """document.body.innerHTML = `<form method="post" enctype="multipart/form-data" action="${arguments[0]}">
<input name="note"><input type="file" name="file" multiple><input type="file" name="none"><button>Send</button></form>`;
document.querySelector('[name=note]').value = arguments[1];"""
SEND = """const form = new FormData();
for (const [field, name, text] of arguments[1])
    form.append(field, new File([text], name));
return (await fetch(arguments[0], {method: 'POST', body: form})).json();"""
DIGEST = """const answer = await fetch(arguments[0], {headers: arguments[1]});
const content = await answer.arrayBuffer();
const digest = new Uint8Array(await crypto.subtle.digest('SHA-256', content));
return [answer.status, content.byteLength, Array.from(digest, byte => byte.toString(16).padStart(2, '0')).join(''),
        answer.headers.get('content-type')];"""
UPLOAD = """const content = new Uint8Array(arguments[1]);
for (let at = 0; at < content.length; at += 65536)
    crypto.getRandomValues(content.subarray(at, at + 65536));
const digest = new Uint8Array(await crypto.subtle.digest('SHA-256', content));
const form = new FormData();
form.append('keep', arguments[2]);
form.append('file', new Blob([content]), 'random');
const answer = await (await fetch(arguments[0], {method: 'POST', body: form})).json();
return [answer, Array.from(digest, byte => byte.toString(16).padStart(2, '0')).join('')];"""
NAMES = ('a "quoted" name.txt', "two\r\nlines\nand one", "../../etc/cron.d/x", "/etc/passwd", "\U0001f600 \u20ac.jpg",
         "back\\slash", "a;b=c", ".", "100%.txt", "trailing blank ", "\u202egpj.exe", "x" * 490)

browser = None


def setUpModule():
    global browser
    browser = webdriver.Browser()
    unittest.addModuleCleanup(browser.close)


class PageTestCase(webserver.ServedTestCase):
    """From a page of the web server."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.folder = test_downloads.FOLDER
        os.makedirs(cls.folder, exist_ok=True)

    def setUp(self):
        super().setUp()
        browser.open(device.URL)
        self.assertIn('"code":101', browser.text())

    def tearDown(self):
        device.wait_for(lambda: not device.hosts_running(), "the end of all host programs")
        self.assertEqual([], test_uploads.part_files())
        super().tearDown()

    def url(self, query):
        return f"{urllib.parse.urlsplit(device.URL).path}?{query}"

    def make(self, name, content):
        path = f"{self.folder}/{name}"
        with open(path, "wb") as file:
            file.write(content)
        self.addCleanup(os.unlink, path)
        return path


class Browser(PageTestCase):
    """Through each web server."""

    def test_a_form_with_chosen_files_arrives_as_the_user_filled_it_in(self):
        paths = [self.make(name, name.encode()) for name in ("first \u00e4.txt", "second.txt")]
        browser.run(FORM, self.url(test_uploads.query("upload")), "a note \u20ac")
        browser.choose_files("[name=file]", *paths)
        browser.click("button")
        told = json.loads(device.wait_for(lambda: '"files"' in (text := browser.text()) and text, "the answer"))["data"]
        self.assertEqual("a note \u20ac", told["params"]["note"])
        self.assertEqual("second.txt", told["files"]["file"]["text"])
        self.assertEqual(("", {"file"}), (told["params"]["none"], set(told["files"])))

    def test_names_of_files_arrive_as_the_page_gave_them_and_are_in_no_path(self):
        answer = browser.run(SEND, self.url(test_uploads.query("upload_deferred")),
                             [[f"f{number}", name, name] for number, name in enumerate(NAMES)])
        steps = answer["data"]["steps"][:-1]
        self.assertEqual({f"f{number}": name for number, name in enumerate(NAMES)},
                         {name: value for step in steps for name, value in step["fields"].items()})
        for step, name in zip(steps, NAMES, strict=True):
            self.assertEqual(name, step["file"]["text"])
            self.assertRegex(step["file"]["path"], r"\A[a-z/]*/zova-upload-[0-9a-f]{32}\Z")

    def test_what_a_page_uploads_has_the_same_digest_on_the_device(self):
        # A rename works within one file system, and uploads lie in /tmp here.
        folder = "/tmp/kept-uploads"
        os.makedirs(folder)
        os.chmod(folder, 0o777)
        self.addCleanup(os.rmdir, folder)
        answer, digest = browser.run(UPLOAD, self.url(test_uploads.query("upload")), 20 << 20, f"{folder}/kept")
        self.addCleanup(os.unlink, f"{folder}/kept")
        self.assertTrue(answer["data"]["moved"])
        with open(f"{folder}/kept", "rb") as file:
            self.assertEqual(digest, hashlib.file_digest(file, "sha256").hexdigest())

    def test_what_a_page_downloads_has_the_same_digest_whole_and_in_part(self):
        content = os.urandom(5_000_001)
        query = test_downloads.query(path=self.make("movie.mp4", content))
        for headers, status, part in (({}, 200, content), ({"Range": "bytes=1000000-"}, 206, content[1000000:])):
            self.assertEqual([status, len(part), hashlib.sha256(part).hexdigest()],
                             browser.run(DIGEST, self.url(query), headers)[:3])

    def test_a_type_comes_to_a_page_once(self):
        query = test_downloads.query(path=self.make("x.bin", b"x"), type="text/x-probe")
        self.assertIn(browser.run(DIGEST, self.url(query), {})[3], ("text/x-probe", "text/x-probe, text/x-probe"))


class Limits(PageTestCase):
    """What is the same behind each web server."""

    def test_names_that_are_too_long_are_refused(self):
        for field, name in (("f", "x" * 491), ("f" * 64, "x")):
            answer = browser.run(SEND, self.url(test_uploads.query("upload")), [[field, name, "x"]])
            self.assertEqual({"code": 108, "errors": {"upload_err": -5}}, answer["error"])

    def test_a_thousand_files_in_one_form_arrive_and_one_more_is_refused(self):
        files = [[f"file{number}", f"{number}.txt", str(number)] for number in range(1001)]
        told = browser.run(SEND, self.url(test_uploads.query("upload")), files[:1000])["data"]["files"]
        self.assertEqual({name: text for name, _, text in files[:1000]},
                         {name: file["text"] for name, file in told.items()})
        answer = browser.run(SEND, self.url(test_uploads.query("upload")), files)
        self.assertEqual({"code": 108, "errors": {"upload_err": -5}}, answer["error"])

    def test_an_empty_file_is_a_file(self):
        told = browser.run(SEND, self.url(test_uploads.query("upload")), [["file", "empty", ""]])["data"]
        self.assertEqual(0, told["files"]["file"]["size"])

    def test_the_browser_keeps_a_file_under_the_name_that_it_was_told(self):
        for name, kept in (("r\u00e9sum\u00e9 \u20ac.txt", "r\u00e9sum\u00e9 \u20ac.txt"), ("plain.csv", "plain.csv")):
            with self.subTest(name):
                content = os.urandom(100_000)
                query = test_downloads.query(path=self.make(name, content))
                browser.run("location.href = arguments[0];", self.url(query))
                path = f"{browser.downloads}/{kept}"
                size = len(content)
                device.wait_for(lambda path=path, size=size: os.path.exists(path) and os.path.getsize(path) == size,
                                "the file")
                with open(path, "rb") as file:
                    self.assertEqual(content, file.read())
                os.unlink(path)


class NginxBrowser(Browser):
    server_type = webserver.Nginx


class ApacheBrowser(Browser):
    server_type = webserver.Apache


class Ciphers(probe.ProbeTestCase):
    """The function that the documentation gives to pages, in a page."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        with open(f"{device.PROJECT}/docs/formats.md", encoding="utf-8") as file:
            cls.function = re.search(r"```js\n(async function encipher.*?)```", file.read(), re.DOTALL).group(1)
        data = webclient.Client().call("ZOVA.Core.Session", "cipher").json()["data"]
        cls.key = data["envelope"]["public_key"]
        browser.open(device.URL)

    def sealed(self, line):
        return browser.run(self.function + "return encipher(arguments[0], arguments[1]);", self.key, line)

    def test_a_page_logs_in_with_an_enciphered_form(self):
        line = urllib.parse.urlencode({"api": "ZOVA.Core.Session", "version": 1, "method": "login",
                                       "account": "alice", "passwd": json.dumps(device.PASSWORD)})
        answer = browser.run("return (await fetch(arguments[0], {method: 'POST', body: arguments[1]})).json();",
                             urllib.parse.urlsplit(device.URL).path, "__cIpHeRtExT=" + self.sealed(line))
        self.assertEqual("alice", answer["data"]["user"])

    def test_parameters_of_a_batch_are_deciphered_that_a_page_enciphered(self):
        entry = {"api": "ZOVA.Test.Probe.Request", "version": 1, "method": "tell"}
        entries = [{**entry, "__cIpHeRtExT": self.sealed(f"secret={text}")} for text in ("one", "%C3%A4+%26")]
        body = urllib.parse.urlencode({"api": "ZOVA.Entry.Request", "version": 1, "method": "request",
                                       "compound": json.dumps(entries)})
        answer = browser.run("return (await fetch(arguments[0], {method: 'POST', body: arguments[1]})).json();",
                             urllib.parse.urlsplit(device.URL).path, body)
        self.assertEqual(["one", "\u00e4 &"], [row["data"]["params"]["secret"] for row in answer["data"]["result"]])

    def test_the_browser_is_taken_for_a_desktop(self):
        query = urllib.parse.urlencode({"api": "ZOVA.Test.Probe.Request", "version": 1, "method": "agent"})
        answer = browser.run("return (await fetch(arguments[0])).json();",
                             f"{urllib.parse.urlsplit(device.URL).path}?{query}")
        self.assertEqual(["IsWebKit"], answer["data"])


if __name__ == "__main__":
    unittest.main()
