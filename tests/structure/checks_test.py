#!/usr/bin/env python3
"""checks_test: which steps scripts/checks chooses for a commit."""

import importlib.machinery
import importlib.util
import pathlib
import sys
import unittest

SCRIPTS = pathlib.Path(__file__).resolve().parents[2] / "scripts"
TURNS = range(36)  # after so many commits all rotations have met in every combination
SYSTEMS = {"abi", "packages", "reproducible"}

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
        met = {(commands[name], commands.get("sanitizers")) for commands in map(wanted, TURNS)
               for name in SYSTEMS & commands.keys()}
        self.assertEqual(len(met), len(SYSTEMS) * 3)

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
