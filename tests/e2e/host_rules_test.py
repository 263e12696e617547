#!/usr/bin/env python3
"""The rules for what a request may change tell a wrong answer from a right one."""

import copy
import unittest

from host_rules import violation

UUID, OTHER_UUID = "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8e", "52e7b2b4-0a7c-3a1c-9d3e-2f4a5b6c7d8"


def absent(name, uuid):
    return {"name": name, "ssd": False, "absent": True, "kovaUuid": uuid}


def host(*disks, capacity=()):
    cache = {"name": "naa.f1", "ssd": True, "kovaUuid": "f"}
    return {"disks": [cache, *disks], "groups": [{"ssd": "naa.f1", "capacity": list(capacity)}]}


def without(before, name):
    """The host when the disk was taken out of its group."""
    after = copy.deepcopy(before)
    after["groups"][0]["capacity"].remove(name)
    for disk in after["disks"]:
        if disk["name"] == name:
            disk["kovaUuid"] = ""
    return after


class RemovalOfADiskThatHasLeft(unittest.TestCase):
    def removal(self, before, removed):
        return violation("RemoveDisk", {"kova:" + UUID}, before, without(before, removed))

    def test_takes_the_one_of_the_uuid(self):
        before = host(absent("naa.1", UUID), absent("naa.2", OTHER_UUID), capacity=["naa.1", "naa.2"])
        self.assertIsNone(self.removal(before, "naa.1"))
        self.assertIn("does not name", self.removal(before, "naa.2"))

    def test_takes_none_of_several_that_bear_the_uuid(self):
        before = host(absent("naa.1", UUID), absent("naa.2", UUID), capacity=["naa.1", "naa.2"])
        self.assertIn("of several disks", self.removal(before, "naa.1"))

    def test_passes_over_another_whose_own_name_looks_like_the_uuid(self):
        before = host(absent("naa.1", UUID), absent("kova:" + UUID, OTHER_UUID), capacity=["naa.1", "kova:" + UUID])
        self.assertIsNone(self.removal(before, "naa.1"))
        self.assertIn("does not name", self.removal(before, "kova:" + UUID))


if __name__ == "__main__":
    unittest.main(verbosity=2)
