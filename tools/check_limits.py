#!/usr/bin/python3
"""Checks the files of limits: the sample, the page's examples and one with every key satisfy the schema and the
program; what is known to be broken satisfies neither. Every key of the schema is described, and used by the
file with every key. The page's commands print what it shows.

check_limits.py ZRLAB             checks all of it
check_limits.py ZRLAB --update    first writes what the commands print into the page
"""

import json
import os
import pathlib
import re
import subprocess
import sys
import tempfile

import jsonschema

ROOT = pathlib.Path(__file__).resolve().parent.parent
SCHEMA = ROOT / "limits" / "limits.schema.json"
SAMPLE = ROOT / "limits" / "sample.json"
PAGE = ROOT / "docs" / "limits.md"
TRANSCRIPT = ROOT / "tools" / "check_transcript.py"
TESTS = ROOT / "tests" / "limits"


def keys_of(node):
    """Each key that the part of a schema describes, with its own part."""
    if isinstance(node, dict):
        yield from node.get("properties", {}).items()
    for part in node.values() if isinstance(node, dict) else node if isinstance(node, list) else ():
        yield from keys_of(part)


def keys_in(document):
    if isinstance(document, dict):
        yield from document
        for part in document.values():
            yield from keys_in(part)


def main():
    zrlab = sys.argv[1]
    schema = json.loads(SCHEMA.read_text())
    jsonschema.Draft202012Validator.check_schema(schema)
    validator = jsonschema.Draft202012Validator(schema)
    every_key = json.loads((TESTS / "every_key.json").read_text())
    examples = re.findall(r"`(\S+\.json)`:\n\n```json\n(.*?)```", PAGE.read_text(), re.DOTALL)
    valid = {SAMPLE.name: json.loads(SAMPLE.read_text()), "every_key.json": every_key,
             **{name: json.loads(text) for name, text in examples}}
    broken = json.loads((TESTS / "broken_limits.json").read_text())

    # The program reads the limits before it looks for the device: a device that there is not ends it.
    def problem_of(limits):
        with tempfile.TemporaryDirectory() as folder:
            path = pathlib.Path(folder) / "limits.json"
            path.write_text(json.dumps(limits))
            done = subprocess.run(
                [zrlab, "run", "VantorMeterixDiagnostic", "--limits", str(path), "--device", "none-such"],
                capture_output=True, text=True, check=False)
            line = done.stderr.strip()
            return None if "unknown device" in line else line.removeprefix(f"zrlab: --limits {path}: ")

    problems = []
    for name, limits in valid.items():
        problems += [f"{name}: {error.json_path}: {error.message}" for error in validator.iter_errors(limits)]
        if (line := problem_of(limits)) is not None:
            problems.append(f"{name}: {line}")
    for row in broken:
        if validator.is_valid(row["limits"]) != ("beyondSchema" in row):
            verb = "rejects" if "beyondSchema" in row else "accepts"
            problems.append(f"the schema {verb} {json.dumps(row['limits'])} ({row['problem']})")
        if (line := problem_of(row["limits"])) != row["problem"]:
            problems.append(f"{json.dumps(row['limits'])}: {line}")
    # The page's examples are in the folder in which its commands run.
    with tempfile.TemporaryDirectory() as folder:
        for name, text in examples:
            (pathlib.Path(folder) / name).write_text(text)
        path = f"{pathlib.Path(zrlab).resolve().parent}:{os.environ['PATH']}"
        done = subprocess.run([sys.executable, str(TRANSCRIPT), str(PAGE), *sys.argv[2:]], text=True,
                              env={**os.environ, "HOME": folder, "PATH": path}, capture_output=True, check=False)
        if done.returncode != 0:
            problems.append((done.stdout + done.stderr).strip())
    described = dict(keys_of(schema))
    problems += [f"{SCHEMA.name}: does not describe \"{key}\"" for key, part in described.items()
                 if not part.get("description")]
    problems += [f"every_key.json: does not use \"{key}\"" for key in sorted(set(described) - set(keys_in(every_key)))]
    for problem in problems:
        print(problem)
    print(f"limits: {len(valid)} valid files and {len(broken)} broken ones checked, {len(problems)} problems")
    return 1 if problems or not (examples and broken) else 0


sys.exit(main())
