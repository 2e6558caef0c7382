#!/usr/bin/env python3
"""Tests of the scripts that run the bench.

usage: bench_test.py PARVEL BENCH_DIR
"""

import json
import subprocess
import sys
import tempfile
import unittest
from pathlib import Path

PARVEL, BENCH = sys.argv.pop(1), Path(sys.argv.pop(1))
sys.path.insert(0, str(BENCH))

import made_files  # noqa: E402
import report  # noqa: E402
from measuring import Contender, Workload  # noqa: E402
from places import Places, file_system_of  # noqa: E402
from workloads import Goal, Growth, workloads  # noqa: E402


def measured(name, seconds, count=1, memory=1, alone=()):
    contender = Contender(name, ["true"])
    contender.runs = [(each, each) for each in seconds]
    contender.alone = [(each, each) for each in alone]
    contender.count, contender.memory = count, memory
    return contender


def workload(*contenders, goals=()):
    return Workload("work", None, list(contenders), list(goals))


class Figures(unittest.TestCase):
    def test_the_start_is_taken_off_and_the_rest_shared_out(self):
        contender = measured("library", [2.0, 4.0], count=11, alone=[1.0])
        self.assertEqual(contender.seconds("cpu"), [0.1, 0.3])

    def test_a_start_that_took_longer_than_the_work_leaves_nothing(self):
        self.assertEqual(measured("library", [1.0], count=11, alone=[2.0]).seconds("wall"), [0])

    def test_a_ratio_is_the_median_of_the_rounds(self):
        both = workload(measured("library", [1, 9, 2]), measured("floor", [1, 1, 1]))
        self.assertEqual(Goal("library", "floor", "cpu", at_most=1).value(both), 2)

    def test_a_contender_that_is_absent_or_failed_gives_no_value(self):
        failed = measured("floor", [1])
        failed.failed = True
        goal = Goal("library", "floor", "cpu", at_most=1)
        self.assertIsNone(goal.value(workload(measured("library", [1]), failed)))
        self.assertIsNone(goal.value(workload(measured("library", [1]))))

    def test_the_bound_itself_is_met(self):
        self.assertTrue(Goal("a", "b", "cpu", at_most=1.3).is_met(1.3))
        self.assertTrue(Goal("a", "b", "cpu", at_least=3).is_met(3))
        self.assertFalse(Goal("a", "b", "cpu", at_most=1.3).is_met(1.31))
        self.assertFalse(Goal("a", "b", "cpu", at_least=3).is_met(2.99))

    def test_growth_compares_one_more_among_many_with_one_more_among_few(self):
        sizes = [measured(str(count), [start + count * 2], count=count)
                 for count, start in ((10, 5), (100, 5), (1000, 5))]
        growth = Growth(["10", "100", "1000"], "cpu", at_most=1.2)
        self.assertAlmostEqual(growth.value(workload(*sizes)), 1)

    def test_a_goal_says_whether_it_is_met(self):
        both = workload(measured("library", [2]), measured("floor", [1]), goals=[
            Goal("library", "floor", "cpu", at_most=1.3),
            Goal("library", None, "wall", at_most=2.5),
            Goal("library", "peer", "cpu", at_most=1)])
        self.assertEqual(list(report.goal_rows(both)), [
            ["work", "library : floor, CPU time", "2.00", "at most 1.3", "not met"],
            ["work", "library, wall time", "2000.00 ms", "at most 2500 ms", "met"],
            ["work", "library : peer, CPU time", "absent", "at most 1", "–"]])


class Workloads(unittest.TestCase):
    def test_each_goal_names_contenders_of_its_workload(self):
        for each in workloads(Path("/one/build/release"), share=1):
            names = {contender.name for contender in each.contenders}
            for goal in each.goals:
                self.assertLessEqual({goal.mine, goal.other} - {None}, names, each.name)

    def test_names_of_contenders_are_unique_within_a_workload(self):
        for each in workloads(Path("/one/build/release"), share=0.1):
            names = [contender.name for contender in each.contenders]
            self.assertEqual(len(names), len(set(names)), each.name)


class MadeFiles(unittest.TestCase):
    def told(self, name, content):
        with tempfile.TemporaryDirectory() as folder:
            path = Path(folder) / name
            path.write_bytes(content)
            told = subprocess.run([PARVEL, "inspect", "--json", path], check=True,
                                  stdout=subprocess.PIPE)
            return json.loads(told.stdout)[0]["record"]

    def test_a_made_pdf_has_pages_and_an_author(self):
        record = self.told("made.pdf", made_files.made_pdf(3))
        self.assertEqual((record["pageCount"], record["artistName"]), (10, "An Author"))

    def test_a_made_audio_file_has_an_identity_and_an_author(self):
        record = self.told("made.m4a", made_files.made_audio(3))
        self.assertEqual((record["itemId"], record["artistName"]), ("900003", "An Author"))


class Folders(unittest.TestCase):
    def test_a_file_system_is_told_by_the_innermost_mount(self):
        self.assertEqual(file_system_of("/proc/self"), "proc")

    def test_folders_are_new_each_time_and_gone_in_the_end(self):
        with tempfile.TemporaryDirectory() as folder:
            with Places(Path(folder)) as places:
                first, second = (places.new_folder("disk") for _ in range(2))
                self.assertNotEqual(first, second)
                self.assertTrue(first.is_dir() and second.is_dir())
            self.assertEqual(list(Path(folder).iterdir()), [])


if __name__ == "__main__":
    outcome = unittest.main(exit=False).result
    failed = len(outcome.failures) + len(outcome.errors)
    print(f"{outcome.testsRun - failed} passed, {failed} failed")
    sys.exit(1 if failed else 0)
