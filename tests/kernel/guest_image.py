"""The contents of a guest: busybox, the kernel's modules, the installed project and the steps to run."""

import json
import os
import pathlib
import shutil
import subprocess
import tempfile

from initramfs import Archive, add_program

HERE = pathlib.Path(__file__).resolve().parent
TARGETS = ("quazor_program", "camera_sensor_diagnostics", "sensor_images", "single_camera",
           "kernel_guest_programs")
GUEST_PROGRAMS = "tests/kernel"  # the build directory of the programs for the rig

# Five cameras with one input each and a metadata node. Their node numbers are not in order, because nothing may depend
# on the numbers.
CAMERAS = 5
VIVID_OPTIONS = {
    "n_devs": [CAMERAS],
    "node_types": ["0x20001"] * CAMERAS,
    "num_inputs": [1] * CAMERAS,
    "input_types": [0] * CAMERAS,
    "vid_cap_nr": [3, 7, 1, 6, 2],
    "meta_cap_nr": [14, 11, 17, 12, 15],
}


class BuildProblem(Exception):
    """The reason why there is nothing to run, as a sentence."""


def checked(*command):
    done = subprocess.run(command, capture_output=True, text=True, check=False)
    if done.returncode != 0:
        raise BuildProblem(f"`{' '.join(map(str, command))}` failed:\n{done.stdout}{done.stderr}")


def build(directory, *options):
    """Configures a build if there is none, and builds everything that the guest needs."""
    if not (directory / "build.ninja").is_file():
        checked("cmake", "-S", HERE.parent.parent, "-B", directory, "-G", "Ninja", *options)
    checked("cmake", "--build", directory, "--target", *TARGETS)


def system_archive(kernel):
    """The common part of all runs: busybox, the test of video drivers and the modules, as bytes."""
    archive = Archive()
    busybox = pathlib.Path(shutil.which("busybox"))
    archive.add_file("/bin/busybox", busybox)
    for name in subprocess.run([busybox, "--list"], capture_output=True, text=True, check=True).stdout.split():
        if name != "busybox":
            archive.add_link(f"/bin/{name}", "busybox")
    add_program(archive, "/usr/bin/v4l2-compliance", pathlib.Path(shutil.which("v4l2-compliance")))
    for directory in ("/proc", "/sys", "/dev", "/tmp", "/run", "/rig/out", "/rig/sanitizer"):
        archive.add_directory(directory)
    archive.add_character_device("/dev/console", 5, 1)
    for group, modules in kernel.modules.items():
        for module in modules:
            archive.add_file(f"/rig/modules/{module.name}", module)
        archive.add(f"/rig/modules/{group}", "".join(f"{module.name}\n" for module in modules).encode(), 0o644)
    options = " ".join(f"{name}={','.join(map(str, values))}" for name, values in VIVID_OPTIONS.items())
    archive.add("/rig/vivid_options", options.encode(), 0o644)
    return archive.bytes()


def module_archive(module):
    """A module that a step loads itself, as bytes."""
    archive = Archive()
    archive.add_file(f"/rig/modules/{module.name}", module)
    return archive.bytes()


def project_archive(directory):
    """The project of a build as installed under /usr, the rig's own programs and the steps, as bytes."""
    archive = Archive()
    programs = [path for path in sorted((directory / GUEST_PROGRAMS).glob("*")) if path.is_file() and os.access(path, os.X_OK)]
    if not programs:
        raise BuildProblem(f"{directory} has no programs for the guest: run without --no-build")
    with tempfile.TemporaryDirectory() as scratch:
        for component in ("program", "plugins"):
            checked("cmake", "--install", directory, "--prefix", scratch, "--component", component)
        add_installed(archive, pathlib.Path(scratch))
    for program in programs:
        add_program(archive, f"/usr/bin/{program.name}", program)
    archive.add("/rig/channels", channels_of(HERE.parent.parent / "data/scenarios/healthy.json").encode(), 0o644)
    archive.add("/etc/passwd", b"root::0:0::/:/bin/sh\nnobody::65534:65534::/:/bin/sh\n", 0o644)
    archive.add_file("/init", HERE / "guest/init")
    for file in ("library", "step", "usb_projector.json"):
        archive.add_file(f"/rig/{file}", HERE / "guest" / file)
    for script in sorted((HERE / "guest/steps").glob("*.sh")):
        archive.add_file(f"/rig/steps/{script.stem}", script)
    return archive.bytes()


def channels_of(scenario):
    """The report channels of a simulated phone, one line GROUP/SUBGROUP/NAME each."""
    groups = json.loads(scenario.read_text())["reports"]
    return "".join(f"{group}/{subgroup}/{name}\n" for group, subgroups in groups.items()
                   for subgroup, names in subgroups.items() for name in names)


def add_installed(archive, prefix):
    """Programs, libraries and data of an installation, without documents."""
    for folder in ("bin", "lib"):
        for file in sorted((prefix / folder).rglob("*")):
            if file.is_symlink():
                archive.add_link(f"/usr/{file.relative_to(prefix)}", os.readlink(file))
            elif file.is_file():
                add_program(archive, f"/usr/{file.relative_to(prefix)}", file)
    archive.add_tree("/usr/share/quazor", prefix / "share/quazor", ".json")


def plan_archive(steps):
    """The names of the steps in order and their time limits in seconds of guest time, as bytes."""
    archive = Archive()
    archive.add("/rig/plan", "".join(f"{step.name} {step.limit}\n" for step in steps).encode(), 0o644)
    return archive.bytes()


def script_archive(name, text):
    """The script of a step that is generated for this run, as bytes."""
    archive = Archive()
    archive.add(f"/rig/steps/{name}", text.encode(), 0o644)
    return archive.bytes()
