"""What the guest finds when it starts: one archive with busybox and drivers, one with the programs and the scenarios.
The kernel unpacks archives that follow each other into the same root, so the first is made once."""

import pathlib
import shutil
import stat
import tempfile

import kernel
from command import Failed, run

BUSYBOX = pathlib.Path("/bin/busybox")
DRIVERS = ("virtio_pci", "virtio_blk", "virtio-gpu", "vivid", "uvcvideo", "vhci-hcd", "uhid", "hid-generic", "dummy",
           "i2c-stub", "i2c-dev", "lm75")


def make_base(archive, kernel_folder):
    """Writes the archive of what does not change, unless it is there and newer than this file."""
    if archive.exists() and archive.stat().st_mtime > pathlib.Path(__file__).stat().st_mtime:
        return
    if not BUSYBOX.exists():
        raise Failed(f"{BUSYBOX} is missing; tools/setup machine installs it")
    version = kernel.version(kernel_folder)
    with tempfile.TemporaryDirectory(dir=archive.parent) as made:
        root = pathlib.Path(made)
        for folder in ("bin", "dev", "lib", "lib64", "proc", "results", "sys", "tmp"):
            (root / folder).mkdir()
        shutil.copy(BUSYBOX, root / "bin")
        for file in _driver_files(kernel_folder, version):
            place = root / file.relative_to(kernel_folder)
            place.parent.mkdir(parents=True, exist_ok=True)
            shutil.copy(file, place)
        for name in ("modules.order", "modules.builtin"):
            shutil.copy(kernel_folder / "lib" / "modules" / version / name, root / "lib" / "modules" / version)
        run("depmod", "-b", root, version)
        _archive(root, archive)


def _driver_files(kernel_folder, version):
    """The drivers and what they need."""
    run("depmod", "-b", kernel_folder, version)
    files = []
    for driver in DRIVERS:
        needed = run("modprobe", "-d", kernel_folder, "-S", version, "--show-depends", driver).decode()
        files += [pathlib.Path(line.split()[1]) for line in needed.splitlines() if line.startswith("insmod ")]
    return dict.fromkeys(files)


def make_overlay(archive, files):
    """Writes an archive of these files, given as path in the guest and file or text, with the shared libraries that the
    programs among them need."""
    with tempfile.TemporaryDirectory(dir=archive.parent) as made:
        root = pathlib.Path(made)
        for path, content in files.items():
            place = root / path
            place.parent.mkdir(parents=True, exist_ok=True)
            if isinstance(content, str):
                place.write_text(content)
                place.chmod(0o755)
                continue
            shutil.copy(content, place)
            if place.stat().st_mode & stat.S_IXUSR and place.read_bytes().startswith(kernel.ELF_BEGIN):
                _add_libraries(root, content)
        _archive(root, archive)


def _add_libraries(root, program):
    """All of them into /lib, where the loader looks; the loader itself to the place that programs name."""
    for line in run("ldd", program).decode().splitlines():
        words = line.split()
        if "not found" in line:
            raise Failed(f"{program}: {words[0]} is not found")
        library = next((word for word in words if word.startswith("/")), None)
        if library is not None:
            place = root / ("lib64" if words[0] == library else "lib") / pathlib.Path(library).name
            place.parent.mkdir(exist_ok=True)
            shutil.copy(library, place)


def _archive(root, archive):
    root.chmod(0o755)
    names = sorted(str(path.relative_to(root)) for path in root.rglob("*"))
    made = archive.with_suffix(".part")
    made.write_bytes(run("cpio", "--quiet", "-o", "-H", "newc", "-R", "0:0", cwd=root, input="\n".join(names).encode()))
    made.rename(archive)
