#!/usr/bin/env python3
"""Checks that every operation of the schema stands in every place that an operation needs by hand.

    operations.py ROOT

Most of what an operation needs is made from the schema; what is left are the places below. The first place that
lacks it is named, and what has to stand there.
"""

import re
import sys
from pathlib import Path

SCHEMA = "nox/schema/nox.schema"
OPERATION = re.compile(r"^(?:query|change) (\w+)", re.MULTILINE)

# Answered by the host program, not by the plug-in.
WITHOUT_HOOK = {"GetDiskGroups", "GetTwin", "GetTasks", "GetTask"}
# Hooks are called like their operations, but for one.
HOOKS = {"RemoveDisk": "RemoveDisksHookFn"}
# The command line asks for more than this one tells, and for tasks by a road of their own.
WITHOUT_WORDS = {"GetStorageInfo", "GetTasks", "GetTask"}

# What has to stand where, in the order in which one adds it; {hook} and {name} are the operation's.
PLUGIN = [
    ("kova/agentd/Exports.map", r"\b{hook};", "the hook among the exports"),
    ("kova/agentd/KovaLibManager.cpp", r"\b{hook}\(", "the hook"),
    ("kova/agentd/KovaManagerImpl.h", r"\b{name}\(", "the manager's member"),
    ("host/PluginLoader.cpp", r'"{hook}"', "the hook where it is looked up"),
    ("kovactl/replay/HookCall.cpp", r'"{name}", "{hook}"', "the row of the replay"),
]
HOST = [("host/KovaService.cpp", r"rowOf<Op::{name}, ", "the row that answers it")]
WORDS = [("kovactl", r"\b(?:Op|Operation)::{name}\b", "the words of the command line")]


def operations(root):
    return OPERATION.findall((root / SCHEMA).read_text(encoding="utf-8"))


def text_of(place):
    """Of the file, or of all sources of the folder but tests."""
    files = [place] if place.is_file() else sorted(f for f in place.rglob("*.cpp") if not f.stem.endswith("_test"))
    return "\n".join(file.read_text(encoding="utf-8") for file in files)


def missing(root, name):
    """[(place, what), ..] that the operation lacks."""
    places = (PLUGIN if name not in WITHOUT_HOOK else []) + HOST + (WORDS if name not in WITHOUT_WORDS else [])
    values = {"name": name, "hook": HOOKS.get(name, name + "HookFn")}
    found = []
    for place, pattern, what in places:
        wanted = pattern.replace("{name}", values["name"]).replace("{hook}", values["hook"])
        if not re.search(wanted, text_of(root / place)):
            found.append((place, what))
    return found


def main(root):
    lines = [f"{place}: {name} is not there: {what}" for name in operations(root) for place, what in missing(root, name)]
    print("\n".join(lines) if lines else "every operation stands where it must")
    return 1 if lines else 0


if __name__ == "__main__":
    sys.exit(main(Path(sys.argv[1])))
