"""The current speed of this machine, to adjust the limits of tests that run beside other work."""

import time

WORK = 0.03  # seconds of processor time


def slowdown():
    """How many times longer work takes now than on an idle machine, at least 1. Times a short piece of work."""
    begin, used_before = time.monotonic(), time.thread_time()
    while time.thread_time() - used_before < WORK:
        pass
    return max(1.0, (time.monotonic() - begin) / WORK)
