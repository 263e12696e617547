"""What README shows of a machine with real disks, typed again."""

import os
import re

import agent
import real
from case import case, expect

README = os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..", "..", "README.md")
BLOCK = re.compile(r"^```sh-session\n(.*?)^```$", re.MULTILINE | re.DOTALL)
CUT = "  ..."  # a line that stands for any number of lines
SHOWN = ("flash0", "hdd0", "hdd1")  # the free disks of the machine that README shows


def session():
    """[(command, [line of output, ..]), ..]"""
    with open(README, encoding="utf-8") as file:
        lines = "".join(BLOCK.findall(file.read())).splitlines()
    found = []
    for line in lines:
        if line.startswith("# "):
            found.append((line[2:], []))
        else:
            found[-1][1].append(line)
    return found


def pattern(lines):
    """What the output must match: the kernel and the agent call disks and volumes otherwise each time, and blank lines at
    the end do not count."""
    while lines and not lines[-1]:
        lines = lines[:-1]
    text = "".join(r"(?:.*\n)*?" if line == CUT else re.escape(line) + "\n" for line in lines)
    text = re.sub(r"\(sd[a-z]+\\\)", r"(sd[a-z]+\\)", text)
    return "^" + re.sub(r"(kova|data)_[0-9a-f]{12}", r"\1_[0-9a-f]{12}", text) + "$"


@case()
def readme_shows_how_real_disks_become_a_mounted_group(machine):
    for name in real.FREE:
        if name not in SHOWN:
            machine.unplug(name)
    commands = session()
    expect.assertTrue(commands)
    with real.groups(machine):
        for command, promised in commands:
            if not command.startswith("agentd "):
                outcome = machine.check(f"export KOVA_AGENT=unix:{agent.SOCKET}\n{command} 2>&1", limit=120)
                expect.assertRegex(outcome.out, pattern(promised), command)
        machine.run("umount /srv/*")
