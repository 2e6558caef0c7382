#!/usr/bin/env python3
"""Runs the contenders of each workload side by side, round by round, and says which goals are met.

usage: run.py --build DIR --workload DIR [--share F] [--rounds N] [--only TEXT] [--markdown]
              [--json FILE]

Times are those of an asset, of the process and of whatever it started, less what the same program
takes for the first asset alone. Absolute times mean nothing on a shared machine: the ratios of one
run do. System calls are counted over up to a hundred assets.
"""

import argparse
import json
import subprocess
import sys
import tempfile
from pathlib import Path

import report
from measuring import Bench
from places import Places
from workloads import workloads


def why_not(workload, folder, places):
    """Why a workload can't be run here; none where it can."""
    if workload.files and not (folder / f"{workload.files}.list").stat().st_size:
        return "the workload has no such files"
    return places.why_not(workload.place) if workload.place else None


def measured_pieces(build):
    """The small pieces' names and nanoseconds, where Google Benchmark is installed."""
    program = build / "bench" / "bench_pieces"
    if not program.exists():
        return []
    told = subprocess.run([program, "--benchmark_format=json"], stdout=subprocess.PIPE,
                          stderr=subprocess.DEVNULL, check=True)
    return [(each["name"], each["cpu_time"]) for each in json.loads(told.stdout)["benchmarks"]]


def main():
    parser = argparse.ArgumentParser(description=__doc__.split("\n")[0])
    parser.add_argument("--build", type=Path, required=True)
    parser.add_argument("--workload", type=Path, required=True)
    parser.add_argument("--share", type=float, default=1.0)
    parser.add_argument("--rounds", type=int, default=5)
    parser.add_argument("--only", default="")
    parser.add_argument("--markdown", action="store_true")
    parser.add_argument("--json", type=Path)
    options = parser.parse_args()
    build, folder = options.build.resolve(), options.workload.resolve()
    about = list(report.machine(folder))
    results = []
    with tempfile.TemporaryDirectory() as scratch, Places(folder) as places:
        bench = Bench(build / "bench" / "bench_launch", folder, Path(scratch), places)
        for workload in workloads(build, options.share):
            if options.only not in workload.name:
                continue
            workload.skipped = why_not(workload, folder, places)
            if not workload.skipped:
                bench.run(workload, options.rounds)
            results.append(workload)
            if options.markdown:
                print(f"bench: {workload.name}", file=sys.stderr)
            else:
                report.print_text_workload(workload)
        pieces = measured_pieces(build) if options.only in "pieces" else []
    if options.markdown:
        report.print_markdown(about, report.peers(), results, pieces)
    else:
        for name, text in about:
            print(f"{name}: {text}")
        print()
        report.print_text_end(results, pieces)
    if options.json:
        options.json.write_text(json.dumps(report.as_json(about, results, pieces), indent=2) + "\n")


if __name__ == "__main__":
    main()
