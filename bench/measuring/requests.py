"""Requests a second through a web server on this device's loopback network."""

import re
import socket
import subprocess
import time

from . import handlers

CONNECTIONS = 4
FOLDER = "/tmp/zova-bench"

CONFIGURATION = """
server.modules       = ("mod_alias", "mod_cgi")
server.port          = {port}
server.bind          = "127.0.0.1"
server.document-root = "/usr/share/zova/www"
server.upload-dirs   = ("/var/tmp")
server.errorlog      = "{folder}/error.log"
server.tag           = ""
alias.url = (
    "/bench/front.cgi" => "{host}/front.cgi",
    "/bench/"          => "{programs}/"
)
cgi.assign = ("front.cgi" => "", "bare_c_cgi" => "", "bare_cpp_cgi" => "", ".php" => "/usr/bin/php-cgi")
"""

# Counts answers that are not the right one, which the status alone does not show.
SCRIPT = """
bad = 0
expected = [==[%s]==]
local threads = {}
function setup(thread) table.insert(threads, thread) end
function response(status, headers, body)
    if status ~= 200 or not body:find(expected, 1, true) then bad = bad + 1 end
end
function done(summary)
    local failed = summary.errors.connect + summary.errors.read + summary.errors.write + summary.errors.timeout
    for _, thread in ipairs(threads) do failed = failed + thread:get("bad") end
    print(string.format("counted %%d %%d %%d", summary.requests, summary.duration, failed))
end
"""


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def wait_for_server(process, port):
    """Returns when the server listens."""
    deadline = time.monotonic() + 10
    while time.monotonic() < deadline and process.poll() is None:
        with socket.socket() as probe:
            if probe.connect_ex(("127.0.0.1", port)) == 0:
                return
        time.sleep(0.05)
    raise RuntimeError(f"{process.args[0]} did not start")


class WebServer:
    """lighttpd with all measured handlers, for as long as the `with` block lasts."""

    def __enter__(self):
        self.port = free_port()
        subprocess.run(["mkdir", "-p", FOLDER], check=True)
        configuration = CONFIGURATION.format(port=self.port, folder=FOLDER, host=handlers.HOST_FOLDER,
                                             programs=handlers.PROGRAM_FOLDER)
        with open(FOLDER + "/lighttpd.conf", "w", encoding="utf-8") as file:
            file.write(configuration)
        self.process = subprocess.Popen(["lighttpd", "-D", "-f", FOLDER + "/lighttpd.conf"],
                                        env={"PATH": "/usr/sbin:/usr/bin:/sbin:/bin"})
        wait_for_server(self.process, self.port)
        return self

    def __exit__(self, *_):
        self.process.terminate()
        self.process.wait(10)

    def rate(self, call, seconds):
        """Good answers a second."""
        with open(FOLDER + "/count.lua", "w", encoding="utf-8") as file:
            file.write(SCRIPT % call.expected_text())
        headers = ["-H", "Cookie: " + call.cookie] if call.cookie else []
        wrk = ["wrk", "-t1", f"-c{CONNECTIONS}", f"-d{seconds}s", "-s", FOLDER + "/count.lua", *headers,
               f"http://127.0.0.1:{self.port}{call.url()}"]
        done = subprocess.run(wrk, stdout=subprocess.PIPE, text=True, check=True, timeout=seconds + 30)
        requests, microseconds, failed = map(int, re.search(r"counted (\d+) (\d+) (\d+)", done.stdout).groups())
        if failed or not requests:
            raise RuntimeError(f"{call.url()}: {failed} of {requests} requests failed")
        return requests * 1e6 / microseconds


def measure(server, calls, seconds, rounds):
    """By handler: requests a second in each round. The handlers take turns, so that a slow spell hits all of them."""
    handled = dict(calls, php=handlers.Call(handlers.PROGRAM_FOLDER + "/bare.php", "name=world"))
    rates = {name: [] for name in handled}
    for call in handled.values():
        server.rate(call, 1)
    for _ in range(rounds):
        for name, call in handled.items():
            rates[name].append(server.rate(call, seconds))
            print(f"requests a second, {name}: {rates[name][-1]:.0f}", flush=True)
    return rates
