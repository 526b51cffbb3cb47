#!/usr/bin/python3
"""How tools/virtual_machine/run fails, with an emulator that prints what it is told to."""

import contextlib
import io
import pathlib
import subprocess
import sys
import tempfile
import unittest

ROOT = pathlib.Path(__file__).resolve().parents[2]
TOOL = ROOT / "tools" / "virtual_machine"
sys.path.insert(0, str(TOOL))
import machine
from command import Failed


class Boot(unittest.TestCase):
    def boot(self, script, limit=60):
        """What the guest said, and the failure in one line."""
        said = []
        with tempfile.TemporaryDirectory() as made, contextlib.redirect_stderr(io.StringIO()):
            machine.EMULATOR = str(pathlib.Path(made) / "emulator")
            pathlib.Path(machine.EMULATOR).write_text(f"#!/bin/sh\n{script}\n")
            pathlib.Path(machine.EMULATOR).chmod(0o755)
            try:
                machine.boot("vmlinux", "initramfs", "disk", pathlib.Path(made) / "console", limit, said.append)
                failure = None
            except Failed as failed:
                failure = str(failed)
        return said, failure

    def test_ends_as_the_guest_does(self):
        panic = "[    1.0] Kernel panic - not syncing: No working init found."
        for script, limit, failure in [
            ("echo guest: start one; echo guest: end", 60, None),
            ("echo loading; exit 3", 60, "the guest ended too early, the emulator with status 3; its last line: loading"),
            (f"echo '{panic}'; echo rebooting; echo guest: end", 60,
             f"the guest ended too early, the emulator with status 0; its last line: {panic}"),
            ("echo loading; exec sleep 60", 0.3, "the guest did not end within 0.3 s; its last line: loading"),
        ]:
            with self.subTest(script):
                self.assertEqual(self.boot(script, limit)[1], failure)

    def test_tells_what_the_guest_says(self):
        self.assertEqual(self.boot("echo kernel; echo guest: start one; echo '[1.0] guest: end'"),
                         (["start one", "end"], None))


class Command(unittest.TestCase):
    def test_says_in_one_line_what_is_missing(self):
        for arguments, complaint in [
            (["--build", "/nowhere"], "virtual_machine: /nowhere/bin/zrlab is missing; build it first\n"),
            (["no-such"], 'virtual_machine: no scenario "no-such"; there are simulated-counters, '),
        ]:
            with self.subTest(arguments):
                done = subprocess.run([TOOL / "run", *arguments], capture_output=True, text=True, check=False)
                self.assertEqual((done.returncode, done.stdout, done.stderr.count("\n")), (2, "", 1))
                self.assertTrue(done.stderr.startswith(complaint), done.stderr)


if __name__ == "__main__":
    unittest.main()
