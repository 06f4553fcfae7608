#!/usr/bin/env python3
"""Runs the GoogleTest programs of a build: run_gtests.py BUILD RESULTS [FILTER].

Each program runs its tests in a few processes, not one for each test: starting a program takes longer than most tests
do, above all under the sanitizers. To RESULTS/gtest "PASSED FAILED" is written. A skipped test counts as failed, and a
process that dies, does not end in time or reports nothing is one failure. FILTER is a regular expression for names of
tests. Ends with 1 if a test failed, or if there was none to run and no filter.
"""

import concurrent.futures
import glob
import os
import re
import signal
import subprocess
import sys
import tempfile
import time
import xml.etree.ElementTree

SHARDS = 4
TIME_LIMIT = 900


def names_of(program):
    """The tests of the program as "SUITE.NAME"."""
    listed = subprocess.run([program, "--gtest_list_tests"], stdout=subprocess.PIPE, text=True, check=True,
                            timeout=TIME_LIMIT)
    suite, names = "", []
    for line in listed.stdout.splitlines():
        name = line.partition("#")[0].rstrip()
        if name.startswith("  "):
            names.append(suite + name.strip())
        elif name.endswith("."):
            suite = name
    return names


def wanted(program, pattern):
    """What GTEST_FILTER has to be; None if the program has no such test."""
    if not pattern:
        return "*"
    names = [name for name in names_of(program) if re.search(pattern, name)]
    return ":".join(names) or None


def run(program, selection, shard, folder):
    """The process's exit status or None, its output, seconds, and the path of its report, which may be missing."""
    report = f"{folder}/{os.path.basename(program)}-{shard}.xml"
    environment = dict(os.environ, GTEST_FILTER=selection, GTEST_TOTAL_SHARDS=str(SHARDS), GTEST_SHARD_INDEX=str(shard),
                       GTEST_OUTPUT="xml:" + report, GTEST_BRIEF="1", GTEST_COLOR="no")
    begin = time.monotonic()
    with tempfile.TemporaryFile() as output:
        process = subprocess.Popen([program], env=environment, stdin=subprocess.DEVNULL, stdout=output,
                                   stderr=subprocess.STDOUT, cwd=folder, start_new_session=True)
        try:
            status = process.wait(TIME_LIMIT)
        except subprocess.TimeoutExpired:
            os.killpg(process.pid, signal.SIGKILL)
            process.wait()
            status = None
        output.seek(0)
        return status, output.read().decode(errors="replace"), time.monotonic() - begin, report


def count(status, report):
    """Passed and failed tests of one process."""
    try:
        cases = list(xml.etree.ElementTree.parse(report).getroot().iter("testcase"))
    except (OSError, xml.etree.ElementTree.ParseError):
        return 0, 1
    ran = [case for case in cases if case.get("status") == "run"]
    failed = sum(case.get("result") != "completed" or case.find("failure") is not None for case in ran)
    # A test that is switched off in its source is not passed over in silence either.
    failed += sum(case.get("name", "").startswith("DISABLED_") for case in cases if case not in ran)
    # What the sanitizers find at the end of a process belongs to no test.
    return len(ran) - failed, failed if failed or status == 0 else 1


def main():
    build, results = sys.argv[1:3]
    pattern = sys.argv[3] if len(sys.argv) > 3 else ""
    programs = {}
    for program in sorted(glob.glob(f"{build}/bin/*[-_]tests")):
        selection = wanted(program, pattern)
        if selection is not None:
            programs[program] = selection
    passed = failed = 0
    with tempfile.TemporaryDirectory() as folder, concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
        running = {pool.submit(run, program, selection, shard, folder): (program, shard)
                   for program, selection in programs.items() for shard in range(SHARDS)}
        for done in concurrent.futures.as_completed(running):
            program, shard = running[done]
            status, output, seconds, report = done.result()
            good, bad = count(status, report)
            passed, failed = passed + good, failed + bad
            if bad:
                print(output)
            ended = "" if status == 0 else ", did not end in time" if status is None else f", ended with {status}"
            print(f"{os.path.basename(program)}, part {shard + 1} of {SHARDS}: {good} passed, {bad} failed{ended}, "
                  f"{seconds:.1f} s", flush=True)
    with open(f"{results}/gtest", "w", encoding="ascii") as file:
        file.write(f"{passed} {failed}\n")
    return 1 if failed or (passed == 0 and not pattern) else 0


if __name__ == "__main__":
    sys.exit(main())
