"""System calls of one process, and the files that it maps, by strace."""

import re
import tempfile

HEAVY = ("libcurl", "libcrypto", "libssl", "libsqlite3", "libpam")
MAPPED_FILE = re.compile(r"mmap\(.*, \d+<(/[^>]+)>, ")


def trace(call, *options):
    """The trace of one process and its children, as text."""
    with tempfile.NamedTemporaryFile("r", encoding="utf-8") as file:
        call.run(["strace", "-f", "-o", file.name, *options])
        return file.read()


def libraries(call):
    """The shared objects that the process or a child of it mapped at any time."""
    paths = MAPPED_FILE.findall(trace(call, "--decode-fds=path", "-e", "trace=mmap"))
    return sorted({path.rpartition("/")[2] for path in paths if ".so" in path})


def heavy(names):
    return [name for name in names if name.startswith(HEAVY)]


def mapped_libraries(calls, login):
    """By call: the objects that it maps. A login, which needs PAM, shows that the check sees what is mapped late."""
    if not heavy(libraries(login)):
        raise RuntimeError("a login maps none of the watched libraries: the check is blind")
    found = {name: libraries(call) for name, call in calls.items()}
    found["front, login by password"] = libraries(login)
    for name, names in found.items():
        print(f"{name} maps of {', '.join(HEAVY)}: {', '.join(heavy(names)) or 'none'}; {len(names)} objects in all",
              flush=True)
    return found


def count(call):
    """By name of the system call: how many the process and its children make."""
    by_name = {}
    for line in trace(call).splitlines():
        found = re.match(r"\d+ +(\w+)\(", line)
        if found:
            by_name[found[1]] = by_name.get(found[1], 0) + 1
    return by_name


def total(call):
    return sum(count(call).values())


def counts(calls):
    """By call: the number of system calls, all together and by name."""
    table = {}
    for name, call in calls.items():
        by_name = count(call)
        table[name] = {"total": sum(by_name.values()), "by name": by_name}
        most = sorted(by_name.items(), key=lambda item: -item[1])[:6]
        frequent = ", ".join(f"{call_name} {count}" for call_name, count in most)
        print(f"system calls, {name}: {table[name]['total']} ({frequent}, ...)", flush=True)
    return table
