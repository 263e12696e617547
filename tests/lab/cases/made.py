"""Disk groups that the agent makes, used as an operator and an administrator of file systems use them."""

import real
from case import case, expect
from real import WWID

SPARE = [f"flash{i}" for i in range(2, 5)] + [f"hdd{i}" for i in range(4, 10)]


class Transcript:
    """What kovactl was told, and what it said."""

    def __init__(self, here):
        self._here = here
        self.text = ""

    def run(self, arguments):
        out = self._here.run(arguments)
        self.text += f"$ kovactl {arguments}\n{out}\n"
        return out


def mounted(groups):
    return [group[0] for group in real.shown(groups)]


def unused(answers):
    return [name for name, (state, _) in real.states(answers).items() if state == "eligible"]


@case(full=True)
def what_is_written_to_a_group_is_there_after_it_was_unmounted_and_after_a_restart(machine):
    for path in SPARE:
        machine.unplug(path)
    with real.groups(machine) as here:
        transcript = Transcript(here)
        transcript.run("disks")
        transcript.run("add --all --yes")
        transcript.run("disks")
        transcript.run("groups")
        before = real.shown(here.groups())
        expect.assertTrue(before and all(mounted(here.groups())), before)
        expect.assertEqual(unused(here.disks()), [])
        paths = real.volumes(machine, here)
        expect.assertEqual(set(paths), {name for _, names in before for name in names[1:]})
        data = real.Data(machine, paths)
        data.unmount()
        transcript.run("unmount --yes " + " ".join(WWID[names[0]] for _, names in before))
        transcript.run("groups")
        expect.assertEqual(real.shown(here.groups()), [(False, names) for _, names in before])
        transcript.run("claim")
        transcript.run("groups")
        expect.assertEqual(real.shown(here.groups()), before)
        verify(data, real.volumes(machine, here))
        machine.save("kovactl.txt", transcript.text)
        restarted(machine, data, before)


def verify(data, paths):
    data.mount(paths)
    expect.assertEqual([name for name in paths if not data.is_whole(name)], [])
    data.unmount()


def restarted(machine, data, before):
    machine.restart()
    with real.agent.running(machine) as here:
        expect.assertEqual(real.shown(here.groups()), [(False, names) for _, names in before])
        here.run("claim")
        expect.assertEqual(real.shown(here.groups()), before)
        verify(data, real.volumes(machine, here))


def make_group(machine, here):
    """One of a cache disk and two capacity disks, with data."""
    here.run(f"init --yes --ssd {WWID['flash0']} --disk {WWID['hdd0']} {WWID['hdd1']}")
    expect.assertEqual(real.shown(here.groups()), [(True, ["flash0", "hdd0", "hdd1"])])
    return real.Data(machine, real.volumes(machine, here))


def comes_back(machine, here, name):
    machine.plug(name)
    machine.eventually(f"{name} is back in its group", limit=60, probe=lambda: [
        names for _, names in real.shown(here.groups())] == [["flash0", "hdd0", "hdd1"]])


def leaves(machine, here, name):
    """Told by its UUID from then on."""
    uuid = {real.name_of(answer["disk"]): answer.get("kovaUuid") for answer in here.disks()}[name]
    machine.unplug(name)
    machine.eventually(f"{name} is told by its UUID", lambda: "kova:" + uuid in real.states(here.disks()), limit=60)


def takes_back(machine, here, data):
    """A group that is whole again comes back into use, with all that was written. Its volumes still lead to the disk
    that went away, so it is not mounted, and cannot be as long as somebody uses them."""
    expect.assertEqual(mounted(here.groups()), [False])
    expect.assertNotEqual(machine.run(real.agent.command("claim")).status, 0)
    data.unmount()
    here.run("claim")
    expect.assertEqual(real.shown(here.groups()), [(True, ["flash0", "hdd0", "hdd1"])])
    verify(data, real.volumes(machine, here))


@case(full=True)
def the_other_disks_of_a_group_work_on_when_a_capacity_disk_leaves_and_it_comes_back_whole(machine):
    with real.groups(machine) as here:
        data = make_group(machine, here)
        leaves(machine, here, "hdd1")
        expect.assertTrue(data.is_whole("hdd0"))
        machine.check("echo more >/mnt/hdd0/more && sync -f /mnt/hdd0/more")
        expect.assertEqual(unused(here.disks()).count("hdd0"), 0)
        comes_back(machine, here, "hdd1")
        takes_back(machine, here, data)


@case(full=True)
def what_was_written_to_a_group_is_whole_after_its_cache_disk_has_left_and_come_back(machine):
    with real.groups(machine) as here:
        data = make_group(machine, here)
        leaves(machine, here, "flash0")
        told = real.states(here.disks())
        expect.assertNotIn("eligible", [told[name][0] for name in ("hdd0", "hdd1")])
        comes_back(machine, here, "flash0")
        takes_back(machine, here, data)


# Microseconds: when the change began and ended, then when each question did that was asked meanwhile.
ASK_MEANWHILE = """
now() { echo "${EPOCHREALTIME/./}"; }
began=$(now)
%s >/run/change.out 2>&1 &
change=$!
while kill -0 $change 2>/dev/null; do
  asked=$(now)
  %s >/run/question.out || exit 9
  echo "$asked $(now)" >>/run/questions
done
wait $change || { cat /run/change.out >&2; exit 8; }
echo "$began $(now)"
cat /run/questions; rm /run/questions
"""


@case(full=True)
def questions_are_answered_while_a_group_is_made(machine):
    with real.groups(machine) as here:
        capacity = " ".join(WWID[f"hdd{number}"] for number in range(7))
        change = real.agent.command(f"init --yes --ssd {WWID['flash0']} --disk {capacity}")
        out = machine.check(ASK_MEANWHILE % (change, real.agent.command("disks")), limit=580).out
        (began, ended), *questions = (tuple(map(int, line.split())) for line in out.splitlines())
        meanwhile = [answered - asked for asked, answered in questions if answered < ended]
        print(f"        the change took {(ended - began) / 1e6:.1f} s; {len(meanwhile)} questions were answered "
              f"meanwhile, the slowest after {max(meanwhile, default=0) / 1e6:.1f} s", flush=True)
        expect.assertGreater(len(meanwhile), 1)
        expect.assertEqual(real.shown(here.groups()), [(True, ["flash0", *(f"hdd{i}" for i in range(7))])])
