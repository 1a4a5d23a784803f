// From settings and profile to the parameter values of one run, checked against what the diagnostics declare.
#pragma once

#include "contract/results.h"
#include "contract/value.h"
#include "host/plugin/catalogue.h"
#include "host/plugin/profile.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// Where a setting stands.
enum class SettingPlace { kEnvironment, kCommandLine };

// The variable of the environment with settings, separated by white space.
inline constexpr const char* kSettingsVariable = "QUAZOR_SET";

// What one setting says: [experiment.|analysis.]NAME=VALUE.
struct Setting {
  std::string text;          // as it was written
  std::optional<Half> half;  // nothing: wherever the parameter is declared
  std::string name;
  Value value;
  SettingPlace place = SettingPlace::kCommandLine;
};

// Throws a Refusal (kUsage) for a text that is not of that form or whose value is no finite number.
Setting parseSetting(const std::string& text, SettingPlace place = SettingPlace::kCommandLine);

// The settings of the environment. Throws as parseSetting.
std::vector<Setting> settingsOfEnvironment();

// A declared parameter and its value for a run.
struct BoundParameter {
  std::string name;
  QZNumberParameter declaration;
  std::optional<Value> value;  // nothing: not set
  std::string source;          // where the value comes from, for people; empty when not set
};

struct BoundParameters {
  std::vector<BoundParameter> experiment;  // in the order of their declaration
  std::vector<BoundParameter> analysis;

  const std::vector<BoundParameter>& of(Half half) const { return half == Half::kExperiment ? experiment : analysis; }
};

// The values that are set, as setups take them.
Dictionary dictionaryOf(const std::vector<BoundParameter>& parameters);

// A diagnostic and what it declares.
struct DescribedDiagnostic {
  Diagnostic diagnostic;
  DiagnosticDescription description;

  // The diagnostic's, or that of an experiment on its own.
  const std::string& summary() const {
    return diagnostic.experimentOnly ? description.experiment.summary() : diagnostic.summary;
  }
};

// Throws a Refusal (kCannotRead) for a profile's parameter that no diagnostic or experiment of its entry declares and,
// unless the profile may name others, for an entry that fits none. An entry for something that was not described, or
// could not be, is passed over.
void checkProfile(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue);

// What was not described, and might declare a parameter that an entry of the profile sets, while nothing described that
// the entry fits declares it: before it is described, checkProfile cannot tell whether the entry is wrong.
std::vector<Diagnostic> inDoubt(const Profile& profile, const std::vector<DescribedDiagnostic>& catalogue);

// Throws a Refusal (kUsage) for a setting whose parameter none of the selected declares, and for two settings of one
// parameter in one place.
void checkSettings(const std::vector<Setting>& settings, const std::vector<DescribedDiagnostic>& selected);

// The parameters of one diagnostic or experiment. The last that has a value for a parameter wins: the profiles in their
// order, then the environment's settings, then the command line's.
BoundParameters bindParameters(const DescribedDiagnostic& diagnostic, const std::vector<Profile>& profiles,
                               const std::vector<Setting>& settings);

// A diagnostic with the values its parameters would have in a run.
struct BoundDiagnostic {
  DescribedDiagnostic described;
  BoundParameters parameters;
};

// Throws a Refusal (kUsage) when a required parameter has no value.
void requireParameters(const DescribedDiagnostic& diagnostic, const BoundParameters& parameters);

}  // namespace quazor
