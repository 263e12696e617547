#!/usr/bin/env python3
"""What is wrong with a commit's message, and which commits are asked."""

import os
import subprocess
import sys
import tempfile
import unittest

from commit_messages import SUBJECT_LENGTH, faults_of

TOOL = os.path.join(os.path.dirname(os.path.abspath(__file__)), "commit_messages.py")
WHY = "\n\nPeople asked for it.\n"


class Messages(unittest.TestCase):
    def test_with_a_short_subject_and_a_body_are_right(self):
        self.assertEqual(list(faults_of("s" * SUBJECT_LENGTH + WHY)), [])

    def test_with_a_longer_subject_are_wrong(self):
        self.assertEqual(list(faults_of("s" * (SUBJECT_LENGTH + 1) + WHY)),
                         ["the subject has 73 characters, 72 at most"])

    def test_need_a_body(self):
        for message in ("A subject", "A subject\n\n", "A subject\n\nSigned-off-by: somebody\n"):
            self.assertEqual(list(faults_of(message)), ["no body that says why"])

    def test_part_the_subject_from_the_body(self):
        self.assertEqual(list(faults_of("A subject\nthat goes on\n")),
                         ["no empty line between the subject and the body"])


class Commits(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = folder.name
        self.git("init", "-q", "-b", "main")
        self.commit("Old and wrong")
        self.commit("Right" + WHY)

    def git(self, *words):
        subprocess.run(["git", "-c", "user.name=a", "-c", "user.email=a@example", *words], cwd=self.folder, check=True,
                       capture_output=True)

    def commit(self, message):
        self.git("commit", "-q", "--allow-empty", "-m", message)

    def run_tool(self, *words):
        result = subprocess.run([sys.executable, "-B", TOOL, *words], cwd=self.folder, capture_output=True, text=True,
                                check=False)
        return result.returncode, result.stdout

    def test_without_an_origin_only_the_last_is_read(self):
        self.assertEqual(self.run_tool(), (0, "commit messages: 1 read, 0 fault(s)\n"))

    def test_after_the_base_are_read_and_the_wrong_ones_named(self):
        self.commit("New and wrong")
        status, text = self.run_tool("HEAD~2")
        self.assertEqual(status, 1)
        self.assertRegex(text, "^[0-9a-f]{12} New and wrong: no body that says why\ncommit messages: 2 read, 1 fault")

    def test_that_the_origin_has_are_not_read(self):
        self.git("update-ref", "refs/remotes/origin/main", "HEAD")
        self.commit("New" + WHY)
        self.assertEqual(self.run_tool(), (0, "commit messages: 1 read, 0 fault(s)\n"))

    def test_that_merge_need_no_body(self):
        self.git("checkout", "-q", "-b", "side", "HEAD~1")
        self.commit("Beside" + WHY)
        self.git("checkout", "-q", "main")
        self.git("merge", "-q", "--no-ff", "-m", "Merge side", "side")
        self.assertEqual(self.run_tool("HEAD~1"), (0, "commit messages: 1 read, 0 fault(s)\n"))

    def test_after_an_unknown_base_are_an_error(self):
        self.assertEqual(self.run_tool("nowhere")[0], 1)


if __name__ == "__main__":
    unittest.main()
