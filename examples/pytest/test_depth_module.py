"""Runs the bench's diagnostics as tests of pytest.

The device and all else that is not said here come from the station's settings or the environment:

    ZRLAB_DEVICE=counter-stuck pytest examples/pytest
"""
import json
import subprocess

import pytest


def run_of(name, *settings):
    """The record of one run, as the JSON report has it."""
    command = ["zrlab", "run", name, "--format", "json", "--output", "-", "--log", "off"]
    for setting in settings:
        command += ["--set", setting]
    done = subprocess.run(command, stdout=subprocess.PIPE, check=False)
    assert done.returncode in (0, 1, 2), f"{name} was not run"
    return json.loads(done.stdout)["runs"][0]


@pytest.mark.parametrize("name, settings", [
    ("VantorMeterixDiagnostic", []),
    ("VantorFaultDiagnostic", ["frameCount=90", "timeout=10"]),
])
def test_diagnostic(name, settings):
    run = run_of(name, *settings)
    assert run["failures"] == []
    assert {r["name"]: r["value"] for r in run["results"] if r["judgement"] == "outside"} == {}
    assert run["verdict"] == "PASS"
