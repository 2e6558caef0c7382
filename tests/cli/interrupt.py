#!/usr/bin/env python3
"""Interrupts a command after its first result.

usage: interrupt.py SIGNAL WORDS...      SIGNAL is INT or TERM; "a.epub" goes in, then nothing more

Prints what came out before the signal and the exit status.
"""

import signal
import subprocess
import sys

command = subprocess.Popen(sys.argv[2:], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)
command.stdin.write("a.epub\n")
command.stdin.flush()
first = command.stdout.read(16)
command.send_signal(signal.Signals["SIG" + sys.argv[1]])
rest = command.stdout.read()  # ends although standard input stays open
print(first)
print("ends with", rest[-2:].strip())
print("status", command.wait())
