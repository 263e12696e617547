#!/usr/bin/env python3
"""Cases are chosen by words, run in order, and counted honestly."""

import contextlib
import io
import types
import unittest

import case
import guest
import run


def made(*functions):
    module = types.ModuleType("cases.sample")
    for function in functions:
        function.__module__ = "cases.sample"
        function.case.__init__(function, function.case.waits_for, function.case.full)
        setattr(module, function.__name__, function)
    return case.cases_of(module)


def sample(log):
    @case.case()
    def one_that_passes(_machine):
        log.append("passes")

    @case.case()
    def one_that_fails(_machine):
        log.append("fails")
        case.expect.assertEqual(1, 2)

    @case.case(waits_for="better times")
    def one_that_waits(_machine):
        log.append("waits")

    @case.case()
    def one_that_the_machine_fails(machine):
        machine.answers = machine.survives
        raise guest.Failed("no answer")

    @case.case(full=True)
    def one_that_takes_long(_machine):
        log.append("long")

    @case.case()
    def the_last(_machine):
        log.append("last")

    return made(one_that_passes, one_that_fails, one_that_waits, one_that_the_machine_fails, one_that_takes_long,
                the_last)


def machine_of(survives=True, full=False, plug_all=lambda: None):
    return types.SimpleNamespace(answers=True, survives=survives, full=full, plug_all=plug_all)


class Cases(unittest.TestCase):
    def setUp(self):
        self.log = []
        self.cases = sample(self.log)

    def run_on(self, machine):
        score, out = run.Score(), io.StringIO()
        with contextlib.redirect_stdout(out):
            run.run_cases(machine, self.cases, score)
        return score, out.getvalue()

    def test_are_called_by_file_and_sentence(self):
        self.assertEqual(self.cases[0].name, "sample: one that passes")

    def test_keep_the_order_of_their_file(self):
        self.assertEqual([one.sentence for one in self.cases][-2:], ["one that takes long", "the last"])

    def test_are_chosen_by_words_of_their_names(self):
        self.assertEqual(len(case.chosen(self.cases, "Sample")), 6)
        self.assertEqual(len(case.chosen(self.cases, "")), 6)
        self.assertEqual([one.sentence for one in case.chosen(self.cases, "that_passes")], ["one that passes"])
        self.assertEqual(case.chosen(self.cases, "nothing of the kind"), [])

    def test_that_fail_do_not_keep_others_from_running(self):
        plugged = []
        score, out = self.run_on(machine_of(plug_all=lambda: plugged.append(1)))
        self.assertEqual(len(plugged), 2)
        self.assertEqual(self.log, ["passes", "fails", "last"])
        self.assertEqual(str(score), "2 passed, 2 failed, 1 waiting, 1 left to a full run")
        self.assertIn("1 != 2", out)
        self.assertIn("better times", out)

    def test_that_take_long_run_in_a_full_run_alone(self):
        score, _ = self.run_on(machine_of(full=True))
        self.assertEqual(self.log, ["passes", "fails", "long", "last"])
        self.assertEqual(str(score), "3 passed, 2 failed, 1 waiting")

    def test_do_not_run_on_a_machine_that_answers_no_more(self):
        score, out = self.run_on(machine_of(survives=False))
        self.assertEqual(self.log, ["passes", "fails"])
        self.assertEqual(str(score), "1 passed, 2 failed, 1 waiting")
        self.assertIn("were not run", out)

    def test_do_not_run_without_the_disks_that_another_took_away(self):
        def fail():
            raise guest.Failed("not so after 20 s: all disks are back")
        _, out = self.run_on(machine_of(plug_all=fail))
        self.assertEqual(self.log, ["passes", "fails"])
        self.assertIn("all disks are back", out)

    def test_of_the_lab_have_different_names(self):
        names = [one.name for one in run.all_cases()]
        self.assertEqual(len(names), len(set(names)))
        self.assertGreater(len(names), 10)


if __name__ == "__main__":
    unittest.main()
