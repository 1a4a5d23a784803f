// The diagnostics that the loaded plug-ins offer.
#pragma once

#include "frame/lab.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A diagnostic with the factories of its two halves.
struct Diagnostic {
  std::string name;
  std::string summary;
  std::string experimentName;
  std::string analysisName;
  QZExperimentFactory makeExperiment;
  QZAnalysisFactory makeAnalysis;
};

// What a diagnostic's halves say of themselves.
struct DiagnosticDescription {
  QZDescription experiment{""};
  QZDescription analysis{""};
  DiagnosticErrorPtr error;  // why it could not be asked; null when it could
};

// The lab's diagnostics, in the order of their registration. REQUIRES: their experiments and analyses are registered.
std::vector<Diagnostic> catalogueOf(const QZLab& lab);

// Makes an experiment and an analysis to ask for their descriptions, on a platform without a phone. What a plug-in
// throws ends in `error`.
DiagnosticDescription describeDiagnostic(const Diagnostic& diagnostic);

// The diagnostics that `names` ask for, without repetitions, in the order of the names; a name that no diagnostic has
// is a pattern of the shell's kind (*, ?, [...]) and stands for all that match, in the catalogue's order. Throws a
// Refusal (kUsage) for a name or pattern that fits none.
std::vector<Diagnostic> selectDiagnostics(const std::vector<Diagnostic>& catalogue,
                                          const std::vector<std::string>& names);

// True when `pattern` is, or matches, `name`.
bool matchesName(const std::string& pattern, const std::string& name);

// True when the text has a character that is special in patterns.
bool isPattern(const std::string& text);

std::vector<std::string> namesOf(const std::vector<Diagnostic>& diagnostics);

}  // namespace quazor
