#!/usr/bin/env python3
"""Disk groups changed from the command line: over an agent, and in one process that saves its host."""

import json
import os
import pty
import subprocess
import unittest

from programs import BIN, PATIENCE, ProgramTest, disk

HOST = {"disks": [disk("naa.s1", True), disk("naa.s2", True), disk("naa.h1"), disk("naa.h2"), disk("naa.h3"),
                  disk("naa.usb", transport="usb")]}
TWO_GROUPS = {**HOST, "groups": [{"ssd": "naa.s1", "capacity": ["naa.h1", "naa.h2"]},
                                 {"ssd": "naa.s2", "capacity": ["naa.h3"]}]}


def names(mapping):
    """Cache disk and capacity disks of a group."""
    return [mapping["ssd"]["canonicalName"]] + [one["canonicalName"] for one in mapping["nonSsd"]]


class Changes:
    """What both ways have in common; a class below says how a command reaches the host."""

    def use(self, host):
        raise NotImplementedError

    def ask(self, *arguments):
        raise NotImplementedError

    def arguments(self):
        raise NotImplementedError

    def done(self, *arguments):
        outcome = self.ask(*arguments)
        self.assert_ended(outcome, 0)
        return outcome

    def groups(self):
        """[[cache disk, capacity disk, ..], ..], each with "!" in front when it is not mounted."""
        found = self.done("-o", "json", "groups").json().get("diskMapInfo", [])
        return [[] + ([] if group["mounted"] else ["!"]) + names(group["mapping"]) for group in found]

    def description(self):
        return json.loads(self.done("sim", "show").out)

    def test_adds_every_eligible_disk(self):
        self.use(HOST)
        outcome = self.done("add", "--all", "--yes")
        self.assertEqual(outcome.out,
                         "OUTCOME  ROLE      DISK    STATE\n"
                         "added    cache     naa.s1  in use\n"
                         "         capacity  naa.h1  in use\n"
                         "         capacity  naa.h3  in use\n"
                         "added    cache     naa.s2  in use\n"
                         "         capacity  naa.h2  in use\n"
                         "\n"
                         "2 disk groups: 2 added\n")
        self.assertEqual(outcome.err, "")
        self.assertEqual(self.groups(), [["naa.s1", "naa.h1", "naa.h3"], ["naa.s2", "naa.h2"]])

    def test_says_why_there_is_nothing_to_add(self):
        self.use({"disks": [disk("naa.h1"), disk("naa.usb", transport="usb")]})
        outcome = self.done("add", "--all", "--yes")
        self.assertTrue(outcome.out.startswith("Nothing was added: no disk group can be made"), outcome.out)
        self.assertIn("        1  no flash disk is free to be its cache", outcome.out)
        self.assertIn("        1  attached by USB\n", outcome.out)
        self.assertEqual(self.done("-o", "json", "add", "--all", "--yes").json(), [])
        self.done("sim", "set", "naa.h1", "--partitions", "1")
        self.assertIn("no disk is eligible", self.done("add", "--all", "--yes").out)

    def test_adds_the_disks_it_is_told_and_extends_groups(self):
        self.use(HOST)
        results = self.done("-o", "json", "add", "naa.h1", "naa.s2", "--yes").json()
        self.assertEqual([names(result["mapping"]) for result in results], [["naa.s2", "naa.h1"]])
        self.done("add", "naa.h3", "--yes")
        self.assertEqual(self.groups(), [["naa.s2", "naa.h1", "naa.h3"]])
        self.assertIn('xsi:type="KovaHostDiskMapResultList"',
                      self.done("-o", "soap", "add", "naa.h2", "--yes").out)

    def test_makes_exactly_one_group(self):
        self.use(HOST)
        self.done("init", "--ssd", "naa.s2", "--disk", "naa.h3", "naa.h1", "--yes")
        self.assertEqual(self.groups(), [["naa.s2", "naa.h3", "naa.h1"]])

    def test_tells_what_failed_and_what_to_do(self):
        self.use(HOST)
        outcome = self.ask("init", "--ssd", "naa.s1", "--disk", "naa.h1", "naa.usb", "--yes")
        self.assert_ended(outcome, 1, "kovactl: disk group of naa.s1: attached by USB: naa.usb\n"
                                      "  Disks on USB are never used: leave it out.\n")
        self.assertIn("         capacity  naa.usb  ineligible  attached by USB\n", outcome.out)
        self.assertTrue(outcome.out.endswith("1 disk group: 1 failed\n"), outcome.out)
        self.assert_ended(self.ask("add", "naa.usb", "--yes"), 1, "too few disks for a disk group")
        self.assert_ended(self.ask("add", "naa.9", "--yes"), 1, "naa.9")
        self.assertEqual(self.groups(), [])

    def test_does_what_it_can_and_tells_of_the_rest(self):
        self.use(HOST)
        self.done("sim", "fault", "FormatDiskMapping", "--call", "2", "--exception", "KovaExceptionHasPartition",
                  "--message", "surprise", "--disk", "naa.h2")
        outcome = self.ask("add", "--all", "--yes")
        self.assert_ended(outcome, 1, "disk group of naa.s2: holds partitions or is in use by others: naa.h2")
        self.assertTrue(outcome.out.endswith("2 disk groups: 1 added, 1 failed\n"), outcome.out)
        self.assertEqual(self.groups(), [["naa.s1", "naa.h1", "naa.h3"]])
        self.done("sim", "clear-faults")
        self.assertNotIn("faults", self.description())

    def test_removes_a_disk_but_not_the_last_of_its_group(self):
        self.use(TWO_GROUPS)
        self.assertEqual(self.done("remove", "naa.h1", "--yes").out, "Removed naa.h1.\n")
        self.assertEqual(self.groups(), [["naa.s1", "naa.h2"], ["naa.s2", "naa.h3"]])
        outcome = self.ask("remove", "naa.h2", "--yes", "--pass-through", "p", "--option-text", "o",
                           "--option-first", "1", "--option-second", "2")
        self.assert_ended(outcome, 1, "last capacity disk of its group: naa.h2\n  Remove the whole group")
        self.done("remove", "naa.s1", "--yes")
        self.assertEqual(self.groups(), [["naa.s2", "naa.h3"]])

    def test_removes_a_group_by_its_cache_disk(self):
        self.use(TWO_GROUPS)
        self.assertEqual(self.done("remove-group", "naa.s1", "--yes").out,
                         "Removed the disk group of naa.s1.\n")
        self.assertEqual(self.groups(), [["naa.s2", "naa.h3"]])
        self.assert_ended(self.ask("remove-group", "naa.s1", "--yes"), 2,
                          "no disk group with the cache disk 'naa.s1'")

    def test_removes_what_has_left_by_its_uuid(self):
        self.use({**TWO_GROUPS, "disks": [{**one, "kovaUuid": f"00000000-0000-4000-8000-{i:012}"}
                                          for i, one in enumerate(TWO_GROUPS["disks"])]})
        self.done("sim", "set", "naa.h1", "--absent")
        lost = "kova:00000000-0000-4000-8000-000000000002"
        self.assertEqual(self.groups()[0], ["naa.s1", lost, "naa.h2"])
        self.assertIn("has left the host", self.done("groups").out)
        self.done("remove", lost, "--yes")
        self.assertEqual(self.groups()[0], ["naa.s1", "naa.h2"])
        self.done("sim", "set", "naa.s1", "--absent")
        lost = "kova:00000000-0000-4000-8000-000000000000"
        self.assertEqual(self.groups()[0], [lost, "naa.h2"])
        self.done("remove-group", lost, "--yes")
        self.assertEqual(self.groups(), [["naa.s2", "naa.h3"]])

    def test_removes_nothing_while_the_host_claims_on_its_own(self):
        self.use(TWO_GROUPS)
        self.done("sim", "set", "--auto-mode", "on")
        self.assertIn("claims disks on its own", self.done("groups").out)
        for command in ("remove", "remove-group"):
            self.assert_ended(self.ask(command, "naa.s1", "--yes"), 1, "If the host claims disks on its own")
        self.assertEqual(len(self.groups()), 2)

    def test_unmounts_groups_and_claims_them_again(self):
        self.use(TWO_GROUPS)
        outcome = self.done("unmount", "naa.s2", "naa.s1")
        self.assertTrue(outcome.out.endswith("2 disk groups: 2 unmounted\n"), outcome.out)
        self.assertEqual(self.groups(), [["!", "naa.s1", "naa.h1", "naa.h2"], ["!", "naa.s2", "naa.h3"]])
        self.assertIn("not mounted", self.done("groups").out)
        self.assert_ended(self.ask("unmount", "naa.s1"), 1, "does not fit the host")
        self.assertEqual(self.done("claim").out, "OUTCOME  CACHE DISK\nmounted  naa.s1\nmounted  naa.s2\n")
        self.assertEqual(self.groups(), [["naa.s1", "naa.h1", "naa.h2"], ["naa.s2", "naa.h3"]])
        self.assertEqual(self.done("claim").out, "Every disk group was mounted already.\n")
        self.assert_ended(self.ask("unmount", "naa.s1", "naa.h3"), 2, "'naa.h3'")
        self.assertEqual(len(self.done("-o", "json", "claim").json()["diskMapInfo"]), 2)

    def test_tells_when_claiming_failed_although_the_host_does_not(self):
        self.use(TWO_GROUPS)
        self.done("unmount", "naa.s2")
        self.done("sim", "fault", "ClaimUnmountedDiskgroups", "--exception", "HostCtlException",
                  "--message", "asleep")
        outcome = self.ask("claim")
        self.assert_ended(outcome, 1, "1 disk group is still not mounted\n  The host's log tells why.")
        self.assertEqual(outcome.out, "OUTCOME      CACHE DISK\nnot mounted  naa.s2\n")

    def test_mounts_an_unmounted_group_whose_disks_are_added(self):
        self.use(TWO_GROUPS)
        self.done("unmount", "naa.s1")
        self.done("add", "naa.s1", "naa.h1", "--yes")
        self.assertEqual(self.groups(), [["naa.s1", "naa.h1", "naa.h2"], ["naa.s2", "naa.h3"]])

    def test_destroys_nothing_without_consent(self):
        self.use(TWO_GROUPS)
        before = self.done("sim", "show").out
        for command in (("add", "--all"), ("add", "naa.h1"), ("init", "--ssd", "naa.s1", "--disk", "naa.h1"),
                        ("remove", "naa.h1"), ("remove-group", "naa.s1")):
            with self.subTest(command):
                outcome = self.ask(*command)
                self.assert_ended(outcome, 2, "--yes")
                self.assertEqual(outcome.out, "")
        self.assertEqual(self.done("sim", "show").out, before)

    def at_terminal(self, reply, *arguments):
        """Runs a command whose standard input is a terminal at which somebody types that."""
        keyboard, screen = pty.openpty()
        try:
            os.write(keyboard, reply.encode())
            ended = subprocess.run([os.path.join(BIN, "kovactl"), *self.arguments(), *arguments], stdin=screen,
                                   capture_output=True, text=True, timeout=PATIENCE, check=False)
        finally:
            os.close(keyboard)
            os.close(screen)
        return ended

    def test_asks_at_a_terminal_before_it_destroys(self):
        self.use(TWO_GROUPS)
        ended = self.at_terminal("no\n", "remove", "naa.s1")
        self.assertEqual((ended.returncode, ended.stdout), (2, ""))
        self.assertEqual(ended.stderr, "What is on these disks may be lost:\n  naa.s1\n  naa.h1\n  naa.h2\n"
                                       "Go on? [y/N] Nothing was changed.\n")
        self.assertEqual(len(self.groups()), 2)
        ended = self.at_terminal("y\n", "remove", "naa.s1")
        self.assertEqual((ended.returncode, ended.stdout), (0, "Removed naa.s1.\n"))
        self.assertEqual(len(self.groups()), 1)

    def test_changes_what_a_simulated_host_has(self):
        self.use(HOST)
        outcome = self.done("sim", "set", "naa.h1", "--ssd", "--capacity-flash", "--transport", "nvme",
                            "--partitions", "2", "--remote", "--not-in-inventory")
        self.assertEqual(outcome.out, "".join(f"naa.h1: {setting}\n" for setting in (
            "ssd = true", "capacityFlash = true", "local = false", "inInventory = false", "partitions = 2",
            'transport = "nvme"')))
        changed = [one for one in self.description()["disks"] if one["name"] == "naa.h1"][0]
        self.assertEqual(changed, {"name": "naa.h1", "ssd": True, "capacityFlash": True, "bytes": 1 << 40,
                                   "transport": "nvme", "local": False, "partitions": 2, "inInventory": False})
        self.done("sim", "set", "naa.h1", "--hdd", "--no-capacity-flash", "--local", "--in-inventory",
                  "--partitions", "0", "--transport", "sas")
        self.assertIn("naa.h1   hard disk  1.0 TiB  eligible\n", self.done("disks").out)
        self.assert_ended(self.ask("sim", "set", "naa.9", "--absent"), 1, "naa.9")
        self.assert_ended(self.ask("sim", "set", "naa.h1"), 2, "say what to set")
        self.assert_ended(self.ask("sim", "set", "--absent"), 2, "DISK")
        self.assert_ended(self.ask("sim", "set", "naa.h1", "--absent", "--present"), 2, "excludes")
        self.assert_ended(self.ask("sim", "fault", "Fly", "--delay-ms", "1"), 2, "Fly")
        self.assert_ended(self.ask("sim", "fault", "RemoveDisk", "--exception", "Fly"), 2, "Fly")
        self.assert_ended(self.ask("sim", "fault", "RemoveDisk"), 2, "--exception")

    def test_plans_without_changing_anything(self):
        self.use(TWO_GROUPS)
        before = self.done("sim", "show").out
        for command, told in {
                ("remove-group", "naa.s1"): "removed  hybrid  cache     naa.s1\n",
                ("remove", "naa.h1"): "reduced  hybrid  cache     naa.s1\n                 capacity  naa.h1\n\n",
                ("unmount", "naa.s2"): "unmounted  hybrid  cache     naa.s2\n",
                ("claim",): "Nothing would change.\n",
                ("add", "--all"): "        1  attached by USB\n",
        }.items():
            with self.subTest(command):
                self.assertIn(told, self.plan(*command).out)
        self.assert_ended(self.plan("remove", "naa.h3", status=1), 1, "last capacity disk of its group")
        self.assert_ended(self.plan("unmount", "naa.9", status=2), 2, "'naa.9'")
        self.assertEqual(self.done("sim", "show").out, before)

    def test_plans_with_the_faults_that_would_come_but_waits_for_none(self):
        self.use({**HOST, "faults": [{"operation": "RefreshKovaInfo", "delayMs": 600000},
                                     {"operation": "FormatDiskMapping", "call": 1, "delayMs": 600000,
                                      "exception": "KovaExceptionHasPartition", "disk": "naa.h1"}]})
        plan = self.plan("-o", "json", "add", "--all", status=1).json()
        self.assertEqual([group["change"] for group in plan["groups"]], ["made", "failed"])
        self.assertEqual(plan["groups"][1]["fault"], {"@type": "DiskHasPartitions", "device": "naa.h1"})
        self.assertEqual(plan["fault"], plan["groups"][1]["fault"])
        self.assertEqual([one["disk"] for one in plan["leftOver"]], ["naa.usb"])

    def plan(self, *arguments, status=0):
        options = []
        while arguments[0].startswith("-"):
            options, arguments = options + list(arguments[:2]), arguments[2:]
        outcome = self.ask(*options, "plan", *arguments)
        self.assert_ended(outcome, status)
        return outcome


class InOneProcess(Changes, ProgramTest):
    def use(self, host):
        self.write("host.json", host)

    def arguments(self):
        return ["--host", self.path("host.json"), "--save"]

    def ask(self, *arguments):
        saving = [] if "plan" in arguments else ["--save"]
        return self.kovactl("--host", self.path("host.json"), *saving, *arguments)

    def test_says_when_a_change_is_forgotten(self):
        self.use(TWO_GROUPS)
        forgotten = "(not saved: give --save to keep the change)\n"
        for command in (("remove", "naa.h1", "--yes"), ("unmount", "naa.s1"), ("sim", "set", "naa.h1", "--absent")):
            with self.subTest(command):
                self.assert_ended(self.kovactl("--host", self.path("host.json"), *command), 0, forgotten)
        self.assertEqual(json.loads(self.read("host.json")), TWO_GROUPS)
        outcome = self.kovactl("--host", self.path("host.json"), "remove", "naa.h3", "--yes")
        self.assert_ended(outcome, 1)
        self.assertNotIn(forgotten, outcome.err)

    def test_refuses_to_save_a_plan(self):
        self.use(HOST)
        outcome = self.kovactl("--host", self.path("host.json"), "--save", "plan", "add", "--all")
        self.assert_ended(outcome, 2, "--save")

    def test_ends_with_2_over_arguments_that_do_not_go_together(self):
        self.use(HOST)
        for told, command in {"--all": ("add", "--yes"), "--disk": ("init", "--ssd", "naa.s1"),
                              "exclude": ("add", "--all", "naa.h1"), "SSD": ("unmount",), "DISK": ("remove",),
                              "a table or as json": ("-o", "soap", "plan", "claim")}.items():
            with self.subTest(command):
                self.assert_ended(self.kovactl("--host", self.path("host.json"), *command), 2, told)

    def test_has_no_tasks(self):
        self.use(HOST)
        self.assert_ended(self.kovactl("--host", self.path("host.json"), "tasks"), 2, "tasks are an agent's")


class OverAgent(Changes, ProgramTest):
    def use(self, host):
        self.agent = self.start_agent("--host", self.write("host.json", host), "--save", "--log-level", "error")

    def arguments(self):
        return ["--agent", "unix:" + self.socket]

    def ask(self, *arguments):
        return self.ask_agent(*arguments)

    def test_lists_what_it_was_asked_to_change(self):
        self.use(HOST)
        self.assertEqual(self.done("tasks").out, "0 tasks\n")
        self.done("add", "naa.s1", "naa.h1", "--yes")
        self.ask("remove", "naa.h1", "--yes")
        lines = self.done("tasks").out.splitlines()
        self.assertEqual(lines[-1], "2 tasks: 1 done, 1 failed")
        self.assertTrue(lines[2].endswith("last capacity disk of its group: naa.h1"), lines[2])
        tasks = self.done("-o", "json", "tasks").json()["tasks"]
        self.assertEqual([(task["operation"], task["state"]) for task in tasks],
                         [("AddDisks", "done"), ("RemoveDisk", "failed")])

    def test_leaves_a_saved_host_that_a_process_of_its_own_goes_on_with(self):
        self.use(HOST)
        self.done("add", "naa.s1", "naa.h1", "--yes")
        groups = self.groups()
        self.assertEqual(self.stop(self.agent), 0)
        alone = self.kovactl("--host", self.path("host.json"), "-o", "json", "groups").json()["diskMapInfo"]
        self.assertEqual([names(group["mapping"]) for group in alone], groups)

    def test_finds_its_agent_in_the_environment(self):
        self.use(HOST)
        command = [os.path.join(BIN, "kovactl"), "groups"]
        for agent, status in (("unix:" + self.socket, 0), ("unix:" + self.path("none"), 3), ("http:", 2)):
            with self.subTest(agent):
                ended = subprocess.run(command, env={**os.environ, "KOVA_AGENT": agent}, capture_output=True,
                                       timeout=PATIENCE, check=False)
                self.assertEqual(ended.returncode, status)


if __name__ == "__main__":
    unittest.main(verbosity=2)
