#!/usr/bin/env python3
"""Tests of kernel_trace.py."""

import unittest

from kernel_trace import Dequeued, gaps_in, read_trace

TRACE = """\
# tracer: nop
#              | |         |   |||||     |         |
    quazor-guard-81      [000] .....     6.000100: sys_write(fd: 5, buf: 7ffd5c, count: 1f)
          poll-1-83      [000] .....     6.010000: v4l2_dqbuf: minor = 3, index = 0, timestamp = 6000000000, timecode = {}, sequence = 0
    quazor-guard-81      [000] .....     6.010500: sys_write(fd: 5, buf: 7ffd5c, count: 1f)
  poll:camera 2-84       [000] d..1.     6.043000: v4l2_dqbuf: minor = 7, index = 1, timestamp = 6000000000, timecode = {}, sequence = 0
          poll-1-83      [000] .....     6.044000: v4l2_dqbuf: minor = 3, index = 1, timestamp = 6033000000, timecode = {}, sequence = 1
    quazor-guard-81      [000] .....     9.000000: sys_write(fd: 5, buf: 7ffd5c, count: 20)
          poll-1-83      [000] .....     9.000001: v4l2_dqbuf: minor = 3, index = 2, timestamp = 6132000000, timecode = {}, sequence = 4
    quazor-guard-81      [000] .....     9.000200: sys_write(fd: 5, buf: 7ffd5c, count: 20)
"""


class KernelTraceTest(unittest.TestCase):
    def test_dequeued_buffers_are_told_for_each_node_until_a_moment(self):
        trace = read_trace(TRACE)
        self.assertEqual(trace.end_of_silence(), 9.0)
        first = [Dequeued(6.01, 3, 6000000000, 0), Dequeued(6.044, 3, 6033000000, 1)]
        last = Dequeued(9.000001, 3, 6132000000, 4)
        self.assertEqual(trace.dequeued_before(3, 9.0), first)
        self.assertEqual(trace.dequeued_before(3, 10.0), [*first, last])
        self.assertEqual(trace.dequeued_before(7, 9.0), [Dequeued(6.043, 7, 6000000000, 0)])
        self.assertEqual(trace.dequeued_before(4, 10.0), [])

    def test_what_another_process_writes_meanwhile_does_not_end_the_silence(self):
        writes = (("quazor-guard", "6.000000"), ("quazor", "36.500000"), ("quazor", "66.500000"),
                  ("quazor-guard", "66.500100"), ("quazor-guard", "66.600000"))
        trace = read_trace("".join(f"{name:>16}-81      [000] .....     {moment}: sys_write(fd: 5, buf: 7ffd5c, count: 1f)\n"
                                   for name, moment in writes))
        self.assertEqual(trace.end_of_silence(), 66.5001)

    def test_missing_sequence_numbers_are_gaps(self):
        trace = read_trace(TRACE)
        self.assertEqual([gaps_in(trace.dequeued_before(3, moment)) for moment in (6.0, 6.02, 9.0, 10.0)], [0, 0, 0, 2])

    def test_a_trace_without_writes_has_no_end_of_silence(self):
        with self.assertRaises(ValueError):
            read_trace("").end_of_silence()


if __name__ == "__main__":
    unittest.main()
