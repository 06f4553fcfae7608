"""A browser without a window, told by the WebDriver protocol what to do."""

import http.client
import json
import os
import re
import shutil
import subprocess
import tempfile

import device

ELEMENT = "element-6066-11e4-a52e-4f735466cecf"
FLAGS = ("--headless", "--no-sandbox", "--disable-gpu", "--disable-quic", "--no-first-run",
         "--disable-background-networking", "--disable-component-update", "--disable-sync", "--disable-dev-shm-usage",
         "--no-proxy-server")
# Hands what an asynchronous function returns, or how it failed, to the callback that the protocol brings.
CALL = """const done = arguments[arguments.length - 1];
(async () => {%s})().then(value => done({value}), error => done({error: String(error)}));"""


class Browser:
    """Chromium with a profile of its own, which goes with it."""

    def __init__(self):
        self.folder = tempfile.mkdtemp(dir="/run")
        self.downloads = f"{self.folder}/downloads"
        os.makedirs(self.downloads)
        environment = {"PATH": os.environ["PATH"], "HOME": self.folder, "TMPDIR": self.folder, "LC_ALL": "C.UTF-8"}
        self.driver = subprocess.Popen(["chromedriver", "--port=0"], env=environment, stdin=subprocess.DEVNULL,
                                       stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
        self.session = ""
        try:
            for line in self.driver.stdout:
                if found := re.search(r"started successfully on port (\d+)", line):
                    self.port = int(found.group(1))
                    break
            flags = [*FLAGS, f"--user-data-dir={self.folder}/profile"]
            self.session = "/" + self._ask("POST", "", {"capabilities": {"alwaysMatch": {
                "browserName": "chrome", "goog:chromeOptions": {"args": flags},
                "timeouts": {"script": device.TIME_LIMIT * 1000}}}})["sessionId"]
            self._ask("POST", "/goog/cdp/execute", {"cmd": "Browser.setDownloadBehavior", "params": {
                "behavior": "allow", "downloadPath": self.downloads}})
        except BaseException:
            self.close()
            raise

    def close(self):
        try:
            if self.session:
                self._ask("DELETE", "")
        finally:
            self.driver.terminate()
            self.driver.communicate()
            shutil.rmtree(self.folder, ignore_errors=True)

    def _ask(self, verb, path, value=None):
        connection = http.client.HTTPConnection("127.0.0.1", self.port, timeout=2 * device.TIME_LIMIT)
        try:
            connection.request(verb, "/session" + self.session + path, None if value is None else json.dumps(value))
            answer = json.loads(connection.getresponse().read())["value"]
        finally:
            connection.close()
        if isinstance(answer, dict) and "error" in answer:
            raise AssertionError(f"the browser cannot: {answer['error']}: {answer['message']}")
        return answer

    def open(self, url):
        self._ask("POST", "/url", {"url": url})

    def run(self, body, *arguments):
        """What the body of an asynchronous function returns in the page; `arguments` are its arguments."""
        answer = self._ask("POST", "/execute/async", {"script": CALL % body, "args": list(arguments)})
        if "error" in answer:
            raise AssertionError(f"the page failed: {answer['error']}")
        return answer.get("value")

    def text(self):
        return self.run("return document.body.innerText;")

    def _element(self, selector):
        found = self._ask("POST", "/element", {"using": "css selector", "value": selector})
        return "/element/" + found[ELEMENT]

    def choose_files(self, selector, *paths):
        """As a user does in the dialog of a file input."""
        self._ask("POST", self._element(selector) + "/value", {"text": "\n".join(paths)})

    def click(self, selector):
        self._ask("POST", self._element(selector) + "/click", {})
