#!/usr/bin/env python3
"""A SOAP client that nobody here wrote, from the service's own description: the whole story of a host."""

import unittest

import requests
import zeep
import zeep.exceptions
import zeep.transports

from doors import FLASH, FLASH2, HALF_FAILS, HOST, PARTED, USB, DoorsTest


class ZeepTest(DoorsTest):
    def connect(self, wsdl, **session):
        """The service at the address that its description has."""
        settings = requests.Session()
        self.addCleanup(settings.close)
        settings.trust_env = False  # whatever this machine asks by or trusts
        for name, value in session.items():
            setattr(settings, name, value)
        self.client = zeep.Client(wsdl, transport=zeep.transports.Transport(session=settings))
        return self.client.service

    def fault_of(self, call, *arguments, **named):
        """The typed fault that the call ends in."""
        with self.assertRaises(zeep.exceptions.Fault) as caught:
            call(*arguments, **named)
        self.fault_text = caught.exception.message
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
        self.tell(self.connect(self.through_a_bridge(HOST)))

    def test_over_tls_from_the_first_query_to_the_last_removal(self):
        self.tell(self.connect(self.over_tls(HOST), verify=self.path("ca.pem"),
                               cert=(self.path("client.pem"), self.path("client.key"))))

    def test_over_tcp_where_clients_may_read(self):
        service = self.connect(self.over_tcp(HOST))
        self.assertEqual(len(service.QueryDisksForKova()["result"]), len(HOST["disks"]))
        fault = self.fault_of(service.ClaimUnmountedDiskgroup)
        self.assertEqual((self.type_of(fault), fault.role), ("NotPermitted", "change"))

    def tell(self, service):
        disks = service.QueryDisksForKova()["result"]
        self.assertEqual([result.disk.canonicalName for result in disks], [d["name"] for d in HOST["disks"]])
        self.assertEqual(self.find(disks, FLASH).state, "eligible")
        self.assertTrue(self.find(disks, FLASH).disk.ssd)
        self.assertEqual(self.type_of(self.find(disks, USB).error), "DiskIsUSB")
        self.assertEqual(self.find(disks, PARTED).error.device, PARTED)
        self.assertEqual([r.disk.canonicalName for r in service.QueryDisksForKova(names=[USB])["result"]], [USB])

        made = service.AddAllEligibleDisks(label="the first")
        self.assertIsNone(made["fault"])
        self.assertTrue(made["task"])
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

        service.AddDisks(disks=[{"canonicalName": FLASH}, {"canonicalName": "naa.c1"}])
        self.assertEqual(self.groups()[FLASH], ["naa.c1"])

    def test_a_typed_fault(self):
        service = self.connect(self.through_a_bridge(HOST))
        disks = service.QueryDisksForKova()["result"]
        parted = {"ssd": self.find(disks, FLASH).disk, "nonSsd": [self.find(disks, PARTED).disk]}
        answer = service.InitializeDisks(mappings=[parted])
        self.assertEqual(self.type_of(answer["fault"]), "DiskHasPartitions")
        self.assertEqual(answer["result"][0].error.device, PARTED)
        with self.subTest("without a result"):
            fault = self.fault_of(service.InitializeDisks, mappings=[])
            self.assertEqual(self.type_of(fault), "InsufficientDisks")
            self.assertIn("too few disks for a disk group", self.fault_text)
        with self.subTest("that names the disk and the reason"):
            fault = self.fault_of(service.AddDisks, disks=[{"canonicalName": PARTED}, {"canonicalName": "naa.c1"}])
            self.assertEqual(self.type_of(fault), "InsufficientDisks")
            self.assertIn(f"too few disks for a disk group; {PARTED}: holds partitions or is in use by others",
                          self.fault_text)

    def test_a_part_that_fails_and_a_part_that_does_not(self):
        service = self.connect(self.through_a_bridge(HALF_FAILS))
        answer = service.AddAllEligibleDisks()
        self.assertEqual(self.type_of(answer["fault"]), "SystemError")
        self.assertEqual(answer["fault"].reason, "it does not answer")
        self.assertEqual([result.error is None for result in answer["result"]], [True, False])
        self.assertEqual(list(self.groups()), [FLASH])

    def test_a_disk_that_has_left(self):
        service = self.connect(self.through_a_bridge(HOST))
        service.AddAllEligibleDisks()
        self.assert_ended(self.ask_agent("sim", "set", "naa.c1", "--absent"), 0)
        disks = service.QueryDisksForKova()["result"]
        gone = next(result for result in disks if result.disk.canonicalName.startswith("kova:"))
        self.assertEqual((gone.state, gone.disk.operationalState), ("inUse", ["error"]))
        self.assertEqual(self.groups()[FLASH], [gone.disk.canonicalName, "naa.c3"])
        service.RemoveDisk(disk=gone.disk.canonicalName)
        self.assertEqual(self.groups()[FLASH], ["naa.c3"])

    def test_a_request_that_the_gate_refuses(self):
        service = self.connect(self.through_a_bridge(HOST))
        fault = self.fault_of(service.QueryDisksForKova, names=["naa.1\n"])
        self.assertEqual((self.type_of(fault), fault.argument), ("InvalidArgument", "names[0]"))
        self.assertEqual(self.type_of(self.fault_of(service.RemoveDisk, disk="naa.nothing")), "SystemError")


if __name__ == "__main__":
    unittest.main()
