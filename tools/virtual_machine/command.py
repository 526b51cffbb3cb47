"""Programs that the machine needs, and the one way in which it fails."""

import subprocess


class Failed(Exception):
    """Why the machine cannot be made or did not come to its end, in one line."""


def run(*command, **options):
    """What the program prints; Failed with the last line of its complaint when it is missing or does not succeed."""
    name = str(command[0])
    try:
        done = subprocess.run(list(map(str, command)), capture_output=True, check=False, **options)
    except FileNotFoundError as missing:
        raise Failed(f"{name} is not installed; tools/setup machine installs it") from missing
    if done.returncode != 0:
        complaint = done.stderr.decode(errors="replace").strip().splitlines() or ["no reason given"]
        raise Failed(f"{name} ended with status {done.returncode}: {complaint[-1]}")
    return done.stdout
