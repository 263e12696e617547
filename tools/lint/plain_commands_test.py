#!/usr/bin/env python3
"""What other tools are told of how a source is compiled."""

import json
import os
import tempfile
import unittest

from plain_commands import main, plain

COMMAND = (r'env A=b ccache /usr/bin/c++ -DNAME=\"a\ b\" -O1 -fpch-preprocess -Winvalid-pch '
           "-include /b/one.dir/cmake_pch.hxx -include own.h -o a.o -c /s/a.cpp")


class PlainCommands(unittest.TestCase):
    def test_leave_out_the_precompiled_headers_and_what_belongs_to_them(self):
        words = ["c++", "-Wall", "--param=ggc-min-heapsize=9", "-Winvalid-pch", "-include", "/b/cmake_pch.hxx", "-include",
                 "own.h", "-fpch-preprocess", "-Wno-array-bounds", "-Wno-stringop-overflow", "-c", "a.cpp"]
        self.assertEqual(plain(words), ["c++", "-Wall", "-include", "own.h", "-c", "a.cpp"])

    def test_begin_with_the_compiler(self):
        self.assertEqual(plain(["env", "A=b", "/usr/bin/ccache", "/usr/bin/clang++-14", "-c", "a.cpp"]),
                         ["/usr/bin/clang++-14", "-c", "a.cpp"])

    def test_are_written_for_every_source_but_not_for_precompiled_headers(self):
        entries = [{"directory": "/b", "file": "/s/a.cpp", "command": COMMAND},
                   {"directory": "/b", "file": "/b/one.dir/cmake_pch.hxx.cxx", "command": "c++ -c cmake_pch.hxx.cxx"}]
        with tempfile.TemporaryDirectory() as build, tempfile.TemporaryDirectory() as out:
            with open(os.path.join(build, "compile_commands.json"), "w", encoding="utf-8") as file:
                json.dump(entries, file)
            main(build, out)
            with open(os.path.join(out, "compile_commands.json"), encoding="utf-8") as file:
                written = json.load(file)
        self.assertEqual(written, [{"directory": "/b", "file": "/s/a.cpp",
                                    "command": "/usr/bin/c++ '-DNAME=\"a b\"' -O1 -include own.h -o a.o -c /s/a.cpp"}])


if __name__ == "__main__":
    unittest.main()
