"""What the check of a sharing link costs beside that of a login session: the same method of the same API."""

import contextlib
import json
import os
import shutil
import statistics
import urllib.parse
import urllib.request

from . import handlers, instructions, system_calls

ROUNDS = 100
API = "ZOVA.Bench.Files.Shared"
LIBRARY = "/usr/lib/zova/webapi/ZOVA.Bench.Files.so"
CHECKS = "/usr/lib/sharing/permission_lib"
PASSWORD = "measured"


def ask(url, session, api, method, **parameters):
    """The answer's data, and the cookies that came with it."""
    pairs = {"api": api, "version": 1, "method": method, **parameters}
    request = urllib.request.Request(url, urllib.parse.urlencode(pairs).encode(),
                                     {"Cookie": handlers.session_cookie(session)} if session else {})
    with urllib.request.urlopen(request, timeout=30) as reply:
        answer, cookies = json.load(reply), reply.headers.get_all("Set-Cookie", [])
    if not answer["success"]:
        raise RuntimeError(f"{api}, {method}: {answer}")
    return answer.get("data"), [cookie.partition(";")[0] for cookie in cookies]


@contextlib.contextmanager
def links(url, session):
    """Calls by name: with a login, through a public link, through one with a password that was opened."""
    os.makedirs(CHECKS, exist_ok=True)
    shutil.copyfile(LIBRARY, CHECKS + "/bench.so")
    made = []
    try:
        for protection in ({}, {"protect_type": 1, "password": PASSWORD}):
            data, _ = ask(url, session, "ZOVA.Core.Sharing", "create", project="bench", paths='["/home/alice"]',
                          **{name: json.dumps(value) for name, value in protection.items()})
            made.append(data["hash"])
        _, cookies = ask(url, None, "ZOVA.Core.Sharing.Visit", "open", hash=json.dumps(made[1]),
                         password=json.dumps(PASSWORD))
        visit = next(cookie for cookie in cookies if cookie.startswith("sharing_sid="))
        yield {"session": handlers.front(API, "hello", {}, handlers.session_cookie(session)),
               "public": handlers.front(API, "hello", {}, link=made[0]),
               "password": handlers.front(API, "hello", {}, visit, link=made[1])}
    finally:
        for link in made:
            ask(url, session, "ZOVA.Core.Sharing", "delete", hash=json.dumps(link))
        os.unlink(CHECKS + "/bench.so")


def measure(session, folder):
    """By call: seconds in each round, system calls and instructions."""
    with links(os.environ["WEBAPI_URL"], session) as calls:
        table = {name: {"seconds": []} for name in calls}
        for _ in range(ROUNDS):
            for name, call in calls.items():
                table[name]["seconds"].append(handlers.times_of(call).wall)
        for name, call in calls.items():
            table[name]["system calls"] = system_calls.total(call)
            table[name]["instructions"] = instructions.run(call, os.path.join(folder, f"sharing-{name}.out"))
            print(f"sharing check, {name}: {statistics.median(table[name]['seconds']) * 1e3:.2f} milliseconds, "
                  f"{table[name]['instructions']} instructions, {table[name]['system calls']} system calls", flush=True)
    return table
