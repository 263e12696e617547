#!/usr/bin/env python3
"""Boots the lab's machine once and runs the cases on it, one after the other.

    run.py [--case WORDS] [--list] [--full] WORK BUILD

A full run has cases that others leave out, and those that repeat something do so more often.

WORK is a folder that packages, image and logs stay in; BUILD has the programs under test. The exit status is 0 if all
cases passed that do not wait for something, 1 if one failed or the machine did, 2 if no case has these words."""

import argparse
import importlib
import os
import signal
import sys
import time

import case
import guest

# Seconds for all cases; downloading and the first boot have limits of their own.
LIMIT = 1800
FULL_LIMIT = 6 * 3600
# The order of the files is that of the run; every case leaves the machine as it found it, but for the kernel's names of
# disks that were unplugged: what README shows comes before those.
FILES = ("boot", "readme", "capture", "plug", "inventory", "groups", "plans", "contract", "alike", "made", "power",
         "cost")


def all_cases():
    return [one for name in FILES for one in case.cases_of(importlib.import_module("cases." + name))]


class OutOfTime(Exception):
    """The run has taken longer than it may."""


class Score:
    def __init__(self):
        self.passed = self.failed = self.waiting = self.left_out = 0

    def __str__(self):
        left_out = f", {self.left_out} left to a full run" if self.left_out else ""
        return f"{self.passed} passed, {self.failed} failed, {self.waiting} waiting{left_out}"


def say(mark, seconds, one, more=""):
    print(f"{mark:7} {seconds:6.1f} s  {one.name}{more}", flush=True)


def run_case(machine, one, score):
    """Whether the machine is good for more."""
    start = time.monotonic()
    try:
        one.run(machine)
    except (AssertionError, guest.Failed) as failure:
        score.failed += 1
        say("FAILED", time.monotonic() - start, one)
        print("        " + str(failure).replace("\n", "\n        "), flush=True)
        return is_mended(machine)
    score.passed += 1
    say("passed", time.monotonic() - start, one)
    return True


def is_mended(machine):
    """Whether the machine is fit for other cases after one that failed in the middle."""
    try:
        if machine.answers:
            machine.plug_all()
    except guest.Failed as failure:
        print(failure)
        return False
    return machine.answers


def run_cases(machine, cases, score):
    for one in cases:
        if one.full and not machine.full:
            score.left_out += 1
        elif one.waits_for:
            score.waiting += 1
            say("WAITS", 0, one, f" (for {one.waits_for})")
        elif not run_case(machine, one, score):
            print("The machine is fit for no more; the cases after this one were not run.")
            return


def main():
    parser = argparse.ArgumentParser(description="Tests on real disks in a virtual machine.")
    parser.add_argument("--case", default="", help="run those only whose names have these words")
    parser.add_argument("--list", action="store_true", help="list the cases and end")
    parser.add_argument("--full", action="store_true", help="run those as well that take long")
    parser.add_argument("work")
    parser.add_argument("build")
    options = parser.parse_args()
    cases = case.chosen(all_cases(), options.case)
    if not cases:
        print(f"No case has {options.case!r} in its name; --list tells them.", file=sys.stderr)
        return 2
    if options.list:
        print(*(one.name + (" (in a full run)" if one.full else "") for one in cases), sep="\n")
        return 0
    if not options.full and all(one.full for one in cases):
        print("Nothing was run: all of these are left to a full run.")
        return 0
    if all(one.waits_for for one in cases):
        print(*(f"{one.name} (waits for {one.waits_for})" for one in cases), sep="\n")
        print("Nothing was run: all of these wait.")
        return 0
    return run(options.work, options.build, cases, options.full)


def run(work, build, cases, full):
    start, score, limit = time.monotonic(), Score(), FULL_LIMIT if full else LIMIT
    try:
        with guest.boot(work, build) as machine:
            machine.full = full
            signal.alarm(limit)
            print(f"The machine was ready after {machine.boot_seconds:.1f} s.", flush=True)
            run_cases(machine, cases, score)
    except OutOfTime:
        print(f"The cases have not ended within {limit} s.\n{guest.console_tail(work)}", file=sys.stderr)
        score.failed += 1
    except guest.Failed as failure:
        print(failure, file=sys.stderr)
        score.failed += 1
    finally:
        signal.alarm(0)
    print(f"{score}, {time.monotonic() - start:.0f} s in all; console: {os.path.join(work, 'console.log')}")
    return 1 if score.failed else 0


def end_late(_number, _frame):
    raise OutOfTime


def end_orderly(number, _frame):
    """So that the machine is ended with the run."""
    raise SystemExit(128 + number)


if __name__ == "__main__":
    signal.signal(signal.SIGTERM, end_orderly)
    signal.signal(signal.SIGALRM, end_late)
    sys.path.insert(0, os.path.dirname(os.path.abspath(__file__)))
    sys.exit(main())
