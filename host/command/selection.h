// Selects the diagnostics of a command line and resolves their parameters.
#pragma once

#include "host/cli/command_line.h"
#include "host/cli/installation.h"
#include "host/device/skip.h"
#include "host/run/plugin_scan.h"

#include <filesystem>
#include <optional>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

struct Selection {
  std::vector<ResolvedDiagnostic> diagnostics;
  std::vector<FailedPlugin> failed;  // could not be loaded
  std::vector<UserLimit> limits;     // of the profiles and the command line, in this order
  std::vector<Profile> profiles;     // of which these limits and the values of parameters are
  std::vector<std::string> remarks;  // on entries of installed profiles that fit nothing
};

// The plug-ins that the options name, or those that are loaded by default, and the limits of their processes.
IsolationOptions isolationOf(const Options& options, const Installation& installation);

// The installed plug-ins of a record. Anybody may have written it, so it cannot make quazor load any other file: throws
// a CommandError (kCannotRead) that asks for --plugin.
std::vector<std::filesystem::path> recordedPlugins(const std::vector<std::string>& recorded,
                                                   const Installation& installation);

// The diagnostics or experiments that the options select, in the order of their names. Throws a CommandError (kUsage)
// for a name or a pattern that fits nothing, unless `mayBeNone`.
std::vector<Diagnostic> wantedOf(const std::vector<Diagnostic>& catalogue, const Options& options, bool mayBeNone);

// Like wantedOf(), but throws like refuseUnknownName() for a name that fits nothing in the catalogue.
std::vector<Diagnostic> wantedWithWayOut(const std::vector<Diagnostic>& catalogue, const Options& options,
                                         const Installation& installation, bool mayBeNone);

// Scans the plug-ins in separate processes, or in this one with --in-process. `described` chooses the diagnostics that
// are asked for their descriptions. Throws like scanPlugins() and Installation::allPlugins(), and kInterrupted on an
// interrupt. In this process, a plug-in that is refused always is a CommandError: its code could not be removed.
// `signals` is the command's; null: they are watched during the scan only.
PluginScan scanOf(const Options& options, const Installation& installation, const DiagnosticChoice& described,
                  WatchedSignals* signals = nullptr);

// Scans the plug-ins and describes only what the options select. Throws like scanOf, and for names of another kind
// than the command expects. Unknown names are ignored.
PluginScan scanForSelection(const Options& options, const Installation& installation,
                            WatchedSignals* signals = nullptr);

// The selected diagnostics or experiments with their parameters. All checks are done except for required parameters
// without a value. Only the selected diagnostics are described, unless a profile's entry matches more than those and
// sets a parameter that none of them declares; then all its matches are described. An unknown name is accepted if a
// plug-in could not be loaded, because that plug-in may define it.
Selection select(const Options& options, const Installation& installation, WatchedSignals* signals = nullptr);

// Tells the remarks, and the limitsForOtherValues() of the profiles.
void tellRemarks(const Selection& selection, const std::vector<ResolvedDiagnostic>& selected, std::ostream& err);

// What a user's own default profile does that is based on nothing: the end of a sentence about it.
inline constexpr const char* kHidesDefaultProfile =
    "hides the shipped default profile, whose values it has only with \"base\": \"default\"";

// The shipped default profile if the user's own hides it and is based on nothing; otherwise empty. Throws an InputError
// if a profile cannot be read.
std::filesystem::path hiddenDefaultProfile(const Installation& installation);

// Like missingParameterOf() of its parameters; a profile that took the place of the default one may be the reason.
std::string missingParameterOf(const ResolvedDiagnostic& one, const Options& options, const Installation& installation);

// What the first rule that fits the diagnostic or experiment says; nothing if none fits.
std::optional<Skip> skipOf(const std::string& name, const std::vector<SkipRule>& rules);

// The installed scenarios and those of the user that the names and patterns fit, each once, and files; all without
// names. Throws a CommandError (kUsage) for a name that fits none.
std::vector<std::string> wantedScenarios(const std::vector<std::string>& names, const Installation& installation);

}  // namespace quazor
