#!/usr/bin/env python3
"""What the agent tells monitoring: the text format to the letter, and numbers that are true."""

import re
import time
import unittest

from programs import PATIENCE, ProgramTest, disk

HOST = {"name": "a", "disks": [disk("naa.f1", True), disk("naa.c1"), disk("naa.c2"), disk("naa.u1", transport="usb")]}
NAME = r"[a-zA-Z_:][a-zA-Z0-9_:]*"
LABEL = r'[a-zA-Z_][a-zA-Z0-9_]*="(?:[^"\\\n]|\\["\\n])*"'
SAMPLE = re.compile(rf"^({NAME})(?:\{{({LABEL}(?:,{LABEL})*)\}})? ((?:\d+(?:\.\d+)?)|\+Inf)$")
TYPES = ("counter", "gauge", "histogram")


class NotMetrics(AssertionError):
    """A text that is not of the format, or contradicts itself."""


def demand(holds, why):
    if not holds:
        raise NotMetrics(why)


class Metrics:
    """The text, read strictly: {name: type}, and {(name, labels): value}."""

    def __init__(self, text):
        self.types, self.values, self.described = {}, {}, None
        demand(text.endswith("\n"), "the last line does not end")
        for line in text[:-1].split("\n"):
            self.read(line)
        for name in (name for name, kind in self.types.items() if kind == "histogram"):
            self.check_histogram(name)

    def read(self, line):
        if match := re.fullmatch(rf"# HELP ({NAME}) \S.*", line):
            demand(match[1] not in self.types, f"{match[1]} is described twice")
            self.described = match[1]
        elif match := re.fullmatch(rf"# TYPE ({NAME}) (\w+)", line):
            demand(match[1] == self.described and match[2] in TYPES, line)
            self.types[match[1]] = match[2]
        else:
            match = SAMPLE.match(line)
            demand(match, f"not understood: {line}")
            self.add(*match.groups())

    def add(self, name, labels, value):
        family = self.described
        kind = self.types.get(family)
        parts = [family + end for end in ("_bucket", "_sum", "_count")] if kind == "histogram" else [family]
        demand(kind and name in parts, f"{name} does not stand with its kind")
        demand((kind == "counter") == name.endswith("_total"), f"{name} is a {kind}")
        pairs = tuple(sorted(re.findall(r'(\w+)="([^"]*)"', labels or "")))
        demand(len(dict(pairs)) == len(pairs), f"a label of {name} stands twice")
        demand((name, pairs) not in self.values, f"{name}{pairs} stands twice")
        self.values[name, pairs] = float(value)

    def check_histogram(self, name):
        series = {}
        for (sample, pairs), value in self.values.items():
            if sample == name + "_bucket":
                end = dict(pairs)["le"]
                rest = tuple(pair for pair in pairs if pair[0] != "le")
                series.setdefault(rest, []).append((float(end.replace("+Inf", "inf")), value))
        for rest, buckets in series.items():
            ends, counts = zip(*buckets)
            demand(list(ends) == sorted(ends) and ends[-1] == float("inf"), f"{name}{rest}: {ends}")
            demand(list(counts) == sorted(counts), f"{name}{rest}: {counts}")
            demand(self.values[name + "_count", rest] == counts[-1], f"{name}{rest} has another count")
            demand((name + "_sum", rest) in self.values, f"{name}{rest} has no sum")

    def of(self, name, **labels):
        return self.values.get((name, tuple(sorted(labels.items()))))


class TheReader(unittest.TestCase):
    def test_takes_nothing_that_is_not_of_the_format(self):
        head = "# HELP a_total h\n# TYPE a_total counter\n"
        self.assertEqual(Metrics(head + 'a_total{b="c"} 1\n').of("a_total", b="c"), 1)
        histogram = "# HELP h h\n# TYPE h histogram\n"
        for text in ("", "a 1\n", head + "a_total 1", head + "a_total -1\n", head + "b_total 1\n", head + head,
                     head + "a_total 1\na_total 1\n", head + 'a_total{b="c} 1\n', "# HELP a h\n# TYPE a counter\na 1\n",
                     histogram + 'h_bucket{le="1"} 1\nh_sum 1\nh_count 1\n',
                     histogram + 'h_bucket{le="1"} 2\nh_bucket{le="+Inf"} 1\nh_sum 1\nh_count 1\n',
                     histogram + 'h_bucket{le="+Inf"} 1\nh_sum 1\nh_count 2\n'):
            with self.subTest(text=text):
                self.assertRaises(NotMetrics, Metrics, text)


class TheAgentsMetrics(ProgramTest):
    def metrics(self):
        status, text, headers = self.agent.ask_fully("GET", "/metrics")
        self.assertEqual((status, headers["Content-Type"]), (200, "text/plain; version=0.0.4; charset=utf-8"))
        return Metrics(text)

    def setUp(self):
        super().setUp()
        self.start_agent("--host", self.write("host.json", HOST))
        self.agent = self.http()

    def metrics_with_the_host(self):
        """Once the host has told, and that is counted; the first answers do not wait for that."""
        return self.metrics_with(lambda metrics: metrics.of("kova_host_age_seconds") is not None
                                 and metrics.of("kova_agent_queries_total", outcome="done"))

    def metrics_with(self, what):
        """Once they show it: an answer is sent before it is counted."""
        deadline = time.monotonic() + PATIENCE
        while not what(metrics := self.metrics()):
            self.assertLess(time.monotonic(), deadline, "the metrics never show what was waited for")
        return metrics

    def test_are_of_the_format_whatever_was_asked(self):
        self.metrics()
        for method, path, body in (("GET", "/api/v1/disks", None), ("GET", '/no"where\\{', None), ("GET", "/%zz", None),
                                   ("POST", "/api/v1/AddDisks", "{"), ("POST", "/soap", "<"),
                                   ("POST", "/api/v1/AddAllEligibleDisks", {})):
            self.agent.ask(method, path, body)
        self.metrics_with_the_host()

    def test_tell_what_became_of_changes_and_queries(self):
        self.metrics_with_the_host()  # which is one query
        self.agent.post("AddDisks", disks=[])
        self.agent.post("AddAllEligibleDisks")
        self.agent.get("groups")
        # After changes each look at the metrics may ask the host again, which is a query more.
        metrics = self.metrics_with(lambda metrics: metrics.of("kova_agent_queries_total", outcome="done") >= 2)
        self.assertEqual(metrics.of("kova_agent_changes_total", outcome="failed"), 1)
        self.assertEqual(metrics.of("kova_agent_changes_total", outcome="done"), 1)
        self.assertEqual(metrics.of("kova_agent_requests_total", route="/api/v1/AddDisks", status="409"), 1)
        self.assertEqual(metrics.of("kova_agent_request_seconds_count", route="/api/v1/groups"), 1)

    def test_tell_of_the_host_as_it_was_when_they_were_last_asked_for(self):
        self.agent.post("AddDisks", disks=["naa.f1", "naa.c1"])
        self.assertIsNone(self.metrics().of("kova_disks", state="inUse"))
        metrics = self.metrics_with_the_host()
        self.assertEqual([metrics.of("kova_disks", state=state) for state in ("inUse", "eligible", "ineligible")], [2, 1, 1])
        self.assertEqual([metrics.of("kova_disk_groups", state=state) for state in ("mounted", "unmounted")], [1, 0])

    def test_tell_which_build_it_is(self):
        version, build = re.fullmatch(r"agentd (\S+) \(build (\S+), API \S+\)\n", self.agentd("--version").out).groups()
        self.assertEqual(self.metrics().of("kova_agent_info", version=version, build=build, api="nox.version.unstable"), 1)


if __name__ == "__main__":
    unittest.main(verbosity=2)
