#!/usr/bin/env python3
"""An agent whose doors are besieged: its Unix socket answers others as it does in peace, and memory stays flat.

    KOVA_BIN=$PWD/build/release/bin door.py [SECONDS]

At each of its addresses (Unix, TCP, TLS) a crowd that is kept at its size connects and does nothing, sends headers
or bodies byte by byte, or sends bodies that it may not send. Meanwhile somebody else asks on the Unix socket, each
time on a new connection. Prints a line for each siege. Not one of the tests that run with every change: it takes
minutes.
"""

import asyncio
import contextlib
import multiprocessing
import os
import re
import resource
import ssl
import statistics
import sys
import time
import unittest

from programs import Agent, ProgramTest, disk

CROWD = 2000
DEFAULT_SECONDS = 6  # of each siege
SETTLE_SECONDS = 1.5  # until the crowd stands
DRIP_SECONDS = 0.2  # between two bytes, and before a client that was turned away comes back
READER, NOBODY = 65534, 65533  # users; taken by the crowd on the Unix socket, where this runs as root

ALLOWED_GROWTH_MIB = 64
ALLOWED_LATENCY = 0.5  # seconds, of the slowest; the crowd keeps the machine busy too

HEAD = "POST {} HTTP/1.1\r\nHost: localhost:{}\r\nContent-Type: application/json\r\nContent-Length: {}\r\n\r\n"


async def idle(_reader, _writer, _port):
    await asyncio.sleep(3600)


async def slow_heads(_reader, writer, _port):
    await drip(writer, b"GET /healthz HTTP/1.1\r\nX: ")


async def slow_bodies(_reader, writer, port):
    await drip(writer, HEAD.format("/api/v1/QueryDisksForKova", port, 1 << 20).encode())


async def drip(writer, begin):
    writer.write(begin)
    while True:
        await writer.drain()
        await asyncio.sleep(DRIP_SECONDS)
        writer.write(b"x")


async def forbidden_bodies(_reader, writer, port):
    writer.write(HEAD.format("/api/v1/AddDisks", port, 16 << 20).encode())
    for _ in range(256):
        writer.write(b" " * (64 << 10))
        await writer.drain()


SIEGES = [idle, slow_heads, slow_bodies, forbidden_bodies]


async def besiege_one(place, siege, over):
    """Comes, does what the siege is, and comes back when it is turned away."""
    while not over.is_set():
        with contextlib.suppress(OSError, asyncio.IncompleteReadError, ssl.SSLError):
            if place["path"]:
                reader, writer = await asyncio.open_unix_connection(place["path"])
            else:
                context = ssl.create_default_context(cafile=place["ca"]) if place["ca"] else None
                reader, writer = await asyncio.open_connection("127.0.0.1", place["port"], ssl=context)
            try:
                gone = asyncio.ensure_future(reader.read(1 << 16))
                work = asyncio.ensure_future(siege(reader, writer, place["port"]))
                await asyncio.wait([gone, work], return_when=asyncio.FIRST_COMPLETED)
                for task in (gone, work):
                    task.cancel()
                await asyncio.gather(gone, work, return_exceptions=True)
            finally:
                writer.transport.abort()
        await asyncio.sleep(DRIP_SECONDS)


async def besiege(place, siege, seconds):
    over = asyncio.Event()
    crowd = [asyncio.ensure_future(besiege_one(place, siege, over)) for _ in range(CROWD)]
    await asyncio.sleep(seconds)
    over.set()
    for one in crowd:
        one.cancel()
    await asyncio.gather(*crowd, return_exceptions=True)


def run_crowd(place, siege, user, seconds):
    """In a process of its own, whose descriptors and user are its own too."""
    hard = resource.getrlimit(resource.RLIMIT_NOFILE)[1]
    resource.setrlimit(resource.RLIMIT_NOFILE, (hard, hard))
    if user is not None:
        os.setgroups([])
        os.setgid(user)
        os.setuid(user)
    sys.stderr = open(os.devnull, "w", encoding="ascii")  # what the event loop says of connections that broke
    asyncio.run(besiege(place, siege, seconds))


def field(process, name):
    with open(f"/proc/{process.pid}/status", encoding="ascii") as file:
        return int(re.search(rf"^{name}:\s+(\d+) kB", file.read(), re.MULTILINE)[1]) / 1024


def forget_peak(process):
    with open(f"/proc/{process.pid}/clear_refs", "w", encoding="ascii") as file:
        file.write("5")


class Door(ProgramTest):
    seconds = DEFAULT_SECONDS

    def setUp(self):
        super().setUp()
        os.chmod(self.folder, 0o755)
        self.host = self.write("host.json", {"name": "door", "disks": [disk("naa.1", True), disk("naa.2")]})

    def start(self, *more):
        """An agent, and the place of its TCP port."""
        agent = self.start_agent("--host", self.host, "--read-uid", str(READER), "--listen", "tcp:127.0.0.1:0",
                                 "--log-level", "warning", *more)
        os.chmod(self.socket, 0o666)
        return agent, int(self.addresses[1].rpartition(":")[2])

    def tls_files(self):
        extension = "subjectAltName=IP:127.0.0.1"
        made = self.run_program("openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256",
                                "-nodes", "-days", "2", "-subj", "/CN=door", "-addext", extension,
                                "-keyout", "door.key", "-out", "door.pem")
        self.assertEqual(made.status, 0, made.err)
        return ["--tls-cert", "door.pem", "--tls-key", "door.key", "--tls-client-ca", "door.pem"]

    def ask_for(self, seconds):
        """Times of requests on the Unix socket, each on a connection of its own."""
        times = []
        end = time.monotonic() + seconds
        while time.monotonic() < end:
            begin = time.monotonic()
            client = Agent(self.socket)
            status, _ = client.get("config")
            client.close()
            times.append(time.monotonic() - begin)
            self.assertEqual(status, 200)
            time.sleep(0.002)
        return times

    def refusals(self):
        client = Agent(self.socket)
        _, text = client.ask("GET", "/metrics")
        client.close()
        return {cause: int(count) for cause, count in
                re.findall(r'^kova_agent_refusals_total\{cause="(\w+)"\} (\d+)', text, re.MULTILINE)}

    def measure(self, label, agent, crowd=None):
        before, refused = field(agent, "VmRSS"), self.refusals()
        forget_peak(agent)
        if crowd:
            crowd.start()
            time.sleep(SETTLE_SECONDS)
        times = sorted(self.ask_for(self.seconds))
        if crowd:
            crowd.terminate()
            crowd.join()
        peak = field(agent, "VmHWM")
        counted = {cause: count - refused[cause] for cause, count in self.refusals().items() if count > refused[cause]}
        print(f"{label:32} {len(times):6} {statistics.median(times) * 1e3:8.2f} "
              f"{times[int(len(times) * 0.99)] * 1e3:8.2f} {times[-1] * 1e3:8.2f} {before:8.1f} {peak:8.1f}  "
              + (", ".join(f"{cause} {count}" for cause, count in counted.items()) or "-"), flush=True)
        if crowd:
            self.assertLess(times[-1], ALLOWED_LATENCY, label)
        self.assertLess(peak - before, ALLOWED_GROWTH_MIB, label)

    def besiege(self, name, agent, place, users):
        self.measure(f"{name}, in peace", agent)
        for siege in SIEGES:
            user = users[siege is forbidden_bodies] if users else None
            crowd = multiprocessing.Process(target=run_crowd,
                                            args=(place, siege, user, SETTLE_SECONDS + self.seconds + 5))
            self.measure(f"{name}, {siege.__name__.replace('_', ' ')}", agent, crowd)

    def test_stands(self):
        print(f"\n{CROWD} clients at each address; {self.seconds} s each; times in ms, memory in MiB\n"
              f"{'':32} {'asked':>6} {'median':>8} {'99 %':>8} {'slowest':>8} {'before':>8} {'most':>8}  refused")
        agent, port = self.start()
        is_root = os.geteuid() == 0
        self.besiege("unix" if is_root else "unix (own user)", agent,
                     {"path": self.socket, "port": port, "ca": ""}, (READER, NOBODY) if is_root else None)
        self.besiege("tcp", agent, {"path": "", "port": port, "ca": ""}, None)
        self.assertEqual(self.stop(agent), 0, self.read("agentd.log"))
        agent, port = self.start(*self.tls_files())
        self.besiege("tls", agent, {"path": "", "port": port, "ca": self.path("door.pem")}, None)
        self.assertEqual(self.stop(agent), 0, self.read("agentd.log"))
        lines = self.read("agentd.log").count("\n")
        print(f"{lines} lines in the log", flush=True)
        self.assertLess(lines, 1000, "the log is bounded too")


if __name__ == "__main__":
    if len(sys.argv) > 1:
        Door.seconds = int(sys.argv.pop(1))
    unittest.main()
