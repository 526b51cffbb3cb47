#!/usr/bin/env python3
"""clang-tidy over the product's sources, as a build compiles them.

    tools/check_tidy.py BUILD      of a preset by clang++, built

What the build compiles at once is looked at at once: the headers are read once, in half of the time.
Prints what clang-tidy found, and fails if that is anything.
"""

import json
import os
import re
import subprocess
import sys
from concurrent.futures import ThreadPoolExecutor
from pathlib import Path

ROOT = Path(__file__).resolve().parent.parent
FOLDERS = ("platform", "frame", "vantor_counters", "vantor_fault", "kirra", "input", "devices", "host")
# The static analyzer takes most of the time, nearly all of it in long functions: it explores a third of the
# paths that it would by default.
ANALYZER = ("-analyzer-config", "max-nodes=75000")
SOURCE_OF_SEVERAL = re.compile(r'^#include "(/.*)"\n', re.MULTILINE)


def product_commands(build):
    """How the build compiles each source of the product. Tests compile some of them again, in their own way."""
    commands = {}
    for command in json.loads((build / "compile_commands.json").read_text()):
        target = re.search(r" -o (\S+)", command["command"]).group(1)
        if target.split("/")[0] in FOLDERS:
            commands[command["file"]] = command
    return list(commands.values())


def as_one_source(command, file):
    """The command for one source instead of one that includes several, which the analyzer would take for headers.
    The list tells of every line of the new source where it came from."""
    sources = SOURCE_OF_SEVERAL.findall(Path(command["file"]).read_text()) or [command["file"]]
    lines, origins = [], []
    for source in sources:
        of_source = Path(source).read_text().splitlines()
        lines += of_source
        origins += [(os.path.relpath(source, ROOT), number) for number in range(1, len(of_source) + 1)]
    file.write_text("\n".join(lines) + "\n")
    return {**command, "file": str(file), "command": command["command"].replace(command["file"], str(file))}, origins


def tidy(folder, file, origins):
    words = ["clang-tidy-14", "--quiet", "-p", folder, file]
    words += [f"--extra-arg={word}" for option in ANALYZER for word in ("-Xclang", option)]
    done = subprocess.run(words, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)
    text = re.sub(re.escape(str(file)) + r":(\d+)", lambda at: "{}:{}".format(*origins[int(at[1]) - 1]), done.stdout)
    return done.returncode, [line for line in text.splitlines() if not re.match(r"\d+ warnings? ", line)]


def main():
    if len(sys.argv) != 2 or not Path(sys.argv[1], "compile_commands.json").exists():
        sys.exit("check_tidy: wants the folder of a build")
    build = Path(sys.argv[1]).resolve()
    folder = build / "tidy"
    folder.mkdir(exist_ok=True)
    work = []
    for number, command in enumerate(product_commands(build)):
        file = folder / f"source_{number}.cpp"
        work.append((file, *as_one_source(command, file)))
    if not work:
        sys.exit(f"check_tidy: {build}: compiles no source of the product")
    (folder / "compile_commands.json").write_text(json.dumps([command for _, command, _ in work]))
    work.sort(key=lambda row: len(row[2]), reverse=True)  # so that no processor waits at the end
    failed = 0
    with ThreadPoolExecutor(os.cpu_count()) as pool:
        for status, lines in pool.map(lambda row: tidy(folder, row[0], row[2]), work):
            failed += status != 0
            print("\n".join(lines), end="\n" if lines else "", flush=True)
    if failed:
        sys.exit(f"check_tidy: {failed} of {len(work)} compilations have something to mend")
    print(f"{sum(len({name for name, _ in origins}) for _, _, origins in work)} sources, nothing to mend")


main()
