"""What the program's help says of its commands and options."""

import re
import subprocess

OPTION = re.compile(r"(?<![\w-])(--[a-z][a-z-]+|-[A-Za-z0-9])(?![\w-])")


def help_of(program, command):
    words = [program] + ([command] if command else []) + ["--help"]
    return subprocess.run(words, capture_output=True, text=True, check=True).stdout


def commands_of(text):
    listed = text.split("Commands:\n")[1].split("\n\n")[0]
    return {line.split()[0] for line in listed.split("\n")}


def options_of(text):
    """The options at the beginning of the lines of a help text: name to the value's name, if any."""
    found = {}
    for line in text.split("\n"):
        match = re.match(r"\s+((?:-\w, )?--[\w-]+)(?: ([A-Za-z]\S*))?(?:  |$)", line)
        for name in OPTION.findall(match.group(1)) if match else ():
            found[name] = match.group(2)
    return found
