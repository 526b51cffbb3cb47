#!/usr/bin/python3
"""Checks the schema of device profiles, that it accepts every profile of the gallery and one with every
key, and that it rejects the broken profiles that the program rejects too.

check_profiles.py PROFILES-FOLDER
"""

import json
import pathlib
import sys

import jsonschema

HERE = pathlib.Path(__file__).resolve().parent
SCHEMA = "device-profile.schema.json"
VERDICTS = "expected-verdicts.json"


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

    profiles = {path.stem: path for path in folder.glob("*.json") if path.name not in (SCHEMA, VERDICTS)}
    every_key = HERE / "every_key.json"
    for path in [*sorted(profiles.values()), every_key]:
        for error in validator.iter_errors(json.loads(path.read_text())):
            problems.append(f"{path.name}: {error.json_path}: {error.message}")
    for name, path in profiles.items():
        summary = json.loads(path.read_text()).get("summary", "")
        if not summary:
            problems.append(f"{name}: no summary")
    for name in set(profiles) ^ set(json.loads((folder / VERDICTS).read_text())):
        problems.append(f"{name}: not in both the gallery and {VERDICTS}")

    broken = json.loads((HERE / "broken_profiles.json").read_text())
    for row in broken:
        if validator.is_valid(row["profile"]) != ("beyondSchema" in row):
            verb = "rejected" if "beyondSchema" in row else "accepted"
            problems.append(f"{verb}: {json.dumps(row['profile'])} ({row['problem']})")

    objects = [part for part in parts_of(schema) if isinstance(part, dict)]
    described = {key for part in objects if part.get("additionalProperties") is False
                 for key in part["properties"]}
    used = {key for part in parts_of(json.loads(every_key.read_text())) if isinstance(part, dict)
            for key in part}
    problems += [f"{every_key.name}: does not use \"{key}\"" for key in sorted(described - used)]

    for problem in problems:
        print(problem)
    print(f"profiles: {len(profiles)} of the gallery and {len(broken)} broken ones checked, "
          f"{len(problems)} problems")
    return 1 if problems or not profiles or not broken else 0


sys.exit(main())
