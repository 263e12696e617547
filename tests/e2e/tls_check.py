#!/usr/bin/env python3
"""What an agent speaks by TLS, looked at from outside by testssl, with each kind of key; and what a session that is
taken up again saves.

    KOVA_BIN=$PWD/build/release/bin tls_check.py

Prints what testssl found, and fails over everything that it finds worth a word. What it says of the certificates
themselves, which are made here, is left out. Not one of the tests that run with every change: it takes minutes.
"""

import http.client
import json
import shutil
import ssl
import subprocess
import time
import unittest

from programs import ProgramTest, disk

KEYS = {"EC": ["ec", "-pkeyopt", "ec_paramgen_curve:P-256"], "RSA": ["rsa:2048"]}
# Protocols, suites, forward secrecy, preferences, what the server offers by default, and known weaknesses.
CHECKS = ["-p", "-s", "-f", "-P", "-S", "-U"]
FINE = ("OK", "INFO")
REQUESTS = 300


def is_of_certificate(finding):
    return finding["id"].startswith("cert")


@unittest.skipUnless(shutil.which("testssl") and shutil.which("openssl"), "testssl is not installed")
class TlsCheck(ProgramTest):
    def serve(self, kind):
        made = self.run_program("openssl", "req", "-x509", "-newkey", *KEYS[kind], "-nodes", "-days", "2", "-subj",
                                "/CN=kova", "-addext", "subjectAltName=IP:127.0.0.1,DNS:localhost", "-keyout", "a.key",
                                "-out", "a.pem")
        self.assertEqual(made.status, 0, made.err)
        host = {"name": "a", "disks": [disk("naa.1", True)]}
        agent = self.start_agent("--host", self.write("host.json", host), "--listen", "tcp:127.0.0.1:0",
                                 "--tls-cert", "a.pem", "--tls-key", "a.key", "--tls-client-ca", "a.pem")
        return agent, int(self.addresses[1].rpartition(":")[2])

    def findings(self, port):
        report = self.path(f"testssl-{port}.json")
        subprocess.run(["testssl", "--quiet", "--warnings", "batch", "--color", "0", "--nodns", "none", "--add-ca",
                        self.path("a.pem"), "--jsonfile", report, *CHECKS, f"localhost:{port}"],
                       stdin=subprocess.DEVNULL, capture_output=True, timeout=1800, check=False, cwd=self.folder)
        with open(report, encoding="utf-8") as file:
            return [finding for finding in json.load(file) if not is_of_certificate(finding)]

    def test_nothing_is_found(self):
        for kind in KEYS:
            with self.subTest(key=kind):
                agent, port = self.serve(kind)
                findings = self.findings(port)
                bad = [finding for finding in findings if finding["severity"] not in FINE]
                print(f"\n{kind} key: {len(findings)} findings, {len(bad)} worth a word")
                for finding in findings:
                    print(f"  {finding['severity']:8} {finding['id']:28} {finding['finding']}")
                self.assertGreater(len(findings), 40, "it has hardly looked")
                self.assertEqual(bad, [])
                self.stop(agent)

    def test_a_session_taken_up_again_is_worth_it(self):
        for kind in KEYS:
            agent, port = self.serve(kind)
            for version in (ssl.TLSVersion.TLSv1_2, ssl.TLSVersion.TLSv1_3):
                context = ssl.create_default_context(cafile=self.path("a.pem"))
                context.maximum_version = version
                anew, _ = self.time_of_requests(context, port, resume=False)
                again, resumed = self.time_of_requests(context, port, resume=True)
                print(f"{kind} key, {version.name}: a request on a connection of its own takes {anew * 1e3:.2f} ms, "
                      f"{again * 1e3:.2f} ms with its session taken up again")
                self.assertEqual(resumed, REQUESTS - 1)
            self.stop(agent)

    def time_of_requests(self, context, port, resume):
        """Mean time, and how many connections went on with a session."""
        session, resumed = None, 0
        begin = time.monotonic()
        for _ in range(REQUESTS):
            client = http.client.HTTPSConnection("127.0.0.1", port, context=context)
            http.client.HTTPConnection.connect(client)
            client.sock = context.wrap_socket(client.sock, server_hostname="127.0.0.1", session=session)
            client.request("GET", "/healthz")
            self.assertEqual(client.getresponse().read()[:2], b"ok")
            resumed += client.sock.session_reused if client.sock else 0
            session = client.sock.session if resume else None
            client.close()
        return (time.monotonic() - begin) / REQUESTS, resumed


if __name__ == "__main__":
    unittest.main()
