#!/usr/bin/env python3
"""Checks that the explanations of `quazor explain` agree with the program.

usage: explanations.py ROOT PROGRAM PLUGIN

ROOT is the source tree, from which the possible errors of the plug-ins, the host and the backends and the registered
names are collected. PROGRAM runs everything, including the experiments of PLUGIN, for the names of results.
Each error and each name must have an explanation, each explanation must belong to an existing error or name, and the
messages must be those of the sources. Exit code 0: everything agrees; 1: something does not.
"""

import json
import pathlib
import re
import shlex
import subprocess
import sys

import jsonschema

import error_codes

# The folders of the plug-ins, and the diagnostics and experiments that return their errors.
PLUGIN_FOLDERS = {
    "diagnostics/camera_sync": {"CameraSyncDiagnostic.Back", "CameraSyncDiagnostic.Front"},
    "diagnostics/projector_fault": {"TesselFaultDiagnostic"},
    "diagnostics/report_channels": {"TesselTelemonDiagnostic"},
    "diagnostics/sensor_images": {"NimbeImageExperiment"},
    "diagnostics/single_camera": {"SingleCameraDiagnostic"},
}
# The project that `quazor new` copies, which explains the errors of its own domain.
TEMPLATE_FOLDER = "examples/event_count"
SENDERS = {**PLUGIN_FOLDERS, TEMPLATE_FOLDER: {"EventCountDiagnostic"}}
SHARED_DOMAIN = "QZErrorDomain"
CATALOGUE_FOLDERS = ["plugins", *PLUGIN_FOLDERS]
ALL_FOLDERS = ["contract", "platform", "base", "diagnostics", "plugins", "backends", "host"]

PLACEHOLDER = re.compile(r"%(?:@|lu|lf|d)")
IN_CAPITALS = re.compile(r"[A-Z :]+")  # placeholders such as NAME and DOMAIN:CODE


def read(folder, schema):
    """The entries of all files, and the problems of the files."""
    validator = jsonschema.Draft202012Validator(json.loads(schema.read_text(encoding="utf-8")))
    entries, found = [], []
    for file in sorted(folder.glob("*.json")):
        if file.name.endswith(".schema.json"):
            continue
        content = json.loads(file.read_text(encoding="utf-8"))
        problems = [f"{file.name}: {error.json_path}: {error.message}" for error in validator.iter_errors(content)]
        found += problems
        if not problems:
            entries += [{"domain": content["domain"], **entry} for entry in content.get("errors", [])]
            entries += content.get("names", [])
    return entries, found


def name_of(entry):
    return f"{entry['domain']}:{entry['code']}" if "domain" in entry else entry["names"][0]


def message_problems(entry, errors):
    """The messages of a plug-in's error, and the diagnostics that return them."""
    returned = {}
    for error in errors:
        folder = str(pathlib.PurePosixPath(error.file).parent)
        if folder not in SENDERS:
            continue
        if error.message is None:
            return [f"{name_of(entry)}: {error.file} makes it with a message that cannot be followed"]
        returned.setdefault(PLACEHOLDER.sub("...", error.message), set()).update(SENDERS[folder])
    explained = {message["text"]: set(message["from"]) for message in entry.get("messages", [])}
    found = [f"{name_of(entry)}: the message '{text}' is missing" for text in returned if text not in explained]
    for text, senders in explained.items():
        if text not in returned:
            found.append(f"{name_of(entry)}: nothing gives the message '{text}'")
        elif senders != returned[text]:
            found.append(f"{name_of(entry)}: the message '{text}' is from {', '.join(sorted(returned[text]))}")
    return found


def error_problems(entries, errors):
    found = []
    by_key = {}
    for error in errors:
        by_key.setdefault((error.domain, error.code), []).append(error)
    explained = {(entry["domain"], entry["code"]): entry for entry in entries if "domain" in entry}
    for domain, code in sorted(by_key.keys() - explained.keys()):
        found.append(f"{domain}:{code} has no explanation; {by_key[domain, code][0].file} returns it")
    for key, entry in explained.items():
        if key not in by_key:
            found.append(f"{name_of(entry)} is explained, but nothing returns it")
            continue
        symbols = sorted({error.symbol for error in by_key[key] if error.symbol})
        if entry.get("symbols", []) != symbols:
            found.append(f"{name_of(entry)}: its symbols are {symbols}, not {entry.get('symbols', [])}")
        found += message_problems(entry, by_key[key])
    return found


def template_problems(entries, errors):
    """`errors` are all of the template's sources; those of the shared domain are explained with the shipped plug-ins'."""
    own = [error for error in errors if error.domain != SHARED_DOMAIN]
    return error_problems(entries, own) + ([] if own else ["the template returns no error of its own"])


def name_problems(entries, registered, results):
    """`registered` has lists of names by kind; `results` has sets of names by diagnostic or experiment."""
    found = []
    wanted = {name: kind for kind, names in registered.items() for name in names}
    senders = {}
    for sender, names in results.items():
        for name in names:
            wanted[name] = "result"
            senders.setdefault(name, set()).add(sender)
    explained = {name: entry for entry in entries for name in entry.get("names", [])}
    found += [f"the {kind} '{name}' has no explanation" for name, kind in wanted.items() if name not in explained]
    for name, entry in explained.items():
        if name not in wanted:
            found.append(f"'{name}' is explained, but there is no such name")
        elif entry["kind"] != wanted[name]:
            found.append(f"'{name}' is of the kind {wanted[name]}, not {entry['kind']}")
    for entry in entries:
        if entry.get("kind") == "result":
            real = set().union(*(senders.get(name, set()) for name in entry["names"]))
            if real != set(entry["from"]):
                found.append(f"'{name_of(entry)}' is a result of {', '.join(sorted(real))}")
    return found


def texts_of(value):
    if isinstance(value, str):
        return [value]
    if isinstance(value, (bool, int, float)):
        return []
    return [text for part in (value.values() if isinstance(value, dict) else value) for text in texts_of(part)]


def command_problems(entries):
    """Checks that the commands in the texts refer to existing errors and names."""
    keys = {name_of(entry) for entry in entries if "domain" in entry}
    names = {name: entry["kind"] for entry in entries for name in entry.get("names", [])}
    kinds = {"run": {"diagnostic"}, "experiment": {"experiment"}, "describe": {"diagnostic", "experiment"},
             "explain": set(names.values())}
    found = []
    for entry in entries:
        for text in texts_of({key: value for key, value in entry.items() if key not in ("code", "names")}):
            if text.count("`") % 2:
                found.append(f"{name_of(entry)}: a back quote has no end: {text}")
            for command in re.findall(r"`(quazor [^`]*)`", text):
                words = shlex.split(command)[1:]
                if words in (["phone", "probe"], ["doctor"]):
                    continue
                asked = words[1] if len(words) > 1 and not words[1].startswith("-") else None
                if words[0] not in kinds:
                    found.append(f"{name_of(entry)}: there is no command '{words[0]}'")
                elif asked and not IN_CAPITALS.fullmatch(asked) and names.get(asked) not in kinds[words[0]]:
                    if words[0] != "explain" or asked not in keys:
                        found.append(f"{name_of(entry)}: '{command}' asks for what there is not")
    return found


def results_of(program, plugin):
    """The names of the results of all diagnostics and experiments on the healthy phone."""
    results = {}
    runs = {"diagnostics": ["run", "--all"], "experiments": ["experiment", "--all", "--plugin", plugin]}
    for kind, command in runs.items():
        run = subprocess.run([program, *command, "--format", "json"], stdout=subprocess.PIPE, timeout=300, check=True)
        for one in json.loads(run.stdout)[kind]:
            names = {result["name"] for result in one.get("measuredResults", [])}
            names |= {*one["measurements"], *one["auxiliaryData"]}
            for image in one["auxiliaryData"].get("images", []):
                names |= image.keys()
            results[one["name"]] = names
    return results


def main():
    root, program, plugin = pathlib.Path(sys.argv[1]), sys.argv[2], sys.argv[3]
    sys.stdout.reconfigure(line_buffering=True)
    schema = root / "data/explanations/explanations.schema.json"
    entries, found = read(schema.parent, schema)
    of_template, wrong = read(root / TEMPLATE_FOLDER / "explanations", schema)
    try:
        errors = error_codes.errors_of(root, ALL_FOLDERS)
        found += wrong + template_problems(of_template, error_codes.errors_of(root, [TEMPLATE_FOLDER]))
        registered = error_codes.registered(root, CATALOGUE_FOLDERS)
    except error_codes.UnknownForm as unknown:
        print(unknown)
        return 1
    results = results_of(program, plugin)
    found += error_problems(entries, errors) + name_problems(entries, registered, results) + command_problems(entries)
    for sentence in found:
        print(sentence)
    codes = len({(error.domain, error.code) for error in errors})
    names = sum(map(len, registered.values())) + len(set().union(*results.values()))
    print(f"{codes} codes, {names} names, {len(entries)} explanations, {len(found)} problems")
    return 1 if found or not codes or not names else 0


if __name__ == "__main__":
    sys.exit(main())
