// Resolves settings and profiles to the parameter values of a run, and checks settings against the declared parameters.
// profile_check.h checks profiles.
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

// The source of a setting.
enum class OverridePlace { kEnvironment, kCommandLine };

// The environment variable with settings, separated by white space.
inline constexpr const char* kSettingsVariable = "QUAZOR_SET";

// One setting: [experiment.|analysis.]NAME=VALUE.
struct ParameterOverride {
  std::string text;          // as it was written
  std::optional<Part> part;  // nothing: wherever the parameter is declared
  std::string name;
  Value value;
  OverridePlace place = OverridePlace::kCommandLine;
};

// Throws a CommandError (kUsage) if the text does not have that form or the value is not a finite number.
ParameterOverride parseOverride(const std::string& text, OverridePlace place = OverridePlace::kCommandLine);

// The settings in the environment. Throws like parseOverride.
std::vector<ParameterOverride> overridesOfEnvironment();

// A declared parameter and its value for a run.
struct ResolvedParameter {
  std::string name;
  QZNumberParameter declaration;
  std::optional<Value> value;               // nothing: not set
  std::string source;                       // user-readable source of the value; empty if not set
  std::optional<QZParameterRange> range{};  // nothing: not known, or the parameters are those of a record
};

struct ResolvedParameters {
  std::vector<ResolvedParameter> experiment;  // in the order of their declaration
  std::vector<ResolvedParameter> analysis;

  const std::vector<ResolvedParameter>& of(Part part) const {
    return part == Part::kExperiment ? experiment : analysis;
  }
};

// The values that are set, in the form that a setup receives.
Dictionary dictionaryOf(const std::vector<ResolvedParameter>& parameters);

// A diagnostic and its description.
// Thread: one at a time.
struct DescribedDiagnostic {
  Diagnostic diagnostic;
  DiagnosticDescription description;

  // The diagnostic's, or that of an experiment on its own.
  const std::string& summary() const {
    return diagnostic.experimentOnly ? description.experiment.summary() : diagnostic.summary;
  }

  const OrderedMap<QZNumberParameter>& parameters(Part part) const {
    return (part == Part::kExperiment ? description.experiment : description.analysis).parameters();
  }

  // What the parameters of that part accept, where it is known.
  const OrderedMap<QZParameterRange>& ranges(Part part) const {
    return part == Part::kExperiment ? description.experimentRanges : description.analysisRanges;
  }
  OrderedMap<QZParameterRange>& ranges(Part part) {
    return part == Part::kExperiment ? description.experimentRanges : description.analysisRanges;
  }
};

// "must be >= 0 s, not -1", the end of a sentence about the parameter, if it is known not to accept the value; else
// nothing.
std::optional<std::string> rangeProblem(const DescribedDiagnostic& diagnostic, Part part, std::string_view name,
                                        const Value& value);

// The names of the parameters that the diagnostics declare in that part or, without one, in any.
std::vector<std::string> declaredNames(const std::vector<DescribedDiagnostic>& diagnostics, std::optional<Part> part);

// Throws a CommandError (kUsage) if no selected diagnostic declares the parameter of a setting, if one that does cannot
// accept the value, or if one source sets the same parameter twice.
void checkOverrides(const std::vector<ParameterOverride>& settings, const std::vector<DescribedDiagnostic>& selected);

// The parameters of one diagnostic or experiment. Later sources override earlier ones: the profiles in order, the
// environment, the command line.
ResolvedParameters resolveParameters(const DescribedDiagnostic& diagnostic, const std::vector<Profile>& profiles,
                                     const std::vector<ParameterOverride>& settings);

// A diagnostic with the parameter values for a run.
struct ResolvedDiagnostic {
  DescribedDiagnostic described;
  ResolvedParameters parameters;
};

// A sentence about the first required parameter that has no value; empty if there is none.
std::string missingParameterOf(const DescribedDiagnostic& diagnostic, const ResolvedParameters& parameters);

}  // namespace quazor
