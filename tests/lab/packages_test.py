#!/usr/bin/env python3
"""Packages of the guest are read off the list, and taken from the cache if they are there."""

import os
import tempfile
import unittest
from unittest import mock

import packages


def touch(folder, *names):
    for name in names:
        with open(os.path.join(folder, name), "w", encoding="utf-8"):
            pass


class Packages(unittest.TestCase):
    def setUp(self):
        self.folder = self.enterContext(tempfile.TemporaryDirectory())

    def test_are_those_of_their_purpose(self):
        text = "# lab-guest: none\nlab: emulator\nlab-guest: a b\n\nbuild: c\nlab-guest: d\n"
        self.assertEqual(packages.listed(text), ["a", "b", "d"])

    def test_of_the_guest_are_listed_with_a_kernel(self):
        with open(packages.LIST, encoding="utf-8") as file:
            self.assertIn("linux-image-amd64", packages.listed(file.read()))

    def test_name_the_kernel_that_they_stand_for(self):
        self.assertEqual(packages.kernel_of("linux-image-6.1.0-9-amd64 (= 6.1.2-3), other"),
                         "linux-image-6.1.0-9-amd64")
        with self.assertRaises(packages.Failed):
            packages.kernel_of("linux-base")

    def test_are_told_from_those_with_longer_names(self):
        touch(self.folder, "udev-extra_1_amd64.deb")
        self.assertIsNone(packages.cached("udev", self.folder))
        touch(self.folder, "udev_1_amd64.deb")
        self.assertTrue(packages.cached("udev", self.folder).endswith("/udev_1_amd64.deb"))

    def test_are_downloaded_only_if_they_are_missing(self):
        touch(self.folder, "a_1_all.deb")
        with mock.patch("packages.download", lambda names, folder: touch(folder, *(n + "_2_all.deb" for n in names))):
            files = packages.fetch_named(["a", "b"], self.folder)
        self.assertEqual([os.path.basename(file) for file in files], ["a_1_all.deb", "b_2_all.deb"])

    def test_leave_nothing_half_in_the_cache_when_a_download_fails(self):
        def fail(_names, folder):
            touch(folder, "a_1_all.deb")
            raise packages.Failed("no network")
        with mock.patch("packages.download", fail), self.assertRaises(packages.Failed):
            packages.fetch_named(["a"], self.folder)
        self.assertEqual(os.listdir(self.folder), [])

    def test_say_which_command_took_too_long(self):
        with mock.patch("packages.LIMIT", 0.1), self.assertRaisesRegex(packages.Failed, "sleep 9 has not ended"):
            packages.attempt(["sleep", "9"], self.folder)


if __name__ == "__main__":
    unittest.main()
