"""Checks of the steps without a camera: the program itself, probing, report channels."""

import json

from arrived import expect, expect_equal

CAMERA_DIAGNOSTICS = ("CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front", "SingleCameraDiagnostic")
TESSEL_DIAGNOSTICS = ("TesselFaultDiagnostic", "TesselTelemonDiagnostic")


def expect_verdicts(step, wanted):
    """Checks the verdicts, by diagnostic, of the run "all"."""
    expect_equal("the exit code", step.exit_code("all"), 0)
    verdicts = {entry["name"]: entry["verdict"] for entry in json.loads(step.out("all"))["diagnostics"]}
    expect_equal("the verdicts", verdicts, wanted)


def simulated_phone(step):
    expect_verdicts(step, dict.fromkeys(CAMERA_DIAGNOSTICS + TESSEL_DIAGNOSTICS, "pass"))


def nothing(step):
    expect_equal("the exit code of a probe", step.exit_code("probe"), 0)
    for kind in ("Cameras", "HID devices", "Displays"):
        expect(f"{kind}\n  none: " in step.out("probe"), f"the probe does not say that there are no {kind}")
    _, _, binding = step.out("probe").partition("\n{")
    expect("cameras" not in json.loads("{" + binding), "the probe's binding has cameras")
    for label, code in (("back", 200), ("fault", 200)):
        expect_equal(f"the verdict of {label}", step.ran(label)["verdict"], "error")
    step.ended_in_error("channels", "QZErrorDomain", 6)
    step.ended_in_error("image", "QZNimbeImageExperimentErrorDomain", 2,
                        "Could not get the main display to determine device power state.")


def probe(step):
    expect_equal("the exit code of a probe", step.exit_code("probe"), 0)
    for number in range(5):
        expect(f"platform:vivid-00{number}" in step.out("probe"), f"the probe does not find camera {number}")
    expect("Virtual-1" in step.out("probe"), "the probe does not find the display")
    expect_equal("the exit code of a probe without rights", step.exit_code("unprivileged"), 0)
    expect("/dev/video" in step.out("unprivileged"), "the probe without rights does not name the cameras")


def probed_cameras(step):
    expect_equal("the exit code of a probe", step.exit_code("probe"), 0)
    expect_verdicts(step, dict.fromkeys(CAMERA_DIAGNOSTICS, "pass") | dict.fromkeys(TESSEL_DIAGNOSTICS, "skip"))
    dropping = step.ran("dropping")
    missing, gaps = (next(result["value"] for result in dropping["measuredResults"] if result["name"] == name)
                     for name in ("MissingFrames", "Errors.SequenceGapCount"))
    expect(gaps > 0, "a fifth of the frames was dropped, and there is no gap in their numbers")
    expect(abs(missing - gaps) <= 2, f"{gaps} frames are missing by their numbers, {missing} by their times")
    expect_equal("the verdict while frames are dropped", dropping["verdict"], "fail")


def multiplanar_cameras(step):
    planes = step.text("multiplanar").strip().split(",")[:5]
    expect_equal("the kind of the cameras", planes, ["2"] * 5)
    expect("NM16" in step.out("probe"), "no camera has a format with two planes")
    probed_cameras(step)


def channels(step):
    expect_equal("the number of channels", len(step.passed("complete")["measuredResults"]), 60)
    raised, missing = (path.rsplit("/", 1)[1] for path in step.text("chosen").splitlines())
    entry = step.ran("raised")
    expect_equal("the verdict with a raised counter", entry["verdict"], "fail")
    expect_equal("the exit code with a raised counter", step.exit_code("raised"), 1)
    failed = [result["name"] for result in entry["measuredResults"] if result["verdict"] == "fail"]
    expect_equal("the failed results", failed, [raised])
    step.ended_in_error("missing", "QZErrorDomain", 6, f"Missing measurement for {missing}")
    step.passed("next")
