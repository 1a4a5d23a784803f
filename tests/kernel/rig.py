"""Boots a real kernel with the project, runs the steps and prints which passed. See README.md.

The steps are distributed over boots, and as many boots run at once as this computer has processors.
"""

import argparse
import concurrent.futures
import dataclasses
import os
import pathlib
import shutil
import sys
import threading
import time

from arrived import Arrived, CheckFailed
from guest_image import (BuildProblem, build, module_archive, plan_archive, project_archive, script_archive,
                         system_archive)
from kernel_package import KernelProblem, cache_directory, find_kernel
from machine import boot, command_of
from steps import STEPS, Step
from vimc_module import find_vimc

ROOT = pathlib.Path(__file__).resolve().parent.parent.parent
RELEASE = ("-DCMAKE_BUILD_TYPE=Release",)
SANITIZED = ("--preset", "sanitized")
MEMORY, SANITIZED_MEMORY = 512, 2048  # MiB
BOOT_SECONDS = 100  # of processor time, before a machine counts as hung
SANITIZED_SLOWNESS = 4

output_lock = threading.Lock()


def say(text):
    with output_lock:
        print(text, flush=True)


@dataclasses.dataclass
class Plan:
    """One boot: its name, its contents, its steps and their results."""

    name: str
    steps: list
    initramfs: bytes
    memory: int
    seconds: float
    slowness: float  # how many times as long its programs take as those of a release
    failed: list = dataclasses.field(default_factory=list)


def judge(step, arrived):
    """A sentence about what is wrong with a step; None if it passed."""
    try:
        arrived.holds_in_general()
        step.check(arrived)
    except CheckFailed as problem:
        return str(problem)
    except (KeyError, ValueError, IndexError, TypeError) as problem:
        return f"the report has not the expected form: {problem!r}"
    return None


def keep(arrived, directory):
    """Writes the files that a step sent."""
    for file, content in arrived.files.items():
        path = directory / arrived.name / file
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_bytes(content)


def indented(text):
    return "".join(f"        {line}\n" for line in text.splitlines())


def run_plan(plan, kernel, results):
    """Runs a boot to its end and reports the outcome of each step; a step that did not arrive has failed."""
    directory = results / plan.name
    shutil.rmtree(directory, ignore_errors=True)
    directory.mkdir(parents=True)
    initramfs = directory / "initramfs"
    initramfs.write_bytes(plan.initramfs)
    waiting = {step.name: step for step in plan.steps}
    ended = []
    last = time.monotonic()

    def take(parcel):
        nonlocal last
        seconds, last = time.monotonic() - last, time.monotonic()
        step = waiting.pop(parcel.name, None)
        if step is None:
            ended.append(parcel.name)
            return
        arrived = Arrived(parcel, plan.slowness)
        keep(arrived, directory)
        problem = judge(step, arrived)
        verdict = "FAIL" if problem else "pass"
        text = f"{verdict}  {seconds:5.1f} s  {plan.name}: {step.name}: {step.shows}\n"
        if problem:
            plan.failed.append(step.name)
            text += indented(problem + "\n" + parcel.text("log"))
        say(text.rstrip("\n"))

    command = command_of(kernel.image, initramfs, plan.memory, directory / "sent")
    outcome = boot(command, directory, plan.seconds, take)
    initramfs.unlink()
    for name in waiting:
        plan.failed.append(name)
        say(f"FAIL    -      {plan.name}: {name}: its closing line never came")
    if ended != ["end"] or outcome.damages or not outcome.ended:
        plan.failed.append("(the boot)")
        how = "ended by itself" if outcome.ended else f"did not end in {plan.seconds:g} s of processor time"
        say(f"FAIL  {outcome.seconds:5.1f} s  {plan.name}: the machine {how}; {'; '.join(outcome.damages)}\n"
            + indented("\n".join(outcome.console.read_text(errors="replace").splitlines()[-30:])))
    else:
        say(f"      {outcome.seconds:5.1f} s  {plan.name}: powered off")


def plans_of(steps, label, archives, memory, slowness):
    """One plan per boot that any of the steps needs."""
    plans = []
    for number in sorted({step.boot for step in steps}):
        chosen = [step for step in steps if step.boot == number]
        slowed = [dataclasses.replace(step, limit=step.limit * slowness) for step in chosen]
        initramfs = b"".join(archives) + plan_archive(slowed)
        plans.append(Plan(f"{label}-{number}", chosen, initramfs, memory, BOOT_SECONDS * slowness, slowness))
    return plans


def run_plans(plans, kernel, results):
    """Runs boots, several at once. Returns whether all of their steps passed."""
    with concurrent.futures.ThreadPoolExecutor(os.cpu_count()) as pool:
        for done in [pool.submit(run_plan, plan, kernel, results) for plan in plans]:
            done.result()
    return not any(plan.failed for plan in plans)


def chosen_steps(names, thorough):
    """The steps of these names, or all of them; the long ones only if asked for."""
    if names:
        return [step for step in STEPS if step.name in names]
    return [step for step in STEPS if thorough or not step.thorough]


def shell(command, directory, kernel):
    """Runs one command in a guest with all devices and prints its output; returns its exit code."""
    code = 1

    def take(parcel):
        nonlocal code
        if parcel.name == "shell":
            print(parcel.text("command.stdout"), end="")
            print(parcel.text("command.stderr"), end="", file=sys.stderr)
            code = int(parcel.text("command.exit") or 1)
            if "closed" not in parcel.files:
                print(parcel.text("log"), file=sys.stderr)

    script = "load_devices\ncat >/rig/command <<'END OF COMMAND'\n" + command + "\nEND OF COMMAND\n" \
             "run command sh -c '. /rig/library; . /rig/command'\n"
    step = Step("shell", "", None, limit=600)
    results = directory / "kernel-rig/shell"
    results.mkdir(parents=True, exist_ok=True)
    initramfs = results / "initramfs"
    initramfs.write_bytes(system_archive(kernel) + project_archive(directory) + script_archive("shell", script)
                          + plan_archive([step]))
    outcome = boot(command_of(kernel.image, initramfs, SANITIZED_MEMORY, results / "sent"), results, 600, take)
    if not outcome.ended or outcome.damages:
        print(outcome.console.read_text(errors="replace"), *outcome.damages, file=sys.stderr)
    return code


def arguments():
    parser = argparse.ArgumentParser(prog="tests/kernel/run",
                                     description="Runs the plug-ins on a real kernel, under emulation.")
    parser.add_argument("--build", type=pathlib.Path, default=ROOT / "build/release", metavar="DIR",
                        help="build directory of what is run (default: build/release)")
    parser.add_argument("--sanitized", type=pathlib.Path, metavar="DIR",
                        help="run the steps also with this build, made with address and undefined-behaviour sanitizers")
    parser.add_argument("--thorough", action="store_true", help="run the long steps, too")
    parser.add_argument("--no-build", action="store_true", help="take the builds as they are")
    parser.add_argument("--prepare", action="store_true", help="make everything that the steps need, and run none")
    parser.add_argument("--shell", metavar="COMMAND", help="run only this command in the guest, with all devices")
    parser.add_argument("--list", action="store_true", help="list the steps")
    parser.add_argument("steps", nargs="*", metavar="STEP", help="steps to run (default: all)")
    options = parser.parse_args()
    unknown = set(options.steps) - {step.name for step in STEPS}
    if unknown:
        parser.error(f"there is no step {', '.join(sorted(unknown))}; --list lists them")
    return options


def main():
    options = arguments()
    if options.list:
        print("\n".join(f"{step.name:32} {step.shows}{' (--thorough)' if step.thorough else ''}" for step in STEPS))
        return 0
    began = time.monotonic()
    directory = options.build.resolve()
    if not options.no_build:
        build(directory, *RELEASE)
        if options.sanitized:
            build(options.sanitized.resolve(), *SANITIZED)
    kernel = find_kernel(cache_directory(ROOT / "build"), say)
    if options.shell is not None:
        return shell(options.shell, directory, kernel)
    steps = chosen_steps(options.steps, options.thorough)
    vimc = find_vimc(kernel, say) if any(step.needs_vimc for step in steps) else None
    say(f"{kernel.name}; {time.monotonic() - began:.1f} s until here")
    if options.prepare:
        return 0
    if not options.steps and len(steps) < len(STEPS):
        left_out = ", ".join(step.name for step in STEPS if step not in steps)
        say(f"left out: {left_out} (--thorough runs them)")
    system = system_archive(kernel)
    if vimc is not None:
        system += module_archive(vimc)
    plans = plans_of(steps, "boot", [system, project_archive(directory)], MEMORY, 1)
    if options.sanitized:
        long = [step.name for step in steps if step.soak and step.name not in options.steps]
        if long:
            say(f"left out with sanitizers, where it takes minutes: {', '.join(long)} (name it to run it)")
        steps = [step for step in steps if step.name not in long]
        plans += plans_of(steps, "sanitized", [system, project_archive(options.sanitized.resolve())], SANITIZED_MEMORY,
                          SANITIZED_SLOWNESS)
    passed = run_plans(plans, kernel, directory / "kernel-rig")
    say(f"{'All steps passed' if passed else 'Not all steps passed'}; {time.monotonic() - began:.1f} s")
    return 0 if passed else 1


if __name__ == "__main__":
    try:
        sys.exit(main())
    except (BuildProblem, KernelProblem) as problem:
        print(problem, file=sys.stderr)
        sys.exit(1)
