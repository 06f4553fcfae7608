"""Large files in and out: seconds for each beside those of `cat`, of nginx and of php-cgi."""

import json
import os
import shutil
import statistics
import subprocess
import time

from . import handlers, requests

SIZE = 1 << 30
ROUNDS = 5
FOLDER = "/var/tmp/zova-bench-transfers"
FILE = FOLDER + "/file"
TIME_LIMIT = 120

# What the device's own lighttpd says about uploads and answers, for all handlers alike.
LIGHTTPD = """
server.modules       = ("mod_alias", "mod_cgi", "mod_setenv")
server.port          = {port}
server.bind          = "127.0.0.1"
server.document-root = "{programs}"
server.upload-dirs   = ("/var/tmp")
server.errorlog      = "{folder}/lighttpd-error.log"
server.max-request-size     = 0
server.stream-request-body  = 2
server.stream-response-body = 2
alias.url = ("/front.cgi" => "{host}/front.cgi")
cgi.assign = ("front.cgi" => "", ".php" => "/usr/bin/php-cgi")
setenv.set-environment = ("PHPRC" => "{folder}")
"""

NGINX = """
user root;
worker_processes 1;
pid {folder}/nginx.pid;
error_log {folder}/nginx-error.log;
events {{ worker_connections 64; }}
http {{
    access_log off;
    sendfile on;
    server {{
        listen 127.0.0.1:{port};
        root {folder};
    }}
}}
"""

PHP = """
upload_max_filesize = 16G
post_max_size = 16G
max_input_time = -1
max_execution_time = 0
upload_tmp_dir = {uploads}
cgi.force_redirect = 0
"""


def write(name, text):
    with open(f"{FOLDER}/{name}", "w", encoding="utf-8") as file:
        file.write(text)


def curl(*arguments):
    done = subprocess.run(["curl", "--silent", "--show-error", "--fail", "--max-time", str(TIME_LIMIT), *arguments],
                          stdout=subprocess.PIPE, check=True)
    return done.stdout


class Transfers:
    """The file, and two web servers around it, for as long as the `with` block lasts."""

    def __init__(self, session):
        self.cookie = handlers.session_cookie(session)

    def __enter__(self):
        os.makedirs(FOLDER, mode=0o755)
        # Real bytes on the disk, not a hole, so that every reader has the same to do.
        with open("/dev/urandom", "rb") as random, open(FILE, "xb") as file:
            block = random.read(1 << 20)
            for _ in range(SIZE >> 20):
                file.write(block)
        os.chmod(FILE, 0o644)
        lighttpd, nginx = requests.free_port(), requests.free_port()
        self.dynamic, self.static = f"http://127.0.0.1:{lighttpd}", f"http://127.0.0.1:{nginx}"
        write("lighttpd.conf", LIGHTTPD.format(port=lighttpd, folder=FOLDER, programs=handlers.PROGRAM_FOLDER,
                                               host=handlers.HOST_FOLDER))
        write("nginx.conf", NGINX.format(port=nginx, folder=FOLDER))
        environment = {"PATH": "/usr/sbin:/usr/bin:/sbin:/bin"}
        self.servers = [
            subprocess.Popen(["lighttpd", "-D", "-f", FOLDER + "/lighttpd.conf"], env=environment),
            subprocess.Popen(["nginx", "-c", FOLDER + "/nginx.conf", "-g", "daemon off;"], env=environment)]
        for server, port in zip(self.servers, (lighttpd, nginx)):
            requests.wait_for_server(server, port)
        # php-cgi stores where the web API does, since the place decides what storing costs.
        self.uploads = self.take_by_front()
        write("php.ini", PHP.format(uploads=self.uploads))
        return self

    def __exit__(self, *_):
        for server in self.servers:
            server.terminate()
            server.wait(10)
        shutil.rmtree(FOLDER)

    def front(self, method):
        return f"{self.dynamic}/front.cgi?api=ZOVA.Bench.Files&version=1&method={method}"

    def get(self, url, *options):
        size = curl(*options, "--output", "/dev/null", "--write-out", "%{size_download}", url)
        if int(size) != SIZE:
            raise RuntimeError(f"{url}: {size} bytes came")

    def take(self, url, *options):
        answer = json.loads(curl(*options, "--form", "file=@" + FILE, url))
        answer = answer.get("data", answer)
        if answer.get("size") != SIZE:
            raise RuntimeError(f"{url} answered {answer}")
        return answer["folder"]

    def take_by_front(self):
        return self.take(self.front("take"), "--cookie", self.cookie)

    def copy(self):
        target = f"{self.uploads}/zova-bench-copy"
        with open(target, "xb") as file:
            subprocess.run(["cat", FILE], stdout=file, check=True)
        os.unlink(target)

    def read(self):
        reading = subprocess.Popen(["cat", FILE], stdout=subprocess.PIPE)
        subprocess.run(["cat"], stdin=reading.stdout, stdout=subprocess.DEVNULL, check=True)
        reading.stdout.close()
        reading.wait()

    def ways(self):
        return {
            "upload": {
                "cat": self.copy,
                "front": self.take_by_front,
                "php": lambda: self.take(f"{self.dynamic}/take.php"),
            },
            "download": {
                "cat": self.read,
                "nginx": lambda: self.get(f"{self.static}/file"),
                "front": lambda: self.get(self.front("send"), "--cookie", self.cookie),
                "php": lambda: self.get(f"{self.dynamic}/send.php"),
            },
        }


def measure(session):
    """By direction and way: seconds in each round. The ways take turns."""
    table = {"size": SIZE}
    with Transfers(session) as transfers:
        ways = transfers.ways()
        for direction, named in ways.items():
            table[direction] = {way: [] for way in named}
            for number in range(ROUNDS + 1):
                for way, transfer in named.items():
                    begin = time.perf_counter()
                    transfer()
                    # The first round fills the caches.
                    if number > 0:
                        table[direction][way].append(time.perf_counter() - begin)
            for way, seconds in table[direction].items():
                print(f"{direction}, {way}: {SIZE / 2**20 / statistics.median(seconds):.0f} MiB a second", flush=True)
    return table
