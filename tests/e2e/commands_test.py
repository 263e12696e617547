#!/usr/bin/env python3
"""kovactl without an agent: one process, host descriptions, and how commands end."""

import json
import os
import shutil
import subprocess
import unittest

from programs import BIN, EXAMPLES, ProgramTest, disk

TWO_DISKS = {"disks": [disk("naa.1", True), disk("naa.2")]}


class OneProcess(ProgramTest):
    def test_prints_disks_in_every_form(self):
        host = self.write("host.json", TWO_DISKS)
        self.assertIn("2 disks: 2 eligible", self.kovactl("--host", host, "disks").out)
        found = self.kovactl("--host", host, "-o", "json", "disks").json()
        self.assertEqual([result["disk"]["canonicalName"] for result in found], ["naa.1", "naa.2"])
        soap = self.kovactl("--host", host, "-o", "soap", "disks").out
        self.assertIn('xsi:type="KovaHostDiskResultList"', soap)

    def test_takes_options_on_either_side_of_the_command(self):
        host = self.write("host.json", TWO_DISKS)
        before = self.kovactl("--host", host, "-o", "json", "disks", "naa.1")
        behind = self.kovactl("disks", "--host", host, "-o", "json", "naa.1")
        self.assertEqual(before.out, behind.out)

    def test_prints_the_disks_it_knows_and_names_the_others(self):
        outcome = self.kovactl("--host", self.write("host.json", TWO_DISKS), "disks", "naa.1", "naa.9")
        self.assert_ended(outcome, 2, "this host has no disk 'naa.9'")
        self.assertIn("naa.1", outcome.out)

    def test_shows_disks_as_in_use_once_they_are_in_a_group(self):
        host = {**TWO_DISKS, "groups": [{"ssd": "naa.1", "capacity": ["naa.2"]}]}
        self.assertIn("2 disks: 2 in use", self.kovactl("--host", self.write("host.json", host), "disks").out)

    def test_ends_with_1_when_the_kernel_fails_in_a_way_it_must_not(self):
        host = {**TWO_DISKS, "faults": [{"operation": "RemoveDisk", "exception": "std::runtime_error",
                                         "message": "boom"}]}
        self.assert_ended(self.kovactl("--host", self.write("host.json", host), "remove", "naa.1", "--yes"), 1, "boom")

    def test_ends_with_1_when_the_host_answers_with_a_fault(self):
        host = self.write("host.json", {**TWO_DISKS, "storageSystem": "missing"})
        outcome = self.kovactl("--host", host, "disks")
        self.assert_ended(outcome, 1, "could not be read")
        self.assertEqual(outcome.out, "")

    def test_ends_with_2_over_what_it_cannot_use(self):
        host = self.write("host.json", TWO_DISKS)
        for told, arguments in {
                "none.json": ("--host", self.path("none.json"), "disks"),
                "disks[1].bytes": ("--host", self.write("broken.json", {
                    "disks": [disk("naa.1"), {"name": "naa.2", "ssd": True, "bytes": "1"}]}), "disks"),
                "none.so": ("--host", host, "--plugin", self.path("none.so"), "disks"),
                "loud": ("--host", host, "--log-level", "loud", "disks"),
                "--save": ("--save", "disks"),
                "unix:PATH": ("--agent", "http://localhost", "disks"),
                "--agent": ("--agent", "unix:/a", "--host", host, "disks"),
                "xml": ("--host", host, "-o", "xml", "disks"),
                "Subcommands:": (),
                "A subcommand is required": ("host",),
                "not expected: fly": ("fly",),
        }.items():
            with self.subTest(told):
                outcome = self.kovactl(*arguments)
                self.assert_ended(outcome, 2, told)
                self.assertEqual(outcome.out, "")

    def test_ends_with_3_when_no_agent_answers(self):
        self.assert_ended(self.ask_agent("disks"), 3, self.socket)

    def test_ends_with_2_when_nobody_takes_its_output(self):
        host = self.write("host.json", TWO_DISKS)
        with open("/dev/full", "w", encoding="utf-8") as full:
            ended = subprocess.run([os.path.join(BIN, "kovactl"), "--host", host, "disks"], stdout=full, check=False)
        self.assertEqual(ended.returncode, 2)

    def test_tells_how_it_is_used(self):
        outcome = self.kovactl("--help")
        self.assert_ended(outcome, 0)
        commands = ("disks", "groups", "config", "tasks", "add", "init", "remove", "remove-group", "unmount", "claim",
                    "plan", "sim", "host", "replay")
        for command in commands:
            self.assertIn(f"\n  {command} ", outcome.out)
            self.assert_ended(self.kovactl(command, "--help"), 0)
        for command in ("add", "init", "remove", "remove-group", "unmount", "claim"):
            self.assertIn(f"\n  {command} ", self.kovactl("plan", "--help").out)
        self.assertIn("Exit status: 0 done", outcome.out)

    def test_tells_its_version(self):
        outcome = self.kovactl("--version")
        self.assert_ended(outcome, 0)
        self.assertRegex(outcome.out, r"^kovactl \d+\.\d+\.\d+ \(build \S+, API nox\.version\.unstable\)\n$")

    def test_lets_no_name_play_with_the_terminal(self):
        # A description may not hold such a name, so it can only come from the command line.
        outcome = self.kovactl("--host", self.write("host.json", TWO_DISKS), "disks", "\x1b[2J")
        self.assertEqual(outcome.status, 1)
        self.assertNotIn("\x1b", outcome.out + outcome.err)


class HostDescriptions(ProgramTest):
    def test_of_the_examples_are_sound(self):
        outcome = self.kovactl("host", "check", os.path.join(EXAMPLES, "default.json"))
        self.assert_ended(outcome, 0)
        self.assertTrue(outcome.out.endswith("host example, 12 disks, 0 disk groups: sound\n"), outcome.out)

    def test_that_are_broken_are_refused_with_file_and_place(self):
        for place, text in {
                "disks[1].name": json.dumps({"disks": [disk("naa.1"), disk("naa.1")]}),
                "disks[0].colour": json.dumps({"disks": [disk("naa.1", colour="red")]}),
                "groups[0].ssd": json.dumps({"groups": [{"ssd": "naa.1", "capacity": []}]}),
                "line 2": '{"disks": [],\n "name": }',
        }.items():
            with self.subTest(place):
                outcome = self.kovactl("host", "check", self.write("host.json", text))
                self.assert_ended(outcome, 2, place)
                self.assertIn(self.path("host.json"), outcome.err)
                self.assertEqual(outcome.out, "")

    def test_that_are_missing_or_no_file_are_refused(self):
        self.assert_ended(self.kovactl("host", "check", self.path("none.json")), 2, "none.json")
        self.assert_ended(self.kovactl("host", "check", self.folder), 2, self.folder)

    def test_of_the_laboratory_show_what_can_be_used_and_why_not(self):
        lab = os.path.join(EXAMPLES, "lab-lsblk.json")
        made = self.kovactl("host", "import", lab, "--name", "lab", "--write", self.path("lab.json"))
        self.assert_ended(made, 0)
        self.assertTrue(made.out.startswith(f"Wrote {self.path('lab.json')}: 12 disks.\n"
                                            "Took 12 disks, 9 of them eligible.\n"), made.out)
        self.assertRegex(made.out, r"naa.5000c50000000300 +sdi +ineligible +gpt partition table with 1 partition")
        self.assert_ended(self.kovactl("host", "check", self.path("lab.json")), 0)
        found = self.kovactl("--host", self.path("lab.json"), "-o", "json", "disks").json()
        self.assertEqual(len(found), 12)
        states = [result["state"] for result in found]
        self.assertEqual(states.count("eligible"), 9)
        faults = sorted(result["error"]["@type"] for result in found if result["state"] == "ineligible")
        self.assertEqual(faults, ["DiskHasPartitions", "DiskIsUSB", "DiskTooSmall"])
        self.assertEqual([result["disk"].get("detail") for result in found if result["state"] == "ineligible"],
                         ["gpt partition table with 1 partition", "64 MiB, smaller than 1 GiB",
                          "attached by USB, removable, hot-plug"])
        small = [result for result in found if result.get("error", {}).get("@type") == "DiskTooSmall"]
        capacity = small[0]["disk"]["capacity"]
        self.assertEqual(capacity["block"] * capacity["blockSize"], 64 << 20)

    def test_come_from_standard_input_too(self):
        with open(os.path.join(EXAMPLES, "lab-lsblk.json"), encoding="utf-8") as file:
            text = file.read()
        piped = self.kovactl("host", "import", "-", stdin=text)
        self.assert_ended(piped, 0)
        self.assertEqual(piped.out, self.kovactl("host", "import", os.path.join(EXAMPLES, "lab-lsblk.json")).out)
        self.assertEqual(piped.json()["name"], "imported")

    def test_are_not_made_from_rubbish(self):
        self.assert_ended(self.kovactl("host", "import", "-", stdin="rubbish"), 2, "standard input: line 1")
        self.assert_ended(self.kovactl("host", "import", self.path("none")), 2, "none")
        self.assert_ended(self.kovactl("host", "import", "-", "--minimum-bytes", "-1", stdin="{}"), 2)

    @unittest.skipUnless(shutil.which("lsblk"), "lsblk is not installed")
    def test_of_this_machine_can_be_made_and_queried(self):
        listed = self.run_program("lsblk", "--json", "-O", "-b")
        if listed.status != 0:
            self.skipTest("lsblk cannot read this machine: " + listed.err)
        made = self.kovactl("host", "import", "-", "--write", self.path("here.json"), stdin=listed.out)
        if made.status != 0:  # where udev told lsblk nothing, as in a container, it must not be guessed what is free
            self.assert_ended(made, 2, "run: lsblk --json -O -b as root, on the machine itself")
            self.assertFalse(os.path.exists(self.path("here.json")))
            return
        self.assert_ended(self.kovactl("host", "check", self.path("here.json")), 0)
        described = json.loads(self.read("here.json"))
        found = self.kovactl("--host", self.path("here.json"), "-o", "json", "disks")
        self.assert_ended(found, 0)
        self.assertEqual([result["disk"]["canonicalName"] for result in found.json()],
                         [described_disk["name"] for described_disk in described.get("disks", [])])


if __name__ == "__main__":
    unittest.main(verbosity=2)
