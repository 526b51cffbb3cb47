#!/usr/bin/python3
"""Checks test-and-validation output: every line against the Open Compute Project's JSON schemas, and the
whole against the rules that schemas cannot express. Prints file, line and reason of the first problem of each
file; exit status 1 when there is one.

validate_jsonl.py FILE...
"""

import datetime
import json
import math
import operator
import pathlib
import sys

import jsonschema

ROOT = pathlib.Path(__file__).resolve().parent.parent
SCHEMAS = ROOT / "tests" / "reports" / "ocp-output-schema"
HOLDS = {
    "GREATER_THAN_OR_EQUAL": operator.ge,
    "GREATER_THAN": operator.gt,
    "LESS_THAN_OR_EQUAL": operator.le,
    "LESS_THAN": operator.lt,
}


def line_checker():
    schemas = [json.loads(file.read_text()) for file in sorted(SCHEMAS.glob("*.json"))]
    by_id = {schema["$id"]: schema for schema in schemas}
    root = next(schema for schema in schemas if schema["title"] == "OutputArtifact")
    resolver = jsonschema.RefResolver.from_schema(root, store=by_id)
    return jsonschema.Draft202012Validator(root, resolver=resolver)


def reason_of(errors):
    """The most specific of the reasons: the one that went furthest into the artifact; or None."""
    reasons = [reason for error in errors for reason in (error, reason_of(error.context)) if reason]
    return max(reasons, key=lambda reason: len(reason.absolute_path), default=None)


def refuse_constant(name):
    raise ValueError(f"{name} is not JSON")


def is_met(measurement):
    """Whether the value satisfies all validators. NaN, written as a string, satisfies none."""
    value = float(measurement["value"])
    for validator in measurement["validators"]:
        if validator["type"] not in HOLDS:
            raise ValueError(f"a validator of type {validator['type']} is not a bound of a limit")
        if not HOLDS[validator["type"]](value, float(validator["value"])):
            return False
    return not math.isnan(value)


class Output:
    """What has been read of one output. Each check raises ValueError with the reason."""

    def __init__(self):
        self.lines = 0
        self.started = self.ended = self.failed_step = False
        self.open = set()
        self.known = set()
        self.hardware = set()
        self.series = {}  # of each open series its step and how many elements it has
        self.met = []  # of the measurements with validators since the last diagnosis

    def demand(self, holds, reason):
        if not holds:
            raise ValueError(reason)

    def read(self, artifact):
        self.demand(artifact["sequenceNumber"] == self.lines,
                    f"sequence number {artifact['sequenceNumber']} instead of {self.lines}")
        time = datetime.datetime.fromisoformat(artifact["timestamp"].replace("Z", "+00:00"))
        self.demand(time.tzinfo is not None, "the timestamp has no time zone")
        self.demand(("schemaVersion" in artifact) == (self.lines == 0),
                    "the schema version must be the first artifact, and only that")
        self.demand(not self.ended, "an artifact follows the run's end")
        self.lines += 1
        if "testRunArtifact" in artifact:
            self.read_run(artifact["testRunArtifact"])
        elif "testStepArtifact" in artifact:
            self.read_step(artifact["testStepArtifact"])

    def read_run(self, content):
        if "testRunStart" in content:
            self.demand(not self.started, "the run starts twice")
            self.started = True
            self.hardware = {info["hardwareInfoId"]
                             for info in content["testRunStart"]["dutInfo"].get("hardwareInfos", [])}
        elif "testRunEnd" in content:
            self.demand(self.started, "the run ends before it starts")
            self.demand(not self.open, f"the run ends with open steps: {sorted(self.open)}")
            end = content["testRunEnd"]
            self.demand((end["status"] == "COMPLETE") == (end["result"] != "NOT_APPLICABLE"),
                        f"status {end['status']} with result {end['result']}")
            self.demand(not self.failed_step or end["status"] == "ERROR",
                        f"status {end['status']} although a step ended with an error")
            self.ended = True

    def read_step(self, content):
        step = content["testStepId"]
        if "testStepStart" in content:
            self.demand(self.started, "a step starts before the run")
            self.demand(step not in self.known, f"step {step} starts twice")
            self.known.add(step)
            self.open.add(step)
        self.demand(step in self.open, f"step {step} is not open")
        self.read_series(step, content)
        if "testStepEnd" in content:
            left = sorted(series for series, (of, _) in self.series.items() if of == step)
            self.demand(not left, f"step {step} ends with open series: {left}")
            self.open.remove(step)
            self.failed_step |= content["testStepEnd"]["status"] == "ERROR"
        for kind in ("measurement", "measurementSeriesStart", "diagnosis"):
            named = content.get(kind, {}).get("hardwareInfoId")
            self.demand(named is None or named in self.hardware, f"unknown hardware {named}")
        measured = content.get("measurement", {})
        if measured.get("validators") and measured.get("metadata", {}).get("partOfVerdict", True):
            self.met.append(is_met(measured))
        if "diagnosis" in content:
            verdict = content["diagnosis"]["type"]
            self.demand(verdict != "PASS" or all(self.met), "PASS although a validator is not met")
            self.demand(verdict != "FAIL" or not all(self.met), "FAIL although all validators are met")
            self.met = []

    def read_series(self, step, content):
        for kind in ("measurementSeriesStart", "measurementSeriesElement", "measurementSeriesEnd"):
            if kind not in content:
                continue
            series = content[kind]["measurementSeriesId"]
            if kind == "measurementSeriesStart":
                self.demand(series not in self.series, f"series {series} starts twice")
                self.series[series] = (step, 0)
                continue
            of, count = self.series.get(series, (None, 0))
            self.demand(of == step, f"series {series} is not open in step {step}")
            if kind == "measurementSeriesElement":
                self.demand(content[kind]["index"] == count, f"series {series} has no element {count}")
                self.series[series] = (step, count + 1)
            else:
                self.demand(content[kind]["totalCount"] == count, f"series {series} has {count} elements")
                del self.series[series]

    def finish(self):
        self.demand(self.started, "the run never starts")
        self.demand(self.ended, "the run never ends")


def problem_of(file, checker):
    output = Output()
    number = 0
    try:
        text = file.read_text(encoding="utf-8")
        if not text.endswith("\n"):
            return f"{file}: the last line has no end"
        for number, line in enumerate(text[:-1].split("\n"), 1):
            artifact = json.loads(line, parse_constant=refuse_constant)
            reason = reason_of(checker.iter_errors(artifact))
            if reason is not None:
                return f"{file}:{number}: {reason.json_path}: {reason.message}"
            output.read(artifact)
        output.finish()
    except (OSError, ValueError) as reason:
        return f"{file}:{number}: {reason}"
    return None


def main():
    files = [pathlib.Path(name) for name in sys.argv[1:]]
    if not files:
        print(__doc__.strip())
        return 64
    checker = line_checker()
    problems = [problem for file in files if (problem := problem_of(file, checker))]
    for problem in problems:
        print(problem)
    print(f"{len(files)} files validated, {len(problems)} with problems")
    return 1 if problems else 0


if __name__ == "__main__":
    sys.exit(main())
