#!/usr/bin/env python3
"""Nothing is lost: an agent that saves its host is killed at random moments of a stream of changes.

After each kill the saved host must load, and be the state before or after the change that was under way; a change
that was acknowledged must be in it. A request that makes several groups may have got as far as any of them, since
each is a change of the host in itself.

KOVA_KILLS: how many kills (default 120). KOVA_SEED: the run that printed it, again.
"""

import json
import os
import random
import signal
import socket
import time
import unittest

from programs import Agent, ProgramTest, disk

KILLS = int(os.environ.get("KOVA_KILLS", "120"))
SEED = int(os.environ.get("KOVA_SEED", "0")) or random.SystemRandom().randrange(1, 1 << 32)

SSDS = ["naa.s1", "naa.s2", "naa.s3"]
HDDS = [f"naa.h{number}" for number in range(1, 9)]
# All top-level keys that changes touch, as they are when a description does not mention them.
DEFAULTS = {"autoMode": False, "groups": []}


def settled(host):
    """A description in one form, whether it mentions defaults or not."""
    return {**DEFAULTS, **host}


class Stream:
    """Random changes that mostly make sense on the host as it is."""

    def __init__(self, rng):
        self.rng = rng

    def next(self, host):
        """The path and the body of a request."""
        makers = [self.add, self.add, self.add_all, self.initialize, self.remove, self.remove, self.remove_group,
                  self.unmount, self.claim, self.lose_or_return, self.partition, self.mode]
        return self.rng.choice(makers)(host)

    def some(self, names, least=1):
        return self.rng.sample(names, self.rng.randint(min(least, len(names)), len(names)))

    @staticmethod
    def mapping(group, host):
        absent = {item["name"]: item.get("kovaUuid", "") for item in host["disks"] if item.get("absent")}
        name = lambda disk_name: "kova:" + absent[disk_name] if disk_name in absent else disk_name
        return {"ssd": name(group["ssd"]), "nonSsd": [name(one) for one in group["capacity"]]}

    def add(self, _):
        return "AddDisks", {"disks": self.some(SSDS) + self.some(HDDS)}

    def add_all(self, _):
        return "AddAllEligibleDisks", {}

    def initialize(self, _):
        ssds, hdds = self.some(SSDS), self.rng.sample(HDDS, len(HDDS))
        return "InitializeDisks", {"mappings": [{"ssd": ssd, "nonSsd": [hdds.pop(), hdds.pop()]} for ssd in ssds]}

    def remove(self, host):
        members = [name for group in host["groups"] for name in group["capacity"]]
        return "RemoveDisk", {"disk": self.rng.choice(members or HDDS)}

    def remove_group(self, host):
        if not host["groups"]:
            return self.add_all(host)
        return "RemoveDiskMapping", {"mapping": self.mapping(self.rng.choice(host["groups"]), host)}

    def unmount(self, host):
        if not host["groups"]:
            return self.add_all(host)
        return "UnmountDiskMapping", {"mappings": [self.mapping(group, host) for group in self.some(host["groups"])]}

    def claim(self, _):
        return "ClaimUnmountedDiskgroup", {}

    def change(self, key, values):
        return "host", {"disk": {"name": self.rng.choice(HDDS), key: self.rng.choice(values)}}

    def lose_or_return(self, _):
        return self.change("absent", [True, False, False])

    def partition(self, _):
        return self.change("partitions", [0, 0, 1])

    def mode(self, _):
        return "host", {"set": {"autoMode": self.rng.random() < 0.2}}


class Copy:
    """A second agent, never killed, on which a change can be tried."""

    def __init__(self, agent):
        self.agent = agent

    def host(self):
        return settled(self.agent.get("host")[1])

    def become(self, host):
        status, answer = self.agent.post("host", set=host)
        assert status == 200, answer

    def states_after(self, before, operation, body):
        """Every state that the change may leave behind, in order; the last is that of the whole change."""
        self.become(before)
        _, answer = self.agent.ask("POST", "/api/v1/" + operation, body)
        after = self.host()
        results = answer.get("result") if isinstance(answer, dict) else None
        steps = [result["mapping"] for result in results or []] if isinstance(results, list) else []
        states = [before]
        if len(steps) > 1:
            self.become(before)
            step = "UnmountDiskMapping" if operation == "UnmountDiskMapping" else "InitializeDisks"
            for mapping in steps:
                self.agent.post(step, mappings=[mapping])
                states.append(self.host())
            assert states[-1] == after, "one group after the other comes to the same"
        return states + [after]


class KilledAgent(ProgramTest):
    def setUp(self):
        super().setUp()
        self.rng = random.Random(SEED)
        self.stream = Stream(self.rng)
        self.file = self.write("host.json", {"name": "a", "disks": [disk(name, True) for name in SSDS] +
                                             [disk(name) for name in HDDS]})
        self.took = {}  # seconds that a change of each kind took lately
        self.seen = {"as before": 0, "as after": 0, "in between its groups": 0, "acknowledged": 0}

    def start_copy(self):
        own, self.socket = self.socket, self.path("copy.sock")
        self.start_agent("--host", self.write("copy.json", self.read("host.json")), "--log-level", "error")
        copy, self.socket = self.http(), own
        return Copy(copy)

    def live(self, agent, changes):
        """Carries out a few changes, all acknowledged; the host afterwards."""
        for _ in range(changes):
            host = settled(agent.get("host")[1])
            operation, body = self.stream.next(host)
            begun = time.monotonic()
            status, answer = agent.ask("POST", "/api/v1/" + operation, body)
            self.took[operation] = time.monotonic() - begun
            self.assertIn(status, (200, 400, 409, 500), answer)
        host = settled(agent.get("host")[1])
        self.assertEqual(host, settled(json.loads(self.read("host.json"))), "what is acknowledged is saved")
        return host

    def choose(self, copy, before):
        """A change that changes something, and the states it may leave behind."""
        for _ in range(20):
            operation, body = self.stream.next(before)
            states = copy.states_after(before, operation, body)
            if states[-1] != before:
                break
        return operation, body, states

    def kill_in(self, process, operation, body):
        """Kills the agent while it works on the change, if it still does; whether it had acknowledged it."""
        content = json.dumps(body).encode()
        with socket.socket(socket.AF_UNIX) as client:
            client.connect(self.socket)
            client.sendall(b"POST /api/v1/%s HTTP/1.1\r\nHost: x\r\nContent-Type: application/json\r\n"
                           b"Connection: close\r\nContent-Length: %d\r\n\r\n" % (operation.encode(), len(content)) +
                           content)
            time.sleep(self.rng.random() * 1.3 * self.took.get(operation, 0.005))
            process.send_signal(signal.SIGKILL)
            process.wait()
            answer = b""
            try:
                while chunk := client.recv(65536):
                    answer += chunk
            except ConnectionResetError:
                pass
        return b"}\n" in answer

    def check(self, states, acknowledged, told):
        """The saved host is one of the states, and an agent starts from it."""
        saved = settled(json.loads(self.read("host.json")))
        if acknowledged:
            self.assertEqual(saved, states[-1], told)
            self.seen["acknowledged"] += 1
            return
        self.assertIn(saved, states, told)
        where = "as before" if saved == states[0] else "as after" if saved == states[-1] else "in between its groups"
        self.seen[where] += 1

    def test_leaves_a_host_that_is_as_before_or_after_the_change(self):
        print(f"KOVA_SEED={SEED} KOVA_KILLS={KILLS}", flush=True)
        copy = self.start_copy()
        for number in range(KILLS):
            process = self.start_agent("--host", self.file, "--save", "--log-level", "error")
            agent = Agent(self.socket)
            before = self.live(agent, self.rng.randint(0, 3))
            agent.close()
            operation, body, states = self.choose(copy, before)
            acknowledged = self.kill_in(process, operation, body)
            self.check(states, acknowledged, f"kill {number} of KOVA_SEED={SEED}: {operation} {json.dumps(body)}")
        process = self.start_agent("--host", self.file, "--save")
        self.assertEqual(self.stop(process), 0)
        print(f"{KILLS} kills: {self.seen}", flush=True)
        self.assertGreater(self.seen["as before"], 0, "some kill came early enough")
        self.assertGreater(self.seen["as after"] + self.seen["acknowledged"], 0, "some kill came late enough")


if __name__ == "__main__":
    unittest.main(verbosity=2)
