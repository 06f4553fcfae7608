"""Reads callgrind's output files: the total, and the cost of calls between named functions."""

import re

NAME = re.compile(r"\((\d+)\)(?: (.*))?$")
ARGUMENTS = re.compile(r"(?<=\w)\(.*\)( const)?$")


def total(path):
    with open(path, encoding="utf-8", errors="replace") as file:
        for line in file:
            if line.startswith(("totals:", "summary:")):
                return int(line.split()[1])
    raise RuntimeError(f"{path} has no total")


class Profile:
    """The call graph of one process. Function names are without their arguments."""

    def __init__(self, path):
        self.total = total(path)
        self.names = {}
        # (caller, callee) to instructions, all that the callee called included.
        self.edges = {}
        self._read(path)

    def _name(self, text):
        number, name = NAME.match(text).groups()
        if name is not None:
            # Callgrind marks the levels of a recursion by 'N.
            self.names[number] = ARGUMENTS.sub("", re.sub(r"'\d+$", "", name))
        return self.names[number]

    def _read(self, path):
        caller = callee = None
        is_call = False
        with open(path, encoding="utf-8", errors="replace") as file:
            for line in file:
                if line.startswith("fn="):
                    caller = self._name(line[3:].rstrip())
                elif line.startswith("cfn="):
                    callee = self._name(line[4:].rstrip())
                elif line.startswith("calls="):
                    is_call = True
                elif is_call:
                    is_call = False
                    edge = (caller, callee)
                    self.edges[edge] = self.edges.get(edge, 0) + int(line.split()[1])

    def inclusive(self, caller, callee):
        """Cost of the calls from a function (None: from any other) to one; None if there was no such call."""
        costs = [cost for (source, target), cost in self.edges.items()
                 if target == callee and source != callee and caller in (None, source)]
        return sum(costs) if costs else None

    def lazy_binding(self):
        """What the linker's trampoline cost, wherever it was called from."""
        return sum(cost for (source, target), cost in self.edges.items()
                   if target.startswith("_dl_fixup") and source.startswith("_dl_runtime_resolve"))
