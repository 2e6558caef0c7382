#!/usr/bin/env python3
"""Adds up what test runs left in their results folders and prints the closing line.

usage: summarize.py RESULTS...

A results folder holds ctest.xml and, for each unit.* test, that share's own report. A test that
prints "N passed, N failed" as its last line counts with those numbers, any other as one. Exits 1
when something failed or nothing ran.
"""

import re
import sys
import xml.etree.ElementTree as ElementTree
from pathlib import Path

CLOSING_LINE = re.compile(r"^(\d+) passed, (\d+) failed(?:, (\d+) skipped)?$")


class Count:
    def __init__(self):
        self.passed = self.failed = 0
        self.skipped = {}  # reason: number

    def add(self, passed, failed, skipped=0, reason="not said"):
        self.passed += passed
        self.failed += failed
        if skipped:
            self.skipped[reason] = self.skipped.get(reason, 0) + skipped


def add_units(count, report):
    """Adds the cases of one share of the unit tests, and returns how many of them failed."""
    failed = 0
    for case in ElementTree.parse(report).iter("testcase"):
        skip = case.find("skipped")
        if case.find("failure") is not None:
            failed += 1
            count.add(0, 1)
        elif skip is not None:
            # The message begins with the place in the source.
            reason = (skip.get("message") or skip.text or "").strip().split("\n")[-1]
            count.add(0, 0, 1, reason or "not said")
        elif case.get("status") == "run":
            count.add(1, 0)
    return failed


def add_run(count, folder):
    for test in ElementTree.parse(folder / "ctest.xml").iter("testcase"):
        name, status = test.get("name"), test.get("status")
        report = folder / (name + ".xml")
        if report.is_file():
            # A crash after the report, or a sanitizer's finding at exit, is a failure too.
            if add_units(count, report) == 0 and status == "fail":
                count.add(0, 1)
            continue
        output = (test.findtext("system-out") or "").strip().split("\n")
        closing = CLOSING_LINE.match(output[-1].strip())
        if closing:
            passed, failed, skipped = (int(number or 0) for number in closing.groups())
            count.add(passed, failed or int(status == "fail"), skipped, name)
        elif status == "run":
            count.add(1, 0)
        elif status == "notrun" or status == "disabled":
            count.add(0, 0, 1, name)
        else:
            count.add(0, 1)


def main():
    count = Count()
    for folder in map(Path, sys.argv[1:]):
        add_run(count, folder)
    for reason, number in sorted(count.skipped.items()):
        print(f"{number} skipped: {reason}")
    print(f"{count.passed} passed, {count.failed} failed")
    return 1 if count.failed or not count.passed else 0


if __name__ == "__main__":
    sys.exit(main())
