"""Reads the kernel's trace of a run: dequeued buffers and writes of processes, in order of time."""

import dataclasses
import re

MOMENT = r"-\d+ +\[\d+\] \S+ +(?P<time>\d+\.\d+): "
DEQUEUED = re.compile(r"^ *.+" + MOMENT + r"v4l2_dqbuf: minor = (?P<minor>\d+),.* timestamp = (?P<timestamp>\d+),"
                      r".* sequence = (?P<sequence>\d+)$", re.MULTILINE)

# The process that runs the diagnostic. Others tell the user meanwhile that it is still running.
WRITTEN = re.compile(r"^ *quazor-guard" + MOMENT + r"sys_write\(", re.MULTILINE)


@dataclasses.dataclass(frozen=True)
class Dequeued:
    """A buffer that a process dequeued from a node."""

    time: float  # in seconds
    minor: int  # of the node
    timestamp: int  # set by the driver, in nanoseconds
    sequence: int


@dataclasses.dataclass(frozen=True)
class KernelTrace:
    dequeued: list  # of Dequeued
    writes: list  # times in seconds, of the process that runs the diagnostic

    def end_of_silence(self):
        """The first write after the longest time without one: a diagnostic sleeps while cameras stream, and writes again
        when it has read the results."""
        return max(zip(self.writes, self.writes[1:]), key=lambda pair: pair[1] - pair[0])[1]

    def dequeued_before(self, minor, moment):
        return [buffer for buffer in self.dequeued if buffer.minor == minor and buffer.time < moment]


def gaps_in(buffers):
    """The number of sequence numbers missing from the buffers of a node."""
    return sum(max(0, later.sequence - earlier.sequence - 1) for earlier, later in zip(buffers, buffers[1:]))


def read_trace(text):
    """Parses a trace file of tracefs."""
    dequeued = []
    for event in DEQUEUED.finditer(text):
        numbers = (int(event[name]) for name in ("minor", "timestamp", "sequence"))
        dequeued.append(Dequeued(float(event["time"]), *numbers))
    return KernelTrace(dequeued, [float(event["time"]) for event in WRITTEN.finditer(text)])
