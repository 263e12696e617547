#!/usr/bin/env python3
"""An agent under mixed clients for a while: every request is answered as it should be, and memory stays flat.

    KOVA_BIN=$PWD/build/release/bin soak.py [SECONDS]

Prints a line of figures. Not one of the tests that run with every change: it needs minutes.
"""

import http.client
import re
import socket
import statistics
import sys
import threading
import time
import unittest

from programs import Agent, ProgramTest, disk

DEFAULT_SECONDS = 180
WARM_UP = 0.3  # part of the time; caches, threads and the list of ended tasks are full by then
SAMPLE_SECONDS = 0.5
# Growth of the median between the first and the last third behind the warm-up. Many times less than a leak of
# a hundred bytes per request would come to in three minutes.
ALLOWED_GROWTH_KIB = 1024

ENVELOPE = ('<e:Envelope xmlns:e="http://schemas.xmlsoap.org/soap/envelope/"><e:Body>'
            '<{0} xmlns="urn:nox">{1}</{0}></e:Body></e:Envelope>')


def cache_disk(group):
    return f"naa.{group}0"


def capacity_disks(group):
    return [f"naa.{group}{number}" for number in range(1, 4)]


def host():
    """Two groups of disks that clients make and remove, a few that stay free, and some with trouble."""
    changed = [disk(name, ssd=name == cache_disk(group))
               for group in (1, 2) for name in [cache_disk(group), *capacity_disks(group)]]
    free = [disk(f"naa.3{number}", ssd=number % 4 == 0) for number in range(8)]
    return {"name": "soak", "disks": changed + free + [disk("naa.40", partitions=2)]}


class Client(Agent):
    """Asks over one connection, and holds the agent to the status that is right."""

    def demand(self, wanted, method, target, body=None, content_type="application/json"):
        self.request(method, target, body, {} if body is None else {"Content-Type": content_type})
        response = self.getresponse()
        text = response.read().decode()
        if response.status != wanted:
            raise AssertionError(f"{method} {target}: {response.status}, wanted {wanted}: {text[:500]}")
        return text

    def soap(self, operation, content="", wanted=200):
        return self.demand(wanted, "POST", "/soap", ENVELOPE.format(operation, content), "text/xml")


# What one round of each kind of client does. Each returns the number of requests.

def read_json(client):
    targets = ["disks", "disks?names=naa.30&names=naa.31", "groups", "config", "tasks", "host"]
    for target in targets:
        client.demand(200, "GET", "/api/v1/" + target)
    return len(targets)


def read_soap(client):
    client.soap("QueryDisksForKova")
    client.soap("QueryDisksForKova", "<names>naa.30</names>")
    client.soap("GetStorageInfo")
    client.soap("GetConfigInfo")
    client.demand(200, "GET", "/soap?wsdl")
    return 5


def change_json(client):
    """A group's whole life."""
    mapping = '{"ssd": "%s", "nonSsd": ["%s"]}' % (cache_disk(1), '", "'.join(capacity_disks(1)))
    for operation, body in [("InitializeDisks", f'{{"mappings": [{mapping}], "label": "soak"}}'),
                            ("UnmountDiskMapping", f'{{"mappings": [{mapping}]}}'),
                            ("ClaimUnmountedDiskgroup", "{}"),
                            ("RemoveDiskMapping", f'{{"mapping": {mapping}}}')]:
        client.demand(200, "POST", "/api/v1/" + operation, body)
    return 4


def change_soap(client):
    """The same, with the disks as the agent itself describes them."""
    known = dict((re.search("<canonicalName>(.*?)<", text)[1], text)
                 for text in re.findall("<disk>(.*?)</disk>", client.soap("QueryDisksForKova")))
    content = f"<ssd>{known[cache_disk(2)]}</ssd>" + "".join(f"<nonSsd>{known[name]}</nonSsd>"
                                                             for name in capacity_disks(2))
    client.soap("InitializeDisks", f"<mappings>{content}</mappings><label>soak</label>")
    client.soap("UnmountDiskMapping", f"<mappings>{content}</mappings>")
    client.soap("ClaimUnmountedDiskgroup")
    client.soap("RemoveDiskMapping", f"<mapping>{content}</mapping>")
    return 5


def err(client):
    """Requests that end in faults and refusals, some of them with their connection."""
    client.demand(404, "GET", "/nothing")
    client.demand(400, "POST", "/api/v1/AddDisks", '{"disks": 1}')
    client.demand(400, "POST", "/api/v1/AddDisks", '{"disks": [""]}')
    client.demand(200, "POST", "/api/v1/AddDisks", '{"disks": ["naa.40"]}')
    client.soap("AddDisks", "<disks/>", wanted=500)
    client.demand(500, "POST", "/soap", "<broken", "text/xml")
    client.close()
    with socket.socket(socket.AF_UNIX) as gone:
        gone.connect(client.path)
        gone.sendall(b"POST /soap HTTP/1.1\r\nHost: localhost\r\nContent-Length: 100\r\n\r\n<half")
    return 7


CLIENTS = [read_json, read_json, read_soap, read_soap, change_json, change_soap, err]


class Crowd:
    """The clients, each on a thread of its own, until they are stopped or one of them fails."""

    def __init__(self, path):
        self.path = path
        self.requests = 0
        self.failures = []
        self.over = threading.Event()
        self.lock = threading.Lock()
        self.threads = [threading.Thread(target=self.run, args=(client,)) for client in CLIENTS]

    def __enter__(self):
        for thread in self.threads:
            thread.start()
        return self

    def __exit__(self, *_):
        self.over.set()
        for thread in self.threads:
            thread.join()

    def run(self, rounds):
        client = Client(self.path)
        try:
            while not self.over.is_set():
                done = rounds(client)
                with self.lock:
                    self.requests += done
        except (AssertionError, OSError, http.client.HTTPException, KeyError, TypeError) as failure:
            self.failures.append(f"{rounds.__name__}: {type(failure).__name__}: {failure}")
            self.over.set()
        finally:
            client.close()


def resident_kib(process):
    with open(f"/proc/{process.pid}/status", encoding="ascii") as file:
        return int(re.search(r"^VmRSS:\s+(\d+) kB", file.read(), re.MULTILINE)[1])


class Soak(ProgramTest):
    seconds = DEFAULT_SECONDS

    def sample(self, agent, crowd):
        """Memory of the agent over the time, and how many requests had been answered when it was warm."""
        samples = []
        start = time.monotonic()
        warm = None
        while time.monotonic() - start < self.seconds and not crowd.over.wait(SAMPLE_SECONDS):
            self.assertIsNone(agent.poll(), self.read("agentd.log"))
            if time.monotonic() - start >= WARM_UP * self.seconds:
                warm = crowd.requests if warm is None else warm
                samples.append(resident_kib(agent))
        return samples, warm

    def test_memory_stays_flat(self):
        agent = self.start_agent("--host", self.write("host.json", host()), "--log-level", "error")
        fresh = resident_kib(agent)
        with Crowd(self.socket) as crowd:
            samples, warm = self.sample(agent, crowd)
        self.assertEqual(crowd.failures, [])
        third = len(samples) // 3
        self.assertGreater(third, 0, "too short a time for any sample")
        before, after = statistics.median(samples[:third]), statistics.median(samples[-third:])
        growth = after - before
        # From the middle of the first third to that of the last, two thirds of the requests were answered.
        each = growth * 1024 / max(1, (crowd.requests - warm) * 2 / 3)
        print(f"soak: {self.seconds} s, {len(CLIENTS)} clients, {crowd.requests} requests; memory {fresh} KiB when "
              f"started, {before:.0f} warm, {after:.0f} at the end, {max(samples)} at most; "
              f"growth {growth:.0f} KiB, {each:.2f} bytes per request")
        self.assertLessEqual(growth, ALLOWED_GROWTH_KIB, "memory is not flat")
        self.assertEqual(self.stop(agent), 0, self.read("agentd.log"))


if __name__ == "__main__":
    if len(sys.argv) > 1:
        Soak.seconds = int(sys.argv.pop(1))
    unittest.main()
