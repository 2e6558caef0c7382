#!/usr/bin/env python3
"""Runs the program through the cases written down in text files.

usage: run_cases.py PROGRAM [--only WORDS] FILE.case...

A case is a few lines, each told by its first sign:

    == what the case says             begins a case
    + book a.epub title="A Book"      an input, made in a fresh working directory (inputs.py)
    $ parvel inspect a.epub           the command line, given to sh; several are given one by one
    ? 1                               the exit status, 0 where it isn't said
    > line     >~ pattern             standard output, line by line; a pattern is matched whole
    ! line     !~ pattern             standard error likewise
    = results[0]["path"] == "a.epub"  must be true; `results` is standard output read as JSON, an
                                      array or lines, and `out` and `err` are the texts themselves
    & name...                         the files that the case makes or removes (with a - before it)

What a case doesn't expect must not be there: output, messages, changed files. {dir} in an expected
line, a truth or a command line stands for the working directory, {tests} in a command line for this
folder, and # begins a comment. The last line printed is
"N passed, N failed", with ", N skipped" where the file system lacks what a case needs.
"""

import json
import os
import re
import subprocess
import sys
import tempfile
from pathlib import Path

sys.dont_write_bytecode = True
import inputs  # noqa: E402  (beside this file)

SIGNS = ("==", ">~", "!~", "+", "$", "?", ">", "!", "=", "&")
HERE = str(Path(__file__).resolve().parent)
TIMEOUT = 60  # seconds; far beyond what any case takes


class Case:
    def __init__(self, name, place):
        self.name, self.place = name, place
        self.lines = {sign: [] for sign in SIGNS}
        self.out, self.err = [], []  # (sign, text) in order

    def add(self, sign, text):
        if sign in (">", ">~"):
            self.out.append((sign, text))
        elif sign in ("!", "!~"):
            self.err.append((sign, text))
        else:
            self.lines[sign].append(text)


def read_cases(path):
    cases = []
    for number, line in enumerate(path.read_text().splitlines(), 1):
        if not line.strip() or line.startswith("#"):
            continue
        sign = next((each for each in SIGNS if line == each or line.startswith(each + " ")), None)
        text = line[len(sign or "") + 1:]
        if sign == "==":
            cases.append(Case(text, f"{path.name}:{number}"))
        elif sign and cases:
            cases[-1].add(sign, text)
        else:
            sys.exit(f"{path}:{number}: not a line of a case: {line}")
    return cases


def snapshot(directory):
    """Everything below the directory: path to what must not change unsaid."""
    state = {}
    for folder, names, files in os.walk(os.fsencode(directory)):
        for name in names + files:
            path = os.path.join(folder, name)
            kept = os.readlink(path) if os.path.islink(path) else None
            if kept is None and os.path.isfile(path):
                kept = Path(os.fsdecode(path)).read_bytes()
            attributes = {}
            if not os.path.islink(path):
                attributes = {key: os.getxattr(path, key) for key in os.listxattr(path)}
            state[os.fsdecode(os.path.relpath(path, os.fsencode(directory)))] = (kept, attributes)
    return state


def line_faults(what, expected, text, directory):
    lines = text.split("\n")
    if lines[-1] == "":
        lines.pop()
    for (sign, wanted), line in zip(expected, lines):
        wanted = wanted.replace("{dir}", re.escape(directory) if sign.endswith("~") else directory)
        same = re.fullmatch(wanted, line) if sign.endswith("~") else wanted == line
        if not same:
            yield f"{what}: expected {wanted!r}, got {line!r}"
    for _, wanted in expected[len(lines):]:
        yield f"{what}: expected {wanted!r}, got no such line"
    for line in lines[len(expected):]:
        yield f"{what}: unexpected {line!r}"


def results_of(text):
    try:
        return json.loads(text)
    except ValueError:
        return [json.loads(line) for line in text.split("\n") if line]


def truth_faults(truths, out, err, directory):
    names = {"out": out, "err": err, "dir": directory}
    if truths and any("results" in truth for truth in truths):
        try:
            names["results"] = results_of(out)
        except ValueError as problem:
            yield f"standard output is no JSON ({problem}): {out!r}"
            return
    for truth in truths:
        truth = truth.replace("{dir}", directory)
        try:
            holds = eval(truth, {"re": re, "json": json}, names)
        except Exception as problem:  # any mistake of a truth is a fault of its case
            holds, truth = False, f"{truth} ({problem!r})"
        if not holds:
            yield f"not true: {truth}\n      standard output was {out!r}"


def file_faults(case, before, after):
    expected = {name for line in case.lines["&"] for name in line.split()}
    changed = {name for name in after if after[name] != before.get(name)}
    changed |= {"-" + name for name in before if name not in after}
    for name in sorted(expected ^ changed):
        yield f"files: {name} is " + ("changed unsaid" if name in changed else "not changed")


def run(case, program):
    """The faults of a case; None where it can't be run here, with the reason."""
    with tempfile.TemporaryDirectory(prefix="parvel-case-") as directory:
        directory = os.path.realpath(directory)
        try:
            for line in case.lines["+"]:
                inputs.make(directory, line)
        except inputs.Unsupported as reason:
            return None, str(reason)
        before = snapshot(directory)
        environment = {"PATH": f"{Path(program).parent}:/usr/bin:/bin", "LC_ALL": "C.UTF-8",
                       "HOME": directory, "TMPDIR": directory, "TZ": "UTC"}
        kept = ("LD_LIBRARY_PATH", "ASAN_OPTIONS", "UBSAN_OPTIONS", "TSAN_OPTIONS")
        environment.update({name: os.environ[name] for name in kept if name in os.environ})
        out = err = ""
        for command in case.lines["$"]:
            command = command.replace("{dir}", directory).replace("{tests}", HERE)
            try:
                done = subprocess.run(["sh", "-c", command], cwd=directory, env=environment,
                                      stdin=subprocess.DEVNULL, capture_output=True,
                                      timeout=TIMEOUT)
            except subprocess.TimeoutExpired:
                return [f"has not ended after {TIMEOUT} seconds: {command}"], ""
            out += done.stdout.decode("utf-8", "backslashreplace")
            err += done.stderr.decode("utf-8", "backslashreplace")
        faults = []
        status = int((case.lines["?"] or ["0"])[0])
        if done.returncode != status:
            faults.append(f"exit status: expected {status}, got {done.returncode}")
        if case.out or not case.lines["="]:
            faults += line_faults("standard output", case.out, out, directory)
        if not any("err" in truth for truth in case.lines["="]):
            faults += line_faults("standard error", case.err, err, directory)
        faults += truth_faults(case.lines["="], out, err, directory)
        faults += file_faults(case, before, snapshot(directory))
        return faults, ""


def main():
    arguments = sys.argv[1:]
    only = ""
    if "--only" in arguments:
        at = arguments.index("--only")
        only = arguments[at + 1]
        del arguments[at:at + 2]
    if len(arguments) < 2:
        sys.exit(__doc__)
    program = os.path.abspath(arguments[0])
    if not os.access(program, os.X_OK):
        sys.exit(f"{program} is no program")
    passed = failed = 0
    skipped = {}
    for path in map(Path, arguments[1:]):
        for case in read_cases(path):
            if only not in case.name:
                continue
            faults, reason = run(case, program)
            if faults is None:
                skipped[reason] = skipped.get(reason, 0) + 1
            elif faults:
                failed += 1
                print(f"FAILED {case.place}: {case.name}")
                print("".join(f"    {fault}\n" for fault in faults), end="")
            else:
                passed += 1
    for reason, number in skipped.items():
        print(f"{number} skipped: {reason}")
    print(f"{passed} passed, {failed} failed" +
          (f", {sum(skipped.values())} skipped" if skipped else ""))
    return 1 if failed or not (passed or skipped) else 0


if __name__ == "__main__":
    sys.exit(main())
