#!/usr/bin/env python3
"""An agent on the network: plain TCP, TLS with and without certificates, and who may do what."""

import contextlib
import json
import os
import re
import shutil
import socket
import stat
import subprocess
import unittest
import unittest.mock

from programs import ProgramTest, disk

HOST = {"name": "a", "disks": [disk("naa.1", True), disk("naa.2")]}
SOAP = ('<e:Envelope xmlns:e="http://schemas.xmlsoap.org/soap/envelope/"><e:Body><{0} xmlns="urn:nox"/></e:Body>'
        '</e:Envelope>')


class NetworkTest(ProgramTest):
    """An agent with a TCP port beside its socket; the folder is its own."""

    def start(self, *arguments):
        self.agent = self.start_agent("--host", self.write("host.json", HOST), "--listen", "tcp:127.0.0.1:0", *arguments)
        self.port = int(self.addresses[1].rpartition(":")[2])

    def curl(self, url, *more, body=None, content_type="application/json", **process):
        """Status and body."""
        command = ["curl", "--silent", "--show-error", "--noproxy", "*", "--write-out", "\n%{http_code}", *more]
        if body is not None:
            command += ["--header", "Content-Type: " + content_type, "--data-binary", body]
        outcome = subprocess.run([*command, url], capture_output=True, text=True, timeout=60, cwd=self.folder,
                                 check=False, **process)
        self.assertEqual(outcome.returncode, 0, outcome.stderr)
        text, status = outcome.stdout.rsplit("\n", 1)
        return int(status), text

    def assert_roles(self, ask, reads, changes):
        """What a client may do: `ask` takes a path and what curl takes."""
        status, health = ask("/healthz")
        self.assertEqual(status, 200)
        self.assertRegex(health, r"^ok\nagentd \S+ \(build \S+, API \S+\)\n$" if reads else r"^ok\n$")
        self.assert_permitted(ask("/api/v1/disks"), reads, "read")
        self.assert_permitted(ask("/api/v1/tasks"), reads, "read")
        self.assert_permitted(ask("/api/v1/host"), reads, "read")
        self.assert_permitted(ask("/api/v1/QueryDisksForKova", body="{}"), reads, "read")
        self.assert_permitted(ask("/api/v1/host", body='{"set": {"autoMode": false}}'), changes, "change")
        self.assert_permitted(ask("/api/v1/ClaimUnmountedDiskgroup", body="{}"), changes, "change")
        for operation, may, role in (("GetStorageInfo", reads, "read"),
                                     ("ClaimUnmountedDiskgroup", changes, "change" if reads else "read")):
            status, text = ask("/soap", body=SOAP.format(operation), content_type="text/xml")
            self.assertEqual(status, 200 if may else 500, text)
            self.assertEqual('xsi:type="NotPermitted"' in text, not may, text)
            self.assertEqual(f"<role>{role}</role>" in text, not may, text)

    def assert_permitted(self, answer, may, role):
        status, text = answer
        if may:
            self.assertEqual(status, 200, text)
            return
        self.assertEqual(status, 403, text)
        fault = json.loads(text)["fault"]
        self.assertEqual((fault["@type"], fault["role"]), ("NotPermitted", role))


@unittest.skipUnless(shutil.which("curl"), "curl is not installed")
class PlainTcp(NetworkTest):
    def setUp(self):
        super().setUp()
        self.start("--server-name", "kova.example")
        self.url = f"http://127.0.0.1:{self.port}"

    def test_lets_clients_read_while_the_socket_lets_them_change(self):
        self.assert_roles(lambda path, **more: self.curl(self.url + path, **more), reads=True, changes=False)
        self.assert_roles(lambda path, **more: self.curl("http://localhost" + path, "--unix-socket", self.socket, **more),
                          reads=True, changes=True)

    def test_serves_the_command_line(self):
        address = f"tcp:127.0.0.1:{self.port}"
        over_tcp = self.kovactl("--agent", address, "-o", "json", "disks")
        self.assert_ended(over_tcp, 0)
        self.assertEqual(over_tcp.out, self.ask_agent("-o", "json", "disks").out)
        self.assert_ended(self.kovactl("--agent", address, "claim"), 1, "role")
        self.assert_ended(self.kovactl("--agent", "tcp:127.0.0.1:1", "disks"), 3, "127.0.0.1:1")

    def test_has_places_for_each_client_and_says_when_they_are_taken(self):
        crowd = [socket.create_connection(("127.0.0.1", self.port)) for _ in range(64)]
        for client in crowd:
            self.addCleanup(client.close)
            client.sendall(b"GET /healthz HTTP/1.1\r\nHost: kova.example\r\n\r\n")
            self.assertIn(b"200 OK", client.recv(4096))
        refused = self.kovactl("--agent", f"tcp:127.0.0.1:{self.port}", "disks")
        self.assert_ended(refused, 3, "too many connections of this client; try again later")
        self.assertNotIn("Start one", refused.err)
        self.assert_ended(self.ask_agent("disks"), 0)
        log = self.read("agentd.log")
        self.assertRegex(log, r"Refused 127\.0\.0\.1:\d+ on tcp:127\.0\.0\.1:\d+: too many connections of this client")
        metrics = self.http().ask("GET", "/metrics")[1]
        self.assertIn('kova_agent_refusals_total{cause="connectionsOfPeer"} 1\n', metrics)
        self.assertIn(f'kova_agent_connections{{listener="tcp:127.0.0.1:{self.port}"}} 64\n', metrics)

    def test_holds_no_body_of_those_who_may_not_change(self):
        with open(f"/proc/{self.agent.pid}/status", encoding="ascii") as file:
            before = int(re.search(r"^VmRSS:\s+(\d+) kB", file.read(), re.MULTILINE)[1])
        head = (f"POST /api/v1/AddDisks HTTP/1.1\r\nHost: kova.example\r\nContent-Type: application/json\r\n"
                f"Content-Length: {16 << 20}\r\n\r\n").encode()
        crowd = [socket.create_connection(("127.0.0.1", self.port)) for _ in range(60)]
        for client in crowd:
            self.addCleanup(client.close)
            with contextlib.suppress(OSError):  # it may have been hung up on
                client.sendall(head + b" " * (4 << 20))
            self.assertIn(b" 403 ", client.recv(4096))
        with open(f"/proc/{self.agent.pid}/status", encoding="ascii") as file:
            most = int(re.search(r"^VmHWM:\s+(\d+) kB", file.read(), re.MULTILINE)[1])
        self.assertLess(most - before, 16 << 10, "KiB")

    def test_refuses_requests_meant_for_another_host(self):
        for host, status in (("127.0.0.1:1", 421), ("evil.example", 421), (f"evil.example:{self.port}", 421), ("", 421),
                             ("<script>'\"", 400), (f"localhost:{self.port}", 200), ("kova.example", 200)):
            with self.subTest(host=host):
                answer = self.curl(self.url + "/healthz", "--header", "Host: " + host if host else "Host;")
                self.assertEqual(answer[0], status)
                self.assertNotIn("evil", answer[1])
                self.assertNotIn("<", answer[1])

    def test_is_open_to_this_host_only(self):
        self.socket = self.path("second.sock")
        outcome = self.agentd("--listen", "tcp:0.0.0.0:0")
        self.assertFalse(os.path.exists(self.socket), "nothing is left behind")
        self.assert_ended(outcome, 2, "without TLS")

    def test_refuses_changes_of_pages_in_browsers(self):
        status, text = self.curl("http://localhost/api/v1/ClaimUnmountedDiskgroup", "--unix-socket", self.socket,
                                 "--header", "Origin: http://evil.example", body="{}")
        self.assertEqual(status, 403)
        self.assertEqual(json.loads(text)["fault"]["@type"], "NotPermitted")

    def test_echoes_nothing_of_a_request_unescaped(self):
        nasty = b"<i>\"'\x01"
        for request in (b"GET /" + nasty + b" HTTP/1.1\r\nHost: 127.0.0.1:%d\r\n\r\n" % self.port,
                        b"GET /api/v1/disks?" + nasty + b" HTTP/1.1\r\nHost: 127.0.0.1:%d\r\n\r\n" % self.port,
                        b"GET /healthz HTTP/1.1\r\nHost: " + nasty + b"\r\n\r\n",
                        b"GET /api/v1/disks?%%3Ci%%3E%%22%%27%%01=1 HTTP/1.1\r\nHost: 127.0.0.1:%d\r\n\r\n" % self.port,
                        b"POST /soap HTTP/1.1\r\nHost: 127.0.0.1:%d\r\nContent-Type: <i>\"'\r\nContent-Length: 0\r\n\r\n"
                        % self.port,
                        b"POST /soap HTTP/1.1\r\nHost: 127.0.0.1:%d\r\nContent-Type: text/xml\r\nSOAPAction: <i>\"'\r\n"
                        b"Content-Length: %d\r\n\r\n%s" % (self.port, len(SOAP.format("GetStorageInfo")),
                                                          SOAP.format("GetStorageInfo").encode())):
            with self.subTest(request=request), socket.create_connection(("127.0.0.1", self.port)) as client:
                client.sendall(request)
                client.shutdown(socket.SHUT_WR)
                answer = b""
                while chunk := client.recv(65536):
                    answer += chunk
                self.assertRegex(answer, rb"^HTTP/1.1 [45]\d\d ")
                for part in (b"<i>", b"\"'", b"\x01"):
                    self.assertNotIn(part, answer)


class TlsTest(NetworkTest):
    """With a CA, strangers of another, and an agent's certificate."""

    def setUp(self):
        super().setUp()
        self.make_ca("ca")
        self.make_ca("strangers")
        self.issue("server", "ca", "/CN=kova", "subjectAltName=IP:127.0.0.1,DNS:kova.example,DNS:localhost")
        self.tls = self.tls_of("server")

    @staticmethod
    def tls_of(server):
        return ["--tls-cert", server + ".pem", "--tls-key", server + ".key", "--tls-client-ca", "ca.pem"]


@unittest.skipUnless(shutil.which("curl"), "curl is not installed")
@unittest.skipUnless(shutil.which("openssl"), "openssl is not installed")
class Tls(TlsTest):
    def ask(self, path, *more, **body):
        return self.curl(f"https://127.0.0.1:{self.port}{path}", "--cacert", "ca.pem", *more, **body)

    def ask_as(self, certificate):
        shown = ("--cert", certificate + ".pem", "--key", certificate + ".key") if certificate else ()
        return lambda path, **body: self.ask(path, *shown, **body)

    def test_knows_clients_by_the_names_in_their_certificates(self):
        self.issue("operator", "ca", "/O=KOVA/CN=operator")
        self.issue("monitor", "ca", "/CN=somebody", "subjectAltName=DNS:other.example,DNS:monitor.example")
        self.issue("nobody", "ca", "/CN=nobody", "subjectAltName=email:operator")
        self.start(*self.tls, "--change-name", "operator", "--read-name", "monitor.example")
        self.assert_roles(self.ask_as("operator"), reads=True, changes=True)
        self.assert_roles(self.ask_as("monitor"), reads=True, changes=False)
        for certificate in ("nobody", None):
            with self.subTest(certificate=certificate):
                ask = self.ask_as(certificate)
                self.assertEqual(ask("/healthz"), (200, "ok\n"))
                self.assert_permitted(ask("/api/v1/disks"), False, "read")
                self.assert_permitted(ask("/api/v1/ClaimUnmountedDiskgroup", body="{}"), False, "change")
                status, text = ask("/soap", body=SOAP.format("GetStorageInfo"), content_type="text/xml")
                self.assertEqual(status, 500)
                self.assertIn('xsi:type="NotPermitted"', text)
        log = self.read("agentd.log")
        self.assertIn("certificate 'nobody' at 127.0.0.1:", log)
        self.assertIn("a client without a certificate at 127.0.0.1:", log)

    def test_refuses_certificates_that_are_not_of_the_ca_or_not_valid(self):
        self.issue("forged", "strangers", "/CN=operator")
        self.issue("expired", "ca", "/CN=operator", days="-1")
        self.issue("server-only", "ca", "/CN=operator", "extendedKeyUsage=serverAuth")
        self.start(*self.tls, "--change-name", "operator")
        for certificate in ("forged", "expired", "server-only"):
            with self.subTest(certificate=certificate):
                outcome = self.run_program("curl", "--silent", "--show-error", "--cacert", "ca.pem", "--cert",
                                           certificate + ".pem", "--key", certificate + ".key",
                                           f"https://127.0.0.1:{self.port}/healthz")
                self.assertNotEqual(outcome.status, 0)
                self.assertEqual(outcome.out, "")
        self.assertEqual(self.ask("/healthz"), (200, "ok\n"), "others are served")

    def test_speaks_nothing_older_than_1_2_and_nothing_in_the_clear(self):
        self.start(*self.tls)
        for version in ("1.2", "1.3"):
            self.assertEqual(self.ask("/healthz", "--tlsv" + version, "--tls-max", version)[0], 200)
        old = self.run_program("curl", "--silent", "--cacert", "ca.pem", "--ciphers", "DEFAULT@SECLEVEL=0", "--tlsv1.0",
                               "--tls-max", "1.1", f"https://127.0.0.1:{self.port}/healthz")
        self.assertNotEqual(old.status, 0)
        clear = self.run_program("curl", "--silent", f"http://127.0.0.1:{self.port}/healthz")
        self.assertNotEqual(clear.status, 0)
        self.assertEqual(clear.out, "")

    def test_looks_at_the_host_too(self):
        self.start(*self.tls, "--server-name", "kova.example")
        self.assertEqual(self.ask("/healthz", "--header", "Host: evil.example")[0], 421)
        answer = self.curl(f"https://kova.example:{self.port}/healthz", "--cacert", "ca.pem", "--resolve",
                           f"kova.example:{self.port}:127.0.0.1")
        self.assertEqual(answer, (200, "ok\n"))

    def test_serves_many_requests_and_large_answers_on_one_connection(self):
        self.issue("operator", "ca", "/CN=operator")
        many = {"name": "a", "disks": [disk(f"naa.{number}") for number in range(600)]}
        self.start_agent("--host", self.write("many.json", many), "--listen", "tcp:127.0.0.1:0", *self.tls,
                         "--read-name", "operator")
        url = "https" + self.addresses[1].removeprefix("tcp").replace(":", "://", 1) + "/api/v1/disks"
        outcome = self.run_program("curl", "--silent", "--show-error", "--cacert", "ca.pem", "--cert", "operator.pem",
                                   "--key", "operator.key", "--write-out", "\n%{num_connects}\n", url, url, url)
        self.assert_ended(outcome, 0)
        lines = outcome.out.splitlines()
        answers = [json.loads(line) for line in lines if line.startswith("{")]
        self.assertEqual([len(answer["result"]) for answer in answers], [600] * 3)
        self.assertEqual([line for line in lines if re.fullmatch(r"\d", line)], ["1", "0", "0"])

    def test_must_have_all_its_files(self):
        listen = ("--listen", "tcp:127.0.0.1:0")
        self.assert_ended(self.agentd(*listen, *self.tls[:4]), 2, "--tls-client-ca")
        self.assert_ended(self.agentd(*listen, *self.tls[:2], "--tls-key", "none.key", *self.tls[4:]), 2, "none.key")
        self.assert_ended(self.agentd(*listen, *self.tls[:2], "--tls-key", "ca.key", *self.tls[4:]), 2, "ca.key")
        self.assertFalse(os.path.exists(self.socket))


@unittest.skipUnless(shutil.which("openssl"), "openssl is not installed")
class CommandLineByTls(TlsTest):
    def setUp(self):
        super().setUp()
        self.issue("operator", "ca", "/CN=operator")
        self.issue("monitor", "ca", "/CN=monitor")

    def start(self, *arguments):
        super().start(*(arguments or self.tls), "--change-name", "operator", "--read-name", "monitor")
        self.address = f"tls:127.0.0.1:{self.port}"

    def ask_as(self, certificate, *command, ca="ca"):
        shown = ("--cert", certificate + ".pem", "--key", certificate + ".key") if certificate else ()
        return self.kovactl("--agent", self.address, "--ca", ca + ".pem", *shown, *command)

    def test_may_do_what_its_certificate_may(self):
        self.start()
        disks = self.ask_as("monitor", "-o", "json", "disks")
        self.assert_ended(disks, 0)
        self.assertEqual(disks.out, self.ask_agent("-o", "json", "disks").out)
        self.assert_ended(self.ask_as("monitor", "add", "--all", "--yes"), 1, "role does not allow this: change")
        self.assert_ended(self.ask_as("operator", "add", "--all", "--yes"), 0)
        self.assertIn("naa.1", self.ask_as("monitor", "groups").out)
        self.assert_ended(self.ask_as("operator", "tasks"), 0)
        self.assert_ended(self.ask_as("operator", "plan", "remove-group", "naa.1"), 0)
        self.assert_ended(self.ask_as(None, "disks"), 1, "role does not allow this: read")

    def test_takes_its_files_from_the_environment(self):
        self.start()
        variables = {"KOVA_AGENT": self.address, "KOVA_AGENT_CA": self.path("ca.pem"),
                     "KOVA_AGENT_CERT": self.path("operator.pem"), "KOVA_AGENT_KEY": self.path("operator.key")}
        with unittest.mock.patch.dict(os.environ, variables):
            self.assert_ended(self.kovactl("claim"), 0)
            self.assert_ended(self.kovactl("--cert", "monitor.pem", "--key", "monitor.key", "claim"), 1, "role")
            self.assert_ended(self.kovactl("--ca", "strangers.pem", "disks"), 3, "strangers.pem")
            self.assert_ended(self.ask_agent("disks"), 0)

    def test_trusts_only_the_agent_that_it_asks_for(self):
        self.start()
        agent = f"the certificate of the agent on 127.0.0.1:{self.port} "
        self.assert_ended(self.ask_as("operator", "disks", ca="strangers"), 3, agent + "is not of the CA strangers.pem")
        self.assert_ended(self.kovactl("--agent", self.address, "disks"), 3, agent + "is of no CA that this host trusts")
        self.address = f"tls:localhost:{self.port}"
        self.assert_ended(self.ask_as("operator", "disks"), 0)
        for name, names, told in (("other", "DNS:other.example,IP:127.0.0.2", "is not for '127.0.0.1'"),
                                  ("expired", "IP:127.0.0.1", "certificate has expired")):
            with self.subTest(certificate=name):
                self.issue(name, "ca", "/CN=127.0.0.1", "subjectAltName=" + names,
                           days="-1" if name == "expired" else "2")
                self.socket = self.path(name + ".sock")
                self.start(*self.tls_of(name))
                self.assert_ended(self.ask_as("operator", "disks"), 3, told)

    def test_says_what_an_agent_has_against_its_certificate(self):
        self.start()
        self.issue("forged", "strangers", "/CN=operator")
        self.issue("expired", "ca", "/CN=operator", days="-1")
        for certificate in ("forged", "expired"):
            refused = self.ask_as(certificate, "claim")
            self.assert_ended(refused, 3, certificate + ".pem")
            self.assertIn("refuse", refused.err)

    def test_says_that_an_agent_wants_a_certificate(self):
        with subprocess.Popen(["openssl", "s_server", "-accept", "127.0.0.1:0", "-cert", "server.pem", "-key",
                               "server.key", "-CAfile", "ca.pem", "-Verify", "1", "-verify_return_error", "-tls1_2"],
                              cwd=self.folder, stdin=subprocess.PIPE, stdout=subprocess.PIPE,
                              stderr=subprocess.DEVNULL, text=True) as server:
            self.addCleanup(self.end, server)
            line = next(line for line in server.stdout if line.startswith("ACCEPT"))
            self.address = "tls:" + line.split()[1]
            self.assert_ended(self.ask_as(None, "disks"), 3, "wants a certificate")
            server.kill()

    def test_says_which_side_does_not_speak_tls(self):
        NetworkTest.start(self)
        self.address = f"tls:127.0.0.1:{self.port}"
        self.assert_ended(self.ask_as("operator", "disks"), 3, "does not speak TLS")
        self.socket = self.path("second.sock")
        self.start()
        self.assert_ended(self.kovactl("--agent", f"tcp:127.0.0.1:{self.port}", "disks"), 3, "its address is tls:")

    def test_takes_files_that_go_together(self):
        self.address = "tls:127.0.0.1:1"
        self.assert_ended(self.ask_as("operator", "disks"), 3, "no agent answers on 127.0.0.1:1")
        for arguments, told in ((("--cert", "operator.pem"), "--key"),
                                (("--key", "operator.key"), "--cert"),
                                (("--cert", "operator.pem", "--key", "monitor.key"),
                                 "monitor.key: it is not that of the certificate operator.pem"),
                                (("--cert", "none.pem", "--key", "monitor.key"), "none.pem"),
                                (("--ca", "none.pem"), "none.pem"),
                                (("--agent", "unix:" + self.socket, "--ca", "ca.pem"), "tls:HOST:PORT"),
                                (("--agent", "tls:127.0.0.1"), "tls:HOST:PORT"),
                                (("--host", self.write("host.json", HOST), "--ca", "ca.pem"), "--host")):
            with self.subTest(arguments=arguments), \
                    unittest.mock.patch.dict(os.environ, {"KOVA_AGENT": self.address}):
                self.assert_ended(self.kovactl(*arguments, "disks"), 2, told)


@unittest.skipUnless(shutil.which("curl"), "curl is not installed")
@unittest.skipUnless(os.geteuid() == 0, "only root can ask as somebody else")
class UsersOfTheSocket(NetworkTest):
    """The socket's mode lets nobody else in; here it is opened, so that the agent itself must tell them apart."""

    def ask_as(self, uid, gid=65534, groups=()):
        return lambda path, **body: self.curl("http://localhost" + path, "--unix-socket", self.socket, **body,
                                              user=uid, group=gid, extra_groups=list(groups))

    def test_are_told_apart(self):
        self.start("--change-uid", "4711", "--change-group", "4801", "--read-uid", "4712", "--read-group", "4802")
        os.chmod(self.folder, 0o755)
        os.chmod(self.socket, 0o666)
        self.assert_roles(self.ask_as(4711), reads=True, changes=True)
        self.assert_roles(self.ask_as(4712), reads=True, changes=False)
        self.assert_roles(self.ask_as(4799, groups=[4801]), reads=True, changes=True)
        self.assert_roles(self.ask_as(4799, gid=4802), reads=True, changes=False)
        self.assertEqual(self.ask_as(4799)("/healthz"), (200, "ok\n"))
        self.assert_permitted(self.ask_as(4799)("/api/v1/disks"), False, "read")
        self.assertIn("uid 4799", self.read("agentd.log"))

    def test_cannot_even_connect_when_the_socket_is_left_as_it_is(self):
        self.start()
        self.assertEqual(stat.S_IMODE(os.stat(self.socket).st_mode), 0o660)
        os.chmod(self.folder, 0o755)
        outcome = subprocess.run(["curl", "--silent", "--unix-socket", self.socket, "http://localhost/healthz"],
                                 capture_output=True, user=4799, group=4799, extra_groups=[], cwd="/", check=False)
        self.assertEqual((outcome.returncode, outcome.stdout), (7, b""))


class ReadyFile(NetworkTest):
    def test_holds_an_address_a_line_as_they_are_answered_on(self):
        second = self.path("second.sock")
        self.start_agent("--listen", "tcp:127.0.0.1:0", "--listen", "unix:" + second, "--listen", "tcp:[::1]:0")
        self.assertEqual([re.sub(r":[1-9]\d*$", ":PORT", address) for address in self.addresses],
                         ["unix:" + self.socket, "tcp:127.0.0.1:PORT", "unix:" + second, "tcp:[::1]:PORT"])
        for address in self.addresses:
            self.assert_ended(self.kovactl("--agent", address, "disks"), 0)


if __name__ == "__main__":
    unittest.main(verbosity=2)
