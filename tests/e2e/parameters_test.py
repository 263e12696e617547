#!/usr/bin/env python3
"""Every parameter of every operation left out, mistyped, empty and too large, as JSON and as SOAP.

Each such request is refused as the client's mistake; the agent stays alive and the host as it is.
"""

import unittest

from checked import CheckedTest
from host_states import QUERIES
from programs import disk
from soap_requests import ENVELOPE, WITHOUT_SOAP, element

HOST = {"name": "a", "groups": [{"ssd": "naa.s2", "capacity": ["naa.h3", "naa.h4"]}],
        "disks": [disk("naa.s1", True), disk("naa.h1"), disk("naa.s2", True), disk("naa.h3"), disk("naa.h4")]}
GROUP = {"ssd": "naa.s1", "nonSsd": ["naa.h1"]}  # to be made
MADE = {"ssd": "naa.s2", "nonSsd": ["naa.h3", "naa.h4"]}
REMOVAL = {"passThrough": "p", "optionText": "o", "optionFirst": 1, "optionSecond": 2}

# Each operation with all its parameters, such as would be taken.
REQUESTS = {
    "QueryDisksForKova": {"names": ["naa.s1"]}, "GetStorageInfo": {}, "GetDiskGroups": {}, "GetConfigInfo": {},
    "GetTwin": {},
    "AddDisks": {"disks": ["naa.s1", "naa.h1"], "label": "l"}, "AddAllEligibleDisks": {"label": "l"},
    "InitializeDisks": {"mappings": [GROUP], "label": "l"}, "UnmountDiskMapping": {"mappings": [MADE], "label": "l"},
    "RemoveDisk": {"disk": "naa.h3", **REMOVAL},
    "RemoveDiskMapping": {"mapping": MADE, **REMOVAL},
    "ClaimUnmountedDiskgroup": {},
}
REQUIRED = {"disks", "mappings", "mapping", "disk"}
KINDS = {"names": "names", "disks": "disks", "mappings": "mappings", "mapping": "mapping", "disk": "name",
         "passThrough": "option", "optionText": "option", "label": "label", "optionFirst": "number",
         "optionSecond": "number", "wait": "flag"}

NO_TEXTS = [None, 1, True, 1.5, [], {}, ["naa.1"], "a\nb", "\u0000", "\u007f"]
NO_NAMES = ["", "x" * 1025, "x" * (1 << 16), "a\nb", "\u001b"]
NO_DISKS = [None, 1, True, [], {}, {"canonicalName": None}, {"canonicalName": 1}, {"canonicalName": ["naa.s1"]},
            {"canonicalName": "naa.s1", "ssd": "true"}, {"canonicalName": "naa.s1", "capacity": 1},
            {"canonicalName": "naa.s1", "colour": "red"}, {"@type": "HostScsiLun", "canonicalName": "naa.s1"},
            {"@type": "KovaHostDiskMapping"}, *({"canonicalName": name} for name in NO_NAMES), *NO_NAMES]
NO_GROUPS = [None, 1, "naa.s1", [], {}, {"nonSsd": ["naa.h1"]}, {"ssd": "naa.s1", "nonSsd": "naa.h1"},
             {"ssd": "naa.s1", "nonSsd": None}, {"ssd": ["naa.s1"]}, {"ssd": "naa.s1", "colour": "red"},
             {"ssd": "naa.s1", "nonSsd": ["naa.h1"] * 1001}, {"@type": "HostScsiDisk", "ssd": "naa.s1"},
             *({"ssd": one, "nonSsd": ["naa.h1"]} for one in NO_DISKS),
             *({"ssd": "naa.s1", "nonSsd": ["naa.h1", one]} for one in NO_DISKS)]
NO_LISTS = [None, 1, True, {}, "naa.s1"]
WRONG = {
    "names": NO_LISTS + [[one] for one in [None, 1, {}, [], *NO_NAMES]] + [["naa.s1"] * 100_001],
    "disks": NO_LISTS + [["naa.h1", one] for one in NO_DISKS] + [["naa.h1"] * 100_001],
    "mappings": NO_LISTS + [[one] for one in NO_GROUPS] + [[GROUP] * 10_001],
    "mapping": NO_GROUPS, "name": NO_TEXTS + NO_NAMES, "option": NO_TEXTS + ["x" * 4097],
    "label": NO_TEXTS + ["x" * 257], "flag": [None, 1, "true", [], {}],
    "number": [None, "1", "", True, 1.5, 1 << 31, -(1 << 31) - 1, 1 << 64, [], {}],
}

# What stands in an element in SOAP in the place of what belongs there.
NO_TEXT_CONTENTS = ["<b/>", "a<!-- -->b", "&#10;", "x" * ((1 << 20) + 1)]
NO_DISK_CONTENTS = ["", "naa.s1", "<deviceName/>", "<canonicalName>naa.s1</canonicalName><canonicalName>naa.s2</canonicalName>"]
WRONG_CONTENTS = {
    "names": NO_TEXT_CONTENTS + ["", "x" * 1025], "disks": NO_DISK_CONTENTS,
    "mappings": NO_DISK_CONTENTS + [f"<ssd>{content}</ssd>" for content in NO_DISK_CONTENTS],
    "mapping": NO_DISK_CONTENTS + [f"<ssd>{content}</ssd>" for content in NO_DISK_CONTENTS],
    "name": NO_TEXT_CONTENTS + ["", "x" * 1025], "option": NO_TEXT_CONTENTS + ["x" * 4097],
    "label": NO_TEXT_CONTENTS + ["x" * 257], "number": ["", "a", "1.5", "2147483648", "-2147483649", "<b/>"],
}
LISTS = ("names", "disks", "mappings")


class WrongParameters(CheckedTest):
    def setUp(self):
        super().setUp()
        self.start(HOST)
        self.before = self.host()
        self.refused = 0

    def assert_refused(self, answer):
        self.assertEqual(answer.fault, "InvalidArgument", self.answer[:500])
        self.assert_alive()
        self.assertEqual(self.host(), self.before)
        self.refused += 1

    def test_are_refused_as_json(self):
        for operation, parameters in REQUESTS.items():
            changes = {} if operation in QUERIES else {"wait": True}
            for name in {**parameters, **changes}:
                for value in WRONG[KINDS[name]]:
                    with self.subTest(operation=operation, name=name, value=str(value)[:100]):
                        self.assert_refused(self.send(operation, {**parameters, name: value}, as_soap=False))
            for missing in REQUIRED & parameters.keys():
                with self.subTest(operation=operation, missing=missing):
                    rest = {name: value for name, value in parameters.items() if name != missing}
                    self.assert_refused(self.send(operation, rest, as_soap=False))
            with self.subTest(operation=operation):
                self.assert_refused(self.send(operation, {**parameters, "colour": "red"}, as_soap=False))
        self.assertGreater(self.refused, 400)

    def message(self, operation, parameters, name, contents):
        """The request with other contents of one element, which may be there more than once or not at all."""
        elements = [f"<{name}>{content}</{name}>" for content in contents]
        return ENVELOPE.format(operation, "".join(
            "".join(elements) if key == name else element(key, value) for key, value in parameters.items()))

    def post(self, operation, text):
        return self.sent(operation, "/soap", text, "text/xml", self.checker.soap)

    def test_are_refused_as_soap(self):
        for operation, parameters in REQUESTS.items():
            for name in parameters if operation not in WITHOUT_SOAP else ():
                messages = [[content] for content in WRONG_CONTENTS[KINDS[name]]]
                if name not in LISTS:
                    messages.append(["1", "1"])  # given twice
                if name in REQUIRED and name not in LISTS:
                    messages.append([])
                for contents in messages:
                    with self.subTest(operation=operation, name=name, contents=str(contents)[:100]):
                        text = self.message(operation, parameters, name, contents)
                        self.assert_refused(self.post(operation, text))
                with self.subTest(operation=operation, name=name):
                    text = self.message(operation, parameters, name, ["1"])
                    self.assert_refused(self.post(operation, text.replace(f"<{name}>", f'<{name} i:nil="true">')))
        self.assertGreater(self.refused, 90)

    def test_have_right_ones_that_are_taken(self):
        for operation, parameters in REQUESTS.items():
            for as_soap in (False, True):
                if as_soap and operation in WITHOUT_SOAP:
                    continue
                with self.subTest(operation=operation, as_soap=as_soap):
                    self.change_host({"set": {"groups": HOST["groups"], "disks": HOST["disks"]}})
                    before = self.host()
                    answer = self.send(operation, parameters, as_soap)
                    self.assertIsNone(answer.fault, self.answer)
                    unchanging = operation in QUERIES or operation == "ClaimUnmountedDiskgroup"
                    self.assertEqual(self.host() == before, unchanging)


if __name__ == "__main__":
    unittest.main(verbosity=2)
