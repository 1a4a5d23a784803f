"""The results of a step, and helpers for checks of them."""

import json
import re

KERNEL_COMPLAINT = re.compile(r"BUG:|WARNING:|Oops|Call Trace|blocked for more than|general protection|Out of memory")

# The address sanitizer prints this once for a program that switches stacks, like the simulated phone. It is not an
# error.
SANITIZER_REMARK = re.compile(r"^==\d+==WARNING: ASan doesn't fully support makecontext/swapcontext functions and may "
                              r"produce false positives in some cases!$", re.MULTILINE)


class CheckFailed(Exception):
    """A failed check, described by a sentence."""


def expect(holds, sentence):
    if not holds:
        raise CheckFailed(sentence)


def expect_equal(what, got, wanted):
    expect(got == wanted, f"{what} is {got!r}, expected {wanted!r}")


class Arrived:
    """The files of a step. Labels are those that the step's script passed to `run`."""

    def __init__(self, parcel, slowness=1):
        self._parcel = parcel
        self.slowness = slowness  # how many times as long the programs take as those of a release

    @property
    def name(self):
        return self._parcel.name

    @property
    def files(self):
        return self._parcel.files

    @property
    def guest_seconds(self):
        return float(self.text("ended") or 0) - float(self.text("began") or 0)

    def text(self, file):
        expect(file in self.files, f"there is no {file}")
        return self._parcel.text(file)

    def exit_code(self, label):
        return int(self.text(f"{label}.exit"))

    def out(self, label):
        return self.text(f"{label}.stdout")

    def number(self, label):
        """The number that a command printed."""
        text = self.out(label).strip()
        expect(re.fullmatch(r"-?\d+", text), f"{label} printed {text!r}, which is no number")
        return int(text)

    def ran(self, label):
        """The only diagnostic or experiment in a JSON report."""
        text = self.out(label)
        expect(text.strip(), f"{label} printed no report: {self.text(f'{label}.stderr').strip()}")
        document = json.loads(text)
        (entry,) = document.get("diagnostics") or document["experiments"]
        return entry

    def passed(self, label):
        """Like ran(), and requires that it passed."""
        entry = self.ran(label)
        expect(entry["verdict"] == "pass", f"{label} ended in {entry['verdict']}: {failure_of(entry)}")
        expect_equal(f"the exit code of {label}", self.exit_code(label), 0)
        return entry

    def ended_in_error(self, label, domain, code, message=None):
        """The chain of errors of a run that ended in an error: the plug-in's error and its underlying errors."""
        entry = self.ran(label)
        expect_equal(f"the verdict of {label}", entry["verdict"], "error")
        expect_equal(f"the exit code of {label}", self.exit_code(label), 2)
        error = entry["error"]
        expect_equal(f"the error of {label}", (error["domain"], error["code"]), (domain, code))
        if message is not None:
            expect_equal(f"the message of {label}", error["message"], message)
        return error

    def holds_in_general(self):
        """Checks that apply to every step."""
        expect_equal("the exit code of the script", self.text("exit").strip(), "0")
        expect_equal("the closing line", self._parcel.text("closed").strip(), f"closed {self.name}")
        expect_equal("what was left running", self.text("leftovers"), "")
        found = (self.text(file) for file in sorted(self.files) if file.startswith("found."))
        findings = " ".join(SANITIZER_REMARK.sub("", text).strip() for text in found).strip()
        expect(not findings, f"a sanitizer found: {findings}")
        complaint = KERNEL_COMPLAINT.search(self.text("kernel.log"))
        expect(complaint is None, f"the kernel complains: {self.text('kernel.log')}")


def failure_of(entry):
    """A one-line reason why a diagnostic did not pass. Experiments judge no results."""
    if entry["error"]:
        return json.dumps(entry["error"])
    return "; ".join(f"{result['name']} is {result['value']}" for result in entry.get("measuredResults", [])
                     if result["verdict"] == "fail")


def underlying(error):
    """The underlying error of an error."""
    expect("underlying-error" in error, f"nothing lies under {error['message']!r}")
    return error["underlying-error"]
