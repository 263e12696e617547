"""Disk groups that the agent has made on the disks of the machine, and the data on them.

    with real.groups(machine) as here:
        here.run("add --yes ...")

However a case ends, the machine is on, and its disks are there and empty again."""

import contextlib

import agent
import disks
import handmade

NAMES = {disk.wwid: disk.name for disk in disks.DISKS if disk.wwid}
WWID = {name: wwid for wwid, name in NAMES.items()}
FREE = [*(f"flash{i}" for i in range(5)), *(f"hdd{i}" for i in range(10)), "nvme"]


def shown(groups):
    """What is told of groups: (mounted, names of its disks, the cache disk first), one for each."""
    return sorted((one["mounted"], [name_of(disk) for disk in (one["mapping"]["ssd"], *one["mapping"]["nonSsd"])])
                  for one in groups)


def name_of(disk):
    return NAMES.get(disk["canonicalName"], disk["canonicalName"])


def states(answers):
    """(state, detail) by the names of disks."""
    return {name_of(answer["disk"]): (answer["state"], answer["disk"].get("detail", "")) for answer in answers}


def clear(machine):
    """Empties all disks that can be a group's, whatever stands on them."""
    nodes = " ".join(handmade.nodes(machine, FREE).values())
    machine.check(f"""
        cat /proc/self/mounts | while read -r device place _; do
          case $device in /dev/mapper/kova_*|/dev/kova_*) umount "$place";; esac
        done
        dmsetup remove_all >/dev/null 2>&1
        if [ "$(dmsetup ls)" != "No devices found" ]; then dmsetup remove_all --force; fi >/dev/null 2>&1
        rm -rf /run/lvm/hints /var/lib/kova/*
        used=$(wipefs -i -n -O DEVICE {nodes} | sort -u)
        if [ -n "$used" ]; then cd /dev && wipefs -q -a -f $used; fi
        udevadm settle --timeout=30""", limit=120)


@contextlib.contextmanager
def groups(machine):
    """An agent on disks of which none is in a group."""
    try:
        with agent.running(machine) as here:
            yield here
    finally:
        if not machine.answers:
            machine.cut()
            machine.start()
        machine.plug_all()
        clear(machine)


def volumes(machine, here):
    """Device files of the data volumes, by the names of the disks that they lie on."""
    tags = {f"kova.disk={answer['kovaUuid']}": name_of(answer["disk"])
            for answer in here.disks() if answer.get("kovaUuid")}
    report = machine.check("lvm lvs --reportformat json -o lv_path,lv_tags 2>/dev/null").json()["report"][0]["lv"]
    return {tags[tag]: row["lv_path"] for row in report for tag in row["lv_tags"].split(",") if tag in tags}


class Data:
    """A file system on each of some volumes, with a file of known content."""

    FILE = "known.bin"

    def __init__(self, machine, paths):
        self._machine = machine
        self._sums = {}
        for name, path in paths.items():
            machine.check(f"mkfs.ext4 -q {path} && mkdir -p /mnt/{name} && mount {path} /mnt/{name}")
        self._mounted = list(paths)
        for name in paths:
            self._sums[name] = machine.check(
                f"dd if=/dev/urandom of=/mnt/{name}/{self.FILE} bs=64k count=64 conv=fsync 2>/dev/null && "
                f"sync -f /mnt/{name} && md5sum </mnt/{name}/{self.FILE}").out

    def unmount(self):
        """A file system whose disk has gone lets itself be unmounted too."""
        for name in self._mounted:
            self._machine.check(f"umount /mnt/{name}")
        self._mounted = []

    def mount(self, paths):
        for name, path in paths.items():
            self._machine.check(f"modprobe ext4; mkdir -p /mnt/{name} && mount {path} /mnt/{name}")
            self._mounted.append(name)

    def is_whole(self, name):
        """Read from the disk, not from memory."""
        told = self._machine.run(f"echo 3 >/proc/sys/vm/drop_caches; md5sum </mnt/{name}/{self.FILE}")
        return told.status == 0 and told.out == self._sums[name]
