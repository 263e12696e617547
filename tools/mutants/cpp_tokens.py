"""The tokens of C++, as far as changing it one place at a time asks for.

Nothing is known of types. Where C++ cannot be read without them the layout that clang-format gives tells:
a sign with a blank on either side is an operator, `<` without one opens template arguments.
"""

import re
from dataclasses import dataclass

TOKEN = re.compile(
    r"""(?P<blank>\s+|//[^\n]*|/\*.*?\*/|^[ \t]*\#(?:[^\n\\]|\\\n|\\.)*)
    |(?P<text>(?:u8|[uUL])?R"(?P<mark>[^()\s\\]*)\(.*?\)(?P=mark)"|(?:u8|[uUL])?"(?:[^"\\\n]|\\.)*")
    |(?P<char>(?:u8|[uUL])?'(?:[^'\\\n]|\\.)+')
    |(?P<number>\.?\d(?:[eEpP][+-]|'?[\w.])*)
    |(?P<name>[A-Za-z_]\w*)
    |(?P<sign>->\*?|\+\+|--|<=>|<<=?|&&|\|\||::|\.\.\.|[-+*/%^&|!=<]=|>=(?=\s)|.)""",
    re.VERBOSE | re.DOTALL | re.MULTILINE)
OPENING = {"(": ")", "[": "]", "{": "}"}


class Unreadable(Exception):
    """The text is not C++ as this reads it."""


@dataclass(frozen=True)
class Token:
    kind: str  # text, char, number, name or sign
    text: str
    start: int
    end: int


def tokens_of(text):
    tokens = []
    for match in TOKEN.finditer(text):
        if match.lastgroup != "blank":
            kind = "text" if match["text"] is not None else match.lastgroup
            tokens.append(Token(kind, match[0], match.start(), match.end()))
    return tokens


def partners_of(tokens):
    """Of each bracket the other one, by index."""
    partners, open_ones = {}, []
    for index, token in enumerate(tokens):
        if token.kind != "sign":
            continue
        if token.text in OPENING:
            open_ones.append(index)
        elif token.text in OPENING.values():
            if not open_ones or OPENING[tokens[open_ones[-1]].text] != token.text:
                raise Unreadable(f"a {token.text} closes nothing")
            other = open_ones.pop()
            partners[index], partners[other] = other, index
    if open_ones:
        raise Unreadable("a bracket is never closed")
    return partners


class Tokens:
    """The tokens of one text. Token indices are what everything here is told by."""

    def __init__(self, text):
        self.text = text
        self.tokens = tokens_of(text)
        self.partners = partners_of(self.tokens)

    def at(self, index):
        """The token's text; empty beyond the ends."""
        return self.tokens[index].text if 0 <= index < len(self.tokens) else ""

    def words(self, first, last):
        """The text from token to token, as it stands."""
        return self.text[self.tokens[first].start:self.tokens[last].end] if first <= last else ""

    def is_spaced(self, index):
        """Whether there is a blank before and behind, as round an operator with two sides."""
        token = self.tokens[index]
        return self.text[token.start - 1].isspace() and self.text[token.end:token.end + 1].isspace()

    def after_angle(self, index):
        """The token behind the template arguments that open at `index`."""
        depth = 0
        while index < len(self.tokens):
            if self.at(index) == "<":
                depth += 1
            elif self.at(index) == ">":
                depth -= 1
                if depth == 0:
                    return index + 1
            index = self.partners[index] + 1 if self.at(index) in OPENING else index + 1
        raise Unreadable("template arguments are never closed")

    def opens_angle(self, index):
        return self.at(index) == "<" and not self.is_spaced(index)

    def next_at_level(self, index):
        """The token behind this one, or behind its brackets when it opens some."""
        if self.at(index) in OPENING:
            return self.partners[index] + 1
        return self.after_angle(index) if self.opens_angle(index) else index + 1

    def at_level(self, first, last):
        """The tokens from first to last that stand in no bracket within."""
        index = first
        while index <= last:
            yield index
            index = self.next_at_level(index)

    def find_at_level(self, first, last, *texts):
        """The first of these among them; None when there is none."""
        return next((index for index in self.at_level(first, last) if self.at(index) in texts), None)

    def split(self, first, last, sign):
        """The parts between the signs, as pairs of first and last token."""
        parts, start = [], first
        for index in self.at_level(first, last):
            if self.at(index) == sign:
                parts.append((start, index - 1))
                start = index + 1
        parts.append((start, last))
        return [part for part in parts if part[0] <= part[1]]
