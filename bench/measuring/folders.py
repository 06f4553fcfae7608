"""Whether the cost of a call depends on the number of description files beside its own."""

import glob
import json
import os

from . import handlers, instructions

SIZES = (10, 5000)


def fill(size):
    """Adds description files until the folder holds `size` of them; gives the paths of the added ones."""
    description = {"lib": "/usr/lib/zova/webapi/ZOVA.Bench.so", "minVersion": 1, "maxVersion": 1, "authLevel": 1,
                   "methods": {"1": ["hello"]}}
    added = []
    for number in range(size - len(glob.glob(handlers.HOST_FOLDER + "/*.lib"))):
        name = f"Example.Package{number}"
        path = f"{handlers.HOST_FOLDER}/{name}.lib"
        with open(path, "x", encoding="utf-8") as file:
            json.dump({name: description}, file)
        added.append(path)
    return added


def measure(call, folder):
    """By number of files: instructions of the call."""
    table = {}
    for size in SIZES:
        added = fill(size)
        try:
            table[size] = instructions.run(call, os.path.join(folder, f"files-{size}.out"))
        finally:
            for path in added:
                os.unlink(path)
        print(f"instructions with {size} description files: {table[size]}", flush=True)
    return table
