#!/usr/bin/python3
"""Runs every diagnostic and experiment on every device of the gallery: the verdict and its reason must be
the expected ones, the exit status must follow, and the standard report must satisfy its schemas. Expected is
what expected-outcomes.json says, and PASS for what it does not mention. Each run is recorded, and run again on its
recording: verdict, failures, judged values, images and log must be the same, but for what the timing of threads
decides.

check_gallery.py ZRLAB OUTPUT-FOLDER
"""

import concurrent.futures
import json
import pathlib
import subprocess
import sys

import outcome

ROOT = pathlib.Path(__file__).resolve().parent.parent
EXPECTED = ROOT / "profiles" / "expected-outcomes.json"
VALIDATOR = ROOT / "tools" / "validate_jsonl.py"
RUNS = {
    "VantorMeterixDiagnostic": [],
    "VantorFaultDiagnostic": ["--set", "frameCount=30", "--set", "timeout=3"],
    "KirraImageExperiment": ["--set", "images=5", "--set", "timeout=2"],
}


def run(zrlab, folder, device, name):
    """The problem with one run, or None."""
    report = folder / f"{device}.{name}.jsonl"
    recording = folder / f"{device}.{name}.zrr"
    command = [zrlab, "run", name, *RUNS[name], "--device", device, "--speed", "max", "--log", "debug"]
    command += ["--format", "json", "--report", str(report), "--record", str(recording)]
    done = subprocess.run(command, capture_output=True, text=True, timeout=120, check=False)
    where = f"{device}: {name}"
    try:
        recorded = json.loads(done.stdout)
        found = outcome.of(recorded)
    except (ValueError, KeyError):
        return f"{where}: no report; exit status {done.returncode}: {done.stderr.strip()}"
    expected = json.loads(EXPECTED.read_text())[device].get(name, "PASS")
    if found != expected:
        return f"{where}: {found}, expected {expected}"
    if done.returncode != outcome.status(found):
        return f"{where}: exit status {done.returncode} with {found}"
    problem = outcome.replay_problem(zrlab, recording, name, recorded)
    return f"{where}: {problem}" if problem else None


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
