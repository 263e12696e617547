"""Runs a test program, the tests first that are likely to fail."""

import os
import re
import resource
import signal
import subprocess
import threading
import time
from collections import Counter
from dataclasses import dataclass
from pathlib import Path

SUITE = re.compile(r"^TEST(?:_F|_P)?\((\w+),", re.MULTILINE)
FAILED = re.compile(r"^\[  FAILED  \] ([\w./]+)", re.MULTILINE)
STARTED = re.compile(r"^\[ RUN      \] ([\w./]+)", re.MULTILINE)
MOST_MEMORY = 4 << 30
MOST_OUTPUT = 64 << 20
MOST_EARLIER = 20  # tests that failed before and are tried first


@dataclass
class Outcome:
    failed: bool
    why: str  # the test that failed, or in which the program ended


def run(program, filter_text, folder, limit):
    """Runs the tests that the filter names, until one fails. A program that takes too long is ended."""
    output = Path(folder) / "output"
    with open(output, "wb") as file:
        process = subprocess.Popen([program, "--gtest_fail_fast", f"--gtest_filter={filter_text}"], cwd=folder,
                                   stdin=subprocess.DEVNULL, stdout=file, stderr=file, start_new_session=True,
                                   env=os.environ | {"TMPDIR": str(folder)})
        restrict(process.pid)
        try:
            status = process.wait(limit)
        except subprocess.TimeoutExpired:
            status = None
        end_group(process)
    text = output.read_text(encoding="utf-8", errors="replace")
    if status == 0:
        return Outcome(False, "")
    failed, started = FAILED.findall(text), STARTED.findall(text)
    if failed:
        return Outcome(True, failed[0])
    return Outcome(True, f"{started[-1] if started else 'before any test'} ({ending(status)})")


def ending(status):
    if status is None:
        return "no end"
    return f"ended by {-status}" if status < 0 else f"ended with {status}"


def restrict(pid):
    try:
        resource.prlimit(pid, resource.RLIMIT_AS, (MOST_MEMORY, MOST_MEMORY))
        resource.prlimit(pid, resource.RLIMIT_FSIZE, (MOST_OUTPUT, MOST_OUTPUT))
        resource.prlimit(pid, resource.RLIMIT_CORE, (0, 0))
    except ProcessLookupError:
        pass  # it has ended already


def end_group(process):
    """Ends the process and what it has started, by the id of the group it leads."""
    try:
        os.killpg(process.pid, signal.SIGKILL)
    except ProcessLookupError:
        pass
    process.wait()


class Order:
    """Which tests are tried first for a file: those that stand beside it, those that found something in it."""

    def __init__(self, root, room):
        self._own = {}
        self._found = {}
        self._lock = threading.Lock()
        for path in (Path(root) / room).rglob("*_test.cpp"):
            source = str(path.relative_to(root)).removesuffix("_test.cpp")
            self._own[source] = sorted(set(SUITE.findall(path.read_text(encoding="utf-8"))))

    def first(self, file):
        """The filter of the tests to try first; empty when there are none."""
        own = [f"{suite}.*:*/{suite}.*" for suite in self._own.get(os.path.splitext(file)[0], [])]
        with self._lock:
            found = [test for test, _ in self._found.get(file, Counter()).most_common(MOST_EARLIER)]
        return ":".join(own + found)

    def learn(self, file, why):
        test = why.split(" ", maxsplit=1)[0]
        if "." in test:
            with self._lock:
                self._found.setdefault(file, Counter())[test] += 1


def whole_run(program, folder):
    """Runs all tests of the unchanged program; how long that takes."""
    start = time.monotonic()
    outcome = run(program, "*", folder, None)
    if outcome.failed:
        raise SystemExit(f"{program}: {outcome.why} fails without any change")
    return time.monotonic() - start
