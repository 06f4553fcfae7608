#!/usr/bin/env python3
"""Runs the unittest modules of one folder: run_tests.py FOLDER COUNTS [FILTER [MODULE...]].

COUNTS is a file to which "PASSED FAILED" is written. A skipped test counts as failed: nothing here is passed over in
silence. FILTER is a pattern as unittest's -k takes it; the MODULEs are left out. Ends with 1 if a test failed, or if there was none to run and
no filter.
"""

import sys
import unittest


def tests_of(suite):
    for test in suite:
        if isinstance(test, unittest.TestSuite):
            yield from tests_of(test)
        else:
            yield test


def main():
    folder, counts = sys.argv[1:3]
    loader = unittest.TestLoader()
    pattern = sys.argv[3] if len(sys.argv) > 3 else ""
    if pattern:
        loader.testNamePatterns = [pattern if "*" in pattern else f"*{pattern}*"]
    left_out = set(sys.argv[4:])
    suite = unittest.TestSuite(test for test in tests_of(loader.discover(folder))
                               if test.id().partition(".")[0] not in left_out)
    result = unittest.TextTestRunner(verbosity=2).run(suite)
    # A test counts once, however many of its rows failed.
    bad = {getattr(test, "test_case", test).id()
           for test, _ in result.failures + result.errors + result.skipped}
    bad |= {test.id() for test in result.unexpectedSuccesses}
    passed = max(result.testsRun - len(bad), 0)
    with open(counts, "w", encoding="ascii") as file:
        file.write(f"{passed} {len(bad)}\n")
    return 1 if bad or (passed == 0 and not pattern) else 0


if __name__ == "__main__":
    sys.exit(main())
