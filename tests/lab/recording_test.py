#!/usr/bin/env python3
"""Recordings say what stood in a folder; those that are kept are whole."""

import glob
import json
import os
import re
import tempfile
import unittest

import recording

RECORDED = os.path.join(os.path.dirname(os.path.abspath(__file__)), "../../otxctl/linux/testing/recorded")
TREES = sorted(glob.glob(RECORDED + "/*.tree"))
UNESCAPE = re.compile(rb"\\(n|\\|x[0-9a-f]{2})")


def unescape(text):
    def byte(match):
        word = match.group(1)
        return {b"n": b"\n", b"\\": b"\\"}.get(word) or bytes([int(word[1:], 16)])
    return UNESCAPE.sub(byte, text.encode("ascii"))


def read(path):
    """{path: (kind, content)} of a recording."""
    with open(path, encoding="ascii") as file:
        parts = [line.rstrip("\n").split(" ", 2) for line in file if not line.startswith("#")]
    return {part[1]: (part[0], part[2] if len(part) > 2 else "") for part in parts}


class Recordings(unittest.TestCase):
    def setUp(self):
        self.folder = self.enterContext(tempfile.TemporaryDirectory())

    def write(self, name, content):
        path = os.path.join(self.folder, name)
        os.makedirs(os.path.dirname(path), exist_ok=True)
        with open(path, "wb") as file:
            file.write(content)

    def test_bring_every_content_back(self):
        for content in (b"", b" ", b"a b \n", b"\\n", b"\\\n\\", bytes(range(256)), b"\\x20", b"ends  "):
            text = recording.escape(content)
            self.assertEqual(unescape(text), content)
            self.assertFalse(text.endswith(" "))

    def test_read_well_where_contents_are_plain(self):
        self.assertEqual(recording.escape(b"LAB     \n"), "LAB     \\n")

    def test_tell_files_links_and_empty_folders(self):
        self.write("sys/size", b"8\n")
        self.write("sys/none", b"")
        os.symlink("../size", self.folder + "/sys/link")
        os.mkdir(self.folder + "/sys/holders")
        self.assertEqual(recording.lines(self.folder), [
            "dir sys/holders", "link sys/link ../size", "file sys/none", "file sys/size 8\\n"])

    def test_do_not_follow_links_to_folders(self):
        self.write("sys/devices/a", b"")
        os.symlink("devices", self.folder + "/sys/again")
        self.assertEqual(recording.lines(self.folder), ["link sys/again devices", "file sys/devices/a"])

    def test_refuse_paths_that_would_not_come_back(self):
        self.write("a b", b"")
        with self.assertRaises(ValueError):
            recording.lines(self.folder)


class Kept(unittest.TestCase):
    """The recordings that other tests read."""

    def test_are_there(self):
        self.assertEqual([os.path.basename(path) for path in TREES], ["lab-missing.tree", "lab-used.tree", "lab.tree"])

    def test_hold_every_disk_that_they_link_to(self):
        for path in TREES:
            tree = read(path)
            links = {name: to for name, (kind, to) in tree.items()
                     if kind == "link" and name.startswith("sys/class/block")}
            self.assertGreater(len(links), 12)
            for name, to in links.items():
                disk = os.path.normpath(os.path.join(os.path.dirname(name), to))
                self.assertRegex(tree[disk + "/size"][1], r"^\d+\\n$")
                self.assertIn(f"{disk}/uevent", tree)

    def test_lose_the_disk_that_was_unplugged(self):
        serials = {path: [to for name, (_, to) in read(path).items() if name.endswith("/vpd_pg80")] for path in TREES}
        missing, used, free = (sorted(serials[path]) for path in TREES)
        self.assertEqual(used, free)
        self.assertEqual([one for one in used if one not in missing], [one for one in used if "HDD0000201" in one])
        self.assertEqual(len(used) - len(missing), 1)

    def test_have_reports_that_are_what_they_are_called(self):
        reports = glob.glob(RECORDED + "/lvm-*.json")
        self.assertGreater(len(reports), 20)
        for path in reports:
            with open(path, encoding="utf-8") as file:
                report = json.load(file)["report"]
            kind = re.search(r"-(pv|vg|lv)s(-all)?\.json$", path).group(1)
            self.assertEqual([list(part) for part in report], [[kind]])
            self.assertTrue(os.path.exists(path.removesuffix("json") + "stderr"))


if __name__ == "__main__":
    unittest.main()
