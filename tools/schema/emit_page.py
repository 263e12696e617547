"""Writes the reference page of the API, for people."""


def occurs(f):
    return "list of " if f.list else "optional " if f.optional else ""


def link(schema, name):
    return f"[{name}](#{name.lower()})" if name in schema.types else name


def only_answers(f):
    return " Not needed in requests." if f.output else ""


def type_section(schema, type_):
    lines = [f"### {type_.name}", ""]
    if type_.doc:
        lines += [type_.doc, ""]
    ancestors = [link(schema, a.name) for a in schema.ancestors(type_)]
    facts = [f"`{type_.cpp}`"]
    facts += ["a fault"] if type_.fault else []
    facts += ["has no objects of its own"] if type_.abstract else []
    facts += ["is a " + " and a ".join(ancestors)] if ancestors else []
    lines += ["; ".join(facts) + ".", ""]
    derived = [link(schema, d.name) for d in schema.derived(type_)]
    if derived:
        lines += ["Kinds of it: " + ", ".join(derived) + ".", ""]
    fields = schema.all_fields(type_)
    if fields:
        lines += ["| Field | Type | |", "| --- | --- | --- |"]
        lines += [f"| `{f.name}` | {occurs(f)}{link(schema, f.type)} | {f.doc}{only_answers(f)} |" for f in fields] + [""]
    if type_.constants:
        lines += ["Constants: " + ", ".join(f'`{k}` = "{v}"' for k, v in type_.constants) + ".", ""]
    return lines


def operation_table(schema):
    """The operations in rows, as docs/agent.md shows them."""
    lines = ["| Operation | What it does | Parameters |", "| --- | --- | --- |"]
    for operation in schema.operations:
        parameters = [f"`{f.name}`" for f in operation.parameters if not f.common]
        route = f"`POST /api/v1/{operation.name}`"
        lines += [f"| {route} | {operation.doc} | {', '.join(parameters)} |"]
    return lines


def operation_section(schema, operation):
    kind = "Changes the host." if operation.changes else "Changes nothing."
    lines = [f"### {operation.name}", "", f"{operation.doc} {kind}", ""]
    if operation.parameters:
        lines += ["| Parameter | Type | |", "| --- | --- | --- |"]
        lines += [f"| `{f.name}` | {occurs(f)}{link(schema, f.type)} | {f.doc} |" for f in operation.parameters] + [""]
    answer = "a fault when it failed"
    if operation.returns:
        answer = ("list of " if operation.returns_list else "") + link(schema, operation.returns) + ", " + answer
    return lines + [f"Answers: {answer}.", ""]


def page(schema):
    lines = [
        "# Management API", "",
        "Generated from the schema. Names are those of the SOAP and JSON texts; all are in the namespace `urn:nox`.", "",
        "## Operations", "",
    ]
    for operation in schema.operations:
        lines += operation_section(schema, operation)
    lines += ["## Types", ""]
    for type_ in sorted(schema.types.values(), key=lambda t: t.name):
        lines += type_section(schema, type_)
    return lines[:-1]
