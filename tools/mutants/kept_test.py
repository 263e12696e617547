#!/usr/bin/env python3
"""The kept list is held to what the sources say."""

import tempfile
import unittest
from pathlib import Path

import kept
from places import places_of

HERE = Path(__file__).resolve().parent
ROOT = HERE.parent.parent
CODE = "int F() {\n  return 1;\n}\n\nint G() {\n  f();\n  g();\n  f();\n  return 2;\n}\n"
ENTRY = '[[kept]]\nfile = "a.cpp"\nfunction = "F"\nbefore = "return 1;"\nafter = "return 2;"\nwhy = "because"\n'


def read(text):
    with tempfile.TemporaryDirectory() as folder:
        path = Path(folder) / "kept.toml"
        path.write_text(text, encoding="utf-8")
        return kept.read(path)


def check(text):
    kept.check(read(text), places_of("a.cpp", CODE))


class KeptList(unittest.TestCase):
    def test_explains_the_places_it_names(self):
        check(ENTRY)
        explained = [place for place in places_of("a.cpp", CODE) if place.key() in read(ENTRY)]
        self.assertEqual([(place.line, place.kind) for place in explained], [(2, "constant changed")])

    def test_still_explains_them_when_lines_have_moved(self):
        kept.check(read(ENTRY), places_of("a.cpp", "\n\n" + CODE.replace("  return", "\treturn")))

    def test_may_be_empty(self):
        check("")

    def test_names_no_place_that_is_gone(self):
        for wrong in ('"F"', '"return 1;"', '"a.cpp"', '"return 2;"'):
            with self.assertRaisesRegex(kept.Faulty, "there are 0 such places"):
                check(ENTRY.replace(wrong, '"other"'))

    def test_says_of_how_many_places_it_speaks(self):
        entry = ENTRY.replace('"F"', '"G"').replace('"return 1;"', '"f();"').replace('"return 2;"', '""')
        with self.assertRaisesRegex(kept.Faulty, "kept for 1, there are 2 such places"):
            check(entry)
        check(entry + "places = 2\n")

    def test_says_why(self):
        for line in ENTRY.splitlines()[1:]:
            with self.assertRaisesRegex(kept.Faulty, "lacks " + line.split()[0]):
                read(ENTRY.replace(line, ""))
        with self.assertRaisesRegex(kept.Faulty, "lacks why"):
            read(ENTRY.replace("because", ""))

    def test_names_a_place_once(self):
        with self.assertRaisesRegex(kept.Faulty, "stands there twice"):
            read(ENTRY + ENTRY)

    def test_is_of_the_sources_as_they_are(self):
        listed = kept.read(HERE / "equivalent.toml")
        files = sorted({file for file, *_ in listed})
        self.assertTrue(files)
        kept.check(listed, [place for file in files if (ROOT / file).exists()
                            for place in places_of(file, (ROOT / file).read_text(encoding="utf-8"))])


if __name__ == "__main__":
    unittest.main()
