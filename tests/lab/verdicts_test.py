#!/usr/bin/env python3
"""What is said of the disks is held against what they are."""

import unittest

import disks
import verdicts


def result(disk, **more):
    """What should be said of a disk."""
    fault, words = verdicts.AGAINST.get(disk.name, (None, None))
    said = {"serialNumber": disk.serial, "ssd": not disk.rotational,
            "capacity": {"blockSize": 512, "block": disk.size // 512}}
    said |= {"detail": f"it is {words}, and more"} if fault else {}
    return {"disk": said | more} | ({"error": {"@type": fault}} if fault else {})


def results():
    return [result(disk) for disk in disks.DISKS for _ in disk.path_names()]


def of(serial, said):
    return next(one for one in said if one["disk"]["serialNumber"] == serial)


class Verdicts(unittest.TestCase):
    def test_agree_when_all_is_said_as_it_is(self):
        self.assertEqual(verdicts.disagreements(results()), [])
        self.assertEqual(verdicts.faults(results()), verdicts.expected_faults())

    def test_differ_by_a_disk_that_is_missing(self):
        said = results()
        said.remove(of("HDD0000200", said))
        self.assertEqual(verdicts.disagreements(said), ["hdd0: told of 0 times, has 1 paths"])

    def test_differ_by_a_path_that_is_missing(self):
        said = results()
        said.remove(of("TWO0000600", said))
        self.assertEqual(verdicts.disagreements(said), ["twice: told of 1 times, has 2 paths"])

    def test_differ_by_a_disk_too_many(self):
        said = [*results(), result(disks.Disk("more", disks.GIB, "MORE"))]
        self.assertEqual(verdicts.disagreements(said), ["MORE: not one of the machine's disks"])

    def test_differ_by_a_fault(self):
        said = results()
        del of("TNY0000400", said)["error"]
        self.assertEqual(len(verdicts.disagreements(said)), 1)
        self.assertIn("tiny: None instead of DiskTooSmall", verdicts.disagreements(said)[0])

    def test_differ_by_the_words(self):
        said = results()
        del of("USBSTICK0001", said)["disk"]["detail"]
        of("HDD0000200", said)["disk"]["detail"] = "a file system"
        self.assertEqual(verdicts.disagreements(said), ["hdd0: the detail is 'a file system', not ''",
                                                        "usb: the detail is '', not 'attached by USB'"])

    def test_differ_by_size_and_kind(self):
        said = results()
        of("SSD0000100", said)["disk"] |= {"ssd": False, "capacity": {"blockSize": 512, "block": 1}}
        self.assertEqual(verdicts.disagreements(said), ["flash0: 512 bytes instead of 2147483648",
                                                        "flash0: flash is False"])


class Devices(unittest.TestCase):
    def test_are_one_for_each_path(self):
        self.assertEqual(list(disks.devices()), [path for disk in disks.DISKS for path in disk.path_names()])

    def test_of_one_disk_share_a_file_that_neither_locks(self):
        twice = next(disk for disk in disks.DISKS if disk.name == "twice")
        nodes = disks.block_nodes(twice, "file")
        self.assertEqual([node["file"] for node in nodes],
                         [{"driver": "file", "filename": "file", "locking": "off"}] * 2)
        first, second = (disks.devices()[path] for path in twice.path_names())
        self.assertEqual((first["wwn"], first["serial"]), (second["wwn"], second["serial"]))
        self.assertNotEqual(first["bus"], second["bus"])
        self.assertTrue(first["share-rw"] and second["share-rw"])

    def test_of_other_disks_are_not_shared(self):
        nodes = disks.block_nodes(disks.DISKS[0], "file")
        self.assertEqual([node["file"]["locking"] for node in nodes], ["auto"])
        self.assertNotIn("share-rw", disks.devices()["flash0"])


if __name__ == "__main__":
    unittest.main()
