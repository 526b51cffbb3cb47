#!/usr/bin/python3
"""Checks the schema of device profiles: it accepts every profile of the gallery, one with every key and the
examples on the page about profiles, and it rejects the broken profiles that the program rejects too. It
describes every key, and knows every key that the page names. Every profile of the gallery has a summary and
its expected outcomes.

check_profiles.py PROFILES-FOLDER PAGE
check_profiles.py --keys                prints each key with its default and what it means
"""

import json
import pathlib
import re
import sys

import jsonschema

ROOT = pathlib.Path(__file__).resolve().parent.parent
SCHEMA = "device-profile.schema.json"
OUTCOMES = "expected-outcomes.json"
SAMPLES = ROOT / "tests" / "profiles"


def parts_of(node):
    """The node and everything in it."""
    yield node
    for part in node.values() if isinstance(node, dict) else node if isinstance(node, list) else ():
        yield from parts_of(part)


def keys_of(schema, node, path=""):
    """Each key below a part of the schema, as a path, with its own part. Faults and errors have keys that
    are the same everywhere; those are left out."""
    name = node.get("$ref", "").rpartition("/")[2]
    if name in ("fault", "error"):
        return
    node = schema["$defs"].get(name, node)
    others = node.get("additionalProperties") or {}
    for key, part in node.get("properties", {}).items():
        yield path + key, {**schema["$defs"].get(part.get("$ref", "").rpartition("/")[2], {}), **part}
        if not others or part.get("$ref") != others.get("$ref"):
            yield from keys_of(schema, part, f"{path}{key}.")
    yield from keys_of(schema, others, path + "NAME.") if others else ()
    for part in [*node.get("anyOf", ()), *([node["items"]] if "items" in node else ())]:
        yield from keys_of(schema, part, path)


def main():
    if sys.argv[1:] == ["--keys"]:
        schema = json.loads((ROOT / "profiles" / SCHEMA).read_text())
        for key, part in keys_of(schema, schema):
            default = json.dumps(part["default"]) if "default" in part else ""
            print(f"{key:<62} {default:<10} {part['description']}")
        return 0
    folder = pathlib.Path(sys.argv[1])
    schema = json.loads((folder / SCHEMA).read_text())
    jsonschema.Draft202012Validator.check_schema(schema)
    validator = jsonschema.Draft202012Validator(schema)
    problems = []

    files = {path.stem: path for path in folder.glob("*.json") if path.name not in (SCHEMA, OUTCOMES)}
    gallery = {name: json.loads(path.read_text()) for name, path in files.items()}
    page = pathlib.Path(sys.argv[2]).read_text()
    every_key = json.loads((SAMPLES / "every_key.json").read_text())
    examples = [json.loads(text) for text in re.findall(r"```json\n(.*?)```", page, re.DOTALL)]
    valid = [*gallery.items(), ("every_key", every_key)] + [("example", text) for text in examples]
    for name, profile in valid:
        for error in validator.iter_errors(profile):
            problems.append(f"{name}: {error.json_path}: {error.message}")

    outcomes = json.loads((folder / OUTCOMES).read_text())
    problems += [f"{name}: not in both the gallery and {OUTCOMES}"
                 for name in sorted(set(gallery) ^ set(outcomes))]
    problems += [f"{name}: no summary" for name, one in sorted(gallery.items()) if not one.get("summary")]

    broken = json.loads((SAMPLES / "broken_profiles.json").read_text())
    for row in broken:
        if validator.is_valid(row["profile"]) != ("beyondSchema" in row):
            verb = "rejected" if "beyondSchema" in row else "accepted"
            problems.append(f"{verb}: {json.dumps(row['profile'])} ({row['problem']})")

    objects = [part for part in parts_of(schema) if isinstance(part, dict)]
    described = {key for part in objects if part.get("additionalProperties") is False
                 for key in part["properties"]}
    used = {key for part in parts_of(every_key) if isinstance(part, dict)
            for key in part}
    problems += [f"every_key: does not use \"{key}\"" for key in sorted(described - used)]
    problems += [f"{SCHEMA}: does not describe \"{key}\""
                 for key, part in keys_of(schema, schema) if not part.get("description")]
    overview = page[page.index("## What can be described"):page.index("## The gallery")]
    known = {word for key, _ in keys_of(schema, schema) for word in key.split(".")}
    problems += [f"{sys.argv[2]}: there is no key \"{key}\""
                 for key in sorted(set(re.findall(r"`([^`\s./]+)`", overview)) - known)]

    for problem in problems:
        print(problem)
    print(f"profiles: {len(gallery)} of the gallery, {len(examples)} examples and {len(broken)} broken ones "
          f"checked, {len(problems)} problems")
    return 1 if problems or not (gallery and examples and broken) else 0


sys.exit(main())
