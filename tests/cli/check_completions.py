#!/usr/bin/env python3
"""Holds what a real shell completes to what the program says of its own options.

usage: check_completions.py bash|zsh|fish PROGRAM COMPLETIONS
"""

import os
import shutil
import sys
import tempfile
from pathlib import Path

sys.dont_write_bytecode = True
from completing_shells import SHELLS  # noqa: E402  (beside this file)
from program_help import commands_of, help_of, options_of  # noqa: E402

SKIPPED = 77
FILES = {"a book.epub", "notes.txt"}
FOLDERS = {"shelf", "trash"}  # one is named as a command
ANY = FILES | FOLDERS
NOTHING = set()
WORDS = {"--log": {"off", "fault", "error", "default", "debug"},
         "--progress": {"auto", "always", "never", "json"},
         "--flavor": {"full", "content-library", "store", "progress", "identity"}}
KINDS = {"DIR": FOLDERS, "FILE": ANY, "IMAGE": ANY, "OLD": ANY, "PATH": ANY}
# By the number of operands before; the last is for any further ones.
OPERANDS = {"cloud": [{"add", "take", "replace", "status"}, ANY, ANY], "cover": [ANY, NOTHING],
            "match": [ANY, ANY, NOTHING], "pack": [FOLDERS, NOTHING]}


def value_lines(command, options):
    """What stands behind each option that has a value."""
    for name, value in options.items():
        expected = WORDS.get(name, KINDS.get(value, NOTHING))
        if value is None:
            continue
        yield f"parvel {command} {name} ", expected
        if name.startswith("--"):
            yield f"parvel {command} {name}=", expected


def operand_lines(command):
    line = f"parvel {command} "
    for expected in OPERANDS.get(command, [ANY, ANY]):
        yield line, expected
        line += "trash "


def lines_of(program):
    """Command lines, each with what it is to be completed to."""
    overview = help_of(program, "")
    commands = commands_of(overview)
    yield "parvel ", commands
    yield "parvel ins", {"inspect", "install"}
    yield "parvel -", set(options_of(overview))
    yield "parvel --log ", WORDS["--log"]
    yield "parvel --log debug ", commands
    for command in sorted(commands):
        options = options_of(help_of(program, command))
        yield f"parvel {command} -", set(options)
        yield f"parvel --log debug {command} --", {name for name in options if len(name) > 2}
        yield from value_lines(command, options)
        yield from operand_lines(command)
    yield "parvel inspect trash --s", {"--store"}
    yield "parvel inspect a", {"a book.epub"}
    yield "parvel inspect --flavor=st", {"store"}
    yield "parvel edit --set title=s", NOTHING
    yield "parvel edit --set title=x ", ANY
    yield "parvel cover -o trash ", ANY
    yield "parvel edit --cover trash ", ANY
    yield "parvel inspect -- -", NOTHING


def main():
    name, program, completions = sys.argv[1:]
    if not shutil.which(name):
        print(f"skipped: {name} is not installed")
        return SKIPPED
    passed = failed = 0
    with tempfile.TemporaryDirectory(prefix="parvel-completions-") as folder, \
            tempfile.TemporaryDirectory(prefix="parvel-home-") as home:
        os.chdir(folder)
        for each in FOLDERS:
            os.mkdir(each)
        for each in FILES:
            Path(each).touch()
        shell = SHELLS[name]({"PATH": f"{Path(program).parent}:/usr/bin:/bin", "LC_ALL": "C.UTF-8",
                              "HOME": home, "COMPLETIONS": completions})
        for line, expected in lines_of(program):
            offered = shell.offers(line)
            if line.endswith(" "):  # zsh offers the options where no operand may stand
                offered = {word for word in offered if not word.startswith("-")}
            if offered == expected:
                passed += 1
                continue
            failed += 1
            print(f"{name}: {line!r} lacks {sorted(expected - offered)} and has "
                  f"{sorted(offered - expected)} of its own")
        shell.end()
        os.chdir("/")
    print(f"{passed} passed, {failed} failed")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
