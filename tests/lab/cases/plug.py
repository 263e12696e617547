"""Disks that go and come while the machine runs."""

import disks
from case import case, expect


def serials(machine):
    return set(machine.kernel_names())


def unplug_and_plug(machine, path, serial):
    """The kernel sees both within seconds."""
    machine.unplug(path)
    machine.eventually(f"{path} is gone", lambda: serial not in serials(machine))
    machine.plug(path)
    machine.eventually(f"{path} is back", lambda: serial in serials(machine))


@case()
def a_disk_that_is_unplugged_is_gone_within_seconds_and_back_when_plugged(machine):
    unplug_and_plug(machine, "hdd3", "HDD0000203")


@case()
def a_usb_stick_goes_and_comes(machine):
    unplug_and_plug(machine, "usb", "USBSTICK0001")


@case()
def an_nvme_disk_goes_and_comes(machine):
    unplug_and_plug(machine, "nvme", "NVME0000500")


@case()
def a_disk_with_two_paths_stays_when_one_of_them_goes(machine):
    def paths():
        return len(machine.kernel_names().get("TWO0000600", []))

    machine.unplug("twice_b")
    machine.eventually("one path is left", lambda: paths() == 1)
    machine.plug("twice_b")
    machine.eventually("both paths are there", lambda: paths() == 2)


@case()
def what_is_on_a_disk_stays_while_it_is_unplugged(machine):
    device = machine.device("hdd4")
    machine.check(f"echo remember >/run/mark && dd if=/run/mark of={device} conv=fsync")
    unplug_and_plug(machine, "hdd4", "HDD0000204")
    device = machine.device("hdd4")
    expect.assertEqual(machine.check(f"dd if={device} bs=9 count=1").out, "remember\n")
    machine.check(f"dd if=/dev/zero of={device} bs=512 count=1 conv=fsync")


@case()
def after_all_this_every_disk_is_there(machine):
    expect.assertEqual(serials(machine), {disk.serial for disk in disks.DISKS})
