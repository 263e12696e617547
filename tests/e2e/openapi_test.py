#!/usr/bin/env python3
"""What the agent answers in JSON is what its own description says."""

import json
import subprocess
import unittest

import jsonschema

from programs import PATIENCE, ProgramTest, disk

HOST = {
    "name": "a", "faultDomain": "rack-1", "cluster": {"enabled": True, "clusterUuid": "c-1", "nodeUuid": "n-1"},
    "networks": [{"interface": "otx1", "masterMulticastGroup": "224.1.2.3", "agentMulticastGroup": "224.2.3.4"}],
    "disks": [disk("naa.f1", True), disk("naa.f2", True), *[disk(f"naa.c{i}") for i in range(1, 5)],
              disk("naa.u1", transport="usb"), disk("naa.p1", partitions=2)],
    "faults": [{"operation": "FormatDiskMapping", "call": 2, "exception": "KovaExceptionHasPartition",
                "disk": "naa.c2", "message": "text"}],
}
GROUP = {"ssd": "naa.f1", "nonSsd": ["naa.c1", "naa.c3"]}


class Described(ProgramTest):
    def setUp(self):
        super().setUp()
        self.start_agent("--host", self.write("host.json", HOST))
        _, self.description = self.exchange("GET", "/api/v1/openapi.json")
        self.seen = set()

    def exchange(self, method, path, body=None):
        command = ["curl", "-sS", "--unix-socket", self.socket, "-X", method, "-w", "\\n%{http_code}",
                   "http://localhost" + path]
        if body is not None:
            command += ["-H", "Content-Type: application/json", "-d", json.dumps(body)]
        done = subprocess.run(command, capture_output=True, text=True, timeout=PATIENCE, check=True)
        text, status = done.stdout.rsplit("\n", 1)
        return status, json.loads(text)

    def check(self, schema, value):
        root = {**schema, "components": self.description["components"]}
        jsonschema.Draft202012Validator.check_schema(root)
        jsonschema.Draft202012Validator(root).validate(value)

    def response(self, operation, status):
        found = operation["responses"][status]
        return self.description["components"]["responses"][found["$ref"].rsplit("/", 1)[1]] if "$ref" in found else found

    def ask(self, method, path, status, body=None, described=None):
        """Asks, and holds request and answer against the description."""
        operation = self.description["paths"][described or path.split("?")[0]][method.lower()]
        if body is not None:
            self.check(operation["requestBody"]["content"]["application/json"]["schema"], body)
        answered, value = self.exchange(method, path, body)
        self.assertEqual(answered, status, value)
        self.check(self.response(operation, status)["content"]["application/json"]["schema"], value)
        self.seen.add((described or path.split("?")[0], method))
        return value

    def test_every_request_and_every_answer(self):
        self.ask("GET", "/api/v1/disks?names=naa.f1&names=naa.u1", "200")
        self.ask("POST", "/api/v1/QueryDisksForKova", "200", {"names": ["naa.p1"]})
        self.ask("POST", "/api/v1/QueryDisksForKova", "400", {"names": ["\n"]})
        self.ask("POST", "/api/v1/AddDisks", "409", {"disks": []})
        made = self.ask("POST", "/api/v1/AddAllEligibleDisks", "200", {"label": "all"})
        self.assertEqual(made["fault"]["@type"], "DiskHasPartitions")
        self.ask("GET", "/api/v1/tasks", "200")
        self.ask("GET", f"/api/v1/tasks/{made['task']}", "200", described="/api/v1/tasks/{id}")
        self.ask("POST", "/api/v1/GetTasks", "200", {})
        self.ask("POST", "/api/v1/GetTask", "200", {"id": made["task"]})
        self.ask("GET", "/api/v1/tasks/nobody", "404", described="/api/v1/tasks/{id}")
        self.ask("GET", "/api/v1/disks?names=%00", "400")
        self.ask("GET", "/api/v1/groups", "200")
        self.ask("POST", "/api/v1/GetDiskGroups", "200", {})
        self.ask("POST", "/api/v1/GetStorageInfo", "200", {})
        self.ask("GET", "/api/v1/config", "200")
        self.ask("POST", "/api/v1/GetConfigInfo", "200", {})
        self.ask("POST", "/api/v1/GetTwin", "200", {})
        self.ask("POST", "/api/v1/UnmountDiskMapping", "200", {"mappings": [GROUP]})
        self.ask("POST", "/api/v1/ClaimUnmountedDiskgroup", "200", {})
        answered = self.ask("GET", "/api/v1/disks?names=naa.f2", "200")["result"][0]["disk"]  # is handed back as it came
        self.ask("POST", "/api/v1/InitializeDisks", "200",
                 {"mappings": [{"ssd": answered, "nonSsd": ["naa.c2", {"canonicalName": "naa.c4", "ssd": False}]}]})
        self.ask("POST", "/api/v1/AddDisks", "400", {"disks": [answered, answered]})
        self.ask("POST", "/api/v1/RemoveDisk", "200", {"disk": "naa.c1", "passThrough": "p", "optionFirst": 1})
        self.ask("POST", "/api/v1/RemoveDisk", "500", {"disk": "naa.nothing"})
        self.ask("POST", "/api/v1/RemoveDiskMapping", "400", {"mapping": GROUP})
        self.ask("POST", "/api/v1/AddDisks", "202", {"disks": ["naa.c1"], "wait": False})
        self.ask("POST", "/api/v1/host", "200", {"disk": {"name": "naa.c4", "absent": True}})
        self.ask("GET", "/api/v1/host", "200")
        described = {(path, method.upper()) for path, methods in self.description["paths"].items() for method in methods}
        self.assertEqual(described - self.seen, {("/healthz", "GET"), ("/metrics", "GET")})

    def test_every_example_is_what_the_schema_beside_it_says(self):
        count = 0
        for where in self.contents(self.description):
            for content in where.values():
                with self.subTest(example=content["example"]):
                    self.check(content["schema"], content["example"])
                    count += 1
        self.assertGreater(count, 40)

    def contents(self, value):
        """Every `content` of the description."""
        if isinstance(value, dict):
            if isinstance(value.get("content"), dict):
                yield value["content"]
            value = list(value.values())
        if isinstance(value, list):
            for item in value:
                yield from self.contents(item)


if __name__ == "__main__":
    unittest.main()
