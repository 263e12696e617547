"""The disks of the lab's machine: what each is, and how the emulator is told of it.

A path is a way on which the kernel sees a disk; all have one, but the disk that is there to be seen twice. Paths are
what can be unplugged and plugged, by name. The data of a disk stays when its paths are gone."""

from dataclasses import dataclass

MIB = 1 << 20
GIB = 1 << 30


@dataclass(frozen=True)
class Disk:
    name: str
    size: int  # bytes
    serial: str
    kind: str = "hdd"  # flash, hdd, usb, nvme
    wwn: int = 0  # of SCSI disks
    product: str = ""
    table: str = ""  # for sfdisk: the partitions it comes with
    paths: tuple = ()  # names of its paths, if they are not one of the disk's name

    @property
    def rotational(self):
        return self.kind in ("hdd", "usb")

    @property
    def transport(self):
        """As lsblk names it."""
        return self.kind if self.kind in ("usb", "nvme") else None

    def path_names(self):
        return self.paths or (self.name,)

    @property
    def wwid(self):
        """What the kernel calls it; nothing for a USB stick."""
        if self.kind == "nvme":
            return "-".join(("nvme.1b36", self.serial.encode().hex(), b"QEMU NVMe Ctrl".hex(), "00000001"))
        return f"naa.{self.wwn:016x}" if self.wwn else None


def scsi(name, size, serial, number, product, **more):
    return Disk(name, size, serial, wwn=0x5000C50000000000 + number, product=product, **more)


DISKS = (
    scsi("flash0", 2 * GIB, "SSD0000100", 0x100, "FAST SSD 2G", kind="flash"),
    scsi("flash1", 2 * GIB, "SSD0000101", 0x101, "FAST SSD 2G", kind="flash"),
    *(scsi(f"hdd{i}", 4 * GIB, f"HDD000020{i}", 0x200 + i, "SLOW HDD 4G") for i in range(6)),
    scsi("parted", GIB, "GPT0000300", 0x300, "PARTED HDD", table="label: gpt\n,\n"),
    scsi("tiny", 64 * MIB, "TNY0000400", 0x400, "TINY"),
    scsi("twice", 2 * GIB, "TWO0000600", 0x600, "SEEN TWICE", paths=("twice_a", "twice_b")),
    Disk("usb", GIB, "USBSTICK0001", kind="usb"),
    Disk("nvme", 2 * GIB, "NVME0000500", kind="nvme"),
    *(scsi(f"flash{i}", 2 * GIB, f"SSD000010{i}", 0x100 + i, "FAST SSD 2G", kind="flash") for i in range(2, 5)),
    *(scsi(f"hdd{i}", 2 * GIB, f"HDD000020{i}", 0x200 + i, "SLOW HDD 2G") for i in range(6, 10)),
)

CONTROLLERS = (
    {"driver": "virtio-scsi-pci", "id": "scsi0"},
    {"driver": "virtio-scsi-pci", "id": "scsi1"},
    {"driver": "qemu-xhci", "id": "xhci"},
)


def block_nodes(disk, file):
    """The data of a disk, once for each of its paths: the emulator's -blockdev."""
    shared = len(disk.path_names()) > 1
    return [{"driver": "raw", "node-name": "node_" + path, "discard": "unmap", "cache": {"no-flush": True},
             "file": {"driver": "file", "filename": file, "locking": "off" if shared else "auto"}}
            for path in disk.path_names()]


def devices(disks=DISKS):
    """By the name of a path, what is plugged in: the emulator's -device."""
    found = {}
    for number, disk in enumerate(disks):
        for controller, path in enumerate(disk.path_names()):
            device = {"id": path, "drive": "node_" + path}
            if len(disk.path_names()) > 1:
                device["share-rw"] = True
            found[path] = device | of_kind(disk, number, controller)
    return found


def of_kind(disk, number, controller):
    if disk.kind == "usb":
        return {"driver": "usb-storage", "bus": "xhci.0", "serial": disk.serial}
    if disk.kind == "nvme":
        return {"driver": "nvme", "serial": disk.serial}
    return {"driver": "scsi-hd", "bus": f"scsi{controller}.0", "scsi-id": number, "lun": 0, "wwn": disk.wwn,
            "rotation_rate": 7200 if disk.rotational else 1, "serial": disk.serial, "vendor": "LAB",
            "product": disk.product}
