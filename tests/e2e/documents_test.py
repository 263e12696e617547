#!/usr/bin/env python3
"""What the documents show on a terminal, typed again: every console block, with the output it promises."""

import os
import re
import subprocess
import time
import unittest

from programs import BIN, EXAMPLES, PATIENCE, ProgramTest

ROOT = os.path.dirname(os.path.dirname(EXAMPLES))
BLOCK = re.compile(r"^```console\n(.*?)^```$", re.MULTILINE | re.DOTALL)
CUT = "  ..."  # a line that stands for any number of lines


def sessions(document):
    """[(command, [line of output, ..]), ..] of all console blocks of a document."""
    with open(os.path.join(ROOT, document), encoding="utf-8") as file:
        lines = "".join(BLOCK.findall(file.read())).splitlines()
    found = []
    for line in lines:
        if line.startswith("$ "):
            found.append((line[2:], []))
        else:
            found[-1][1].append(line)
    return found


def pattern(lines):
    """What the output must match; blank lines at its end do not count."""
    while lines and not lines[-1]:
        lines = lines[:-1]
    return "".join(r"(?:.*\n)*?" if line == CUT else re.escape(line) + "\n" for line in lines)


class Documents(ProgramTest):
    def setUp(self):
        super().setUp()
        os.symlink(os.path.join(ROOT, "examples"), self.path("examples"))
        self.environment = {**os.environ, "PATH": BIN + os.pathsep + os.environ["PATH"],
                            "KOVA_AGENT": "unix:" + self.socket}

    def start(self, command):
        """An agent as the document starts it, on a socket of the test."""
        log = self.path("agentd.log")
        with open(log, "w", encoding="utf-8") as out:
            agent = subprocess.Popen(
                [*command.split(), "--listen", "unix:" + self.socket, "--ready-file", self.path("ready")],
                env=self.environment, cwd=self.folder, stdin=subprocess.DEVNULL, stdout=out, stderr=out)
        self.addCleanup(self.end, agent)
        deadline = time.monotonic() + PATIENCE
        while not os.path.exists(self.path("ready")):
            self.assertIsNone(agent.poll(), self.read("agentd.log"))
            self.assertLess(time.monotonic(), deadline, "the agent does not get ready")
            time.sleep(0.01)

    def type_again(self, document):
        session = sessions(document)
        self.assertTrue(session, document + " shows no session")
        for command, promised in session:
            if command.startswith("agentd ") and command.endswith(" &"):
                self.start(command[:-2])
                continue
            ended = subprocess.run(command, shell=True, env=self.environment, cwd=self.folder, text=True,
                                   stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                                   timeout=PATIENCE, check=False)
            self.assertRegex(ended.stdout, "^" + pattern(promised) + "$", f"{document}: {command}")

    def test_readme_shows_what_happens(self):
        self.type_again("README.md")


class Demo(ProgramTest):
    def test_goes_through_to_its_end(self):
        outcome = self.run_program(os.path.join(ROOT, "tools", "demo.sh"), os.path.dirname(BIN))
        self.assert_ended(outcome, 0)
        self.assertEqual(outcome.err, "")
        for told in ("2 disk groups: 2 added", "has left the host", "1 disk group: 1 unmounted", "not mounted",
                     "4 tasks: 4 done"):
            self.assertIn(told, outcome.out)


if __name__ == "__main__":
    unittest.main(verbosity=2)
