"""Runs one contender over its files, and says what an asset cost it."""

import math
import os
import re
import shutil
import statistics
import subprocess
from pathlib import Path

COUNTED = 100  # assets whose system calls are counted
STARTED = 10  # of what is started once a file


class Contender:
    """A command, whose words may hold {list} (the list of files), {file} (it is started once a file
    then, for at most `each` of them), {into} (a new folder) and {workload}.

    `files` are its own where the workload's are not meant, `limit` is how many of them it gets,
    `times` how often they are listed, `assets` how many a command without files works on. `sift`
    is a command that prints which of the files it can be given. `needs` is one that succeeds where
    the contender is installed."""

    def __init__(self, name, command, role="peer", files=None, each=0, limit=0, times=1, assets=0,
                 sift=None, needs=None):
        self.name, self.command, self.role = name, [str(word) for word in command], role
        self.files, self.each, self.limit, self.times = files, each, limit, times
        self.assets, self.sift, self.needs = assets, sift, needs
        self.count = assets
        self.runs, self.alone = [], []
        self.memory, self.calls, self.read, self.failed = 0, None, None, False

    def installed(self):
        if shutil.which(self.command[0]) is None:
            return False
        return self.needs is None or subprocess.run(
            self.needs, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
            check=False).returncode == 0

    def seconds(self, measure):
        """An asset's CPU or wall time in each round, less that of the start."""
        which = {"cpu": 0, "wall": 1}[measure]
        start = statistics.median(each[which] for each in self.alone) if self.alone else 0
        assets = self.count - 1 if self.alone else self.count
        return [max(each[which] - start, 0) / assets for each in self.runs]

    def typical(self, measure):
        return statistics.median(self.seconds(measure))


class Workload:
    """Files (a list's name), who works on them, and what is to come of it. Each contender gets at
    least `at_least` assets, the files being listed as often as that takes. `place` is where {into}
    lies, and with `brings` the files are copied there first."""

    def __init__(self, name, files, contenders, goals, at_least=0, place=None, brings=False,
                 cold=False, rounds=None, per="asset"):
        self.name, self.files, self.contenders, self.goals = name, files, contenders, goals
        self.at_least, self.place, self.brings, self.cold = at_least, place, brings, cold
        self.rounds, self.per = rounds, per
        self.skipped = None

    def named(self, name):
        return next((each for each in self.contenders if each.name == name and each.runs
                     and not each.failed), None)


def drop_caches(paths):
    """Lets the next reads come from the disk; tells whether names and inodes are forgotten too."""
    os.sync()
    try:
        Path("/proc/sys/vm/drop_caches").write_text("3")
        return True
    except OSError:
        for path in paths:
            file = os.open(path, os.O_RDONLY)
            os.posix_fadvise(file, 0, 0, os.POSIX_FADV_DONTNEED)
            os.close(file)
        return False


class Bench:
    def __init__(self, launcher, workload, scratch, places):
        self.launcher, self.workload = launcher, workload
        self.scratch, self.places = scratch, places
        self.number = 0

    def run(self, workload, rounds):
        contenders = [each for each in workload.contenders if each.installed()]
        plans = {each: self.plan(workload, each) for each in contenders}
        for number in range(workload.rounds or rounds):
            # The order turns round by round, so that nobody always follows the same one.
            for contender in contenders[::-1] if number % 2 else contenders:
                if not contender.failed:
                    self.measure(workload, contender, plans[contender])
        for contender in contenders:
            self.count_calls(workload, contender, plans[contender])
            self.count_read(workload, contender, plans[contender])
        if workload.place:
            self.places.clear(workload.place)

    def plan(self, workload, contender):
        """The paths that it gets, each as often as it gets it."""
        name = contender.files or workload.files
        if not name:
            contender.count = contender.each or contender.assets
            return [""] * contender.each
        paths = (self.workload / f"{name}.list").read_text().splitlines()
        if workload.brings:
            paths = self.places.bring(workload.place, paths)
        if contender.sift:
            sifted = subprocess.run(self.words(contender.sift, paths=paths), text=True, check=False,
                                    stdout=subprocess.PIPE, stderr=subprocess.DEVNULL)
            paths = sifted.stdout.splitlines()
        if contender.limit or contender.each:
            paths = paths[:contender.limit or contender.each]
        elif paths:
            paths = paths * max(contender.times, math.ceil(workload.at_least / len(paths)))
        contender.count = len(paths)
        return paths

    def words(self, command, paths=(), file="", into=""):
        values = {"{file}": str(file), "{into}": str(into), "{workload}": str(self.workload)}
        if any("{list}" in word for word in command):
            self.number += 1
            listed = self.scratch / f"{self.number}.list"
            listed.write_text("".join(f"{path}\n" for path in paths))
            values["{list}"] = str(listed)
        return [re.sub(r"\{\w+\}", lambda name: values[name[0]], word) for word in command]

    def launch(self, workload, contender, **values):
        """CPU seconds, wall seconds, peak kilobytes of a run and of all that it leaves behind."""
        into = self.places.new_folder(workload.place) if workload.place else ""
        done = subprocess.run([self.launcher, *self.words(contender.command, into=into, **values)],
                              stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, text=True,
                              check=False)
        if workload.place:
            self.places.drop(workload.place, into)
        if done.returncode > 125:
            contender.failed = True
        cpu, wall, peak = map(int, done.stdout.split())
        contender.memory = max(contender.memory, peak)
        return cpu / 1e6, wall / 1e6

    def measure(self, workload, contender, paths):
        if contender.each:
            runs = [self.launch(workload, contender, file=path) for path in paths]
            contender.runs.append(tuple(map(sum, zip(*runs))))
            return
        if len(paths) < 2:
            contender.runs.append(self.launch(workload, contender, paths=paths))
            return
        if workload.cold:
            drop_caches(set(paths))
            self.launch(workload, contender, paths=paths[:1])
        contender.alone.append(self.launch(workload, contender, paths=paths[:1]))
        contender.runs.append(self.launch(workload, contender, paths=paths))

    def count_calls(self, workload, contender, paths):
        """System calls an asset, where strace is installed and may be used."""
        if not shutil.which("strace") or contender.failed or workload.cold or not paths:
            return
        if contender.each or len(paths) == 1:
            some = paths[::math.ceil(len(paths) / STARTED)]
            counts = [self.calls_of(workload, contender, paths=paths, file=path) for path in some]
            contender.calls = None if None in counts else statistics.mean(counts)
            return
        some = paths[:COUNTED + 1]
        several, one = (self.calls_of(workload, contender, paths=each) for each in (some, some[:1]))
        if several and one:
            contender.calls = (several - one) / (len(some) - 1)

    def calls_of(self, workload, contender, **values):
        into = self.places.new_folder(workload.place) if workload.place else ""
        command = self.words(contender.command, into=into, **values)
        done = subprocess.run(["strace", "-f", "-qq", "-c", "-U", "calls", *command],
                              stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                              stderr=subprocess.PIPE, text=True, errors="replace", check=False)
        if workload.place:
            self.places.drop(workload.place, into)
        numbers = re.findall(r"(\d+) total", done.stderr)
        return int(numbers[-1]) if numbers else None

    def count_read(self, workload, contender, paths):
        """The share of the files with which it went well, where the contender says so."""
        if contender.each or contender.failed or workload.cold or not paths:
            return
        paths = list(dict.fromkeys(paths))
        into = self.places.new_folder(workload.place) if workload.place else ""
        done = subprocess.run(self.words(contender.command, paths=paths, into=into), check=False,
                              stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                              stderr=subprocess.DEVNULL)
        if workload.place:
            self.places.drop(workload.place, into)
        said = re.fullmatch(rb"(\d+) of (\d+)\n", done.stdout)
        if said:
            contender.read = int(said[1]) / int(said[2])
