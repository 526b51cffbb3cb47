#!/usr/bin/python3
"""Checks the schema of device profiles: it accepts every profile of the gallery, one with every key and the
examples on the page about profiles, and it rejects the broken profiles that the program rejects too. The
page explains every key; every profile of the gallery has a summary and its expected outcomes.

check_profiles.py PROFILES-FOLDER PAGE
"""

import json
import pathlib
import re
import sys

import jsonschema

SAMPLES = pathlib.Path(__file__).resolve().parent.parent / "tests" / "profiles"
SCHEMA = "device-profile.schema.json"
OUTCOMES = "expected-outcomes.json"


def parts_of(node):
    """The node and everything in it."""
    yield node
    for part in node.values() if isinstance(node, dict) else node if isinstance(node, list) else ():
        yield from parts_of(part)


def main():
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
    explained = set(re.findall(r"[$\w]+", " ".join(re.findall(r"`([^`\n]+)`", page))))
    problems += [f"{sys.argv[2]}: does not explain \"{key}\"" for key in sorted(described - explained)]

    for problem in problems:
        print(problem)
    print(f"profiles: {len(gallery)} of the gallery, {len(examples)} examples and {len(broken)} broken ones "
          f"checked, {len(problems)} problems")
    return 1 if problems or not (gallery and examples and broken) else 0


sys.exit(main())
