"""The programs as tests of them run them: agents that are gone when the test is, commands with their output."""

import http.client
import json
import os
import shutil
import socket
import subprocess
import tempfile
import time
import unittest

BIN = os.environ["KOVA_BIN"]
EXAMPLES = os.environ.get("KOVA_EXAMPLE_HOSTS", "")
PATIENCE = 120  # seconds; generous, for builds with sanitizers on a busy machine


def disk(name, ssd=False, **more):
    """A disk of a host description."""
    return {"name": name, "ssd": ssd, "bytes": 1 << 40, **more}


class Agent(http.client.HTTPConnection):
    """A client of an agent's JSON routes, on one connection."""

    def __init__(self, path, timeout=PATIENCE):
        super().__init__("localhost", timeout=timeout)
        self.path = path

    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(self.timeout)
        self.sock.connect(self.path)

    def ask(self, method, target, body=None):
        """Status, and the answer as JSON."""
        status, answer, _ = self.ask_fully(method, target, body)
        return status, answer

    def ask_fully(self, method, target, body=None):
        """The same, and the headers. What is no text is sent as JSON."""
        content = body if body is None or isinstance(body, str) else json.dumps(body)
        self.request(method, target, content, {} if body is None else {"Content-Type": "application/json"})
        response = self.getresponse()
        text = response.read().decode()
        is_json = response.headers["Content-Type"] == "application/json"
        return response.status, json.loads(text) if is_json else text, response.headers

    def get(self, target):
        return self.ask("GET", "/api/v1/" + target)

    def post(self, operation, **parameters):
        return self.ask("POST", "/api/v1/" + operation, parameters)


class Outcome:
    """How a command ended."""

    def __init__(self, process):
        self.status = process.returncode
        self.out = process.stdout
        self.err = process.stderr

    def json(self):
        return json.loads(self.out)

    def lines(self):
        return [json.loads(line) for line in self.out.splitlines()]


class ProgramTest(unittest.TestCase):
    """Has a folder of its own, and takes down what it started."""

    maxDiff = None

    def setUp(self):
        self.folder = tempfile.mkdtemp(prefix="kova-e2e-", dir="/tmp")  # short: it holds sockets
        self.addCleanup(shutil.rmtree, self.folder)
        self.socket = self.path("agentd.sock")
        self.agents = 0
        self.addresses = []  # that the agent answers on

    def path(self, name):
        return os.path.join(self.folder, name)

    def write(self, name, content):
        """A file of the test; what is no text is written as JSON."""
        with open(self.path(name), "w", encoding="utf-8") as file:
            file.write(content if isinstance(content, str) else json.dumps(content))
        return self.path(name)

    def read(self, name):
        with open(self.path(name), encoding="utf-8") as file:
            return file.read()

    def run_program(self, *command, stdin=""):
        return Outcome(subprocess.run(command, input=stdin, capture_output=True, text=True, timeout=PATIENCE,
                                      cwd=self.folder, check=False))

    def kovactl(self, *arguments, stdin=""):
        return self.run_program(os.path.join(BIN, "kovactl"), *arguments, stdin=stdin)

    def ask_agent(self, *arguments):
        return self.kovactl("--agent", "unix:" + self.socket, *arguments)

    def http(self):
        """A connection to the agent."""
        agent = Agent(self.socket)
        self.addCleanup(agent.close)
        return agent

    def agentd(self, *arguments):
        """An agent that is not expected to stay."""
        return self.run_program(os.path.join(BIN, "agentd"), "--listen", "unix:" + self.socket, *arguments)

    def start_agent(self, *arguments):
        """An agent that answers by now."""
        self.agents += 1
        ready = self.path(f"ready{self.agents}")
        with open(self.path("agentd.log"), "a", encoding="utf-8") as log:
            agent = subprocess.Popen([os.path.join(BIN, "agentd"), "--listen", "unix:" + self.socket,
                                      "--ready-file", ready, *arguments],
                                     stdin=subprocess.DEVNULL, stdout=log, stderr=log, cwd=self.folder)
        self.addCleanup(self.end, agent)
        deadline = time.monotonic() + PATIENCE
        while not (os.path.exists(ready) and os.path.getsize(ready)):
            self.assertIsNone(agent.poll(), self.read("agentd.log"))
            self.assertLess(time.monotonic(), deadline, "the agent does not get ready")
            time.sleep(0.01)
        with open(ready, encoding="utf-8") as file:
            self.addresses = file.read().splitlines()
        self.assertEqual(self.addresses[0], "unix:" + self.socket)
        return agent

    @staticmethod
    def end(agent):
        if agent.poll() is None:
            agent.kill()
        agent.wait(PATIENCE)

    def stop(self, agent):
        """Ends an agent as an operator does; its status."""
        agent.terminate()
        return agent.wait(PATIENCE)

    def assert_ended(self, outcome, status, told=""):
        self.assertEqual(outcome.status, status, outcome.err)
        self.assertIn(told, outcome.err)

    def openssl(self, *arguments):
        outcome = self.run_program("openssl", *arguments)
        self.assertEqual(outcome.status, 0, outcome.err)

    def make_ca(self, name):
        self.openssl("req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes", "-days", "2",
                     "-subj", "/CN=" + name, "-keyout", name + ".key", "-out", name + ".pem")

    def issue(self, name, ca, subject, extension=None, days="2"):
        """name.key and name.pem, signed by the CA."""
        self.write(name + ".ext", (extension or "basicConstraints=CA:FALSE") + "\n")
        self.openssl("req", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes", "-subj", subject,
                     "-keyout", name + ".key", "-out", name + ".csr")
        self.openssl("x509", "-req", "-in", name + ".csr", "-CA", ca + ".pem", "-CAkey", ca + ".key", "-CAcreateserial",
                     "-days", days, "-extfile", name + ".ext", "-out", name + ".pem")
