#!/usr/bin/env python3
"""Replays of request logs through the plug-in, as someone who was sent a report runs them."""

import json
import unittest

from programs import ProgramTest, disk

THREE_DISKS = {"disks": [disk("naa.1", True), disk("naa.2"), disk("naa.3")]}
ADD = {"operation": "AddDisks", "disks": ["naa.1", "naa.2"], "requestTag": "t1"}
GROUP = {"ssd": "naa.1", "nonSsd": ["naa.2"]}
TWO_DISKS = {"disks": [disk("naa.1", True), disk("naa.2")]}
QUERY = {"operation": "QueryDisksForKova"}
REFRESH = {"operation": "RefreshKovaInfo", "arguments": [], "outcome": "ok"}
GET_ALL_GROUPS = {"operation": "GetDiskMappings", "arguments": [True], "outcome": "ok"}
GET_GROUPS = {"operation": "GetDiskMappings", "arguments": [False], "outcome": "ok"}
QUERY_DISKS = {"operation": "QueryDisks", "arguments": [[], True], "outcome": "ok"}


class Replay(ProgramTest):
    def replay(self, *lines, host=None, options=()):
        text = "".join((line if isinstance(line, str) else json.dumps(line)) + "\n" for line in lines)
        return self.kovactl("--host", self.write("host.json", host or TWO_DISKS), "replay",
                            self.write("log.jsonl", text), *options)

    def answers(self, *lines, **more):
        outcome = self.replay(*lines, **more)
        self.assert_ended(outcome, 0)
        found = outcome.lines()
        for answer in found:
            self.assertEqual(list(answer), ["operation", "fault", "result", "ended", "log", "calls"])
        return found

    @staticmethod
    def states(answer):
        return {result["disk"]["canonicalName"]: result["state"] for result in answer["result"]}

    def test_answers_each_line_with_one(self):
        found = self.answers(
            {"operation": "QueryDisksForKova", "names": ["naa.1"]},
            {"operation": "AddDisks", "disks": ["naa.1", {"@type": "HostScsiDisk", "canonicalName": "naa.2",
                                                          "ssd": True}], "requestTag": "t1"},
            {"operation": "InitializeDisks", "mappings": [{"ssd": "naa.1", "nonSsd": ["naa.2"]}],
             "requestTag": "t2"},
            {"operation": "RemoveDisk", "disk": "naa.2", "passThrough": "p", "optionText": "o", "optionFirst": 1,
             "optionSecond": 2},
            {"operation": "RemoveDiskMapping", "mapping": {"ssd": "naa.1", "nonSsd": ["naa.2"]},
             "passThrough": "", "optionText": "", "optionFirst": 0, "optionSecond": 0},
            {"operation": "UnmountDiskMapping", "mappings": [{"ssd": "naa.1", "nonSsd": ["naa.2"]}],
             "requestTag": "t3"},
            {"operation": "AddAllEligibleDisks", "requestTag": "t4"},
            {"operation": "GetStorageInfo"},
            {"operation": "GetConfigInfo"},
            {"operation": "ClaimUnmountedDiskgroup"},
            {"operation": "raw", "hook": "QueryDisksForKovaHookFn", "names": ["naa.2"]},
            {"operation": "host", "set": {"autoMode": True}, "disk": {"name": "naa.2", "absent": True}})
        self.assertEqual([answer["operation"] for answer in found],
                         ["QueryDisksForKova", "AddDisks", "InitializeDisks", "RemoveDisk", "RemoveDiskMapping",
                          "UnmountDiskMapping", "AddAllEligibleDisks", "GetStorageInfo", "GetConfigInfo",
                          "ClaimUnmountedDiskgroup", "raw", "host"])
        self.assertEqual([answer["ended"] for answer in found], [None] * 12)
        self.assertEqual(self.states(found[0]), {"naa.1": "eligible"})
        self.assertEqual(found[0]["calls"], [REFRESH, QUERY_DISKS])
        self.assertEqual(found[0]["log"], [{"level": 16, "format": "No fault. Operation completed successfully",
                                            "arguments": []}])
        self.assertEqual(list(self.states(found[10])), ["naa.2"])
        self.assertEqual(found[11], {"operation": "host", "fault": None, "result": None, "ended": None,
                                     "log": [], "calls": []})

    @staticmethod
    def call(operation, *arguments, outcome="ok"):
        return {"operation": operation, "arguments": list(arguments), "outcome": outcome}

    @staticmethod
    def groups(answer):
        """Names of each group of the result, and what kind of error it has."""
        return [([result["mapping"]["ssd"]["canonicalName"]]
                 + [one["canonicalName"] for one in result["mapping"]["nonSsd"]],
                 result.get("error", {}).get("@type")) for result in answer["result"]]

    def test_changes_the_host_from_line_to_line(self):
        added, made, removed, unmounted, claimed, gone, all_of_them, storage = self.answers(
            ADD,
            {"operation": "InitializeDisks", "mappings": [{"ssd": "naa.1", "nonSsd": ["naa.3"]}],
             "requestTag": "t2"},
            {"operation": "RemoveDisk", "disk": "naa.3", "passThrough": "p", "optionText": "o", "optionFirst": 1,
             "optionSecond": 2},
            {"operation": "UnmountDiskMapping", "mappings": [GROUP], "requestTag": "t3"},
            {"operation": "ClaimUnmountedDiskgroup"},
            {"operation": "RemoveDiskMapping", "mapping": GROUP, "passThrough": "p", "optionText": "o",
             "optionFirst": 3, "optionSecond": 4},
            {"operation": "AddAllEligibleDisks", "requestTag": "t4"},
            {"operation": "GetStorageInfo"}, host=THREE_DISKS)
        refresh = [REFRESH, QUERY_DISKS]
        self.assertEqual(self.groups(added), [(["naa.1", "naa.2"], None)])
        self.assertEqual(added["calls"], [*refresh, GET_ALL_GROUPS, GET_ALL_GROUPS,
                                          self.call("FormatDiskMapping", "naa.1", ["naa.2"], ["t1", 1, 0]), *refresh])
        self.assertEqual(self.groups(made), [(["naa.1", "naa.3"], None)])
        self.assertEqual(made["calls"],
                         [*refresh, self.call("FormatDiskMapping", "naa.1", ["naa.3"], ["t2", 1, 0]), *refresh])
        self.assertEqual((removed["fault"], removed["result"]), (None, None))
        self.assertEqual(removed["calls"], [*refresh, self.call("RemoveDisk", "naa.3", "p", ["o", 1, 2])])
        self.assertEqual(self.groups(unmounted), [(["naa.1", "naa.2"], None)])
        self.assertEqual(unmounted["calls"], [*refresh, GET_GROUPS, self.call("UnmountDiskMapping", "naa.1")])
        self.assertEqual(claimed["calls"], [self.call("ClaimUnmountedDiskgroups")])
        self.assertEqual(gone["calls"],
                         [*refresh, GET_GROUPS, self.call("RemoveDiskMapping", "naa.1", "p", ["o", 3, 4])])
        self.assertEqual(self.groups(all_of_them), [(["naa.1", "naa.2", "naa.3"], None)])
        self.assertEqual(len(storage["result"]["diskMapInfo"]), 1)

    def test_shows_faults_as_the_plug_in_gives_them(self):
        wanting, unknown, refused, partial = self.answers(
            {"operation": "AddDisks", "disks": ["naa.2"]},
            {"operation": "RemoveDiskMapping", "mapping": GROUP},
            {"operation": "RemoveDisk", "disk": "naa.9"},
            ADD, host={**TWO_DISKS, "faults": [{"operation": "FormatDiskMapping", "disk": "naa.2",
                                                "exception": "KovaExceptionHasPartition"}]})
        self.assertEqual((wanting["fault"]["@type"], wanting["result"]), ("InsufficientDisks", []))
        self.assertEqual((unknown["fault"]["@type"], unknown["result"]), ("InvalidArgument", None))
        self.assertEqual(unknown["fault"]["faultMessage"][0]["arg"][0]["value"]["@value"],
                         "SSD: naa.1, Disks: naa.2")
        self.assertEqual(refused["fault"]["@type"], "SystemError")
        self.assertEqual(partial["fault"], {"@type": "DiskHasPartitions", "device": "naa.2"})
        self.assertEqual(self.groups(partial), [(["naa.1", "naa.2"], "DiskHasPartitions")])

    def test_goes_on_after_an_exception_that_left_the_hook(self):
        boom = {"operation": "FormatDiskMapping", "call": 1, "exception": "std::runtime_error", "message": "boom"}
        found = self.answers(ADD, ADD, host={**TWO_DISKS, "faults": [boom]})
        self.assertEqual([answer["ended"] for answer in found], ["exception: std::runtime_error: boom", None])
        self.assertEqual((found[0]["fault"], found[0]["result"]), (None, None))
        self.assertEqual(found[0]["calls"][-1], self.call("FormatDiskMapping", "naa.1", ["naa.2"], ["t1", 1, 0],
                                                          outcome="std::runtime_error: boom"))
        self.assertEqual(found[0]["log"][-1]["format"], "Formatting KOVA disks")
        self.assertEqual(self.groups(found[1]), [(["naa.1", "naa.2"], None)])

    def assert_panics(self, request, told, host=None):
        """The request ends the process; its answer is the last."""
        outcome = self.replay(QUERY, request, QUERY, host=host)
        self.assert_ended(outcome, 70, told)
        found = outcome.lines()
        self.assertEqual(len(found), 2)
        self.assertEqual(found[1]["ended"], "panic: " + told)
        return found[1]

    def test_ends_over_a_raw_text_of_the_wrong_type(self):
        text = ('<object xmlns="urn:nox" xmlns:xsi="http://www.w3.org/2001/XMLSchema-instance" xsi:type="%s">'
                '</object>')
        self.assert_panics({"operation": "raw", "hook": "AddDisksHookFn", "texts": [text % "KovaFault"]},
                           "NOT_REACHED kova/agentd/KovaLibManager:1908")
        self.assert_panics({"operation": "raw", "hook": "InitializeDisksHookFn", "texts": [text % "KovaFault"]},
                           "NOT_REACHED kova/agentd/KovaLibManager:2070")
        self.assert_panics({"operation": "raw", "hook": "RemoveDiskMappingHookFn", "texts": [text % "KovaFault"]},
                           "NOT_REACHED kova/agentd/KovaLibManager:2280")
        self.assert_panics({"operation": "raw", "hook": "UnmountDiskMappingHookFn", "texts": [text % "KovaFault"]},
                           "NOT_REACHED kova/agentd/KovaLibManager:2549")
        answer = self.assert_panics({"operation": "raw", "hook": "AddDisksHookFn", "texts": ["<cut"]},
                                    "/, line 1: unclosed token")
        self.assertEqual((answer["operation"], answer["calls"], answer["log"]), ("raw", [], []))

    def test_ends_over_a_half_filled_request_with_what_came_about_before(self):
        answer = self.assert_panics({"operation": "AddDisks", "disks": [{"ssd": True}]}, "Not initialized")
        self.assertEqual((answer["fault"], answer["result"], answer["calls"]), (None, None, []))
        boom = {"operation": "RemoveDisk", "exception": "std::runtime_error", "message": "boom"}
        answer = self.assert_panics({"operation": "RemoveDisk", "disk": "naa.2"}, "boom",
                                    host={**TWO_DISKS, "faults": [boom]})
        self.assertEqual(answer["calls"],
                         [self.call("RemoveDisk", "naa.2", "", ["", 0, 0], outcome="std::runtime_error: boom")])

    def test_gives_the_same_answers_every_time(self):
        lines = (QUERY, {"operation": "host", "disk": {"name": "naa.2", "partitions": 1}}, QUERY)
        self.assertEqual(self.replay(*lines).out, self.replay(*lines).out)

    def test_shows_a_host_as_fresh_as_the_plug_ins_last_invalidation(self):
        change = {"operation": "host", "disk": {"name": "naa.2", "partitions": 1}}
        found = self.answers(change, QUERY)
        self.assertEqual(self.states(found[1]), {"naa.1": "eligible", "naa.2": "ineligible"})
        found = self.answers(QUERY, change, QUERY)
        self.assertEqual(self.states(found[2]), {"naa.1": "eligible", "naa.2": "eligible"})
        self.assertEqual(found[2]["calls"], [])
        found = self.answers(QUERY, change, {"operation": "GetStorageInfo"}, QUERY)
        self.assertEqual(self.states(found[3]), {"naa.1": "eligible", "naa.2": "ineligible"})
        self.assertEqual(found[3]["calls"], [REFRESH, QUERY_DISKS])

    def test_asks_again_after_a_refresh_that_failed(self):
        host = {**TWO_DISKS, "faults": [{"operation": "RefreshKovaInfo", "call": 1,
                                         "exception": "HostCtlException", "message": "asleep"}]}
        found = self.answers(QUERY, QUERY, host=host)
        self.assertEqual(found[0]["result"], [])
        self.assertEqual(found[0]["calls"], [{**REFRESH, "outcome": "HostCtlException: asleep"}])
        self.assertEqual(found[0]["log"][0], {"level": 4, "format": "Failed to refresh KOVA disk cache %1",
                                              "arguments": ["asleep"]})
        self.assertEqual(found[1]["calls"], [REFRESH, QUERY_DISKS])
        self.assertEqual(len(found[1]["result"]), 2)

    def test_ends_with_a_panic_as_its_last_answer(self):
        host = {**TWO_DISKS, "faults": [{"operation": "QueryDisks", "call": 1,
                                         "exception": "std::runtime_error", "message": "boom"}]}
        outcome = self.replay({"operation": "ClaimUnmountedDiskgroup"}, QUERY, QUERY, host=host)
        self.assert_ended(outcome, 70, "boom")
        found = outcome.lines()
        self.assertEqual(len(found), 2)
        self.assertEqual(found[1]["ended"], "panic: boom")
        self.assertEqual(found[1]["calls"], [REFRESH, {**QUERY_DISKS, "outcome": "std::runtime_error: boom"}])

    def test_shows_the_log_up_to_the_level_it_is_given(self):
        for level in ("error", "warning", "info", "8", "none", "0"):
            with self.subTest(level):
                self.assertEqual(self.answers(QUERY, options=("--log-level", level))[0]["log"], [])
        for level in ("verbose", "16", "trivia", "100"):
            with self.subTest(level):
                self.assertEqual(len(self.answers(QUERY, options=("--log-level", level))[0]["log"]), 1)
        host = self.write("host.json", TWO_DISKS)
        common = self.kovactl("--host", host, "--log-level", "error", "replay", "-", stdin=json.dumps(QUERY))
        self.assertEqual(common.lines()[0]["log"], [])

    def test_reads_standard_input(self):
        host = self.write("host.json", TWO_DISKS)
        outcome = self.kovactl("--host", host, "replay", "-", stdin=json.dumps(QUERY))
        self.assert_ended(outcome, 0)
        self.assertEqual(len(outcome.lines()), 1)

    def test_saves_changes_only_if_it_is_asked_to(self):
        change = {"operation": "host", "set": {"name": "renamed"}}
        self.answers(change)
        self.assertNotIn("renamed", self.read("host.json"))
        host, log = self.path("host.json"), self.path("log.jsonl")
        self.assert_ended(self.kovactl("--host", host, "--save", "replay", log), 0)
        self.assertEqual(json.loads(self.read("host.json"))["name"], "renamed")

    def test_refuses_a_bad_file_before_anything_runs(self):
        for told, line in {
                "line 2: ": "rubbish",
                "line 2: operation": {"operation": "Fly"},
                "line 2: disks[1].ssd": {"operation": "AddDisks", "disks": ["naa.1", {"ssd": 1}]},
                "line 2: hook": {"operation": "raw", "texts": []},
                "line 2: name": {"operation": "QueryDisksForKova", "name": "naa.1"},
        }.items():
            with self.subTest(told):
                outcome = self.replay(QUERY, line)
                self.assert_ended(outcome, 2, "log.jsonl, " + told)
                self.assertEqual(outcome.out, "")

    def test_refuses_a_host_that_cannot_be_where_it_would_come_about(self):
        for told, change in {"line 2: set.colour": {"set": {"colour": "red"}},
                             "line 2: disk": {"disk": {"name": "naa.9", "absent": True}}}.items():
            with self.subTest(told):
                outcome = self.replay(QUERY, {"operation": "host", **change}, QUERY)
                self.assert_ended(outcome, 2, "log.jsonl, line 2: ")
                self.assertEqual(len(outcome.lines()), 1)

    def test_needs_a_host_and_a_file(self):
        self.assert_ended(self.kovactl("replay", self.write("log.jsonl", "")), 2, "--host")
        host = self.write("host.json", TWO_DISKS)
        self.assert_ended(self.kovactl("--host", host, "replay", self.path("none.jsonl")), 2, "none.jsonl")
        self.assert_ended(self.kovactl("--host", host, "replay", self.folder), 2, self.folder)
        self.assert_ended(self.kovactl("--host", host, "replay"), 2)


if __name__ == "__main__":
    unittest.main(verbosity=2)
