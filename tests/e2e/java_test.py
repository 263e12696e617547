#!/usr/bin/env python3
"""A client in Java, from classes that a generator makes of the description and that are built here."""

import glob
import os
import shutil
import subprocess
import tempfile
import unittest

from doors import ClientTest, Scenes

HERE = os.path.dirname(os.path.abspath(__file__))
LIBRARIES = ":".join(glob.glob("/usr/share/java/*.jar"))


class Java(Scenes, ClientTest):
    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.built = tempfile.mkdtemp(prefix="kova-client-")
        cls.addClassCleanup(shutil.rmtree, cls.built)
        cls.command = None

    def play(self, scene, wsdl):
        if Java.command is None:
            self.build(wsdl)
        super().play(scene, wsdl)

    def build(self, wsdl):
        self.run_tool("wsimport", "-quiet", "-Xnocompile", "-p", "nox", "-s", self.built, wsdl)
        self.run_tool("javac", "-nowarn", "-cp", LIBRARIES, "-d", self.built, os.path.join(HERE, "clients", "Story.java"),
                      *glob.glob(os.path.join(self.built, "nox", "*.java")))
        Java.command = ("java", "-cp", LIBRARIES + ":" + self.built, "Story")

    def run_tool(self, *command):
        done = subprocess.run(command, capture_output=True, text=True, check=False)
        self.assertEqual(done.returncode, 0, done.stdout + done.stderr)


if __name__ == "__main__":
    unittest.main()
