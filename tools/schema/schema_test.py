#!/usr/bin/env python3
"""Tests of the schema language and of what is generated from it."""

import json
import os
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest
import xml.etree.ElementTree as ElementTree

HERE = pathlib.Path(__file__).resolve().parent
ROOT = HERE.parent.parent
BINDING = ROOT / "orbis/schema/binding.schema"
API = ROOT / "nox/schema/nox.schema"

sys.path.insert(0, str(HERE))
sys.dont_write_bytecode = True
import emit_openapi  # noqa: E402
import emit_page  # noqa: E402
import emit_xsd  # noqa: E402
import schema as schema_language  # noqa: E402

XSD = "{http://www.w3.org/2001/XMLSchema}"
WSDL = "{http://schemas.xmlsoap.org/wsdl/}"
SOAP = "{http://schemas.xmlsoap.org/wsdl/soap/}"


class InFolder(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)

    def schema_file(self, text, name="test.schema"):
        path = self.folder / name
        path.write_text(text, encoding="utf-8")
        return str(path)

    def read(self, text):
        return schema_language.read([self.schema_file(text)])


def types(*lines):
    return "file Test\n" + "\n".join(lines) + "\n"


def operation(*lines):
    return "## Runs.\n" + "\n".join(lines) + "\n"


LAMP = "type Lamp = Test::Lamp : DataObject {\n  name: string\n}"
FAULT = "fault Broken = Test::Broken : DataObject {\n}"

# What the text says wrong, and what the error must name.
ERRORS = {
    "a line that is nothing": ("file Test\nhello\n", r"test\.schema:2: not understood: hello"),
    "a field that is none": (types("type Lamp = Test::Lamp : DataObject {", "  name string", "}"),
                             r"test\.schema:3: not a field: name string"),
    "a field with two marks": (types("type Lamp = Test::Lamp : DataObject {", "  name?[]: string", "}"),
                               r"test\.schema:3: not a field"),
    "a lazy field that is no list": (types("type Lamp = Test::Lamp : DataObject {", "  other?: Lamp lazy", "}"),
                                     r"test\.schema:3: only a list"),
    "a lazy list of texts": (types("type Lamp = Test::Lamp : DataObject {", "  names[]: string lazy", "}"),
                             r"test\.schema:3: only a list of data objects"),
    "a type twice": (types(LAMP, LAMP), r"test\.schema:5: Lamp is defined twice"),
    "a type before `file`": (LAMP + "\n", r"test\.schema:1: no `file`"),
    "a type that is not closed": (types("type Lamp = Test::Lamp : DataObject {"), r"test\.schema: Lamp is not closed"),
    "a type inside another": (types("type Lamp = Test::Lamp : DataObject {", FAULT),
                              r"test\.schema:3: Lamp is not closed before Broken"),
    "an operation inside a type": (types("type Lamp = Test::Lamp : DataObject {", "query Run {", "}"),
                                   r"test\.schema:3: Lamp is not closed before Run"),
    "a type inside an operation": ("file Test\n## Runs.\nquery Run {\n" + LAMP + "\n",
                                   r"test\.schema:4: Run is not closed before Lamp"),
    "an output field that may be missing": (types("type Lamp = Test::Lamp : DataObject {", "  name?: string output", "}"),
                                            r"test\.schema:3: only a field that is always there"),
    "a closing brace too many": (types(LAMP, "}"), r"test\.schema:5: not understood: \}"),
    "an unknown base": (types("type Lamp = Test::Lamp : Furniture {", "}"), r"Lamp: unknown base Furniture"),
    "its own base": (types("type Lamp = Test::Lamp : Lamp {", "}"), r"Lamp: its bases run in a circle"),
    "bases in a circle": (types("type Lamp = Test::Lamp : Light {", "}", "type Light = Test::Light : Lamp {", "}"),
                          r"Lamp: its bases run in a circle through Lamp"),
    "a fault that derives from a type": (types(LAMP, "fault Dark = Test::Dark : Lamp {", "}"),
                                         r"Dark: faults derive from faults"),
    "a type that derives from a fault": (types(FAULT, "type Lamp = Test::Lamp : Broken {", "}"),
                                         r"Lamp: faults derive from faults"),
    "a field twice": (types("type Lamp = Test::Lamp : DataObject {", "  name: string", "  name?: int", "}"),
                      r"Lamp: field name is defined twice"),
    "a field of the base again": (types(LAMP, "type Torch = Test::Torch : Lamp {", "  name: string", "}"),
                                  r"Torch: field name is defined twice"),
    "a field of an unknown type": (types("type Lamp = Test::Lamp : DataObject {", "  shade?: Shade", "}"),
                                   r"Lamp\.shade: unknown type Shade"),
    "a list of numbers": (types("type Lamp = Test::Lamp : DataObject {", "  watts[]: int", "}"),
                          r"Lamp\.watts: lists hold"),
    "construct from nothing": (types("type Lamp = Test::Lamp : DataObject {", "  construct(watts)", "}"),
                               r"Lamp: cannot construct from unknown field watts"),
    "a required abstract object": (types("abstract type Light = Test::Light : DataObject {", "}",
                                         "type Lamp = Test::Lamp : DataObject {", "  light: Light", "}"),
                                   r"Lamp\.light: Light is abstract"),
    "an object that requires itself": (types("type Lamp = Test::Lamp : DataObject {", "  spare: Lamp", "}"),
                                       r"Lamp: requires an object of its own type"),
    "objects that require each other": (types("type Lamp = Test::Lamp : DataObject {", "  shade: Shade", "}",
                                              "type Shade = Test::Shade : DataObject {", "  lamp: Lamp", "}"),
                                        r"Lamp: requires an object of its own type"),
    "a name of the binding": (types("type LampList = Test::LampList : DataObject {", "}"),
                              r"LampList: the name belongs"),
    "a parameter of an unknown type": (operation("change Run {", "  ## Which.", "  lamp: Lamp", "}"),
                                       r"Run\(lamp\): unknown type Lamp"),
    "a parameter that is none": (operation("change Run {", "  lamp", "}"), r"test\.schema:3: not a field: lamp"),
    "a parameter without a word": (operation("change Run {", "  lamp: string", "}"), r"Run\(lamp\): a parameter says"),
    "an operation without a word": ("query Run {\n}\n", r"Run: an operation says"),
    "an operation that is not closed": (operation("query Run {"), r"test\.schema: Run is not closed"),
    "an operation of another kind": (operation("action Run {", "}"), r"test\.schema:2: not understood: action Run"),
    "a constant in an operation": (operation("query Run {", '  const RED = "red"', "}"), r"test\.schema:3: not a field"),
    "an unknown result": (operation("query Run returns Lamp {", "}"), r"Run: unknown result Lamp"),
    "an operation twice": (operation("query Run {", "}") * 2, r"Run: operation is defined twice"),
}


class Errors(InFolder):
    def test_each_error_says_where_it_is(self):
        for what, (text, message) in ERRORS.items():
            with self.subTest(what):
                with self.assertRaisesRegex(schema_language.SchemaError, message):
                    self.read(text)

    def test_a_file_that_is_not_there_or_no_text_is_an_error_that_names_it(self):
        with self.assertRaisesRegex(schema_language.SchemaError, r"missing\.schema: cannot be read"):
            schema_language.read([str(self.folder / "missing.schema")])
        (self.folder / "bytes.schema").write_bytes(b"file \xff\n")
        with self.assertRaisesRegex(schema_language.SchemaError, r"bytes\.schema: cannot be read"):
            schema_language.read([str(self.folder / "bytes.schema")])

    def test_the_program_prints_the_error_and_fails(self):
        broken = self.schema_file("file Test\nhello\n")
        run = subprocess.run([sys.executable, "-B", HERE / "generate.py", "xsd", self.folder / "out.xsd", broken],
                             capture_output=True, text=True, check=False)
        self.assertEqual(run.returncode, 1)
        self.assertEqual(run.stderr, f"error: {broken}:2: not understood: hello\n")
        self.assertFalse((self.folder / "out.xsd").exists())

    def test_the_program_explains_itself_when_it_is_called_wrongly(self):
        for arguments in ([], ["xsd"], ["cpp", "orbis"], ["pdf", "out", str(BINDING)]):
            run = subprocess.run([sys.executable, "-B", HERE / "generate.py", *arguments],
                                 capture_output=True, text=True, check=False)
            self.assertEqual(run.returncode, 1, arguments)
            self.assertIn("generate.py xsd", run.stderr)


class Language(InFolder):
    def test_fields_have_marks_types_and_what_is_said_of_them(self):
        schema = self.read(types("## A lamp.", "type Lamp = Test::Lamp : DataObject {", '  const RED = "red"',
                                 "  name: string", "  ## How bright,", "  ## at its best.", "  watts?: int",
                                 "  spare[]: Lamp lazy", "  # no word about this", "  shade[]: string", "}"))
        lamp = schema.types["Lamp"]
        self.assertEqual(lamp.doc, "A lamp.")
        self.assertEqual(lamp.constants, [("RED", "red")])
        self.assertEqual([(f.name, f.type, f.optional, f.list, f.lazy, f.doc) for f in lamp.fields], [
            ("name", "string", False, False, False, ""),
            ("watts", "int", True, False, False, "How bright, at its best."),
            ("spare", "Lamp", False, True, True, ""),
            ("shade", "string", False, True, False, ""),
        ])

    def test_fields_of_the_bases_come_first(self):
        schema = self.read(types(LAMP, "type Torch = Test::Torch : Lamp {", "  battery: string", "}"))
        self.assertEqual([f.name for f in schema.all_fields(schema.types["Torch"])], ["name", "battery"])

    def test_operations_have_parameters_and_a_result(self):
        schema = self.read(types(LAMP, "## Turns lamps on.", "change TurnOn returns Lamp[] {", "  ## Which.",
                                 "  lamps[]: Lamp", "  ## In words", "  ## of your own.", "  label?: string", "}",
                                 "## Which are on.", "query LampsThatAreOn {", "}"))
        change, query = schema.operations
        self.assertEqual((change.name, change.changes, change.returns, change.returns_list, change.doc),
                         ("TurnOn", True, "Lamp", True, "Turns lamps on."))
        self.assertEqual([(f.name, f.optional, f.list, f.doc) for f in change.parameters],
                         [("lamps", False, True, "Which."), ("label", True, False, "In words of your own.")])
        self.assertEqual((query.name, query.changes, query.returns, query.parameters), ("LampsThatAreOn", False, "", []))

    def test_every_change_takes_what_is_said_of_every_change_behind_its_own_parameters(self):
        schema = self.read(types(LAMP, "every change {", "  ## In words.", "  label?: string", "}",
                                 "## Turns lamps on.", "change TurnOn {", "  ## Which.", "  lamps[]: Lamp", "}",
                                 "## Which are on.", "query LampsThatAreOn {", "}"))
        change, query = schema.operations
        self.assertEqual([(f.name, f.common) for f in change.parameters], [("lamps", False), ("label", True)])
        self.assertEqual(query.parameters, [])
        with self.assertRaisesRegex(schema_language.SchemaError, "TurnOn: parameter label is defined twice"):
            self.read(types("every change {", "  ## In words.", "  label?: string", "}", "## Turns lamps on.",
                            "change TurnOn {", "  ## Again.", "  label?: string", "}"))

    def test_a_key_identifies_objects_of_a_type_and_of_what_derives_from_it(self):
        schema = self.read(types("type Lamp = Test::Lamp : DataObject {", "  name?: string key", "}",
                                 "type Torch = Test::Torch : Lamp {", "}"))
        self.assertEqual(schema.key(schema.types["Torch"]).name, "name")
        with self.assertRaisesRegex(schema_language.SchemaError, "only an optional text can be a key"):
            self.read(types("type Lamp = Test::Lamp : DataObject {", "  watts?: int key", "}"))

    def test_fields_that_only_answers_must_have_say_so(self):
        schema = self.read(types("type Lamp = Test::Lamp : DataObject {", "  name: string", "  watts: int output", "}"))
        self.assertEqual([f.output for f in schema.types["Lamp"].fields], [False, True])

    def test_later_files_build_on_earlier_ones(self):
        first = self.schema_file(types(LAMP), "first.schema")
        second = self.schema_file(types("type Torch = Test::Torch : Lamp {", "}"), "second.schema")
        self.assertEqual(list(schema_language.read([first, second]).types), ["Lamp", "Torch"])
        with self.assertRaisesRegex(schema_language.SchemaError, "unknown base Lamp"):
            schema_language.read([second])


class Generated(InFolder):
    def generate(self, *arguments):
        subprocess.run([sys.executable, "-B", HERE / "generate.py", *map(str, arguments)], check=True)

    def generate_all(self, out):
        self.generate("cpp", "orbis", out, BINDING)
        self.generate("cpp", "nox", out, BINDING, API)
        for kind, name in (("xsd", "nox.xsd"), ("wsdl", "nox.wsdl"), ("page", "api-reference.md")):
            self.generate(kind, out / name, BINDING, API)
        return {str(path.relative_to(out)): path for path in sorted(out.rglob("*")) if path.is_file()}

    def test_is_the_same_every_time(self):
        first = self.generate_all(self.folder / "first")
        second = self.generate_all(self.folder / "second")
        self.assertEqual(list(first), list(second))
        self.assertIn("nox/Kova.h", first)
        for name, path in first.items():
            self.assertEqual(path.read_bytes(), second[name].read_bytes(), name)

    def test_keeps_the_time_of_files_that_do_not_change(self):
        long_ago = 1_000_000_000
        files = self.generate_all(self.folder)
        for path in files.values():
            os.utime(path, (long_ago, long_ago))
        files["nox/Host.h"].write_text("something else", encoding="utf-8")
        os.utime(files["nox/Host.h"], (long_ago, long_ago))
        self.generate_all(self.folder)
        changed = [name for name, path in files.items() if path.stat().st_mtime != long_ago]
        self.assertEqual(changed, ["nox/Host.h"])

    def test_names_no_path_of_the_machine(self):
        for name, path in self.generate_all(self.folder).items():
            self.assertNotIn(str(ROOT), path.read_text(encoding="utf-8"), name)


class Documents(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.schema = schema_language.read([str(BINDING), str(API)])
        cls.xsd = ElementTree.fromstring("\n".join(emit_xsd.xsd(cls.schema)).encode())
        cls.wsdl = ElementTree.fromstring("\n".join(emit_xsd.wsdl(cls.schema)).encode())

    def names(self, tree, tag):
        return [element.get("name") for element in tree.findall(tag)]

    def test_every_type_and_its_list_stand_in_the_schema_once(self):
        names = self.names(self.xsd, XSD + "complexType")
        self.assertEqual(len(names), len(set(names)))
        wanted = {"DataObject", "TextList"}
        wanted |= set(self.schema.types) | {name + "List" for name in self.schema.types}
        self.assertEqual(set(names), wanted)

    def test_every_type_that_is_referred_to_is_defined(self):
        defined = set(self.names(self.xsd, XSD + "complexType"))
        for element in self.xsd.iter():
            for reference in (element.get("type"), element.get("base")):
                if reference and reference.startswith("nox:"):
                    self.assertIn(reference[4:], defined)

    def test_nothing_is_nillable(self):
        self.assertFalse([element for element in self.xsd.iter() if element.get("nillable")])

    def test_abstract_types_say_so(self):
        abstract = {e.get("name") for e in self.xsd.findall(XSD + "complexType") if e.get("abstract") == "true"}
        self.assertEqual(abstract, {"DataObject", "MethodFault", "ServiceFault"})

    def test_every_message_has_its_element_in_the_schema(self):
        elements = set(self.names(self.xsd, XSD + "element"))
        parts = [part.get("element") for part in self.wsdl.iter(WSDL + "part")]
        self.assertEqual(len(parts), 2 * len(self.schema.operations) + 1)
        for part in parts:
            self.assertTrue(part.startswith("nox:"), part)
            self.assertIn(part[4:], elements)

    def test_every_operation_has_its_messages_and_its_binding(self):
        messages = set(self.names(self.wsdl, WSDL + "message"))
        operations = [operation.name for operation in self.schema.operations]
        ports = self.wsdl.find(WSDL + "portType").findall(WSDL + "operation")
        self.assertEqual([port.get("name") for port in ports], operations)
        for port in ports:
            for tag in ("input", "output", "fault"):
                self.assertIn(port.find(WSDL + tag).get("message")[4:], messages)
        bound = self.wsdl.find(WSDL + "binding").findall(WSDL + "operation")
        self.assertEqual([b.get("name") for b in bound], operations)
        actions = [b.find(SOAP + "operation").get("soapAction") for b in bound]
        self.assertEqual(actions, [f"urn:nox#{name}" for name in operations])

    def response(self, operation):
        """[(name, type, fewest), ..] of the fields of the answer."""
        element = next(e for e in self.xsd.findall(XSD + "element") if e.get("name") == operation.name + "Response")
        return [(f.get("name"), f.get("type"), f.get("minOccurs")) for f in list(element.iter(XSD + "element"))[1:]]

    def test_every_operation_can_answer_with_a_fault(self):
        for operation in self.schema.operations:
            self.assertIn(("fault", "nox:MethodFault", "0"), self.response(operation))

    def test_the_answer_to_every_change_tells_its_task(self):
        for operation in self.schema.operations:
            self.assertEqual(("task", "xsd:string", "0") in self.response(operation), operation.changes, operation.name)

    def test_a_disk_needs_nothing_but_its_name(self):
        for name in ("HostDevice", "HostScsiLun", "HostScsiDisk"):
            type_ = next(t for t in self.xsd.findall(XSD + "complexType") if t.get("name") == name)
            self.assertEqual({e.get("minOccurs") for e in type_.iter(XSD + "element")}, {"0"}, name)

    def test_the_service_is_one_document(self):
        self.assertFalse(list(self.wsdl.iter(XSD + "import")) + list(self.wsdl.iter(XSD + "include")))
        inline = self.wsdl.find(WSDL + "types").find(XSD + "schema")
        defined = set(self.names(inline, XSD + "complexType"))
        elements = set(self.names(inline, XSD + "element"))
        used = set()
        for element in inline.iter():
            for reference in (element.get("type"), element.get("base")):
                if reference and reference.startswith("nox:"):
                    used.add(reference[4:])
        self.assertEqual(used - defined, set())
        faults = {n for n, t in self.schema.types.items() if t.fault}
        self.assertEqual(defined - used - faults, set(), "types that nobody uses")
        self.assertEqual(faults - defined, set())
        self.assertTrue({part.get("element")[4:] for part in self.wsdl.iter(WSDL + "part")} <= elements)

    def test_the_address_and_the_product_are_the_servers_to_say(self):
        wsdl = ElementTree.fromstring("\n".join(emit_xsd.wsdl(self.schema, "https://a:1/soap", " Version 7.")).encode())
        service = wsdl.find(WSDL + "service")
        self.assertEqual(service.find(WSDL + "port").find(SOAP + "address").get("location"), "https://a:1/soap")
        self.assertTrue(service.find(WSDL + "documentation").text.endswith(" Version 7."))

    def test_the_page_about_the_agent_shows_every_operation(self):
        table = "\n".join(emit_page.operation_table(self.schema))
        page = (ROOT / "docs" / "agent.md").read_text(encoding="utf-8")
        self.assertIn(table, page, "renew it: tools/schema/generate.py table OUT_FILE SCHEMA...")

    def test_every_change_takes_the_common_parameters_behind_its_own(self):
        for operation in self.schema.operations:
            names = [f.name for f in operation.parameters]
            common = [f.name for f in self.schema.common]
            self.assertEqual(names[len(names) - len(common):] == common, operation.changes, operation.name)

    def test_every_operation_parameter_and_field_is_documented(self):
        for operation in self.schema.operations:
            element = next(e for e in self.xsd.findall(XSD + "element") if e.get("name") == operation.name)
            self.assertEqual(element.find(f"{XSD}annotation/{XSD}documentation").text, operation.doc)
        for outer in self.xsd.findall(XSD + "element") + self.xsd.findall(XSD + "complexType"):
            if outer.get("name").endswith("List"):
                continue
            for field in list(outer.iter(XSD + "element")):
                if field is not outer:
                    self.assertIsNotNone(field.find(f"{XSD}annotation/{XSD}documentation"),
                                         f"{outer.get('name')}.{field.get('name')}")

    def test_the_page_describes_every_type_and_its_links_lead_somewhere(self):
        page = "\n".join(emit_page.page(self.schema))
        headings = {line[4:].lower() for line in page.splitlines() if line.startswith("### ")}
        self.assertEqual(headings, {n.lower() for n in self.schema.types} | {o.name.lower() for o in self.schema.operations})
        for link in re.findall(r"\]\(#([^)]*)\)", page):
            self.assertIn(link, headings)

    def test_the_json_description_has_every_operation_and_refers_to_what_it_defines(self):
        document = json.loads("\n".join(emit_openapi.openapi(self.schema)))
        for operation in self.schema.operations:
            body = document["paths"]["/api/v1/" + operation.name]["post"]["requestBody"]
            properties = body["content"]["application/json"]["schema"]["properties"]
            self.assertTrue({f.name for f in operation.parameters} <= set(properties), operation.name)
        defined = document["components"]["schemas"]
        references = re.findall(r'"#/components/schemas/([^"]*)"', json.dumps(document))
        self.assertEqual(set(references) - set(defined), set())
        referred = set(references)
        self.assertEqual(set(defined) - referred, set(), "types that nothing leads to")
        self.assertEqual({n for n, t in self.schema.types.items() if t.fault and not t.abstract} - referred, set())

    def test_the_json_description_names_every_operation_once(self):
        document = json.loads("\n".join(emit_openapi.openapi(self.schema)))
        names = [o["operationId"] for path in document["paths"].values() for o in path.values()]
        self.assertEqual(len(names), len(set(names)))
        self.assertLess({o.name for o in self.schema.operations}, set(names))

    def test_the_json_description_lists_the_values_of_a_field_that_has_some(self):
        for type_ in self.schema.types.values():
            found = [value for f in type_.fields for value in emit_openapi.values_of(type_, f)]
            self.assertEqual(sorted(found), sorted(value for _, value in type_.constants), type_.name)
        types = json.loads("\n".join(emit_openapi.openapi(self.schema)))["components"]["schemas"]
        disk = types["HostScsiDisk"]["properties"]
        self.assertEqual(disk["lunType"]["enum"], ["disk", "tape", "cdrom", "enclosure", "unknown", ""])
        self.assertEqual(disk["operationalState"]["items"]["enum"], ["ok", "off", "error"])
        self.assertEqual(types["KovaHostDiskResult"]["properties"]["state"]["enum"], ["inUse", "eligible", "ineligible"])

    def test_the_json_description_has_one_type_of_disk_for_both_ways(self):
        types = json.loads("\n".join(emit_openapi.openapi(self.schema)))["components"]["schemas"]
        disk = {"$ref": "#/components/schemas/HostScsiDisk"}
        self.assertIn(disk, types["DiskArgument"]["anyOf"])
        self.assertEqual(types["ReportedDisk"]["allOf"], [disk])
        self.assertEqual(types["HostScsiDisk"]["required"], ["canonicalName"])

    def test_the_json_description_names_the_kinds_of_a_type_where_it_is_declared(self):
        document = json.loads("\n".join(emit_openapi.openapi(self.schema)))
        kinds = document["components"]["schemas"]["AnyMethodFault"]["oneOf"]
        names = {kind["$ref"].rsplit("/", 1)[1] for kind in kinds}
        self.assertEqual(names, {n for n, t in self.schema.types.items() if t.fault and not t.abstract})


if __name__ == "__main__":
    unittest.main()
