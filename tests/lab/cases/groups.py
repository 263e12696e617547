"""Disk groups, and what else stands on disks, as the agent tells of them."""

import contextlib

import agent
import disks
import handmade
import verdicts
from case import case, expect

WWID = {disk.name: disk.wwid for disk in disks.DISKS}


def told(answers):
    """(state, KOVA UUID, detail) by the name of a disk; those that have left by the name they are told by."""
    names = {disk.serial: disk.name for disk in disks.DISKS}
    return {names.get(result["disk"].get("serialNumber"), result["disk"]["canonicalName"]):
            (result["state"], result.get("kovaUuid", ""), result["disk"].get("detail", "")) for result in answers}


def states(answers, names):
    found = told(answers)
    return [found[name][0] for name in names]


def group_of(*capacity):
    """The group made by hand, as `groups` tells of it."""
    return [WWID[handmade.CACHE], *capacity]


def shown(groups):
    """(mounted, canonical names of its disks) of each group."""
    return [(one["mounted"], [disk["canonicalName"] for disk in (one["mapping"]["ssd"], *one["mapping"]["nonSsd"])])
            for one in groups]


WHOLE = group_of(WWID["hdd0"], WWID["hdd1"])


@case()
def a_group_is_shown_mounted_as_long_as_its_volumes_are_active(machine):
    with handmade.group(machine), agent.running(machine) as here:
        expect.assertEqual(shown(here.groups()), [(True, WHOLE)])
        answers = told(here.disks())
        expect.assertEqual({name: answers[name] for name in handmade.MEMBERS},
                           {name: ("inUse", uuid, "") for name, uuid in handmade.MEMBERS.items()})
        machine.check("vgchange -q -a n lab")
        expect.assertEqual(shown(here.groups()), [(False, WHOLE)])
        words = f"member of disk group {handmade.UUID}, which is not mounted"
        answers = told(here.disks())
        expect.assertEqual({name: answers[name] for name in handmade.MEMBERS},
                           {name: ("ineligible", uuid, words) for name, uuid in handmade.MEMBERS.items()})


@case()
def the_data_volume_of_each_capacity_disk_is_shown_as_large_as_it_is(machine):
    with handmade.group(machine), agent.running(machine) as here:
        volumes = here.groups()[0]["volume"]
        expect.assertEqual([one["disk"] for one in volumes], [WWID["hdd0"], WWID["hdd1"]])
        for one in volumes:
            expect.assertEqual(one["bytes"], int(machine.check(f"blockdev --getsize64 {one['path']}").out))
            expect.assertTrue(one["cacheState"])
        table = machine.check(f"kovactl --agent unix:{agent.SOCKET} groups").out
        for one in volumes:
            expect.assertIn(one["path"], table)


@case(full=True)
def a_capacity_disk_that_has_left_is_told_by_its_uuid_until_it_is_back(machine):
    absent = "kova:" + handmade.MEMBERS["hdd1"]
    with handmade.group(machine), agent.running(machine) as here:
        machine.unplug("hdd1")
        machine.eventually("hdd1 is told by its UUID", lambda: absent in told(here.disks()))
        expect.assertEqual(shown(here.groups()), [(True, group_of(WWID["hdd0"], absent))])
        expect.assertNotIn("hdd1", told(here.disks()))
        machine.plug("hdd1")
        machine.eventually("hdd1 is back", lambda: "hdd1" in told(here.disks()))
        # Its volume is mapped to the disk that went away until the group is claimed.
        machine.eventually("the group is whole", lambda: shown(here.groups()) == [(False, WHOLE)])
        machine.check("kovactl --agent unix:/run/agentd.sock claim")
        expect.assertEqual(shown(here.groups()), [(True, WHOLE)])
        answers = told(here.disks())
        expect.assertEqual(answers["hdd1"], ("inUse", handmade.MEMBERS["hdd1"], ""))
        expect.assertNotIn(absent, answers)
        machine.check("dd if=/dev/lab/data1 of=/dev/null bs=1M count=1")


@case(full=True)
def a_cache_disk_that_has_left_is_told_by_its_uuid(machine):
    absent = "kova:" + handmade.MEMBERS[handmade.CACHE]
    with handmade.group(machine), agent.running(machine) as here:
        machine.unplug(handmade.CACHE)
        machine.eventually("it is told by its UUID", lambda: absent in told(here.disks()))
        expect.assertEqual([names for _, names in shown(here.groups())], [[absent, WWID["hdd0"], WWID["hdd1"]]])
        expect.assertNotIn("eligible", states(here.disks(), ("hdd0", "hdd1")))


@case(full=True)
def a_disk_that_its_group_has_given_up_is_not_offered_when_it_comes_back(machine):
    with handmade.group(machine), agent.running(machine) as here:
        machine.check("vgchange -q -a n lab")
        machine.unplug("hdd1")
        machine.eventually("hdd1 is gone", lambda: "hdd1" not in told(here.disks()))
        machine.check("vgreduce -q -f --removemissing lab 2>/dev/null")
        expect.assertEqual([names for _, names in shown(here.groups())], [group_of(WWID["hdd0"])])
        machine.plug("hdd1")
        machine.eventually("hdd1 is back", lambda: "hdd1" in told(here.disks()))
        state, _, detail = told(here.disks())["hdd1"]
        expect.assertEqual((state, detail),
                           ("ineligible", "LVM physical volume that its volume group no longer knows, or hides"))


@contextlib.contextmanager
def retagged(machine, before, after):
    machine.check(f"vgchange -q {handmade.tag('del', before)} {handmade.tag('add', after)} lab")
    yield
    machine.check(f"vgchange -q {handmade.tag('del', after)} {handmade.tag('add', before)} lab")


def none_is_offered(here, words):
    """The members are told of in these words, and none is offered or shown as a group."""
    expect.assertEqual(shown(here.groups()), [])
    answers = told(here.disks())
    for name in handmade.MEMBERS:
        state, uuid, detail = answers[name]
        expect.assertEqual((state, uuid), ("ineligible", ""), f"{name}: {detail}")
        expect.assertIn(f"member of disk group {handmade.UUID}, {words}", detail)


@case(full=True)
def what_has_the_marks_and_is_no_group_of_this_machine_is_told_and_not_offered(machine):
    with handmade.group(machine, others=("usb",)), agent.running(machine) as here:
        with retagged(machine, "kova.state=ready", "kova.state=creating"):
            none_is_offered(here, "which was never finished")
        with retagged(machine, "kova.machine=$(cat /etc/machine-id)", "kova.machine=another"):
            none_is_offered(here, "of another machine")
        expect.assertEqual(shown(here.groups()), [(True, WHOLE)])
        usb = handmade.nodes(machine, ("usb",))["usb"]
        machine.check(f"pvcreate -q -y {usb} && vgextend -q lab {usb} && "
                      f"pvchange -q {handmade.member_tags(2, handmade.uuid(4))} {usb}")
        none_is_offered(here, f"of which {usb.removeprefix('/dev/')} is not attached to this machine as its own")
        state, _, detail = told(here.disks())["usb"]
        expect.assertEqual(state, "ineligible")
        expect.assertIn("attached by USB", detail)


@case()
def what_stands_on_a_disk_is_told_by_the_next_query(machine):
    names = ("hdd2", "hdd3", "hdd4", "hdd5")
    device = handmade.nodes(machine, names)
    try:
        with agent.running(machine) as here:
            expect.assertEqual(states(here.disks(), names), ["eligible"] * 4)
            machine.check(f"mkfs.ext4 -q -L DATA {device['hdd2']} && mkswap -q {device['hdd3']} && "
                          "mdadm -q --create /dev/md7 --homehost lab --run -l 1 -n 2 "
                          f"{device['hdd4']} missing </dev/null && "
                          f"mkfs.ext4 -q {device['hdd5']} && mkdir -p /mnt/whole && "
                          f"mount {device['hdd5']} /mnt/whole")
            answers = told(here.disks())
            expect.assertEqual({name: answers[name][2] for name in names}, {
                "hdd2": 'ext4 file system "DATA"', "hdd3": "swap space",
                "hdd4": 'member of a RAID array (linux_raid_member) "lab:7", held by md7 (RAID)',
                "hdd5": "ext4 file system, mounted at /mnt/whole"})
            expect.assertEqual(states(here.disks(), names), ["ineligible"] * 4)
            machine.check(f"mdadm -q --stop /dev/md7 && swapon {device['hdd3']} && umount /mnt/whole")
            answers = told(here.disks())
            expect.assertEqual({name: answers[name][2] for name in names[1:]}, {
                "hdd3": "swap space, mounted at [SWAP]", "hdd4": 'member of a RAID array (linux_raid_member) "lab:7"',
                "hdd5": "ext4 file system"})
    finally:
        machine.run(f"swapoff {device['hdd3']}; umount /mnt/whole; mdadm -q --stop /dev/md7")
        handmade.clear(machine, names)


@case()
def a_disk_that_something_keeps_for_itself_is_told_to_be_held(machine):
    device = handmade.nodes(machine, ("hdd2", "hdd3"))
    try:
        with agent.running(machine) as here:
            machine.check(f"dmsetup create keeper --table '0 8192 linear {device['hdd2']} 0'")
            # Mounted where the agent cannot see it, and then without a trace on the disk.
            machine.check(f"modprobe ext4 && mkfs.ext4 -q {device['hdd3']} && mkdir -p /mnt/hidden && "
                          f"(unshare -m sh -c 'mount {device['hdd3']} /mnt/hidden && "
                          f"wipefs -q -a -f {device['hdd3']} && touch /run/hidden && "
                          "exec sleep 1000' >/dev/null 2>&1 & echo $! >/run/hidden.pid)")
            machine.eventually("it is mounted", lambda: machine.run("test -e /run/hidden").status == 0)
            answers = told(here.disks())
            expect.assertEqual({name: answers[name] for name in device}, {
                "hdd2": ("ineligible", "", "held by keeper (device-mapper)"),
                "hdd3": ("ineligible", "", "held by another program")})
    finally:
        machine.run("kill $(cat /run/hidden.pid); rm -f /run/hidden")
        machine.eventually("it is free for others", lambda: machine.run(
            f"dmsetup remove keeper; wipefs -q -a {device['hdd2']} {device['hdd3']}").status == 0)


@case()
def after_all_this_every_free_disk_is_free_again(machine):
    with agent.running(machine) as here:
        machine.eventually("all is as it was", lambda: verdicts.disagreements(here.disks()) == [], limit=10)
        expect.assertEqual(here.groups(), [])
