#!/usr/bin/env python3
"""Records, from a running guest, what unit tests read in place of a kernel and of the volume manager.

    record.py WORK BUILD OUT    writes OUT/*.tree, OUT/lvm-*.json and OUT/lvm-*.stderr
"""

import os
import sys
import tarfile
import tempfile

import guest
import recording

# What the volume manager is asked for; one report of each kind per state.
REPORT = "{command} --reportformat json --units b --nosuffix -o {fields}"
REPORTS = {"pvs": ("pvs", "+all"), "vgs": ("vgs", "+all"), "lvs": ("lvs", "+all,seg_all"),
           "lvs-all": ("lvs -a", "+all,seg_all")}
GROUP = "lab"


def here(name):
    with open(os.path.join(os.path.dirname(os.path.abspath(__file__)), name), encoding="utf-8") as file:
        return file.read()


def record_tree(machine, out, name, title):
    print(machine.check(f"set -- /host/{name}.tar\n{here('record.sh')}", limit=120).err, end="")
    with tempfile.TemporaryDirectory() as folder:
        with tarfile.open(os.path.join(machine.folder, name + ".tar")) as archive:
            archive.extractall(folder)
        recording.write(folder, title, os.path.join(out, name + ".tree"))


def record_reports(machine, out, state):
    """What each report says on stdout and on stderr; nothing on stderr makes an empty file."""
    for name, (command, fields) in REPORTS.items():
        outcome = machine.check(REPORT.format(command=command, fields=fields))
        for suffix, text in (("json", outcome.out), ("stderr", outcome.err)):
            with open(os.path.join(out, f"lvm-{state}-{name}.{suffix}"), "w", encoding="utf-8") as file:
                file.write(text)


def make_group(machine):
    """One flash disk and two hard disks: each hard disk has a volume of its own, cached on a slice of the flash."""
    flash, first, second = (machine.device(name) for name in ("flash0", "hdd0", "hdd1"))
    machine.check(f"pvcreate -q {flash} {first} {second}")
    machine.check(f"vgcreate -q --addtag kova --addtag kova.state=ready {GROUP} {flash} {first} {second}")
    for number, disk in enumerate((flash, first, second)):
        machine.check(f"pvchange -q --addtag kova.disk=52d6f2a0-0000-4000-8000-00000000000{number} {disk}")
    for number, disk in enumerate((first, second)):
        machine.check(f"lvcreate -q -y -l 100%PVS -n data{number} {GROUP} {disk}")
        machine.check(f"lvcreate -q -y -L 256m -n cache{number} {GROUP} {flash}")
        machine.check(f"lvconvert -q -y --type cache --cachevol cache{number} --cachemode writethrough "
                      f"{GROUP}/data{number}", limit=120)


def use_more(machine):
    """Disks in use in every other way: file systems on a disk, a partition, a volume; swap, an array, a loop."""
    for device, place in ((machine.device("hdd2"), "a b"), (machine.device("parted") + "1", "part"),
                          (f"/dev/{GROUP}/data0", "data")):
        machine.check(f"mkfs.ext4 -q {device} && mkdir -p '/mnt/{place}' && mount {device} '/mnt/{place}'")
    machine.check(f"mkswap {machine.device('tiny')} && swapon {machine.device('tiny')}")
    machine.check(f"mdadm --create /dev/md0 --run --metadata=1.2 --level=1 --raid-devices=2 --assume-clean "
                  f"{machine.device('hdd3')} {machine.device('hdd4')}")
    machine.check("modprobe loop && truncate -s 16M /run/backing && losetup -f /run/backing")
    settle(machine)


def settle(machine):
    machine.check("udevadm settle --timeout=30")


def record_in_use(machine, out):
    record_tree(machine, out, "lab", "Disks that nobody uses: five of flash, thirteen hard disks of which one has two "
                                     "paths and one a partition, USB, NVMe.")
    make_group(machine)
    record_reports(machine, out, "tagged")
    use_more(machine)
    record_tree(machine, out, "lab-used", "The same disks, most in use: a volume group, file systems, swap, an array.")


def record_loss(machine, out):
    """One disk of the group goes, is given up, and comes back."""
    machine.unplug("hdd1")
    settle(machine)
    record_reports(machine, out, "missing")
    record_tree(machine, out, "lab-missing", "The same in use, after one disk of the volume group was unplugged.")
    machine.check(f"umount /mnt/data && vgchange -q -an {GROUP}")
    machine.check(f"vgreduce -y --removemissing --force {GROUP}", limit=120)
    machine.plug("hdd1")
    machine.eventually("the disk is back", lambda: "HDD0000201" in machine.kernel_names())
    settle(machine)
    record_reports(machine, out, "outdated")
    machine.check(f"vgck --updatemetadata {GROUP}")
    record_reports(machine, out, "updated")


def record_duplicates(machine, out):
    """A group on a disk that is seen by two paths, which the manager hides; then a copy, which it tells of."""
    twice = machine.device("twice")
    machine.check(f"vgcreate -q -y --addtag kova two {twice}")
    settle(machine)
    record_reports(machine, out, "two-paths")
    machine.check(f"dd if={machine.device('hdd1')} of={machine.device('hdd5')} bs=1M count=4 conv=fsync")
    settle(machine)
    record_reports(machine, out, "copied")


def main(work, build, out):
    os.makedirs(out, exist_ok=True)
    with guest.boot(work, build) as machine:
        record_in_use(machine, out)
        record_loss(machine, out)
        record_duplicates(machine, out)


if __name__ == "__main__":
    main(*sys.argv[1:])
