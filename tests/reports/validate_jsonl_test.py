#!/usr/bin/python3
"""Breaks a good output in one way after another: the validator must name the line and the reason."""

import json
import pathlib
import sys
import tempfile
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "tools"))
import validate_jsonl

GOOD = [
    {"schemaVersion": {"major": 2, "minor": 0}},
    {"testRunArtifact": {"testRunStart": {
        "name": "n", "version": "1", "commandLine": "n", "parameters": {},
        "dutInfo": {"dutInfoId": "d", "hardwareInfos": [{"hardwareInfoId": "h", "name": "h"}]}}}},
    {"testStepArtifact": {"testStepId": "0", "testStepStart": {"name": "s"}}},
    {"testStepArtifact": {"testStepId": "0", "measurement": {
        "name": "m", "value": 3, "hardwareInfoId": "h",
        "validators": [{"type": "LESS_THAN", "value": "inf"},
                       {"type": "GREATER_THAN_OR_EQUAL", "value": 3}]}}},
    {"testStepArtifact": {"testStepId": "0", "diagnosis": {"verdict": "n-pass", "type": "PASS"}}},
    {"testStepArtifact": {"testStepId": "0", "testStepEnd": {"status": "COMPLETE"}}},
    {"testStepArtifact": {"testStepId": "1", "testStepStart": {"name": "s"}}},
    {"testStepArtifact": {"testStepId": "1", "measurementSeriesStart": {
        "name": "m", "measurementSeriesId": "a", "hardwareInfoId": "h"}}},
    {"testStepArtifact": {"testStepId": "1", "measurementSeriesElement": {
        "index": 0, "value": 3, "timestamp": "2026-11-24T17:34:07.125Z", "measurementSeriesId": "a"}}},
    {"testStepArtifact": {"testStepId": "1", "measurementSeriesEnd": {
        "measurementSeriesId": "a", "totalCount": 1}}},
    {"testStepArtifact": {"testStepId": "1", "testStepEnd": {"status": "SKIP"}}},
    {"testRunArtifact": {"testRunEnd": {"status": "COMPLETE", "result": "PASS"}}},
]
STEP = "testStepArtifact"
RUN = "testRunArtifact"


def change(index, *path, to):
    """A way to break the output: replaces one entry of one artifact."""
    def broken(artifacts):
        entry = artifacts[index]
        for key in path[:-1]:
            entry = entry[key]
        entry[path[-1]] = to
    return broken


def remove(index):
    return lambda artifacts: artifacts.pop(index)


def repeat(index, at):
    return lambda artifacts: artifacts.insert(at, artifacts[index])


BROKEN = [
    (change(0, "schemaVersion", "major", to=1), 1, "$.schemaVersion.major"),
    (change(1, RUN, "testRunStart", "surprise", to=1), 2, "surprise"),
    (change(3, STEP, "measurement", "validators", 0, "type", to="BELOW"), 4, "'BELOW' is not one of"),
    (change(3, STEP, "measurement", "value", to=None), 4, "$.testStepArtifact.measurement.value"),
    (change(3, STEP, "measurement", "hardwareInfoId", to="x"), 4, "unknown hardware x"),
    (change(3, STEP, "measurement", "value", to="nan"), 5, "PASS although a validator is not met"),
    (change(3, STEP, "measurement", "value", to=2), 5, "PASS although a validator is not met"),
    (change(4, STEP, "diagnosis", "type", to="FAIL"), 5, "FAIL although all validators are met"),
    (change(4, STEP, "testStepId", to="1"), 5, "step 1 is not open"),
    (change(5, STEP, "testStepEnd", "status", to="ERROR"), 12, "although a step ended with an error"),
    (change(7, STEP, "measurementSeriesStart", "hardwareInfoId", to="x"), 8, "unknown hardware x"),
    (change(8, STEP, "measurementSeriesElement", "index", to=1), 9, "series a has no element 0"),
    (change(8, STEP, "measurementSeriesElement", "value", to=None), 9, "measurementSeriesElement.value"),
    (change(9, STEP, "measurementSeriesEnd", "totalCount", to=2), 10, "series a has 1 elements"),
    (change(11, RUN, "testRunEnd", "result", to="NOT_APPLICABLE"), 12, "status COMPLETE with result"),
    (remove(0), 1, "schema version"),
    (remove(1), 2, "a step starts before the run"),
    (remove(5), 11, "the run ends with open steps: ['0']"),
    (remove(7), 8, "series a is not open in step 1"),
    (remove(9), 10, "step 1 ends with open series: ['a']"),
    (remove(11), 11, "the run never ends"),
    (repeat(1, 2), 3, "the run starts twice"),
    (repeat(2, 3), 4, "step 0 starts twice"),
    (repeat(7, 8), 9, "series a starts twice"),
    (repeat(11, 12), 13, "an artifact follows the run's end"),
]


class ValidatorTest(unittest.TestCase):
    checker = validate_jsonl.line_checker()

    def problem_with(self, text):
        with tempfile.TemporaryDirectory() as folder:
            file = pathlib.Path(folder) / "output.jsonl"
            file.write_text(text)
            return validate_jsonl.problem_of(file, self.checker)

    @staticmethod
    def text_of(artifacts):
        frame = {"timestamp": "2026-11-24T17:34:07.125Z"}
        return "".join(json.dumps({"sequenceNumber": number, **frame, **artifact}) + "\n"
                       for number, artifact in enumerate(artifacts))

    def test_accepts_a_good_output(self):
        self.assertIsNone(self.problem_with(self.text_of(GOOD)))

    def test_names_line_and_reason(self):
        for broken, line, reason in BROKEN:
            artifacts = json.loads(json.dumps(GOOD))
            broken(artifacts)
            problem = self.problem_with(self.text_of(artifacts))
            self.assertIn(f"output.jsonl:{line}: ", problem or "no problem", reason)
            self.assertIn(reason, problem)

    def test_reads_whole_lines_of_json_only(self):
        good = self.text_of(GOOD)
        for text, reason in [
            (good[:-1], "the last line has no end"),
            (good[:40], "the last line has no end"),
            (good.replace(":07.125Z", ":07.125"), "no time zone"),
            (good.replace('"sequenceNumber": 3', '"sequenceNumber": 4'), "sequence number 4"),
            (good.replace('"value": 3', '"value": NaN', 1), "NaN is not JSON"),
            ("", "the last line has no end"),
        ]:
            self.assertIn(reason, self.problem_with(text) or "no problem")


if __name__ == "__main__":
    unittest.main()
