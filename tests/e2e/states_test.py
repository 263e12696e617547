#!/usr/bin/env python3
"""The agent stays alive, answers and keeps to its orders, whatever state its host is in and whatever it is asked.

One agent is put through generated hosts. Between requests disks leave, return and change, and its kernel fails as
rules say. After every request: the same process answers, the answer is well formed and of its type, and the host has
changed in nothing that the request did not name.

KOVA_STATES: how many hosts (default 400). KOVA_SEED: the generator's seed, printed with a failure. KOVA_CASE: that host
only.
"""

import http.client
import json
import os
import random
import time
import unittest

from checked import CheckedTest
from host_states import QUERIES, Draw
from soap_requests import is_soap

STATES = int(os.environ.get("KOVA_STATES", "400"))
SEED = int(os.environ.get("KOVA_SEED", "1"))
CASE = os.environ.get("KOVA_CASE")
STEPS = 8  # requests to each host
SHOWN = 2000  # characters of a host or an answer that failed


def shown(value):
    text = value if isinstance(value, str) else json.dumps(value)
    return text if len(text) <= SHOWN else f"{text[:SHOWN]}.. ({len(text)} characters)"


class GeneratedStates(CheckedTest):
    def test_leave_the_agent_alive_and_obedient(self):
        self.start({"name": "first"})
        began = time.monotonic()
        self.requests = self.faults = 0
        for case in range(STATES) if CASE is None else [int(CASE)]:
            self.story = []
            try:
                self.live_through(random.Random(f"{SEED}/{case}"))
            except (AssertionError, OSError, http.client.HTTPException, ValueError) as failure:
                story = "\n  ".join(map(shown, self.story))
                self.fail(f"KOVA_SEED={SEED} KOVA_CASE={case}: {type(failure).__name__}: {failure}\n  {story}\n"
                          f"{self.read('agentd.log')[-SHOWN:]}")
        print(f"seed {SEED}: {self.requests} requests to {STATES} hosts, {self.faults} of them with a fault, "
              f"in {time.monotonic() - began:.1f} s")
        self.assertEqual(self.stop(self.process), 0)

    def live_through(self, rng):
        draw = Draw(rng)
        host = draw.host()
        self.story.append({"set": host})
        earlier = self.trace.read()
        self.change_host({"set": host})
        if draw.is_kernel_away or draw.chance(3):
            self.let_fail(draw, earlier)
        before = known = self.host()
        for _ in range(STEPS):
            if draw.chance(3):
                change = draw.event(before)
                self.story.append(change)
                self.change_host(change)
                before = self.host()
            if draw.chance(2):
                known = before  # else the client goes by what it saw some time ago
            before = self.step(draw, known, before)

    def let_fail(self, draw, earlier):
        """From now on the provider fails. A change of the host calls the provider too, as often as the last one."""
        calls = self.trace.read()
        expected = {operation: 2 * count - earlier.get(operation, 0) for operation, count in calls.items()}
        faults = draw.faults(expected)
        self.story.append({"set": {"faults": faults}, "called": calls})
        self.change_host({"set": {"faults": faults}})

    def step(self, draw, known, before):
        operation, parameters = draw.request(known)
        as_soap = draw.chance(2) and is_soap(operation, parameters)
        if not as_soap and operation not in QUERIES and draw.chance(8):
            parameters["wait"] = False
        self.story.append(f"{'SOAP' if as_soap else 'JSON'} {operation} {shown(parameters)}")
        self.answer = ""
        answer = self.send(operation, parameters, as_soap)
        self.story.append(f"  {self.answer}")
        self.requests += 1
        self.faults += answer.fault is not None
        self.assert_alive()
        return self.assert_obeyed(operation, parameters, before, answer)


if __name__ == "__main__":
    unittest.main(verbosity=2)
