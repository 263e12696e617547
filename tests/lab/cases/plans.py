"""Plans for the machine's disks: made on a twin of it, while nothing on the machine is touched."""

import agent
import disks
import handmade
from case import case, expect

WWID = {disk.name: disk.wwid for disk in disks.DISKS}
ADD_ALL = "plan add --all"


def planned(machine, change, where=f"--agent unix:{agent.SOCKET}"):
    return machine.check(f"kovactl {where} -o json {change}").json()


def written(machine):
    """Sectors that were written, by the kernel's name of each device."""
    lines = machine.check("cat /proc/diskstats").out.splitlines()
    return {line.split()[2]: line.split()[9] for line in lines}


def summary(results):
    """What decides about each disk, in order."""
    return [(result["disk"]["canonicalName"], result["state"], result.get("kovaUuid"), result["disk"].get("detail"),
             result.get("error", {}).get("@type")) for result in results]


def changes(plan):
    return [(group["change"], group["ssd"], sorted(group["capacity"])) for group in plan["groups"]]


@case()
def a_plan_is_made_of_free_disks_and_writes_to_none(machine):
    with agent.running(machine) as here:
        answers = here.disks()
        before = written(machine)
        plan = planned(machine, ADD_ALL)
        expect.assertEqual(planned(machine, ADD_ALL, "--host linux"), plan, "with an agent or without one")
        expect.assertEqual(written(machine), before)
        used = {name for group in plan["groups"] for name in (group["ssd"], *group["capacity"])}
        left = {one["disk"]: one["text"] for one in plan["leftOver"]}
        by_state = {state: {result["disk"]["canonicalName"] for result in answers if result["state"] == state}
                    for state in ("eligible", "ineligible")}
        expect.assertTrue(used)
        expect.assertLessEqual(used, by_state["eligible"])
        expect.assertEqual(used | set(left), by_state["eligible"] | by_state["ineligible"])
        for result in answers:
            if result["state"] == "ineligible":
                expect.assertEqual(left[result["disk"]["canonicalName"]], result["disk"]["detail"])
        expect.assertEqual(summary(here.disks()), summary(answers))


@case(full=True)
def a_plan_knows_a_group_and_the_disk_that_has_left_it(machine):
    with handmade.group(machine), agent.running(machine) as here:
        machine.unplug("hdd1")
        absent = "kova:" + handmade.MEMBERS["hdd1"]
        machine.eventually("hdd1 has left", lambda: absent in [one[0] for one in summary(here.disks())])
        plan = planned(machine, f"plan remove-group {WWID[handmade.CACHE]}")
        expect.assertEqual(changes(plan), [("removed", WWID[handmade.CACHE], sorted([WWID["hdd0"], absent]))])
        expect.assertEqual([group["mounted"] for group in here.groups()], [True], "it is all still there")
        machine.plug("hdd1")
        machine.eventually("hdd1 is back", lambda: absent not in [one[0] for one in summary(here.disks())])


@case(full=True)
def the_generation_is_another_one_while_something_has_changed(machine):
    with handmade.group(machine), agent.running(machine):
        def generation():
            return planned(machine, ADD_ALL)["generation"]

        first = generation()
        expect.assertEqual(generation(), first)
        machine.check("vgchange -q -a n lab")
        expect.assertNotEqual(generation(), first, "the group is not mounted")
        machine.check("vgchange -q -a y lab")
        expect.assertEqual(generation(), first, "it is again")
        machine.unplug("hdd5")
        machine.eventually("a disk has left", lambda: generation() != first)
        machine.plug("hdd5")
