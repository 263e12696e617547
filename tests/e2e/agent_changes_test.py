#!/usr/bin/env python3
"""The agent's JSON routes that change disks: what they do, what they refuse, and in what order they work."""

import json
import os
import signal
import threading
import unittest

from programs import ProgramTest, disk

HOST = {"name": "a", "disks": [disk("naa.s1", True), disk("naa.h1"), disk("naa.h2"), disk("naa.s2", True),
                               disk("naa.h3"), disk("naa.h4"), disk("naa.parted", partitions=1)]}
SLOW_FORMAT = {"operation": "FormatDiskMapping", "call": 1, "delayMs": 3000}
ENDLESS_FORMAT = {**SLOW_FORMAT, "delayMs": 600_000}
LOST_UUID = "01234567-89ab-cdef-0123-456789abcdef"
# A group that is not mounted and whose capacity disk has left: to add its cache disk would end the plug-in.
BROKEN_GROUP = {**HOST, "disks": HOST["disks"] + [disk("naa.s3", True),
                                                  disk("naa.lost", absent=True, kovaUuid=LOST_UUID)],
                "groups": [{"ssd": "naa.s3", "capacity": ["naa.lost"], "mounted": False}]}


def names_of(mapping):
    return mapping["ssd"]["canonicalName"], [one["canonicalName"] for one in mapping.get("nonSsd", [])]


class ChangesTest(ProgramTest):
    def serve(self, host, *arguments):
        """The agent's process; a connection to it is in self.agent."""
        process = self.start_agent("--host", self.write("host.json", host), *arguments)
        self.agent = self.http()
        return process

    def done(self, operation, **parameters):
        """The result of a request that must succeed."""
        status, answer = self.agent.post(operation, **parameters)
        self.assertEqual((status, answer["fault"]), (200, None), answer)
        return answer["result"]

    def refused(self, status, kind, operation, **parameters):
        """The fault of a request that must fail."""
        got, answer = self.agent.post(operation, **parameters)
        self.assertEqual((got, answer["result"], answer["fault"]["@type"]), (status, None, kind), answer)
        return answer["fault"]

    def groups(self):
        """(cache disk, capacity disks, mounted) of each."""
        status, answer = self.agent.get("groups")
        self.assertEqual((status, answer["fault"]), (200, None), answer)
        return [(*names_of(group["mapping"]), group["mounted"])
                for group in answer["result"].get("diskMapInfo", [])]

    def host(self):
        return self.agent.get("host")[1]


class Changes(ChangesTest):
    def test_run_from_adding_disks_to_removing_them(self):
        self.serve(HOST)
        made = self.done("AddDisks", disks=["naa.s1", {"canonicalName": "naa.h1", "ssd": True}, "naa.h2"])
        self.assertEqual([names_of(one["mapping"]) for one in made], [("naa.s1", ["naa.h1", "naa.h2"])])
        self.assertEqual({one["state"] for one in made[0]["diskResult"]}, {"inUse"})
        group = {"ssd": "naa.s2", "nonSsd": ["naa.h3", "naa.h4"]}
        self.done("InitializeDisks", mappings=[group])
        self.assertEqual(self.groups(), [("naa.s1", ["naa.h1", "naa.h2"], True), ("naa.s2", ["naa.h3", "naa.h4"], True)])
        self.done("RemoveDisk", disk="naa.h2", passThrough="p", optionText="o", optionFirst=1, optionSecond=2)
        self.done("UnmountDiskMapping", mappings=[group])
        self.assertEqual(self.groups(), [("naa.s1", ["naa.h1"], True), ("naa.s2", ["naa.h3", "naa.h4"], False)])
        self.assertEqual(self.agent.post("GetStorageInfo")[1]["result"]["diskMapInfo"][1:], [],
                         "storage info knows the mounted ones only")
        self.assertEqual(self.agent.post("GetDiskGroups"), self.agent.get("groups"))
        self.assertIsNone(self.done("ClaimUnmountedDiskgroup"))
        self.assertEqual(self.groups()[1], ("naa.s2", ["naa.h3", "naa.h4"], True))
        self.done("RemoveDiskMapping", mapping=group)
        self.assertEqual(self.groups(), [("naa.s1", ["naa.h1"], True)])

    def test_add_everything_that_is_eligible_and_then_nothing(self):
        self.serve(HOST)
        made = self.done("AddAllEligibleDisks")
        self.assertEqual(sorted(names_of(one["mapping"])[0] for one in made), ["naa.s1", "naa.s2"])
        self.assertIsNone(self.done("AddAllEligibleDisks"), "neither result nor fault: there was nothing to do")

    def test_answer_with_result_and_fault_when_a_part_failed(self):
        self.serve(HOST)
        status, answer = self.agent.post("InitializeDisks", mappings=[
            {"ssd": "naa.s1", "nonSsd": ["naa.parted"]}, {"ssd": "naa.s2", "nonSsd": ["naa.h3"]}])
        self.assertEqual(status, 200)
        self.assertEqual(answer["fault"]["@type"], "DiskHasPartitions")
        self.assertEqual([one.get("error", {}).get("@type") for one in answer["result"]], ["DiskHasPartitions", None])
        self.assertEqual(self.groups(), [("naa.s2", ["naa.h3"], True)])

    def test_remove_a_disk_that_has_left_by_its_uuid(self):
        self.serve(HOST)
        self.done("AddDisks", disks=["naa.s1", "naa.h1", "naa.h2"])
        self.done("host", disk={"name": "naa.h2", "absent": True})
        ssd, capacity, _ = self.groups()[0]
        self.assertRegex(capacity[1], "^kova:[0-9a-f-]{36}$")
        self.done("UnmountDiskMapping", mappings=[{"ssd": ssd, "nonSsd": capacity}])
        self.done("RemoveDisk", disk=capacity[1])
        self.assertEqual(self.groups(), [("naa.s1", ["naa.h1"], False)])

    def test_of_a_simulated_host_are_seen_at_once(self):
        self.serve(HOST)
        self.assertEqual(self.host(), HOST)
        self.agent.get("disks")
        self.done("host", disk={"name": "naa.h1", "transport": "usb"}, set={"autoMode": True})
        states = {one["disk"]["canonicalName"]: one["state"] for one in self.agent.get("disks")[1]["result"]}
        self.assertEqual(states["naa.h1"], "ineligible")
        self.assertTrue(self.agent.get("groups")[1]["result"]["autoClaim"])

    def test_are_saved_and_found_by_the_next_agent(self):
        process = self.serve(HOST, "--save")
        self.done("AddDisks", disks=["naa.s1", "naa.h1"])
        before = self.host()
        self.assertEqual(self.stop(process), 0)
        self.assertEqual(json.loads(self.read("host.json")), before)
        self.serve(before, "--save")
        self.assertEqual(self.groups(), [("naa.s1", ["naa.h1"], True)])


class RefusedChanges(ChangesTest):
    def test_name_the_place_and_end_nobody(self):
        process = self.serve(BROKEN_GROUP)
        for operation, parameters, place in (
                ("AddDisks", {"disks": ["naa.s1", "naa.x"]}, "disks[1]"),
                ("AddDisks", {"disks": [""]}, "disks[0]"),
                ("AddDisks", {"disks": ["a\nb"]}, "disks[0]"),
                ("AddDisks", {"disks": [{}]}, "disks[0]"),
                ("AddDisks", {"disks": [{"ssd": True}]}, "disks[0]"),
                ("AddDisks", {"disks": ["naa.h1", "naa.s3"]}, "disks[1]"),
                ("AddDisks", {"disks": ["kova:" + LOST_UUID]}, "disks[0]"),
                ("InitializeDisks", {"mappings": [{"ssd": "naa.x", "nonSsd": ["naa.h1"]}]}, "mappings[0].ssd"),
                ("InitializeDisks", {"mappings": [{"ssd": "naa.s1", "nonSsd": ["naa.x"]}]}, "mappings[0].nonSsd[0]"),
                ("UnmountDiskMapping", {"mappings": [{"ssd": {}}]}, "mappings[0].ssd"),
                ("RemoveDisk", {"disk": ""}, "disk"),
                ("RemoveDisk", {"disk": "x" * 1025}, "disk"),
                ("RemoveDisk", {"disk": "naa.h1", "passThrough": "\u0001"}, "passThrough"),
                ("RemoveDiskMapping", {"mapping": {"ssd": ""}}, "mapping.ssd"),
                ("host", {"disk": {"name": "naa.x"}}, "disk.name"),
                ("host", {"set": {"colour": 1}}, "colour")):
            with self.subTest(operation=operation, parameters=parameters):
                fault = self.refused(400, "InvalidArgument", operation, **parameters)
                self.assertEqual(fault["argument"], place)
                self.assertTrue(fault["faultMessage"][0]["message"].startswith(place + ": "))
        self.assertIsNone(process.poll(), "the agent is the same process as before")
        self.assertEqual(self.host(), BROKEN_GROUP)

    def test_tell_which_member_of_a_broken_group_is_missing(self):
        self.serve(BROKEN_GROUP)
        fault = self.refused(400, "InvalidArgument", "AddDisks", disks=["naa.s3"])
        self.assertIn("kova:" + LOST_UUID, fault["faultMessage"][0]["message"])
        self.done("host", disk={"name": "naa.lost", "absent": False})
        self.done("AddDisks", disks=["naa.s3"])
        self.assertEqual(self.groups(), [("naa.s3", ["naa.lost"], True)])

    def test_of_what_the_plug_in_itself_refuses_are_faults_too(self):
        process = self.serve(HOST)
        self.done("AddDisks", disks=["naa.s1", "naa.h1"])
        self.refused(409, "DiskIsLastRemainingNonSSD", "RemoveDisk", disk="naa.h1")
        self.refused(400, "InvalidArgument", "RemoveDiskMapping", mapping={"ssd": "naa.s1", "nonSsd": ["naa.x"]})
        self.refused(400, "InvalidArgument", "RemoveDiskMapping", mapping={"ssd": "naa.s1"})
        status, answer = self.agent.post("UnmountDiskMapping", mappings=[{"ssd": "naa.x", "nonSsd": ["naa.y"]}])
        self.assertEqual((status, answer["result"][0]["error"]["@type"]), (200, "InvalidArgument"))
        status, answer = self.agent.post("AddDisks", disks=[])
        self.assertEqual((status, answer["result"], answer["fault"]["@type"]), (409, [], "InsufficientDisks"))
        for name in ("kova:", "kova:" + LOST_UUID, "KOVA:" + LOST_UUID, "kova:" + LOST_UUID + "0", "../x", "--x"):
            self.assertEqual(self.agent.post("RemoveDisk", disk=name)[0], 500, name)
        self.assertIsNone(process.poll())

    def test_that_cannot_be_read_are_told_so_in_words(self):
        self.serve(HOST)
        for operation, body, told in (("AddDisks", {}, "disks"), ("AddDisks", {"disk": []}, "takes disks, label, wait"),
                                      ("AddDisks", {"disks": [None]}, "disks[0]"), ("AddDisks", "{", ""),
                                      ("RemoveDisk", {"disk": "a", "optionFirst": 1 << 31}, "optionFirst")):
            status, answer = self.agent.ask("POST", "/api/v1/" + operation, body)
            self.assertEqual((status, answer["fault"]["@type"]), (400, "InvalidArgument"))
            self.assertIn(told, answer["fault"]["faultMessage"][0]["message"])
        self.assertEqual(self.agent.get("tasks"), (200, {"tasks": []}))


class Tasks(ChangesTest):
    def test_tell_what_became_of_each_change(self):
        self.serve(HOST)
        _, answer = self.agent.post("AddDisks", disks=["naa.s1", "naa.h1"], label="rack 3")
        self.agent.post("RemoveDisk", disk="naa.x")
        status, listed = self.agent.get("tasks")
        self.assertEqual(status, 200)
        first, second = listed["tasks"]
        self.assertEqual((first["id"], first["label"], first["operation"], first["state"], first["percent"]),
                         (answer["task"], "rack 3", "AddDisks", "done", 100))
        self.assertEqual((second["operation"], second["state"]), ("RemoveDisk", "failed"))
        self.assertEqual(second["fault"]["@type"], "SystemError")
        self.assertLessEqual(first["created"], first["started"])
        self.assertLessEqual(first["ended"], second["ended"])
        status, task = self.agent.get("tasks/" + first["id"])
        self.assertEqual((status, task["result"]), (200, answer["result"]))
        self.assertEqual(self.agent.get("tasks/task-1")[0], 404)

    def test_carry_their_id_down_to_the_kernel(self):
        self.serve(HOST, "--trace", self.path("trace"))
        _, answer = self.agent.post("AddDisks", disks=["naa.s1", "naa.h1"])
        calls = [json.loads(line) for line in self.read("trace").splitlines()]
        formats = [call["arguments"] for call in calls if call["operation"] == "FormatDiskMapping"]
        self.assertEqual(formats, [["naa.s1", ["naa.h1"], [answer["task"], 1, 0]]])

    def test_can_be_left_alone_and_looked_up(self):
        self.serve(HOST)
        status, task = self.agent.post("AddDisks", disks=["naa.s1", "naa.h1"], wait=False, label="mine")
        self.assertEqual((status, task["operation"], task["label"]), (202, "AddDisks", "mine"))
        self.agent.post("ClaimUnmountedDiskgroup")  # has its turn behind it
        self.assertEqual(self.agent.get("tasks/" + task["id"])[1]["state"], "done")
        self.assertEqual(self.groups(), [("naa.s1", ["naa.h1"], True)])

    def test_have_other_ids_after_a_restart(self):
        process = self.serve(HOST)
        first = self.agent.post("ClaimUnmountedDiskgroup")[1]["task"]
        self.stop(process)
        self.serve(HOST)
        self.assertNotEqual(self.agent.post("ClaimUnmountedDiskgroup")[1]["task"], first)

    def test_wait_in_a_queue_of_64_and_queries_pass_them_by(self):
        self.serve({**HOST, "faults": [ENDLESS_FORMAT]})
        self.agent.post("AddDisks", disks=["naa.s1", "naa.h1"], wait=False)
        while self.agent.get("tasks")[1]["tasks"][0]["state"] != "running":
            pass
        waiting = [self.agent.post("ClaimUnmountedDiskgroup", wait=False)[0] for _ in range(64)]
        self.assertEqual(waiting, [202] * 64)
        status, answer, headers = self.agent.ask_fully("POST", "/api/v1/ClaimUnmountedDiskgroup", {})
        self.assertEqual((status, answer["fault"]["@type"]), (503, "Busy"))
        self.assertEqual(headers["Retry-After"], str(answer["fault"]["retryAfterSeconds"]))
        status, answer = self.agent.get("disks")
        self.assertEqual((status, len(answer["result"])), (200, 7))
        states = [task["state"] for task in self.agent.get("tasks")[1]["tasks"]]
        self.assertEqual(states, ["running"] + ["waiting"] * 64, "all that was answered while the format ran")

    def test_of_clients_that_wait_use_up_no_worker_of_the_queries(self):
        self.serve({**HOST, "faults": [SLOW_FORMAT]})
        clients = [threading.Thread(target=self.http().post, args=("ClaimUnmountedDiskgroup",)) for _ in range(20)]
        self.agent.post("AddDisks", disks=["naa.s1", "naa.h1"], wait=False)
        for client in clients:
            client.start()
        while len(self.agent.get("tasks")[1]["tasks"]) < 21:
            pass
        self.assertEqual(self.agent.get("disks")[0], 200)
        self.assertEqual(self.agent.get("tasks")[1]["tasks"][0]["state"], "running", "and the format ran all the while")
        for client in clients:
            client.join()
        self.assertEqual({task["state"] for task in self.agent.get("tasks")[1]["tasks"]}, {"done"})


class Stopping(ChangesTest):
    def test_finishes_the_change_that_runs_and_refuses_those_that_wait(self):
        process = self.serve({**HOST, "faults": [SLOW_FORMAT]}, "--save")
        answers = {}

        def ask(name, operation, **parameters):
            answers[name] = self.http().post(operation, **parameters)

        slow = threading.Thread(target=ask, args=("slow", "AddDisks"), kwargs={"disks": ["naa.s1", "naa.h1"]})
        slow.start()
        while not any(task["state"] == "running" for task in self.agent.get("tasks")[1]["tasks"]):
            pass
        waiting = threading.Thread(target=ask, args=("waiting", "AddAllEligibleDisks"))
        waiting.start()
        while len(self.agent.get("tasks")[1]["tasks"]) < 2:
            pass
        left = self.agent.post("AddAllEligibleDisks", wait=False)[0]
        self.assertEqual(left, 202)
        process.send_signal(signal.SIGTERM)
        waiting.join()
        self.assertIsNone(process.poll(), "those that wait are told at once")
        slow.join()
        self.assertEqual(process.wait(), 0)
        self.assertEqual((answers["slow"][0], answers["slow"][1]["fault"]), (200, None))
        self.assertEqual((answers["waiting"][0], answers["waiting"][1]["fault"]["@type"]), (503, "Busy"))
        saved = json.loads(self.read("host.json"))["groups"]
        self.assertEqual([(group["ssd"], group["capacity"]) for group in saved], [("naa.s1", ["naa.h1"])])

    def test_finishes_a_change_that_nobody_waits_for(self):
        process = self.serve({**HOST, "faults": [SLOW_FORMAT]}, "--save")
        self.agent.post("AddDisks", disks=["naa.s1", "naa.h1"], wait=False)
        while self.agent.get("tasks")[1]["tasks"][0]["state"] != "running":
            pass
        os.kill(process.pid, signal.SIGTERM)
        os.kill(process.pid, signal.SIGTERM)
        self.assertEqual(process.wait(), 0)
        self.assertEqual(len(json.loads(self.read("host.json"))["groups"]), 1)


if __name__ == "__main__":
    unittest.main(verbosity=2)
