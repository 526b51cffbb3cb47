"""What benchmarks/run reports about rows that became worse, and the page that it writes."""

import contextlib
import importlib.machinery
import importlib.util
import io
import math
import pathlib
import sys
import tempfile
import unittest
import xml.etree.ElementTree

FOLDER = pathlib.Path(__file__).resolve().parents[2] / "benchmarks"
sys.path.insert(0, str(FOLDER))

import baseline
import measure
import page
from rows import Curve, Goal, Row

MACHINE = {"processor": "Some (R) CPU", "cores": 2, "root": False}


def runner():
    """benchmarks/run, which has no ending."""
    loader = importlib.machinery.SourceFileLoader("run", str(FOLDER / "run"))
    module = importlib.util.module_from_spec(importlib.util.spec_from_loader("run", loader))
    loader.exec_module(module)
    return module


RUN = runner()


def row_of(values):
    """A row that measures these values in turn, and the last one ever after; a failure for None."""
    left = list(values)

    def sample(_quick):
        measured = left.pop(0) if len(left) > 1 else left[0]
        if measured is None:
            raise measure.Failed("it broke")
        ratio, other = measured if isinstance(measured, tuple) else (measured, 1.0)
        return {"here": ratio, "other": other, "peer/10": 2.0}

    goals = (Goal("ratio", lambda found: found["here"], 1.0), Goal("other", lambda found: found["other"]))
    return Row("row", "A row", sample, goals, "", "", curves=(
        Curve("row.svg", "A <row>", "size", "ns", "peer/{size}", ("peer",), (10,)),))


def compare(kept, values):
    """The status and the text of a whole comparison of one row that measures these values."""
    row = row_of(values)
    out = io.StringIO()
    with contextlib.redirect_stdout(out), contextlib.redirect_stderr(io.StringIO()):
        results = RUN.take([row], False)
        return RUN.check(kept, [row], results), out.getvalue()


class BaselineTest(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        baseline.FOLDER = pathlib.Path(folder.name)

    def test_what_became_worse_in_two_runs_is_reported(self):
        first = RUN.REPEATS
        report = "row: ratio: 1 became 1.2\n"
        for what, spread, values, status, text in (
                ("by more than a tenth and the spread", 0.1, [1.2], 1, report),
                ("by less than a tenth", 0.01, [1.09], 0, ""),
                ("by less than the spread", 0.3, [1.2], 0, ""),
                ("in the first run only", 0.1, [1.2] * first + [1.0], 0, ""),
                ("in the second run only", 0.1, [1.0] * first + [1.2], 0, ""),
                ("another one in each run", 0.1, [(1.2, 1.0)] * first + [(1.0, 1.2)], 0, ""),
                ("and cannot be measured anew", 0.1, [1.2] * first + [None], 1, ""),
                ("better", 0.1, [0.5], 0, "")):
            with self.subTest(what):
                kept = {"row": {goal: {"value": 1.0, "spread": spread} for goal in ("ratio", "other")}}
                self.assertEqual(compare(kept, values), (status, text))

    def test_a_kept_goal_that_is_not_measured_is_worse(self):
        kept = {"row": {"gone": {"value": 1.0, "spread": 0.1}}}
        self.assertEqual(compare(kept, [1.0]), (1, "row: gone: 1 became nan\n"))

    def test_an_update_keeps_the_rows_that_were_not_measured(self):
        goals = {"ratio": {"value": 0.5, "spread": 0.1, "compared": True},
                 "time": {"value": 7.0, "spread": 0.1, "compared": False}}
        baseline.update(MACHINE, {"old": {"goals": goals}})
        baseline.update(MACHINE, {"new": {"goals": goals}})
        ratio = {"ratio": {"value": 0.5, "spread": 0.1}}
        self.assertEqual(baseline.load(MACHINE), {"old": ratio, "new": ratio})
        self.assertEqual(baseline.load({**MACHINE, "root": True}), {})
        self.assertEqual([file.name for file in baseline.FOLDER.iterdir()], ["some-r-cpu-2-cores-user.json"])


class PageTest(unittest.TestCase):
    def test_it_says_what_is_reached_and_what_was_not_measured(self):
        row = row_of([0.5])
        for ratio, verdict in ((0.5, "reached"), (1.0, "reached"), (1.5, "**not reached**"),
                               (math.nan, "**not reached**")):
            result = {"goals": {"ratio": {"value": ratio, "spread": 0.25}}}
            line = page.goal_table([row], {"row": result}).splitlines()[2]
            self.assertEqual(line, f"| row | ratio | {page.number(ratio)} | 0.25 | ≤ 1 | {verdict} |")
        self.assertEqual(page.goal_table([row], {}).splitlines()[2], "| row | ratio | | | ≤ 1 | not measured |")

    def test_a_drawing_is_whole_whatever_is_measured(self):
        curve = row_of([1]).curves[0]
        for value in (0, 1e-6, 10, 12345.6):
            svg = xml.etree.ElementTree.fromstring(page.drawing(curve, {"peer/10": value}))
            self.assertEqual(svg.attrib["aria-label"], "A <row>")
            self.assertEqual(len(svg.findall("{http://www.w3.org/2000/svg}circle")), 1)


if __name__ == "__main__":
    unittest.main()
