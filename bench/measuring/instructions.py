"""Instructions of one whole process, from the first of the dynamic linker to the last of its exit, by callgrind."""

import os
import re

from . import callgrind_file

REPEATS = 3


def run(call, path):
    """Total of one process; callgrind's file stays at `path`."""
    call.run(["valgrind", "--quiet", "--tool=callgrind", "--callgrind-out-file=" + path])
    return callgrind_file.total(path)


def file_name(name):
    return re.sub(r"[^a-z+]+", "-", name.lower()) + ".out"


def measure(calls, folder):
    """By call: the totals of each repetition."""
    totals = {}
    for name, call in calls.items():
        path = os.path.join(folder, file_name(name))
        totals[name] = [run(call, path) for _ in range(REPEATS)]
        print(f"instructions, {name}: {totals[name]}", flush=True)
    return totals


# Disjoint parts of a process, each with the functions whose cost, with all that they call, it is. A function counts
# where the one named with it calls it.
STATIONS = [
    ("reading lib.def", [("ZOVA::WebEntry::WebEntry", "ZOVA::APIRunner::APIRunner")]),
    ("request: environment, cookies, parameters", [("ZOVA::WebEntry::Run", "ZOVA::WebEntry::Initialize")]),
    ("names of the process", [("ZOVA::WebEntry::Run", "ZOVA::APIRunner::SetProcessName"),
                              ("ZOVA::APIRunner::Process", "ZOVA::APIRunnerPrivate::SetCallName")]),
    ("reading the description", [("ZOVA::APIRunner::CheckRequestParam", "ZOVA::APIRunner::InitLibDesc")]),
    ("session and gate", [("ZOVA::APIRunner::ProcessLib", "ZOVA::PassesGate")]),
    ("opening the API library", [("ZOVA::APIRunner::ProcessLib", "ZOVA::APIRunner::OpenLib")]),
    ("identity of the method", [(None, "ZOVA::ResetIdentity"), (None, "ZOVA::IdentityScope::Restore")]),
    ("the method", [(None, "(anonymous namespace)::Hello")]),
    ("output", [("ZOVA::WebEntry::Run", "ZOVA::WebEntry::OutputHeader"),
                ("ZOVA::WebEntry::Run", "ZOVA::WebEntry::OutputBody")]),
    ("end of the entry", [("main", "ZOVA::WebEntry::~WebEntry")]),
]


def parts(profile):
    """The stations of one process as rows (name, instructions or None if a function was not seen)."""
    in_main = profile.inclusive(None, "main")
    rows = [("dynamic linking and constructors, before and after main", profile.total - in_main)]
    for station, functions in STATIONS:
        costs = [profile.inclusive(caller, callee) for caller, callee in functions]
        seen = [cost for cost in costs if cost is not None]
        rows.append((station, sum(seen) if seen else None))
    rest = profile.total - sum(cost for _, cost in rows if cost)
    rows.append(("everything else", rest))
    return rows


def stations(calls, folder):
    """By call of front.cgi: its stations, and what the linker took for binding functions at their first call."""
    table = {}
    for name in calls:
        if not name.startswith("front"):
            continue
        profile = callgrind_file.Profile(os.path.join(folder, file_name(name)))
        rows = parts(profile)
        table[name] = {"rows": rows, "lazy binding": profile.lazy_binding()}
        for station, cost in rows:
            print(f"  {name}, {station}: {cost}", flush=True)
    return table
