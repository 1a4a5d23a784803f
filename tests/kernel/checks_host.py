"""Checks of the steps without a camera: the program itself, probing, report channels."""

import json

from arrived import expect, expect_equal

DIAGNOSTICS = ("CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front", "TesselFaultDiagnostic",
               "TesselTelemonDiagnostic")


def simulated_phone(step):
    expect_equal("the exit code", step.exit_code("all"), 0)
    verdicts = {entry["name"]: entry["verdict"] for entry in json.loads(step.out("all"))["diagnostics"]}
    expect_equal("the verdicts", verdicts, dict.fromkeys(DIAGNOSTICS, "pass"))


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
