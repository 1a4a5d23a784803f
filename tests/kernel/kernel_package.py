"""The distribution's kernel: downloaded as a package, never installed, and cached.

From each package the cache keeps the kernel in the form that boots fastest (vmlinux, not compressed) and the modules
that the rig loads, in loading order.
"""

import dataclasses
import json
import lzma
import os
import pathlib
import re
import shutil
import subprocess
import tempfile

META_PACKAGE = "linux-image-amd64"  # depends on the package of the newest kernel, whose name contains the version
# Groups of modules, which steps load separately.
MODULES = {
    "devices": ("hid-generic", "uhid", "bochs", "vivid"),
    "usb": ("vhci-hcd", "uvcvideo", "hid-generic", "usbhid"),
}
XZ_MAGIC = b"\xfd7zXZ\x00"


class KernelProblem(Exception):
    """The reason why there is no kernel, as a sentence."""


@dataclasses.dataclass(frozen=True)
class Kernel:
    name: str  # of the package, with its version
    image: pathlib.Path
    modules: dict  # for each group of MODULES the paths, each after its dependencies


def cache_directory(build):
    """The directory for packages: the user's cache, or else in the build."""
    home = os.environ.get("XDG_CACHE_HOME")
    return pathlib.Path(home) / "quazor-kernels" if home else build / "kernel-cache"


def kernel_of(directory):
    """The kernel in a directory of the cache; None if the directory is incomplete or of an earlier list of modules."""
    try:
        order = json.loads((directory / "modules.json").read_text())
    except FileNotFoundError:
        return None
    if {group: tuple(kept["wanted"]) for group, kept in order.items()} != MODULES:
        return None
    modules = {group: tuple(directory / "modules" / name for name in kept["files"]) for group, kept in order.items()}
    return Kernel(directory.name, directory / "vmlinux", modules)


def output_of(*command, **options):
    """The output of a command; raises KernelProblem with its error messages if it fails."""
    done = subprocess.run(command, capture_output=True, text=True, check=False, **options)
    if done.returncode != 0:
        raise KernelProblem(f"`{' '.join(map(str, command))}` failed: {(done.stderr or done.stdout).strip()}")
    return done.stdout


def newest_package():
    """The package of the newest kernel in the system's package lists, as "name=version"; None without lists."""
    depends = subprocess.run(["apt-cache", "depends", META_PACKAGE], capture_output=True, text=True, check=False).stdout
    name = re.search(r"Depends: (linux-image-\S+)", depends)
    if name is None:
        return None
    candidate = re.search(r"Candidate: (\S+)", output_of("apt-cache", "policy", name[1]))
    return f"{name[1]}={candidate[1]}"


def unpacked_image(compressed):
    """The kernel inside of a vmlinuz, whose payload is XZ data followed by other data."""
    content = compressed.read_bytes()
    start = content.find(XZ_MAGIC)
    if start < 0:
        raise KernelProblem(f"{compressed.name} holds no XZ payload, which this rig needs")
    return lzma.LZMADecompressor().decompress(content[start:])


def modules_in_order(root, release, wanted):
    """The files of modules and of their dependencies, in loading order."""
    order = []
    for module in wanted:
        lines = output_of("modprobe", "-d", root, "-S", release, "--show-depends", module).splitlines()
        for file in (line.split()[1] for line in lines if line.startswith("insmod ")):
            if file not in order:
                order.append(file)
    return [pathlib.Path(file) for file in order]


def extract(package, directory):
    """Fills a directory of the cache from a package file. Writes `modules.json` last, as the mark of completeness."""
    with tempfile.TemporaryDirectory(dir=directory.parent) as scratch:
        root = pathlib.Path(scratch)
        output_of("dpkg-deb", "-x", package, root)
        (compressed,) = (root / "boot").glob("vmlinuz-*")
        release = compressed.name.removeprefix("vmlinuz-")
        (directory / "modules").mkdir(parents=True, exist_ok=True)
        (directory / "vmlinux").write_bytes(unpacked_image(compressed))
        output_of("depmod", "-b", root, release)
        order = {}
        for group, wanted in MODULES.items():
            modules = modules_in_order(root, release, wanted)
            for module in modules:
                shutil.copy(module, directory / "modules")
            order[group] = {"wanted": wanted, "files": [module.name for module in modules]}
    (directory / "modules.json").write_text(json.dumps(order, indent=2) + "\n")


def download(package, cache):
    """Downloads a package file into the cache and fills the package's directory from it."""
    with tempfile.TemporaryDirectory(dir=cache) as scratch:
        output_of("apt-get", "download", "-q", package, cwd=scratch)
        (file,) = pathlib.Path(scratch).glob("*.deb")
        extract(file, cache / package.replace("=", "_"))


def newest_cached(cache):
    """The kernel most recently added to the cache; None if the cache is empty."""
    kernels = filter(None, map(kernel_of, cache.iterdir()))
    return max(kernels, key=lambda kernel: kernel.image.stat().st_mtime, default=None)


def find_kernel(cache, say):
    """The newest available kernel. Falls back to the cache, with a message, if nothing can be downloaded."""
    cache.mkdir(parents=True, exist_ok=True)
    package = newest_package()
    if package is None and newest_cached(cache) is None:
        say("Reading the package lists (apt-get update)")
        output_of("apt-get", "update", "-qq")
        package = newest_package()
    kernel = kernel_of(cache / package.replace("=", "_")) if package else None
    if kernel is None and package is not None:
        say(f"Fetching {package} (once)")
        try:
            download(package, cache)
            kernel = kernel_of(cache / package.replace("=", "_"))
        except KernelProblem as problem:
            say(str(problem))
    if kernel is None:
        kernel = newest_cached(cache)
        if kernel is None:
            raise KernelProblem(f"there is no kernel: {META_PACKAGE} is not known to apt-cache, or could not be fetched")
        say(f"Taking {kernel.name}, which is in the cache")
    return kernel
