// From settings and profile to the parameter values of one run, checked against what the diagnostics declare.
#pragma once

#include "contract/results.h"
#include "contract/value.h"
#include "host/plugin/diagnostic_registry.h"
#include "host/plugin/profile.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Where a setting stands.
enum class OverridePlace { kEnvironment, kCommandLine };

// The variable of the environment with settings, separated by white space.
inline constexpr const char* kSettingsVariable = "QUAZOR_SET";

// What one setting says: [experiment.|analysis.]NAME=VALUE.
struct ParameterOverride {
  std::string text;          // as it was written
  std::optional<Part> half;  // nothing: wherever the parameter is declared
  std::string name;
  Value value;
  OverridePlace place = OverridePlace::kCommandLine;
};

// Throws a CommandError (kUsage) for a text that is not of that form or whose value is no finite number.
ParameterOverride parseOverride(const std::string& text, OverridePlace place = OverridePlace::kCommandLine);

// The settings of the environment. Throws as parseOverride.
std::vector<ParameterOverride> overridesOfEnvironment();

// A declared parameter and its value for a run.
struct ResolvedParameter {
  std::string name;
  QZNumberParameter declaration;
  std::optional<Value> value;  // nothing: not set
  std::string source;          // where the value comes from, for people; empty when not set
};

struct ResolvedParameters {
  std::vector<ResolvedParameter> experiment;  // in the order of their declaration
  std::vector<ResolvedParameter> analysis;

  const std::vector<ResolvedParameter>& of(Part half) const {
    return half == Part::kExperiment ? experiment : analysis;
  }
};

// The values that are set, as setups take them.
Dictionary dictionaryOf(const std::vector<ResolvedParameter>& parameters);

// A diagnostic and what it declares.
struct DescribedDiagnostic {
  Diagnostic diagnostic;
  DiagnosticDescription description;

  // The diagnostic's, or that of an experiment on its own.
  const std::string& summary() const {
    return diagnostic.experimentOnly ? description.experiment.summary() : diagnostic.summary;
  }
};

// Throws a CommandError (kCannotRead) for a profile's parameter that no diagnostic or experiment of its entry declares
// and, unless the profile may name others, for an entry that fits none. An entry for something that was not described,
// or could not be, is passed over.
void checkProfile(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue);

// What was not described, and might declare a parameter that an entry of the profile sets, while nothing described that
// the entry fits declares it: before it is described, checkProfile cannot tell whether the entry is wrong.
std::vector<Diagnostic> diagnosticsToDescribe(const Profile& profile,
                                              const std::vector<DescribedDiagnostic>& catalogue);

// Throws a CommandError (kUsage) for a setting whose parameter none of the selected declares, and for two settings of
// one parameter in one place.
void checkOverrides(const std::vector<ParameterOverride>& settings, const std::vector<DescribedDiagnostic>& selected);

// The parameters of one diagnostic or experiment. The last that has a value for a parameter wins: the profiles in their
// order, then the environment's settings, then the command line's.
ResolvedParameters resolveParameters(const DescribedDiagnostic& diagnostic, const std::vector<Profile>& profiles,
                                     const std::vector<ParameterOverride>& settings);

// A diagnostic with the values its parameters would have in a run.
struct ResolvedDiagnostic {
  DescribedDiagnostic described;
  ResolvedParameters parameters;
};

// Throws a CommandError (kUsage) when a required parameter has no value.
void requireParameters(const DescribedDiagnostic& diagnostic, const ResolvedParameters& parameters);

}  // namespace quazor
