"""The jobs of docs/ci.md and the pytest module pass on a healthy device, and fail on others saying why.

    ci_test.py ZRLAB
"""
import os
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest
import xml.etree.ElementTree

ROOT = pathlib.Path(__file__).resolve().parents[2]
PROGRAM = pathlib.Path(sys.argv.pop(1)).resolve()
COUNTER = "Number Xel INT_FAULT_CC"


def environment(device):
    return dict(os.environ, PATH=f"{PROGRAM.parent}:{os.environ['PATH']}", ZRLAB_DEVICE=device)


class Jobs(unittest.TestCase):
    def test_each_command_of_the_page(self):
        text = (ROOT / "docs/ci.md").read_text()
        commands = set(re.findall(r"^ *(?:- (?:run: )?|sh ')(zrlab .*?)'?$", text, re.M))
        self.assertEqual(3, len(re.findall(r"\bzrlab run", text)), "one command in each job")
        self.assertEqual(1, len(commands), "the same in all")
        command = commands.pop()
        for device, status, failed in (("healthy", 0, False), ("counter-stuck", 1, True)):
            with self.subTest(device=device), tempfile.TemporaryDirectory() as folder:
                done = subprocess.run(["bash", "-c", command], cwd=folder, env=environment(device), timeout=120,
                                      capture_output=True)
                self.assertEqual(status, done.returncode, done.stderr)
                self.assertTrue((pathlib.Path(folder) / "report.html").stat().st_size > 0)
                junit = xml.etree.ElementTree.parse(pathlib.Path(folder) / "junit.xml")
                names = [case.get("name") for case in junit.iter("testcase") if case.find("failure") is not None]
                self.assertEqual(failed, COUNTER in names, names)


class Pytest(unittest.TestCase):
    def test_module(self):
        for device, status, reason in (("healthy", 0, "2 passed"),
                                       ("counter-stuck", 1, COUNTER),
                                       ("module-overheats", 1, "Frame 18 is not illuminated for safety reason!"),
                                       ("no-such-device", 1, "VantorMeterixDiagnostic was not run")):
            with self.subTest(device=device):
                done = subprocess.run(
                    ["/usr/bin/python3", "-B", "-m", "pytest", "-p", "no:cacheprovider", ROOT / "examples/pytest"],
                    env=environment(device), timeout=120, capture_output=True, text=True)
                self.assertEqual(status, done.returncode, done.stdout)
                self.assertIn(reason, done.stdout)


unittest.main()
