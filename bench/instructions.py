#!/usr/bin/env python3
"""Counts the instructions of planning and checking disk groups, per disk of the request.

A time per disk grows with the number of disks as soon as they no longer fit the processor's caches, and differs from
run to run; the number of instructions does neither. It is counted by callgrind, for one call each.

  instructions.py PLANNING_BENCH    fails when a disk among many costs more than one among few
"""

import json
import os
import re
import subprocess
import sys
import tempfile

FEW, MANY = 512, 32768
MOST = 1.1  # of a disk among many, as a multiple of one among few

MANAGER = "Kovasvc::KovaManagerImpl::"
SUBJECTS = [  # the benchmark, and the function that it is about
    ("PlanHybrid", "ComputeDiskMappings"),
    ("ExtendGroups", "ComputeDiskMappings"),
    ("SplitAllFlash", "AllFlashDiskMappingSwitch"),
    ("FindUnmounted", "ComputeNotMountedDiskMappings"),
    ("CheckRequest", "ValidateDiskMappings"),
    ("CheckShuffled", "ValidateDiskMappings"),
]


def instructions(program, benchmark, function, disks):
    """Of one call of the function."""
    with tempfile.NamedTemporaryFile() as counts:
        outcome = subprocess.run(
            ["valgrind", "--tool=callgrind", f"--callgrind-out-file={counts.name}",
             f"--toggle-collect={MANAGER}{function}*", program, f"--benchmark_filter=^{benchmark}/disks:{disks}$",
             "--benchmark_min_time=0.000000001", "--benchmark_format=json"],
            capture_output=True, text=True, check=False,
            env={**os.environ, "LD_BIND_NOW": "1"})  # or the first call would look up symbols
        if outcome.returncode != 0:
            sys.exit(f"{benchmark} with {disks} disks: {outcome.stdout}{outcome.stderr}")
        total = re.search(r"^(?:summary|totals): (\d+)", counts.read().decode(), re.MULTILINE)
    calls = json.loads(outcome.stdout)["benchmarks"][0]["iterations"]
    if not total or calls != 1:
        sys.exit(f"{benchmark} with {disks} disks: {function} was called {calls} times, and not once")
    return int(total[1])


def main():
    if len(sys.argv) != 2:
        sys.exit(__doc__)
    print(f"{'instructions per disk':<28}{FEW:>10}{MANY:>10}{'growth':>10}")
    grown = []
    for benchmark, function in SUBJECTS:
        few, many = (instructions(sys.argv[1], benchmark, function, disks) / disks for disks in (FEW, MANY))
        print(f"{benchmark:<28}{few:>10.0f}{many:>10.0f}{many / few:>10.2f}", flush=True)
        if many > MOST * few:
            grown.append(benchmark)
    if grown:
        sys.exit(f"more than {MOST} times as much among {MANY}: {', '.join(grown)}")


if __name__ == "__main__":
    main()
