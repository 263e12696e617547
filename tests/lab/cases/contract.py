"""The suite that every provider keeps, kept by that of Linux on real disks."""

import os
import subprocess
import time

import disks
import guest
import remote
from case import case, expect

PROGRAM = "test/linux_contract"
SUITE = "Linux/ProviderContract"
# Free disks, by what a host of the suite may want of them.
KINDS = {"flash": [f"flash{i}" for i in range(5)], "hdd": [f"hdd{i}" for i in range(10)], "tiny": ["tiny"],
         "usb": ["usb"]}
# Tests that go through each operation once, and through some refusals; the others run in a full run.
QUICK = """FormattingWithTheSsdOfAGroupExtendsIt MountingBringsARestampedGroupBackAsItWas
AnAbsentDiskKeepsItsRecordWithoutAName""".split()
# Seconds; those that need longer than the others by their nature.
LIMIT = 600
LONG = {"ConcurrentCallsDoNotDisturbEachOther": 3 * 3600}


def names_of_all(machine):
    listing = subprocess.run([os.path.join(machine.programs, PROGRAM), "--gtest_list_tests"], capture_output=True,
                             text=True, check=True).stdout
    return [line.split("/")[0].strip() for line in listing.splitlines() if line.startswith("  ")]


def disks_by_kind():
    serial = {disk.name: disk.serial for disk in disks.DISKS}
    words = [f"{kind}:{serial[name]}" for kind, names in KINDS.items() for name in names]
    return " ".join([*words, f"remote:{remote.SERIAL}"])


def command(arguments):
    return f"KOVA_LAB_DISKS='{disks_by_kind()}' /opt/kova/{PROGRAM} {arguments}"


def outcome_of(machine, name):
    """("passed", "skipped" or "failed", what the test said). Each test clears what the one before has left."""
    try:
        ended = machine.run(command(f"--gtest_filter='{SUITE}.{name}/*'"), limit=LONG.get(name, LIMIT))
    except guest.Failed as failure:
        if not machine.answers:
            raise
        return "failed", str(failure)
    if "[  SKIPPED ]" in ended.out:
        return "skipped", ended.out
    passed = ended.status == 0 and "[  PASSED  ] 1 test." in ended.out
    return "passed" if passed else "failed", str(ended)


def run(machine, names):
    """Every test, whatever becomes of the others; fails if one of them does."""
    outcomes = {"passed": [], "skipped": [], "failed": []}
    with remote.disk(machine):
        for name in names:
            start = time.monotonic()
            mark, said = outcome_of(machine, name)
            outcomes[mark].append(name)
            print(f"        {mark:7} {time.monotonic() - start:6.1f} s  {name}", flush=True)
            if mark == "failed":
                print("            " + said.replace("\n", "\n            "), flush=True)
        machine.check(command("restore"))
    print("        " + ", ".join(f"{len(some)} {mark}" for mark, some in outcomes.items()), *outcomes["skipped"],
          flush=True)
    expect.assertEqual(outcomes["failed"], [])


@case()
def the_provider_of_linux_keeps_the_contract_in_each_operation(machine):
    expect.assertEqual(set(QUICK) - set(names_of_all(machine)), set())
    run(machine, QUICK)


@case(full=True)
def the_provider_of_linux_keeps_all_of_the_contract(machine):
    run(machine, names_of_all(machine))
