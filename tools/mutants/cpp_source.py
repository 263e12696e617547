"""Reads a C++ source into functions, blocks and statements."""

from dataclasses import dataclass, field

from cpp_tokens import OPENING, Tokens, Unreadable, tokens_of

CONTROL = ("if", "for", "while", "switch")
JUMPS = ("return", "throw", "break", "continue")
NO_TYPE = ("delete", "new", "return", "throw", "else", "goto", "co_return", "co_await", "not", "sizeof")
NOT_OF_TYPE = ("virtual", "inline", "static", "explicit", "constexpr")
SKIPPED = ("using", "friend", "static_assert", "typedef", "enum")


@dataclass
class Statement:
    """Tokens first to last, both included."""
    kind: str  # a keyword of control, a jump, or: block, label, declaration, expression
    first: int
    last: int
    condition: tuple | None = None  # (first, last) of what a control statement tests
    blocks: list = field(default_factory=list)
    governed: list = field(default_factory=list)  # statements without braces: the `if` of an `else if`

    def with_inner(self):
        """This, and every statement in it."""
        yield self
        inner = [statement for block in self.blocks for statement in block.statements]
        for statement in inner + self.governed:
            yield from statement.with_inner()


@dataclass
class Block:
    """The tokens between the braces `first` and `last`."""
    kind: str  # function, lambda, plain, then, else, loop, switch, try, catch
    first: int
    last: int
    statements: list = field(default_factory=list)


@dataclass
class Function:
    name: str
    type: str  # empty of constructors and destructors
    first: int  # the brace, or the colon before what a constructor sets
    body: Block

    def blocks(self):
        """The body and every block within, lambdas' bodies too."""
        yield self.body
        for statement in self.statements():
            yield from statement.blocks

    def statements(self):
        """Every statement, those within others too."""
        for statement in self.body.statements:
            yield from statement.with_inner()


@dataclass
class Value:
    """A variable outside of functions, or a declaration of a function, which may have defaults."""
    name: str
    first: int
    last: int
    scope: str  # where it stands: "namespace 3" or "class 4"
    is_function: bool


class Source(Tokens):
    """One file, read."""

    def __init__(self, text):
        super().__init__(text)
        self.functions = []
        self.values = []
        self.bodies = set()  # the braces that open a block; any other opens a list of values
        self._scopes = 0
        self._scope("namespace", 0, len(self.tokens))

    # ---- outside of functions

    def _scope(self, kind, index, end):
        self._scopes += 1
        scope = f"{kind} {self._scopes}"
        while index < end:
            word = self.at(index)
            if word in (";", "[") or (word == "extern" and self.tokens[index + 1].kind == "text"):
                index = self.next_at_level(index) + (word == "extern")
            elif word in ("public", "private", "protected") and self.at(index + 1) == ":":
                index += 2
            elif word == "template":
                index = self.after_angle(index + 1)
            elif word in SKIPPED:
                index = self._semicolon(index) + 1
            elif (brace := self._inner_scope(index, end)) is not None:
                self._scope(word, brace + 1, self.partners[brace])
                index = self.partners[brace] + 1
            else:
                index = self._declaration(index, end, scope)

    def _inner_scope(self, index, end):
        """The brace that a namespace or a class opens here."""
        if self.at(index) not in ("namespace", "class", "struct", "{"):
            return None
        stop = self.find_at_level(index, end - 1, "{", ";", "(", "=")
        return stop if stop is not None and self.at(stop) == "{" else None

    def _semicolon(self, index):
        found = self.find_at_level(index, len(self.tokens) - 1, ";")
        if found is None:
            raise Unreadable(f"no semicolon behind {self.at(index)}")
        return found

    def _declaration(self, first, end, scope):
        """Reads a variable or a function; the token behind it."""
        parameters = assigned = None
        index = first
        while index < end:
            word = self.at(index)
            if word == "operator":
                index += 2 if self.at(index + 1) != "(" else 3
                continue
            if word == ";":
                name = self._name_before(parameters or assigned or index)
                self.values.append(Value(name, first, index, scope, parameters is not None))
                return index + 1
            if word == "(" and parameters is None and assigned is None:
                parameters = index
            elif word == "=":
                assigned = assigned or index
            elif parameters is not None and assigned is None and word in ("{", ":"):
                return self._function(first, parameters, index)
            elif word == "{" and parameters is None:
                assigned = assigned or index
            index = self.next_at_level(index)
        return end

    def _name_before(self, index):
        """The name that ends before the token, with the class it belongs to."""
        while self.at(index - 1) == "]":
            index = self.partners[index - 1]
        if "operator" in (self.at(index - 2), self.at(index - 3)):
            return self.words(index - 2 if self.at(index - 2) == "operator" else index - 3, index - 1)
        start = index - 1
        while self.at(start - 1) in ("::", "~"):
            start -= 2 if self.at(start - 1) == "::" else 1
        return self.words(start, index - 1)

    def _function(self, first, parameters, start):
        brace = self._behind_initializers(start + 1) if self.at(start) == ":" else start
        name = self._name_before(parameters)
        words = [self.at(i) for i in range(first, parameters - len(tokens_of(name)))]
        body = self._block("function", brace)
        self.functions.append(Function(name, " ".join(w for w in words if w not in NOT_OF_TYPE), start, body))
        return body.last + 1

    def _behind_initializers(self, index):
        """The function's brace behind the list of what a constructor sets."""
        while True:
            while self.at(index) not in ("(", "{"):
                index = self.next_at_level(index)
            index = self.partners[index] + 1
            if self.at(index) == "...":
                index += 1
            if self.at(index) != ",":
                return index
            index += 1

    # ---- inside

    def _block(self, kind, brace):
        block = Block(kind, brace, self.partners[brace])
        self.bodies.add(brace)
        index = brace + 1
        while index < block.last:
            statement = self._statement(index)
            block.statements.append(statement)
            index = statement.last + 1
        return block

    def _statement(self, index):
        word = self.at(index)
        if word == "{":
            return Statement("block", index, self.partners[index], None, [self._block("plain", index)])
        if word in CONTROL:
            return self._control(index)
        if word == "do":
            body = self._statement(index + 1)
            paren = body.last + 2
            statement = Statement("do", index, self.partners[paren] + 1, (paren + 1, self.partners[paren] - 1))
            self._govern(statement, "loop", body)
            return statement
        if word == "try":
            return self._try(index)
        if word in ("case", "default"):
            return Statement("label", index, self.find_at_level(index, len(self.tokens) - 1, ":"))
        return self._simple(index)

    def _govern(self, statement, kind, body):
        """Puts under a control statement what it governs."""
        if body.kind == "block":
            body.blocks[0].kind = kind
            statement.blocks += body.blocks
        else:
            statement.governed.append(body)
        statement.last = body.last if statement.kind != "do" else statement.last

    def _control(self, index):
        word = self.at(index)
        paren = index + (2 if self.at(index + 1) == "constexpr" else 1)
        close = self.partners[paren]
        statement = Statement(word, index, close, self._condition(word, paren + 1, close - 1),
                              self._lambdas(paren, close))
        kind = {"if": "then", "switch": "switch"}.get(word, "loop")
        self._govern(statement, kind, self._statement(close + 1))
        if word == "if" and self.at(statement.last + 1) == "else":
            self._govern(statement, "else", self._statement(statement.last + 2))
        return statement

    def _condition(self, word, first, last):
        parts = self.split(first, last, ";")
        if word == "for":
            return parts[1] if len(parts) == 3 else None
        return parts[-1]

    def _try(self, index):
        statement = Statement("try", index, self.partners[index + 1], None, [self._block("try", index + 1)])
        while self.at(statement.last + 1) == "catch":
            brace = self.partners[statement.last + 2] + 1
            statement.blocks.append(self._block("catch", brace))
            statement.last = self.partners[brace]
        return statement

    def _simple(self, index):
        last = self._semicolon(index)
        word = self.at(index)
        kind = word if word in JUMPS else "declaration" if self.is_declaration(index, last) else "expression"
        return Statement(kind, index, last, None, self._lambdas(index, last))

    def is_declaration(self, first, last):
        return self.at(first) in SKIPPED or self.declared(first, last) is not None

    def declared(self, first, last):
        """The name of the variable that is declared from here; None when none is."""
        index, words = first, 0
        while index < last and self.at(index) not in NO_TYPE:
            if self.tokens[index].kind == "name":
                if self.at(index) not in ("const", "constexpr", "static", "auto") and self.at(index - 1) != "::":
                    words += 1
                if words == 2 or (words == 1 and "auto" in (self.at(i) for i in range(first, index))):
                    return self.at(index)
                index += 1
            elif self.opens_angle(index):
                index = self.after_angle(index)
            elif self.at(index) in ("::", "*", "&") and (index > first or self.at(index) == "::"):
                index += 1
            else:
                return None
        return None

    def _lambdas(self, first, last):
        """The bodies of the lambdas between these tokens."""
        found, index = [], first
        while index <= last:
            if self.at(index) == "{" and self.is_lambda(index):
                found.append(self._block("lambda", index))
                index = self.partners[index]
            index += 1
        return found

    def is_lambda(self, brace):
        index = brace - 1
        while self.tokens[index].kind == "name" or self.at(index) in ("::", "<", ">", "&", "*"):
            index -= 1
        if self.at(index) == "->":
            index -= 1
        elif index != brace - 1 and not {self.at(i) for i in range(index + 1, brace)} <= {"mutable", "noexcept"}:
            return False
        if self.at(index) == ")":
            index = self.partners[index] - 1
        if self.at(index) != "]":
            return False
        before = self.tokens[self.partners[index] - 1]
        return before.kind == "sign" and before.text not in (")", "]") or before.text == "return"
