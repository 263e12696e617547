#!/usr/bin/env python3
"""A SOAP client in C++, generated from the service's description and built here: the whole story of a host."""

import os
import shutil
import subprocess
import tempfile
import unittest

from programs import PATIENCE, ProgramTest, disk

DOCUMENTS = os.environ["KOVA_DOCUMENTS"]
SOURCE = os.path.join(os.path.dirname(os.path.abspath(__file__)), "gsoap", "story.cpp")
DISKS = [disk("naa.f1", True), disk("naa.f2", True), *[disk(f"naa.c{i}") for i in range(1, 5)],
         disk("naa.u1", transport="usb"), disk("naa.p1", partitions=2)]
HOST = {"name": "a", "faultDomain": "rack-1", "disks": DISKS}


def run(folder, *command):
    done = subprocess.run(command, cwd=folder, capture_output=True, text=True, check=False)
    if done.returncode != 0:
        raise RuntimeError(f"{' '.join(command)}\n{done.stdout}\n{done.stderr}")


class GeneratedClient(ProgramTest):
    @classmethod
    def setUpClass(cls):
        cls.built = tempfile.mkdtemp(prefix="kova-client-")
        cls.addClassCleanup(shutil.rmtree, cls.built)
        for name in ("nox.wsdl", "nox.xsd"):
            shutil.copy(os.path.join(DOCUMENTS, name), cls.built)
        run(cls.built, "wsdl2h", "-o", "kova.h", "nox.wsdl")
        run(cls.built, "soapcpp2", "-1", "-C", "-j", "-I/usr/share/gsoap/import", "kova.h")
        run(cls.built, "g++", "-O0", "-I.", "-o", "story", SOURCE, "soapC.cpp", "soapKovaBindingProxy.cpp",
            "-DWITH_IPV6", "-DWITH_DOM", "-lgsoap++")  # as the library itself was built

    def play(self, scene, host):
        self.start_agent("--host", self.write("host.json", host))
        done = subprocess.run([os.path.join(self.built, "story"), self.socket, scene], capture_output=True, text=True,
                              timeout=PATIENCE, check=False)
        self.assertEqual((done.returncode, done.stderr), (0, ""))

    def test_tells_the_whole_story(self):
        self.play("story", HOST)

    def test_meets_a_partitioned_disk(self):
        self.play("partitioned", HOST)

    def test_is_told_which_part_failed(self):
        self.play("part", {**HOST, "faults": [
            {"operation": "FormatDiskMapping", "call": 2, "exception": "KovaStorageException", "disk": "naa.c2",
             "message": "it does not answer"}]})

    def test_removes_a_disk_that_has_left(self):
        gone = disk("naa.c1", absent=True, kovaUuid="52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e", formatVersion=3)
        self.play("absent", {"name": "a", "disks": [DISKS[0], gone, DISKS[3]],
                             "groups": [{"ssd": "naa.f1", "capacity": ["naa.c1", "naa.c2"]}]})


if __name__ == "__main__":
    unittest.main()
