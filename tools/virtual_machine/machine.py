"""Boots the guest and follows it to its end."""

import pathlib
import subprocess
import threading

from command import Failed

EMULATOR = "qemu-system-x86_64"
# The guest's clock counts its instructions, and time without any is skipped: no load of this machine makes the guest
# lose a frame. The disk holds what it brings back.
OPTIONS = ("-nodefaults -no-user-config -display none -no-reboot -machine pc -cpu max -smp 1 -m 256 "
           "-accel tcg,thread=single -icount shift=0,sleep=off -rtc clock=vm -device virtio-gpu-pci -serial stdio").split()
PARAMETERS = "console=ttyS0 quiet panic=-1 ipv6.disable=1"
SAID_BY_GUEST = "guest: "  # begins a line of the console that is not the kernel's
END = "end"


def boot(kernel, initramfs, disk, console, limit, follow):
    """Runs the guest until it has switched itself off, at most `limit` seconds by this machine's clock. `follow` gets
    what the guest says as it comes, `console` is the file of all that it printed."""
    command = [EMULATOR, *OPTIONS, "-kernel", kernel, "-initrd", initramfs, "-append", PARAMETERS,
               "-drive", f"file={disk},format=raw,if=virtio"]
    try:
        guest = subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, stderr=subprocess.STDOUT)
    except FileNotFoundError as missing:
        raise Failed(f"{EMULATOR} is not installed; tools/setup machine installs it") from missing
    late = threading.Event()
    timer = threading.Timer(limit, lambda: (late.set(), guest.kill()))
    timer.start()
    try:
        last, ended = _read(guest.stdout, console, follow)
        status = guest.wait()
    finally:
        timer.cancel()
        guest.kill()
        guest.wait()
        guest.stdout.close()
    if late.is_set():
        raise Failed(f"the guest did not end within {limit:g} s; its last line: {last}")
    if not ended:
        raise Failed(f"the guest ended too early, the emulator with status {status}; its last line: {last}")


def _read(output, console, follow):
    """The last line, and whether the guest came to its end. A panic is the last line whatever follows."""
    last, panic, ended = "none", None, False
    with pathlib.Path(console).open("w") as copy:
        for raw in output:
            line = raw.decode(errors="replace").rstrip()
            print(line, file=copy, flush=True)
            if line and "reboot: Power down" not in line:
                last = line
            if "Kernel panic" in line:
                panic = line
            _, said, what = line.partition(SAID_BY_GUEST)
            if said:
                ended = what == END
                follow(what)
    return panic or last, ended and panic is None
