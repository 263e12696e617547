"""Writes the description of the agent's JSON API: OpenAPI 3.1."""

import json
import re

from openapi_examples import FAULTS, WAITING, example_of

SIMPLE = {
    "boolean": {"type": "boolean"},
    "int": {"type": "integer", "format": "int32"},
    "long": {"type": "integer", "format": "int64"},
    "dateTime": {"type": "string", "format": "date-time"},
    "string": {"type": "string"},
    "base64": {"type": "string", "contentEncoding": "base64"},
    "any": {"description": "A value that names its type: an object by @type, a simple one as {@type, @value}."},
}
DISK, REPORTED_DISK, STORAGE = "HostScsiDisk", "ReportedDisk", "KovaHostConfigInfoStorageInfo"
GROUPS = "The disk groups of the host, those that are not mounted too"
ABOUT = """Looks at the disks of a host and makes disk groups of them.

Every answer of an operation is `{"result": .., "fault": ..}`. A fault without a result has a status that fits its kind;
a result beside a fault has 200: a part failed. Changes are tasks, carried out one after the other."""
SERVERS = [
    {"url": "/", "description": "The agent that gave this description out: on its Unix socket, or on TCP."},
    {"url": "https://{host}:{port}", "description": "An agent on the network.", "variables": {
        "host": {"default": "localhost", "description": "A name that the agent goes by."},
        "port": {"default": "9443", "description": "That it listens on."}}},
]
CERTIFICATE = {"type": "mutualTLS",
               "description": "On the network, a client certificate whose name has a role. On a Unix socket the caller's "
                              "user and groups count instead; on TCP without TLS everybody may read."}
TAGS = {
    "reports": "What the host is like, by GET.",
    "operations": "The operations of the management API, by name.",
    "tasks": "What became of changes.",
    "simulation": "Simulated hosts only.",
    "agent": "The agent itself.",
}
NOT_KNOWN = {"lunType": [""]}  # of a disk that has left
TASK = "Task"


def ref(name):
    return {"$ref": f"#/components/schemas/{name}"}


def described(text, value):
    return {"description": text, **value} if text else value


def kinds(schema, type_):
    """The type and those that derive from it, as far as there are objects of them."""
    found = [] if type_.abstract else [type_.name]
    for derived in schema.derived(type_):
        found += kinds(schema, derived)
    return found


def declared(schema, name):
    """What may stand where a type is declared, in an answer."""
    if name == DISK:
        return ref(REPORTED_DISK)
    return ref(f"Any{name}" if schema.derived(schema.types[name]) else name)


def values_of(type_, f):
    """The values that the type's constants name for the field; none where it may hold any text.

    A constant is named for its field: SCSILUNTYPE_DISK for lunType, STATE_OK for operationalState.
    """
    def names_field(constant):
        prefix, name = constant.split("_")[0].lower(), f.name.lower()
        return prefix.endswith(name) or name.endswith(prefix)
    return [value for constant, value in type_.constants if f.type == "string" and names_field(constant)]


def value_of(schema, f, type_=None):
    value = SIMPLE[f.type] if f.type in SIMPLE else declared(schema, f.type)
    values = values_of(type_, f) if type_ else []
    if values:
        value = {**value, "enum": values + NOT_KNOWN.get(f.name, [])}
    return {"type": "array", "items": value} if f.list else value


def required_of(schema, type_):
    return ["@type"] + [f.name for f in schema.all_fields(type_) if not f.optional and not f.list]


def object_of(schema, type_, required=None):
    properties = {"@type": {"type": "string", "const": type_.name}}
    for owner in [*reversed(list(schema.ancestors(type_))), type_]:
        properties |= {f.name: described(f.doc, value_of(schema, f, owner)) for f in owner.fields}
    return described(type_.doc, {
        "type": "object",
        "properties": properties,
        "required": required or required_of(schema, type_),
        "additionalProperties": False,
    })


def disks(schema):
    """The one type of a disk: what a request must say of it is little, what an answer tells is more."""
    disk = schema.types[DISK]
    reported = ["canonicalName"] + required_of(schema, disk)
    return {
        DISK: {**object_of(schema, disk, ["canonicalName"]),
               "description": disk.doc + " In a request its name is enough: what the host knows of it counts."},
        REPORTED_DISK: {"description": "A disk as answers tell of it. It may be handed back in a request as it came.",
                        "allOf": [ref(DISK)], "required": reported},
    }


def task_of(schema):
    """A task, as an object or, by GET, without its type; there, what one that has ended came to may be null."""
    task = object_of(schema, schema.types[TASK], [f.name for f in schema.types[TASK].fields if not f.optional and not f.list])
    for name in ("result", "fault"):
        value = dict(task["properties"][name])
        doc = value.pop("description")
        task["properties"][name] = {"description": doc, "anyOf": [value, {"type": "null"}]}
    return task


def arguments():
    """Disks and groups as requests name them."""
    return {
        "DiskArgument": {"anyOf": [{"type": "string", "description": "The disk's canonical name."}, ref(DISK)]},
        "MappingArgument": {
            "type": "object",
            "description": "A disk group; one of an answer may be handed back as it came.",
            "properties": {"@type": {"type": "string", "const": "KovaHostDiskMapping"}, "ssd": ref("DiskArgument"),
                           "nonSsd": {"type": "array", "items": ref("DiskArgument")}},
            "required": ["ssd"],
            "additionalProperties": False,
        },
    }


def argument_of(f):
    value = {DISK: ref("DiskArgument"), "KovaHostDiskMapping": ref("MappingArgument")}.get(f.type)
    value = value or SIMPLE[f.type]
    return {"type": "array", "items": value} if f.list else value


def body_of(operation):
    properties = {f.name: described(f.doc, argument_of(f)) for f in operation.parameters}
    # A list that changes something is never left out; one that only asks may be.
    required = [f.name for f in operation.parameters if not f.optional and (not f.list or operation.changes)]
    if operation.changes:
        properties["label"] |= {"maxLength": 256}
        properties["wait"] |= {"default": True}
    schema = {"type": "object", "properties": properties, "additionalProperties": False}
    return {**schema, "required": required} if required else schema


def answer_of(schema, returns, many, task):
    result = {"type": "null"}
    if returns:
        value = declared(schema, returns)
        result = {"anyOf": [{"type": "array", "items": value} if many else value, {"type": "null"}]}
    properties = {"result": result, "fault": {"anyOf": [ref("AnyMethodFault"), {"type": "null"}]}}
    if task:
        properties = {"task": {"type": "string", "description": "The task's id."}, **properties}
    return {"type": "object", "properties": properties, "required": list(properties), "additionalProperties": False}


def content(schema, example):
    return {"application/json": {"schema": schema, "example": example}}


def plain(example):
    return {"text/plain": {"schema": {"type": "string"}, "example": example}}


# Why a request is refused as a whole, by status.
REFUSALS = {
    "400": "It cannot be read, or is wrong whatever the host is like: InvalidArgument, DuplicateDisks.",
    "403": "The caller's role does not allow it: NotPermitted.",
    "404": "There is no such thing.",
    "409": "The host, as it is now, does not allow it: HostChanged, or a fault of the storage service.",
    "415": "The body is not application/json.",
    "500": "Something in the host failed: SystemError.",
    "503": "Too many changes or queries wait: Busy.",
}
OTHERWISE = "RefusedOtherwise"
OTHER_REFUSALS = {
    "description": "It is no request that is served: 405 for another method; 408, 413, 417, 421 and 431 by the server.",
    "content": {**content({"$ref": "#/components/schemas/Refusal"}, FAULTS["400"]), **plain("the body is too large\n")},
}
READ = ["400", "403"]
ASKED = READ + ["409", "500", "503"]  # of the host
REFUSAL = {"type": "object", "description": "An answer that is a fault and nothing else.",
           "properties": {"task": {"type": "string"}, "result": {"description": "null, or an empty list."},
                          "fault": {"$ref": "#/components/schemas/AnyMethodFault"}},
           "required": ["result", "fault"], "additionalProperties": False}


def refusals():
    found = {"Refused" + status: {"description": why, "content": content(ref("Refusal"), FAULTS[status])}
             for status, why in REFUSALS.items()}
    found["Refused503"]["headers"] = {
        "Retry-After": {"description": "Seconds after which to ask again.", "schema": {"type": "integer"}}}
    return {**found, OTHERWISE: OTHER_REFUSALS}


def operation(operation_id, tag, summary, answer, refused, **more):
    """One operation. `answer` is its schema, none: a text; `refused` the statuses of its refusals."""
    body, example = example_of(operation_id)
    if "requestBody" in more:
        more["requestBody"] = {"required": True, "content": content(more["requestBody"], body)}
    done = "A result, perhaps beside a fault where a part failed; or neither: done."
    return {
        "operationId": operation_id, "tags": [tag], "summary": summary, **more,
        "responses": {
            "200": {"description": done if answer else summary,
                    "content": content(answer, example) if answer else plain(example)},
            **{status: {"$ref": "#/components/responses/Refused" + status} for status in sorted(refused)},
            "4XX": {"$ref": "#/components/responses/" + OTHERWISE}}}


def change(operation_id, tag, summary, answer, body):
    found = operation(operation_id, tag, summary, answer, ASKED + ["415"], requestBody=body)
    taken_on = {"description": "Taken on; asked for without waiting.", "content": content(ref(TASK), WAITING)}
    found["responses"] = {"200": found["responses"].pop("200"), "202": taken_on, **found["responses"]}
    return found


def reports(schema):
    """What GET asks of the host."""
    names = {"name": "names", "in": "query", "description": "Canonical names; none: every disk.", "explode": True,
             "schema": {"type": "array", "items": {"type": "string"}}}
    return {
        "/api/v1/disks": {"get": operation(
            "listDisks", "reports", "Which disks the service could use, and why it cannot use the others",
            answer_of(schema, "KovaHostDiskResult", True, False), ASKED, parameters=[names])},
        "/api/v1/groups": {"get": operation(
            "listGroups", "reports", GROUPS, answer_of(schema, STORAGE, False, False), ASKED)},
        "/api/v1/config": {"get": operation(
            "readConfig", "reports", "The host's cluster, network and fault domain",
            answer_of(schema, "KovaHostConfigInfo", False, False), ASKED)},
    }


def tasks():
    every = {"type": "object", "properties": {"tasks": {"type": "array", "items": ref(TASK)}}, "required": ["tasks"]}
    task_id = {"name": "id", "in": "path", "required": True, "description": "As the answer to the change told it.",
               "schema": {"type": "string"}}
    return {
        "/api/v1/tasks": {"get": operation("listTasks", "tasks", "What became of the requests that change disks",
                                           every, READ)},
        "/api/v1/tasks/{id}": {"get": operation("readTask", "tasks", "One of them, with its result", ref(TASK),
                                                READ + ["404"], parameters=[task_id])},
    }


def simulated_host(schema):
    host = {"type": "object", "description": "A host description, as a file holds it."}
    body = {"type": "object", "additionalProperties": False, "properties": {
        "set": {"type": "object", "description": "Top-level keys of the description to replace."},
        "disk": {"type": "object", "description": "Keys of one disk to replace.", "required": ["name"],
                 "properties": {"name": {"type": "string"}}, "additionalProperties": True}}}
    return {"/api/v1/host": {
        "get": operation("readHost", "simulation", "The description of a simulated host", host, READ + ["404"]),
        "post": change("changeHost", "simulation", "Changes a simulated host", answer_of(schema, "", False, True), body)}}


def about_the_agent():
    return {
        "/healthz": {"get": operation("readHealth", "agent", "Whether the agent serves, and who may read: its version",
                                      None, [], security=[])},
        "/metrics": {"get": operation(
            "readMetrics", "agent", "What the agent has served and what waits, in the text format of Prometheus", None,
            READ)},
    }


def operations(schema):
    paths = {}
    for o in schema.operations:
        answer = answer_of(schema, o.returns, o.returns_list, o.changes)
        paths["/api/v1/" + o.name] = {"post": change(o.name, "operations", o.doc, answer, body_of(o)) if o.changes else
                                      operation(o.name, "operations", o.doc, answer, ASKED + ["415"], requestBody=body_of(o))}
    return paths


def types_of(schema):
    found = {}
    for type_ in schema.types.values():
        if not type_.abstract:
            found[type_.name] = object_of(schema, type_)
        if schema.derived(type_):
            found["Any" + type_.name] = {"description": type_.doc, "oneOf": [ref(name) for name in kinds(schema, type_)],
                                         "discriminator": {"propertyName": "@type"}}
    return {**found, **disks(schema), **arguments(), TASK: task_of(schema), "Refusal": REFUSAL}


def used(types, *roots):
    """Those of the types that the roots lead to, in their order."""
    names, at = set(), list(roots)
    while at:
        text = json.dumps(at.pop())
        for name in set(re.findall(r'"#/components/schemas/([^"]*)"', text)) - names:
            names.add(name)
            at.append(types[name])
    return {name: value for name, value in types.items() if name in names}


def openapi(schema):
    paths = {**reports(schema), **operations(schema), **tasks(), **simulated_host(schema), **about_the_agent()}
    responses = refusals()
    document = {
        "openapi": "3.1.0",
        "info": {"title": "KOVA host agent", "version": "1", "description": ABOUT},
        "servers": SERVERS,
        "security": [{"certificate": []}, {}],
        "tags": [{"name": name, "description": what} for name, what in TAGS.items()],
        "paths": paths,
        "components": {"schemas": used(types_of(schema), paths, responses), "responses": responses,
                       "securitySchemes": {"certificate": CERTIFICATE}},
    }
    return json.dumps(document, indent=1).split("\n")
