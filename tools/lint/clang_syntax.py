#!/usr/bin/env python3
"""Lets clang read every source that a build compiles, with the build's own flags, and write nothing.

    clang_syntax.py BUILD_DIR [JOBS]
"""

import json
import os
import shlex
import subprocess
import sys
from concurrent.futures import ThreadPoolExecutor

COMPILER = "clang++-14"


def command_of(entry):
    """The build's command for one file, made clang's, without launcher and output."""
    words = shlex.split(entry["command"])
    while not os.path.basename(words[0]).startswith(("c++", "g++", "clang++")):
        words.pop(0)
    kept, skip = [COMPILER, "-fsyntax-only"], False
    for word in words[1:]:
        if skip or word == "-c":
            skip = False
        elif word == "-o":
            skip = True
        else:
            kept.append(word)
    return kept


def check(entry):
    result = subprocess.run(command_of(entry), cwd=entry["directory"], capture_output=True, text=True, check=False)
    return entry["file"], result.returncode, result.stderr


def main(build, jobs):
    with open(os.path.join(build, "compile_commands.json"), encoding="utf-8") as file:
        entries = json.load(file)
    failed = 0
    with ThreadPoolExecutor(jobs) as pool:
        for file, status, text in pool.map(check, entries):
            if status != 0:
                failed += 1
                print(f"{file}:\n{text}")
    print(f"{COMPILER} read {len(entries)} files, {failed} failed")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1], int(sys.argv[2]) if len(sys.argv) > 2 else os.cpu_count()))
