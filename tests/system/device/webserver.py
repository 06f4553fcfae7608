"""Web servers of a test case's own, each with the settings that the project ships, on a port beside the device's."""

import grp
import os
import re
import socket
import subprocess
import urllib.parse

import device
import probe
import webclient

SETTINGS = "/usr/share/zova"
INFORMATION = "/etc/zovainfo.conf"
RUN = "/run/test-web-server"
FCGI_SOCKET = "/run/zova/webapi-fcgi.sock"
# The folder in the shipped settings from which fast downloads may come.
VOLUME = "/volume1"


def _replaced(text, old, new):
    if text.count(old) != 1:
        raise AssertionError(f"{old!r} stands {text.count(old)} times in the settings")
    return text.replace(old, new)


class _Server:
    """Serves for as long as a test class runs, and `device.URL` leads to it."""

    # What the web server is told to send a file by.
    fast_header = "X-Sendfile"
    information = 'fast_download="X-Sendfile"\n'

    def __init__(self, fast_folder=None):
        """With a folder, the web server sends what lies in it itself where the host program says so."""
        self.fast_folder = fast_folder
        self.processes = []

    def serve(self, case):
        """Until the class cleanup of the case."""
        url = urllib.parse.urlsplit(device.URL)
        self.port = url.port + 1
        os.makedirs(RUN, exist_ok=True)
        if self.fast_folder:
            self._set_information(case)
        self.start(case)
        case.addClassCleanup(setattr, device, "URL", device.URL)
        device.URL = url._replace(netloc=f"{url.hostname}:{self.port}").geturl()
        device.wait_for(self._answers, "the web server answers")

    def _set_information(self, case):
        def write(text):
            with open(INFORMATION + ".test", "w", encoding="utf-8") as file:
                file.write(text)
            os.rename(INFORMATION + ".test", INFORMATION)
        with open(INFORMATION, encoding="utf-8") as file:
            before = "".join(line for line in file if not line.startswith("fast_download"))
        write(before + self.information)
        case.addClassCleanup(write, before)

    def _settings(self, name, text):
        path = f"{RUN}/{name}"
        with open(path, "w", encoding="utf-8") as file:
            file.write(text)
        return path

    @staticmethod
    def _shipped(name):
        with open(f"{SETTINGS}/{name}", encoding="utf-8") as file:
            return file.read()

    def _run(self, case, *command, **more):
        process = subprocess.Popen(command, env={"PATH": os.environ["PATH"]}, **{"stdin": subprocess.DEVNULL, **more})
        self.processes.append(process)
        case.addClassCleanup(process.wait)
        case.addClassCleanup(process.terminate)

    def _answers(self):
        if any(process.poll() is not None for process in self.processes):
            raise AssertionError(f"{self.name} has ended")
        try:
            return webclient.request("GET").status == 200
        except OSError:
            return False

    def logs(self):
        return [f"{device.LOGS}/{self.name}-{kind}.log" for kind in ("access", "error")]


class Lighttpd(_Server):
    name = "lighttpd"

    def start(self, case):
        text = f'include "{SETTINGS}/lighttpd.conf"\nserver.port := {self.port}\n'
        if self.fast_folder:
            text += f'cgi.x-sendfile = "enable"\ncgi.x-sendfile-docroot = ("{self.fast_folder}/")\n'
        self._run(case, "lighttpd", "-D", "-f", self._settings("lighttpd.conf", text))


class _BehindFcgiwrap(_Server):
    """Starts fcgiwrap as zova-fcgiwrap.socket and zova-fcgiwrap.service describe it."""

    def start(self, case):
        socket_unit, service_unit = self._shipped_unit("socket"), self._shipped_unit("service")
        if socket_unit["ListenStream"] != FCGI_SOCKET or service_unit["StandardInput"] != "socket":
            raise AssertionError("the units have changed")
        if os.path.exists(FCGI_SOCKET):
            os.unlink(FCGI_SOCKET)
        with socket.socket(socket.AF_UNIX) as listening, open(device.HOST_LOG, "ab") as errors:
            listening.bind(FCGI_SOCKET)
            os.chown(FCGI_SOCKET, 0, grp.getgrnam(socket_unit["SocketGroup"]).gr_gid)
            os.chmod(FCGI_SOCKET, int(socket_unit["SocketMode"], 8))
            listening.listen(128)
            self._run(case, *service_unit["ExecStart"].split(), stdin=listening, stdout=subprocess.DEVNULL,
                      stderr=errors)
        self.start_server(case)

    @staticmethod
    def _shipped_unit(kind):
        with open(f"/usr/lib/systemd/system/zova-fcgiwrap.{kind}", encoding="utf-8") as file:
            return dict(re.findall(r"(?m)^(\w+)=(.*)$", file.read()))


class Nginx(_BehindFcgiwrap):
    name = "nginx"
    fast_header = "X-Accel-Redirect"
    information = 'fast_download="X-Accel-Redirect"\nfast_download_location="/inside"\n'

    def start_server(self, case):
        text = _replaced(self._shipped("nginx.conf"), "listen 127.0.0.1:8080;", f"listen 127.0.0.1:{self.port};")
        if self.fast_folder:
            text = _replaced(text, f"location /inside{VOLUME}/", f"location /inside{self.fast_folder}/")
            text = _replaced(text, f"alias {VOLUME}/", f"alias {self.fast_folder}/")
        self._run(case, "nginx", "-g", "daemon off;", "-c", self._settings("nginx.conf", text))


class Apache(_BehindFcgiwrap):
    name = "apache"

    def start_server(self, case):
        text = self._shipped("apache.conf")
        options = []
        if self.fast_folder:
            text = _replaced(text, f"XSendFilePath {VOLUME}", f"XSendFilePath {self.fast_folder}")
            options = ["-D", "ZOVA_FAST_DOWNLOADS"]
        self._run(case, "apache2", "-D", "FOREGROUND", *options, "-C", f"Define ZOVA_PORT {self.port}", "-f",
                  self._settings("apache.conf", text))


class ServedTestCase(probe.ProbeTestCase):
    """Its calls go through a web server of the type, or the device's own."""

    server_type = None
    fast_folder = None

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        if cls.server_type is not None:
            cls.server = cls.server_type(cls.fast_folder)
            cls.server.serve(cls)
