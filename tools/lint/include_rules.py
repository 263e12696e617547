#!/usr/bin/env python3
"""Checks who may include whom, and that third-party libraries stay in their rooms.

The table is the architecture, as ARCHITECTURE.md draws it. A folder may include itself, what its row
names, and the C++ standard library; system headers only where a row says so. A folder with a row of its own
is none of the folder around it: who may know it names it. No row leads back to where it came from.
"""

import re
import sys
from pathlib import Path

# Folder: folders, or single headers, that it may include. The longest folder that a file lies in counts.
RULES = {
    "tessa": [],
    "orbis": ["tessa"],
    "orbis/json": ["tessa", "orbis"],
    "orbis/xml": ["tessa/text", "orbis/Limits.h", "orbis/Namespaces.h", "orbis/ParseException.h"],
    "orbis/soap": ["tessa", "orbis", "orbis/json", "orbis/xml"],
    "nox": ["tessa", "orbis"],
    "kova/agentd/include": [],
    "kova/agentd/planning/pure": [],
    "kova/agentd": ["tessa", "orbis", "nox", "kova/agentd/include", "kova/agentd/disks", "kova/agentd/util"],
    "kova/agentd/util": ["tessa", "orbis", "nox"],
    "kova/agentd/disks": ["tessa", "orbis", "nox", "kova/agentd/include"],
    "kova/agentd/marshal": ["tessa", "orbis", "nox", "kova/agentd/include", "kova/agentd/disks", "kova/agentd/util"],
    "kova/agentd/query": ["tessa", "orbis", "nox", "kova/agentd/include", "kova/agentd/disks", "kova/agentd/marshal",
                          "kova/agentd/util", "kova/agentd/KovaManagerImpl.h"],
    "kova/agentd/planning": ["tessa", "orbis", "nox", "kova/agentd/include", "kova/agentd/disks",
                             "kova/agentd/marshal", "kova/agentd/util", "kova/agentd/planning/pure",
                             "kova/agentd/KovaManagerImpl.h"],
    "kova/agentd/operations": ["tessa", "orbis", "nox", "kova/agentd/include", "kova/agentd/disks",
                               "kova/agentd/marshal", "kova/agentd/planning/pure", "kova/agentd/KovaManagerImpl.h",
                               "kova/agentd/KovaLibManager.h"],
    "otxctl": ["kova/agentd/include"],
    "otxctl/provider": ["kova/agentd/include"],
    "otxctl/disks": ["kova/agentd/include/KovaRecords.h"],
    "otxctl/linux": ["tessa/text", "otxctl", "otxctl/disks", "otxctl/provider", "kova/agentd/include"],
    "otxctl/fault": ["otxctl/provider", "kova/agentd/include"],
    # Faults on demand are a part of a host's description; who records calls is nothing to it.
    "otxctl/sim": ["tessa/text", "orbis/Limits.h", "orbis/json/JsonEvents.h", "otxctl", "otxctl/disks",
                   "otxctl/provider", "otxctl/fault/FaultRules.h", "kova/agentd/include"],
    "host": ["tessa", "orbis", "orbis/json", "nox", "otxctl", "otxctl/provider", "otxctl/fault",
             "kova/agentd/include"],
    "machines": ["tessa", "orbis", "nox", "host", "otxctl/sim", "otxctl/linux", "otxctl/disks",
                 "kova/agentd/include"],
    "agentd": ["tessa", "host", "machines/Machines.h", "otxctl/fault", "agentd/http", "agentd/routes",
               "agentd/tasks"],
    "agentd/http": ["tessa/Logger.h", "tessa/text"],
    "agentd/client": ["tessa", "orbis", "nox", "host", "agentd/http"],
    "agentd/tasks": ["tessa", "orbis", "orbis/json", "nox", "host", "otxctl/TaskScope.h"],
    "agentd/routes": ["tessa", "orbis", "orbis/json", "nox", "host", "agentd/http", "agentd/tasks"],
    "kovactl": ["tessa", "orbis", "orbis/json", "nox", "host", "machines/Machines.h",
                "machines/HostSettingsFile.h", "agentd/client"],
    "kovactl/replay": ["tessa", "orbis", "orbis/json", "nox", "host", "machines/Machines.h", "otxctl/fault",
                       "kovactl/ExitStatus.h"],
    # A plan is what becomes of a simulated copy, so it compares descriptions.
    "kovactl/plan": ["tessa/text", "orbis", "nox", "host", "kovactl", "machines/SimulatedInventory.h", "otxctl/sim",
                     "kova/agentd/planning/pure"],
    # A change of nothing is explained as a plan explains what it leaves over.
    "kovactl/change": ["tessa/text", "kovactl", "kovactl/plan/LeftOvers.h"],
    "kovactl/sim": ["tessa/text", "host", "kovactl", "kovactl/change", "otxctl/sim"],
    "kovactl/cli": ["tessa/text", "host", "agentd/client", "otxctl/provider", "kovactl", "kovactl/replay",
                    "kovactl/plan", "kovactl/change", "kovactl/sim"],
}
# What only one library must not drag into another: these headers are for whoever links the kernel library.
FORBIDDEN = {
    "otxctl": ["kova/agentd/include/KovaConstants.h", "kova/agentd/include/KovaHooks.h"],
    "kova/agentd": ["otxctl"],
}
# Library: (pattern of its headers, folders that may include it).
LIBRARIES = {
    "UTF-8": (r"utf8(cpp)?(/.*|\.h)", ["tessa/text"]),
    "expat": (r"expat\.h", ["orbis/xml"]),
    "JSON": (r"nlohmann/.*", ["orbis/json", "otxctl/sim", "otxctl/fault", "otxctl/linux", "machines", "kovactl"]),
    "HTTP, URLs and network": (r"boost/.*", ["agentd/http"]),
    "TLS": (r"openssl/.*", ["agentd/http"]),
    "log sink": (r"spdlog/.*", ["host"]),
    "command line": (r"CLI/.*", ["agentd", "kovactl"]),
    "UUID": (r"uuid/.*", ["otxctl/sim"]),
    "dynamic loading": (r"dlfcn\.h", ["host", "tests/abi"]),
    "block devices": (r"(sys/ioctl|linux/.*|blkid/.*|libudev)\.h", ["otxctl/linux", "machines/linux"]),
    "system calls": (r"(unistd|fcntl|sys/.*|poll|pthread|netinet/.*|arpa/.*)(\.h)?",
                     ["tessa", "otxctl/linux", "otxctl/sim", "host", "machines", "agentd", "kovactl", "tests"]),
    "test framework": (r"(gtest|gmock)/.*", []),
    "benchmark framework": (r"benchmark/.*", ["bench"]),
}
# Tests and the support for them may use anything; so may what crosses rooms by its nature.
FREE = re.compile(r"(tests|bench|fuzz|otxctl/contract)/|.*/testing/|.*_test\.cpp$")
INCLUDE = re.compile(r'^\s*#\s*include\s+([<"])([^>"]+)[>"]')


def room_of(path, rules=None):
    rooms = [room for room in rules or RULES if path.startswith(room + "/")]
    return max(rooms, key=len) if rooms else None


def circle_in(rules):
    """Rooms of which each may know the next, and the last the first; an empty list where no row leads back."""
    done = set()

    def search(room, way):
        if room in way:
            return way[way.index(room):] + [room]
        if room in done:
            return []
        done.add(room)
        known = {room_of(f"{one}/", rules) for one in rules[room]} - {room, None}
        return next(filter(None, (search(other, way + [room]) for other in sorted(known))), [])

    return next(filter(None, (search(room, []) for room in rules)), [])


def is_forbidden(room, target):
    return any(target == one or target.startswith(one + "/")
               for outer, forbidden in FORBIDDEN.items() if room == outer or room.startswith(outer + "/")
               for one in forbidden)


def allowed(path, room, target):
    if FREE.match(path):
        return True
    known = [room] + RULES[room]
    return not is_forbidden(room, target) and (target in known or room_of(target) in known or any(
        target.startswith(rule + "/") and room_of(target) == room_of(rule) for rule in known))


def library_fault(path, header):
    if FREE.match(path):
        return None
    for library, (pattern, rooms) in LIBRARIES.items():
        if re.fullmatch(pattern, header) and not any(path.startswith(room + "/") for room in rooms):
            return f"<{header}>: the {library} library belongs to {', '.join(rooms) or 'tests'}"
    return None


def faults_of(path, text):
    """Faults of one file: (line, reason)."""
    room = room_of(path)
    for number, line in enumerate(text.splitlines(), 1):
        match = INCLUDE.match(line)
        if not match:
            continue
        kind, header = match.groups()
        if kind == "<":
            fault = library_fault(path, header)
            if fault:
                yield number, fault
        elif room and not allowed(path, room, header):
            yield number, f'"{header}": {room} may not know it'


def main(root):
    faults = 0
    for file in sorted(Path(root).rglob("*")):
        path = file.relative_to(root).as_posix()
        if file.suffix not in (".h", ".cpp") or path.startswith(("build/", ".")):
            continue
        for number, reason in faults_of(path, file.read_text(encoding="utf-8")):
            print(f"{path}:{number}: {reason}")
            faults += 1
    if faults:
        print(f"{faults} include(s) break the rules of tools/lint/include_rules.py")
    circle = circle_in(RULES)
    if circle:
        print(f"the rules go in a circle: {' -> '.join(circle)}")
    return 1 if faults or circle else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1] if len(sys.argv) > 1 else "."))
