#!/usr/bin/env python3
"""Disks are told apart by what stands on them, and by nothing else."""

import os
import tempfile
import unittest

import images

SIZE = 64 << 20


class Digest(unittest.TestCase):
    def setUp(self):
        self.path = self.enterContext(tempfile.TemporaryDirectory()) + "/disk"
        with open(self.path, "wb") as file:
            file.truncate(SIZE)
        self.blank = images.digest(self.path)

    def write(self, offset, data):
        with open(self.path, "r+b") as file:
            file.seek(offset)
            file.write(data)
        return images.digest(self.path)

    def test_of_a_blank_disk_does_not_depend_on_what_is_allocated(self):
        self.assertEqual(self.write(5 << 20, bytes(1 << 20)), self.blank)
        self.assertEqual(self.write(0, bytes(SIZE)), self.blank)

    def test_sees_every_byte(self):
        for offset in (0, 12345, images.BLOCK - 1, SIZE - 1):
            before = images.digest(self.path)
            self.assertNotEqual(self.write(offset, b"x"), before, offset)

    def test_sees_the_place(self):
        one = self.write(images.BLOCK, b"x")
        self.write(images.BLOCK, b"\0")
        self.assertNotEqual(self.write(2 * images.BLOCK, b"x"), one)

    def test_is_the_same_however_the_data_came_there(self):
        one = self.write(3 << 20, b"data")
        self.write(3 << 20, b"other data")
        self.write(3 << 20, bytes(16))
        self.assertEqual(images.digest(self.path), self.blank)
        self.assertEqual(self.write(3 << 20, b"data"), one)

    def test_of_marks_is_that_of_their_seed(self):
        images.mark(self.path, 1)
        one = images.digest(self.path)
        self.assertNotEqual(one, self.blank)
        images.mark(self.path, 2)
        self.assertNotEqual(images.digest(self.path), one)
        images.mark(self.path, 1)
        self.assertEqual(images.digest(self.path), one)
        self.assertEqual(os.path.getsize(self.path), SIZE)


if __name__ == "__main__":
    unittest.main()
