"""Reads the kernel's trace of a run: dequeued buffers and writes of processes, in order of time."""

import dataclasses
import re

EVENT = re.compile(r"^ *.+-\d+ +\[\d+\] \S+ +(?P<time>\d+\.\d+): (?:v4l2_dqbuf: minor = (?P<minor>\d+),"
                   r".* timestamp = (?P<timestamp>\d+),.* sequence = (?P<sequence>\d+)$|sys_write\()", re.MULTILINE)


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
    writes: list  # times in seconds

    def end_of_silence(self):
        """The first write after the last long time without one, which is at least half of the longest. A program that
        sleeps while cameras stream writes nothing but that it is still running, every half minute, and writes again
        when it has read the results."""
        between = list(zip(self.writes, self.writes[1:]))
        longest = max(later - earlier for earlier, later in between)
        return [later for earlier, later in between if later - earlier >= longest / 2][-1]

    def dequeued_before(self, minor, moment):
        return [buffer for buffer in self.dequeued if buffer.minor == minor and buffer.time < moment]


def gaps_in(buffers):
    """The number of sequence numbers missing from the buffers of a node."""
    return sum(max(0, later.sequence - earlier.sequence - 1) for earlier, later in zip(buffers, buffers[1:]))


def read_trace(text):
    """Parses a trace file of tracefs."""
    dequeued, writes = [], []
    for event in EVENT.finditer(text):
        if event["minor"] is None:
            writes.append(float(event["time"]))
        else:
            numbers = (int(event[name]) for name in ("minor", "timestamp", "sequence"))
            dequeued.append(Dequeued(float(event["time"]), *numbers))
    return KernelTrace(dequeued, writes)
