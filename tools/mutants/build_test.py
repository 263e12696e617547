#!/usr/bin/env python3
"""A change of a file, and of a header, reaches the program that is linked anew."""

import json
import subprocess
import tempfile
import unittest
from pathlib import Path

from build import Build

SOURCES = {
    "room/value.h": "#pragma once\n#include <cstdio>\ninline int Value() { return 1; }\n",
    "room/answer.h": '#pragma once\n#include "room/value.h"\nint Answer();\n',
    "room/answer.cpp": '#include "room/answer.h"\nint Answer() { return Value(); }\n',
    "room/other.cpp": "int Other() { return 0; }\n",
    "room/answer_test.cpp": '#include "room/answer.h"\nint main() { return Answer(); }\n',
}
NINJA = """
rule compile
  command = : && c++ -Wall -Werror -I{root} -MD -MF $out.d -o $out -c $in
rule archive
  command = ar rcs $out $in
rule link
  command = : && c++ $in -o $out && :
build answer.o: compile {root}/room/answer.cpp
build other.o: compile {root}/room/other.cpp
build answer_test.o: compile {root}/room/answer_test.cpp
build lib.a: archive answer.o
build program: link answer_test.o other.o lib.a
"""


class Building(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.root = Path(folder.name)
        self.write(self.root, SOURCES)
        (self.root / "build").mkdir()
        (self.root / "build/build.ninja").write_text(NINJA.format(root=self.root), encoding="utf-8")
        command = ("ccache /usr/bin/c++ -Wall -Werror -I{root} -O1 -g1 -Winvalid-pch -include cmake_pch.hxx -MD -MF {name}.o.d -o {name}.o "
                   "-c {root}/room/{name}.cpp")
        entries = [{"file": str(self.root / f"room/{name}.cpp"), "command": command.format(root=self.root, name=name)}
                   for name in ("answer", "other", "answer_test")]
        (self.root / "build/compile_commands.json").write_text(json.dumps(entries), encoding="utf-8")
        subprocess.run(["ninja", "-C", self.root / "build", "program"], check=True, capture_output=True)
        self.build = Build(self.root, self.root / "build", "room", ["program"])

    def write(self, folder, sources):
        for name, text in sources.items():
            (folder / name).parent.mkdir(parents=True, exist_ok=True)
            (folder / name).write_text(text, encoding="utf-8")

    def result_with(self, objects):
        """What the program returns when it is linked with these objects."""
        self.assertIsNone(self.build.link("program", objects, self.root / "changed"))
        return subprocess.run([self.root / "changed"], check=False).returncode

    def compiled(self, file, source, headers=None):
        output = self.root / (Path(file).stem + ".changed.o")
        self.assertIsNone(self.build.compile(file, source, output, headers))
        return output

    def test_knows_the_sources_that_are_no_tests(self):
        self.assertEqual(self.build.files(".cpp", ".h"),
                         ["room/answer.cpp", "room/answer.h", "room/other.cpp", "room/value.h"])

    def test_leaves_advice_and_outputs_out_of_the_flags(self):
        self.assertEqual(self.build.flags("room/answer.cpp"), ["/usr/bin/c++", f"-I{self.root}", "-w", "-g0"])

    def test_links_a_changed_file_in_place_of_an_archives(self):
        for precompile in (False, True):
            if precompile:
                self.build.precompile(self.root)
            self.write(self.root / "new", {"answer.cpp": SOURCES["room/answer.cpp"].replace("Value()", "Value() + 4")})
            changed = self.compiled("room/answer.cpp", self.root / "new/answer.cpp")
            self.assertEqual(self.result_with({"room/answer.cpp": changed}), 5)
            self.assertEqual(self.result_with({}), 1)

    def test_says_what_the_compiler_or_the_linker_says(self):
        self.write(self.root / "new", {"bad.cpp": "int Answer() { return x; }", "empty.cpp": ""})
        self.assertIn("error", self.build.compile("room/answer.cpp", self.root / "new/bad.cpp", self.root / "bad.o"))
        empty = self.compiled("room/other.cpp", self.root / "new/empty.cpp")
        self.assertIn("main", self.build.link("program", {"room/answer_test.cpp": empty}, self.root / "changed"))

    def test_reaches_all_that_include_a_header_and_the_tests_that_name_it(self):
        self.assertEqual(self.build.users_of("room/answer.h"), ["room/answer.cpp", "room/answer_test.cpp"])
        self.assertEqual(self.build.users_of("room/value.h"), ["room/answer.cpp"])

    def test_a_changed_header_comes_before_the_sources_own(self):
        self.build.precompile(self.root)
        self.write(self.root / "new", {"room/value.h": SOURCES["room/value.h"].replace("1", "7")})
        changed = self.compiled("room/answer.cpp", self.root / "room/answer.cpp", self.root / "new")
        self.assertEqual(self.result_with({"room/answer.cpp": changed}), 7)


if __name__ == "__main__":
    unittest.main()
