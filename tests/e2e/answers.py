"""Whether an agent's answers are well formed and typed, held against the documents that the agent gives out itself."""

import json

import jsonschema
from lxml import etree

ENVELOPE = "{http://schemas.xmlsoap.org/soap/envelope/}"
API = "{urn:nox}"
FAULT_STATUSES = {"InvalidArgument": 400, "DuplicateDisks": 400, "NotPermitted": 403, "Busy": 503, "SystemError": 500}
OTHER_FAULT = 409  # the disks, as they are now, do not allow it
MAPPING_RESULTS = ("AddDisks", "AddAllEligibleDisks", "InitializeDisks", "UnmountDiskMapping")
QUERIES = ("QueryDisksForKova", "GetStorageInfo", "GetDiskGroups", "GetConfigInfo", "GetTwin")
# Operations that may end with neither result nor fault.
SILENT = ("AddAllEligibleDisks", "RemoveDisk", "RemoveDiskMapping", "ClaimUnmountedDiskgroup")
PLAIN = "a text"  # in the place of a fault's type: a SOAP message that could not be read


class Untyped(AssertionError):
    """An answer that is not what the documents promise."""


def demand(holds, why):
    if not holds:
        raise Untyped(why)


class Answer:
    """What an answer says: the type of its fault, or PLAIN, or None; and the groups that went well, as names."""

    def __init__(self, fault, groups=()):
        self.fault = fault
        self.groups = list(groups)


class Checker:
    """Reads answers, and raises Untyped for one that is not right."""

    def __init__(self, agent):
        self.description = agent.ask("GET", "/api/v1/openapi.json")[1]
        self.schema = etree.XMLSchema(etree.fromstring(agent.ask("GET", "/soap?xsd=nox.xsd")[1].encode()))
        self.validators = {}

    def json(self, operation, status, content_type, text):
        demand(content_type == "application/json", content_type)
        answer = json.loads(text)
        self.validate(operation, status, answer)
        if status == 202:
            return Answer(None)
        demand(set(answer) - {"task"} == {"result", "fault"}, f"the answer has {list(answer)}")
        read = self.read(operation, answer)
        failed = read.fault is not None and not answer["result"]
        wanted = FAULT_STATUSES.get(read.fault, OTHER_FAULT) if failed else 200
        demand(status == wanted, f"{status} with {read.fault}")
        return read

    def read(self, operation, answer):
        """Of result and fault, either of which may be missing."""
        fault, result = answer.get("fault"), answer.get("result")
        self.check_pair(operation, fault, result is not None)
        groups = [[disk["canonicalName"] for disk in [one["mapping"]["ssd"], *one["mapping"].get("nonSsd", [])]]
                  for one in result or [] if operation in MAPPING_RESULTS and "error" not in one]
        return Answer(fault and fault["@type"], groups)

    def validate(self, operation, status, answer):
        key = operation, status
        if key not in self.validators:
            described = self.description["paths"]["/api/v1/" + operation]["post"]["responses"]
            demand(str(status) in described, f"status {status} is not described")
            response = described[str(status)]
            if "$ref" in response:
                response = self.description["components"]["responses"][response["$ref"].rsplit("/", 1)[1]]
            schema = response["content"]["application/json"]["schema"]
            self.validators[key] = jsonschema.Draft202012Validator(
                {**schema, "components": self.description["components"]})
        error = next(self.validators[key].iter_errors(answer), None)
        demand(error is None, error)

    def soap(self, operation, status, content_type, text):
        demand(content_type == "text/xml; charset=utf-8", content_type)
        root = etree.fromstring(text.encode())
        demand(root.tag == ENVELOPE + "Envelope" and len(root) == 1, root.tag)
        [body] = root
        demand(body.tag == ENVELOPE + "Body" and len(body) == 1, body.tag)
        [message] = body
        return self.soap_fault(status, message) if status == 500 else self.response(operation, status, message)

    def response(self, operation, status, message):
        demand(status == 200 and message.tag == f"{API}{operation}Response", f"{status} with {message.tag}")
        self.hold_to_schema(message)
        fault = message.find(API + "fault")
        is_list = operation in ("QueryDisksForKova", *MAPPING_RESULTS)
        task = message.findall(API + "task")
        demand(len(task) == (0 if operation in QUERIES else 1), f"{operation} tells {len(task)} tasks")
        self.check_pair(operation, fault, is_list or len(message) > len(task))  # an empty list shows as nothing
        groups = [[name.text or "" for name in group.findall(f"{API}mapping/*/{API}canonicalName")]
                  for group in message.findall(API + "result")
                  if operation in MAPPING_RESULTS and group.find(API + "error") is None]
        return Answer(None if fault is None else self.type_of(fault), groups)

    def soap_fault(self, status, message):
        demand(message.tag == ENVELOPE + "Fault", f"{status} with {message.tag}")
        parts = {part.tag: part for part in message}
        demand(list(parts)[:2] == ["faultcode", "faultstring"] and parts["faultstring"].text, list(parts))
        demand(parts["faultcode"].text in ("soapenv:Client", "soapenv:Server"), parts["faultcode"].text)
        if "detail" not in parts:
            return Answer(PLAIN)
        fault, *task = parts["detail"]
        demand([part.tag for part in task] in ([], [API + "task"]), "what else stands in the detail")
        for part in (fault, *task):
            self.hold_to_schema(part)
        return Answer(self.type_of(fault))

    def hold_to_schema(self, element):
        document = etree.fromstring(etree.tostring(element))  # with the namespaces that are in scope
        demand(self.schema.validate(document), self.schema.error_log.last_error)

    @staticmethod
    def type_of(fault):
        kind = fault.get("{http://www.w3.org/2001/XMLSchema-instance}type")
        demand(kind, "a fault without a type")
        return kind.split(":")[-1]

    @staticmethod
    def check_pair(operation, fault, complete):
        demand(complete or fault is not None or operation in SILENT, "neither a result nor a fault")
