#!/usr/bin/python3
"""Drives zrlab in real shells on a terminal of its own: terminal_test.py ZRLAB BOARD-MODULE"""

import os
import pathlib
import subprocess
import sys
import tempfile
import unittest

import pexpect

ZRLAB, BOARD = (pathlib.Path(argument).resolve() for argument in sys.argv[1:])
PROGRESS = pathlib.Path(__file__).resolve().parents[2] / "tools" / "build_progress"

# What is typed before a tab, and the line after it.
COMPLETED = [
    ("zrlab ru", "zrlab run "),
    ("zrlab help devices", "zrlab help devices "),
    ("zrlab completion z", "zrlab completion zsh "),
    ("zrlab describe VantorFaultA", "zrlab describe VantorFaultAnalysis "),
    ("zrlab run VantorF", "zrlab run VantorFault"),
    ("zrlab run X --unt", "zrlab run X --until-fail "),
    ("zrlab run --format ju", "zrlab run --format junit "),
    ("zrlab run --format=ju", "zrlab run --format=junit "),
    ("zrlab run VantorFaultDiagnostic --set ti", "zrlab run VantorFaultDiagnostic --set timeout="),
    ("zrlab run VantorFaultDiagnostic --set=analysis:f",
     "zrlab run VantorFaultDiagnostic --set=analysis:frameCount="),
    ("zrlab run KirraImageExperiment --set timeout=1 --set i",
     "zrlab run KirraImageExperiment --set timeout=1 --set images="),
    ("zrlab run X --device counter-st", "zrlab run X --device counter-stuck "),
    ("zrlab run X --device=simulator:counter-st", "zrlab run X --device=simulator:counter-stuck "),
    ("zrlab run X --device sim", "zrlab run X --device simulator:"),
    (f"zrlab run X --device-module={BOARD} --device boa",
     f"zrlab run X --device-module={BOARD} --device board:"),
    (f"zrlab devices --device-module {BOARD}", f"zrlab devices --device-module {BOARD} "),
    ("zrlab run X --device my", "zrlab run X --device my\\ profile.json "),
    ('zrlab run X --output "my', 'zrlab run X --output "my profile.json" '),
    ("zrlab run X --output=fol", "zrlab run X --output=folder/"),
    ("zrlab run X --report ~/folder/in", "zrlab run X --report ~/folder/inner.json "),
    ("zrlab run X --device simulator:folder/in", "zrlab run X --device simulator:folder/inner.json "),
    ("zrlab run X --color nothing", "zrlab run X --color nothing"),
]

# Ctrl-G shows the line between angle brackets.
BASH = r"""bind -x '"\C-g": printf "\n<%s>\n" "$READLINE_LINE"'
bind 'set enable-bracketed-paste off'; bind 'set bell-style none'"""
ZSH = r"""show() { zle -I; print -r -- "<$BUFFER>" }; zle -N show; bindkey '^G' show; bindkey '^U' kill-whole-line
zstyle ':completion:*' rehash true; unsetopt beep; unset zle_bracketed_paste"""


class Shells(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.home = pathlib.Path(folder.name)
        (self.home / "folder").mkdir()
        (self.home / "my profile.json").touch()
        (self.home / "folder" / "inner.json").touch()

    def expect_completed(self, command, set_up, rows):
        environment = dict(os.environ, HOME=str(self.home), ZDOTDIR=str(self.home), TERM="xterm",
                           PATH=f"{ZRLAB.parent}:/usr/bin:/bin", PS1="ready> ")
        shell = pexpect.spawn(command, cwd=self.home, env=environment, dimensions=(50, 400),
                              encoding="utf-8", timeout=60)
        for line in [*set_up.splitlines(), "echo set''-up"]:
            shell.sendline(line)
        shell.expect_exact("set-up")
        for typed, line in rows:
            shell.send(typed + "\t\a")
            shell.expect(r"\n<(.*)>\r")
            with self.subTest(command=command, typed=typed):
                self.assertEqual(shell.match.group(1), line)
            shell.send("\x15")
        shell.close(force=True)

    def test_bash(self):
        self.expect_completed("bash --norc -i", "source <(zrlab completion bash)\n" + BASH, COMPLETED)

    def test_zsh(self):
        functions = self.home / "functions"
        functions.mkdir()
        with open(functions / "_zrlab", "w") as script:
            subprocess.run([ZRLAB, "completion", "zsh"], check=True, stdout=script)
        set_up = f"fpath=({functions} $fpath); autoload -Uz compinit; compinit -u\n" + ZSH
        self.expect_completed("zsh -f -i", set_up, COMPLETED)
        source = "source <(zrlab completion zsh)\n"
        self.expect_completed("zsh -f -i", source + ZSH, COMPLETED[:1])
        self.expect_completed("zsh -f -i", "autoload -Uz compinit; compinit -u\n" + source + ZSH,
                              COMPLETED[:1])


class StatusLine(unittest.TestCase):
    def test_is_cut_to_the_width(self):
        program = pexpect.spawn(
            str(ZRLAB), ["run", "VantorFaultDiagnostic", "--set", "frameCount=900", "--set", "timeout=60",
                         "--speed", "max"],
            env=dict(os.environ, TERM="xterm"), dimensions=(24, 30), encoding="utf-8", timeout=60)
        lines = [line for line in program.read().split("\r\x1b[K") if " of 900" in line]
        self.assertEqual({len(line) for line in lines}, {29}, lines)


class BuildProgress(unittest.TestCase):
    def progress(self, *lines):
        script = "".join(f"echo '{line}';" for line in lines) + "exit 3"
        done = subprocess.run([PROGRESS, "building", "/dev/null", "bash", "-c", script],
                              capture_output=True, text=True)
        self.assertEqual((done.returncode, done.stdout), (3, ""))
        return done.stderr.splitlines()

    def test_shows_every_tenth_of_what_there_is_to_build(self):
        self.assertEqual(self.progress(*(f"[{step}/40] Building {step}.o" for step in range(1, 41))),
                         [f"building {percent:3} %" for percent in (2, *range(10, 101, 10))])
        self.assertEqual(self.progress("[0/2] Re-checking globbed directories...", "no work to do"), [])


unittest.main(argv=sys.argv[:1])
