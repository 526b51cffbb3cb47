"""The scenarios: what each does in the guest, and what it must end in."""

import itertools
import json
import pathlib
import re
import shlex
import sys

from command import Failed

sys.path.append(str(pathlib.Path(__file__).resolve().parent.parent))
import outcome
from check_transcript import BLOCK, timeless

ROOT = pathlib.Path(__file__).resolve().parent.parent.parent
TABLE = ROOT / "tests" / "virtual_machine" / "scenarios.json"
STATIONS = TABLE.with_name("stations.json")
LIMITS = ROOT / "limits" / "coverage.json"
EXAMPLES = ROOT / "examples" / "linux"
PAGE = ROOT / "docs" / "linux.md"
FRAME = re.compile(r"Frame \d+ is")  # which one a fault meets first, depends on the shell that causes it
# What a device logs of its own is not in a recording.
REPLAYED = ("verdict", "failures", "results", "auxiliary data", "frames")
KEYS = {"station", "camera", "sensor", "before", "during", "run", "conformance", "check", "client", "says", "page",
        "after", "expected", "values"}


def read(names):
    """The scenarios of these names, or all of them, by name in the table's order."""
    table = json.loads(TABLE.read_text())
    for name, scenario in table.items():
        if unknown := set(scenario) - KEYS:
            raise Failed(f"{TABLE.name}: {name}: unknown key \"{min(unknown)}\"")
    if unknown := [name for name in names if name not in table]:
        raise Failed(f"no scenario \"{unknown[0]}\"; there are {', '.join(table)}")
    return {name: table[name] for name in table if not names or name in names}


def files():
    """What they need besides programs, by path in the guest."""
    return {"limits.json": LIMITS, "page": page_script(), **stations(),
            **{f"root/examples/linux/{file.name}": file for file in EXAMPLES.iterdir()}}


def stations():
    """The port descriptions of the stations, by their path in the guest: each an example, with what is other there."""
    made = {}
    for name, station in json.loads(STATIONS.read_text()).items():
        example = json.loads((EXAMPLES / station["example"]).read_text())
        made[f"stations/{name}.json"] = json.dumps(_merged(example, station.get("changes", {})), indent=1)
    return made


def page_script():
    """The guest's script that runs what stands in the page's blocks, in one folder with the examples, and prints what
    the page shows: in a block "console" the commands and what they print, in a block "sh" nothing."""
    lines = ["cd /root"]
    for language, body in BLOCK.findall(PAGE.read_text()):
        if language == "sh":
            lines.append(f"{{\n{body}}} >/dev/null 2>&1 || echo {shlex.quote(f'failed: {body}')}")
        for line in body.splitlines() if language == "console" else ():
            if line.startswith("$ "):
                lines += [f"status=$?; echo {shlex.quote(line)}; (exit $status)", line[2:]]
    return "\n".join(lines) + "\n"


def _merged(base, patch):
    """A JSON merge patch (RFC 7386)."""
    if not isinstance(base, dict) or not isinstance(patch, dict):
        return patch
    merged = {**base, **{key: _merged(base.get(key, {}), value) for key, value in patch.items()}}
    return {key: value for key, value in merged.items() if value is not None}


def script(scenarios):
    """The guest's script that plays them one after the other."""
    lines = ["#!/bin/busybox sh", "set -e", ". /scenario.sh", "set +e"]
    for name, scenario in scenarios.items():
        for device in ("camera", "sensor"):
            if device in scenario:
                lines.append(f"{device} {shlex.join(scenario[device])} || exit 1")
        lines += scenario.get("before", [])
        for text, what in scenario.get("during", {}).items():
            lines.append(f"once {shlex.quote(name)} {shlex.quote(text)} {shlex.quote(what)}")
        lines.append(f"play {shlex.quote(name)} {command(name, scenario)}")
        lines += scenario.get("after", [])
    return "\n".join([*lines, "true"]) + "\n"


def command(name, scenario):
    """What the guest runs."""
    if "page" in scenario:
        return "sh /page"
    if "client" in scenario:
        return f"vm_slow_client /stations/{scenario['client']}.json"
    if "check" in scenario:
        return f"zrlab device check linux:/stations/{scenario['check']}.json"
    folder = f"/results/{name}"
    arguments = (f"zrlab run {scenario['run']} --log debug --record {folder}/recording.zrr" if "run" in scenario else
                 f"zrlab conformance {scenario['conformance']}")
    device = f" --device linux:/stations/{scenario['station']}.json" if "station" in scenario else ""
    return f"{arguments}{device} --format json --output {folder}/report.json"


def difference(scenario, folder, zrlab):
    """How what the guest brought back of a scenario differs from what is expected, or from what its recording ends in
    on this machine; None when it does not."""
    if "page" in scenario:
        return _page_difference(folder)
    if "says" in scenario:
        return _said_difference(scenario, folder)
    try:
        report = json.loads((folder / "report.json").read_text())
        status = int((folder / "status").read_text())
    except (OSError, ValueError):
        log = folder / "log"
        said = log.read_text(errors="replace").strip().splitlines() if log.exists() else []
        return f"no report; zrlab said: {said[-1] if said else 'nothing'}"
    found = FRAME.sub("Frame N is", outcome.of(report))
    if found != scenario["expected"]:
        return f"{found}, expected {scenario['expected']}"
    if status != outcome.status(found):
        return f"exit status {status} with {found}"
    run = report["runs"][0]
    values = {one["name"]: one["value"] for one in run["results"] + run["benchResults"]}
    for what, value in scenario.get("values", {}).items():
        if values.get(what) != value:
            return f"{what} is {values.get(what)}, expected {value}"
    if "run" not in scenario:
        return None
    limits = ["--limits", str(LIMITS)] if "--limits" in scenario["run"] else []
    return outcome.replay_problem(zrlab, folder / "recording.zrr", scenario["run"].split()[0], report, REPLAYED, limits)


def _said_difference(scenario, folder):
    """The same for a program that makes no report, of which the table has the exit status and lines that it must
    print."""
    said = (folder / "log").read_text()
    status = (folder / "status").read_text().strip()
    if status != scenario["expected"]:
        return f"exit status {status}, expected {scenario['expected']}: {said.strip()}"
    missing = [line for line in scenario["says"] if line not in said]
    return f"does not say \"{missing[0]}\": {said.strip()}" if missing else None


def _page_difference(folder):
    """The first line that the page shows otherwise; run times are not compared."""
    shown = "".join(body for language, body in BLOCK.findall(PAGE.read_text()) if language == "console")
    printed = (folder / "log").read_text()
    pairs = itertools.zip_longest(*(timeless(text).splitlines() for text in (shown, printed)))
    return next((f"{PAGE.name} shows {on_page!r}, the guest prints {in_guest!r}"
                 for on_page, in_guest in pairs if on_page != in_guest), None)
