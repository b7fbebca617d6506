#!/usr/bin/env python3
"""checks_test: which steps scripts/checks chooses for a commit."""

import importlib.machinery
import importlib.util
import pathlib
import sys
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
SCRIPTS = PROJECT / "scripts"
TURNS = range(180)  # after so many commits all rotations have met in every combination
SYSTEMS = {"abi", "packages", "reproducible", "packages-13", "tests-13"}

sys.path.insert(0, str(SCRIPTS))
sys.dont_write_bytecode = True
LOADER = importlib.machinery.SourceFileLoader("checks", str(SCRIPTS / "checks"))
checks = importlib.util.module_from_spec(importlib.util.spec_from_loader("checks", LOADER))
LOADER.exec_module(checks)


def wanted(turn):
    """The commands of the steps that CI runs for a commit, by name."""
    return {step.name: step.command for step in checks.ci_steps(turn) if step.wanted}


class RotationTest(unittest.TestCase):
    """The steps of CI, which depend on the number of commits."""

    def test_each_commit_has_one_step_of_each_rotation(self):
        for turn in TURNS:
            for rotation in (SYSTEMS, {"mutate", "fuzz", "valgrind"}, {"sanitizers", "coverage"}):
                self.assertEqual(len(rotation & wanted(turn).keys()), 1, f"{turn}: {rotation}")

    def test_each_step_has_its_turn(self):
        self.assertEqual(set().union(*map(wanted, TURNS)), {step.name for step in checks.ci_steps(0)})

    def test_each_system_meets_each_further_build(self):
        met = {(name, commands.get("sanitizers")) for commands in map(wanted, TURNS)
               for name in SYSTEMS & commands.keys()}
        self.assertEqual(len(met), len(SYSTEMS) * 3 - 1)
        self.assertNotIn(("tests-13", None), met)  # coverage and these do not fit into one run

    def test_the_tests_of_each_folder_have_their_turn_on_debian_13(self):
        met = {folder for commands in map(wanted, TURNS) if "tests-13" in commands
               for folder in commands["tests-13"][-1].split(",")}
        tests = PROJECT / "tests"
        self.assertEqual(met, {path.parent.name for path in tests.glob("*/CMakeLists.txt")} - {"support"})

    def test_the_guests_have_the_machine_to_themselves(self):
        *others, lab = checks.ci_steps(0)
        self.assertEqual(lab.name, "lab")
        self.assertEqual(set(lab.after), {step.name for step in others} - {"test", "rebuild"})

    def test_a_step_waits_for_earlier_ones_only(self):
        for steps in (checks.ci_steps(0), checks.all_steps(0)):
            names = []
            for step in steps:
                self.assertLessEqual(set(step.after), set(names), step.name)
                names.append(step.name)


if __name__ == "__main__":
    unittest.main()
