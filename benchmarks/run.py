#!/usr/bin/env python3
"""Runs the benchmarks, compares the figures with the requirements, and returns the result as exit code.

DIRECTORY contains the benchmark programs, in a build directory. Every program runs its benchmarks several times, in
random order, so that other activity of the machine affects all of them alike; the medians are compared. A benchmark
without a figure counts as a missed requirement. Exit code 0: all requirements are met; 1: one is missed; 2: invalid
arguments.

--quick runs every benchmark once and briefly. It checks that each has a figure, but does not judge the figures, so it
works on any machine. Exit code 0: all have a figure; 1: one has none; 2: invalid arguments.
"""

import argparse
import json
import os
import subprocess
import sys

from isolation import check_isolation, measure as measure_isolation
from requirements import Figures, Requirements

FULL = ("--benchmark_repetitions=7", "--benchmark_enable_random_interleaving=true",
        "--benchmark_report_aggregates_only=true")
QUICK = ("--benchmark_min_time=0.001",)
# Executors that keep the order of all tasks, and lists of tasks with a single thread.
PEERS = ("asio strand", "asio pool", "tbb node")
LISTS = ("moodycamel bulk", "mutex queue")
RUN_LOOPS = (("wake_ups", "wake-ups of two threads by each other"), ("signals", "signals from another thread"),
             ("stopped_runs", "runs that a source stops"))
LINES = ("received frame", "event", "format index", "device supports", "session status")
# The variation between runs of two queues that use the same system call to wake a thread, in either direction.
WAKE_UP_NOISE = 1.10


class Programs:
    """Runs the benchmark programs of a directory; with `quick` once and briefly."""

    def __init__(self, directory, quick):
        self.directory = directory
        self.options = QUICK if quick else FULL
        self.kind = "iteration" if quick else "median"
        self.missing = []  # benchmarks that ended without a figure

    def run(self, program, *arguments):
        """The medians of a program's benchmarks by name; with --quick, their only figures."""
        print(f"running {program} ...", flush=True)
        command = [os.path.join(self.directory, program), *arguments]
        names = self.output([*command, "--benchmark_list_tests=true"]).split("\n")[:-1]
        output = self.output([*command, *self.options, "--benchmark_format=json"])
        figures = {}
        for entry in json.loads(output)["benchmarks"] if output else ():
            if self.kind in (entry["run_type"], entry.get("aggregate_name")) and not entry.get("error_occurred"):
                figures[entry["run_name"]] = entry
        self.missing += [f"{program}: {name}" for name in names if name not in figures] if names else [program]
        return figures

    def output(self, command):
        """The output of a command; None if it fails."""
        done = subprocess.run(command, stdout=subprocess.PIPE, text=True, check=False)
        if done.returncode != 0:
            print(f"{os.path.basename(command[0])} ended with exit code {done.returncode}")
            return ""
        return done.stdout


def check_serial_queue(requirements, medians):
    for threads in (1, 2):
        def rate(queue, threads=threads):
            return medians[f"throughput/{queue}/real_time/threads:{threads}"]["items_per_second"] / 1e6

        def against_peers(rate=rate):
            best = max(PEERS, key=rate)
            return rate("quazor") >= 3 * rate(best), f"{rate('quazor'):.1f} against {rate(best):.1f} ({best}) million/s"

        def against_lists(rate=rate):
            best = max(LISTS, key=rate)
            return rate("quazor") >= rate(best), f"{rate('quazor'):.1f} against {rate(best):.1f} ({best}) million/s"

        producers = f"{threads} producer{'s' if threads > 1 else ''}"
        requirements.check(f"serial queue, {producers}: three times the best peer", against_peers)
        requirements.check(f"serial queue, {producers}: no slower than moodycamel's in bulk, and than a mutex and a vector",
                           against_lists)

    def wake_up(queue, figure="median_ns"):
        return medians["wake_up/iterations:500"][f"{queue} {figure}"] / 1e3

    def against_best():
        best = min((*PEERS, *LISTS), key=wake_up)
        return (wake_up("quazor") <= WAKE_UP_NOISE * wake_up(best),
                f"{wake_up('quazor'):.2f} against {wake_up(best):.2f} us ({best})")

    def late_against_best():
        best = min(PEERS, key=lambda queue: wake_up(queue, "p99_ns"))
        return (wake_up("quazor", "p99_ns") <= 2 * wake_up(best, "p99_ns"),
                f"{wake_up('quazor', 'p99_ns'):.2f} against {wake_up(best, 'p99_ns'):.2f} us ({best})")

    requirements.check(f"wake-up of an idle queue: no slower than the best, within {WAKE_UP_NOISE:.2f}", against_best)
    requirements.check("wake-up of an idle queue, 99th percentile: at most twice the best executor", late_against_best)
    if "wake_up/iterations:500" in medians:
        for queue in ("quazor", *PEERS, *LISTS):
            print(f"        wake-up, {queue}: median {wake_up(queue):.2f} us, "
                  f"99th percentile {wake_up(queue, 'p99_ns'):.2f} us")


def check_run_loop(requirements, medians):
    for name, text in RUN_LOOPS:
        def against_glib(name=name):
            ours, glib = (medians[f"{name}/{loop}/real_time"]["items_per_second"] / 1e6 for loop in ("quazor", "glib"))
            return ours >= 1.5 * glib, f"{ours:.3f} against {glib:.3f} million/s"

        requirements.check(f"run loop, {text}: one and a half times GLib", against_glib)


def check_log(requirements, medians):
    def disabled():
        line, empty = (medians[f"log/{name}"]["cpu_time"] for name in ("disabled line", "empty call"))
        return line <= 2 * empty, f"{line:.2f} against {empty:.2f} ns"

    requirements.check("a disabled log line: at most twice an empty call", disabled)


def check_messages(requirements, medians):
    for name in LINES:
        def against_libfmt(name=name):
            ours, libfmt, compiled = (medians[f"message/{name}/{form}"]["cpu_time"]
                                      for form in ("quazor", "fmt::format", "FMT_COMPILE"))
            return ours <= libfmt, f"{ours:.1f} against {libfmt:.1f} ns (with FMT_COMPILE {compiled:.1f})"

        requirements.check(f"message \"{name}\": no slower than fmt::format", against_libfmt)


def check_sensor_images(requirements, medians):
    def against_copy():
        read, copy = (medians[f"record/{name}"]["cpu_time"] for name in ("read", "copy of 384 bytes"))
        return read <= 3 * copy, f"{read:.1f} against {copy:.1f} ns"

    requirements.check("reading an image record: at most three times a copy of what is kept", against_copy)
    key = "callback/iterations:10000"
    if key in medians:
        print(f"        report callback, until the experiment has its image: {medians[key]['cpu_time']:.1f} ns")


def check_load(requirements, medians):
    def more():
        plugin, empty = (medians[f"load/{name}/iterations:100/manual_time"]["real_time"]
                         for name in ("plug-in", "empty shared object"))
        return plugin - empty < 1000, f"{plugin:.0f} against {empty:.0f} us"

    requirements.check("loading the plug-in: less than 1 ms more than an empty shared object", more)


def check_pipeline(requirements, medians):
    def handler():
        entry = medians["handler/one behind the other/iterations:20000/manual_time"]
        return entry["p99_ns"] < 2000, f"median {entry['median_ns']:.0f} ns, 99th percentile {entry['p99_ns']:.0f} ns"

    def intake():
        entry = medians["intake/every millisecond/iterations:12000/manual_time"]
        off, on = (entry[f"{state}_p99_ns"] for state in ("off", "on"))
        return (on <= 1.05 * off, f"median {entry['off_median_ns']:.0f} / {entry['on_median_ns']:.0f} ns, "
                                  f"99th percentile {off:.0f} / {on:.0f} ns")

    def frames(pipeline):
        return medians[f"frames/{pipeline}/iterations:5/manual_time"]["items_per_second"] / 1e6

    def memory():
        entry = medians["memory/an hour of frames/iterations:1"]
        return entry["growth_kb"] <= 64, f"{entry['growth_kb']:.0f} KiB more than after five minutes"

    requirements.check("frame handler, all busy: 99th percentile under 2 us", handler)
    requirements.check("frame intake, not told and told to the record: 99th percentiles within 5 %", intake)
    requirements.check("frames through the pipeline: a million a second",
                       lambda: (frames("quazor") >= 1, f"{frames('quazor'):.2f} million/s"))
    requirements.check("frames through the pipeline: twice as many as on asio strands",
                       lambda: (frames("quazor") >= 2 * frames("asio strands"),
                                f"{frames('quazor'):.2f} against {frames('asio strands'):.2f} million/s"))
    requirements.check("an hour of frames: memory stays the same", memory)


def check_frame_trace(requirements, medians):
    def late():
        off, on = (medians[f"frames/trace {state}/iterations:5"] for state in ("off", "on"))
        return (on["p99_ns"] - off["p99_ns"] < 1000,
                f"median {off['median_ns']:.0f} / {on['median_ns']:.0f} ns, "
                f"99th percentile {off['p99_ns']:.0f} / {on['p99_ns']:.0f} ns")

    requirements.check("a frame that is told to the record or not: 99th percentiles within 1 us", late)


def check_channels(requirements, medians):
    def flat():
        costs = [medians[f"channels/{count}/manual_time"]["ns_per_channel"] for count in (60, 10_000, 1_000_000)]
        return max(costs) <= 2 * min(costs), " / ".join(f"{cost:.0f}" for cost in costs) + " ns"

    requirements.check("a report channel of 60, 10,000 and 1,000,000: costs the same within 2 times", flat)


def main():
    parser = argparse.ArgumentParser(usage="run.py [--quick] DIRECTORY PLUG-IN", description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--quick", action="store_true")
    parser.add_argument("directory")
    parser.add_argument("plugin")
    arguments = parser.parse_args()
    programs = Programs(arguments.directory, arguments.quick)
    empty = os.path.join(arguments.directory, "empty_shared_object.so")
    build = os.path.dirname(os.path.abspath(arguments.directory))
    results = (
        (check_serial_queue, programs.run("serial_queue_benchmark")),
        (check_run_loop, programs.run("run_loop_benchmark")),
        (check_log, programs.run("log_benchmark")),
        (check_messages, programs.run("message_format_benchmark")),
        (check_sensor_images, programs.run("sensor_images_benchmark")),
        (check_load, programs.run("load_benchmark", arguments.plugin, empty)),
        (check_pipeline, programs.run("projector_pipeline_benchmark")),
        (check_frame_trace, programs.run("frame_trace_benchmark")),
        (check_channels, programs.run("report_channels_benchmark")),
        (check_isolation, measure_isolation(build, arguments.quick)),
    )
    requirements = Figures() if arguments.quick else Requirements()
    for check, medians in results:
        check(requirements, medians)
    for name in programs.missing:
        requirements.miss(f"no figure of {name}")
    return requirements.exit_code()


if __name__ == "__main__":
    sys.exit(main())
