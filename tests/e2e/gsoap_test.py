#!/usr/bin/env python3
"""A SOAP client in C++, generated from the service's description and built here: the whole story of a host."""

import os
import shutil
import subprocess
import tempfile
import unittest
import urllib.request

from doors import GONE, HALF_FAILS, HOST, DoorsTest
from programs import PATIENCE

SOURCE = os.path.join(os.path.dirname(os.path.abspath(__file__)), "gsoap", "story.cpp")
COMPILE = ("g++", "-O0", "-I.", "-DWITH_OPENSSL", "-DWITH_IPV6", "-DWITH_DOM")  # as the library itself was built


def run(folder, *command):
    done = subprocess.run(command, cwd=folder, capture_output=True, text=True, check=False)
    if done.returncode != 0:
        raise RuntimeError(f"{' '.join(command)}\n{done.stdout}\n{done.stderr}")


class GeneratedClient(DoorsTest):
    """Built of the description that an agent serves: its address is in the program, and no other is given. What does
    not depend on the address is compiled once."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.common = tempfile.mkdtemp(prefix="kova-client-")
        cls.addClassCleanup(shutil.rmtree, cls.common)
        cls.bridged = None

    def generate(self, text):
        """The folder of a program for the service that the text describes."""
        folder = tempfile.mkdtemp(prefix="kova-client-")
        self.addClassCleanup(shutil.rmtree, folder)
        with open(os.path.join(folder, "kova.wsdl"), "w", encoding="utf-8") as file:
            file.write(text)
        run(folder, "wsdl2h", "-o", "kova.h", "kova.wsdl")
        run(folder, "soapcpp2", "-1", "-C", "-j", "-I/usr/share/gsoap/import", "kova.h")
        objects = [os.path.join(self.common, name + ".o") for name in ("soapC", "story")]
        if not os.path.exists(objects[1]):
            run(folder, *COMPILE, "-c", "-o", objects[0], "soapC.cpp")
            run(folder, *COMPILE, "-c", "-o", objects[1], SOURCE)
        run(folder, *COMPILE, "-o", "story", *objects, "soapKovaBindingProxy.cpp", "-lgsoapssl++", "-lssl", "-lcrypto")
        return folder

    def play(self, scene, folder, *certificates):
        done = subprocess.run([os.path.join(folder, "story"), scene, *certificates], capture_output=True, text=True,
                              cwd=self.folder, timeout=PATIENCE, check=False)
        self.assertEqual((done.returncode, done.stderr), (0, ""))

    def play_bridged(self, scene, host):
        """The bridge's address stays the same, so one program serves."""
        wsdl = self.through_a_bridge(host)
        if GeneratedClient.bridged is None:
            GeneratedClient.bridged = self.generate(urllib.request.urlopen(wsdl).read().decode())
        self.play(scene, GeneratedClient.bridged)

    def test_tells_the_whole_story(self):
        self.play_bridged("story", HOST)

    def test_meets_a_partitioned_disk(self):
        self.play_bridged("partitioned", HOST)

    def test_is_told_which_part_failed(self):
        self.play_bridged("part", HALF_FAILS)

    def test_removes_a_disk_that_has_left(self):
        self.play_bridged("absent", GONE)

    def test_reads_over_tcp(self):
        wsdl = self.over_tcp(HOST)
        self.play("read", self.generate(urllib.request.urlopen(wsdl).read().decode()))

    def test_tells_the_whole_story_over_tls(self):
        wsdl = self.over_tls(HOST)
        text = self.run_program("curl", "--silent", "--cacert", "ca.pem", "--cert", "client.pem", "--key", "client.key",
                                "--noproxy", "*", wsdl).out
        self.write("client.all", self.read("client.pem") + self.read("client.key"))
        self.play("story", self.generate(text), "client.all", "ca.pem")


if __name__ == "__main__":
    unittest.main()
