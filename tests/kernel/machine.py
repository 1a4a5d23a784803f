"""A machine under emulation that boots a kernel, and what it sends back.

Guest time is counted in instructions (2 ns each) and waiting costs nothing: what happens in the guest does not depend
on how busy this computer is, and a sleep of the guest takes no time here. That asks for one processor and one thread.

The guest's processor makes random numbers (rdrand). Without it the kernel's are slow for the first seconds, and vivid,
which paints a line of noise before its first image, then takes longer for that than a frame may.
"""

import dataclasses
import os
import pathlib
import subprocess
import time

from parcels import ParcelReader

MACHINE = ("-accel", "tcg,thread=single", "-cpu", "qemu64,+rdrand", "-smp", "1", "-icount", "shift=1,sleep=off",
           "-nodefaults", "-no-reboot", "-display", "none", "-vga", "none", "-device", "bochs-display")
KERNEL_OPTIONS = "console=ttyS0 quiet panic=-1 printk.time=1"
LOOK_INTERVAL = 0.05  # seconds between two looks at what has come
PATIENCE = 10  # how much longer a machine may take than its processor time, on a computer that is busy


@dataclasses.dataclass
class Boot:
    """How a machine ended."""

    seconds: float  # of this computer's time
    ended: bool  # by itself, within the time it had
    damages: list  # of what it sent
    console: pathlib.Path  # a file with all that it printed


def command_of(kernel, initramfs, memory, sent):
    return ["qemu-system-x86_64", *MACHINE, "-m", str(memory), "-kernel", str(kernel), "-initrd", str(initramfs),
            "-append", KERNEL_OPTIONS, "-serial", "stdio", "-serial", f"file:{sent}"]


def boot(command, directory, seconds, take):
    """Runs a machine to its end, or kills it after so many seconds of processor time, or PATIENCE times as many of any.

    The machine sends to the file `directory`/sent. `take` is called with each Parcel as it comes, on this thread.
    """
    console = directory / "console.log"
    reader = ParcelReader()
    began = time.monotonic()
    (directory / "sent").write_bytes(b"")  # nothing of a run before this one may be read
    with open(console, "wb") as printed, open(directory / "sent", "rb") as sent:
        process = subprocess.Popen(command, stdin=subprocess.DEVNULL, stdout=printed, stderr=subprocess.STDOUT)
        try:
            ended = watch(process, sent, reader, seconds, take)
        finally:
            process.kill()
            process.wait()
    reader.finish()
    return Boot(time.monotonic() - began, ended, reader.damages, console)


def watch(process, sent, reader, seconds, take):
    """Hands on what comes until the process has ended (true) or time is over (false)."""
    deadline = time.monotonic() + seconds * PATIENCE
    while True:
        over = process.poll() is not None  # before the last look, so that nothing is left unread
        for parcel in reader.feed(sent.read()):
            take(parcel)
        if over:
            return True
        if time.monotonic() > deadline or processor_seconds(process.pid) > seconds:
            return False
        time.sleep(LOOK_INTERVAL)


def processor_seconds(process):
    """What a child has used so far; it may have ended, but nobody has waited for it."""
    fields = pathlib.Path(f"/proc/{process}/stat").read_text().rpartition(")")[2].split()
    return (int(fields[11]) + int(fields[12])) / os.sysconf("SC_CLK_TCK")
