#!/usr/bin/env python3
"""Holds the man pages to what the program says of its own options.

usage: check_documents.py PROGRAM ROOT
"""

import re
import sys
from pathlib import Path

sys.dont_write_bytecode = True
from program_help import commands_of, help_of, options_of  # noqa: E402  (beside this file)


def manned(root, command):
    """The options that a page explains, each where its list has an item for it."""
    page = root / "docs/man" / (f"parvel-{command}.1" if command else "parvel.1")
    text = page.read_text()
    if not command:  # the options of the results are those of the commands
        text = text.split(".Sh RESULTS")[0]
    found = set()
    for line in re.findall(r"^\.It (Fl .*)$", text, re.MULTILINE):
        for name in re.findall(r"(?:^Fl | , )(-?[\w-]+)", line):
            found.add("-" + name)
    return found


def main():
    program, root = sys.argv[1], Path(sys.argv[2])
    passed = failed = 0
    for command in ["", *sorted(commands_of(help_of(program, "")))]:
        expected = set(options_of(help_of(program, command)))
        options = manned(root, command)
        if options == expected:
            passed += 1
            continue
        failed += 1
        print(f"parvel {command}: the man page lacks {sorted(expected - options)} and has "
              f"{sorted(options - expected)} of its own")
    print(f"{passed} passed, {failed} failed")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
