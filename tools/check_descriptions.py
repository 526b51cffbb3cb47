#!/usr/bin/python3
"""Checks the schema of port descriptions: it and the program accept the examples, and reject what is
known to be broken, the program with the known reason. Every key of the schema is described, in it and on the page.

check_descriptions.py ZRLAB
"""

import json
import pathlib
import subprocess
import sys
import tempfile

import jsonschema

ROOT = pathlib.Path(__file__).resolve().parent.parent
FOLDER = ROOT / "examples" / "linux"
SCHEMA = FOLDER / "port-description.schema.json"
PAGE = ROOT / "docs" / "linux.md"
BROKEN = ROOT / "tests" / "devices" / "linux" / "broken_descriptions.json"
INVALID = 64  # the exit status of the program about a description that it cannot read


def checked(zrlab, description):
    """The exit status and the first line of zrlab device check."""
    with tempfile.TemporaryDirectory() as folder:
        path = pathlib.Path(folder) / "port.json"
        path.write_text(json.dumps(description))
        done = subprocess.run([zrlab, "device", "check", f"linux:{path}"], capture_output=True, text=True)
        return done.returncode, done.stdout.partition("\n")[0].removeprefix(f"{path}: ")


def undescribed(schema, defs, path=""):
    for key, part in schema.get("properties", {}).items():
        target = defs.get(part.get("$ref", "").rpartition("/")[2], {})
        whole = {**target, **part}
        if not any(word in whole for word in ("description", "enum", "properties", "default", "$ref")) and \
                key not in ("$schema", "width", "height", "unit", "selector", "code", "group", "subgroup"):
            yield f"{path}/{key}"
        yield from undescribed(part, defs, f"{path}/{key}")


def keys(schema):
    """Of the objects anywhere in it."""
    if isinstance(schema, list):
        return {key for part in schema for key in keys(part)}
    if not isinstance(schema, dict):
        return set()
    members = schema.get("properties", {})
    return set(members) | keys([*members.values(), *(part for key, part in schema.items() if key != "properties")])


def main():
    zrlab = sys.argv[1]
    schema = json.loads(SCHEMA.read_text())
    jsonschema.Draft202012Validator.check_schema(schema)
    validator = jsonschema.Draft202012Validator(schema)
    problems = [f"{SCHEMA.name}: {key} is not described" for key in undescribed(schema, schema["$defs"])]
    page = PAGE.read_text()
    problems += [f"{PAGE.name}: `{key}` is not described" for key in sorted(keys(schema)) if f"`{key}`" not in page]
    for path in sorted(FOLDER.glob("*.json")):
        if path == SCHEMA:
            continue
        description = json.loads(path.read_text())
        problems += [f"{path.name}: {error.json_path}: {error.message}" for error in validator.iter_errors(description)]
        status, line = checked(zrlab, description)
        if status == INVALID:
            problems.append(f"{path.name}: the program says {line!r}")
    for case in json.loads(BROKEN.read_text()):
        status, line = checked(zrlab, case["description"])
        if status != INVALID or not line.startswith(case["problem"]):
            problems.append(f"not {case['problem']!r}: status {status}, {line!r}")
        if validator.is_valid(case["description"]) != ("beyondSchema" in case):
            problems.append(f"the schema and the table differ about {case['problem']!r}")
    print("\n".join(problems) or "port descriptions: the schema and the program agree")
    sys.exit(bool(problems))


if __name__ == "__main__":
    main()
