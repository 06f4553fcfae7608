#!/usr/bin/env python3
"""Adds up what the test programs left: count_results.py RESULTS FILTER PART... Prints "N passed, N failed" as its only line.

A part that left no result was cut off, and counts as one failure. So does a test that ctest did not run. Ends with 1 if
anything failed or nothing ran.
"""

import os
import sys
import xml.etree.ElementTree


def of_ctest(path, filtered):
    if not os.path.exists(path):
        return 0, 1
    passed = failed = 0
    for case in xml.etree.ElementTree.parse(path).getroot().iter("testcase"):
        if case.get("status") == "run":
            passed += 1
        else:
            failed += 1
    return passed, failed if passed + failed > 0 or filtered else 1


def of_counts(path):
    if not os.path.exists(path):
        return 0, 1
    with open(path, encoding="ascii") as file:
        passed, failed = map(int, file.read().split())
    return passed, failed


def main():
    results = sys.argv[1]
    filtered = sys.argv[2] != ""
    parts = [of_ctest(f"{results}/ctest.xml", filtered)]
    parts += [of_counts(f"{results}/{part}") for part in sys.argv[3:]]
    passed = sum(part[0] for part in parts)
    failed = sum(part[1] for part in parts)
    print(f"{passed} passed, {failed} failed")
    return 1 if failed or not passed else 0


if __name__ == "__main__":
    sys.exit(main())
