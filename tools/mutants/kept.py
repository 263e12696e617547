"""The list of places that no test can tell from the source as it is, and why."""

import tomllib
from collections import Counter

FIELDS = {"file", "function", "before", "after", "why"}


class Faulty(Exception):
    """The list says what is not so."""


def read(path):
    """The entries by the key of their place."""
    with open(path, "rb") as file:
        entries = tomllib.load(file).get("kept", [])
    kept = {}
    for entry in entries:
        missing = FIELDS - {name for name in entry if entry[name]} - {"after", "function"} | FIELDS - set(entry)
        if missing:
            raise Faulty(f"{path}: an entry lacks {', '.join(sorted(missing))}: {entry}")
        key = tuple(entry[name] for name in ("file", "function", "before", "after"))
        if key in kept:
            raise Faulty(f"{path}: {describe(key)} stands there twice")
        kept[key] = entry
    return kept


def check(kept, places):
    """Every entry is of as many places as it says; of one, if it says nothing."""
    found = Counter(place.key() for place in places)
    for key, entry in kept.items():
        wanted = entry.get("places", 1)
        if found[key] != wanted:
            raise Faulty(f"{describe(key)}: kept for {wanted}, there are {found[key]} such places")


def describe(key):
    file, function, before, after = key
    return f"{file}, {function}: {before} -> {after}"
