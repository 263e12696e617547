#!/usr/bin/env python3
"""What goes into the image is found by what programs and modules need."""

import lzma
import os
import struct
import tempfile
import unittest

import image

LDD = """\tlinux-vdso.so.1 (0x00007ff72b027000)
\tlibc.so.6 => /lib/x86_64-linux-gnu/libc.so.6 (0x00007ff72a21e000)
\tlibnox.so.0 => /b/dev/lib/libnox.so.0 (0x00007ff72a6f5000)
\t/lib64/ld-linux-x86-64.so.2 (0x00007ff72b029000)
"""
MODULES_DEP = """kernel/drivers/scsi/virtio_scsi.ko: kernel/drivers/virtio/virtio.ko \
kernel/drivers/virtio/virtio_ring.ko
kernel/drivers/virtio/virtio.ko:
kernel/drivers/virtio/virtio_ring.ko:
kernel/drivers/md/dm-mod.ko:
kernel/drivers/block/other.ko:
"""


def packed_kernel(content, sectors=2):
    """A kernel as it is shipped, as far as its header tells where the rest is."""
    payload = lzma.compress(content)
    data = bytearray((sectors + 1) * 512 + 64)
    data[0x1F1] = sectors
    data[0x202:0x206] = b"HdrS"
    struct.pack_into("<II", data, 0x248, 64, len(payload) + 4)
    return bytes(data) + payload + struct.pack("<I", len(content))


class Images(unittest.TestCase):
    def test_hold_the_libraries_that_programs_name(self):
        self.assertEqual(list(image.libraries_of(LDD)),
                         ["/lib/x86_64-linux-gnu/libc.so.6", "/b/dev/lib/libnox.so.0"])

    def test_are_not_made_without_a_library(self):
        with self.assertRaisesRegex(image.Failed, "libgone.so.1"):
            list(image.libraries_of("\tlibgone.so.1 => not found\n"))

    def test_hold_modules_with_what_they_need(self):
        self.assertEqual(image.with_dependencies(["virtio-scsi", "dm_mod"], MODULES_DEP),
                         ["kernel/drivers/md/dm-mod.ko", "kernel/drivers/scsi/virtio_scsi.ko",
                          "kernel/drivers/virtio/virtio.ko", "kernel/drivers/virtio/virtio_ring.ko"])

    def test_are_not_made_without_a_module(self):
        with self.assertRaisesRegex(image.Failed, "no module ext4$"):
            image.with_dependencies(["ext4", "virtio"], MODULES_DEP)

    def test_have_one_place_for_programs(self):
        self.assertEqual([image.in_guest(path) for path in ("sbin/lvm", "usr/sbin/x", "etc/lvm/lvm.conf")],
                         ["usr/sbin/lvm", "usr/sbin/x", "etc/lvm/lvm.conf"])


class Files(unittest.TestCase):
    def setUp(self):
        self.folder = self.enterContext(tempfile.TemporaryDirectory())
        self.path = os.path.join(self.folder, "file")

    def write(self, content):
        with open(self.path, "wb") as file:
            file.write(content)
        return self.path

    def test_of_kernels_are_unpacked(self):
        content = os.urandom(5000)
        self.assertEqual(image.plain_kernel(self.write(packed_kernel(content))), content)

    def test_that_are_no_kernels_are_refused(self):
        with self.assertRaisesRegex(image.Failed, "is no kernel"):
            image.plain_kernel(self.write(b"\0" * 4096))

    def test_are_told_apart_by_their_content(self):
        before = image.digest([self.write(b"one")])
        self.assertEqual(image.digest([self.write(b"one")]), before)
        self.assertNotEqual(image.digest([self.write(b"two")]), before)

    def test_are_not_there_when_they_could_not_be_written_whole(self):
        def fail(out):
            out.write(b"half")
            raise ValueError
        with self.assertRaises(ValueError):
            image.write_whole(self.path, fail)
        self.assertFalse(os.path.exists(self.path))


if __name__ == "__main__":
    unittest.main()
