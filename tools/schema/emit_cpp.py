"""Writes the C++ classes of the API types and their descriptors."""

import os
import re

import emit_openapi
import emit_xsd
from schema import Field, Type

BANNER = "// Generated from {origin}. Changes here are lost; change the schema.\n"

SCALARS = {
    # schema type: (C++ type, taken as, field kind, default)
    "boolean": ("bool", "bool", "Boolean", " = false"),
    "int": ("std::int32_t", "std::int32_t", "Int", " = 0"),
    "long": ("std::int64_t", "std::int64_t", "Long", " = 0"),
    "dateTime": ("::Orbis::DateTime", "::Orbis::DateTime", "DateTime", ""),
    "string": ("std::string", "const std::string&", "String", ""),
}


def upper(name):
    return name[0].upper() + name[1:]


def base_cpp(schema, type_):
    return "::" + (schema.types[type_.base].cpp if type_.base in schema.types else "Orbis::DataObject")


def is_scalar(f):
    return f.type in SCALARS and not f.list


def referred(schema, f):
    """C++ type that the reference of a field points to."""
    if f.type == "any":
        return "::Orbis::Any"
    if f.type == "base64":
        return "::Orbis::Binary"
    if f.type == "string":
        return "::Orbis::TextList"
    cpp = "::" + schema.types[f.type].cpp
    return f"::Orbis::DataArray<{cpp}>" if f.list else cpp


def declare_field(schema, f):
    """Accessors of one field."""
    name, doc = upper(f.name), [f"  // {f.doc}"] if f.doc else []
    if not is_scalar(f):
        target = referred(schema, f)
        if f.lazy:
            return doc + [
                f"  ::Tessa::Ref<{target}> Get{name}() const {{ return _{f.name}.GetOrCreate(); }}",
                f"  void Set{name}(::Tessa::Ref<{target}> value);",
            ]
        return doc + [
            f"  const ::Tessa::Ref<{target}>& Get{name}() const noexcept {{ return _{f.name}; }}",
            f"  void Set{name}(::Tessa::Ref<{target}> value);",
        ]
    cpp, taken, _, _ = SCALARS[f.type]
    override = " override" if f.common else ""
    if f.optional:
        return doc + [
            f"  {taken} Get{name}() const{override};",
            f"  bool Has{name}() const noexcept{override} {{ return _{f.name}.has_value(); }}",
            f"  void Set{name}(std::optional<{cpp}> value){override};",
        ]
    return doc + [
        f"  {taken} Get{name}() const noexcept {{ return _{f.name}; }}",
        f"  void Set{name}({cpp} value);",
    ]


def member(schema, f):
    if f.lazy:
        return f"  ::Orbis::LazyArray<::{schema.types[f.type].cpp}> _{f.name};"
    if not is_scalar(f):
        return f"  ::Tessa::Ref<{referred(schema, f)}> _{f.name};"
    cpp, _, _, default = SCALARS[f.type]
    return f"  std::optional<{cpp}> _{f.name};" if f.optional else f"  {cpp} _{f.name}{default};"


def construct_parameter(schema, type_):
    f = next(f for f in schema.all_fields(type_) if f.name == type_.construct)
    if not is_scalar(f):
        return f, f"::Tessa::Ref<{referred(schema, f)}>"
    cpp = SCALARS[f.type][0]
    return f, f"std::optional<{cpp}>" if f.optional else cpp


def exception_lines(schema, type_):
    root = type_.base not in schema.types
    base = "::Tessa::Throwable" if root else base_cpp(schema, type_) + "::Exception"
    lines = [
        "",
        "  // The fault, thrown.",
        f"  class TESSA_API Exception : public {base} {{",
        "   public:",
        f"    explicit Exception(::Tessa::Ref<::{type_.cpp}> fault);",
        "    Exception(const Exception&);",
        "    ~Exception() override;",
    ]
    if root:
        lines += [
            "    // Never null.",
            f"    const ::Tessa::Ref<::{type_.cpp}>& GetFault() const noexcept {{ return _fault; }}",
            "",
            "   private:",
            f"    ::Tessa::Ref<::{type_.cpp}> _fault;",
        ]
    return lines + ["  };"]


def declare_class(schema, type_):
    outer = schema.outer(type_)
    name = f"{outer.cpp_name}::{type_.cpp_name}" if outer else type_.cpp_name
    if outer and schema.outer(outer):
        name = f"{schema.outer(outer).cpp_name}::{name}"
    short = type_.cpp_name
    lines = [f"// {type_.doc}"] if type_.doc else []
    lines += [f"class TESSA_API {name} : public {type_.cpp_base or base_cpp(schema, type_)} {{", " public:"]
    nested = [other for other in schema.types.values() if schema.outer(other) is type_]
    lines += [f"  class {other.cpp_name};" for other in nested]
    lines += [f'  static constexpr const char* {key} = "{value}";' for key, value in type_.constants]
    if type_.abstract:
        lines += [f"  ~{short}() override;"]
    else:
        lines += [f"  {short}();"]
        if type_.construct:
            lines += [f"  explicit {short}({construct_parameter(schema, type_)[1]} {type_.construct});"]
        lines += [f"  {short}(const {short}&);", f"  ~{short}() override;"]
    lines += ["", "  static const ::Orbis::TypeDescriptor& StaticType();"]
    lines += ["  const ::Orbis::TypeDescriptor& GetType() const override;"]
    for f in type_.fields:
        lines += [""] + declare_field(schema, f)
    if type_.fault:
        lines += exception_lines(schema, type_)
    if type_.abstract:
        lines += ["", " protected:", f"  {short}();", f"  {short}(const {short}&);"]
    if type_.fields:
        lines += ["", " private:"] + [member(schema, f) for f in type_.fields]
    return lines + ["};"]


def in_order(schema, types):
    """Outer classes and bases before what needs them."""
    done, ordered = set(), []

    def visit(type_):
        if type_.name in done or type_ not in types:
            return
        done.add(type_.name)
        for needed in (schema.types.get(type_.base), schema.outer(type_)):
            if needed:
                visit(needed)
        ordered.append(type_)

    for type_ in types:
        visit(type_)
    return ordered


def namespace_of(schema, type_):
    while schema.outer(type_):
        type_ = schema.outer(type_)
    return "::".join(type_.cpp_path[:-1])


def wrapped(schema, types, body):
    """Bodies of types inside their namespaces, a namespace opened once for a run of types."""
    lines, current = [], None
    for type_ in types:
        space = namespace_of(schema, type_)
        if space != current:
            if current:
                lines += [f"}}  // namespace {current}", ""]
            lines += [f"namespace {space} {{", ""]
            current = space
        lines += body(type_) + [""]
    return lines + ([f"}}  // namespace {current}"] if current else [])


def forward_declarations(schema, types):
    spaces = {}
    for type_ in types:
        if not schema.outer(type_):
            spaces.setdefault(namespace_of(schema, type_), []).append(f"class {type_.cpp_name};")
    lines = []
    for space, names in spaces.items():
        lines += [f"namespace {space} {{"] + names + [f"}}  // namespace {space}"]
    return lines


def descriptor_field(schema, type_, f):
    described = plain_descriptor_field(schema, type_, f)
    return f"Output({described})" if f.output else f"Key({described})" if f.key else described


def plain_descriptor_field(schema, type_, f):
    presence = "List" if f.list else "Optional" if f.optional else "Required"
    member_ = f"&{type_.cpp_name}::_{f.name}"
    if is_scalar(f):
        kind = SCALARS[f.type][2]
        return f'Scalar<{member_}>("{f.name}", FieldKind::{kind}, Presence::{presence})'
    kind = {"any": "Any", "base64": "Base64", "string": "Strings"}.get(f.type, "Object")
    declared = f", &::{schema.types[f.type].cpp}::StaticType" if f.is_object else ""
    return f'Reference<{member_}>("{f.name}", FieldKind::{kind}, Presence::{presence}{declared})'


def define_class(schema, type_):
    cls, short = "::" + type_.cpp, type_.cpp_name
    cls = type_.cpp[len(namespace_of(schema, type_)) + 2:]
    required = [f for f in type_.fields if not f.list and not f.optional and not is_scalar(f) and f.type != "any"]
    defaults = ", ".join(f"_{f.name}(new {referred(schema, f)})" for f in required)
    lines = [f"{cls}::{short}(){' : ' + defaults if defaults else ''} {{}}"]
    lines += [f"{cls}::{short}(const {short}&) = default;", f"{cls}::~{short}() = default;"]
    if type_.construct:
        f, parameter = construct_parameter(schema, type_)
        lines += [f"{cls}::{short}({parameter} {f.name}) : {short}() {{ Set{upper(f.name)}(std::move({f.name})); }}"]
    for f in type_.fields:
        name = upper(f.name)
        if is_scalar(f):
            cpp, taken, _, _ = SCALARS[f.type]
            if f.optional:
                failure = "ThrowNotInitialized" if f.type == "string" else "ThrowOptionalNotSet"
                lines += [
                    f"{taken} {cls}::Get{name}() const {{",
                    f"  if (!_{f.name}) {{",
                    f"    ::Tessa::NotInitializedException::{failure}();",
                    "  }",
                    f"  return *_{f.name};",
                    "}",
                ]
            parameter = f"std::optional<{cpp}>" if f.optional else cpp
        else:
            parameter = f"::Tessa::Ref<{referred(schema, f)}>"
        lines += [f"void {cls}::Set{name}({parameter} value) {{ _{f.name} = std::move(value); }}"]
    create = "nullptr" if type_.abstract else f"&Create<{short}>"
    copy = "nullptr" if type_.abstract else f"&Copy<{short}>"
    fields = ",\n                      ".join(descriptor_field(schema, type_, f) for f in type_.fields)
    lines += [
        f"const ::Orbis::TypeDescriptor& {cls}::StaticType() {{",
        "  using namespace ::Orbis;",
        "  using namespace ::Orbis::Generated;",
        f'  static const TypeDescriptor& type = Complete({{.name = "{type_.name}",',
        f'        .source = "{type_.cpp}",',
        f"        .base = &{base_cpp(schema, type_)}::StaticType(),",
        f"        .ownFields = {{{fields}}},",
        f"        .create = {create},",
        f"        .copy = {copy}}}, &CreateArray<{short}>);",
        "  return type;",
        "}",
        f"const ::Orbis::TypeDescriptor& {cls}::GetType() const {{ return StaticType(); }}",
    ]
    if type_.fault:
        root = type_.base not in schema.types
        exc = f"{cls}::Exception::Exception"
        if root:
            lines += [
                f"{exc}(::Tessa::Ref<::{type_.cpp}> fault)",
                "    : ::Tessa::Throwable(::Orbis::FaultText(*fault)), _fault(std::move(fault)) {}",
            ]
        else:
            lines += [f"{exc}(::Tessa::Ref<::{type_.cpp}> fault) : {base_cpp(schema, type_)}::Exception(std::move(fault)) {{}}"]
        lines += [f"{exc}(const Exception&) = default;", f"{cls}::Exception::~Exception() = default;"]
    return lines


def header(schema, module, file_, types, needs):
    lines = [BANNER.format(origin=types[0].origin_name), "#pragma once", ""]
    lines += ["#include <cstdint>", "#include <optional>", "#include <string>", ""]
    lines += [f'#include "{need}"' for need in needs]
    lines += ["", *forward_declarations(schema, types), ""]
    lines += wrapped(schema, in_order(schema, types), lambda t: declare_class(schema, t))
    lines += ["", "namespace Orbis {"]
    lines += [f"extern template class DataArray<::{t.cpp}>;" for t in types]
    return lines + ["}  // namespace Orbis"]


def source(schema, module, file_, types, registered=True):
    lines = [BANNER.format(origin=types[0].origin_name), f'#include "{module}/{file_}.h"', "", "#include <utility>", ""]
    lines += ['#include "orbis/FaultText.h"', '#include "orbis/FieldAccess.h"', '#include "tessa/Throwable.h"', ""]
    lines += ["namespace Orbis {"] + [f"template class DataArray<::{t.cpp}>;" for t in types] + ["}  // namespace Orbis", ""]
    lines += wrapped(schema, in_order(schema, types), lambda t: define_class(schema, t))
    if not registered:
        return lines
    names = ",\n    ".join(f"&::{t.cpp}::StaticType" for t in types)
    lines += ["", "namespace {", f"const ::Orbis::TypeRegistration registration({{\n    {names}}});", "}  // namespace"]
    return lines


def messages(schema, origin):
    """The elements that carry an operation's parameters and answers, as types that no text can name."""
    types = []
    for o in schema.operations:
        request = Type(o.name, f"Nox::Operation::{o.name}", "DataObject", False, False, "Operations", origin, o.doc)
        request.fields = o.parameters
        request.construct = next((f.name for f in o.parameters if not f.common), "")
        request.cpp_base = "Change" if o.changes else "Query"
        answer = Type(f"{o.name}Response", f"{request.cpp}Response", "DataObject", False, False, "Operations", origin)
        if o.returns:
            answer.fields.append(Field("result", o.returns, not o.returns_list, o.returns_list))
        answer.fields.append(Field("fault", "MethodFault", True, False))
        if o.changes:
            answer.fields.append(Field("task", "string", True, False))
        types += [request, answer]
    return types


def operation_table(schema):
    """What Nox::Operations() tells."""
    rows = []
    for o in schema.operations:
        result = "nullptr"
        if o.returns:
            result = f"&::{schema.types[o.returns].cpp}::StaticType()"
            result = f"({result})->array" if o.returns_list else result
        changes = "true" if o.changes else "false"
        rows += [f'      {{"{o.name}", {changes}, Operation::{o.name}::StaticType(),',
                 f"       Operation::{o.name}Response::StaticType(), {result}}},"]
    return ["", "namespace Nox {", "", "std::span<const OperationDescriptor> Operations() {",
            "  static const auto& operations = *new std::vector<OperationDescriptor>{", *rows, "  };",
            "  return operations;", "}", "", "}  // namespace Nox"]


def documents_header(origin):
    return [
        BANNER.format(origin=origin),
        "#pragma once",
        "",
        "#include <string>",
        "#include <string_view>",
        "",
        '#include "tessa/Api.h"',
        "",
        "namespace Nox {",
        "",
        "// The service as clients of other makes need it described. Threads: any.",
        "",
        "// One document, with the types. `address`: where this client reaches the service. `product`: a sentence about",
        "// the server, or none. Both are texts of XML attributes: escaped.",
        "TESSA_API std::string WsdlText(std::string_view address, std::string_view product);",
        "",
        "// Texts that live for ever.",
        "TESSA_API std::string_view XsdText() noexcept;",
        "TESSA_API std::string_view OpenApiText() noexcept;",
        "",
        "}  // namespace Nox",
    ]


def documents_source(schema, origin):
    lines = [BANNER.format(origin=origin), '#include "nox/Documents.h"', "", "namespace Nox {"]
    lines += ["", "std::string WsdlText(std::string_view address, std::string_view product) {"]
    places = {"@address@": "std::string(address)", "@product@": "std::string(product)"}
    parts = re.split("(@address@|@product@)", "\n".join(emit_xsd.wsdl(schema, *places)) + "\n")
    texts = [text for part in parts for text in ([places[part]] if part in places else literals(part.splitlines(True)))]
    lines += ["  return " + " +\n".join(texts) + ";", "}"]
    for name, document in (("Xsd", emit_xsd.xsd(schema)), ("OpenApi", emit_openapi.openapi(schema))):
        lines += ["", f"std::string_view {name}Text() noexcept {{", "  static const std::string* const text = new std::string("]
        lines += [" +\n".join(literals([line + "\n" for line in document])) + ");", "  return *text;", "}"]
    return lines + ["", "}  // namespace Nox"]


def literals(lines, most=30_000):
    """The text of the lines in C++, in pieces: compilers need not understand longer literals."""
    found = [""]
    for line in lines:
        if len(found[-1]) + len(line) > most:
            found.append("")
        found[-1] += line
    return [f'std::string(R"document({piece})document")' for piece in found]


def write(path, lines):
    text = "\n".join(lines) + "\n"
    os.makedirs(os.path.dirname(path), exist_ok=True)
    # An unchanged file keeps its time, so that nothing is built again for it.
    if os.path.exists(path):
        with open(path, encoding="utf-8") as there:
            if there.read() == text:
                return
    with open(path, "w", encoding="utf-8") as out:
        out.write(text)


def emit(schema, origin, module, out_dir):
    """Headers and sources for the types that stand in the schema file `origin`."""
    mine = [t for t in schema.types.values() if t.origin == origin]
    for type_ in mine:
        type_.origin_name = f"{module}/schema/{os.path.basename(origin)}"
    files, lazy = {}, any(f.lazy for t in mine for f in t.fields)
    for type_ in mine:
        files.setdefault(type_.file, []).append(type_)
    needs = ["orbis/DataArray.h", "orbis/DataObject.h"]
    needs += ["orbis/LazyArray.h"] if lazy else []
    needs += ["orbis/Types.h"] if module != "orbis" else ["tessa/Throwable.h"]
    for file_, types in files.items():
        write(f"{out_dir}/{module}/{file_}.h", header(schema, module, file_, types, needs))
        write(f"{out_dir}/{module}/{file_}.cpp", source(schema, module, file_, types))
        needs = needs + [f"{module}/{file_}.h"]
    if wrappers := messages(schema, origin):
        for type_ in wrappers:
            type_.origin_name = f"{module}/schema/{os.path.basename(origin)}"
        needs = needs + [f"{module}/OperationTable.h"]
        write(f"{out_dir}/{module}/Operations.h", header(schema, module, "Operations", wrappers, needs))
        lines = source(schema, module, "Operations", wrappers, registered=False)
        write(f"{out_dir}/{module}/Operations.cpp", lines + operation_table(schema))
        write(f"{out_dir}/{module}/Documents.h", documents_header(wrappers[0].origin_name))
        write(f"{out_dir}/{module}/Documents.cpp", documents_source(schema, wrappers[0].origin_name))
    if module != "orbis":
        lines = [BANNER.format(origin=mine[0].origin_name), "#pragma once", ""] + forward_declarations(schema, mine)
        write(f"{out_dir}/{module}/Fwd.h", lines)
