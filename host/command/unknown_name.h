// The way out for a name that fits nothing that is loaded.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/error/exit_code.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/run/plugin_scan.h"

#include <string>
#include <vector>

namespace quazor {

// The end of a sentence about a phone that is not installed.
inline constexpr const char* kWayToPhones =
    "'quazor phone list' shows them, and one that is not installed is given by its file";

// Throws a CommandError (kUsage) if it is the name of an installed phone.
void refusePhoneAsName(const std::string& name, const Installation& installation);

// Throws a CommandError with that code if it is the beginning of installed phones, such as "camera_sync". The message
// begins with `about`.
void refuseGroupOfPhones(const std::string& name, ExitCode code, const std::string& about,
                         const Installation& installation);

// What the installed plug-ins have that the options do not load, and which of them cannot be loaded. `signals` is the
// command's; null: they are watched during the scan only.
PluginScan scanOfOthers(const Options& options, const Installation& installation, WatchedSignals* signals = nullptr);

// Throws the refusal of the first name of the options that fits nothing in the catalogue, with the way out: the plug-in
// that must be named, that it is a phone, or the command that lists all names. Returns if there is no such name.
void refuseUnknownName(const std::vector<Diagnostic>& catalogue, const Options& options,
                       const Installation& installation, const CommandError& refusal);

}  // namespace quazor
