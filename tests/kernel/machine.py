"""An emulated machine that boots a kernel, and the data that it sends back.

Guest time is derived from the number of instructions (2 ns each) and waiting is skipped: the guest does not depend on
the load of this computer, and a sleep of the guest takes no time here. That requires one processor and one thread.

The guest's processor provides random numbers (rdrand). Without it the kernel's are slow during the first seconds, and
vivid, which draws a line of noise before its first image, then needs more than a frame's time for that.
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
LOOK_INTERVAL = 0.05  # seconds between two checks for new data
PATIENCE = 10  # on a busy computer a machine may take this many times its processor time


@dataclasses.dataclass
class Boot:
    """The outcome of a machine's run."""

    seconds: float  # of this computer's time
    ended: bool  # it ended by itself and in time
    damages: list  # damage to the received data
    console: pathlib.Path  # a file with the console output


def command_of(kernel, initramfs, memory, sent):
    return ["qemu-system-x86_64", *MACHINE, "-m", str(memory), "-kernel", str(kernel), "-initrd", str(initramfs),
            "-append", KERNEL_OPTIONS, "-serial", "stdio", "-serial", f"file:{sent}"]


def boot(command, directory, seconds, take):
    """Runs a machine to its end, or kills it after so many seconds of processor time or PATIENCE times as many seconds.

    The machine sends to the file `directory`/sent. Calls `take` on this thread with each Parcel that arrives.
    """
    console = directory / "console.log"
    reader = ParcelReader()
    began = time.monotonic()
    (directory / "sent").write_bytes(b"")  # discards the data of an earlier run
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
    """Passes on arriving data until the process has ended (True) or the time is over (False)."""
    deadline = time.monotonic() + seconds * PATIENCE
    while True:
        over = process.poll() is not None  # before the last read, so that no data is left unread
        for parcel in reader.feed(sent.read()):
            take(parcel)
        if over:
            return True
        if time.monotonic() > deadline or processor_seconds(process.pid) > seconds:
            return False
        time.sleep(LOOK_INTERVAL)


def processor_seconds(process):
    """The processor time of a child, which may have ended but must not have been waited for."""
    fields = pathlib.Path(f"/proc/{process}/stat").read_text().rpartition(")")[2].split()
    return (int(fields[11]) + int(fields[12])) / os.sysconf("SC_CLK_TCK")
