#!/usr/bin/python3
"""Checks the schema of device profiles: it accepts every profile of the gallery, one with every key, the
examples on the page about profiles and what the program shows of a device, and it rejects the broken profiles
that the program rejects too. It describes every key with the default that the program has. Every profile of
the gallery has a summary and its expected outcomes. The page names no other keys, the program accepts its
examples, and its tables are those that the program and the outcomes give.

check_profiles.py ZRLAB            checks all of it
check_profiles.py ZRLAB --update   first writes the tables of the page and the names in the schema again
check_profiles.py --keys           prints each key with its default and what it means
"""

import json
import pathlib
import re
import subprocess
import sys
import tempfile

import jsonschema

ROOT = pathlib.Path(__file__).resolve().parent.parent
GALLERY = ROOT / "profiles"
SCHEMA = GALLERY / "device-profile.schema.json"
OUTCOMES = GALLERY / "expected-outcomes.json"
PAGE = ROOT / "docs" / "profiles.md"
SAMPLES = ROOT / "tests" / "profiles"


def parts_of(node):
    """The node and everything in it."""
    yield node
    for part in node.values() if isinstance(node, dict) else node if isinstance(node, list) else ():
        yield from parts_of(part)


def definition(schema, part):
    """What a part refers to, if it does."""
    return schema["$defs"].get(part.get("$ref", "").rpartition("/")[2], {})


def keys_of(schema, node, path=""):
    """Each key below a part of the schema, as a path, with its own part. Faults and errors have keys that
    are the same everywhere, and most counter channels are described by their names; those are left out."""
    if node.get("$ref") in ("#/$defs/fault", "#/$defs/error"):
        return
    node = {**definition(schema, node), **node}
    others = node.get("additionalProperties") or node.get("unevaluatedProperties") or {}
    for key, part in node.get("properties", {}).items():
        if part != others:
            yield path + key, {**definition(schema, part), **part}
        if not others or part.get("$ref") != others.get("$ref"):
            yield from keys_of(schema, part, f"{path}{key}.")
    yield from keys_of(schema, others, path + "NAME.") if others else ()
    for part in [*node.get("anyOf", ()), *([node["items"]] if "items" in node else ())]:
        yield from keys_of(schema, part, path)


def metadata_table(schema, healthy):
    camera = healthy["capture"]["streams"]["front-infrared"]
    rows = ["| key | what it is | healthy | rises by |", "|---|---|---|---|"]
    for key, part in schema["$defs"]["metadata"]["properties"].items():
        numbers = [camera["metadata"].get(key), camera["warming"].get(key)]
        cells = ["" if number is None else json.dumps(number) for number in numbers]
        rows.append(f"| `{key}` | {part['description']} | {' | '.join(cells)} |")
    return rows


def channel_list(healthy):
    rows, before = ["```"], None
    for name, channel in healthy["counters"]["channels"].items():
        publisher = f'{channel["group"]}, {channel["subgroup"]}'
        if publisher != before:
            rows.append(publisher)
            before = publisher
        rows.append(f'    {name}' + (f'    {channel["count"]}' if channel["count"] else ""))
    return [*rows, "```"]


def gallery_table(outcomes):
    rows = ["| device | verdict and reason |", "|---|---|"]
    for device, runs in outcomes.items():
        cells = [f"{', '.join(f'`{name}`' for name in runs if runs[name] == outcome)}: {outcome}"
                 for outcome in dict.fromkeys(runs.values())]
        text = "<br>".join(cell.replace("<", "&lt;") for cell in cells)
        rows.append(f"| `{device}` | {text or 'every run passes'} |")
    return rows


def with_tables(page, tables):
    """The page with these tables, each between a comment that names it and the next comment."""
    for name, rows in tables.items():
        start, end = page.split(f"<!-- {name}: made by tools/check_profiles.py -->\n")
        page = (f"{start}<!-- {name}: made by tools/check_profiles.py -->\n" + "\n".join(rows) +
                "\n<!-- end -->" + end.split("<!-- end -->", 1)[1])
    return page


def with_names(schema, healthy):
    """The schema with the names of metadata keys and counter channels as they are."""
    schema = json.loads(json.dumps(schema))
    parts = schema["$defs"]
    parts["healthyChannels"]["properties"] = {
        name: {"$ref": "#/$defs/channelOrNull"} for name in healthy["counters"]["channels"]}
    parts["metadataName"]["anyOf"][0]["enum"] = list(parts["metadata"]["properties"])
    return schema


def name_problems(schema, healthy):
    """The names in the schema that a healthy device does not have, and the reverse."""
    streams = healthy["capture"]["streams"]
    for part, names in (("healthyStreams", streams), ("healthyDevices", healthy["hid"]["devices"]),
                        ("metadata", streams["front-infrared"]["metadata"])):
        for name in sorted(set(names) ^ set(schema["$defs"][part]["properties"])):
            yield f'{SCHEMA.name}: {part}: "{name}" is not in both the schema and the program'


def default_problems(schema, healthy):
    """The defaults in the schema that are not those of a healthy device."""
    named = {"streams": "front", "devices": "Kirra", "channels": list(healthy["counters"]["channels"])[-1]}
    for key, part in keys_of(schema, schema):
        value, before = healthy, None
        for word in key.split("."):
            value = value.get(named[before] if word == "NAME" else word) if isinstance(value, dict) else None
            before = word
        if "." in key and value is not None and part.get("default", value) != value:
            yield f'{SCHEMA.name}: {key}: the default is {json.dumps(value)}'


def main():
    schema = json.loads(SCHEMA.read_text())
    if sys.argv[1:] == ["--keys"]:
        for key, part in keys_of(schema, schema):
            default = json.dumps(part["default"]) if "default" in part else ""
            print(f"{key:<62} {default:<10} {part['description']}")
        return 0

    def zrlab(*arguments):
        return subprocess.run([sys.argv[1], "device", *arguments], capture_output=True, text=True,
                              check=False)

    healthy = json.loads(zrlab("show", "healthy").stdout)
    outcomes = json.loads(OUTCOMES.read_text())
    page = PAGE.read_text()
    tables = {"metadata": metadata_table(schema, healthy), "channels": channel_list(healthy),
              "gallery": gallery_table(outcomes)}
    named, tabled = with_names(schema, healthy), with_tables(page, tables)
    if sys.argv[2:] == ["--update"]:
        SCHEMA.write_text(json.dumps(named, indent=2, ensure_ascii=False) + "\n")
        PAGE.write_text(tabled)
        schema, page = named, tabled
    problems = [f"{file.name}: not up to date: tools/check_profiles.py ZRLAB --update"
                for file, is_old in ((SCHEMA, named != schema), (PAGE, tabled != page)) if is_old]
    problems += [*name_problems(schema, healthy), *default_problems(schema, healthy)]

    jsonschema.Draft202012Validator.check_schema(schema)
    validator = jsonschema.Draft202012Validator(schema)
    files = {path.stem: path for path in GALLERY.glob("*.json") if path not in (SCHEMA, OUTCOMES)}
    gallery = {name: json.loads(path.read_text()) for name, path in files.items()}
    every_key = json.loads((SAMPLES / "every_key.json").read_text())
    examples = dict(re.findall(r"`(\S+\.json)`:\n\n```json\n(.*?)```", page, re.DOTALL))
    valid = {**gallery, "every_key": every_key, "shown": healthy,
             **{name: json.loads(text) for name, text in examples.items()}}
    for name, profile in valid.items():
        for error in validator.iter_errors(profile):
            problems.append(f"{name}: {error.json_path}: {error.message}")
    with tempfile.TemporaryDirectory() as folder:
        paths = [pathlib.Path(folder) / name for name in examples]
        for path in paths:
            path.write_text(examples[path.name])
        checked = zrlab("check", *map(str, paths))
        if (checked.stdout, checked.returncode) != ("".join(f"{path}: valid\n" for path in paths), 0):
            problems.append((checked.stdout + checked.stderr).strip())

    problems += [f"{name}: not in both the gallery and {OUTCOMES.name}"
                 for name in sorted(set(gallery) ^ set(outcomes))]
    problems += [f"{OUTCOMES.name}: {name}: PASS need not be said"
                 for name, runs in outcomes.items() if "PASS" in runs.values()]
    problems += [f"{name}: no summary" for name, one in sorted(gallery.items()) if not one.get("summary")]

    broken = json.loads((SAMPLES / "broken_profiles.json").read_text())
    for row in broken:
        if validator.is_valid(row["profile"]) != ("beyondSchema" in row):
            verb = "rejected" if "beyondSchema" in row else "accepted"
            problems.append(f"{verb}: {json.dumps(row['profile'])} ({row['problems'][0]})")

    objects = [part for part in parts_of(schema) if isinstance(part, dict)]
    described = {key for part in objects if part.get("additionalProperties") is False
                 for key in part["properties"]}
    used = {key for part in parts_of(every_key) if isinstance(part, dict)
            for key in part}
    problems += [f"every_key: does not use \"{key}\"" for key in sorted(described - used)]
    problems += [f"{SCHEMA.name}: does not describe \"{key}\""
                 for key, part in keys_of(schema, schema) if not part.get("description")]
    overview = page[page.index("## What can be described"):page.index("## The gallery")]
    known = {word for key, _ in keys_of(schema, schema) for word in key.split(".")}
    problems += [f"{PAGE.name}: there is no key \"{key}\""
                 for key in sorted(set(re.findall(r"`([^`\s./]+)`", overview)) - known)]

    for problem in problems:
        print(problem)
    print(f"profiles: {len(gallery)} of the gallery, {len(examples)} examples and {len(broken)} broken ones "
          f"checked, {len(problems)} problems")
    return 1 if problems or not (gallery and examples and broken) else 0


sys.exit(main())
