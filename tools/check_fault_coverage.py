#!/usr/bin/python3
"""Gives the simulated device every fault, and compares what the diagnostics and the limits of limits/coverage.json
catch with docs/fault-coverage.md.

check_fault_coverage.py ZRLAB OUTPUT-FOLDER            exit status 1 and the lines that differ
check_fault_coverage.py ZRLAB OUTPUT-FOLDER --update   writes the page
"""

import difflib
import pathlib
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parent.parent
PAGE = ROOT / "docs" / "fault-coverage.md"


def main():
    zrlab, folder = pathlib.Path(sys.argv[1]).resolve(), pathlib.Path(sys.argv[2]).resolve()
    folder.mkdir(parents=True, exist_ok=True)
    made = folder / PAGE.name
    command = [zrlab, "campaign", "--limits", "limits/coverage.json", "--output", made]
    done = subprocess.run(command, cwd=ROOT, capture_output=True, text=True, check=False)
    print((done.stdout + done.stderr).strip())
    if done.returncode != 0:
        return 1
    if "--update" in sys.argv:
        PAGE.write_text(made.read_text())
        return 0
    expected = PAGE.read_text().splitlines()
    differences = list(difflib.unified_diff(expected, made.read_text().splitlines(), str(PAGE), "found",
                                            lineterm="", n=0))
    for line in differences:
        print(line)
    return 1 if differences else 0


sys.exit(main())
