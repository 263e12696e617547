"""An agent of which every answer is checked: that it is well formed, and true of the host."""

import json

from answers import PLAIN, Checker
from host_rules import untruth, violation
from host_states import names_in
from programs import ProgramTest
from soap_requests import soap

OF_THE_GATE = "nox.agentd.gate."  # begins the key of a fault with which a request was not let in


class Trace:
    """How often each operation of the provider was called, as the agent's trace tells."""

    def __init__(self, path):
        self.file = open(path, encoding="utf-8")
        self.counts = {}

    def read(self):
        for line in self.file:
            operation = json.loads(line)["operation"]
            self.counts[operation] = self.counts.get(operation, 0) + 1
        return dict(self.counts)


class CheckedTest(ProgramTest):
    def start(self, host):
        """One agent for the whole test: its process is in self.process, a connection to it in self.agent."""
        trace = self.path("trace")
        self.process = self.start_agent("--host", self.write("host.json", host), "--trace", trace,
                                        "--log-level", "error")
        self.agent = self.http()
        self.trace = Trace(trace)
        self.addCleanup(self.trace.file.close)
        self.checker = Checker(self.agent)

    def host(self):
        status, host = self.agent.get("host")
        self.assertEqual(status, 200)
        groups = [{"capacity": [], **group} for group in host.get("groups", [])]  # empty lists are left out
        return {"disks": [], **host, "groups": groups}

    def change_host(self, change):
        status, answer = self.agent.post("host", **change)
        self.assertEqual((status, answer["fault"]), (200, None), answer)

    def send(self, operation, parameters, as_soap):
        """The answer, well formed and of its type."""
        if as_soap:
            return self.sent(operation, "/soap", soap(operation, parameters).encode(), "text/xml", self.checker.soap)
        return self.sent(operation, "/api/v1/" + operation, json.dumps(parameters), "application/json",
                         self.checker.json)

    def sent(self, operation, path, body, content_type, check):
        self.agent.request("POST", path, body, {"Content-Type": content_type})
        response = self.agent.getresponse()
        self.answer = response.read().decode()
        answer = check(operation, response.status, response.headers["Content-Type"], self.answer)
        if response.status == 202:
            return self.checker.read(operation, self.ended(json.loads(self.answer)["id"]))
        return answer

    def ended(self, task):
        """The task when it has ended."""
        described = {}
        while "ended" not in described:
            described = self.agent.get("tasks/" + task)[1]
        return described

    def assert_alive(self):
        self.assertIsNone(self.process.poll(), self.read("agentd.log")[-2000:])
        self.assertEqual(self.agent.ask("GET", "/healthz")[0], 200)

    def assert_obeyed(self, operation, parameters, before, answer):
        """The host as it is now."""
        after = self.host()
        if answer.fault is PLAIN or OF_THE_GATE in self.answer:
            self.assertEqual(before, after, "what is refused changes nothing")
        self.assertIsNone(violation(operation, names_in(parameters), before, after))
        self.assertIsNone(untruth(operation, answer, before, after))
        return after
