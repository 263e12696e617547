#!/usr/bin/env python3
"""Prints benchmark results as tables: `Name` beside the floor `NameFloor` of the same run; servers beside the
bare one; a query's latency beside that of an idle agent."""

import json
import re
import sys

UNITS = {"ns": 1, "us": 1e3, "ms": 1e6, "s": 1e9}
ENDPOINT = re.compile(r"Endpoint/(\w+)/(\w+)/disks:(\d+)/process_time/real_time/threads:(\d+)")  # socket, server, ..
LATENCY = re.compile(r"Latency(\w+)/disks:(\d+)/.*")


def medians(path):
    """The rows of medians, by the names of their benchmarks."""
    with open(path, encoding="utf-8") as file:
        rows = json.load(file)["benchmarks"]
    failed = [f"{row['name']}: {row['error_message']}" for row in rows if row.get("error_occurred")]
    if failed:
        sys.exit("\n".join(failed))
    return {row["run_name"]: row for row in rows if row.get("aggregate_name") == "median"}


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


def human_latency(row):
    return f"{human(row['p50'] * 1e9):>12}{human(row['p99'] * 1e9):>12}"


def print_endpoints(rows):
    """Requests per second of each server, as a part of what the bare one answers over the same socket; and
    the processor time of a request, which other programs of the machine do not change."""
    matches = [match for name in rows if (match := ENDPOINT.fullmatch(name))]
    if matches:
        print(f"\n{'endpoint':<16}{'disks':>6}{'clients':>9}{'requests/s':>12}{'p50':>12}{'p99':>12}{'CPU':>12}{'of bare':>9}{'by CPU':>9}")
    for match in matches:
        listener, server, disks, clients = match.groups()
        row = rows[match[0]]
        bare = rows.get(match[0].replace(f"/{server}/", "/bare/"))
        parts = [f"{'-':>9}"] * 2 if bare in (None, row) else [
            f"{row['items_per_second'] / bare['items_per_second']:>9.2f}",
            f"{bare['cpu_time'] / row['cpu_time']:>9.2f}"]
        print(f"{listener + ' ' + server:<16}{disks:>6}{clients:>9}{row['items_per_second']:>12.0f}"
              f"{human_latency(row)}{human(row['cpu_time'] * UNITS[row['time_unit']]):>12}", *parts, sep="")


def print_latencies(rows):
    """Latency of a query, as a multiple of that of an idle agent."""
    matches = [match for name in rows if (match := LATENCY.fullmatch(name))]
    idle = {match[2]: rows[match[0]] for match in matches if match[1] == "Idle"}
    if matches:
        print(f"\n{'query of an agent':<22}{'disks':>6}{'p50':>12}{'p99':>12}{'of idle':>9}{'of idle':>9}")
    for match in matches:
        row, beside = rows[match[0]], idle.get(match[2])
        parts = [f"{row[part] / beside[part]:>9.2f}" if beside and beside is not row else f"{'-':>9}"
                 for part in ("p50", "p99")]
        print(f"{match[1]:<22}{match[2]:>6}{human_latency(row)}", *parts, sep="")


def print_floors(times):
    print(f"{'benchmark':<28}{'median':>12}{'floor':>12}{'ratio':>8}")
    for name, time in times.items():
        base, _, argument = name.partition("/")
        if base.endswith("Floor"):
            continue
        floor = times.get(f"{base}Floor/{argument}")
        beside = f"{human(floor):>12}{time / floor:>8.2f}" if floor else f"{'-':>12}{'-':>8}"
        print(f"{name:<28}{human(time):>12}{beside}")


def in_order(name):
    """Sorts the numbers in names as numbers."""
    return [int(part) if part.isdigit() else part for part in re.split(r"(\d+)", name)]


def main(paths):
    found = {name: row for path in paths for name, row in medians(path).items()}
    rows = {name: found[name] for name in sorted(found, key=in_order)}
    times = {name: row["cpu_time"] * UNITS[row["time_unit"]] for name, row in rows.items()
             if not ENDPOINT.fullmatch(name) and not LATENCY.fullmatch(name)}
    if times:
        print_floors(times)
        print_growth(times)
    print_endpoints(rows)
    print_latencies(rows)


if __name__ == "__main__":
    main(sys.argv[1:])
