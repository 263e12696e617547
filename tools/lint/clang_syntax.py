#!/usr/bin/env python3
"""Lets clang read every source that a build compiles, with the build's own flags, and write nothing.
Without the build's precompiled headers, so that each source has to include what it uses.

    clang_syntax.py BUILD_DIR [JOBS]
"""

import os
import shlex
import subprocess
import sys
from concurrent.futures import ThreadPoolExecutor

from plain_commands import plain_entries

COMPILER = "clang++-14"


def command_of(entry):
    """The build's command for one file, made clang's, without output."""
    kept, skip = [COMPILER, "-fsyntax-only"], False
    for word in shlex.split(entry["command"])[1:]:
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
    entries = plain_entries(build)
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
