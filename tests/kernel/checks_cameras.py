"""Checks of the steps that stream cameras."""

import json

from arrived import expect, expect_equal, underlying
from kernel_trace import gaps_in, read_trace

RATE = 30
PORTS = {  # of data/bindings/vivid.json: the camera's name in measurements and the bus info of the device
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
SYSTEM_CALL, NO_DEVICE, BUSY, DEVICE_GONE = 1, 2, 8, 9
SINGLE_CAMERA, NOT_STARTED = "SingleCameraErrorDomain", 5
HOST, NO_ERROR_GIVEN = "QuazorHostErrorDomain", 1


def frames_of(entry, camera):
    return int(entry["measurements"][f"{camera}.Frames"]["value"])


def offset_of(entry, camera):
    return int(entry["measurements"][f"{camera}.FrameOffset"]["value"])


def counters_of(entry, camera):
    return entry["auxiliaryData"]["ErrorCounters"][camera]


def expect_counters(entry, camera, **wanted):
    """Checks that the given counters have these values and all others are 0."""
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
    expect_equal("the exit code of another user of the camera", step.exit_code("next_free"), 0)
    healthy_run(step, "next", FRONT, 2.015)


def as_the_kernel_counts(step, label, cameras, ports=PORTS, seconds=3.015):
    """Checks that the counts of every camera equal the number of buffers dequeued until they were read. `ports` has
    the bus info of each camera."""
    entry = healthy_run(step, label, cameras, seconds)
    trace = read_trace(step.text(f"{label}.trace"))
    minors = dict(line.split() for line in step.text(f"{label}.minors").splitlines())
    moment = trace.end_of_silence()
    buffers = {camera: trace.dequeued_before(int(minors[ports[camera]]), moment) for camera in cameras}
    master = buffers[cameras[0]][0].timestamp
    for camera in cameras:
        expect_equal(f"the frame count of {camera}", frames_of(entry, camera), len(buffers[camera]))
        gaps = counters_of(entry, camera)["SequenceGapCount"]
        expect_equal(f"SequenceGapCount of {camera}", gaps, gaps_in(buffers[camera]))
        offset = round((buffers[camera][0].timestamp - master) * RATE / 1e9)
        expect_equal(f"the offset of {camera}", offset_of(entry, camera), offset)


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
    # No gap ends those that are dropped last: of six in a row, with a chance of 0.006 %, each is missing here too.
    expect(-7 <= frames + gaps - RATE * 2.015 <= 2, f"{frames} frames and {gaps} missing ones are not two seconds")
    expect_counters(some, "Front", SequenceGapCount=gaps)
    expect_counters(some, "FrontInfrared")
    buffers = int(step.text("buffers"))
    expect(0 <= buffers - frames <= 1, f"the kernel counted {buffers} buffers, not {frames}")
    step.ended_in_error("all", HOST, NO_ERROR_GIVEN)  # without any frame there is no result and no error of the plug-in
    healthy_again(step)


def expect_not_controlled(step, label, code, words):
    """Checks that the cameras were not available and that the diagnostic logged the reason."""
    step.ended_in_error(label, CAPTURE, 214, "Failed to synchronize cameras!")
    log = " ".join(line["text"] for line in step.ran(label)["log"])
    expect(f"{LINUX} code {code}:" in log and words in log, f"the log does not say why: {log}")


def selftest_cameras(step):
    expect_equal("the errors of the self-test", step.text("selftest.stderr"), "")
    expect_equal("the exit code of the self-test", step.exit_code("selftest"), 0)
    document = json.loads(step.out("selftest"))
    # By the profile strict, one frame more or less on a real kernel is a false alarm.
    found = {phone["phone"].rpartition("/")[2]: (phone["kind"], phone["default"]["detected"])
             for phone in document["phones"]}
    expect_equal("what the self-test finds", found, {"healthy.json": ("healthy", 0), "start_late.json": ("faulty", 0),
                                                     "start_refused.json": ("faulty", 1), "never_stops.json": ("faulty", 0)})
    fired = [row["faultsFired"] for row in document["rows"]]
    expect_equal("how often each fault fired", fired, [[], [1], [1], [1]])
    expect("FrontInfrared.FrameOffset is 3" in " ".join(document["phones"][1]["default"]["reasons"]),
           f"the blind spot has no reason: {document['phones'][1]}")
    expect("By default: 1 of 1 fault detected, 0 blind spots, 0 false alarms\n" in step.out("matrix"),
           f"the matrix is {step.out('matrix')}")


def single_camera_faults(step):
    entry = step.ran("clock_beyond")
    failed = {result["name"] for result in entry["measuredResults"] if result["verdict"] == "fail"}
    expect_equal("what fails with a clock beyond a century", failed, {"FrameRate", "BackwardTimeStamps"})
    # The numbers of the frames begin again at 0; none is missing.
    results = {result["name"]: result["value"] for result in step.passed("wrapped_sequence")["measuredResults"]}
    expect_equal("the missing numbers", results["Errors.SequenceGapCount"], 0)
    numbers = [buffer.sequence for buffer in read_trace(step.text("wrapped_sequence.trace")).dequeued]
    expect(numbers[0] > numbers[-1], f"the frames are numbered from {numbers[0]} to {numbers[-1]}: nothing wraps")
    expect_equal("the errors of the self-test", step.text("selftest.stderr"), "")
    expect_equal("the exit code of the self-test", step.exit_code("selftest"), 0)
    found = {phone["phone"].rpartition("/")[2].removesuffix(".json"): phone["default"]["detected"]
             for phone in json.loads(step.out("selftest"))["phones"] if phone["kind"] == "faulty"}
    refused = ("control_refused", "rate_refused", "start_refused", "never_stops", "counters_unreadable")
    expect_equal("the faults that are detected", found, dict.fromkeys(refused, 1))


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
    """Checks that the camera stopped half a second after its start and that the other one did not."""
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
    expect_equal("the unbinding", step.exit_code("injection"), 0)
    for camera in BACK:
        expect(10 <= frames_of(entry, camera) <= 30, f"{camera} has {frames_of(entry, camera)} frames")
        expect_counters(entry, camera, DisconnectCount=1)
    expect_not_controlled(step, "absent", NO_DEVICE, "there is none")
    below = underlying(step.ended_in_error("uncounted", CAPTURE, 210))
    expect_equal("the cause with an unreadable counter", (below["domain"], below["code"]), (LINUX, DEVICE_GONE))
    healthy_again(step)


def two_users(step):
    healthy_run(step, "first", FRONT, 3.015)
    expect_not_controlled(step, "second", BUSY, "FrontFacingCamera")
    healthy_again(step)


def media_controller(step):
    linked = step.passed("linked")
    frames = next(result["value"] for result in linked["measuredResults"] if result["name"] == "Frames")
    expect(frames >= 140, f"there are only {frames} frames in 3 s at 50 a second")
    expect(0 <= int(step.text("buffers")) - frames <= 1, f"the kernel counted {step.text('buffers')} buffers")
    for label in ("bare_before", "bare_after"):  # its own links and formats do not fit together, before and after
        below = underlying(step.ended_in_error(label, SINGLE_CAMERA, NOT_STARTED))
        expect_equal("the cause", (below["domain"], below["code"]), (LINUX, SYSTEM_CALL))
        expect("EPIPE" in below["message"] and '"media"' in below["message"], below["message"])
    step.passed("again")
    for way in ('"Sensor A"', '"Sensor B"', '"RGB/YUV Input", "Scaler"'):
        expect(f"through a media controller, from {way};" in step.out("probe"), f"the probe finds no way from {way}")
    as_probed = step.ran("as_probed")
    expect(as_probed["error"] is None, f"what was probed does not run: {as_probed['error']}")
    for camera in range(3):
        step.passed(f"probed_{camera}")


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
    """One buffer could not be returned to the driver; the others circulate."""
    entry = step.passed("disturbed")
    expect_equal("the injection", step.exit_code("injection"), 0)
    expect_frames(entry, FRONT, 2.015)
    expect_counters(entry, "Front", StreamErrorCount=1)
    expect_counters(entry, "FrontInfrared")
    healthy_again(step)
