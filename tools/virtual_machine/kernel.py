"""Debian's kernel, downloaded and unpacked into a folder. It is never installed."""

import lzma
import pathlib
import re
import shutil
import tempfile

from command import Failed, run

DEPENDS_ON_KERNEL = "linux-image-amd64"
XZ_BEGIN = b"\xfd7zXZ\x00"
ELF_BEGIN = b"\x7fELF"


def fetch(folder):
    """Fills the folder, unless it is filled already: `vmlinux`, and the modules in `lib/modules/VERSION`."""
    if folder.exists():
        return
    folder.parent.mkdir(parents=True, exist_ok=True)
    made = pathlib.Path(tempfile.mkdtemp(dir=folder.parent))
    try:
        made.chmod(0o755)
        package = _download(made)
        run("dpkg-deb", "-x", package, made)
        compressed, = made.glob("boot/vmlinuz-*")
        (made / "vmlinux").write_bytes(_uncompressed(compressed.read_bytes()))
        package.unlink()
        made.rename(folder)
    finally:
        shutil.rmtree(made, ignore_errors=True)


def version(folder):
    return next((folder / "lib" / "modules").iterdir()).name


def _download(folder):
    """The package's file. The lists of packages are read anew and kept beside it: the machine's own may be old, and
    need root to be renewed."""
    for made in ("lists/partial", "archives/partial"):
        (folder / "apt" / made).mkdir(parents=True)
    options = ["-o", f"Dir::State::lists={folder}/apt/lists", "-o", f"Dir::Cache={folder}/apt",
               "-o", "APT::Sandbox::User=root", "-o", "APT::Update::Error-Mode=any"]
    try:
        run("apt-get", "-qq", *options, "update")
        depends = run("apt-cache", *options, "depends", "--important", DEPENDS_ON_KERNEL).decode()
        name = re.search(r"Depends: (\S+)", depends)
        if name is None:
            raise Failed(f"{DEPENDS_ON_KERNEL} depends on no package")
        run("apt-get", "-qq", *options, "download", name[1], cwd=folder)
    except Failed as failed:
        raise Failed(f"cannot download the kernel: {failed}") from failed
    finally:
        shutil.rmtree(folder / "apt")
    return next(folder.glob("*.deb"))


def _uncompressed(image):
    """The kernel inside a compressed one. The emulator boots it at once; unpacking itself would take it seconds."""
    at = image.find(XZ_BEGIN)
    while at >= 0:
        try:
            kernel = lzma.LZMADecompressor(lzma.FORMAT_XZ).decompress(image[at:])
        except lzma.LZMAError:
            kernel = b""
        if kernel.startswith(ELF_BEGIN):
            return kernel
        at = image.find(XZ_BEGIN, at + 1)
    raise Failed("the kernel's package holds no kernel that is compressed by xz")
