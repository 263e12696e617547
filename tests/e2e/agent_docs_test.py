#!/usr/bin/env python3
"""The console examples of the documentation do what it says they do."""

import json
import os
import re
import shutil
import unittest

from programs import ProgramTest

DOCS = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..", "docs")
LEFT_OUT = "..."
BLOCK = re.compile(r"^```console\n(.*?)^```$", re.MULTILINE | re.DOTALL)


def fits(shown, real):
    """Whether the answer is what is shown of it; "..." stands for anything, as a key for further members."""
    if shown == LEFT_OUT:
        return True
    if isinstance(shown, dict) and isinstance(real, dict):
        known = {key: value for key, value in shown.items() if key != LEFT_OUT}
        return all(key in real and fits(value, real[key]) for key, value in known.items()) and (
            LEFT_OUT in shown or known.keys() == real.keys())
    if isinstance(shown, list) and isinstance(real, list):
        return len(shown) == len(real) and all(map(fits, shown, real))
    return shown == real


def as_json(text):
    try:
        return json.loads(text)
    except ValueError:
        return text


class AnAnswerThatIsShown(unittest.TestCase):
    def test_fits_when_nothing_differs_but_what_is_left_out(self):
        for shown, real in ((1, 1), ("...", {"a": 1}), ({"a": 1}, {"a": 1}), ({"a": 1, "...": "..."}, {"a": 1, "b": 2}),
                            ([1, "..."], [1, 2]), ({"a": [{"b": "..."}]}, {"a": [{"b": None}]})):
            self.assertTrue(fits(shown, real), (shown, real))
        for shown, real in ((1, 2), ({"a": 1}, {"a": 1, "b": 2}), ({"a": 1, "...": "..."}, {"b": 2}), ([1], [1, 2]),
                            ([1, "..."], [1]), ({"a": [1]}, {"a": [2]}), (None, {})):
            self.assertFalse(fits(shown, real), (shown, real))


@unittest.skipUnless(shutil.which("curl"), "curl is not installed")
class TheAgentsPage(ProgramTest):
    def test_shows_what_the_agent_answers(self):
        self.start_agent()
        with open(os.path.join(DOCS, "agent.md"), encoding="utf-8") as page:
            blocks = BLOCK.findall(page.read())
        examples = [line for block in blocks for line in block.splitlines()]
        self.assertGreater(len(examples), 20, "the examples were found")
        self.assertEqual(len(examples) % 2, 0, "a command, its answer, and so on")
        for command, shown in zip(examples[::2], examples[1::2]):
            with self.subTest(command=command):
                self.assertTrue(command.startswith("$ curl -s --unix-socket /run/kova/agentd.sock "), command)
                outcome = self.run_program("sh", "-c", command[2:].replace("/run/kova/agentd.sock", self.socket))
                self.assert_ended(outcome, 0)
                self.assertTrue(fits(as_json(shown), as_json(outcome.out.rstrip("\n"))), outcome.out)


if __name__ == "__main__":
    unittest.main(verbosity=2)
