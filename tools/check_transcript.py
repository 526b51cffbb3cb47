#!/usr/bin/python3
"""Runs the commands on a page and compares what they print with what the page shows.

Exit status 1 and a difference for each that is not so. With --update, what the commands print is written
into the page.

All commands of the page run in one shell, in the folder HOME, for which ~ stands in what they print.
Run times, as in "0.02 s", are not compared. A block is
  sh          run; it must succeed, and the page does not show what it prints
  console     "$ COMMAND", then what the command prints on both streams; the next "$ COMMAND", and so on
  cpp, cmake  with --excerpts-of FOLDER: an excerpt of a file of that folder, at any indentation
Other blocks are not looked at.
"""

import argparse
import difflib
import os
import pathlib
import re
import subprocess
import sys
import textwrap

BLOCK = re.compile(r"^```(\w+)\n(.*?)^```$", re.MULTILINE | re.DOTALL)
END = "-- end of output --"


class Shell:
    """A shell whose folder and variables last from one command to the next."""

    def __init__(self):
        self.home = os.environ["HOME"]
        self.process = subprocess.Popen(["bash"], cwd=self.home, stdin=subprocess.PIPE, text=True,
                                        stdout=subprocess.PIPE, stderr=subprocess.STDOUT)

    def run(self, command):
        """What the command prints, and its exit status."""
        # Leaves $? to the next command as this one left it.
        self.process.stdin.write(f'{command}\nstatus=$?; echo "{END}$status"; (exit "$status")\n')
        self.process.stdin.flush()
        output = ""
        for line in self.process.stdout:
            line = line.replace(self.home, "~")
            if END in line:
                text, status = line.split(END)
                return output + text, int(status)
            output += line
        raise RuntimeError(f"the shell ended in: {command}")


def indented_alike(text):
    """The text without the differences that indentation and line breaks make."""
    return " ".join(text.split())


def timeless(text):
    return re.sub(r"\b\d+\.\d\d s\b", "0.00 s", text)


def console(shell, body):
    """The block as a run makes it: each command with what it prints now."""
    out = ""
    for line in body.splitlines():
        if line.startswith("$ "):
            out += line + "\n" + shell.run(line[2:])[0]
    return out


def main():
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("page", type=pathlib.Path)
    parser.add_argument("--excerpts-of", type=pathlib.Path, metavar="FOLDER")
    parser.add_argument("--update", action="store_true")
    arguments = parser.parse_args()
    page, folder = arguments.page, arguments.excerpts_of
    sources = folder and indented_alike(" ".join(
        file.read_text() for file in sorted(folder.iterdir()) if file.is_file()))
    problems = []
    ran = 0

    def check(match):
        nonlocal ran
        language, body = match.groups()
        if language == "sh":
            text, status = shell.run(body.rstrip().replace("\n", " &&\n"))
            if status != 0:
                problems.append(f"{body}{text}ended with {status}")
        elif language == "console":
            new = console(shell, body)
            ran += new.count("\n$ ") + 1
            if timeless(new) != timeless(body):
                problems.append("\n".join(difflib.unified_diff(
                    body.splitlines(), new.splitlines(), "the page", "a run", lineterm="")))
                return f"```{language}\n{new}```"
        elif language in ("cpp", "cmake") and folder and indented_alike(body) not in sources:
            problems.append(f"not in {folder}:\n{textwrap.indent(body, '  ')}")
        return match.group(0)

    shell = Shell()
    new = BLOCK.sub(check, page.read_text())
    shell.process.communicate()
    if arguments.update:
        page.write_text(new)
    print("\n".join(problems) if problems else f"{page.name}: {ran} commands print what it shows")
    return 1 if ran == 0 or (problems and not arguments.update) else 0


if __name__ == "__main__":
    sys.exit(main())
