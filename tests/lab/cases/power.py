"""The power goes in the middle of a change: what is found afterwards is whole, or told as what it is and can be cleaned
up; and nothing but the disks of the change is touched.

KOVA_LAB_SEED in the environment repeats the moments of a run, as far as the machine keeps time."""

import contextlib
import os
import random
import time

import agent
import disks
import images
import real
from case import case, expect
from real import WWID

BASE = ["flash0", "hdd0"]
MEMBERS = ["flash0", "hdd0", "hdd1"]
OTHERS = [disk.name for disk in disks.DISKS if disk.name not in MEMBERS]

# By the change: the group before and after it, what it is asked by, and how long it writes to disks at most, where
# making a group does so for one by capacity disk. The first has a group before it, which is timed.
CHANGES = {
    "extend": (BASE, MEMBERS, f"add --yes {WWID['hdd1']}", 1.1),
    "format": ([], MEMBERS, f"init --yes --ssd {WWID['flash0']} --disk {WWID['hdd0']} {WWID['hdd1']}", 2.1),
    "remove": (MEMBERS, BASE, f"remove --yes {WWID['hdd1']}", 1.0),
    "remove-group": (MEMBERS, [], f"remove-group --yes {WWID['flash0']}", 1.0),
}
# What a disk may be told as that a change has left behind.
UNFINISHED = ("which was never finished", "of which the removal was not finished", "half way into disk group",
              "that an unfinished change of a disk group left behind")


@contextlib.contextmanager
def marked(machine):
    """All other disks have data, and are blank again afterwards. Hands out what they should be."""
    machine.cut()
    for number, name in enumerate(OTHERS):
        images.mark(machine.disk_files[name], number)
    before = digests(machine)
    machine.start()
    try:
        yield before
    finally:
        machine.renew()


def digests(machine):
    return {name: images.digest(machine.disk_files[name]) for name in OTHERS}


def group_names(here):
    found = [names for _, names in real.shown(here.groups())]
    expect.assertLessEqual(len(found), 1)
    return found[0] if found else []


def is_at_work(machine):
    """Whether a change has left word of what it does, and not yet taken it back; seen from outside."""
    with contextlib.suppress(FileNotFoundError):
        return os.path.getsize(os.path.join(machine.folder, "state", "under-change")) > 0
    return False


def begin(machine, change):
    """Asks for a change, and waits until disks may be written to."""
    machine.check(f"rm -f /run/answered; ({agent.command(change)} >/run/change.out 2>&1; echo $? >/run/answered) "
                  "</dev/null >/dev/null 2>&1 &")
    machine.eventually("the change begins", lambda: is_at_work(machine), limit=120)


def make_group(machine, members):
    """How many seconds disks were written to."""
    begin(machine, f"init --yes --ssd {WWID[members[0]]} --disk " + " ".join(WWID[name] for name in members[1:]))
    start = time.monotonic()
    machine.eventually("the change has ended", lambda: not is_at_work(machine), limit=600)
    seconds = time.monotonic() - start
    answer = machine.eventually("it is answered", lambda: machine.run("cat /run/answered").out, limit=120)
    expect.assertEqual(answer, "0\n")
    return seconds


WRITE = """head -c 1048576 /dev/urandom >/run/pattern
dd if=/run/pattern of=%s bs=64k conv=fsync 2>/dev/null && md5sum </run/pattern"""


def cut_into(machine, change, seconds):
    """Cuts the power so long after disks may be written to. Whether that was in the middle of the change."""
    begin(machine, change)
    time.sleep(seconds)
    machine.cut()
    return is_at_work(machine)


def clean_up(here):
    """Removes what the change has left behind; each disk of it is free then."""
    told = real.states(here.disks())
    left = [name for name in MEMBERS if any(words in told[name][1] for words in UNFINISHED)]
    for name in left:
        if any(words in real.states(here.disks())[name][1] for words in UNFINISHED):
            here.run(f"remove --yes {WWID[name]}")
    told = real.states(here.disks())
    expect.assertEqual({name: told[name] for name in left}, {name: ("eligible", "") for name in left})
    return left


def check_after(machine, before, after, kept):
    """What the agent tells after a cut. Hands back (the group's disks, the disks that were left half way)."""
    with agent.running(machine) as here:
        found = group_names(here)
        expect.assertIn(found, (before, after))
        told = real.states(here.disks())
        for name in set(MEMBERS) - set(found):
            is_unfinished = any(words in told[name][1] for words in UNFINISHED)
            expect.assertTrue(told[name] == ("eligible", "") or is_unfinished, f"{name}: {told[name]}")
        left = clean_up(here)
        expect.assertEqual(group_names(here), found)
        if found:
            here.run("claim")
            expect.assertEqual(real.shown(here.groups()), [(True, found)])
        if kept and found:
            path = real.volumes(machine, here)["hdd0"]
            expect.assertEqual(machine.check(f"head -c 1048576 {path} | md5sum").out, kept)
        if found:
            here.run(f"remove-group --yes {WWID[found[0]]}")
        told = real.states(here.disks())
        expect.assertEqual({name: told[name] for name in MEMBERS}, {name: ("eligible", "") for name in MEMBERS})
        return found, left


class Cuts:
    """One after the other, on disks that are free before and after each."""

    def __init__(self, machine, chance, others):
        self._machine = machine
        self._chance = chance
        self._others = others
        self._unit = 0.0  # seconds that making a group takes, by capacity disk

    def cut(self, title):
        before, after, change, share = CHANGES[title]
        with agent.running(self._machine) as here:
            if before:
                self._unit = make_group(self._machine, before) / (len(before) - 1)
            kept = self._machine.check(WRITE % real.volumes(self._machine, here)["hdd0"]).out if before else ""
            moment = self._chance.uniform(0, self._unit * share)
            is_in_the_middle = cut_into(self._machine, change, moment)
        expect.assertEqual(digests(self._machine), self._others, "other disks than those of the change are touched")
        self._machine.start()
        found, left = check_after(self._machine, before, after, kept)
        print(f"        {title}: cut after {moment:.1f} s, {'in the middle' if is_in_the_middle else 'at the end'}; "
              f"group: {' '.join(found) or 'none'}; half way: {' '.join(left) or 'none'}", flush=True)


@case()
def a_power_cut_in_a_change_leaves_whole_groups_or_what_can_be_cleaned_up(machine):
    seed = int(os.environ.get("KOVA_LAB_SEED") or time.time_ns() % 1000000)
    print(f"        KOVA_LAB_SEED={seed}", flush=True)
    with marked(machine) as others:
        cuts = Cuts(machine, random.Random(seed), others)
        for number in range(20 if machine.full else 3):
            cuts.cut(list(CHANGES)[number % len(CHANGES)])
