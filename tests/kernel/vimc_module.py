"""The kernel's virtual media controller (vimc), which the distribution's kernel leaves out: built once, and cached.

It is built as a module from the distribution's sources of the same kernel, with its headers. Nothing is installed.
"""

import pathlib
import re
import shutil
import subprocess
import tarfile
import tempfile

from kernel_package import KernelProblem, output_of

SOURCES = "drivers/media/test-drivers/vimc/"


def packages_of(kernel):
    """The packages for building modules for a kernel of the cache, as "name=version", and its release."""
    parts = re.fullmatch(r"linux-image-((\d+\.\d+)\S*?)(-[a-z0-9]+)_(\S+)", kernel.name)
    if parts is None:
        raise KernelProblem(f"{kernel.name} is not named like a kernel package of the distribution")
    base, series, flavour, version = parts.groups()
    names = (f"linux-source-{series}", f"linux-headers-{base}{flavour}", f"linux-headers-{base}-common",
             f"linux-kbuild-{series}")
    return [f"{name}={version}" for name in names], base + flavour


def unpack_sources(archive, target):
    """Unpacks vimc from the kernel's sources. The archive is sorted: what follows vimc is not read."""
    found = False
    with subprocess.Popen(["xz", "-dc", archive], stdout=subprocess.PIPE) as unpacking:
        with tarfile.open(fileobj=unpacking.stdout, mode="r|") as members:
            for member in members:
                _, _, name = member.name.partition("/")
                if name.startswith(SOURCES) and member.isfile():
                    found = True
                    (target / pathlib.Path(name).name).write_bytes(members.extractfile(member).read())
                elif found:
                    break
        unpacking.kill()
    if not found:
        raise KernelProblem(f"{archive.name} has no {SOURCES}")


def build_module(packages, release, scratch):
    """Downloads the packages, builds the module and returns its file."""
    output_of("apt-get", "download", "-q", *packages, cwd=scratch)
    root = scratch / "root"
    for package in scratch.glob("*.deb"):
        output_of("dpkg-deb", "-x", package, root)
    (archive,) = (root / "usr/src").glob("linux-source-*.tar.xz")
    sources = scratch / "vimc"
    sources.mkdir()
    unpack_sources(archive, sources)
    headers = root / "usr/src" / f"linux-headers-{release}"
    makefile = headers / "Makefile"
    makefile.write_text(makefile.read_text().replace("/usr/src/", f"{root}/usr/src/"))
    output_of("make", "-C", headers, f"M={sources}", "CONFIG_VIDEO_VIMC=m", "modules")
    output_of("strip", "--strip-debug", sources / "vimc.ko")
    return sources / "vimc.ko"


def find_vimc(kernel, say):
    """The module for a kernel of the cache, in the kernel's directory there."""
    module = kernel.image.parent / "built" / "vimc.ko"
    if module.is_file():
        return module
    packages, release = packages_of(kernel)
    say(f"Building vimc for {release} (once)")
    with tempfile.TemporaryDirectory(dir=kernel.image.parent) as scratch:
        built = build_module(packages, release, pathlib.Path(scratch))
        module.parent.mkdir(exist_ok=True)
        shutil.copy(built, module.with_suffix(".part"))
        module.with_suffix(".part").replace(module)
    return module
