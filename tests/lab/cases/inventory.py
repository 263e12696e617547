"""The agent on this machine's own disks."""

import agent
import disks
import verdicts
from case import case, expect


@case()
def the_agent_tells_each_disk_with_its_verdict_and_in_words_why_not(machine):
    with agent.running(machine) as told:
        expect.assertEqual(verdicts.disagreements(told.disks()), [])


@case()
def the_agent_calls_disks_by_their_world_wide_names(machine):
    with agent.running(machine) as told:
        names = {result["disk"]["canonicalName"] for result in told.disks()}
    expect.assertEqual({disk.wwid for disk in disks.DISKS if disk.wwid} - names, set())


@case()
def a_disk_that_goes_and_comes_is_told_of_within_seconds(machine):
    with agent.running(machine) as told:
        machine.unplug("hdd3")
        machine.eventually("hdd3 is gone", lambda: "HDD0000203" not in verdicts.by_serial(told.disks()))
        machine.plug("hdd3")
        machine.eventually("hdd3 is back, and free",
                           lambda: verdicts.faults(told.disks()).get("HDD0000203") == [None])


@case()
def a_disk_with_two_paths_is_free_once_only_one_is_left(machine):
    with agent.running(machine) as told:
        machine.unplug("twice_b")
        machine.eventually("it is free", lambda: verdicts.faults(told.disks()).get("TWO0000600") == [None])
        machine.plug("twice_b")
        machine.eventually("it is free no more",
                           lambda: verdicts.disagreements(told.disks()) == [])


@case()
def the_agent_and_lsblk_agree_on_size_kind_and_transport(machine):
    with agent.running(machine) as told:
        results = verdicts.by_serial(told.disks())
    for device in machine.check("lsblk --json -O -b -d").json()["blockdevices"]:
        for result in results[device["serial"]]:
            disk = result["disk"]
            expect.assertEqual((disk["capacity"]["blockSize"] * disk["capacity"]["block"], disk["ssd"]),
                               (device["size"], not device["rota"]), device["serial"])
            if device["tran"]:
                expect.assertEqual(disk.get("transport"), device["tran"], device["serial"])


@case()
def an_import_of_this_machine_gives_the_verdicts_of_its_agent(machine):
    with agent.running(machine) as told:
        live = verdicts.faults(told.disks())
    machine.check("lsblk --json -O -b | kovactl host import - --write /run/imported.json")
    imported = machine.check("kovactl --host /run/imported.json disks -o json").json()
    expect.assertEqual(verdicts.faults(imported), live)
