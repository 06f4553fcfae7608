"""Background tasks: how soon a started one is answered, and whether many records slow the question for one."""

import http.client
import json
import os
import subprocess
import time

from . import handlers, instructions, system_calls

OWNER = "alice"
FOLDER = "/run/zova/tasks"
# Its time says when the folder was last looked through, which a call does again after half a minute.
SWEPT = "/run/zova/tasks.swept"
SIZES = (1, 10000)
STARTS = 200


def task_records(user, *arguments):
    """Runs the program that makes and removes records, as that user, and gives the lines that it prints."""
    done = subprocess.run([handlers.PROGRAM_FOLDER + "/task_records", *map(str, arguments)], user=user, group=user,
                          extra_groups=[], stdout=subprocess.PIPE, text=True, check=True, timeout=120)
    return done.stdout.split()


class OtherRecords:
    """Records of the owner beside the measured one, for as long as the `with` block lasts."""

    def __init__(self, total):
        self.total = total

    def __enter__(self):
        task_records(OWNER, "make", OWNER, "other-", self.total - 1)
        found = len(os.listdir(FOLDER))
        if found != self.total:
            raise RuntimeError(f"{found} files in the store instead of {self.total}")

    def __exit__(self, *_):
        task_records("root", "remove", OWNER, "other-")


def status_call(task, session):
    info = {"api": "ZOVA.Bench.Work.Task", "version": 1, "method": "start", "group": "", "prefix": "measured-",
            "param": {}}
    answer = {"data": {"auto_remove": False, "data": {}, "finish": True, "info": info, "success": True},
              "success": True}
    return handlers.front("ZOVA.Core.Task", "status", {"task_id": json.dumps(f"{OWNER}/{task}")},
                          handlers.session_cookie(session), answer)


def cost(call, path, since_swept):
    """Instructions and system calls of the call, the store having been swept so many seconds ago."""
    figures = {}
    for name, count in (("instructions", lambda: instructions.run(call, path)),
                        ("system calls", lambda: system_calls.total(call))):
        when = time.time() - since_swept
        os.utime(SWEPT, (when, when))
        figures[name] = count()
    return figures


def measure_status(server, session, folder, seconds, rounds):
    """By number of records: cost of asking for one of them, and good answers a second in each round."""
    call = status_call(task_records(OWNER, "make", OWNER, "measured-", 1)[0], session)
    table = {size: {"rates": []} for size in SIZES}
    for number in range(rounds):
        for size in SIZES:
            with OtherRecords(size):
                call.check()
                if number == 0:
                    path = os.path.join(folder, f"status-{size}.out")
                    table[size]["usual"] = cost(call, path, 0)
                    table[size]["sweeping"] = cost(call, path.replace("status", "status-sweeping"), 60)
                    print(f"status with {size} records: {table[size]['usual']}, "
                          f"with a sweep {table[size]['sweeping']}", flush=True)
                table[size]["rates"].append(server.rate(call, seconds))
                print(f"status calls a second with {size} records: {table[size]['rates'][-1]:.0f}", flush=True)
    task_records("root", "remove", OWNER, "measured-")
    return table


def answer_of(connection, call):
    """Seconds from the request to the whole answer, and its JSON."""
    begin = time.perf_counter()
    connection.request("GET", call.url(), headers={"Cookie": call.cookie})
    body = connection.getresponse().read()
    return time.perf_counter() - begin, json.loads(body)


def measure_start(server, plain):
    """By call, one that starts a task and a plain one beside it: seconds from request to answer, each time."""
    start = handlers.front("ZOVA.Bench.Work.Task", "start", {}, plain.cookie, expected=None)
    times = {"start": [], "plain": []}
    connection = http.client.HTTPConnection("127.0.0.1", server.port, timeout=30)
    ids = set()
    for _ in range(STARTS):
        taken, answer = answer_of(connection, plain)
        times["plain"].append(taken)
        if answer != plain.expected:
            raise RuntimeError(f"the plain call answered {answer}")
        taken, answer = answer_of(connection, start)
        times["start"].append(taken)
        if not answer.get("success") or not answer["data"]["task_id"].startswith(f"{OWNER}/bench-"):
            raise RuntimeError(f"a start answered {answer}")
        ids.add(answer["data"]["task_id"])
    connection.close()
    if len(ids) != STARTS:
        raise RuntimeError(f"{STARTS} starts made {len(ids)} tasks")
    return times
