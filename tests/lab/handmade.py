"""A disk group made by hand with the volume manager, with the marks by which the agent knows it.

    with handmade.group(machine):
        ...                            # mounted: each capacity disk has a volume, and all are active

However a case ends, the disks are there and empty again afterwards."""

import contextlib

import disks

GROUP = "lab"  # as the volume manager calls it


def uuid(number):
    return f"6b6f7661-0000-4000-8000-{number:012d}"


UUID = uuid(0)
CACHE = "flash0"
MEMBERS = {CACHE: uuid(1), "hdd0": uuid(2), "hdd1": uuid(3)}  # the cache disk first


def nodes(machine, names):
    """Device files, by the names of disks."""
    by_serial = machine.kernel_names()
    return {disk.name: "/dev/" + sorted(by_serial[disk.serial])[0] for disk in disks.DISKS if disk.name in names}


def tag(change, *tags):
    return " ".join(f"--{change}tag {one}" for one in tags)


def member_tags(number, kova_uuid, role="capacity"):
    return tag("add", f"kova.disk={kova_uuid}", f"kova.role={role}", f"kova.place={number}")


def commands(device):
    """What makes the group of MEMBERS, with these device files."""
    yield "set -e"
    yield f"pvcreate -q -y {' '.join(device.values())}"
    tags = tag("add", "kova", f"kova.group={UUID}", "kova.machine=$(cat /etc/machine-id)", "kova.state=ready",
               "kova.created=$(date +%s)")
    yield f"vgcreate -q {tags} {GROUP} {' '.join(device[name] for name in MEMBERS)}"
    for number, (name, kova_uuid) in enumerate(MEMBERS.items()):
        if name == CACHE:
            yield f"pvchange -q {member_tags(0, kova_uuid, 'cache')} {device[name]}"
        else:
            yield f"pvchange -q {member_tags(number - 1, kova_uuid)} {device[name]}"
            yield (f"lvcreate -q -y -n data{number - 1} {tag('add', f'kova.disk={kova_uuid}')} --type cache "
                   f"--cachedevice {device[CACHE]} --cachesize 64m -l 16 {GROUP} {device[name]}")


@contextlib.contextmanager
def group(machine, others=()):
    """The group of MEMBERS; `others` are disks that the case uses besides."""
    names = {*MEMBERS, *others}
    try:
        machine.check("\n".join(commands(nodes(machine, MEMBERS))))
        yield
    finally:
        machine.plug_all()
        clear(machine, names)


def clear(machine, names):
    """Empties disks, whatever stands on them; what was mapped to a disk that went away is mapped no more."""
    devices = nodes(machine, names)
    machine.check(f"""vgchange -q -a n {GROUP} >/dev/null 2>&1
        dmsetup ls | while read -r name _; do dmsetup remove --retry "$name"; done 2>/dev/null
        wipefs -q -a {' '.join(devices.values())} && udevadm settle --timeout=30""")
