#include "host/plugin/parameters.h"

#include "base/text/input_error.h"
#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/error/exit_code.h"
#include "host/plugin/parameter_range.h"
#include "host/text/parameter_number.h"

#include <algorithm>
#include <cstdlib>
#include <sstream>

namespace quazor {

namespace {

// A setting as messages quote it: its source and its text.
std::string quoted(OverridePlace place, const std::string& text) {
  const std::string where = place == OverridePlace::kEnvironment ? kSettingsVariable : "--set";
  return where + " '" + text + "'";
}

std::string_view sourceOf(OverridePlace place) {
  return place == OverridePlace::kEnvironment ? "environment" : "command line";
}

// The noun for a list of them.
std::string nounOf(const std::vector<DescribedDiagnostic>& diagnostics) {
  const auto isExperiment = [](const DescribedDiagnostic& one) { return one.diagnostic.experimentOnly; };
  if (std::all_of(diagnostics.begin(), diagnostics.end(), isExperiment)) return "experiments";
  if (std::any_of(diagnostics.begin(), diagnostics.end(), isExperiment)) return "diagnostics and experiments";
  return "diagnostics";
}

bool sets(const ParameterOverride& setting, Part part, std::string_view name) {
  return (!setting.part || *setting.part == part) && setting.name == name;
}

bool contains(const std::vector<std::string>& names, const std::string& name) {
  return std::find(names.begin(), names.end(), name) != names.end();
}

// " (NAME could not be described: ...)" for the first such diagnostic: its parameters are not known.
std::string noteOfUndescribed(const std::vector<DescribedDiagnostic>& diagnostics) {
  for (const DescribedDiagnostic& one : diagnostics) {
    if (one.description.error == nullptr) continue;
    return " (" + one.diagnostic.name + " could not be described: " + one.description.error->localizedDescription() +
           ")";
  }
  return {};
}

void checkRange(const ParameterOverride& setting, const std::vector<DescribedDiagnostic>& selected) {
  for (const DescribedDiagnostic& one : selected) {
    for (const Part part : kParts) {
      if (!sets(setting, part, setting.name)) continue;
      const std::optional<std::string> problem = rangeProblem(one, part, setting.name, setting.value);
      if (!problem) continue;
      throw CommandError(ExitCode::kUsage,
                         formatMessage("%@: the parameter '%@' of %@ %@", quoted(setting.place, setting.text),
                                       setting.name, one.diagnostic.name, *problem));
    }
  }
}

const Value* findIn(const Profile& profile, const Diagnostic& diagnostic, Part part, std::string_view parameter) {
  return diagnostic.experimentOnly ? profile.findForExperiment(diagnostic.name, diagnostic.usedBy, parameter)
                                   : profile.find(diagnostic.name, part, parameter);
}

std::vector<ResolvedParameter> resolvePart(const DescribedDiagnostic& diagnostic, Part part,
                                           const std::vector<Profile>& profiles,
                                           const std::vector<ParameterOverride>& settings) {
  std::vector<ResolvedParameter> bound;
  for (const auto& [name, declaration] : diagnostic.parameters(part)) {
    ResolvedParameter parameter{name, declaration, std::nullopt, {}};
    for (const Profile& profile : profiles) {
      const Value* const value = findIn(profile, diagnostic.diagnostic, part, name);
      if (value == nullptr) continue;
      parameter.value = *value;
      parameter.source = profile.source();
    }
    for (const OverridePlace place : {OverridePlace::kEnvironment, OverridePlace::kCommandLine}) {
      for (const ParameterOverride& setting : settings) {
        if (setting.place != place || !sets(setting, part, name)) continue;
        parameter.value = setting.value;
        parameter.source = sourceOf(place);
      }
    }
    if (const QZParameterRange* const range = diagnostic.ranges(part).find(name)) parameter.range = *range;
    bound.push_back(std::move(parameter));
  }
  return bound;
}

}  // namespace

std::optional<std::string> rangeProblem(const DescribedDiagnostic& diagnostic, Part part, std::string_view name,
                                        const Value& value) {
  const QZParameterRange* const range = diagnostic.ranges(part).find(name);
  if (range == nullptr || accepts(*range, value)) return std::nullopt;
  return formatMessage("must be %@, not %@", rangeText(*range), value);
}

std::vector<std::string> declaredNames(const std::vector<DescribedDiagnostic>& diagnostics, std::optional<Part> part) {
  std::vector<std::string> names;
  for (const DescribedDiagnostic& diagnostic : diagnostics) {
    for (const Part one : kParts) {
      if (part && *part != one) continue;
      for (const auto& [name, ignored] : diagnostic.parameters(one)) names.push_back(name);
    }
  }
  return names;
}

ParameterOverride parseOverride(const std::string& text, OverridePlace place) {
  const std::string what = quoted(place, text) + ": ";
  const std::size_t equals = text.find('=');
  if (equals == std::string::npos) {
    throw CommandError(ExitCode::kUsage, what + "expected [experiment.|analysis.]NAME=VALUE");
  }
  ParameterOverride setting{text, std::nullopt, text.substr(0, equals), 0, place};
  for (const Part part : kParts) {
    const std::string prefix = std::string(nameOf(part)) + ".";
    if (setting.part || !setting.name.starts_with(prefix)) continue;
    setting.part = part;
    setting.name.erase(0, prefix.size());
  }
  if (setting.name.empty()) throw CommandError(ExitCode::kUsage, what + "the parameter name is missing");
  try {
    setting.value = parseNumber(std::string_view(text).substr(equals + 1));
  } catch (const InputError& problem) {
    throw CommandError(ExitCode::kUsage, what + problem.what());
  }
  return setting;
}

std::vector<ParameterOverride> overridesOfEnvironment() {
  std::vector<ParameterOverride> settings;
  const char* const variable = std::getenv(kSettingsVariable);
  std::istringstream texts(variable == nullptr ? "" : variable);
  for (std::string text; texts >> text;) settings.push_back(parseOverride(text, OverridePlace::kEnvironment));
  return settings;
}

Dictionary dictionaryOf(const std::vector<ResolvedParameter>& parameters) {
  Dictionary dictionary;
  for (const ResolvedParameter& parameter : parameters) {
    if (parameter.value) dictionary.set(parameter.name, *parameter.value);
  }
  return dictionary;
}

void checkOverrides(const std::vector<ParameterOverride>& settings, const std::vector<DescribedDiagnostic>& selected) {
  for (std::size_t i = 0; i < settings.size(); ++i) {
    const ParameterOverride& setting = settings[i];
    const std::vector<std::string> names = declaredNames(selected, setting.part);
    if (!contains(names, setting.name)) {
      const std::string noun = nounOf(selected);
      const std::string where = setting.part ? "no " + std::string(nameOf(*setting.part)) + " of the selected " + noun
                                             : "none of the selected " + noun;
      const bool isOfExperiment =
          setting.part == Part::kAnalysis && contains(declaredNames(selected, Part::kExperiment), setting.name);
      const std::string wayOut = isOfExperiment ? "; the experiment has it, and an analysis cannot change it"
                                                : didYouMean(setting.name, names);
      throw CommandError(ExitCode::kUsage,
                         formatMessage("%@: %@ has a parameter '%@'%@%@", quoted(setting.place, setting.text), where,
                                       setting.name, wayOut, noteOfUndescribed(selected)));
    }
    checkRange(setting, selected);
    for (std::size_t j = 0; j < i; ++j) {
      const ParameterOverride& other = settings[j];
      const bool overlap = other.place == setting.place && other.name == setting.name &&
                           (!other.part || !setting.part || *other.part == *setting.part);
      if (!overlap) continue;
      throw CommandError(ExitCode::kUsage, quoted(other.place, other.text) + " and " +
                                               quoted(setting.place, setting.text) + " set the same parameter twice");
    }
  }
}

ResolvedParameters resolveParameters(const DescribedDiagnostic& diagnostic, const std::vector<Profile>& profiles,
                                     const std::vector<ParameterOverride>& settings) {
  return {resolvePart(diagnostic, Part::kExperiment, profiles, settings),
          resolvePart(diagnostic, Part::kAnalysis, profiles, settings)};
}

std::string missingParameterOf(const DescribedDiagnostic& diagnostic, const ResolvedParameters& parameters) {
  for (const Part part : kParts) {
    for (const ResolvedParameter& one : parameters.of(part)) {
      if (one.value || !one.declaration.required()) continue;
      const std::string name =
          diagnostic.diagnostic.experimentOnly ? one.name : formatMessage("%@.%@", nameOf(part), one.name);
      return formatMessage("%@ requires the parameter %@; set it with --set %@=VALUE or in a profile",
                           diagnostic.diagnostic.name, name, name);
    }
  }
  return {};
}

}  // namespace quazor
