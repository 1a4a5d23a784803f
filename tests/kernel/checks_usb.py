"""Checks of the steps with USB cameras and sensors."""

import itertools
import json
import re

import checks_cameras as cameras
import checks_sensors as sensors
from arrived import expect, expect_equal, underlying
from kernel_trace import gaps_in, read_trace

RATE, SECONDS = 30, 2
SECONDS_OF_PROJECTOR = 3  # after which a run of the projector's diagnostic stops
BUSES = [f"usb-vhci_hcd.0-{number}" for number in range(1, 6)]  # of the cameras, in the order in which they are connected
NAMES = {  # of measurements, by port
    "BackFacingCamera": "BackWide",
    "BackFacingTelephotoCamera": "BackTele",
    "BackFacingSuperWideCamera": "BackSuperWide",
    "FrontFacingCamera": "Front",
    "FrontFacingInfraredCamera": "FrontInfrared",
}
SINGLE, CONTROL_REFUSED, NOT_STARTED, NOT_STOPPED = "SingleCameraErrorDomain", 3, 5, 6
ANSWER = 6  # seconds, for which the kernel waits at most for an answer of a device
EXPOSURE_NOT_SET = 211  # of cameras.CAPTURE
NOT_SUPPORTED = 5  # of cameras.LINUX
# The tests of v4l2-compliance that fail with the stock driver whatever the camera does, and what each says.
KNOWN_FAILURES = {
    # The driver refuses an exposure time while the exposure is automatic.
    "VIDIOC_G/S_CTRL": "s_ctrl returned an error (13)",
    "VIDIOC_G/S/TRY_EXT_CTRLS": "s_ext_ctrls returned an error (13)",
    # The driver's own name for the format NV12.
    "VIDIOC_ENUM_FMT/FRAMESIZES/FRAMEINTERVALS": "fmtdesc.description mismatch: was 'Y/UV 4:2:0', expected 'Y/CbCr 4:2:0'",
    # The driver starts a stream without buffers.
    **{f"MMAP ({way})": "node->streamon(q.g_type()) != EINVAL" for way in ("no poll", "select", "epoll")},
}


def results_of(step, label):
    return {result["name"]: result["value"] for result in step.ran(label)["measuredResults"]}


def failed_results(step, label):
    """The names of the results that are outside of their limits."""
    return {result["name"] for result in step.ran(label)["measuredResults"] if result["verdict"] == "fail"}


def activity(step, label):
    """What the gadgets of a program did; the checks after it was ended."""
    expect_equal(f"the exit code of {label}", step.exit_code(label), 0)
    expect_equal(f"what {label} complained about", step.text(f"{label}.stderr"), "")
    expect_equal(f"ports and drivers in use after {label}", step.text(f"{label}.ports"), "")
    return json.loads(step.out(label))["cameras"]


def healthy_camera(step, label):
    """Checks that a camera passed, with every frame."""
    step.passed(label)
    results = results_of(step, label)
    expect(abs(results["Frames"] - RATE * SECONDS) <= 1, f"{results['Frames']} frames in {SECONDS} s")
    expect_equal("missing frames", results["MissingFrames"], 0)


def recorded_frames(step, label):
    """The number of each frame in the record, and its time of capture from the first one's, in nanoseconds."""
    numbers, times = [], []
    for line in step.text(f"{label}.record").splitlines():
        event = json.loads(line)
        if event["event"] == "frames":
            numbers += itertools.accumulate(event["columns"]["number"])
            times += itertools.accumulate(event["columns"]["captured"])
    return [(number, time - times[0]) for number, time in zip(numbers, times)]


def healthy_again(step):
    healthy_camera(step, "next")
    activity(step, "next_camera")


def usb_camera(step):
    healthy_camera(step, "single")
    trace = read_trace(step.text("single.trace"))
    minors = dict(line.split() for line in step.text("single.minors").splitlines())
    buffers = [buffer for buffer in trace.dequeued if buffer.minor == int(minors[BUSES[0]])]
    expect_equal("the frames", results_of(step, "single")["Frames"], len(buffers))
    expect_equal("the missing numbers", results_of(step, "single")["Errors.SequenceGapCount"], gaps_in(buffers))
    # The record has each frame's number and, to the microsecond that drivers tell, its time of capture.
    times = [buffer.timestamp // 1000 for buffer in buffers]
    expect_equal("the recorded frames", recorded_frames(step, "single"),
                 [(buffer.sequence, (time - times[0]) * 1000) for buffer, time in zip(buffers, times)])
    (function,) = activity(step, "camera")[0]["functions"]
    expect_equal("the number of streams", function["streams"], 1)
    expect(0 <= function["frames"] - len(buffers) <= 1, f"{function['frames']} frames were sent, {len(buffers)} came")


def usb_cameras(step):
    bound = json.loads(step.text("probed.json"))["cameras"]
    ports = {NAMES[port]: camera["node"]["busInfo"] for port, camera in bound.items()}
    expect_equal("the cameras", ports, dict(zip(NAMES.values(), BUSES)))
    cameras.as_the_kernel_counts(step, "back", cameras.BACK, ports)
    cameras.as_the_kernel_counts(step, "front", cameras.FRONT, ports)
    streams = [camera["functions"][0]["streams"] for camera in activity(step, "cameras")]
    expect_equal("the number of streams", streams, [1] * 5)


def usb_twins(step):
    expect("USB interface 2" in step.out("probe"), "the probe does not tell the second camera's interface")
    nodes = [camera["node"].get("usbInterface") for camera in json.loads(step.text("front.json"))["cameras"].values()]
    expect_equal("the interfaces of both cameras", nodes, [0, 2])
    front = cameras.healthy_run(step, "front", cameras.FRONT, 2.015)
    healthy_camera(step, "second")
    (device,) = activity(step, "twins")
    expect_equal("the streams", [function["streams"] for function in device["functions"]], [1, 2])
    came = [cameras.frames_of(front, "Front"), results_of(step, "second")["Frames"]]  # in the last stream of each
    sent = [function["frames"] for function in device["functions"]]
    expect(all(0 <= one - other <= 1 for one, other in zip(sent, came)), f"{sent} frames were sent, {came} came")
    entry = step.passed("leaving")
    for camera in cameras.FRONT:
        expect(15 <= cameras.frames_of(entry, camera) <= 20, f"{cameras.frames_of(entry, camera)} frames, not 20")
        cameras.expect_counters(entry, camera, DisconnectCount=1)
    expect_unplugged(step, "leaving_twins")


def usb_stalled_controls(step):
    expect("does not describe the controls 0x00980901" in step.out("probe"), "the probe does not tell of the control")
    expect("Saturation" in step.out("probe") and "Auto Exposure" in step.out("probe"), "later controls are lost")
    healthy_camera(step, "single")
    activity(step, "camera")
    below = underlying(step.ended_in_error("exposure", cameras.CAPTURE, EXPOSURE_NOT_SET))
    expect_equal("the cause", (below["domain"], below["code"]), (cameras.LINUX, NOT_SUPPORTED))
    expect("0x009A0901" in below["message"], f"the cause does not name the control: {below['message']}")
    activity(step, "exposure_camera")
    below = underlying(step.ended_in_error("set", cameras.CAPTURE, EXPOSURE_NOT_SET))
    expect_equal("the cause of a refused setting", (below["domain"], below["code"]), (cameras.LINUX, cameras.SYSTEM_CALL))
    activity(step, "set_camera")


def pairs_of(step, label):
    """The frames of a trace with the metadata of the same number. Only the last ones may be without."""
    trace = read_trace(step.text(f"{label}.trace"))
    minors = {name: int(minor) for name, minor in (line.split() for line in step.text(f"{label}.minors").splitlines())}
    frames = [buffer for buffer in trace.dequeued if buffer.minor == minors[BUSES[0]]]
    blocks = {buffer.sequence: buffer for buffer in trace.dequeued if buffer.minor == minors["metadata"]}
    pairs = [(frame, blocks[frame.sequence]) for frame in frames if frame.sequence in blocks]
    expect(len(frames) - len(pairs) <= 2, f"{len(frames) - len(pairs)} frames have no metadata of their number ({label})")
    return pairs


def usb_metadata(step):
    for label, are_alike in (("driver_stamps", True), ("device_stamps", False)):
        frames = step.passed(label)["measurements"]["FrameCount"]["value"]
        pairs = pairs_of(step, label)
        expect(60 <= frames <= len(pairs), f"{frames} frames, but the kernel gave {len(pairs)} with metadata ({label})")
        different = sum(frame.timestamp != block.timestamp for frame, block in pairs)
        expect((different == 0) == are_alike, f"{different} of {len(pairs)} pairs have two time stamps ({label})")
    error = step.ended_in_error("paired_by_time", cameras.CAPTURE, 206)
    expect("frame description" in error["message"], f"the error is {error['message']}")
    expect_equal("the light after the streams", step.number("dark_after"), 0)
    activity(step, "camera")


def compliance_of(step, label):
    """The tests of v4l2-compliance that fail, each with what it says, and the numbers of tests and of those that fail,
    as it counts them."""
    text = step.out(label)
    total = re.search(r"^Total for .*: (\d+), Succeeded: \d+, Failed: (\d+),", text, re.MULTILINE)
    expect(total is not None, f"v4l2-compliance did not end ({label}): {text[-500:]}")
    failures, said = {}, []
    for line in text.splitlines():
        if found := re.fullmatch(r"\s*fail: \S+\(\d+\): (.*)", line):
            said.append(found[1])
        elif found := re.fullmatch(r"\s*test (.+): FAIL", line):
            failures[found[1]], said = "; ".join(said), []
    return failures, int(total[1]), int(total[2])


def usb_compliance(step):
    for label, known, tests in (("capture", KNOWN_FAILURES, 67), ("metadata", {}, 46)):
        failures, count, failed = compliance_of(step, label)
        expect_equal(f"the tests that fail ({label})", failures, known)
        expect_equal(f"the numbers of tests and of failures ({label})", (count, failed), (tests, len(known)))
    activity(step, "camera")


def usb_damaged_frames(step):
    faulty = 13  # of 59 frames, every tenth and every seventh
    results = results_of(step, "dropped")
    expect(abs(results["Errors.SequenceGapCount"] - faulty) <= 1, f"{results['Errors.SequenceGapCount']} gaps")
    expect_equal("missing frames", results["MissingFrames"], results["Errors.SequenceGapCount"])
    expect_equal("damaged buffers", results["Errors.BufferErrorCount"], 0)
    activity(step, "dropped_camera")
    results = results_of(step, "kept")
    expect(abs(results["Errors.BufferErrorCount"] - faulty) <= 1, f"{results['Errors.BufferErrorCount']} damaged buffers")
    expect_equal("missing numbers", results["Errors.SequenceGapCount"], 0)
    for label in ("dropped", "kept"):
        frames = results_of(step, label)["Frames"]
        expect(abs(frames + faulty - RATE * SECONDS) <= 2, f"{frames} frames are whole ({label})")
    activity(step, "kept_camera")
    healthy_again(step)


def usb_late_frames(step):
    healthy_camera(step, "punctual")  # by the limits of the late one
    # A gap of 58 ms has room for a frame.
    expect_equal("what fails for frames that are 25 ms late", failed_results(step, "late"), {"Jitter", "MissingFrames"})
    expect_equal("missing frames of a late camera", results_of(step, "late")["Errors.SequenceGapCount"], 0)
    expect("SilenceAtEnd" in failed_results(step, "mute"), "a camera that falls silent is not noticed")
    expect_equal("the frames before the silence", results_of(step, "mute")["Frames"], 30)
    expect("FrameRate" in failed_results(step, "silent"), "a silent camera passes")
    expect_equal("the frames of a silent camera", results_of(step, "silent")["Frames"], 0)
    for camera in ("punctual_camera", "late_camera", "mute_camera", "silent_camera"):
        activity(step, camera)
    healthy_again(step)


def expect_unplugged(step, label):
    (device,) = activity(step, label)
    expect_equal(f"unplugged ({label})", device["unplugged"], True)


def ended_by_unplugging(step, label):
    below = underlying(step.ended_in_error(label, SINGLE, NOT_STOPPED))
    expect_equal(f"the cause ({label})", (below["domain"], below["code"]), (cameras.LINUX, cameras.DEVICE_GONE))
    expect_run_of(step, label, SECONDS + ANSWER)


def expect_run_of(step, label, seconds):
    took = step.ran(label)["durations"]["run"]
    expect(took <= seconds, f"{label} took {took} s")


def usb_unplugged(step):
    activity(step, "before")
    below = underlying(step.ended_in_error("absent", SINGLE, CONTROL_REFUSED))
    expect_equal("the cause without a camera", (below["domain"], below["code"]), (cameras.LINUX, cameras.NO_DEVICE))
    for moment, number in (("commit", "EIO"), ("start", "ETIMEDOUT")):
        below = underlying(step.ended_in_error(moment, SINGLE, NOT_STARTED))
        expect_equal(f"the cause ({moment})", (below["domain"], below["code"]), (cameras.LINUX, cameras.SYSTEM_CALL))
        expect_run_of(step, moment, ANSWER)
        expect("VIDIOC_STREAMON" in below["message"] and number in below["message"], f"the cause is {below['message']}")
    for moment in ("streaming", "stop"):
        ended_by_unplugging(step, moment)
    for moment in ("commit", "start", "streaming", "stop"):
        expect_unplugged(step, f"{moment}_camera")
    healthy_again(step)


def usb_projector_unplugged(step):
    for moment in ("0", "10", "29", "at_stop"):
        step.ended_in_error(f"judged_{moment}", cameras.CAPTURE, 205, "Failed to stop stream!")
    for moment in ("at_commit", "at_start"):
        below = underlying(step.ended_in_error(f"judged_{moment}", cameras.CAPTURE, 204))
        expect_equal(f"the cause ({moment})", (below["domain"], below["code"]), (cameras.LINUX, cameras.SYSTEM_CALL))
    for moment in ("0", "10", "29", "at_commit", "at_start", "at_stop"):
        expect_run_of(step, f"judged_{moment}", SECONDS_OF_PROJECTOR + ANSWER)
        expect_unplugged(step, f"camera_{moment}")
    step.passed("next")
    expect_equal("the light after the next run", step.number("dark_after"), 0)
    activity(step, "next_camera")


def usb_unplugged_anytime(step):
    activity(step, "before")
    for frames in (0, 1, 2, 3, 5, 8, 13, 21, 34, 55):
        label = f"after_{frames}"
        ended_by_unplugging(step, label)
        expect_unplugged(step, f"camera_{frames}")
    healthy_again(step)


def usb_60s(step):
    bound = json.loads(step.text("front.json"))["cameras"]
    ports = {NAMES[port]: camera["node"]["busInfo"] for port, camera in bound.items()}
    cameras.as_the_kernel_counts(step, "front", cameras.FRONT, ports, seconds=60.015)
    activity(step, "cameras")


def usb_sensor_unplugged(step):
    step.ended_in_error("absent", sensors.NIMBE, 3, "Nimbe device match was ambiguous!")
    for report, code, message in ((171, 4, "Failed to override power mode to active!"),
                                  (172, 5, "Failed to set streaming mode to images only!")):
        below = underlying(step.ended_in_error(f"set_up_{report}", sensors.NIMBE, code, message))
        # usbhid waits for the answer as long as for that of a sensor that is there.
        expect_equal(f"the cause ({report})", (below["domain"], below["code"]), (sensors.LINUX, sensors.NO_ANSWER))
        expect_run_of(step, f"set_up_{report}", ANSWER)
    for reports in (0, 1, 2, 29):
        step.ended_in_error(f"after_{reports}", sensors.LINUX, sensors.DEVICE_GONE)
        device = sensors.device_of(step, f"leaving_{reports}")
        expect_equal(f"what the device sent ({reports})", (device["sent"], device["removed"]), (reports, True))
    expect_equal("the frame IDs before the stop", len(sensors.frame_ids(step, "at_stop")), 30)
    expect_equal("the frame IDs of the next run", len(sensors.frame_ids(step, "next")), 30)
    expect_equal("ports in use", step.text("ports"), "")


def usb_sensor(step):
    device = sensors.device_of(step, "sensor")
    expect_equal("the feature reports", device["features"], sensors.ACTIVE_IMAGES_ONLY)
    expect_equal("the frame IDs", sensors.frame_ids(step, "images"), list(range(1000, 1120)))
    below = underlying(step.ended_in_error("refused", sensors.NIMBE, 5, "Failed to set streaming mode to images only!"))
    expect_equal("the cause of a stall", (below["domain"], below["code"]), (sensors.LINUX, sensors.SYSTEM_CALL))
    expect("EPIPE" in below["message"], f"the cause is {below['message']}")
    below = underlying(step.ended_in_error("no_answer", sensors.NIMBE, 4, "Failed to override power mode to active!"))
    expect_equal("the cause without an answer", (below["domain"], below["code"]), (sensors.LINUX, sensors.NO_ANSWER))
    step.ended_in_error("timed_out", sensors.NIMBE, 6, "Timed out after 2 seconds.")
    step.ended_in_error("removed", sensors.LINUX, sensors.DEVICE_GONE)
    expect_equal("what the device says", sensors.device_of(step, "leaving")["removed"], True)
    expect_equal("the frame IDs of the next run", len(sensors.frame_ids(step, "next")), 30)
    expect_equal("ports in use", step.text("ports"), "")
