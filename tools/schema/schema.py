"""Reads the schema language of the API types (described in orbis/schema/binding.schema)."""

import re
from dataclasses import dataclass, field

SIMPLE_TYPES = ("boolean", "int", "long", "dateTime", "string", "base64", "any")


class SchemaError(Exception):
    """A schema that cannot be understood; the text names file and line."""


@dataclass
class Field:
    name: str
    type: str
    optional: bool
    list: bool
    lazy: bool = False
    output: bool = False
    key: bool = False
    doc: str = ""
    common: bool = False  # every change has it

    @property
    def is_object(self):
        return self.type not in SIMPLE_TYPES


@dataclass
class Type:
    name: str
    cpp: str
    base: str
    fault: bool
    abstract: bool
    file: str
    origin: str
    doc: str = ""
    fields: list = field(default_factory=list)
    constants: list = field(default_factory=list)
    construct: str = ""
    cpp_base: str = ""  # where the class has another base than the type

    @property
    def cpp_path(self):
        return self.cpp.split("::")

    @property
    def cpp_name(self):
        return self.cpp_path[-1]


@dataclass
class Operation:
    name: str
    changes: bool
    returns: str
    returns_list: bool
    doc: str = ""
    parameters: list = field(default_factory=list)


@dataclass
class Schema:
    types: dict
    operations: list
    common: list = field(default_factory=list)  # parameters of every change

    def all_fields(self, type_):
        """Fields in wire order: those of the bases first."""
        inherited = self.all_fields(self.types[type_.base]) if type_.base in self.types else []
        return inherited + type_.fields

    def ancestors(self, type_):
        while type_.base in self.types:
            type_ = self.types[type_.base]
            yield type_

    def derived(self, type_):
        return [other for other in self.types.values() if other.base == type_.name]

    def key(self, type_):
        """The field that identifies objects of the type, or None."""
        return next((f for f in self.all_fields(type_) if f.key), None)

    def outer(self, type_):
        """The type whose C++ class the given one is nested in, or None."""
        path = "::".join(type_.cpp_path[:-1])
        return next((other for other in self.types.values() if other.cpp == path), None)


TYPE = re.compile(r"(abstract )?(type|fault) (\w+) = ([\w:]+) : (\w+) \{$")
FIELD = re.compile(r"(\w+)(\?|\[\])?: (\w+)( lazy| output| key)?$")
CONSTANT = re.compile(r'const (\w+) = "([^"]*)"$')
CONSTRUCT = re.compile(r"construct\((\w+)\)$")
EVERY_CHANGE = "every change {"
OPERATION = re.compile(r"(query|change) (\w+)(?: returns (\w+)(\[\])?)? \{$")


def _field(text, where):
    match = FIELD.match(text)
    if not match:
        raise SchemaError(f"{where}: not a field: {text}")
    name, mark, type_, word = match.groups()
    if word == " lazy" and (mark != "[]" or type_ in SIMPLE_TYPES):
        raise SchemaError(f"{where}: only a list of data objects can be lazy: {text}")
    if word == " output" and mark:
        raise SchemaError(f"{where}: only a field that is always there can be output: {text}")
    if word == " key" and (mark != "?" or type_ != "string"):
        raise SchemaError(f"{where}: only an optional text can be a key: {text}")
    return Field(name, type_, mark == "?", mark == "[]", word == " lazy", word == " output", word == " key")


def _read(path, schema):
    current, file_, doc = None, None, []
    with open(path, encoding="utf-8") as file:
        lines = file.readlines()
    for number, line in enumerate(lines, 1):
        where, text = f"{path}:{number}", line.strip()
        if text.startswith("## "):
            doc.append(text[3:])
            continue
        if not text or text.startswith("#"):
            continue
        if text.startswith("file "):
            file_ = text[5:]
        elif match := TYPE.match(text):
            abstract, kind, name, cpp, base = match.groups()
            if name in schema.types:
                raise SchemaError(f"{where}: {name} is defined twice")
            if current:
                raise SchemaError(f"{where}: {current.name} is not closed before {name}")
            if file_ is None:
                raise SchemaError(f"{where}: no `file` before the first type")
            current = Type(name, cpp, base, kind == "fault", bool(abstract), file_, path, " ".join(doc))
            schema.types[name] = current
        elif text == "}" and current:
            current = None
        elif match := OPERATION.match(text):
            kind, name, returns, many = match.groups()
            if current:
                raise SchemaError(f"{where}: {current.name} is not closed before {name}")
            current = Operation(name, kind == "change", returns or "", bool(many), " ".join(doc))
            schema.operations.append(current)
        elif text == EVERY_CHANGE and not current:
            current = Operation("every change", True, "", False, parameters=schema.common)
        elif isinstance(current, Type) and (match := CONSTANT.match(text)):
            current.constants.append(match.groups())
        elif isinstance(current, Type) and (match := CONSTRUCT.match(text)):
            current.construct = match.group(1)
        elif current:
            fields = current.fields if isinstance(current, Type) else current.parameters
            fields.append(_field(text, where))
            fields[-1].doc = " ".join(doc)
        else:
            raise SchemaError(f"{where}: not understood: {text}")
        doc = []
    if current:
        raise SchemaError(f"{path}: {current.name} is not closed")


def _check_base(schema, type_):
    """Walks up to DataObject; must come first, everything else walks the same way and trusts it."""
    seen, at = {type_.name}, type_
    while at.base != "DataObject":
        if at.base not in schema.types:
            raise SchemaError(f"{at.name}: unknown base {at.base}")
        if at.base in seen:
            raise SchemaError(f"{type_.name}: its bases run in a circle through {at.base}")
        seen.add(at.base)
        at = schema.types[at.base]
    if type_.base in schema.types and type_.fault != schema.types[type_.base].fault:
        raise SchemaError(f"{type_.name}: faults derive from faults, and only they")


def _check_required(schema, type_):
    """A new object makes its required objects, so these must have objects and must come to an end."""
    seen, at = [], [type_]
    while at:
        outer = at.pop()
        for f in schema.all_fields(outer):
            if f.list or f.optional or f.type not in schema.types:
                continue
            if schema.types[f.type].abstract:
                raise SchemaError(f"{outer.name}.{f.name}: {f.type} is abstract, so the field cannot be required")
            if f.type == type_.name:
                raise SchemaError(f"{type_.name}: requires an object of its own type, without end")
            if f.type not in seen:
                seen.append(f.type)
                at.append(schema.types[f.type])


def _check(schema):
    for type_ in schema.types.values():
        if type_.name in ("DataObject", "Text") or type_.name.endswith("List"):
            raise SchemaError(f"{type_.name}: the name belongs to the binding itself")
        _check_base(schema, type_)
    for type_ in schema.types.values():
        names = [f.name for f in schema.all_fields(type_)]
        for name in names:
            if names.count(name) > 1:
                raise SchemaError(f"{type_.name}: field {name} is defined twice")
        if type_.construct and type_.construct not in names:
            raise SchemaError(f"{type_.name}: cannot construct from unknown field {type_.construct}")
        for f in type_.fields:
            if f.is_object and f.type not in schema.types:
                raise SchemaError(f"{type_.name}.{f.name}: unknown type {f.type}")
            if f.list and not f.is_object and f.type != "string":
                raise SchemaError(f"{type_.name}.{f.name}: lists hold data objects or texts")
    for type_ in schema.types.values():
        _check_required(schema, type_)
    names = [operation.name for operation in schema.operations]
    for operation in schema.operations:
        if names.count(operation.name) > 1:
            raise SchemaError(f"{operation.name}: operation is defined twice")
        _check_operation(schema, operation)


def _check_operation(schema, operation):
    if not operation.doc:
        raise SchemaError(f"{operation.name}: an operation says what it is for")
    names = [f.name for f in operation.parameters]
    for f in operation.parameters:
        if names.count(f.name) > 1:
            raise SchemaError(f"{operation.name}: parameter {f.name} is defined twice")
        if f.is_object and f.type not in schema.types:
            raise SchemaError(f"{operation.name}({f.name}): unknown type {f.type}")
        if not f.doc:
            raise SchemaError(f"{operation.name}({f.name}): a parameter says what it is for")
    if operation.returns and operation.returns not in schema.types:
        raise SchemaError(f"{operation.name}: unknown result {operation.returns}")


def read(paths):
    """One schema from several files, later ones building on earlier ones."""
    schema = Schema({}, [])
    for path in paths:
        try:
            _read(path, schema)
        except (OSError, UnicodeDecodeError) as error:
            raise SchemaError(f"{path}: cannot be read: {error}") from error
    for f in schema.common:
        f.common = True
    for operation in schema.operations:
        operation.parameters += schema.common if operation.changes else []
    _check(schema)
    return schema
