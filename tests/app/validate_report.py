#!/usr/bin/python3
"""Checks one JSON document on standard input against the report schema.

validate_report.py SCHEMA [DEF] [PYTHON-CHECK]: DEF names a $defs entry to
check against instead of the root (listReport); PYTHON-CHECK is an
expression over the parsed document `r` that must hold as well.
Prints why and exits 1 when the document does not pass.
"""
import json
import sys

import jsonschema

schema = json.load(open(sys.argv[1]))
definition = sys.argv[2] if len(sys.argv) > 2 and sys.argv[2] else None
text = sys.stdin.read()
try:
    r = json.loads(text)
except json.JSONDecodeError as error:
    sys.exit(f"not one JSON document: {error}: {text[:200]!r}")
target = schema
if definition:
    # Only the $ref applies; the root's own keywords are the update report's.
    target = {"$schema": schema["$schema"], "$defs": schema["$defs"], "$ref": f"#/$defs/{definition}"}
validator = jsonschema.Draft202012Validator(target, format_checker=jsonschema.FormatChecker())
errors = sorted(validator.iter_errors(r), key=lambda e: list(e.path))
for error in errors:
    print(f"{list(error.path)}: {error.message}")
if errors:
    sys.exit(1)
if len(sys.argv) > 3 and not eval(sys.argv[3], {}, {"r": r}):
    sys.exit(f"does not hold: {sys.argv[3]}: {json.dumps(r)[:400]}")
