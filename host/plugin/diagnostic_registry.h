// The diagnostics and experiments of the loaded plug-ins.
#pragma once

#include "contract/lab.h"
#include "contract/parameter_range.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A diagnostic with the factories of its experiment and analysis, or an experiment on its own, which has no summary
// and no analysis and whose `name` equals `experimentName`.
struct Diagnostic {
  std::string name;
  std::string summary;
  std::string experimentName;
  std::string analysisName;
  QZExperimentFactory makeExperiment;
  QZAnalysisFactory makeAnalysis;
  bool experimentOnly = false;
  std::vector<std::string> usedBy{};  // for an experiment on its own: the diagnostics that use it
  // The files that register the diagnostic, its experiment and its analysis, in loading order; empty if unknown.
  std::vector<std::filesystem::path> plugins{};
};

// The time that something took in a process, and the memory by which the process grew.
struct Cost {
  std::chrono::nanoseconds time{};
  std::uint64_t bytes = 0;
};

// The descriptions of a diagnostic's experiment and analysis.
struct DiagnosticDescription {
  QZDescription experiment{""};
  QZDescription analysis{""};
  DiagnosticErrorPtr error;  // why there is no description; null if there is one
  bool isAsked = true;       // false if no description was requested; all other members are then empty
  // What the parameters accept, where it is known.
  OrderedMap<QZParameterRange> experimentRanges{};
  OrderedMap<QZParameterRange> analysisRanges{};
  std::optional<Cost> cost{};  // of asking; nothing if it was not measured
};

// What the names of a command refer to. kDescribable includes the experiments of diagnostics only if they are requested
// by name or by a pattern that matches nothing else, because the descriptions of the diagnostics already contain them.
enum class Wanted { kDiagnostics, kExperiments, kDescribable };

// The lab's diagnostics followed by all its experiments, each in registration order. Omits a diagnostic whose
// experiment or analysis is not registered.
std::vector<Diagnostic> catalogueOf(const QZLab& lab);

// The entry of the lab's catalogue that is the same as `wanted`, with its factories; nothing if there is none.
std::optional<Diagnostic> registeredDiagnostic(const QZLab& lab, const Diagnostic& wanted);

// Creates the experiment and, for a diagnostic, the analysis, and asks for their descriptions, on a platform without a
// phone. An exception of the plug-in is stored in `error`.
DiagnosticDescription describeDiagnostic(const Diagnostic& diagnostic);

// Like describeDiagnostic if `wanted` contains the diagnostic; otherwise asks for nothing.
DiagnosticDescription describeIfWanted(const Diagnostic& diagnostic, const std::vector<Diagnostic>& wanted);

// The entries selected by --all.
std::vector<Diagnostic> allOf(const std::vector<Diagnostic>& catalogue, Wanted wanted);

// The entries selected by `names`, without duplicates, in the order of the names. A name that matches no wanted entry
// exactly is a shell pattern (*, ?, [...]) and selects all matching entries, in registry order. Throws a CommandError
// (kUsage) if a name or pattern matches no wanted entry; the message names the right command if an entry of another
// kind has that name.
std::vector<Diagnostic> selectDiagnostics(const std::vector<Diagnostic>& catalogue, Wanted wanted,
                                          const std::vector<std::string>& names);

// True if `diagnostics` contains that diagnostic, or that experiment on its own, by name.
bool contains(const std::vector<Diagnostic>& diagnostics, const Diagnostic& wanted);

std::vector<std::string> namesOf(const std::vector<Diagnostic>& diagnostics);

}  // namespace quazor
