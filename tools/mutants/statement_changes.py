"""Changes of statements: conditions, steps left out, in another order, on the other side of a block's edge.

Each generator takes a source and a function of it and yields (kind, edits), as in token_changes.
"""

import re

from token_changes import COMPARISONS, edit, swapped

# What these do nobody sees but a clock: nothing is told by leaving them out or moving them.
WITHOUT_OUTCOME = re.compile(r"[\w.>()*-]*\b[rR]eserve\(")
FRESH_OBJECT = re.compile(r"(const )?\S.* (= )?((Tessa::)?MakeRef<[^;]*>\(\);|\w+;)", re.DOTALL)
SETTER = re.compile(r"(\w+)(->|\.)Set\w+\(")
# Changes one object and nothing else; a call of `a.b()` in it only asks.
OWN_EFFECT = re.compile(r"([\w.]+)(?: = |(?:\.|->)(push_back|emplace_back|Append|Set\w+)\()"
                        r"((?:(?:\.|->)\w+\(\)|[^()])*)\)?;")
MAKING = re.compile(r"(\w+) = MakeRef<[\w:]+>\([^()]*\);")
TEXT = re.compile(r'"[^"]*"')
LOG_LINE = re.compile(r"LogInternal\(.*\);", re.DOTALL)


def conditions(source, function):
    for statement in function.statements():
        if statement.condition is None or statement.kind == "switch":
            continue
        first, last = statement.condition
        name = source.declared(first, last) if source.find_at_level(first, last, "=") else None
        end = source.tokens[last].end
        if name:
            yield "condition negated", [(end, end, f"; !{name}")]
            yield "condition never true", [(end, end, "; false")]
            continue
        yield "condition negated", negated(source, first, last)
        yield "condition never true", [(source.tokens[first].start, end, "false")]
        if statement.kind == "if":
            yield "condition always true", [(source.tokens[first].start, end, "true")]


def negated(source, first, last):
    signs = [index for index in source.at_level(first, last)
             if source.at(index) in ("&&", "||", "?", *COMPARISONS) and source.is_spaced(index)]
    if not signs and source.at(first) == "!":
        return [edit(source, first, "")]
    if len(signs) == 1 and source.at(signs[0]) in COMPARISONS:
        return [edit(source, signs[0], COMPARISONS[source.at(signs[0])][-1])]
    return [(source.tokens[first].start, source.tokens[first].start, "!("),
            (source.tokens[last].end, source.tokens[last].end, ")")]


def dropped(source, function):
    never_done = [statement.blocks[0] for statement in function.statements()
                  if statement.kind == "if" and len(statement.blocks) == 1 and not statement.governed]
    for block in function.blocks():
        if block in never_done and len(block.statements) == 1:
            continue  # that comes to a condition that is never true
        for statement in block.statements:
            if is_droppable(source, function, block, statement):
                start = source.tokens[statement.first].start
                yield "statement dropped", [(start, source.tokens[statement.last].end, "")]


def is_droppable(source, function, block, statement):
    if statement.kind == "declaration":
        name = source.declared(statement.first, statement.last)
        return name is not None and not is_used(source, name, statement.last + 1, block.last) and (
            source.at(statement.last - 1) in (")", "}"))
    if statement.kind in ("return", "throw") and statement in list(last_statements(function.body)):
        return False  # a function that ends without its result has no meaning
    return statement.kind not in ("label", "if", "try", "block") and not is_without_outcome(source, statement)


def last_statements(block):
    """What stands last in the block, or last in a block that stands last there."""
    for statement in block.statements[-1:]:
        yield statement
        for inner in statement.blocks if statement.kind in ("if", "try", "block") else []:
            yield from last_statements(inner)


def is_used(source, name, first, last):
    return any(source.at(index) == name for index in range(first, last + 1))


def is_without_outcome(source, statement):
    return WITHOUT_OUTCOME.match(source.words(statement.first, statement.last)) is not None


def exchanged(source, function):
    """Two neighbouring statements in the other order."""
    for block in function.blocks():
        for one, two in zip(block.statements, block.statements[1:]):
            if is_exchangeable(source, one, two):
                yield "statements swapped", swapped(source, (one.first, one.last), (two.first, two.last))


def is_exchangeable(source, one, two):
    if one.kind == "label" or two.kind in ("label", "return", "throw", "break", "continue"):
        return False
    if any(is_without_outcome(source, s) for s in (one, two)) or any(is_fresh(source, s) for s in (one, two)):
        return False
    name = source.declared(one.first, one.last)
    if name and is_used(source, name, two.first, two.last):
        return False
    return not is_order_unseen(*(source.words(s.first, s.last) for s in (one, two)))


def is_order_unseen(one, two):
    """Whether they set two fields of one object, or change two objects of which neither is asked for the other,
    or one is a line of the log and the other gives a variable its value."""
    if LOG_LINE.fullmatch(one):
        made = MAKING.fullmatch(two) or (OWN_EFFECT.fullmatch(two) if " = " in two else None)
        return made is not None and made[1] not in TEXT.sub("", one)
    first, second = SETTER.match(one), SETTER.match(two)
    if first and second:
        return first[1] == second[1]
    first, second = OWN_EFFECT.fullmatch(one), OWN_EFFECT.fullmatch(two)
    if not first or not second or first[1] == second[1] or second[1] in first[3]:
        return False
    return first[1] not in second[3] or (second[2] == "Append" and first[1] == second[3])  # a list holds references


def is_fresh(source, statement):
    """Whether it makes an object that nobody has seen yet: the order of two does not show."""
    return statement.kind == "declaration" and FRESH_OBJECT.fullmatch(
        source.words(statement.first, statement.last)) is not None


def moved_over_edges(source, function):
    """A step on the other side of the edge of a block that holds a lock, or that a handler guards."""
    for block in function.blocks():
        for position, statement in enumerate(block.statements):
            if statement.kind in ("block", "try"):
                before = block.statements[position - 1] if position > 0 else None
                behind = block.statements[position + 1] if position + 1 < len(block.statements) else None
                yield from moved(source, statement, before, behind)


def moved(source, statement, before, behind):
    inner = statement.blocks[0].statements
    if not inner:
        return
    first, last = inner[0], inner[-1]
    open_end = source.tokens[inner[0].last].end if first.kind == "declaration" else (
        source.tokens[statement.blocks[0].first].end)
    close_start = source.tokens[statement.blocks[0].last].start
    yield "moved out before", move(source, first, source.tokens[statement.first].start)
    if last.kind == "expression" and last is not first:
        yield "moved out behind", move(source, last, source.tokens[statement.last].end)
    if before and before.kind == "expression":
        yield "moved in", move(source, before, open_end)
    if behind and behind.kind == "expression":
        yield "moved in", move(source, behind, close_start)


def move(source, statement, to):
    start, end = source.tokens[statement.first].start, source.tokens[statement.last].end
    return sorted([(start, end, ""), (to, to, f" {source.words(statement.first, statement.last)} ")])


def cut_short(source, function):
    """The function returns at once, or nothing; a loop ends after its first round."""
    returned = "return;" if function.type == "" or function.type.endswith("void") else "return {};"
    statements = function.body.statements
    start = source.tokens[function.body.first].end
    if statements and statements[0].kind != "return":
        yield "returns at once", [(start, start, f" {returned}")]
    for statement in function.statements():
        if statement.kind == "return" and statement.last > statement.first + 1:
            yield from answers(source, function, statement)
        for block in statement.blocks:
            if block.kind == "loop":
                end = source.tokens[block.last].start
                yield "loop ends after one round", [whole(source, statement), (end, end, "break; ")]


def answers(source, function, statement):
    start, end = source.tokens[statement.first + 1].start, source.tokens[statement.last - 1].end
    if function.type == "bool" and source.words(statement.first + 1, statement.last - 1) not in ("true", "false"):
        yield "answer changed", [(start, end, "true")]
        yield "answer changed", [(start, end, "false")]
    elif function.type != "bool" and source.words(statement.first + 1, statement.last - 1) != "{}":
        yield "answer emptied", [(start, end, "{}")]


def handlers(source, function):
    """A handler lets its exception pass; one more swallows all others."""
    for statement in function.statements():
        if statement.kind != "try":
            continue
        for block in statement.blocks[1:]:
            if block.statements and block.statements[0].kind != "throw":
                start = source.tokens[block.first].end
                yield "exception let through", [(start, start, " throw;")]
        if source.at(statement.blocks[-1].first - 2) != "...":
            end = source.tokens[statement.last].end
            answer = "" if function.type == "" or function.type.endswith("void") else " return {}; "
            yield "other exceptions swallowed", [whole(source, statement), (end, end, f" catch (...) {{{answer}}}")]


def whole(source, statement):
    """No change, but the statement's beginning: so that the place is told from others that end alike."""
    start = source.tokens[statement.first].start
    return (start, start, "")


def initializers(source, function):
    """What a constructor sets: one of it left alone."""
    if function.first == function.body.first:
        return
    parts = source.split(function.first + 1, function.body.first - 1, ",")
    for position, (first, last) in enumerate(parts):
        if len(parts) == 1:
            yield "initializer dropped", [(source.tokens[function.first].start, source.tokens[last].end, "")]
        elif position == 0:
            yield "initializer dropped", [(source.tokens[first].start, source.tokens[parts[1][0]].start, "")]
        else:
            yield "initializer dropped", [(source.tokens[parts[position - 1][1]].end, source.tokens[last].end, "")]


GENERATORS = (conditions, dropped, exchanged, moved_over_edges, cut_short, handlers, initializers)


def neighbouring_values(source):
    """Two neighbouring variables outside of functions and classes, made in the other order."""
    for one, two in zip(source.values, source.values[1:]):
        if one.scope == two.scope and one.scope.startswith("namespace") and two.first == one.last + 1:
            if not (one.is_function or two.is_function or is_used(source, one.name, two.first, two.last)):
                yield "definitions swapped", swapped(source, (one.first, one.last), (two.first, two.last))
