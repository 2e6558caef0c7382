#!/usr/bin/env python3
"""Interrupts a command while it runs.

usage: interrupt.py SIGNAL WORDS...        after its first result; "a.epub" goes in, then nothing more
       interrupt.py --twice SIGNAL WORDS...  while it waits for somebody to read its results
       interrupt.py --midway SIGNAL WORDS... while it waits for somebody to read its progress

SIGNAL is INT or TERM. Prints what came out and the exit status.
"""

import fcntl
import os
import signal
import subprocess
import sys
import tempfile
import time


def once(name, words):
    command = subprocess.Popen(words, stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)
    command.stdin.write("a.epub\n")
    command.stdin.flush()
    print(command.stdout.read(16))
    command.send_signal(signal.Signals["SIG" + name])
    rest = command.stdout.read()  # ends although standard input stays open
    print("ends with", rest[-2:].strip())
    print("status", command.wait())


def state_of(command):
    with open(f"/proc/{command.pid}/stat") as file:
        return file.read().rsplit(")", 1)[1].split()[0]


def wait_until_idle(command):
    """Until it does nothing but wait, which it does for as long as nobody reads."""
    idle = 0
    while idle < 20:
        time.sleep(0.01)
        idle = idle + 1 if state_of(command) == "S" else 0


def midway(name, words):
    ours, theirs = os.pipe()
    fcntl.fcntl(theirs, fcntl.F_SETPIPE_SZ, 4096)  # soon full
    with tempfile.TemporaryFile("w+") as results:
        command = subprocess.Popen(words, stdin=subprocess.DEVNULL, stdout=results, stderr=theirs)
        os.close(theirs)
        os.read(ours, 1)
        wait_until_idle(command)
        command.send_signal(signal.Signals["SIG" + name])
        with open(ours) as messages:
            told = [line for line in messages if line.startswith("parvel: ")]
        status = command.wait()
        results.seek(0)
        print(results.read() + "".join(told) + f"status {status}")


def twice(name, words):
    command = subprocess.Popen(words, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE)
    command.stdout.read(1)
    wait_until_idle(command)
    command.send_signal(signal.Signals["SIG" + name])
    time.sleep(0.2)
    print("after the first:", "runs" if command.poll() is None else "has ended")
    command.send_signal(signal.Signals["SIG" + name])
    print("status", command.wait(10))


if __name__ == "__main__":
    # A signal that this process ignores, as a background job's, would be ignored by the command too.
    for name in ("SIGINT", "SIGTERM"):
        signal.signal(signal.Signals[name], signal.SIG_DFL)
    if sys.argv[1] == "--twice":
        twice(sys.argv[2], sys.argv[3:])
    elif sys.argv[1] == "--midway":
        midway(sys.argv[2], sys.argv[3:])
    else:
        once(sys.argv[1], sys.argv[2:])
