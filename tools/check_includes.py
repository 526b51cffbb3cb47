#!/usr/bin/python3
"""Checks that every file includes only what its folder may include.

check_includes.py ROOT        exit status 1 and one line for each forbidden include
check_includes.py --self-test exit status 1 unless forbidden includes are found
"""

import pathlib
import re
import sys

# Folder or file: the folders and files that it may include, besides its own.
MAY_INCLUDE = {
    "platform": [],
    "frame/host_interface": ["platform"],
    "frame/shared_helpers": ["platform", "frame/host_interface", "frame/alphanumeric_ranges"],
    "frame/registration": ["platform", "frame", "vantor_counters", "vantor_fault", "kirra"],
    "vantor_counters": ["platform", "frame/host_interface", "frame/shared_helpers"],
    "vantor_fault": ["platform", "frame/host_interface", "frame/shared_helpers", "vantor_counters"],
    "kirra": ["platform", "frame/host_interface", "frame/shared_helpers"],
    "simulator": ["platform"],
    "host": ["platform", "frame/host_interface", "simulator"],
}
FOLDERS = sorted({key.split("/")[0] for key in MAY_INCLUDE})
INCLUDE = re.compile(r'^\s*#\s*include\s*["<]([^">]+)[">]')


def within(path, place):
    return path.startswith(place + "/") or path.startswith(place + ".") or path == place


def rule_of(path):
    return next((key for key in MAY_INCLUDE if within(path, key)), None)


def forbidden(path, included):
    """Why the file at `path` may not include `included`, or None."""
    if ".." in included.split("/"):
        return "climbs out of its folder"
    if included.split("/")[0] not in FOLDERS:
        return None  # the standard library, the operating system, a library
    rule = rule_of(path)
    if rule is None:
        return "the file has no place among the folders"
    if within(included, rule) or any(within(included, place) for place in MAY_INCLUDE[rule]):
        return None
    return f"{rule} may not include it"


def check(root):
    problems = []
    files = 0
    for folder in FOLDERS:
        for file in sorted((root / folder).rglob("*")):
            if file.suffix not in (".h", ".cpp", ".inc"):
                continue
            files += 1
            path = str(file.relative_to(root))
            for number, line in enumerate(file.read_text().splitlines(), 1):
                match = INCLUDE.match(line)
                why = match and forbidden(path, match.group(1))
                if why:
                    problems.append(f"{path}:{number}: {match.group(1)}: {why}")
    return files, problems


def self_test():
    cases = [
        ("platform/value.h", "frame/host_interface.h", True),
        ("simulator/device.cpp", "frame/host_interface.h", True),
        ("kirra/image_stream.cpp", "vantor_fault/fault_experiment.h", True),
        ("kirra/image_stream.cpp", "simulator/device.h", True),
        ("vantor_counters/a.cpp", "vantor_fault/fault_experiment.h", True),
        ("vantor_fault/a.cpp", "../simulator/device.h", True),
        ("frame/host_interface.h", "frame/shared_helpers.h", True),
        ("host/main.cpp", "vantor_counters/counter_report.h", True),
        ("host/main.cpp", "simulator/device.h", False),
        ("vantor_fault/a.cpp", "vantor_counters/counter_report.h", False),
        ("frame/registration.cpp", "kirra/image_experiment.h", False),
        ("kirra/image_stream.cpp", "vector", False),
    ]
    wrong = [case for case in cases if bool(forbidden(case[0], case[1])) != case[2]]
    for case in wrong:
        print("self-test:", case)
    return 1 if wrong else 0


def main():
    if sys.argv[1:] == ["--self-test"]:
        return self_test()
    files, problems = check(pathlib.Path(sys.argv[1]))
    print("\n".join(problems) if problems else f"{files} files include what they may")
    return 1 if problems or files == 0 else 0


sys.exit(main())
