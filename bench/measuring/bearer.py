"""A call with a bearer token, split into the four queries that judge the token and the rest."""

import json
import os
import re
import statistics
import urllib.parse
import urllib.request

from . import callgrind_file, fast_api, handlers, instructions, system_calls, token_server

ROUNDS = 100
TOKEN = "measured-token"
ANSWER = {"active": True, "sub": "alice", "scope": "bench"}
SCOPES = [{"id": "bench", "apis": [{"params": ["api=ZOVA.Bench.Login&method=hello&version=1"]}]}]
# Enough to find the queries, and rare enough that to trace them slows the call little.
MARKS = ["--seccomp-bpf", "--absolute-timestamps=format:unix,precision:us", "--syscall-times=us", "-s", "64",
         "-e", "trace=execve,socket,connect,recvfrom,exit_group"]
# When the system call began, and how long it took; the last never returns.
LINE = re.compile(r"\d+ +(\d+\.\d+) \w+\(.*?(?: <(\d+\.\d+)>)?$")


class Records:
    """The lists of OAuth servers and scopes, set by an administrator for as long as the `with` block lasts."""

    def __init__(self, url, password, server):
        self.url = url
        self.session = handlers.log_in(url, "admin", password)
        self.server = {"enabled": True, "endpoint": server.endpoint(), "header": "Authorization: Basic bWU6c2VjcmV0",
                       "params": "token={access_token}", "expect": {"sub": "{userName}", "scope": "{scope}"}}

    def _set(self, servers, scopes):
        for api, name, value in (("ZOVA.Core.OAuth.Server", "servers", servers),
                                 ("ZOVA.Core.OAuth.Scope", "scope", scopes)):
            pairs = {"api": api, "version": 1, "method": "set", name: json.dumps(value)}
            request = urllib.request.Request(self.url, urllib.parse.urlencode(pairs).encode(),
                                             {"Cookie": handlers.session_cookie(self.session)})
            with urllib.request.urlopen(request, timeout=30) as reply:
                answer = json.load(reply)
            if not answer["success"]:
                raise RuntimeError(f"{api} cannot be set: {answer}")

    def __enter__(self):
        self._set([self.server], SCOPES)

    def __exit__(self, *_):
        self._set([], [])


def fast_queries(lines):
    """Of each query at the fast API service the places in a trace where it opens its socket and where the last of its
    answer has come."""
    queries = []
    opened = descriptor = None
    for place, line in enumerate(lines):
        if " socket(" in line:
            opened, descriptor = place, None
        elif found := re.search(rf' connect\((\d+), .*"{fast_api.SOCKET}"', line):
            descriptor = found[1]
            queries.append((opened, None))
        elif descriptor and re.search(rf" recvfrom\({descriptor}, .* = [1-9]", line):
            queries[-1] = (queries[-1][0], place)
    if len(queries) != 3 or None in (answered for _, answered in queries):
        raise RuntimeError(f"the trace of a call with a bearer token shows other queries: {queries}")
    return queries


def split(whole, begins, ends):
    """The parts of the call by name, given where the queries at the fast API service begin and end. What lies between
    the list of servers and the user's look-up is the exchange: loading libcurl, asking, cleaning up."""
    parts = {"scope list": ends[0] - begins[0], "server list": ends[1] - begins[1], "exchange": begins[2] - ends[1],
             "user look-up": ends[2] - begins[2]}
    return {**parts, "rest": whole - sum(parts.values()), "whole": whole}


def timed_parts(call):
    """Seconds of each part."""
    lines = [line for line in system_calls.trace(call, *MARKS).splitlines() if LINE.match(line)]
    begun = [float(LINE.match(line)[1]) for line in lines]
    took = [float(LINE.match(line)[2] or 0) for line in lines]
    queries = fast_queries(lines)
    return split(begun[-1] - begun[0], [begun[opened] for opened, _ in queries],
                 [begun[answered] + took[answered] for _, answered in queries])


def counted_parts(call):
    """System calls of each part."""
    lines = [line for line in system_calls.trace(call, "-s", "64").splitlines() if re.match(r"\d+ +\w+\(", line)]
    queries = fast_queries(lines)
    return split(len(lines), [opened for opened, _ in queries], [answered + 1 for _, answered in queries])


def instruction_parts(path):
    """Instructions of the call's process: of its queries at the fast API service, of the two halves of the exchange."""
    profile = callgrind_file.Profile(path)
    loading = profile.inclusive(None, "ZOVA::CurlLibrary::Open")
    parts = {"fast API": profile.inclusive(None, "ZOVA::APIUtils::QueryFastWebapi"), "loading libcurl": loading,
             "transfer": profile.inclusive(None, "ZOVA::HttpQuery") - loading}
    return {**parts, "rest": profile.total - sum(parts.values()), "whole": profile.total}


def measure(plain, folder):
    """By call, one with a session and one with a token: seconds and processor time in each round, system calls and
    instructions. Then the parts of the token's call, and the processor time that the token server took for each."""
    calls = {"session": plain, "token": handlers.front("ZOVA.Bench.Login", "hello", {"name": "world"}, token=TOKEN)}
    table = {"calls": {name: {"seconds": [], "processor": []} for name in calls}}
    timed = []
    with token_server.TokenServer(TOKEN, ANSWER) as server:
        with Records(os.environ["WEBAPI_URL"], os.environ["WEBAPI_PASSWORD"], server):
            calls["token"].check()
            server.processor_seconds.clear()
            for _ in range(ROUNDS):
                for name, call in calls.items():
                    times = handlers.times_of(call)
                    table["calls"][name]["seconds"].append(times.wall)
                    table["calls"][name]["processor"].append(times.processor)
                timed.append(timed_parts(calls["token"]))
            table["server"] = list(server.processor_seconds)
            counted = counted_parts(calls["token"])
            for name, call in calls.items():
                path = os.path.join(folder, f"bearer-{name}.out")
                table["calls"][name]["instructions"] = instructions.run(call, path)
                table["calls"][name]["system calls"] = system_calls.total(call)
    table["parts"] = {name: {"seconds": [parts[name] for parts in timed], "system calls": counted[name]}
                      for name in counted}
    table["instructions"] = instruction_parts(os.path.join(folder, "bearer-token.out"))
    for name, measured in table["parts"].items():
        print(f"call with a bearer token, {name}: {statistics.median(measured['seconds']) * 1e3:.2f} milliseconds, "
              f"{measured['system calls']} system calls", flush=True)
    print(f"instructions of a call with a bearer token: {table['instructions']}", flush=True)
    return table
