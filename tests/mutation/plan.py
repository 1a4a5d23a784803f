"""What is mutated, which tests judge it, and which mutants are drawn."""

import dataclasses
import hashlib
import math
import pathlib

from mutants import mutants_of

# Generated, and compared with its generator by a test of its own.
GENERATED = {"contract/alpha_numerics_table.cpp"}
TEST_ENDINGS = ("_test", "_for_tests", "_conformance", "_fixture", "_fuzz")


@dataclasses.dataclass(frozen=True)
class Folder:
    """A folder whose tests are judged: the patterns of its sources, its own tests, and the nearest that depend on it."""
    name: str
    sources: tuple
    own: tuple
    near: tuple


DIAGNOSTICS = ("camera_sync_test", "projector_fault_test", "report_channels_test", "sensor_images_test",
               "single_camera_test")
SWEEPS = ("camera_sync_sweep_test", "projector_sweep_test", "telemon_sweep_test", "sensor_images_sweep_test")
LINUX = ("linux_test", "linux_binding_test", "linux_capture_test", "linux_counters_test", "linux_display_test",
         "linux_hid_test", "linux_probe_test", "linux_system_test", "linux_video_test")
COMPILE_FAILURE = "compile_failure."  # such a test compiles its source itself
COMPILE_FAILURES = tuple(COMPILE_FAILURE + name for name in (
    "character_as_message_argument", "copied_task", "copied_unit", "error_with_wrong_format",
    "format_that_is_no_literal", "format_with_argument_of_wrong_type", "format_with_too_few_arguments",
    "format_with_too_many_arguments", "format_with_unknown_placeholder", "log_line_with_wrong_format",
    "value_from_character", "value_from_null", "value_from_pointer"))
HOST_UNITS = ("host_error_test", "host_text_test", "host_device_test", "host_plugin_test", "host_system_test",
              "host_model_test", "host_record_test", "host_report_test", "host_run_test", "host_cli_test",
              "host_command_test")
FOLDERS = (
    Folder("contract", ("contract/*.h", "contract/*.cpp"), ("contract_test", *COMPILE_FAILURES),
           (*DIAGNOSTICS, *HOST_UNITS)),
    Folder("diagnostics", ("diagnostics/*/*.h", "diagnostics/*/*.cpp"), DIAGNOSTICS, SWEEPS),
    Folder("host/model", ("host/model/*.h", "host/model/*.cpp"), ("host_model_test",), HOST_UNITS),
    Folder("host/plugin", ("host/plugin/parameters.*",), ("host_plugin_test",), HOST_UNITS),
    Folder("host/record", ("host/record/*.h", "host/record/*.cpp"), ("host_record_test", "host_model_test"), HOST_UNITS),
    Folder("host/run", ("host/run/isolation*",), ("host_run_test",), (*HOST_UNITS, "misbehaving_test")),
    Folder("host/system", ("host/system/child_process.*", "host/system/supervision.*"), ("host_system_test",),
           (*HOST_UNITS, "misbehaving_test")),
    Folder("backends/linux", ("backends/linux/*.h", "backends/linux/*.cpp", "backends/linux/*/*.h",
                              "backends/linux/*/*.cpp"), LINUX, ("linux_cameras_test", "host_device_test")),
)


def nearest(folder, file):
    """Those of the folder's own tests that are named after the folder that the file is in."""
    place = pathlib.PurePosixPath(file).parent.name
    return tuple(name for name in folder.own if name in (f"{place}_test", f"linux_{place}_test"))


def is_product(path):
    return path.suffix in (".h", ".cpp") and not path.stem.endswith(TEST_ENDINGS)


def sources_of(root, folder):
    """The folder's files that may be mutated, as texts by name."""
    files = sorted({path for pattern in folder.sources for path in root.glob(pattern) if is_product(path)})
    names = {path.relative_to(root).as_posix(): path for path in files}
    return {name: path.read_text(encoding="utf-8") for name, path in names.items() if name not in GENERATED}


def order(seed, mutant):
    """A random place in the order of drawing, which changes of other mutants do not alter."""
    return hashlib.sha256(f"{seed}|{mutant.key}".encode()).hexdigest()


def drawn(seed, mutants):
    """All mutants in the order of drawing: the operators take turns, because most mutants are of a few of them."""
    queues = {}
    for mutant in sorted(mutants, key=lambda one: order(seed, one)):
        queues.setdefault(mutant.operator, []).append(mutant)
    ordered = []
    while queues:
        for operator in sorted(queues):
            ordered.append(queues[operator].pop(0))
        queues = {operator: queue for operator, queue in queues.items() if queue}
    return ordered


def all_mutants(root):
    """The mutants of each folder, by its name."""
    return {folder.name: [mutant for file, text in sources_of(root, folder).items() for mutant in mutants_of(file, text)]
            for folder in FOLDERS}


def shares(counts, total):
    """How many mutants each folder gets: its share of the total, rounded up."""
    whole = sum(counts.values())
    return {name: min(count, math.ceil(total * count / whole)) for name, count in counts.items()}


class EquivalentError(Exception):
    pass


def read_equivalents(file):
    """The keys of equivalent mutants and their reasons.

    Entries are separated by an empty line: the key, as the runner prints it, then the reason, both on one line.
    """
    equivalents, lines = {}, []
    text = file.read_text(encoding="utf-8") if file.exists() else ""
    for number, line in enumerate([*text.splitlines(), ""], start=1):
        if line.startswith("#"):
            continue
        if line.strip():
            lines.append(line.strip())
        elif lines:
            if len(lines) != 2 or not lines[1].startswith("reason: ") or lines[1] == "reason:":
                raise EquivalentError(f"{file.name}:{number}: an entry is a key and a line 'reason: ...'")
            if lines[0] in equivalents:
                raise EquivalentError(f"{file.name}:{number}: this mutant is listed twice")
            equivalents[lines[0]] = lines[1].removeprefix("reason: ")
            lines = []
    return equivalents


def check_equivalents(equivalents, mutants):
    """Every entry must still be a mutant: an entry for text that has changed says nothing."""
    known = {mutant.key for of_folder in mutants.values() for mutant in of_folder}
    stale = [key for key in equivalents if key not in known]
    if stale:
        raise EquivalentError(f"no longer a mutant; remove it from the equivalent ones: {stale[0]}")


def root_of_tree():
    return pathlib.Path(__file__).resolve().parents[2]
