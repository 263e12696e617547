#!/usr/bin/env python3
"""The emulator ends with its starter, runs once per host, and is understood in whatever order it speaks."""

import json
import os
import socket
import subprocess
import sys
import tempfile
import threading
import time
import unittest
from unittest import mock

import emulator

HERE = os.path.dirname(os.path.abspath(__file__))
STARTER = """
import os, signal, sys
sys.path.insert(0, sys.argv[1])
import emulator
emulator.PROGRAM = "sleep"
print(emulator.start(["600"], os.devnull).pid, flush=True)
os.kill(os.getpid(), signal.SIGKILL)
"""


def is_running(pid):
    try:
        with open(f"/proc/{pid}/stat", encoding="ascii") as file:
            return file.read().rpartition(")")[2].split()[0] not in "ZX"
    except FileNotFoundError:
        return False


class Process(unittest.TestCase):
    def test_ends_when_its_starter_is_killed(self):
        starter = subprocess.run([sys.executable, "-B", "-c", STARTER, HERE], capture_output=True, text=True,
                                 check=False)
        pid = int(starter.stdout)
        for _ in range(500):
            if not is_running(pid):
                return
            time.sleep(0.02)
        os.kill(pid, 9)
        self.fail("it runs on")

    def test_is_ended_by_its_id(self):
        with mock.patch("emulator.PROGRAM", "sleep"):
            process = emulator.start(["600"], os.devnull)
        emulator.end(process)
        self.assertFalse(is_running(process.pid))
        emulator.end(process)


class Lock(unittest.TestCase):
    def setUp(self):
        folder = self.enterContext(tempfile.TemporaryDirectory())
        self.enterContext(mock.patch("emulator.LOCK", folder + "/lock"))

    def test_lets_one_machine_run(self):
        with emulator.only_machine(), mock.patch("builtins.print"), self.assertRaises(emulator.Failed):
            with emulator.only_machine(limit=0.1):
                pass

    def test_is_free_when_the_machine_has_gone(self):
        for _ in range(2):
            with emulator.only_machine(limit=0):
                pass


class ControlSocket(unittest.TestCase):
    """The other side says what it is told to, and keeps what it hears."""

    def speak(self, *messages, close=False):
        here, there = socket.socketpair()
        self.heard = there.makefile("rb")

        def say():
            for message in messages:
                there.sendall(json.dumps(message).encode() + b"\n")
            if close:
                there.shutdown(socket.SHUT_WR)

        thread = threading.Thread(target=say)
        thread.start()
        thread.join()
        for one in (here, there, self.heard):
            self.addCleanup(one.close)
        control = emulator.Control(here, limit=0.5)
        self.addCleanup(control.close)
        return control

    def test_gives_the_answer_to_a_command(self):
        control = self.speak({"QMP": {}}, {"return": {}}, {"return": {"running": True}})
        self.assertEqual(control.command("query-status"), {"running": True})
        self.assertEqual([json.loads(self.heard.readline())["execute"] for _ in range(2)],
                         ["qmp_capabilities", "query-status"])

    def test_keeps_events_that_come_before_an_answer(self):
        deleted = {"event": "DEVICE_DELETED", "data": {"device": "hdd3", "path": "/x"}}
        control = self.speak({"QMP": {}}, {"return": {}}, {"event": "RESUME"}, deleted, {"return": {}})
        control.command("device_del", id="hdd3")
        self.assertEqual(control.event("DEVICE_DELETED", device="hdd3"), deleted)

    def test_does_not_take_the_event_of_another_device(self):
        control = self.speak({"QMP": {}}, {"return": {}}, {"event": "DEVICE_DELETED", "data": {"device": "hdd4"}})
        with self.assertRaisesRegex(emulator.Failed, "does not tell of DEVICE_DELETED"):
            control.event("DEVICE_DELETED", device="hdd3")

    def test_takes_no_event_twice(self):
        control = self.speak({"QMP": {}}, {"return": {}}, {"event": "STOP"})
        control.event("STOP")
        with self.assertRaises(emulator.Failed):
            control.event("STOP")

    def test_tells_what_was_refused_and_why(self):
        control = self.speak({"QMP": {}}, {"return": {}}, {"error": {"desc": "no such device"}})
        with self.assertRaisesRegex(emulator.Failed, "device_del.*no such device"):
            control.command("device_del", id="x")

    def test_tells_that_it_was_closed(self):
        control = self.speak({"QMP": {}}, {"return": {}}, close=True)
        with self.assertRaisesRegex(emulator.Failed, "closed its control socket"):
            control.event("STOP")


if __name__ == "__main__":
    unittest.main()
