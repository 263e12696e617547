#!/usr/bin/env python3
"""Prints benchmark results as a table: `Name` beside the floor `NameFloor` of the same run."""

import json
import sys

UNITS = {"ns": 1, "us": 1e3, "ms": 1e6, "s": 1e9}


def medians(path):
    with open(path, encoding="utf-8") as file:
        for row in json.load(file)["benchmarks"]:
            if row.get("aggregate_name") == "median":
                yield row["run_name"], row["cpu_time"] * UNITS[row["time_unit"]]


def human(nanoseconds):
    for unit, factor in (("s", 1e9), ("ms", 1e6), ("us", 1e3)):
        if nanoseconds >= factor:
            return f"{nanoseconds / factor:.2f} {unit}"
    return f"{nanoseconds:.0f} ns"


def print_growth(times):
    """Time per disk at the largest number of disks, as a multiple of that at 512: 1 is flat."""
    rows = []
    for name, time in times.items():
        base, _, argument = name.partition("/disks:")
        small = times.get(f"{base}/disks:512")
        if argument.isdigit() and int(argument) >= 4096 and small and not base.endswith("Floor"):
            floor, floor_small = times.get(f"{base}Floor/disks:{argument}"), times.get(f"{base}Floor/disks:512")
            beside = f"{floor / floor_small * 512 / int(argument):>8.2f}" if floor and floor_small else f"{'-':>8}"
            rows.append(f"{name:<28}{time / small * 512 / int(argument):>12.2f}{beside}")
    if rows:
        print(f"\n{'growth per disk from 512':<28}{'':>12}{'floor':>8}", *rows, sep="\n")


def main(paths):
    times = {name: time for path in paths for name, time in medians(path)}
    print(f"{'benchmark':<28}{'median':>12}{'floor':>12}{'ratio':>8}")
    for name, time in times.items():
        base, _, argument = name.partition("/")
        if base.endswith("Floor"):
            continue
        floor = times.get(f"{base}Floor/{argument}")
        beside = f"{human(floor):>12}{time / floor:>8.2f}" if floor else f"{'-':>12}{'-':>8}"
        print(f"{name:<28}{human(time):>12}{beside}")
    print_growth(times)


if __name__ == "__main__":
    main(sys.argv[1:])
