"""All places of a source that are changed, each told so that it is found again when lines have moved."""

import re
from dataclasses import dataclass

import statement_changes
import token_changes
from cpp_source import Source

LONGEST = 240  # characters of a place's text; of a longer one the middle is left out


@dataclass(frozen=True)
class Place:
    file: str
    function: str
    kind: str  # what is done there, in words
    before: str  # the lines that change, blanks made one
    after: str
    line: int
    edits: tuple

    def key(self):
        return self.file, self.function, self.before, self.after


def changed(text, edits):
    """The text after the edits, which do not overlap."""
    for start, end, replacement in sorted(edits, reverse=True):
        text = text[:start] + replacement + text[end:]
    return text


def lines_around(text, edits):
    """Start and end of the lines that the edits touch."""
    start = text.rfind("\n", 0, min(e[0] for e in edits)) + 1
    end = text.find("\n", max(e[1] for e in edits))
    return start, end if end >= 0 else len(text)


def on_one_line(text):
    words = re.sub(r"\s+", " ", text).strip()
    if len(words) > LONGEST:
        half = LONGEST // 2
        words = f"{words[:half]} ... {words[-half:]}"
    return words


def place_of(file, name, text, kind, edits):
    start, end = lines_around(text, edits)
    inner = [(s - start, e - start, replacement) for s, e, replacement in edits]
    before, after = text[start:end], changed(text[start:end], inner)
    line = text.count("\n", 0, min(e[0] for e in edits)) + 1
    return Place(file, name, kind, on_one_line(before), on_one_line(after), line, tuple(edits))


def assertions(source):
    """Where the assertions stand. They say what holds of the code beside them: to weaken one changes no outcome."""
    return [(source.tokens[index].start, source.tokens[source.partners[index + 1]].end)
            for index in range(len(source.tokens) - 1)
            if source.at(index) == "assert" and source.at(index + 1) == "("]


def touches(edits, spans):
    return any(start < span_end and span_start < end for start, end, _ in edits for span_start, span_end in spans)


def changes_of(source, is_header):
    """(name, kind, edits) of everything that is changed in the file."""
    for function in source.functions:
        for generator in statement_changes.GENERATORS:
            yield from ((function.name, *change) for change in generator(source, function))
        for generator in token_changes.GENERATORS:
            yield from ((function.name, *change) for change in generator(source, function.first, function.body.last))
    for value in source.values:
        for generator in token_changes.GENERATORS_OF_DEFAULTS if value.is_function else token_changes.GENERATORS:
            yield from ((value.name, *change) for change in generator(source, value.first, value.last))
    if not is_header:  # there it would change the layout of what other files have been compiled with
        yield from (("", *change) for change in statement_changes.neighbouring_values(source))


def places_of(file, text):
    """Every place of one file, in order; of changes that come to the same one is taken."""
    found, seen = [], set()
    source = Source(text)
    asserted = assertions(source)
    for name, kind, edits in changes_of(source, file.endswith(".h")):
        if touches(edits, asserted):
            continue
        result = re.sub(r"\s+", " ", changed(text, edits))
        if result not in seen:
            seen.add(result)
            found.append(place_of(file, name, text, kind, edits))
    return sorted(found, key=lambda place: (place.edits, place.kind))
