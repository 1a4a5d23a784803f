// The diagnostics and experiments that the loaded plug-ins offer.
#pragma once

#include "contract/lab.h"

#include <filesystem>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A diagnostic with the factories of its two halves; or an experiment on its own, whose two names are one and which has
// neither summary nor analysis.
struct Diagnostic {
  std::string name;
  std::string summary;
  std::string experimentName;
  std::string analysisName;
  QZExperimentFactory makeExperiment;
  QZAnalysisFactory makeAnalysis;
  bool experimentOnly = false;
  std::vector<std::string> usedBy{};  // of an experiment on its own: the diagnostics that have it, as registered
  // The files that register it and its halves, in the order of their loading; empty where it is not known.
  std::vector<std::filesystem::path> plugins{};
};

// What a diagnostic's halves say of themselves.
struct DiagnosticDescription {
  QZDescription experiment{""};
  QZDescription analysis{""};
  DiagnosticErrorPtr error;  // why it could not be asked; null when it could
  bool isAsked = true;       // false: nobody wanted it, and the rest is empty
};

// What a command's names can stand for. Of the experiments that diagnostics use, kDescribable has those that are asked
// for by name, or by a pattern that fits nothing else: the diagnostics' descriptions have them already.
enum class Wanted { kDiagnostics, kExperiments, kDescribable };

// The lab's diagnostics, then all its experiments, each in the order of their registration. A diagnostic of which a
// half is not registered is left out.
std::vector<Diagnostic> catalogueOf(const QZLab& lab);

// Makes an experiment and, of a diagnostic, an analysis to ask for their descriptions, on a platform without a phone.
// What a plug-in throws ends in `error`.
DiagnosticDescription describeDiagnostic(const Diagnostic& diagnostic);

// As describeDiagnostic for what is among `wanted`; nothing else is asked.
DiagnosticDescription describeIfWanted(const Diagnostic& diagnostic, const std::vector<Diagnostic>& wanted);

// What there is of the catalogue for everyone who asks for all.
std::vector<Diagnostic> allOf(const std::vector<Diagnostic>& catalogue, Wanted wanted);

// What `names` ask for, without repetitions, in the order of the names; a name that nothing wanted has is a pattern of
// the shell's kind (*, ?, [...]) and stands for all that match, in the catalogue's order. Throws a CommandError
// (kUsage) for a name or pattern that fits nothing wanted; it tells the command to use when there is something else of
// that name.
std::vector<Diagnostic> selectDiagnostics(const std::vector<Diagnostic>& catalogue, Wanted wanted,
                                          const std::vector<std::string>& names);

// True when `diagnostics` has that one: the diagnostic, or the experiment on its own, of its name.
bool contains(const std::vector<Diagnostic>& diagnostics, const Diagnostic& wanted);

// True when `pattern` is, or matches, `name`.
bool matchesName(const std::string& pattern, const std::string& name);

// True when the text has a character that is special in patterns.
bool isPattern(const std::string& text);

std::vector<std::string> namesOf(const std::vector<Diagnostic>& diagnostics);

}  // namespace quazor
