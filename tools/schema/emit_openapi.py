"""Writes the description of the agent's JSON API: OpenAPI 3.1."""

import json

SIMPLE = {
    "boolean": {"type": "boolean"},
    "int": {"type": "integer", "format": "int32"},
    "long": {"type": "integer", "format": "int64"},
    "dateTime": {"type": "string", "format": "date-time"},
    "string": {"type": "string"},
    "base64": {"type": "string", "contentEncoding": "base64"},
    "any": {"description": "A value that names its type: an object by @type, a simple one as {@type, @value}."},
}
# Read by nobody's program name, written by every request that changes disks.
TASK = {
    "type": "object",
    "description": "A request that changes disks, from the moment the agent takes it on.",
    "properties": {
        "id": {"type": "string"},
        "label": {"type": "string", "description": "The client's own."},
        "operation": {"type": "string"},
        "state": {"enum": ["waiting", "running", "done", "partly", "failed"]},
        "created": SIMPLE["dateTime"],
        "started": SIMPLE["dateTime"],
        "ended": SIMPLE["dateTime"],
        "percent": {"type": "integer"},
        "step": {"type": "string"},
        "result": {"description": "Of one that has ended, and asked for by its id."},
        "resultForgotten": {"type": "boolean", "description": "Of one whose result was too large to be kept."},
        "fault": {"anyOf": [{"$ref": "#/components/schemas/AnyMethodFault"}, {"type": "null"}]},
    },
    "required": ["id", "label", "operation", "state", "created", "percent", "step"],
    "additionalProperties": False,
}


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
    """What may stand where a type is declared."""
    return ref(f"Any{name}" if schema.derived(schema.types[name]) else name)


def value_of(schema, f):
    value = SIMPLE[f.type] if f.type in SIMPLE else declared(schema, f.type)
    return {"type": "array", "items": value} if f.list else value


def object_of(schema, type_):
    fields = schema.all_fields(type_)
    return described(type_.doc, {
        "type": "object",
        "properties": {"@type": {"const": type_.name},
                       **{f.name: described(f.doc, value_of(schema, f)) for f in fields}},
        "required": ["@type"] + [f.name for f in fields if not f.optional and not f.list],
        "additionalProperties": False,
    })


def arguments(schema):
    """Disks and groups as requests name them."""
    disk = object_of(schema, schema.types["HostScsiDisk"])
    disk["required"] = ["canonicalName"]
    disk["description"] = "What is left out has defaults. A disk that the host knows is taken as the host knows it."
    disk_argument = {"anyOf": [{"type": "string", "description": "The disk's canonical name."}, disk]}
    return {
        "DiskArgument": disk_argument,
        "MappingArgument": {
            "type": "object",
            "properties": {"@type": {"const": "KovaHostDiskMapping"}, "ssd": ref("DiskArgument"),
                           "nonSsd": {"type": "array", "items": ref("DiskArgument")}},
            "required": ["ssd"],
            "additionalProperties": False,
        },
    }


def argument_of(f):
    value = {"HostScsiDisk": ref("DiskArgument"), "KovaHostDiskMapping": ref("MappingArgument")}.get(f.type)
    value = value or SIMPLE[f.type]
    return {"type": "array", "items": value} if f.list else value


def changes(operation):
    return not operation.name.startswith(("Query", "Get"))


def body_of(operation):
    properties = {f.name: argument_of(f) for f in operation.parameters if f.name != "label"}
    # A list that changes something is never left out; one that only asks may be.
    required = [f.name for f in operation.parameters
                if f.name in properties and not f.optional and (not f.list or changes(operation))]
    if changes(operation):
        properties["label"] = {"type": "string", "maxLength": 256, "description": "The client's own, kept with the task."}
        properties["wait"] = {"type": "boolean", "default": True,
                              "description": "false: the answer is the task as it was taken on, with 202."}
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


def content(schema):
    return {"application/json": {"schema": schema}}


PLAIN = {"content": {"text/plain": {"schema": {"type": "string"}}}}
FAULT = {"anyOf": [{"type": "object", "properties": {"fault": ref("AnyMethodFault")}, "required": ["fault"]}]}


def responses(answer, waits=False):
    found = {
        "200": {"description": "A result, perhaps beside a fault; or neither: done.", "content": content(answer)},
        "400": {"description": "A request that cannot be read (text), or does not fit the host (fault).",
                "content": {**content(FAULT), **PLAIN["content"]}},
        "403": {"description": "The caller's role does not allow it.", "content": content(FAULT)},
        "409": {"description": "The host, as it is now, does not allow it.", "content": content(FAULT)},
        "500": {"description": "Any other fault.", "content": content(FAULT)},
    }
    if waits:
        found["202"] = {"description": "Taken on; asked for without waiting.", "content": content(ref("Task"))}
        found["503"] = {"description": "Too many changes wait.", "content": content(FAULT),
                        "headers": {"Retry-After": {"schema": {"type": "integer"}}}}
    return found


def query(summary, answer, parameters=()):
    found = {"summary": summary, "responses": responses(answer)}
    return {"get": {**found, "parameters": list(parameters)} if parameters else found}


def fixed_paths(schema):
    """What the agent serves beside the operations of the schema."""
    groups = answer_of(schema, "KovaHostConfigInfoStorageInfo", False, False)
    task_id = {"name": "id", "in": "path", "required": True, "schema": {"type": "string"}}
    names = {"name": "names", "in": "query", "description": "Canonical names; none: every disk.",
             "schema": {"type": "array", "items": {"type": "string"}}, "explode": True}
    host = {"type": "object", "description": "A host description, as a file holds it."}
    change = {"type": "object", "additionalProperties": False, "properties": {
        "set": {"type": "object", "description": "Top-level keys of the description to replace."},
        "disk": {"type": "object", "description": "Keys of one disk to replace.", "required": ["name"]}}}
    tasks = {"type": "object", "properties": {"tasks": {"type": "array", "items": ref("Task")}}, "required": ["tasks"]}
    return {
        "/api/v1/disks": query("QueryDisksForKova", answer_of(schema, "KovaHostDiskResult", True, False), [names]),
        "/api/v1/groups": query("The disk groups of the host, those that are not mounted too", groups),
        "/api/v1/config": query("GetConfigInfo", answer_of(schema, "KovaHostConfigInfo", False, False)),
        "/api/v1/GetDiskGroups": {"post": {
            "summary": "The disk groups of the host, those that are not mounted too",
            "requestBody": {"required": True, "content": content({"type": "object", "additionalProperties": False})},
            "responses": responses(groups)}},
        "/api/v1/tasks": query("What became of the requests that change disks", tasks),
        "/api/v1/tasks/{id}": query("One of them, with its result", ref("Task"), [task_id]),
        "/api/v1/host": {
            **query("The description of a simulated host", host),
            "post": {"summary": "Changes a simulated host",
                     "requestBody": {"required": True, "content": content(change)},
                     "responses": responses(answer_of(schema, "", False, True), waits=True)}},
        "/healthz": {"get": {"summary": "Whether the agent serves", "responses": {"200": {"description": "ok", **PLAIN}}}},
        "/metrics": {"get": {"summary": "What the agent has served and what waits, in the text format of Prometheus",
                             "responses": {"200": {"description": "Metrics", **PLAIN}}}},
    }


def openapi(schema):
    paths = fixed_paths(schema)
    for o in schema.operations:
        paths[f"/api/v1/{o.name}"] = {"post": {
            "operationId": o.name,
            "summary": o.doc,
            "requestBody": {"required": True, "content": content(body_of(o))},
            "responses": responses(answer_of(schema, o.returns, o.returns_list, changes(o)), waits=changes(o)),
        }}
    components = {}
    for type_ in schema.types.values():
        if not type_.abstract:
            components[type_.name] = object_of(schema, type_)
        if schema.derived(type_):
            components[f"Any{type_.name}"] = {"oneOf": [ref(name) for name in kinds(schema, type_)]}
    document = {
        "openapi": "3.1.0",
        "info": {"title": "KOVA host agent", "version": "1"},
        "paths": paths,
        "components": {"schemas": {**components, **arguments(schema), "Task": TASK}},
    }
    return json.dumps(document, indent=1).split("\n")
