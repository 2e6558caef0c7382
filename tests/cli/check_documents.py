#!/usr/bin/env python3
"""Holds the man pages and the completions to what the program says of its own options.

usage: check_documents.py PROGRAM ROOT
"""

import re
import subprocess
import sys
from pathlib import Path

OPTION = re.compile(r"(?<![\w-])(--[a-z][a-z-]+|-[A-Za-z0-9])(?![\w-])")


def help_of(program, command):
    words = [program] + ([command] if command else []) + ["--help"]
    return subprocess.run(words, capture_output=True, text=True, check=True).stdout


def helped(text):
    """The options at the beginning of the lines of a help text."""
    found = set()
    for line in text.split("\n"):
        match = re.match(r"\s+((?:-\w, )?--[\w-]+)", line)
        found |= set(OPTION.findall(match.group(1))) if match else set()
    return found


def commands_of(text):
    listed = text.split("Commands:\n")[1].split("\n\n")[0]
    return {line.split()[0] for line in listed.split("\n")}


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


def in_bash(root, command):
    script = root / "packaging/completions/parvel.bash"
    shown = subprocess.run(["bash", "-c", f'source "{script}"; _parvel_options "$1"', "-", command],
                           capture_output=True, text=True, check=True).stdout
    return set(shown.split())


def in_zsh(root, command):
    text = (root / "packaging/completions/_parvel").read_text()
    body = re.search(r"^_parvel%s\(\) \{\n(.*?)^\}" % ("_" + command if command else ""), text,
                     re.MULTILINE | re.DOTALL).group(1)
    for name in re.findall(r"\$(_parvel_\w+)", body):
        body += re.search(r"^%s=\(\n(.*?)^\)" % name, text, re.MULTILINE | re.DOTALL).group(1)
    found = set()
    for entry in re.findall(r"'(?:\([^)]*\))?\*?(-[\w-]+)\[|\{(-[^}]*)\}", body):
        found |= set(OPTION.findall(entry[0] or entry[1]))
    return found


def in_fish(root, command):
    text = (root / "packaging/completions/parvel.fish").read_text()
    everywhere = re.compile(r"complete -c parvel -[sl]")
    found = set()
    looped = []
    for line in text.split("\n"):
        line = line.strip()
        if line.startswith("for command in "):
            looped = line.split()[3:]
        named = f"__fish_seen_subcommand_from {command}'" in line or \
            (command in looped and "__fish_seen_subcommand_from $command" in line)
        before = "__parvel_needs_command" in line
        if everywhere.match(line) or (named if command else before):
            found |= {"-" + name for name in re.findall(r" -s (\w)", line)}
            found |= {"--" + name for name in re.findall(r" -l ([\w-]+)", line)}
    return found


def main():
    program, root = sys.argv[1], Path(sys.argv[2])
    overview = help_of(program, "")
    passed = failed = 0
    for command in ["", *sorted(commands_of(overview))]:
        expected = helped(overview if not command else help_of(program, command))
        for where, options in [("the man page", manned(root, command)),
                               ("bash", in_bash(root, command)), ("zsh", in_zsh(root, command)),
                               ("fish", in_fish(root, command))]:
            if options == expected:
                passed += 1
                continue
            failed += 1
            print(f"parvel {command}: {where} lacks {sorted(expected - options)} and has "
                  f"{sorted(options - expected)} of its own")
    print(f"{passed} passed, {failed} failed")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
