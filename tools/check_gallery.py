#!/usr/bin/python3
"""Runs every diagnostic and experiment on every device of the gallery: the verdict and its reason must be
the expected ones, the exit status must follow, and the standard report must satisfy its schemas. Expected is
what expected-outcomes.json says, and PASS for what it does not mention.

check_gallery.py ZRLAB OUTPUT-FOLDER
"""

import concurrent.futures
import json
import pathlib
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parent.parent
EXPECTED = ROOT / "profiles" / "expected-outcomes.json"
VALIDATOR = ROOT / "tools" / "validate_jsonl.py"
RUNS = {
    "VantorMeterixDiagnostic": [],
    "VantorFaultDiagnostic": ["--set", "frameCount=30", "--set", "timeout=3"],
    "KirraImageExperiment": ["--set", "images=5", "--set", "timeout=2"],
}
STATUS = {"PASS": 0, "FAIL": 1, "ERROR": 2}


def failure_text(failure):
    """The error's code and message, then what caused it, down to the device."""
    error = failure["error"]
    if error is None:
        return failure["message"]
    text = f'{error["code"]} {error["description"]}'
    while error := error.get("underlying"):
        text += f' < {error["domain"]} {error["code"]}'
    return text


def outcome_of(report):
    """The verdict of a run and, when it is not PASS, why."""
    done = report["runs"][0]
    reasons = [failure_text(failure) for failure in done["failures"]]
    if not reasons:
        reasons = [one["name"] for one in done["results"] if one["judgement"] == "outside"]
    return ": ".join([done["verdict"], *(["; ".join(reasons)] if reasons else [])])


def run(zrlab, folder, device, name):
    """The problem with one run, or None."""
    report = folder / f"{device}.{name}.jsonl"
    command = [zrlab, "run", name, *RUNS[name], "--device", device, "--speed", "max", "--log", "off"]
    command += ["--format", "json", "--report", str(report)]
    done = subprocess.run(command, capture_output=True, text=True, timeout=120, check=False)
    where = f"{device}: {name}"
    try:
        outcome = outcome_of(json.loads(done.stdout))
    except (ValueError, KeyError):
        return f"{where}: no report; exit status {done.returncode}: {done.stderr.strip()}"
    expected = json.loads(EXPECTED.read_text())[device].get(name, "PASS")
    if outcome != expected:
        return f"{where}: {outcome}, expected {expected}"
    if done.returncode != STATUS[outcome.split(":")[0]]:
        return f"{where}: exit status {done.returncode} with {outcome}"
    return None


def main():
    zrlab, folder = sys.argv[1], pathlib.Path(sys.argv[2])
    folder.mkdir(parents=True, exist_ok=True)
    for old in folder.glob("*.jsonl"):
        old.unlink()
    devices = subprocess.run(
        [zrlab, "devices", "--names"], capture_output=True, text=True, check=True
    ).stdout.split()
    outcomes = json.loads(EXPECTED.read_text())
    unknown = set(devices) ^ set(outcomes)
    problems = [f"{device}: not in both the gallery and {EXPECTED.name}" for device in sorted(unknown)]
    problems += [f"{EXPECTED.name}: {device}: there is no run \"{name}\""
                 for device, runs in outcomes.items() for name in runs if name not in RUNS]
    jobs = [(device, name) for device in devices if device not in unknown for name in RUNS]
    # Most of a run is waiting for a time-out, so more run at once than there are processors.
    with concurrent.futures.ThreadPoolExecutor(6) as pool:
        found = pool.map(lambda job: run(zrlab, folder, *job), jobs)
        problems += [problem for problem in found if problem]
    reports = sorted(folder.glob("*.jsonl"))
    validation = subprocess.run(
        ["/usr/bin/python3", str(VALIDATOR), *map(str, reports)],
        capture_output=True,
        text=True,
        check=False,
    )
    if validation.returncode != 0:
        problems.append((validation.stdout + validation.stderr).strip())
    for problem in problems:
        print(problem)
    print(f"gallery: {len(jobs)} runs on {len(devices)} devices, {len(reports)} reports validated, "
          f"{len(problems)} problems")
    return 1 if problems or not jobs else 0


sys.exit(main())
