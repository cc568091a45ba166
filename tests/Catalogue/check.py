"""Holds a document against a directory of schemas, by a validator that is not ours: check.py DIRECTORY DOCUMENT"""

import json
import pathlib
import sys
import warnings

import jsonschema

warnings.simplefilter("ignore", DeprecationWarning)  # newer releases resolve references in another way, too

directory, document = map(pathlib.Path, sys.argv[1:])
schemas = {file.name: json.loads(file.read_text()) for file in directory.glob("*.schema.json")}
for schema in schemas.values():
    jsonschema.Draft202012Validator.check_schema(schema)
whole = schemas["user-events.schema.json"]
resolver = jsonschema.RefResolver.from_schema(whole, store=schemas)
errors = list(jsonschema.Draft202012Validator(whole, resolver=resolver).iter_errors(json.loads(document.read_text())))
for error in errors:
    print(list(error.absolute_path), error.message)
sys.exit(bool(errors))
