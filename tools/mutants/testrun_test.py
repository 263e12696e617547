#!/usr/bin/env python3
"""A test program's end is understood, however it ends."""

import tempfile
import time
import unittest
from pathlib import Path

import testrun


class Running(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = Path(folder.name)

    def run_script(self, text, limit=30):
        program = self.folder / "program"
        program.write_text(f"#!/bin/sh\n{text}\n", encoding="utf-8")
        program.chmod(0o755)
        return testrun.run(program, "A.*", self.folder, limit)

    def test_success_is_no_failure(self):
        self.assertFalse(self.run_script("echo '[ RUN      ] A.B'; echo '[       OK ] A.B'").failed)

    def test_a_failure_names_its_test(self):
        outcome = self.run_script("echo '[ RUN      ] X/A.B/1'; echo '[  FAILED  ] X/A.B/1 (1 ms)'; exit 1")
        self.assertEqual(outcome, testrun.Outcome(True, "X/A.B/1"))

    def test_a_crash_names_the_test_it_was_in(self):
        outcome = self.run_script("echo '[ RUN      ] A.B'; kill -SEGV $$")
        self.assertEqual(outcome, testrun.Outcome(True, "A.B (ended by 11)"))

    def test_a_program_that_cannot_start_its_tests_fails(self):
        self.assertEqual(self.run_script("exit 3").why, "before any test (ended with 3)")

    def test_a_program_without_end_is_ended_with_what_it_started(self):
        start = time.monotonic()
        outcome = self.run_script(f"(sleep 300; touch {self.folder}/late) & echo '[ RUN      ] A.B'; wait", limit=0.2)
        self.assertEqual(outcome, testrun.Outcome(True, "A.B (no end)"))
        self.assertLess(time.monotonic() - start, 100)

    def test_the_filter_is_handed_on(self):
        self.assertFalse(self.run_script('[ "$2" = "--gtest_filter=A.*" ]').failed)


class Ordering(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        room = Path(folder.name) / "room"
        room.mkdir()
        (room / "A_test.cpp").write_text("TEST(One, IsSo) {\nTEST_P(Two,\n  IsSo) {\nTEST_F(One, IsMore) {",
                                         encoding="utf-8")
        self.order = testrun.Order(folder.name, "room")

    def test_begins_with_the_tests_beside_the_file(self):
        for file in ("room/A.cpp", "room/A.h"):
            self.assertEqual(self.order.first(file), "One.*:*/One.*:Two.*:*/Two.*")
        self.assertEqual(self.order.first("room/B.cpp"), "")

    def test_learns_which_tests_find_something_in_a_file(self):
        for why in ("X.A", "X/Y.B/1 (ended by 6)", "X/Y.B/1"):
            self.order.learn("room/B.cpp", why)
        self.assertEqual(self.order.first("room/B.cpp"), "X/Y.B/1:X.A")


if __name__ == "__main__":
    unittest.main()
