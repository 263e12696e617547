"""The machine itself: what the other cases stand on."""

import disks
from case import case, expect


def wanted(field):
    """By serial number, what each disk should be."""
    return {disk.serial: field(disk) for disk in disks.DISKS}


@case()
def the_kernel_shows_each_disk_by_each_of_its_paths(machine):
    names = machine.kernel_names()
    expect.assertEqual({serial: len(same) for serial, same in names.items()},
                       wanted(lambda disk: len(disk.path_names())))


@case()
def the_kernel_tells_disks_by_world_wide_names(machine):
    lines = machine.run("cd /sys/block; grep -s . */wwid */device/wwid").out.splitlines()
    told = {line.split("/")[0]: line.partition(":")[2] for line in lines}
    expect.assertEqual({serial: told.get(names[0]) for serial, names in machine.kernel_names().items()},
                       wanted(lambda disk: disk.wwid))


@case()
def lsblk_shows_the_disks_as_they_were_made(machine):
    text = machine.check("lsblk --json -O -b").out
    machine.save("lsblk.json", text)
    shown = {}
    for device in machine.check("lsblk --json -O -b -d").json()["blockdevices"]:
        shown[device["serial"]] = {key: device[key] for key in ("size", "rota", "tran", "pttype")}
    expect.assertEqual(shown, wanted(lambda disk: {
        "size": disk.size, "rota": disk.rotational, "tran": disk.transport, "pttype": "gpt" if disk.table else None}))


@case()
def the_partition_is_shown_with_its_disk(machine):
    parted = machine.check(f"lsblk --json -b {machine.device('parted')}").json()["blockdevices"]
    expect.assertEqual([child["type"] for child in parted[0]["children"]], ["part"])


@case()
def the_programs_run_here(machine):
    for program in ("agentd", "kovactl"):
        expect.assertRegex(machine.check(program + " --version").out, f"^{program} [0-9]")


@case()
def the_plug_in_is_loaded_here(machine):
    host = '{"name": "h", "disks": [{"name": "naa.1", "ssd": true, "bytes": 4294967296}]}'
    machine.check(f"echo '{host}' >/run/h.json")
    disks_shown = machine.check("kovactl --host /run/h.json disks -o json").json()
    expect.assertEqual([result["disk"]["canonicalName"] for result in disks_shown], ["naa.1"])
