"""Reads what the kernel traced of a run: buffers that were dequeued, and writes of processes, in the order of time."""

import dataclasses
import re

EVENT = re.compile(r"^ *.+-\d+ +\[\d+\] \S+ +(?P<time>\d+\.\d+): (?:v4l2_dqbuf: minor = (?P<minor>\d+),"
                   r".* timestamp = (?P<timestamp>\d+),.* sequence = (?P<sequence>\d+)$|sys_write\()", re.MULTILINE)


@dataclasses.dataclass(frozen=True)
class Dequeued:
    """A buffer that a process took from a node."""

    time: float  # in seconds
    minor: int  # of the node
    timestamp: int  # that the driver gave the buffer, in nanoseconds
    sequence: int


@dataclasses.dataclass(frozen=True)
class KernelTrace:
    dequeued: list  # of Dequeued
    writes: list  # times in seconds

    def end_of_silence(self):
        """The first write after the longest time without any. A program that sleeps while cameras stream is silent, and
        says so when it has looked what came of them."""
        between = zip(self.writes, self.writes[1:])
        return max(between, key=lambda pair: pair[1] - pair[0])[1]

    def dequeued_before(self, minor, moment):
        return [buffer for buffer in self.dequeued if buffer.minor == minor and buffer.time < moment]


def gaps_in(buffers):
    """How many sequence numbers are missing between those of a node's buffers."""
    return sum(max(0, later.sequence - earlier.sequence - 1) for earlier, later in zip(buffers, buffers[1:]))


def read_trace(text):
    """The trace of a file as tracefs gives it."""
    dequeued, writes = [], []
    for event in EVENT.finditer(text):
        if event["minor"] is None:
            writes.append(float(event["time"]))
        else:
            numbers = (int(event[name]) for name in ("minor", "timestamp", "sequence"))
            dequeued.append(Dequeued(float(event["time"]), *numbers))
    return KernelTrace(dequeued, writes)
