"""What the figures were measured on."""

import datetime
import os
import platform
import re
import subprocess

PACKAGES = ("g++", "libc6", "libstdc++6", "libjsoncpp25", "lighttpd", "nginx-light", "php-cgi", "wrk", "valgrind", "strace")


def processor():
    with open("/proc/cpuinfo", encoding="utf-8") as file:
        found = re.search(r"^model name\s*: (.*)$", file.read(), re.MULTILINE)
    return found[1] if found else platform.machine()


def facts():
    versions = subprocess.run(["dpkg-query", "--show", "--showformat=${Package} ${Version}\n", *PACKAGES],
                              stdout=subprocess.PIPE, text=True, check=False).stdout.split("\n")
    with open("/etc/debian_version", encoding="utf-8") as file:
        debian = file.read().strip()
    with open("/etc/nsswitch.conf", encoding="utf-8") as file:
        groups = re.search(r"^group:\s*(.*)$", file.read(), re.MULTILINE)
    return {
        "date": datetime.date.today().isoformat(),
        "processor": f"{processor()}, {os.cpu_count()} cores",
        "system": f"Debian {debian}, kernel {platform.release()}",
        "load": f"{os.getloadavg()[0]:.1f}",
        "groups": groups[1] if groups else "",
        "packages": ", ".join(line for line in versions if line),
    }
