#!/usr/bin/python3
"""Checks that every file includes only what its folder may include.

check_includes.py ROOT        exit status 1 and one line for each forbidden include
check_includes.py --self-test exit status 1 unless forbidden includes are found
"""

import pathlib
import re
import sys
import tempfile

# Folder or file: the folders and files that it may include, besides its own. The longest key that a
# path begins with is its rule.
MAY_INCLUDE = {
    "platform": [],
    "frame/host_interface": ["platform"],
    "frame/alphanumeric_ranges": [],
    "frame/shared_helpers": ["platform", "frame/host_interface", "frame/alphanumeric_ranges"],
    "frame/plugin": ["platform", "frame", "vantor_counters", "vantor_fault", "kirra"],
    "vantor_counters": ["platform", "frame/host_interface", "frame/shared_helpers"],
    "vantor_fault": ["platform", "frame/host_interface", "frame/shared_helpers", "vantor_counters"],
    "kirra": ["platform", "frame/host_interface", "frame/shared_helpers"],
    "input": ["platform"],
    "devices/device": ["platform"],
    "devices/report_delivery": ["platform"],
    "devices/usage_match": ["platform"],
    "devices/written_handlers": ["platform"],
    "devices/observed": ["platform"],
    "devices/faulty": ["platform", "devices/observed/handlers_property", "devices/observed/wrapper_table"],
    "devices/recording": ["platform", "devices/device", "devices/report_delivery", "devices/written_handlers",
                          "devices/observed/handlers_property", "devices/observed/wrapper_table"],
    "devices/linux": ["platform", "input", "devices/device", "devices/report_delivery", "devices/usage_match",
                      "devices/written_handlers"],
    "devices/simulator": ["platform", "input", "devices/device", "devices/report_delivery", "devices/usage_match",
                          "devices/written_handlers"],
    "devices/simulator/profile": ["platform", "input"],
    "host/record": ["platform"],
    "host/run": ["platform", "frame/host_interface", "input", "devices/device", "devices/observed",
                 "host/record"],
    "host/report": ["platform", "host/record"],
    "host/conformance": ["platform", "devices/device", "host/record", "host/run"],
    "host/campaign": ["platform", "frame/host_interface", "devices/device", "devices/faulty", "devices/observed",
                      "host/record", "host/report", "host/run"],
    "host/store": ["platform", "host/record"],
    "host/store/sqlite": ["host/store/database"],
    "host/store/postgres": ["host/store/database", "host/record/mask_passwords"],
    "host/results": ["platform", "input", "host/record", "host/report", "host/store"],
    "host/zrlab": ["platform", "frame/host_interface", "input", "devices/device",
                   "devices/observed", "devices/recording", "devices/linux/kind", "devices/simulator/kind",
                   "devices/simulator/profile", "host/record", "host/report",
                   "devices/faulty", "host/run", "host/campaign", "host/conformance", "host/store", "host/results"],
    "tools/mutate": [],
}
# Where anything may be included from, and where no rule is needed.
FREE = ["tests", "benchmarks", "fuzz", "examples", "tools"]
FOLDERS = sorted({key.split("/")[0] for key in MAY_INCLUDE})
INCLUDE = re.compile(r'^\s*#\s*include\s*["<]([^">]+)[">]')


def within(path, place):
    return path.startswith(place + "/") or path.startswith(place + ".") or path == place


def rule_of(path):
    return max((key for key in MAY_INCLUDE if within(path, key)), key=len, default=None)


def is_free(path):
    return path.split("/")[0] in FREE


def forbidden(path, included):
    """Why the file at `path` may not include `included`, or None."""
    if ".." in included.split("/"):
        return "climbs out of its folder"
    if is_free(included):
        return "nothing may include it"
    if included.split("/")[0] not in FOLDERS:
        return None  # the standard library, the operating system, a library
    rule = rule_of(path)
    if within(included, rule) or any(within(included, place) for place in MAY_INCLUDE[rule]):
        return None
    return f"{rule} may not include it"


def sources(root):
    """Every source file below `root`, except what the build made and what is hidden."""
    for file in sorted(root.rglob("*")):
        path = file.relative_to(root)
        if file.suffix in (".h", ".cpp", ".inc") and path.parts[0] != "build":
            if not any(part.startswith(".") for part in path.parts):
                yield file, str(path)


def check(root):
    problems = []
    files = 0
    for file, path in sources(root):
        if is_free(path):
            continue
        files += 1
        if rule_of(path) is None:
            problems.append(f"{path}: its folder has no row in the table of {pathlib.Path(__file__).name}")
            continue
        for number, line in enumerate(file.read_text().splitlines(), 1):
            match = INCLUDE.match(line)
            why = match and forbidden(path, match.group(1))
            if why:
                problems.append(f"{path}:{number}: {match.group(1)}: {why}")
    return files, problems


def self_test():
    cases = [
        ("platform/value.h", "frame/host_interface.h", True),
        ("devices/simulator/device.cpp", "frame/host_interface.h", True),
        ("devices/simulator/device.cpp", "devices/simulator/profile/fault.h", False),
        ("devices/simulator/profile/reader.cpp", "devices/simulator/device.h", True),
        ("devices/simulator/device.cpp", "devices/observed/observer.h", True),
        ("devices/device.cpp", "devices/simulator/device.h", True),
        ("kirra/image_stream.cpp", "vantor_fault/fault_experiment.h", True),
        ("kirra/image_stream.cpp", "devices/simulator/device.h", True),
        ("kirra/image_stream.cpp", "tests/support/is_error.h", True),
        ("vantor_counters/a.cpp", "vantor_fault/fault_experiment.h", True),
        ("vantor_fault/a.cpp", "../devices/device.h", True),
        ("frame/host_interface.h", "frame/shared_helpers.h", True),
        ("host/zrlab/main.cpp", "vantor_counters/counter_report.h", True),
        ("host/record/run_record.cpp", "host/run/run_plan.h", True),
        ("host/report/text_report.cpp", "host/run/run_plan.h", True),
        ("host/run/run_plan.cpp", "devices/simulator/device.h", True),
        ("host/zrlab/main.cpp", "devices/device.h", False),
        ("host/store/sqlite/sqlite_database.cpp", "host/store/store.h", True),
        ("vantor_fault/a.cpp", "vantor_counters/counter_report.h", False),
        ("frame/plugin/registration.cpp", "kirra/image_experiment.h", False),
        ("kirra/image_stream.cpp", "vector", False),
    ]
    wrong = [case for case in cases if bool(forbidden(case[0], case[1])) != case[2]]
    for case in wrong:
        print("self-test:", case)
    with tempfile.TemporaryDirectory() as folder:
        stray = pathlib.Path(folder) / "attic"
        stray.mkdir()
        (stray / "old.cpp").write_text("")
        if len(check(pathlib.Path(folder))[1]) != 1:
            print("self-test: a folder without a row is not reported")
            return 1
    return 1 if wrong else 0


def main():
    if sys.argv[1:] == ["--self-test"]:
        return self_test()
    files, problems = check(pathlib.Path(sys.argv[1]))
    print("\n".join(problems) if problems else f"{files} files include what they may")
    return 1 if problems or files == 0 else 0


sys.exit(main())
