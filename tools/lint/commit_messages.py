#!/usr/bin/env python3
"""Checks what commits say: a subject that stays readable in one line, and a body that says why.

    commit_messages.py [BASE]    the commits after BASE, merges left out

Without BASE: those that the origin's main branch does not have or, where there is no origin, the last one.
"""

import re
import subprocess
import sys

SUBJECT_LENGTH = 72
TRAILER = re.compile(r"[A-Z][A-Za-z-]+: ")  # who signed or reviewed says nothing about why


def faults_of(message):
    """What is wrong with a commit's message."""
    subject, _, rest = message.strip().partition("\n")
    if len(subject) > SUBJECT_LENGTH:
        yield f"the subject has {len(subject)} characters, {SUBJECT_LENGTH} at most"
    lines = rest.split("\n")
    if rest and lines[0].strip():
        yield "no empty line between the subject and the body"
    if not any(line.strip() and not TRAILER.match(line) for line in lines):
        yield "no body that says why"


def git(*words):
    return subprocess.run(["git", *words], capture_output=True, text=True, check=False)


def commits_to_check(base):
    if not base:
        common = git("merge-base", "HEAD", "origin/main")
        base = common.stdout.strip() if common.returncode == 0 else "HEAD~1"
    listed = git("rev-list", "--no-merges", f"{base}..HEAD")
    if listed.returncode != 0:
        sys.exit(f"commit messages: cannot tell what comes after {base}: {listed.stderr.strip()}")
    return listed.stdout.split()


def main(base):
    commits, faults = commits_to_check(base), 0
    for commit in commits:
        message = git("show", "-s", "--format=%B", commit).stdout
        for fault in faults_of(message):
            print(f"{commit[:12]} {message.splitlines()[0][:50]}: {fault}")
            faults += 1
    print(f"commit messages: {len(commits)} read, {faults} fault(s)")
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1] if len(sys.argv) > 1 else ""))
