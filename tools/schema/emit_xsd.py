"""Writes the XML Schema and the WSDL of the API."""

from xml.sax.saxutils import escape

NAMESPACE = "urn:nox"
SIMPLE = {
    "boolean": "xsd:boolean", "int": "xsd:int", "long": "xsd:long", "dateTime": "xsd:dateTime",
    "string": "xsd:string", "base64": "xsd:base64Binary", "any": "xsd:anyType",
}


def type_name(name):
    return SIMPLE.get(name, f"nox:{name}")


def doc(text, indent):
    pad = " " * indent
    return [f"{pad}<xsd:annotation><xsd:documentation>{escape(text)}</xsd:documentation></xsd:annotation>"] if text else []


def element(f, indent):
    occurs = ' minOccurs="0" maxOccurs="unbounded"' if f.list else ' minOccurs="0"' if f.optional else ""
    pad = " " * indent
    head = f'{pad}<xsd:element name="{f.name}" type="{type_name(f.type)}"{occurs}'
    return [head + ">"] + doc(f.doc, indent + 2) + [f"{pad}</xsd:element>"] if f.doc else [head + "/>"]


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


def wrapper(name, lines):
    return [f'  <xsd:element name="{name}"><xsd:complexType><xsd:sequence>', *lines, "  </xsd:sequence></xsd:complexType></xsd:element>"]


def operation_elements(operation):
    request = [line for f in operation.parameters for line in element(f, 4)]
    answer = []
    if operation.returns:
        many = ' maxOccurs="unbounded"' if operation.returns_list else ""
        answer += [f'    <xsd:element name="result" type="nox:{operation.returns}" minOccurs="0"{many}/>']
    answer += ['    <xsd:element name="fault" type="nox:MethodFault" minOccurs="0"/>']
    return wrapper(operation.name, request) + wrapper(f"{operation.name}Response", answer)


def xsd(schema):
    lines = [
        '<?xml version="1.0" encoding="UTF-8"?>',
        f'<xsd:schema xmlns:xsd="http://www.w3.org/2001/XMLSchema" xmlns:nox="{NAMESPACE}" targetNamespace="{NAMESPACE}"',
        '            elementFormDefault="qualified" attributeFormDefault="unqualified">',
        '  <xsd:element name="object" type="xsd:anyType"/>',
        '  <xsd:element name="fault" type="nox:MethodFault"/>',
        '  <xsd:complexType name="DataObject" abstract="true"/>',
    ]
    lines += array_type("Text", "xsd:string")
    for type_ in schema.types.values():
        lines += complex_type(type_) + array_type(type_.name, f"nox:{type_.name}")
    for operation in schema.operations:
        lines += operation_elements(operation)
    return lines + ["</xsd:schema>"]


def wsdl(schema):
    lines = [
        '<?xml version="1.0" encoding="UTF-8"?>',
        '<wsdl:definitions xmlns:wsdl="http://schemas.xmlsoap.org/wsdl/" xmlns:soap="http://schemas.xmlsoap.org/wsdl/soap/"',
        f'                  xmlns:xsd="http://www.w3.org/2001/XMLSchema" xmlns:nox="{NAMESPACE}" targetNamespace="{NAMESPACE}" name="Kova">',
        f'  <wsdl:types><xsd:schema><xsd:import namespace="{NAMESPACE}" schemaLocation="nox.xsd"/></xsd:schema></wsdl:types>',
        '  <wsdl:message name="Fault"><wsdl:part name="fault" element="nox:fault"/></wsdl:message>',
    ]
    for o in schema.operations:
        for suffix in ("", "Response"):
            part = f'<wsdl:part name="parameters" element="nox:{o.name}{suffix}"/>'
            lines += [f'  <wsdl:message name="{o.name}{suffix}Message">{part}</wsdl:message>']
    lines += ['  <wsdl:portType name="KovaPort">']
    for o in schema.operations:
        lines += [f'    <wsdl:operation name="{o.name}">']
        lines += [f"      <wsdl:documentation>{escape(o.doc)}</wsdl:documentation>"] if o.doc else []
        lines += [
            f'      <wsdl:input message="nox:{o.name}Message"/>',
            f'      <wsdl:output message="nox:{o.name}ResponseMessage"/>',
            '      <wsdl:fault name="fault" message="nox:Fault"/>',
            "    </wsdl:operation>",
        ]
    lines += ["  </wsdl:portType>", '  <wsdl:binding name="KovaBinding" type="nox:KovaPort">']
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
    return lines + [
        "  </wsdl:binding>",
        '  <wsdl:service name="KovaService">',
        "    <wsdl:documentation>The address is where an agent is told to listen; this one stands for it.</wsdl:documentation>",
        '    <wsdl:port name="KovaPort" binding="nox:KovaBinding"><soap:address location="http://localhost/soap"/></wsdl:port>',
        "  </wsdl:service>",
        "</wsdl:definitions>",
    ]
