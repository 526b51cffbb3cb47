"""The guest from its parts to what it brings back."""

import os
import pathlib
import shutil
import tarfile

import initramfs
import kernel
import machine
from command import Failed

HERE = pathlib.Path(__file__).resolve().parent
FOLDER = HERE.parent.parent / "build" / "virtual_machine"
RESULTS = FOLDER / "results"
DISK_BYTES = 1 << 28
TOOLS = ("v4l2-ctl", "i2cset")


def boot(build, programs, files, script, limit, follow):
    """Boots a guest with these programs of the build folder and these files, given as path in the guest and file or
    text. Runs the script in it and leaves in RESULTS what it wrote to /results. `limit` and `follow`: see
    machine.boot()."""
    overlay_files = {"init": HERE / "init", "scenario.sh": HERE / "scenario.sh", "scenarios": script, **files,
                     **_programs(build, programs)}
    kernel_folder = FOLDER / "kernel"
    kernel.fetch(kernel_folder)
    base = kernel_folder / "base.cpio"
    overlay, whole = (FOLDER / f"{name}.cpio" for name in ("overlay", "whole"))
    initramfs.make_base(base, kernel_folder)
    initramfs.make_overlay(overlay, overlay_files)
    whole.write_bytes(base.read_bytes() + overlay.read_bytes())
    disk = FOLDER / "results.disk"
    disk.unlink(missing_ok=True)
    with disk.open("wb"):
        os.truncate(disk, DISK_BYTES)
    machine.boot(kernel_folder / "vmlinux", whole, disk, FOLDER / "console.log", limit, follow)
    shutil.rmtree(RESULTS, ignore_errors=True)
    try:
        with tarfile.open(disk) as archive:
            archive.extractall(RESULTS)
    except tarfile.TarError as error:
        raise Failed(f"the guest brought nothing back: {error}") from error


def _programs(build, names):
    """By path in the guest, those of the build folder and those of this machine."""
    files = {}
    for name in names:
        file = build / "bin" / name
        if not file.exists():
            raise Failed(f"{file} is missing; build it first")
        files[f"bin/{name}"] = file
    for tool in TOOLS:
        file = shutil.which(tool, path=f"{os.environ['PATH']}:/usr/sbin")
        if file is None:
            raise Failed(f"{tool} is not installed; tools/setup machine installs it")
        files[f"bin/{tool}"] = pathlib.Path(file)
    return files
