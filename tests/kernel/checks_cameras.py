"""Checks of the steps that stream cameras."""

from arrived import expect, expect_equal, underlying
from kernel_trace import read_trace

RATE = 30
PORTS = {  # of bindings/vivid.json: the name in measurements and the device's bus info
    "BackWide": "platform:vivid-000",
    "BackTele": "platform:vivid-001",
    "BackSuperWide": "platform:vivid-002",
    "Front": "platform:vivid-003",
    "FrontInfrared": "platform:vivid-004",
}
BACK = ("BackWide", "BackTele", "BackSuperWide")
FRONT = ("Front", "FrontInfrared")
CAPTURE, TELEMON = "QZCapturePlugInErrorDomain", "QZTelemonErrorDomain"
LINUX = "LinuxErrorDomain"
SYSTEM_CALL, NO_DEVICE, BUSY = 1, 2, 8


def frames_of(entry, camera):
    return int(entry["measurements"][f"{camera}.Frames"]["value"])


def offset_of(entry, camera):
    return int(entry["measurements"][f"{camera}.FrameOffset"]["value"])


def counters_of(entry, camera):
    return entry["auxiliaryData"]["ErrorCounters"][camera]


def expect_counters(entry, camera, **wanted):
    """The counters that are named are as wanted, all others 0."""
    counters = counters_of(entry, camera)
    expect(set(wanted) <= set(counters), f"{camera} has no counter {set(wanted) - set(counters)}")
    for name, count in counters.items():
        expect_equal(f"{name} of {camera}", count, wanted.get(name, 0))


def expect_frames(entry, cameras, seconds):
    for camera in cameras:
        frames = frames_of(entry, camera)
        expect(abs(frames - RATE * seconds) <= 1, f"{camera} has {frames} frames in {seconds} s at {RATE} a second")


def healthy_run(step, label, cameras, seconds):
    entry = step.passed(label)
    expect_frames(entry, cameras, seconds)
    for camera in cameras:
        expect_equal(f"the offset of {camera}", offset_of(entry, camera), 0)
        expect_counters(entry, camera)
    return entry


def healthy_again(step):
    expect_equal("what another user of the camera is told", step.text("next_free.stderr"), "")
    healthy_run(step, "next", FRONT, 2.015)


def as_the_kernel_counts(step, label, cameras):
    """Every camera's count is the number of buffers that were dequeued until it was read."""
    entry = healthy_run(step, label, cameras, 3.015)
    trace = read_trace(step.text(f"{label}.trace"))
    minors = dict(line.split() for line in step.text(f"{label}.minors").splitlines())
    moment = trace.end_of_silence()
    for camera in cameras:
        counted = trace.count_before(int(minors[PORTS[camera]]), moment)
        expect_equal(f"the frame count of {camera}", frames_of(entry, camera), counted)


def back_cameras(step):
    as_the_kernel_counts(step, "back", BACK)


def front_cameras(step):
    as_the_kernel_counts(step, "front", FRONT)


def delayed_start(step):
    entry = step.passed("late")
    offsets = {camera: offset_of(entry, camera) for camera in BACK}
    expect_equal("the offsets", offsets, {"BackWide": 0, "BackTele": 0, "BackSuperWide": 3})
    healthy_run(step, "punctual", BACK, 2.015)


def dropped_frames(step):
    some = step.passed("some")
    frames, gaps = frames_of(some, "Front"), counters_of(some, "Front")["SequenceGapCount"]
    expect(2 <= gaps <= 30, f"{gaps} of 60 frames are missing, with a chance of 20 %")
    expect(abs(frames + gaps - RATE * 2.015) <= 2, f"{frames} frames and {gaps} missing ones are not two seconds")
    expect_counters(some, "Front", SequenceGapCount=gaps)
    expect_counters(some, "FrontInfrared")
    expect(0 <= int(step.text("buffers")) - frames <= 1, f"the kernel counted {step.text('buffers').strip()}, not {frames}")
    expect_equal("the number of frames when all are dropped", frames_of(step.ran("all"), "Front"), 0)
    healthy_again(step)


def refused_start(call):
    def check(step):
        error = step.ended_in_error("refused", CAPTURE, 204)
        below = underlying(error)
        expect_equal("the cause", (below["domain"], below["code"]), (LINUX, SYSTEM_CALL))
        expect(below["message"].startswith(f"{call} on ") and "EINVAL" in below["message"],
               f"the cause does not name {call}: {below['message']}")
        healthy_again(step)
    return check


def disturbed(**counters):
    """The camera stopped half a second after it had begun; the other one did not."""
    def check(step):
        entry = step.passed("disturbed")
        expect_equal("the injection", step.exit_code("injection"), 0)
        frames = frames_of(entry, "Front")
        expect(10 <= frames <= 30, f"the camera has {frames} frames, and was stopped after half a second")
        expect_counters(entry, "Front", **counters)
        expect_frames(entry, ["FrontInfrared"], 2.015)
        expect_counters(entry, "FrontInfrared")
        healthy_again(step)
    return check


def damaged_buffer(step):
    entry = step.passed("disturbed")
    expect_equal("the injection", step.exit_code("injection"), 0)
    expect_counters(entry, "Front", BufferErrorCount=1)
    expect(abs(frames_of(entry, "Front") + 1 - RATE * 2.015) <= 1, "the damaged buffer is not one that is missing")
    expect(0 <= int(step.text("buffers")) - frames_of(entry, "Front") - 1 <= 1, "the kernel counted otherwise")
    healthy_again(step)


def unbind(step):
    entry = step.passed("disturbed")
    for camera in FRONT:
        expect(10 <= frames_of(entry, camera) <= 30, f"{camera} has {frames_of(entry, camera)} frames")
        expect_equal(f"DisconnectCount of {camera}", counters_of(entry, camera)["DisconnectCount"], 1)
    expect_equal("the verdict without cameras", step.ran("absent")["verdict"], "error")
    healthy_again(step)


def two_users(step):
    healthy_run(step, "first", FRONT, 3.015)
    entry = step.ran("second")
    expect_equal("the verdict of the second user", entry["verdict"], "error")
    expect("busy" in str(entry).lower(), "the second user is not told that the camera is busy")
    healthy_again(step)


def projector(step):
    entry = step.passed("lit")
    expect(entry["measurements"]["FrameCount"]["value"] >= 30, "there are too few frames")
    expect_equal("the number of judged results", len(entry["measuredResults"]), 64)
    expect_equal("the light while the stream ran", step.number("injection"), 1)
    expect_equal("the light after the stream", step.number("dark_after"), 0)


def projector_unlit(step):
    error = step.ended_in_error("unlit", CAPTURE, 206)
    expect(error["message"].endswith("is not illuminated for unknown reason!"), error["message"])
    healthy_again(step)


def projector_unsafe(step):
    error = step.ended_in_error("unsafe", CAPTURE, 213)
    expect(error["message"].endswith("is not illuminated for safety reason!"), error["message"])
    healthy_again(step)


def projector_killed(step):
    expect_equal("the light before the first kill", step.number("injection"), 1)
    expect_equal("the verdict of the killed diagnostic", step.ran("diagnostic_killed")["verdict"], "error")
    expect_equal("waiting for the dark", step.exit_code("dark_after_diagnostic"), 0)
    expect_equal("the light before the second kill", step.number("lit_before_kill"), 1)
    expect_equal("waiting for the dark", step.exit_code("dark_after_program"), 0)
    healthy_again(step)


def refused_qbuf_streaming(step):
    """One buffer could not be given back to the driver; the others go round."""
    entry = step.passed("disturbed")
    expect_equal("the injection", step.exit_code("injection"), 0)
    expect_frames(entry, FRONT, 2.015)
    expect_counters(entry, "Front", StreamErrorCount=1)
    expect_counters(entry, "FrontInfrared")
    healthy_again(step)
