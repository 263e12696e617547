#!/usr/bin/env python3
"""How a build compiles each source, plainly: without the compiler's launcher and without precompiled headers. Another
tool cannot read those, and with them would not see that a source leans on what it does not include.

    plain_commands.py BUILD_DIR OUT_DIR    writes OUT_DIR/compile_commands.json
"""

import json
import os
import shlex
import sys

COMPILERS = ("c++", "g++", "clang++")
PRECOMPILED = "cmake_pch.hxx"
# What else cmake/KovaPrecompiled.cmake gives a compiler because of them.
COMPANIONS = ("-Winvalid-pch", "-fpch-preprocess", "-Wno-array-bounds", "-Wno-stringop-overflow")


def plain(words):
    """The words of a command from the compiler on, but those about precompiled headers or GCC's memory."""
    start = next(i for i, word in enumerate(words) if os.path.basename(word).startswith(COMPILERS))
    kept, rest = [], iter(words[start:])
    for word in rest:
        if word == "-include":
            header = next(rest)
            if os.path.basename(header) != PRECOMPILED:
                kept += [word, header]
        elif word not in COMPANIONS and not word.startswith("--param="):
            kept.append(word)
    return kept


def plain_entries(build):
    """What compile_commands.json says of each source; the precompiled headers themselves are none."""
    with open(os.path.join(build, "compile_commands.json"), encoding="utf-8") as file:
        entries = [entry for entry in json.load(file) if not entry["file"].endswith(PRECOMPILED + ".cxx")]
    return [{**entry, "command": shlex.join(plain(shlex.split(entry["command"])))} for entry in entries]


def main(build, out):
    with open(os.path.join(out, "compile_commands.json"), "w", encoding="utf-8") as file:
        json.dump(plain_entries(build), file, indent=1)


if __name__ == "__main__":
    main(sys.argv[1], sys.argv[2])
