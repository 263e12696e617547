#!/usr/bin/env python3
"""The check of operations sees one that was forgotten, wherever."""

import pathlib
import shutil
import sys
import tempfile
import unittest

HERE = pathlib.Path(__file__).resolve().parent
ROOT = HERE.parent.parent
sys.path.insert(0, str(HERE))

import operations  # noqa: E402


class Operations(unittest.TestCase):
    def setUp(self):
        self.root = pathlib.Path(tempfile.mkdtemp())
        self.addCleanup(shutil.rmtree, self.root)
        files = {operations.SCHEMA} | {place for place, _, _ in operations.PLUGIN + operations.HOST}
        for file in files:
            (self.root / file).parent.mkdir(parents=True, exist_ok=True)
            shutil.copy(ROOT / file, self.root / file)
        shutil.copytree(ROOT / "kovactl", self.root / "kovactl", dirs_exist_ok=True)

    def add(self, words):
        with open(self.root / operations.SCHEMA, "a", encoding="utf-8") as file:
            file.write(words)

    def test_none_is_forgotten_now(self):
        self.assertEqual([operations.missing(self.root, name) for name in operations.operations(self.root)],
                         [[] for _ in operations.operations(self.root)])

    def test_a_new_one_lacks_every_place(self):
        self.add("\n## Paints a disk.\nchange PaintDisk {\n}\n")
        self.assertIn("PaintDisk", operations.operations(self.root))
        lacking = [place for place, _ in operations.missing(self.root, "PaintDisk")]
        self.assertEqual(lacking, [place for place, _, _ in operations.PLUGIN + operations.HOST + operations.WORDS])

    def test_an_old_one_that_a_place_loses_is_named_with_the_place(self):
        for place, _, what in operations.PLUGIN + operations.HOST:
            text = (self.root / place).read_text(encoding="utf-8")
            (self.root / place).write_text(text.replace("AddDisks", "AddDiscs"), encoding="utf-8")
            self.assertEqual(operations.missing(self.root, "AddDisks"), [(place, what)])
            (self.root / place).write_text(text, encoding="utf-8")


if __name__ == "__main__":
    unittest.main()
