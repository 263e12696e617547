#!/usr/bin/env python3
"""The plan of every example host: what it is known to be, and what then comes about."""

import json
import os
import unittest

from programs import EXAMPLES, ProgramTest

EXPECTED = os.path.join(os.path.dirname(os.path.abspath(__file__)), "expected", "plans")
LSBLK_OUTPUT = "lab-lsblk"  # the one example that is imported, not loaded


def stems(folder):
    return sorted(name[:-len(".json")] for name in os.listdir(folder) if name.endswith(".json"))


def groups_by_cache_disk(storage_info):
    """{cache disk: capacity disks} of what `groups` answered."""
    return {group["mapping"]["ssd"]["canonicalName"]:
            [one["canonicalName"] for one in group["mapping"]["nonSsd"]]
            for group in storage_info.get("diskMapInfo", [])}


class Plan(ProgramTest):
    def example(self, name):
        """A copy of the example that may be changed."""
        path = os.path.join(EXAMPLES, name + ".json")
        if name == LSBLK_OUTPUT:
            self.assert_ended(self.kovactl("host", "import", path, "--write", self.path(name)), 0)
        else:
            with open(path, encoding="utf-8") as file:
                self.write(name, file.read())
        return self.path(name)

    def groups(self, host):
        return groups_by_cache_disk(self.kovactl("--host", host, "-o", "json", "groups").json())

    def test_of_every_example_host_is_what_it_is_known_to_be(self):
        self.assertEqual(stems(EXPECTED), stems(EXAMPLES))
        for name in stems(EXAMPLES):
            with self.subTest(name):
                plan = self.kovactl("--host", self.example(name), "-o", "json", "plan", "add", "--all")
                self.assert_ended(plan, 0)
                with open(os.path.join(EXPECTED, name + ".json"), encoding="utf-8") as file:
                    self.assertEqual({**plan.json(), "generation": None}, {**json.load(file), "generation": None})

    def test_tells_the_generation_that_it_stands_on(self):
        host = self.example("default")

        def generation(*where):
            plan = self.kovactl(*where, "-o", "json", "plan", "add", "--all")
            self.assert_ended(plan, 0)
            return plan.json()["generation"]

        first = generation("--host", host)
        self.assertRegex(first, "^[0-9a-f]{16}$")
        self.assertIn(f"Planned on generation {first}.", self.kovactl("--host", host, "plan", "add", "--all").out)
        self.start_agent("--host", host)
        self.assertEqual(generation("--agent", "unix:" + self.socket), first, "it is the same host")
        self.assert_ended(self.ask_agent("sim", "set", "naa.5000c50000000200", "--absent"), 0)
        self.assertNotEqual(generation("--agent", "unix:" + self.socket), first)
        self.assertEqual(generation("--host", host), first, "the file is as it was")

    def test_comes_about_when_every_disk_is_added(self):
        for name in stems(EXAMPLES):
            with self.subTest(name):
                host = self.example(name)
                expected = self.groups(host)
                plan = self.kovactl("--host", host, "-o", "json", "plan", "add", "--all").json()
                for change in plan["groups"]:
                    self.assertIn(change["change"], ("made", "extended"))
                    expected[change["ssd"]] = expected.get(change["ssd"], []) + change["capacity"]
                self.assert_ended(self.kovactl("--host", host, "--save", "add", "--all", "--yes"), 0)
                self.assertEqual(self.groups(host), expected)

    def test_leaves_over_every_disk_that_is_then_in_no_group(self):
        for name in stems(EXAMPLES):
            with self.subTest(name):
                host = self.example(name)
                plan = self.kovactl("--host", host, "-o", "json", "plan", "add", "--all").json()
                self.kovactl("--host", host, "--save", "add", "--all", "--yes")
                disks = self.kovactl("--host", host, "-o", "json", "disks").json()
                self.assertEqual([one["disk"] for one in plan["leftOver"]],
                                 [one["disk"]["canonicalName"] for one in disks if one["state"] != "inUse"])
                self.assertTrue(all(one["text"] for one in plan["leftOver"]))


if __name__ == "__main__":
    unittest.main(verbosity=2)
