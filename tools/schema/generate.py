#!/usr/bin/env python3
"""Generates everything that is written down once, in the schema, and needed in several languages.

    generate.py cpp  MODULE OUT_DIR SCHEMA...    C++ types of the last schema
    generate.py xsd  OUT_FILE SCHEMA...          XML Schema of all types
    generate.py wsdl OUT_FILE SCHEMA...          the service: messages, port type, binding
    generate.py openapi OUT_FILE SCHEMA...       the JSON API, OpenAPI 3.1
    generate.py page OUT_FILE SCHEMA...          reference page, Markdown
    generate.py table OUT_FILE SCHEMA...         the operations in rows, for docs/agent.md

Later schemas build on earlier ones.
"""

import sys

import emit_cpp
import emit_openapi
import emit_page
import emit_xsd
import schema as schema_language


def main(arguments):
    kinds = {"xsd": emit_xsd.xsd, "wsdl": emit_xsd.wsdl, "openapi": emit_openapi.openapi,
             "page": emit_page.page, "table": emit_page.operation_table}
    if len(arguments) >= 4 and arguments[0] == "cpp":
        module, out_dir, paths = arguments[1], arguments[2], arguments[3:]
        emit_cpp.emit(schema_language.read(paths), paths[-1], module, out_dir)
    elif len(arguments) >= 3 and arguments[0] in kinds:
        emit_cpp.write(arguments[1], kinds[arguments[0]](schema_language.read(arguments[2:])))
    else:
        sys.exit(__doc__)


if __name__ == "__main__":
    try:
        main(sys.argv[1:])
    except schema_language.SchemaError as error:
        sys.exit(f"error: {error}")
