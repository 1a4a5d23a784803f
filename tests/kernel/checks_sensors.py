"""Checks of the steps with the display's sensor."""

import json

from arrived import expect, expect_equal, underlying

NIMBE, LINUX = "QZNimbeImageExperimentErrorDomain", "LinuxErrorDomain"
SYSTEM_CALL, DEVICE_GONE, NO_ANSWER = 1, 9, 11
ACTIVE_IMAGES_ONLY = [{"id": 0xAB, "data": "ab01"}, {"id": 0xAC, "data": "ac01"}]


def device_of(step, label):
    """The report of the only device."""
    expect_equal(f"the exit code of the device {label}", step.exit_code(label), 0)
    (device,) = json.loads(step.out(label).splitlines()[-1])["devices"]
    return device


def images_of(step, label):
    return step.passed(label)["auxiliaryData"]["images"]


def frame_ids(step, label):
    return [image["frameID"] for image in images_of(step, label)]


def sensor_30s(step):
    device = device_of(step, "sensor")
    expect_equal("the feature reports", device["features"], ACTIVE_IMAGES_ONLY)
    images = images_of(step, "images")
    ids = [image["frameID"] for image in images]
    expect_equal("the frame IDs", ids, list(range(1000, 1000 + len(ids))))
    expect(1800 <= len(ids) <= device["sent"] <= 1802, f"{len(ids)} images came of {device['sent']} that were sent")
    milliseconds = images[-1]["timestampInMilliseconds"] - images[0]["timestampInMilliseconds"]
    expect(abs(milliseconds - (len(ids) - 1) * 1000 / 60) <= 20, f"{len(ids)} images came in {milliseconds} ms")
    # Beyond the images' own 30 s: switching the sensor on, and reading what it sent.
    seconds = step.ran("images")["durations"]["run"]
    expect(29.9 <= seconds <= 30 + 0.3 * step.slowness, f"1800 images at 60 a second took {seconds} s")


def sensor_faults(step):
    ambiguous = "Nimbe device match was ambiguous!"
    expect("underlying-error" not in step.ended_in_error("absent", NIMBE, 3, ambiguous), "something lies under it")
    expect("underlying-error" not in step.ended_in_error("ambiguous", NIMBE, 3, ambiguous), "something lies under it")

    below = underlying(step.ended_in_error("no_answer", NIMBE, 4, "Failed to override power mode to active!"))
    expect_equal("the cause without an answer", (below["domain"], below["code"]), (LINUX, NO_ANSWER))
    seconds = step.ran("no_answer")["durations"]["run"]
    expect(4.9 <= seconds <= 5.5, f"the kernel waits 5 s for an answer; this took {seconds} s")

    below = underlying(step.ended_in_error("refused", NIMBE, 5, "Failed to set streaming mode to images only!"))
    expect_equal("the cause of a refusal", (below["domain"], below["code"]), (LINUX, SYSTEM_CALL))
    expect("EIO" in below["message"], f"the cause is {below['message']}")

    step.ended_in_error("removed", LINUX, DEVICE_GONE)
    expect_equal("what the device says", device_of(step, "leaving")["removed"], True)
    step.ended_in_error("timed_out", NIMBE, 6, "Timed out after 2 seconds.")
    expect_equal("the number of reports", device_of(step, "pausing")["sent"], 30)

    # Only the first 792 bytes are an image.
    expect_equal("the frame IDs of over-long reports", len(frame_ids(step, "over_long")), 30)
    expect_equal("the frame IDs of the next run", len(frame_ids(step, "next")), 30)


def display_off(step):
    expect_equal("the connector's state", step.text("dpms").strip(), "Off")
    step.ended_in_error("dark", NIMBE, 2, "The display is not powered.")
    step.ended_in_error("unplugged", NIMBE, 2, "The display is not powered.")
    expect(len(frame_ids(step, "next")) >= 5, "there are too few images")
