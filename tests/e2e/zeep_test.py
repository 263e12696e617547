#!/usr/bin/env python3
"""A SOAP client that nobody here wrote, from the service's own description: the whole story of a host."""

import http.client
import os
import socket
import unittest

import requests
import requests.adapters
import urllib3
import zeep
import zeep.exceptions
import zeep.transports

from programs import ProgramTest, disk

FLASH, FLASH2, USB, PARTED = "naa.f1", "naa.f2", "naa.u1", "naa.p1"
HOST = {
    "name": "a", "faultDomain": "rack-1",
    "cluster": {"enabled": True, "clusterUuid": "c-1", "nodeUuid": "n-1"},
    "disks": [disk(FLASH, True), disk(FLASH2, True), *[disk(f"naa.c{i}") for i in range(1, 5)],
              disk(USB, transport="usb"), disk(PARTED, partitions=2)],
}


class UnixConnection(http.client.HTTPConnection):
    """HTTP over a socket file."""

    def __init__(self, path):
        super().__init__("localhost")
        self.path = path

    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
        self.sock.connect(self.path)


class UnixPool(urllib3.connectionpool.HTTPConnectionPool):
    def __init__(self, path):
        super().__init__("localhost")
        self.path = path

    def _new_conn(self):
        return UnixConnection(self.path)


class UnixAdapter(requests.adapters.HTTPAdapter):
    """Sends every request to one socket file."""

    def __init__(self, path):
        super().__init__()
        self.pool = UnixPool(path)

    def get_connection(self, url, proxies=None):
        return self.pool


class ZeepTest(ProgramTest):
    def connect(self, host):
        self.start_agent("--host", self.write("host.json", host))
        session = requests.Session()
        session.mount("http://", UnixAdapter(self.socket))
        self.client = zeep.Client("http://localhost/soap?wsdl", transport=zeep.transports.Transport(session=session))
        return self.client.service

    def fault_of(self, call, *arguments, **named):
        """The typed fault that the call ends in."""
        with self.assertRaises(zeep.exceptions.Fault) as caught:
            call(*arguments, **named)
        return self.client.wsdl.types.deserialize(caught.exception.detail[0])

    @staticmethod
    def type_of(value):
        return type(value).__name__

    def find(self, results, name):
        return next(result for result in results if result.disk.canonicalName == name)

    def groups(self):
        """Cache disk: capacity disks, of the mounted groups."""
        info = self.client.service.GetStorageInfo()["result"]
        return {mapping.ssd.canonicalName: [disk.canonicalName for disk in mapping.nonSsd]
                for mapping in info.diskMapping}


class Story(ZeepTest):
    def test_from_the_first_query_to_the_last_removal(self):
        service = self.connect(HOST)

        disks = service.QueryDisksForKova()["result"]
        self.assertEqual([result.disk.canonicalName for result in disks], [d["name"] for d in HOST["disks"]])
        self.assertEqual(self.find(disks, FLASH).state, "eligible")
        self.assertTrue(self.find(disks, FLASH).disk.ssd)
        self.assertEqual(self.type_of(self.find(disks, USB).error), "DiskIsUSB")
        self.assertEqual(self.find(disks, PARTED).error.device, PARTED)
        self.assertEqual([r.disk.canonicalName for r in service.QueryDisksForKova(names=[USB])["result"]], [USB])

        made = service.AddAllEligibleDisks(label="the first")
        self.assertIsNone(made["fault"])
        self.assertEqual([len(result.mapping.nonSsd) for result in made["result"]], [2, 2])
        self.assertEqual(self.groups(), {FLASH: ["naa.c1", "naa.c3"], FLASH2: ["naa.c2", "naa.c4"]})

        config = service.GetConfigInfo()["result"]
        self.assertEqual((config.clusterInfo.clusterUuid, config.faultDomainInfo.name), ("c-1", "rack-1"))

        mapping = made["result"][0].mapping
        unmounted = service.UnmountDiskMapping(mappings=[mapping])
        self.assertIsNone(unmounted["fault"])
        self.assertEqual(list(self.groups()), [FLASH2])
        service.ClaimUnmountedDiskgroup()
        self.assertEqual(list(self.groups()), [FLASH, FLASH2])

        service.RemoveDisk(disk="naa.c1")
        self.assertEqual(self.groups()[FLASH], ["naa.c3"])
        last = self.fault_of(service.RemoveDiskMapping, mapping=mapping)  # as it was before
        self.assertEqual(self.type_of(last), "InvalidArgument")
        mapping.nonSsd = mapping.nonSsd[1:]
        service.RemoveDiskMapping(mapping=mapping, passThrough="p", optionText="o", optionFirst=1, optionSecond=2)
        self.assertEqual(list(self.groups()), [FLASH2])

    def test_a_typed_fault(self):
        service = self.connect(HOST)
        disks = service.QueryDisksForKova()["result"]
        parted = {"ssd": self.find(disks, FLASH).disk, "nonSsd": [self.find(disks, PARTED).disk]}
        answer = service.InitializeDisks(mappings=[parted])
        self.assertEqual(self.type_of(answer["fault"]), "DiskHasPartitions")
        self.assertEqual(answer["result"][0].error.device, PARTED)
        with self.subTest("without a result"):
            fault = self.fault_of(service.InitializeDisks, mappings=[])
            self.assertEqual(self.type_of(fault), "InsufficientDisks")

    def test_a_part_that_fails_and_a_part_that_does_not(self):
        service = self.connect({**HOST, "faults": [
            {"operation": "FormatDiskMapping", "call": 2, "exception": "KovaStorageException", "disk": "naa.c2",
             "message": "it does not answer"}]})
        answer = service.AddAllEligibleDisks()
        self.assertEqual(self.type_of(answer["fault"]), "SystemError")
        self.assertEqual(answer["fault"].reason, "it does not answer")
        self.assertEqual([result.error is None for result in answer["result"]], [True, False])
        self.assertEqual(list(self.groups()), [FLASH])

    def test_a_disk_that_has_left(self):
        service = self.connect(HOST)
        service.AddAllEligibleDisks()
        self.assert_ended(self.ask_agent("sim", "set", "naa.c1", "--absent"), 0)
        disks = service.QueryDisksForKova()["result"]
        gone = next(result for result in disks if result.disk.canonicalName.startswith("kova:"))
        self.assertEqual((gone.state, gone.disk.operationalState), ("inUse", ["error"]))
        self.assertEqual(self.groups()[FLASH], [gone.disk.canonicalName, "naa.c3"])
        service.RemoveDisk(disk=gone.disk.canonicalName)
        self.assertEqual(self.groups()[FLASH], ["naa.c3"])

    def test_a_request_that_the_gate_refuses(self):
        service = self.connect(HOST)
        fault = self.fault_of(service.QueryDisksForKova, names=["naa.1\n"])
        self.assertEqual((self.type_of(fault), fault.argument), ("InvalidArgument", "names[0]"))
        self.assertEqual(self.type_of(self.fault_of(service.RemoveDisk, disk="naa.nothing")), "SystemError")


if __name__ == "__main__":
    unittest.main()
