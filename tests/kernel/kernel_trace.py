"""Reads what the kernel traced of a run: buffers that were dequeued, and writes of processes, in the order of time."""

import dataclasses
import re

EVENT = re.compile(r"^ *(?P<task>.+)-(?P<process>\d+) +\[\d+\] \S+ +(?P<time>\d+\.\d+): (?P<what>v4l2_dqbuf: minor = (?P<minor>\d+)"
                   r"|sys_write\()", re.MULTILINE)


@dataclasses.dataclass(frozen=True)
class KernelTrace:
    dequeued: list  # (time in seconds, minor number of the node)
    writes: list  # times in seconds

    def end_of_silence(self):
        """The first write after the longest time without any. A program that sleeps while cameras stream is silent, and
        says so when it has looked what came of them."""
        between = zip(self.writes, self.writes[1:])
        return max(between, key=lambda pair: pair[1] - pair[0])[1]

    def count_before(self, minor, moment):
        return sum(1 for time, node in self.dequeued if node == minor and time < moment)


def read_trace(text):
    """The trace of a file as tracefs gives it."""
    dequeued, writes = [], []
    for event in EVENT.finditer(text):
        if event["minor"] is None:
            writes.append(float(event["time"]))
        else:
            dequeued.append((float(event["time"]), int(event["minor"])))
    return KernelTrace(dequeued, writes)
