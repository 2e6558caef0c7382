#!/usr/bin/env python3
"""Runs the contenders of each workload side by side, round by round, and prints one table.

usage: run.py --build DIR --workload DIR [--rounds N] [--only TEXT] [--json FILE]

Times are CPU time an asset, of the process and of whatever it started, less what the same program
takes for an empty list. Absolute times mean nothing on a shared machine: the ratios of one run do.
"""

import argparse
import json
import re
import shutil
import statistics
import subprocess
import sys
import tempfile
from pathlib import Path


class Contender:
    """`command` is a list of words; "{list}" stands for the list of files. `each` starts it once a
    file, which comes as the last word, for at most so many files."""

    def __init__(self, name, command, role="peer", each=0):
        self.name, self.command, self.role, self.each = name, command, role, each
        self.cpu, self.wall, self.memory, self.calls, self.read = [], [], 0, None, None

    def installed(self):
        return shutil.which(self.command[0]) is not None


class Workload:
    def __init__(self, name, files, contenders, per="asset"):
        self.name, self.files, self.contenders, self.per = name, files, contenders, per


def workloads(build, folder):
    inspect = str(build / "bench" / "bench_inspect")
    bench = lambda name: str(build / "bench" / f"bench_{name}")
    parvel = str(build / "bin" / "parvel")
    floor, ours, peer = "floor", "library", "peer"
    kfilemetadata = bench("kfilemetadata")
    yield Workload("zipped book", "books", [
        Contender("floor", [bench("floor_book"), "{list}"], floor),
        Contender("library", [inspect, "{list}"], ours),
        Contender("ebook-tools", [bench("ebook_tools"), "{list}"]),
        Contender("KFileMetaData", [kfilemetadata, "{list}", "application/epub+zip"]),
        Contender("libgepub", [bench("gepub"), "{list}"])])
    yield Workload("expanded package", "packages", [
        Contender("library", [inspect, "{list}"], ours)])
    yield Workload("PDF information", "pdfs", [
        Contender("floor", [bench("floor_pdf"), "{list}"], floor),
        Contender("library", [inspect, "{list}"], ours),
        Contender("KFileMetaData", [kfilemetadata, "{list}", "application/pdf"]),
        Contender("poppler-glib", [bench("poppler_glib"), "{list}"]),
        Contender("pdfinfo", ["pdfinfo"], peer, each=50)])
    yield Workload("PDF cover", "pdfs", [
        Contender("floor", [bench("floor_pdf"), "{list}", "cover"], floor),
        Contender("library", [inspect, "{list}", "cover"], ours),
        Contender("poppler-glib", [bench("poppler_glib"), "{list}", "cover"]),
        Contender("pdftoppm", ["pdftoppm", "-png", "-singlefile", "-scale-to", "380"], peer,
                  each=50)])
    yield Workload("PDF of 200 MB with its MD5", "large-pdf", [
        Contender("openssl md5", ["openssl", "md5"], floor, each=1),
        Contender("library", [inspect, "{list}"], ours)])
    for name, files in (("audiobook", "audiobooks"), ("audiobook over 100 MB", "large-audiobooks")):
        yield Workload(name, files, [
            Contender("floor", [bench("floor_audiobook"), "{list}"], floor),
            Contender("library", [inspect, "{list}"], ours),
            Contender("TagLib", [bench("taglib"), "{list}"]),
            Contender("libavformat", [bench("avformat"), "{list}"])])
    yield Workload("program over zipped books", "books", [
        Contender("parvel -j1", [parvel, "inspect", "--jsonl", "-j1", "--files-from", "{list}"],
                  ours),
        Contender("parvel -j2", [parvel, "inspect", "--jsonl", "-j2", "--files-from", "{list}"]),
        Contender("exiftool", ["exiftool", "-json", "-@", "{list}"]),
        Contender("ebook-meta", ["ebook-meta"], peer, each=5)])
    yield Workload("start of the program", "nothing", [
        Contender("true", ["/bin/true"], floor, each=200),
        Contender("parvel --version", [parvel, "--version"], ours, each=200)], per="start")


def run_once(launcher, command):
    """CPU seconds, wall seconds and peak kilobytes of a command and of all that it leaves behind."""
    done = subprocess.run([launcher, *command], stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                          text=True, check=False)
    cpu, wall, peak = map(int, done.stdout.split())
    return cpu / 1e6, wall / 1e6, peak


def commands_of(contender, files):
    if not contender.each:
        return [[word.replace("{list}", str(files)) for word in contender.command]]
    paths = files.read_text().split("\n")[:-1] or []
    if not paths:
        return [contender.command] * contender.each
    return [contender.command + [path] for path in paths[:contender.each]]


def number_of_assets(contender, files):
    if contender.each:
        return len(commands_of(contender, files))
    return files.read_text().count("\n")


def measure(launcher, contender, files, empty):
    assets = number_of_assets(contender, files)
    cpu = wall = 0.0
    for command in commands_of(contender, files):
        once = run_once(launcher, command)
        cpu, wall = cpu + once[0], wall + once[1]
        contender.memory = max(contender.memory, once[2])
    if not contender.each:
        nothing = run_once(launcher, commands_of(contender, empty)[0])
        cpu, wall = max(cpu - nothing[0], 0), max(wall - nothing[1], 0)
    contender.cpu.append(cpu / assets)
    contender.wall.append(wall / assets)


def count_calls(contender, files, empty):
    """System calls an asset, where strace is installed."""
    if not shutil.which("strace"):
        return
    counts = []
    for listed in (files, empty):
        command = commands_of(contender, listed)[0]
        done = subprocess.run(["strace", "-f", "-qq", "-c", "-U", "calls", *command],
                              stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                              stderr=subprocess.PIPE, text=True, errors="replace")
        numbers = re.findall(r"(\d+) total", done.stderr)
        counts.append(int(numbers[-1]) if numbers else 0)
    each = counts[0] - counts[1] if not contender.each else counts[0]
    contender.calls = each / (1 if contender.each else number_of_assets(contender, files))


def count_read(contender, files):
    """The share of the files that a contender could read, where it says so."""
    if contender.each:
        return
    done = subprocess.run(commands_of(contender, files)[0], stdin=subprocess.DEVNULL,
                          stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, check=False)
    said = re.fullmatch(rb"(\d+) of (\d+)\n", done.stdout)
    if said:
        contender.read = int(said[1]) / int(said[2])


def median_ratio(mine, others):
    """Of the rounds, each contender's beside the other's of the same round."""
    pairs = [a / b for a, b in zip(mine, others) if b > 0]
    return statistics.median(pairs) if pairs else None


def line_of(contender, floor, ours):
    cells = [f"{statistics.median(contender.cpu) * 1e6:10.1f}",
             f"{statistics.median(contender.wall) * 1e6:10.1f}",
             f"{contender.memory / 1024:8.1f}",
             f"{contender.calls:8.1f}" if contender.calls is not None else f"{'-':>8}",
             f"{contender.read:6.0%}" if contender.read is not None else f"{'-':>6}"]
    for other in (floor, ours):
        ratio = median_ratio(contender.cpu, other.cpu) if other else None
        cells.append(f"{ratio:9.2f}" if ratio is not None else f"{'-':>9}")
    return f"  {contender.name:<18}" + " ".join(cells)


def first_of(contenders, role):
    return next((contender for contender in contenders if contender.role == role), None)


def main():
    parser = argparse.ArgumentParser(description=__doc__.split("\n")[0])
    parser.add_argument("--build", type=Path, required=True)
    parser.add_argument("--workload", type=Path, required=True)
    parser.add_argument("--rounds", type=int, default=5)
    parser.add_argument("--only", default="")
    parser.add_argument("--json", type=Path)
    options = parser.parse_args()
    launcher = options.build.resolve() / "bench" / "bench_launch"
    results = []
    with tempfile.TemporaryDirectory() as scratch:
        empty = Path(scratch) / "empty.list"
        empty.touch()
        for workload in workloads(options.build.resolve(), options.workload):
            files = empty if workload.files == "nothing" else \
                options.workload / f"{workload.files}.list"
            if options.only not in workload.name:
                continue
            if workload.files != "nothing" and files.stat().st_size == 0:
                print(f"{workload.name}: the workload has no such files", file=sys.stderr)
                continue
            contenders = [each for each in workload.contenders if each.installed()]
            missing = [each.name for each in workload.contenders if not each.installed()]
            for _ in range(options.rounds):
                for contender in contenders:
                    measure(launcher, contender, files, empty)
            for contender in contenders:
                count_calls(contender, files, empty)
                count_read(contender, files)
            print_table(workload, contenders, missing)
            results.append(json_of(workload, contenders))
    if options.json:
        options.json.write_text(json.dumps(results, indent=2) + "\n")


def print_table(workload, contenders, missing):
    floor, ours = first_of(contenders, "floor"), first_of(contenders, "library")
    print(f"{workload.name}" + (f"  (not installed: {', '.join(missing)})" if missing else ""))
    print(f"  {'':<18}{'CPU µs':>10} {'wall µs':>10} {'peak MB':>8} {'calls':>8} {'read':>6} "
          f"{'x floor':>9} {'x ours':>9}   each {workload.per}")
    for contender in contenders:
        print(line_of(contender, floor, ours))
    print(flush=True)


def json_of(workload, contenders):
    floor, ours = first_of(contenders, "floor"), first_of(contenders, "library")
    ratio = lambda mine, other: median_ratio(mine.cpu, other.cpu) if other else None
    return {"workload": workload.name, "contenders": [
        {"name": each.name, "role": each.role, "cpuMicroseconds": [s * 1e6 for s in each.cpu],
         "wallMicroseconds": [s * 1e6 for s in each.wall], "peakKilobytes": each.memory,
         "systemCalls": each.calls, "shareRead": each.read,
         "timesFloor": ratio(each, floor),
         "timesLibrary": ratio(each, ours)} for each in contenders]}


if __name__ == "__main__":
    main()
