"""Writes the XML Schema and the WSDL of the API.

The WSDL holds the types that its messages need and refers to no other document; the XML Schema holds all types,
also those of stand-alone texts.
"""

from xml.sax.saxutils import escape

NAMESPACE = "urn:nox"
SIMPLE = {
    "boolean": "xsd:boolean", "int": "xsd:int", "long": "xsd:long", "dateTime": "xsd:dateTime",
    "string": "xsd:string", "base64": "xsd:base64Binary", "any": "xsd:anyType",
}

# Stands for the address, of which only a server knows which it is.
ANY_ADDRESS = "http://localhost/soap"

RESULT_DOC = "What the operation came to."
FAULT_DOC = "What failed, beside the results that there are."
TASK_DOC = "Identifies the change among the agent's tasks."


def type_name(name):
    return SIMPLE.get(name, f"nox:{name}")


def doc(text, indent):
    pad = " " * indent
    return [f"{pad}<xsd:annotation><xsd:documentation>{escape(text)}</xsd:documentation></xsd:annotation>"] if text else []


def element(f, indent):
    """A field. One that only answers have to hold may be missing: the same type stands in requests."""
    occurs = ' minOccurs="0" maxOccurs="unbounded"' if f.list else ' minOccurs="0"' if f.optional or f.output else ""
    return plain_element(f.name, type_name(f.type), occurs, f.doc, indent)


def plain_element(name, type_, occurs, text, indent):
    pad = " " * indent
    head = f'{pad}<xsd:element name="{name}" type="{type_}"{occurs}'
    return [head + ">"] + doc(text, indent + 2) + [f"{pad}</xsd:element>"] if text else [head + "/>"]


def complex_type(type_):
    abstract = ' abstract="true"' if type_.abstract else ""
    lines = [f'  <xsd:complexType name="{type_.name}"{abstract}>', *doc(type_.doc, 4)]
    lines += [f'    <xsd:complexContent><xsd:extension base="nox:{type_.base}"><xsd:sequence>']
    for f in type_.fields:
        lines += element(f, 6)
    return lines + ["    </xsd:sequence></xsd:extension></xsd:complexContent>", "  </xsd:complexType>"]


def array_type(name, item):
    return [
        f'  <xsd:complexType name="{name}List"><xsd:sequence>',
        f'    <xsd:element name="item" type="{item}" minOccurs="0" maxOccurs="unbounded"/>',
        "  </xsd:sequence></xsd:complexType>",
    ]


def wrapper(name, text, lines):
    head = [f'  <xsd:element name="{name}">', *doc(text, 4), "    <xsd:complexType><xsd:sequence>"]
    return head + lines + ["    </xsd:sequence></xsd:complexType>", "  </xsd:element>"]


def operation_elements(operation):
    request = [line for f in operation.parameters for line in element(f, 6)]
    answer = []
    if operation.returns:
        many = ' minOccurs="0" maxOccurs="unbounded"' if operation.returns_list else ' minOccurs="0"'
        answer += plain_element("result", f"nox:{operation.returns}", many, RESULT_DOC, 6)
    answer += plain_element("fault", "nox:MethodFault", ' minOccurs="0"', FAULT_DOC, 6)
    if operation.changes:
        answer += plain_element("task", "xsd:string", ' minOccurs="0"', TASK_DOC, 6)
    text = f"The answer to {operation.name}."
    return wrapper(operation.name, operation.doc, request) + wrapper(f"{operation.name}Response", text, answer)


def used_types(schema):
    """What the messages may hold: what they refer to, the bases of that, and every kind of it."""
    wanted = ["MethodFault"]
    for operation in schema.operations:
        wanted += [operation.returns] + [f.type for f in operation.parameters]
    used = set()
    while wanted:
        type_ = schema.types.get(wanted.pop())
        if type_ is None or type_.name in used:
            continue
        used.add(type_.name)
        wanted += [type_.base] + [f.type for f in type_.fields]
        if type_.fault:
            wanted += [other.name for other in schema.derived(type_)]
    return [type_ for type_ in schema.types.values() if type_.name in used]


def schema_element(content):
    return [
        f'<xsd:schema xmlns:xsd="http://www.w3.org/2001/XMLSchema" xmlns:nox="{NAMESPACE}" targetNamespace="{NAMESPACE}"',
        '            elementFormDefault="qualified" attributeFormDefault="unqualified">',
        *content,
        "</xsd:schema>",
    ]


def common(schema):
    lines = ['  <xsd:element name="fault" type="nox:MethodFault"/>']
    lines += plain_element("task", "xsd:string", "", TASK_DOC, 2)
    return lines + ['  <xsd:complexType name="DataObject" abstract="true"/>']


def messages(schema):
    return [line for operation in schema.operations for line in operation_elements(operation)]


def xsd(schema):
    lines = ['  <xsd:element name="object" type="xsd:anyType"/>', *common(schema)]
    lines += array_type("Text", "xsd:string")
    for type_ in schema.types.values():
        lines += complex_type(type_) + array_type(type_.name, f"nox:{type_.name}")
    return ['<?xml version="1.0" encoding="UTF-8"?>'] + schema_element(lines + messages(schema))


def types(schema):
    lines = common(schema)
    for type_ in used_types(schema):
        lines += complex_type(type_)
    return ["  <wsdl:types>", *schema_element(lines + messages(schema)), "  </wsdl:types>"]


def port(schema):
    lines = ['  <wsdl:portType name="KovaPort">']
    for o in schema.operations:
        lines += [
            f'    <wsdl:operation name="{o.name}">',
            f"      <wsdl:documentation>{escape(o.doc)}</wsdl:documentation>",
            f'      <wsdl:input message="nox:{o.name}Message"/>',
            f'      <wsdl:output message="nox:{o.name}ResponseMessage"/>',
            '      <wsdl:fault name="fault" message="nox:Fault"/>',
            "    </wsdl:operation>",
        ]
    return lines + ["  </wsdl:portType>"]


def binding(schema):
    lines = ['  <wsdl:binding name="KovaBinding" type="nox:KovaPort">']
    lines += ['    <soap:binding style="document" transport="http://schemas.xmlsoap.org/soap/http"/>']
    for o in schema.operations:
        lines += [
            f'    <wsdl:operation name="{o.name}">',
            f'      <soap:operation soapAction="{NAMESPACE}#{o.name}"/>',
            '      <wsdl:input><soap:body use="literal"/></wsdl:input>',
            '      <wsdl:output><soap:body use="literal"/></wsdl:output>',
            '      <wsdl:fault name="fault"><soap:fault name="fault" use="literal"/></wsdl:fault>',
            "    </wsdl:operation>",
        ]
    return lines + ["  </wsdl:binding>"]


def wsdl(schema, address=ANY_ADDRESS, product=""):
    """`product`: what is said of the server, behind what the service is."""
    lines = [
        '<?xml version="1.0" encoding="UTF-8"?>',
        '<wsdl:definitions xmlns:wsdl="http://schemas.xmlsoap.org/wsdl/" xmlns:soap="http://schemas.xmlsoap.org/wsdl/soap/"',
        f'                  xmlns:xsd="http://www.w3.org/2001/XMLSchema" xmlns:nox="{NAMESPACE}" targetNamespace="{NAMESPACE}" name="Kova">',
        *types(schema),
        '  <wsdl:message name="Fault"><wsdl:part name="fault" element="nox:fault"/></wsdl:message>',
    ]
    for o in schema.operations:
        for suffix in ("", "Response"):
            part = f'<wsdl:part name="parameters" element="nox:{o.name}{suffix}"/>'
            lines += [f'  <wsdl:message name="{o.name}{suffix}Message">{part}</wsdl:message>']
    return lines + port(schema) + binding(schema) + [
        '  <wsdl:service name="KovaService">',
        f"    <wsdl:documentation>The disks and disk groups of one host.{product}</wsdl:documentation>",
        f'    <wsdl:port name="KovaPort" binding="nox:KovaBinding"><soap:address location="{address}"/></wsdl:port>',
        "  </wsdl:service>",
        "</wsdl:definitions>",
    ]
