#!/usr/bin/env python3
"""An agent and its clients: what is answered, what is refused, how it starts and ends."""

import json
import os
import shutil
import signal
import socket
import stat
import subprocess
import unittest

from programs import ProgramTest, disk

HOST = {"name": "a", "disks": [disk("naa.1", True), disk("naa.2"), disk("naa.3", transport="usb")]}


class AgentAnswers(ProgramTest):
    def test_the_same_as_a_command_that_hosts_the_plug_in_itself(self):
        host = self.write("host.json", HOST)
        self.start_agent("--host", host)
        for output in ("table", "json", "soap"):
            for names in ((), ("naa.3", "naa.1")):
                with self.subTest(output=output, names=names):
                    asked = self.ask_agent("-o", output, "disks", *names)
                    alone = self.kovactl("--host", host, "-o", output, "disks", *names)
                    self.assert_ended(asked, 0)
                    self.assertEqual(asked.out, alone.out)
                    self.assertIn("naa.1", asked.out)

    def test_groups_and_configuration_as_a_command_that_hosts_the_plug_in_itself(self):
        host = self.write("host.json", {
            **HOST, "faultDomain": "rack-1", "cluster": {"enabled": True, "clusterUuid": "c-1", "nodeUuid": "n-1"},
            "networks": [{"interface": "otx1", "masterMulticastGroup": "224.1.2.3",
                          "agentMulticastGroup": "FF19:0:0:0:0:2:3:4"}],
            "groups": [{"ssd": "naa.1", "capacity": ["naa.2"]}]})
        self.start_agent("--host", host)
        for command, texts in (("groups", ("naa.1", "naa.2", "mounted")),
                               ("config", ("c-1", "n-1", "rack-1", "otx1", "FF19:0:0:0:0:2:3:4"))):
            for output in ("table", "json", "soap"):
                with self.subTest(command=command, output=output):
                    asked = self.ask_agent("-o", output, command)
                    self.assert_ended(asked, 0)
                    self.assertEqual(asked.out, self.kovactl("--host", host, "-o", output, command).out)
                    for text in texts if output == "table" else texts[:1]:
                        self.assertIn(text, asked.out)

    def test_for_the_example_host_when_none_is_named(self):
        self.start_agent()
        self.assertEqual(len(self.ask_agent("-o", "json", "disks").json()), 12)

    def test_a_table_for_people(self):
        self.start_agent("--host", self.write("host.json", HOST))
        self.assertEqual(self.ask_agent("disks").out,
                         "DISK   KIND          SIZE  STATE       WHY NOT\n"
                         "naa.1  flash      1.0 TiB  eligible\n"
                         "naa.2  hard disk  1.0 TiB  eligible\n"
                         "naa.3  hard disk  1.0 TiB  ineligible  attached by USB\n"
                         "\n"
                         "3 disks: 2 eligible, 1 ineligible\n")

    def test_disks_that_are_there_beside_a_name_that_is_not(self):
        self.start_agent("--host", self.write("host.json", HOST))
        outcome = self.ask_agent("disks", "naa.2", "naa.9")
        self.assert_ended(outcome, 2, "no disk 'naa.9'")
        self.assertIn("naa.2", outcome.out)

    def test_a_name_that_cannot_be_one_with_a_fault(self):
        self.start_agent()
        self.assert_ended(self.ask_agent("disks", "a\nb"), 1, "a\\x0ab")
        self.assert_ended(self.ask_agent("disks", "x" * 1025), 1, "names[0]")

    def test_many_clients_at_once(self):
        self.start_agent()
        command = [os.path.join(os.environ["KOVA_BIN"], "kovactl"), "--agent", "unix:" + self.socket,
                   "-o", "json", "disks"]
        clients = [subprocess.Popen(command, stdout=subprocess.PIPE) for _ in range(8)]
        outputs = {client.communicate()[0] for client in clients}
        self.assertEqual([client.returncode for client in clients], [0] * 8)
        self.assertEqual(len(outputs), 1)

    def test_a_fault_when_the_host_cannot_be_read(self):
        self.start_agent("--host", self.write("host.json", {**HOST, "storageSystem": "missing"}))
        self.assert_ended(self.ask_agent("disks"), 1, "could not be read")


@unittest.skipUnless(shutil.which("curl"), "curl is not installed")
class AgentAnswersCurl(ProgramTest):
    def setUp(self):
        super().setUp()
        self.start_agent("--host", self.write("host.json", HOST))

    def curl(self, path, *more):
        """Status and body."""
        outcome = self.run_program("curl", "--silent", "--show-error", "--unix-socket", self.socket,
                                   "--write-out", "\n%{http_code}", *more, "http://localhost" + path)
        self.assert_ended(outcome, 0)
        body, status = outcome.out.rsplit("\n", 1)
        return int(status), body

    def post(self, body, content_type="application/json"):
        return self.curl("/api/v1/QueryDisksForKova", "--header", "Content-Type: " + content_type, "--data-binary",
                         body)

    def test_that_it_is_well(self):
        status, body = self.curl("/healthz")
        version = self.agentd("--version")
        self.assert_ended(version, 0)
        self.assertRegex(version.out, r"^agentd \d+\.\d+\.\d+ \(build \S+, API nox\.version\.unstable\)\n$")
        self.assertEqual((status, body), (200, "ok\n" + version.out))

    def test_with_all_disks_and_with_chosen_ones(self):
        status, body = self.curl("/api/v1/disks")
        self.assertEqual(status, 200)
        everything = json.loads(body)
        self.assertEqual(len(everything["result"]), 3)
        self.assertIsNone(everything["fault"])
        chosen = {"result": [everything["result"][1]], "fault": None}
        self.assertEqual(json.loads(self.curl("/api/v1/disks?names=naa.2")[1]), chosen)
        self.assertEqual(json.loads(self.post('{"names": ["naa.2"]}')[1]), chosen)

    def test_with_a_fault_for_a_name_that_cannot_be_one(self):
        status, body = self.post('{"names": [""]}')
        self.assertEqual(status, 400)
        answer = json.loads(body)
        self.assertIsNone(answer["result"])
        self.assertEqual(answer["fault"]["@type"], "InvalidArgument")
        self.assertEqual(answer["fault"]["argument"], "names[0]")

    def test_with_a_status_that_says_what_is_wrong_with_the_request(self):
        self.assertEqual(self.curl("/nowhere")[0], 404)
        self.assertEqual(self.curl("/healthz", "--request", "DELETE")[0], 405)
        self.assertEqual(self.post("{}", "text/plain")[0], 415)
        self.assertEqual(self.post("{")[0], 400)
        self.assertEqual(self.curl("/api/v1/disks?disk=naa.1")[0], 400)

    def test_about_a_body_that_is_too_large(self):
        status, body = self.post("@" + self.write("large.json", " " * ((16 << 20) + 1)))
        [message] = json.loads(body)["fault"]["faultMessage"]
        self.assertEqual((status, message["message"]), (413, "the body is too large"))

    def test_head_requests_as_those_for_the_body(self):
        status, head = self.curl("/healthz", "--head")
        self.assertEqual(status, 200)
        self.assertRegex(head, r"Date: \w{3}, \d\d \w{3} \d{4} \d\d:\d\d:\d\d GMT")
        self.assertIn(f"Content-Length: {len(self.curl('/healthz')[1])}", head)

    def test_other_methods_with_those_that_are_served(self):
        status, head = self.curl("/healthz", "--request", "DELETE", "--include")
        self.assertEqual(status, 405)
        self.assertIn("Allow: GET, HEAD", head)


class AgentStarts(ProgramTest):
    def test_with_a_socket_for_owner_and_group_in_a_folder_of_its_own(self):
        self.socket = self.path("run/agentd.sock")
        self.start_agent()
        self.assertEqual(stat.S_IMODE(os.stat(self.socket).st_mode), 0o660)
        self.assertEqual(stat.S_IMODE(os.stat(self.path("run")).st_mode), 0o750)

    def test_not_beside_another_one(self):
        self.start_agent()
        self.assert_ended(self.agentd(), 2, "another agent answers on " + self.socket)
        self.assert_ended(self.ask_agent("disks"), 0)

    def test_over_the_socket_of_one_that_was_killed(self):
        agent = self.start_agent()
        agent.kill()
        agent.wait()
        self.assertTrue(os.path.exists(self.socket))
        self.assert_ended(self.ask_agent("disks"), 3, "Start one with")
        self.start_agent()
        self.assert_ended(self.ask_agent("disks"), 0)

    def test_not_where_something_else_stands(self):
        self.write("agentd.sock", "precious")
        self.assert_ended(self.agentd(), 2, "not a socket")
        self.assertEqual(self.read("agentd.sock"), "precious")

    def test_not_on_an_address_or_host_or_option_it_does_not_know(self):
        self.assert_ended(self.agentd("--listen", "tcp:localhost:0"), 2, "tcp:ADDRESS:PORT")
        self.assert_ended(self.agentd("--host", self.path("none.json")), 2, "none.json")
        broken = self.write("broken.json", {"disks": [{"name": "naa.1", "ssd": 1, "bytes": 1}]})
        self.assert_ended(self.agentd("--host", broken), 2, "disks[0].ssd")
        self.assert_ended(self.agentd("--log-level", "loud"), 2, "loud")
        self.assert_ended(self.agentd("--plugin", self.path("none.so")), 2, "none.so")
        self.assert_ended(self.agentd("--trace", self.path("none/trace")), 2, "none/trace")
        self.assert_ended(self.agentd("--save"), 2, "--host")
        self.assert_ended(self.agentd("--no-such-option"), 2)
        self.assertFalse(os.path.exists(self.socket))

    def test_not_when_its_ready_file_cannot_be_written(self):
        self.assert_ended(self.agentd("--ready-file", self.path("none/ready")), 2, "none/ready")
        self.assertFalse(os.path.exists(self.socket), "the socket is taken away again")

    def test_not_as_the_second_that_saves_a_host(self):
        host = self.write("host.json", HOST)
        self.start_agent("--host", host, "--save")
        first, self.socket = self.socket, self.path("second.sock")
        self.assert_ended(self.agentd("--host", host, "--save"), 2, "saves this host already")
        self.assert_ended(self.kovactl("--host", host, "--save", "disks"), 2, "saves this host already")
        self.assert_ended(self.kovactl("--host", host, "disks"), 0)
        self.socket = first
        self.assert_ended(self.ask_agent("disks"), 0)

    def test_and_tells_how_it_is_used(self):
        outcome = self.agentd("--help")
        self.assert_ended(outcome, 0)
        self.assertIn("--ready-file", outcome.out)


class AgentEnds(ProgramTest):
    def test_on_a_signal_with_status_0_and_without_its_socket(self):
        for number in (signal.SIGTERM, signal.SIGINT):
            with self.subTest(signal=number):
                agent = self.start_agent()
                agent.send_signal(number)
                self.assertEqual(agent.wait(), 0)
                self.assertFalse(os.path.exists(self.socket))
                self.assert_ended(self.ask_agent("disks"), 3, self.socket)

    def test_although_a_client_holds_its_connection(self):
        agent = self.start_agent()
        with socket.socket(socket.AF_UNIX) as idle:
            idle.connect(self.socket)
            self.assertEqual(self.stop(agent), 0)
            self.assertEqual(idle.recv(1), b"")

    def test_after_the_answer_to_a_request_that_it_has_begun(self):
        slow = {**HOST, "faults": [{"operation": "QueryDisks", "call": 1, "delayMs": 300}]}
        trace = self.path("trace")
        agent = self.start_agent("--host", self.write("host.json", slow), "--trace", trace)
        with socket.socket(socket.AF_UNIX) as client:
            client.connect(self.socket)
            client.sendall(b"GET /api/v1/disks HTTP/1.1\r\nHost: x\r\n\r\n")
            while "RefreshKovaInfo" not in self.read("trace"):
                pass  # the query comes next, and waits
            agent.terminate()
            answer = b""
            while chunk := client.recv(65536):
                answer += chunk
        self.assertIn(b"HTTP/1.1 200", answer)
        self.assertIn(b"naa.1", answer)
        self.assertEqual(agent.wait(), 0)

    def test_not_over_a_kernel_that_fails_in_a_way_it_must_not(self):
        broken = {**HOST, "faults": [{"operation": name, "exception": "std::runtime_error", "message": "boom"}
                                     for name in ("QueryDisks", "RemoveDisk", "ClaimUnmountedDiskgroups")]}
        agent = self.start_agent("--host", self.write("host.json", broken))
        self.assert_ended(self.ask_agent("disks"), 0)
        self.assertIn("boom", self.read("agentd.log"))
        self.assert_ended(self.ask_agent("remove", "naa.1", "--yes"), 1, "boom")
        self.ask_agent("claim")
        self.assertIsNone(agent.poll())


class AgentKeeps(ProgramTest):
    def test_a_trace_of_what_it_asks_the_kernel(self):
        self.start_agent("--host", self.write("host.json", HOST), "--trace", self.path("trace"))
        self.ask_agent("disks")
        self.ask_agent("disks")
        calls = [json.loads(line) for line in self.read("trace").splitlines()]
        self.assertEqual(calls, [{"operation": "RefreshKovaInfo", "arguments": [], "outcome": "ok"},
                                 {"operation": "QueryDisks", "arguments": [[], True], "outcome": "ok"}])

    def test_a_log_at_the_level_it_is_given(self):
        self.stop(self.start_agent())
        self.assertIn("Answering on unix:" + self.socket, self.read("agentd.log"))
        self.write("agentd.log", "")
        self.stop(self.start_agent("--log-level", "warning"))
        self.assertEqual(self.read("agentd.log"), "")

    def test_no_descriptor_of_a_client_that_has_gone(self):
        agent = self.start_agent()
        self.ask_agent("disks")
        descriptors = f"/proc/{agent.pid}/fd"
        before = len(os.listdir(descriptors))
        for _ in range(20):
            self.ask_agent("disks")
        self.assertLessEqual(len(os.listdir(descriptors)), before + 1)


if __name__ == "__main__":
    unittest.main(verbosity=2)
