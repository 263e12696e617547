"""The emulator's process and its control socket. One machine at a time runs on a host, whoever started it."""

import contextlib
import ctypes
import fcntl
import json
import os
import signal
import socket
import subprocess
import tempfile
import time

PROGRAM = "qemu-system-x86_64"
LOCK = os.path.join(tempfile.gettempdir(), "kova-lab.lock")
PR_SET_PDEATHSIG = 1


class Failed(Exception):
    """What the machine did not do; with the end of its console, where that helps."""


@contextlib.contextmanager
def only_machine(limit=900):
    """Waits until no other lab runs on this host."""
    try:
        lock = os.open(LOCK, os.O_RDWR | os.O_CREAT | os.O_NOFOLLOW | os.O_CLOEXEC, 0o666)
    except PermissionError:  # another user's, and in a folder of everybody
        lock = os.open(LOCK, os.O_RDONLY | os.O_NOFOLLOW | os.O_CLOEXEC)
    with os.fdopen(lock, "rb"):
        wait_for_lock(lock, limit)
        yield


def wait_for_lock(lock, limit):
    deadline = time.monotonic() + limit
    told = False
    while True:
        try:
            fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
            return
        except BlockingIOError:
            if time.monotonic() > deadline:
                raise Failed(f"another lab has been running on this host for {limit} s: {LOCK} is locked") from None
        if not told:
            print("Another lab runs on this host; waiting for it.", flush=True)
            told = True
        time.sleep(0.5)


def start(arguments, log):
    """A process that ends with its starter, even if that is killed. What it says is added to the log."""
    libc = ctypes.CDLL(None)

    def end_with_parent():
        libc.prctl(PR_SET_PDEATHSIG, signal.SIGKILL)

    with open(log, "ab") as out:
        return subprocess.Popen([PROGRAM, *arguments], stdin=subprocess.DEVNULL, stdout=out, stderr=out,
                                preexec_fn=end_with_parent)


def end(process):
    """By its id, and whatever state it is in."""
    if process.poll() is None:
        process.kill()
    process.wait(30)


class Control:
    """The emulator's control socket (QMP): commands with answers, and events in between."""

    def __init__(self, connection, limit=30):
        self._connection = connection
        self._connection.settimeout(limit)
        self._lines = connection.makefile("rb")
        self._events = []
        self._read("its greeting")
        self.command("qmp_capabilities")

    def close(self):
        self._lines.close()
        self._connection.close()

    def command(self, name, **arguments):
        text = json.dumps({"execute": name, "arguments": arguments})
        with self._told(text):
            self._connection.sendall(text.encode() + b"\n")
        while True:
            message = self._read(text)
            if "error" in message:
                raise Failed(f"{text}: {message['error']['desc']}")
            if "return" in message:
                return message["return"]
            self._events.append(message)

    def event(self, name, **data):
        """Waits for an event that has these data, and takes it."""
        while True:
            for event in self._events:
                if event.get("event") == name and data.items() <= event.get("data", {}).items():
                    self._events.remove(event)
                    return event
            self._events.append(self._read(f"{name} {data}"))

    def _read(self, waiting_for):
        with self._told(waiting_for):
            line = self._lines.readline()
            if not line:
                raise ConnectionError
            return json.loads(line)

    @staticmethod
    @contextlib.contextmanager
    def _told(waiting_for):
        try:
            yield
        except TimeoutError:
            raise Failed(f"the emulator does not tell of {waiting_for}") from None
        except OSError:
            raise Failed(f"the emulator has closed its control socket: {waiting_for}") from None


def connect(path, process, limit=20):
    """A connection to a socket of the emulator, which makes it when it starts."""
    deadline = time.monotonic() + limit
    while True:
        connection = socket.socket(socket.AF_UNIX)
        try:
            connection.connect(path)
            return connection
        except OSError:
            connection.close()
            if process.poll() is not None:
                raise Failed(f"the emulator ended with status {process.returncode}") from None
            if time.monotonic() > deadline:
                raise Failed(f"the emulator does not open {path}") from None
        time.sleep(0.02)
