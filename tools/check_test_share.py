#!/usr/bin/python3
"""Prints which share of the code lines are tests, and fails outside the bounds.

Code lines are those that are not blank and begin with neither // nor #, in the files that git knows; tests
are what is below tests/.
"""

import pathlib
import subprocess
import sys

LEAST, MOST = 25, 33  # per cent
ENDINGS = {".cpp", ".cc", ".h", ".hpp", ".mjs", ".js", ".py", ".sh"}


def code_lines(file):
    lines = (line.strip() for line in file.read_text().splitlines())
    return sum(1 for line in lines if line and not line.startswith(("//", "#")))


root = pathlib.Path(__file__).resolve().parent.parent
names = subprocess.run(["git", "-C", root, "ls-files", "-z"], check=True, capture_output=True, text=True)
tests = total = 0
for name in names.stdout.split("\0"):
    if (root / name).suffix in ENDINGS and (root / name).is_file():
        lines = code_lines(root / name)
        total += lines
        tests += lines if name.startswith("tests/") else 0
share = 100 * tests / total
print(f"tests: {tests} of {total} code lines, {share:.1f} %")
if not LEAST <= share <= MOST:
    sys.exit(f"not from {LEAST} to {MOST} %")
