#!/usr/bin/env python3
"""Which lines and branches of the platform and the plug-in the tests run. Every line that they do not run is
named, with the reason, in tests/coverage-exceptions.json.

    tools/check_coverage.py BUILD      of the preset asan, after its tests: they leave their counts there

Fails on a line that is not run and has no exception, on an exception whose line is run or is not there any
more, and when fewer than 95 % of a folder's branches are taken. The two ways out of a condition are two
branches.
"""

import collections
import json
import subprocess
import sys
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
FOLDERS = ("frame", "vantor_counters", "vantor_fault", "kirra", "platform")
EXCEPTIONS = ROOT / "tests/coverage-exceptions.json"
BRANCHES = 0.95


def merge(build):
    """One profile of what the tests kept; of programs that were built anew since, both would count."""
    profiles = sorted((build / "profiles").glob("*.profraw"))
    if not profiles:
        sys.exit(f"check_coverage: {build}/profiles: nothing there; run the tests of the preset asan first")
    merged = build / "profiles/merged.profdata"
    subprocess.run(["llvm-profdata-14", "merge", "-sparse", "-o", merged, *profiles], check=True)
    return merged


def export(build, profile):
    """What llvm-cov knows of the files of the folders."""
    programs = [build / "bin" / name for name in sorted({p.name.split(".")[0] for p in build.glob("profiles/*.profraw")})]
    programs += [*(build / "bin").glob("*.so"), *(build / "lib").glob("*.so")]
    objects = [word for program in programs for word in ("-object", program)][1:]
    files = [path for folder in FOLDERS for path in sorted((ROOT / folder).rglob("*"))
             if path.suffix in (".h", ".cpp")]
    text = subprocess.run(["llvm-cov-14", "export", f"-instr-profile={profile}", *objects, *files],
                          stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True, check=True).stdout
    return {str(Path(file["filename"]).relative_to(ROOT)): file for file in json.loads(text)["data"][0]["files"]}


def lines_not_run(file):
    """The numbers of the lines with code of which nothing ran.

    The space between statements counts as run or not, too (a gap); it is left out, since it is reported as
    not run after a block that can return."""
    counts = {}
    inside = None  # the count of the code that a line begins in
    line = 0
    for number, _, count, has_count, _, is_gap in file["segments"]:
        if inside is not None:
            for between in range(line + 1, number + 1):
                counts.setdefault(between, []).append(inside)
        inside = count if has_count and not is_gap else None
        line = number
        if inside is not None:
            counts.setdefault(number, []).append(inside)
    return [number for number, seen in sorted(counts.items()) if max(seen) == 0]


def branches_of(files):
    """Branches taken, and all: of a template's instances, what any of them took. A condition that was never
    reached is left out: the compiler decided it, or its line is reported."""
    taken = {}
    for name, file in files:
        for line, column, _, _, when_true, when_false, *_ in file["branches"]:
            ways = taken.setdefault((name, line, column), [False, False])
            ways[0] |= when_true > 0
            ways[1] |= when_false > 0
    reached = [ways for ways in taken.values() if any(ways)]
    return sum(map(sum, reached)), 2 * len(reached)


def sources_without_counts(files):
    """Those that define a function: of constants alone nothing is counted."""
    return [name for folder in FOLDERS for path in sorted((ROOT / folder).rglob("*.cpp"))
            if (name := str(path.relative_to(ROOT))) not in files and ") {" in path.read_text()]


def main():
    build = Path(sys.argv[1]).resolve()
    files = export(build, merge(build))
    problems = []
    exceptions = collections.Counter()  # a line that stands there twice has two entries
    for entry in json.loads(EXCEPTIONS.read_text()):
        exceptions[entry["file"], entry["line"]] += 1
        if not entry.get("reason"):
            problems.append(f"{EXCEPTIONS.name}: no reason: {entry['file']}: {entry['line']}")
    problems += [f"{name}: llvm-cov does not know it" for name in sources_without_counts(files)]
    used = collections.Counter()
    for name, file in files.items():
        text = (ROOT / name).read_text().splitlines()
        for number in lines_not_run(file):
            key = (name, text[number - 1].strip())
            used[key] += 1
            if used[key] > exceptions[key] and not set(key[1]) <= set("{}();"):
                problems.append(f"{name}:{number}: no test runs it, and it has no exception: {key[1]}")
    problems += [f"{EXCEPTIONS.name}: a test runs it now, or it is gone: {name}: {line}"
                 for name, line in (exceptions - used).elements()]
    for folder in FOLDERS:
        inside = [(name, file) for name, file in files.items() if name.startswith(folder + "/")]
        taken, branches = branches_of(inside)
        print(f"{folder:16} {sum(file['summary']['lines']['count'] for _, file in inside):5} lines, "
              f"{taken} of {branches} branches ({taken / branches:.1%})")
        if taken < BRANCHES * branches:
            problems.append(f"{folder}: {taken} of {branches} branches are taken, less than {BRANCHES:.0%}")
    print("\n".join(problems), file=sys.stderr)
    print(f"{exceptions.total()} lines are excepted" if not problems else f"{len(problems)} problems")
    sys.exit(1 if problems else 0)


main()
