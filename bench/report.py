"""What was measured, as text, Markdown and JSON."""

import os
import platform
import re
import subprocess
from pathlib import Path

from places import MEMORY, file_system_of
from workloads import median_ratio

PACKAGES = Path(__file__).parent / "peers" / "packages"
HEADINGS = ("CPU µs", "wall µs", "peak MB", "calls", "went well", "assets", "x floor", "x library")
MEASURES = {"cpu": "CPU time", "wall": "wall time", "memory": "peak memory",
            "calls": "system calls"}


def machine(workload):
    """What the figures depend on, as pairs of a name and a text."""
    lines = Path("/proc/cpuinfo").read_text()
    model = re.search(r"model name\s*:\s*(.*)", lines)
    release = re.search(r'PRETTY_NAME="(.*)"', Path("/etc/os-release").read_text())
    memory = os.sysconf("SC_PAGE_SIZE") * os.sysconf("SC_PHYS_PAGES")
    yield "processor", f"{len(os.sched_getaffinity(0))} cores, {model[1] if model else 'unknown'}"
    yield "memory", f"{memory / 2**30:.0f} GiB"
    yield "system", f"{release[1] if release else 'unknown'}, Linux {platform.release()}"
    yield "file system", f"{file_system_of(workload)}; in memory {file_system_of(MEMORY)}"
    yield "load before", f"{os.getloadavg()[0]:.1f}"


def peers():
    told = subprocess.run(["dpkg-query", "-W", "-f", "${Package} ${Version} ${db:Status-Status}\n",
                           *PACKAGES.read_text().split()], text=True, stdout=subprocess.PIPE,
                          stderr=subprocess.DEVNULL, check=False)
    for package, version, status in (line.split() for line in told.stdout.splitlines()
                                     if line.count(" ") == 2):
        if status == "installed":
            yield f"{package} {version}"


def number(value, digits=1):
    return "–" if value is None else f"{value:,.{digits}f}"


def first_of(contenders, role):
    return next((each for each in contenders if each.role == role and each.runs
                 and not each.failed), None)


def ratio_to(contender, other):
    return median_ratio(contender.seconds("cpu"), other.seconds("cpu")) if other else None


def row_of(contender, floor, ours):
    if not contender.runs or contender.failed:
        return [contender.name, "failed" if contender.failed else "absent"]
    return [contender.name, number(contender.typical("cpu") * 1e6),
            number(contender.typical("wall") * 1e6), number(contender.memory / 1024),
            number(contender.calls),
            "–" if contender.read is None else f"{contender.read:.0%}", f"{contender.count:,}",
            number(ratio_to(contender, floor), 2), number(ratio_to(contender, ours), 2)]


def rows_of(workload):
    floor, ours = (first_of(workload.contenders, role) for role in ("floor", "library"))
    return [row_of(contender, floor, ours) for contender in workload.contenders]


def goal_rows(workload):
    for goal in workload.goals:
        # Times alone are seconds, and are told in milliseconds.
        is_time = goal.measure in ("cpu", "wall") and not goal.other
        factor, unit = (1e3, " ms") if is_time else (1, "")
        bound = f"at most {goal.at_most * factor:g}{unit}" if goal.at_most is not None else \
            f"at least {goal.at_least * factor:g}{unit}"
        value = goal.value(workload)
        if value is None:
            measured, met = workload.skipped or "absent", "–"
        else:
            measured = f"{value * factor:.2f}{unit}"
            met = "met" if goal.is_met(value) else "not met"
        yield [workload.name, f"{goal.text()}, {MEASURES[goal.measure]}", measured, bound, met]


GOAL_HEADINGS = ["work", "compared", "measured", "goal", ""]


def as_table(rows):
    """Columns as wide as they must be, the first to the left."""
    columns = max(map(len, rows))
    rows = [row + [""] * (columns - len(row)) for row in rows]
    widths = [max(len(row[column]) for row in rows) for column in range(columns)]
    return "\n".join("  " + "  ".join(
        cell.ljust(width) if column == 0 else cell.rjust(width)
        for column, (cell, width) in enumerate(zip(row, widths))).rstrip() for row in rows)


def as_list(rows):
    """The same, every column to the left."""
    widths = [max(len(row[column]) for row in rows) for column in range(len(rows[0]))]
    return "\n".join("  " + "  ".join(
        cell.ljust(width) for cell, width in zip(row, widths)).rstrip() for row in rows)


def print_text_workload(workload):
    print(workload.name + (f": {workload.skipped}" if workload.skipped else ""))
    if not workload.skipped:
        print(as_table([["each " + workload.per, *HEADINGS], *rows_of(workload)]))
    print(flush=True)


def print_text_end(results, pieces):
    if pieces:
        print("pieces")
        print(as_table([[name, f"{nanoseconds:,.0f} ns"] for name, nanoseconds in pieces]))
        print()
    print("goals")
    print(as_list([GOAL_HEADINGS, *(row for workload in results for row in goal_rows(workload))]))


def markdown_table(headings, rows, right):
    print("| " + " | ".join(headings) + " |")
    print("|---" + ("|--:" if right else "|---") * (len(headings) - 1) + "|")
    for row in rows:
        print("| " + " | ".join(row + [""] * (len(headings) - len(row))) + " |")
    print()


def print_markdown(about, installed, results, pieces):
    for name, text in about:
        print(f"- {name}: {text}")
    print("- peers: " + ", ".join(installed) + "\n")
    markdown_table(GOAL_HEADINGS, [row for workload in results for row in goal_rows(workload)],
                   right=False)
    for workload in results:
        if not workload.skipped:
            print(f"**{workload.name}**, each {workload.per}\n")
            markdown_table(["", *HEADINGS], rows_of(workload), right=True)
    if pieces:
        print("**Pieces**\n")
        markdown_table(["", "CPU time"], [[name, f"{nanoseconds:,.0f} ns"]
                                          for name, nanoseconds in pieces], right=True)


def as_json(about, results, pieces):
    return {"machine": dict(about), "workloads": [json_of(workload) for workload in results],
            "pieces": [{"name": name, "cpuNanoseconds": each} for name, each in pieces]}


def json_of(workload):
    floor, ours = (first_of(workload.contenders, role) for role in ("floor", "library"))
    return {"name": workload.name, "skipped": workload.skipped, "contenders": [
        {"name": each.name, "role": each.role, "assets": each.count, "failed": each.failed,
         "cpuMicroseconds": [seconds * 1e6 for seconds in each.seconds("cpu")],
         "wallMicroseconds": [seconds * 1e6 for seconds in each.seconds("wall")],
         "peakKilobytes": each.memory, "systemCalls": each.calls, "shareRead": each.read,
         "timesFloor": ratio_to(each, floor), "timesLibrary": ratio_to(each, ours)}
        for each in workload.contenders if each.runs], "goals": [
        {"compared": what, "measured": measured, "goal": goal, "met": met == "met"}
        for _, what, measured, goal, met in goal_rows(workload)]}
