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


if __name__ == "__main__":
    main(sys.argv[1:])
