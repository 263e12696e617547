"""The machine and a simulated twin of it: the same requests have the same results, faults and end states on both."""

import contextlib
import json
import os
import random
import re

import agent
import disks
import real
from case import case, expect

WWID = {disk.name: disk.wwid for disk in disks.DISKS}
FLASH = ("flash0", "flash1")
CAPACITY = ("hdd0", "hdd1", "hdd2", "hdd3")
UNFIT = ("parted", "tiny")
TWIN = "/run/twin.sock"
UUID = re.compile(r"[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}")
# What only a real kernel tells, and the words of whoever refuses.
OF_ONE_SIDE = {"volume", "deviceName", "generation", "msg", "message", "localizedMessage", "faultMessage", "reason", "task"}

# What a bash can ask without a program; the answer is told without the lines before it.
TAKE_TWIN = """
exec 4<>/dev/tcp/%s/%s
printf 'POST /api/v1/GetTwin HTTP/1.1\\r\\nHost: %s\\r\\nContent-Type: application/json\\r\\n' >&4
printf 'Content-Length: 2\\r\\nConnection: close\\r\\n\\r\\n{}' >&4
mapfile -t answer <&4
printf '%%s' "${answer[-1]}"
""" % (*agent.ADDRESS.split(":"), agent.ADDRESS)


def plain(value):
    """Without what may differ: UUIDs, words."""
    if isinstance(value, dict):
        return {key: plain(one) for key, one in value.items() if key not in OF_ONE_SIDE}
    if isinstance(value, list):
        return [plain(one) for one in value]
    return UUID.sub("UUID", value) if isinstance(value, str) else value


class Side:
    """One of the two, asked in the same words."""

    def __init__(self, machine, socket):
        self._machine = machine
        self._socket = socket

    def do(self, words):
        """(status, result) without what may differ."""
        outcome = self._machine.run(f"kovactl --agent unix:{self._socket} -o json {words} --yes", limit=240)
        return outcome.status, plain(json.loads(outcome.out)) if outcome.out.strip().startswith(("{", "[")) else ""

    def ask(self, what):
        return plain(self._machine.check(f"kovactl --agent unix:{self._socket} -o json {what}").json())

    def state(self):
        return {"disks": [(one["disk"]["canonicalName"], one["state"], one.get("error", {}).get("@type"))
                          for one in self.ask("disks")],
                "groups": self.ask("groups")}


def twin_of(machine):
    """The description of a simulated host that is like the machine now."""
    answer = json.loads(machine.check(TAKE_TWIN).out)
    return answer["result"]["description"]


def request(dice):
    """A random request, in words for kovactl; most name disks that may be used."""
    def some(names, count):
        return dice.sample(names, min(count, len(names)))

    any_disk = [*FLASH, *CAPACITY, dice.choice(UNFIT)]
    kind = dice.choice(("init", "init", "add", "add", "remove", "remove-group", "unmount", "claim"))
    if kind == "init":
        capacity = some([*CAPACITY, dice.choice(any_disk)], dice.randint(1, 2))
        return "init --ssd " + WWID[dice.choice(FLASH)] + "".join(" --disk " + WWID[name] for name in capacity)
    if kind == "add":
        return "add " + " ".join(WWID[name] for name in some(any_disk, dice.randint(1, 3)))
    if kind == "claim":
        return "claim"
    return kind + " " + WWID[dice.choice(FLASH if kind != "remove" else any_disk)]


@contextlib.contextmanager
def twin_running(machine):
    """A second agent, with a simulated host that is like the machine now."""
    with open(os.path.join(machine.folder, "twin.json"), "w", encoding="utf-8") as file:
        file.write(twin_of(machine))
    machine.check(f"rm -f /run/twin.ready; setsid agentd --host /host/twin.json --listen unix:{TWIN} "
                  "--ready-file /run/twin.ready </dev/null >/run/twin.log 2>&1 & echo $! >/run/twin.pid")
    try:
        machine.eventually("the twin's agent answers", lambda: machine.run("test -s /run/twin.ready").status == 0)
        yield
    finally:
        machine.run("kill $(cat /run/twin.pid)")


def run_sequence(machine, seed, length):
    """Random requests, one after the other, to both sides."""
    dice = random.Random(seed)
    with real.groups(machine), twin_running(machine):
        mine, twin = Side(machine, agent.SOCKET), Side(machine, TWIN)
        said = []
        for _ in range(length):
            words = request(dice)
            said.append(words)
            where = f"seed {seed}: " + "; ".join(said)
            expect.assertEqual(mine.do(words), twin.do(words), where)
            expect.assertEqual(mine.state(), twin.state(), where)


@case()
def the_same_requests_have_the_same_results_as_on_a_twin(machine):
    run_sequence(machine, 15, 5)


@case(full=True)
def fifty_sequences_of_requests_have_the_same_results_as_on_a_twin(machine):
    for seed in range(100, 150):
        run_sequence(machine, seed, 6)
