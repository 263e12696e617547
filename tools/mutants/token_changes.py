"""Changes inside of expressions: constants, texts, comparisons, operands, arguments, names.

Each generator takes a source and a range of tokens and yields (kind, edits); an edit is (start, end, text) and
puts the text in place of what stands there.
"""

import functools
import re

from cpp_tokens import OPENING

COMPARISONS = {"==": ["!="], "!=": ["=="], "<": ["<=", ">="], "<=": ["<", ">"], ">": [">=", "<="], ">=": [">", "<"]}
ARITHMETIC = {"+": "-", "-": "+", "*": "/", "/": "*", "%": "/"}
STEPS = {"++": "--", "--": "++", "+=": "-=", "-=": "+="}
OTHER_NAME = {
    "true": "false", "false": "true", "Describe": "what", "what": "Describe", "front": "back", "back": "front",
    "min": "max", "max": "min", "min_element": "max_element", "max_element": "min_element",
    "GetMasterMulticastGroup": "GetAgentMulticastGroup", "GetAgentMulticastGroup": "GetMasterMulticastGroup",
}
LEVELS = ["Error", "Warning", "Info", "Verbose", "Trivia"]
ENDS_OF_OPERAND = ("&&", "||", ",", ";", "?", ":")
LEVEL = re.compile(r"(\w+::)*LogLevel::\w+")
MOST_ROWS = 32  # of a longer table every row's text is changed; more would tell nothing new


def edit(source, index, text):
    token = source.tokens[index]
    return (token.start, token.end, text)


def literals(source, first, last):
    for index in range(first, last + 1):
        token = source.tokens[index]
        if token.kind == "number" and not is_pure(source, index):
            yield from numbers(source, index)
        elif token.kind == "text" and token.text.startswith('"'):
            yield "text changed", [(token.end - 1, token.end - 1, "#")]


def is_pure(source, index):
    """Whether this is the nought that makes a function pure."""
    return source.at(index - 1) == "=" and source.at(index + 1) == ";" and source.at(index - 2) in (
        ")", "const", "noexcept")


def numbers(source, index):
    text = source.at(index)
    digits = text.rstrip("uUlL")
    try:
        value = int(digits, 0)
    except ValueError:
        return
    yield "constant changed", [edit(source, index, f"{value + 1}{text[len(digits):]}")]
    if value > 0:
        yield "constant changed", [edit(source, index, f"{value - 1}{text[len(digits):]}")]


def operators(source, first, last):
    for index in range(first, last + 1):
        text = source.at(index)
        if text in COMPARISONS and source.is_spaced(index):
            for other in COMPARISONS[text]:
                yield "comparison changed", [edit(source, index, other)]
        elif text in ARITHMETIC and source.is_spaced(index):
            yield "arithmetic changed", [edit(source, index, ARITHMETIC[text])]
        elif text in STEPS:
            yield "arithmetic changed", [edit(source, index, STEPS[text])]
        elif text == "!":
            yield "negation dropped", [edit(source, index, "")]
        elif text == "?":
            yield from arms(source, index)


def arms(source, index):
    """The two arms of a choice change places."""
    colon = source.find_at_level(index + 1, len(source.tokens) - 1, ":")
    end = colon + 1
    while source.at(end) not in (",", ";", ")", "}", "]"):
        end = source.next_at_level(end)
    yield "arms of a choice swapped", swapped(source, (index + 1, colon - 1), (colon + 1, end - 1))


def swapped(source, left, right):
    """The edits that let two ranges of tokens change places."""
    return [(source.tokens[left[0]].start, source.tokens[left[1]].end, source.words(*right)),
            (source.tokens[right[0]].start, source.tokens[right[1]].end, source.words(*left))]


def operands(source, first, last):
    """And for or, or for and; either side of it gone."""
    for index in range(first, last + 1):
        text = source.at(index)
        if text not in ("&&", "||") or not source.is_spaced(index):
            continue
        yield "logic changed", [edit(source, index, "||" if text == "&&" else "&&")]
        left, right = operand_start(source, index), operand_end(source, index)
        yield "operand dropped", [(source.tokens[left].start, source.tokens[index + 1].start, "")]
        yield "operand dropped", [(source.tokens[index - 1].end, source.tokens[right].end, "")]


def operand_start(source, index):
    while source.at(index - 1) not in ENDS_OF_OPERAND + ("=", "return", *OPENING):
        index = source.partners[index - 1] if source.at(index - 1) in OPENING.values() else index - 1
    return index


def operand_end(source, index):
    while source.at(index + 1) not in ENDS_OF_OPERAND + tuple(OPENING.values()):
        index = source.next_at_level(index + 1) - 1
    return index


def names(source, first, last):
    for index in range(first, last + 1):
        text = source.at(index)
        if text in OTHER_NAME and source.tokens[index].kind == "name":
            yield "name changed", [edit(source, index, OTHER_NAME[text])]
        elif source.at(index - 1) == "::" and source.at(index - 2) == "LogLevel":
            yield "log level changed", [edit(source, index, LEVELS[(LEVELS.index(text) + 1) % len(LEVELS)])]


def lists(source, first, last):
    """Neighbouring arguments, or rows of a table, change places; a row goes."""
    for index in range(first, last + 1):
        is_call = source.at(index) == "(" and is_called(source, index)
        is_list = source.at(index) == "{" and index not in source.bodies
        if not is_call and not is_list:
            continue
        parts = source.split(index + 1, source.partners[index] - 1, ",")
        if is_list and len(parts) > MOST_ROWS:
            continue
        for left, right in zip(parts, parts[1:]):
            if is_swappable(source, left, right):
                kind = "arguments swapped" if is_call else "rows swapped"
                yield kind, swapped(source, left, right)
        if is_list and len(parts) > 1 and source.at(parts[0][0]) in ("{", "&"):
            for left, right in zip(parts, parts[1:]):
                yield "row dropped", [(source.tokens[left[0]].start, source.tokens[right[0]].start, "")]


def is_swappable(source, left, right):
    """Whether the two could stand for each other: fields are named, a level is like nothing beside it."""
    one, two = source.words(*left), source.words(*right)
    return one != two and not one.startswith(".") and not any(LEVEL.fullmatch(text) for text in (one, two))


def is_called(source, index):
    before = source.tokens[index - 1]
    return (before.kind == "name" and before.text not in ("if", "for", "while", "switch", "catch", "return")) or (
        before.text == ">" and not source.is_spaced(index - 1))


def constants_of_a_kind(source, first, last):
    """A::B becomes A::C where the file names both."""
    families = families_of(source)
    for index in range(first, last + 1):
        family = families.get(family_of(source, index), [])
        if len(family) > 1:
            other = family[(family.index(source.at(index)) + 1) % len(family)]
            yield "name changed", [edit(source, index, other)]


@functools.cache
def families_of(source):
    families = {}
    for index in range(2, len(source.tokens)):
        members = families.setdefault(family_of(source, index), [])
        if source.at(index) not in members:
            members.append(source.at(index))
    families.pop(None, None)
    return families


def family_of(source, index):
    """What stands before the last name of a constant or a template argument; None for other tokens."""
    if source.at(index - 1) != "::" or index + 1 == len(source.tokens):
        return None
    behind = source.tokens[index + 1]
    if behind.kind == "name" or behind.text in ("::", "(", "<", "&", "*", "{"):
        return None
    start = index - 2
    while source.at(start - 1) == "::":
        start -= 2
    words = source.words(start, index - 2)
    return None if words.startswith("std") or words.endswith("LogLevel") else (words, behind.text == ">")


GENERATORS = (literals, operators, operands, names, lists, constants_of_a_kind)
GENERATORS_OF_DEFAULTS = (literals, names)
