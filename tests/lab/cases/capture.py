"""A description of this machine, made from what its lsblk prints."""

import verdicts
from case import case, expect


def imported(machine):
    machine.check("lsblk --json -O -b | kovactl host import - --write /run/imported.json")
    return machine.check("kovactl --host /run/imported.json disks -o json").json()


@case()
def an_import_of_lsblk_tells_each_disk_with_its_verdict_and_in_words_why_not(machine):
    expect.assertEqual(verdicts.disagreements(imported(machine)), [])


@case()
def an_import_finds_a_disk_with_two_paths_free_once_only_one_is_left(machine):
    def faults():
        return verdicts.faults(imported(machine)).get("TWO0000600")

    machine.unplug("twice_b")
    machine.eventually("it is free", lambda: faults() == [None])
    machine.plug("twice_b")
    machine.eventually("it is free no more", lambda: verdicts.disagreements(imported(machine)) == [])


@case()
def an_import_does_not_offer_a_disk_that_the_volume_manager_uses(machine):
    device = machine.device("hdd5")
    machine.check(f"pvcreate -q {device} && vgcreate -q import {device}")
    machine.eventually("it is not offered", lambda: [
        one for one in verdicts.disagreements(imported(machine)) if one.startswith("hdd5: DiskHasPartitions instead")])
    machine.check(f"vgremove -q import && pvremove -q {device}")
    machine.eventually("all is as before", lambda: verdicts.disagreements(imported(machine)) == [])
