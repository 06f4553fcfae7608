"""What one more entry of a batch costs, where its method does nothing."""

import json
import os
import statistics
import urllib.parse

from . import handlers, instructions, system_calls

ROUNDS = 40
API = "ZOVA.Bench.Work.Batch"
# By kind: the method, the batch's mode, and the entries of the long batch. Those of the first kind are so cheap that
# fifty would be lost in how much the start of a process varies.
KINDS = {
    "in process": ("nothing", "sequential", 501),
    "forked": ("nothingForked", "sequential", 51),
    "parallel": ("nothing", "parallel", 51),
}


def batch(method, mode, size):
    entry = {"api": API, "version": 1, "method": method}
    form = urllib.parse.urlencode({"api": "ZOVA.Entry.Request", "version": 1, "method": "request", "mode": mode,
                                   "compound": json.dumps([entry] * size)})
    answer = {"data": {"has_fail": False, "result": [dict(entry, success=True)] * size}, "success": True}
    return handlers.Call(handlers.HOST_FOLDER + "/front.cgi", "", form=form, expected=answer)


def measure(folder):
    """By kind: seconds for each further entry in each round, system calls and, of those in process, instructions."""
    batches = {kind: (batch(method, mode, 1), batch(method, mode, size), size - 1)
               for kind, (method, mode, size) in KINDS.items()}
    table = {kind: {"entries": further + 1, "seconds": []} for kind, (_, _, further) in batches.items()}
    for _ in range(ROUNDS):
        for kind, (short, long, further) in batches.items():
            taken = handlers.times_of(long).wall - handlers.times_of(short).wall
            table[kind]["seconds"].append(taken / further)
    for kind, (short, long, further) in batches.items():
        table[kind]["system calls"] = (system_calls.total(long) - system_calls.total(short)) / further
        print(f"one entry of a batch, {kind}: {statistics.median(table[kind]['seconds']) * 1e6:.0f} microseconds, "
              f"{table[kind]['system calls']:.1f} system calls", flush=True)
    short, long, further = batches["in process"]
    totals = [instructions.run(call, os.path.join(folder, f"batch-{name}.out"))
              for name, call in (("short", short), ("long", long))]
    table["in process"]["instructions"] = (totals[1] - totals[0]) / further
    print(f"one entry of a batch, in process: {table['in process']['instructions']:.0f} instructions", flush=True)
    return table
