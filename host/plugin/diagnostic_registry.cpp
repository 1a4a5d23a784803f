#include "host/plugin/diagnostic_registry.h"

#include "base/text/input_error.h"
#include "base/text/nearest_name.h"
#include "host/error/exit_code.h"
#include "host/error/host_error.h"
#include "host/plugin/null_platform.h"
#include "host/plugin/parameter_range.h"
#include "host/text/name_pattern.h"

#include <algorithm>
#include <iterator>
#include <string_view>
#include <utility>

namespace quazor {

namespace {

std::vector<std::string> diagnosticsWith(const QZLab& lab, const std::string& experiment) {
  std::vector<std::string> names;
  for (const QZLab::Registration& one : lab.registrations()) {
    if (one.kind == QZLab::Kind::kDiagnostic && one.experimentName == experiment) names.push_back(one.name);
  }
  return names;
}

template <class Test>
std::vector<Diagnostic> thoseThat(const std::vector<Diagnostic>& diagnostics, Test test) {
  std::vector<Diagnostic> those;
  std::copy_if(diagnostics.begin(), diagnostics.end(), std::back_inserter(those), test);
  return those;
}

bool isWanted(const Diagnostic& one, Wanted wanted) {
  switch (wanted) {
    case Wanted::kDiagnostics: return !one.experimentOnly;
    case Wanted::kExperiments: return one.experimentOnly;
    case Wanted::kDescribable: break;
  }
  return one.usedBy.empty();
}

// A diagnostic and an experiment on its own may have the same name.
bool isSame(const Diagnostic& one, const Diagnostic& other) {
  return one.name == other.name && one.experimentOnly == other.experimentOnly;
}

// The entries that an exact name can select; a pattern can select them only if it matches no wanted entry.
std::vector<Diagnostic> reachable(const std::vector<Diagnostic>& catalogue, Wanted wanted) {
  return wanted == Wanted::kDescribable ? catalogue : allOf(catalogue, wanted);
}

std::string_view nounOf(Wanted wanted) {
  switch (wanted) {
    case Wanted::kDiagnostics: return "diagnostic";
    case Wanted::kExperiments: return "experiment";
    case Wanted::kDescribable: break;
  }
  return "diagnostic or experiment";
}

[[noreturn]] void refuseName(const std::vector<Diagnostic>& catalogue, Wanted wanted, const std::string& name) {
  const std::string quoted = "'" + name + "'";
  const std::string noun(nounOf(wanted));
  const auto other = std::find_if(catalogue.begin(), catalogue.end(),
                                  [&name](const Diagnostic& one) { return matchesName(name, one.name); });
  if (other != catalogue.end()) {
    const std::string rest =
        other->experimentOnly ? "an experiment and has no limits; run it with 'quazor experiment " + other->name + "'"
                              : "a diagnostic; run it with 'quazor run " + other->name +
                                    "', or only its experiment with 'quazor experiment " + other->experimentName + "'";
    const std::string subject = isPattern(name) ? "no " + noun + " matches " + quoted + ", but " + other->name : quoted;
    throw CommandError(ExitCode::kUsage, subject + " is " + rest);
  }
  if (isPattern(name)) throw CommandError(ExitCode::kUsage, "no " + noun + " matches " + quoted);
  throw CommandError(ExitCode::kUsage, "there is no " + noun + " " + quoted +
                                           didYouMeanOrPattern(name, namesOf(reachable(catalogue, wanted))));
}

bool failNothingMade(const std::string& name, DiagnosticErrorPtr* error) {
  *error = hostError(HostErrorCode::kNothingMade, "the factory of " + name + " returned no object");
  return false;
}

// What an experiment or analysis says about its parameters, if it says anything.
template <class Made>
OrderedMap<QZParameterRange> rangesOf(const Made& made) {
  const auto* const ranges = dynamic_cast<const QZParameterRanges*>(&made);
  return ranges == nullptr ? OrderedMap<QZParameterRange>() : ranges->parameterRanges();
}

// Stores an error and clears the ranges if one is nonsense.
bool checkRanges(const std::string& name, OrderedMap<QZParameterRange>& ranges, const QZDescription& description,
                 DiagnosticErrorPtr* error) {
  try {
    validateRanges(ranges, description);
    return true;
  } catch (const InputError& problem) {
    *error = hostError(HostErrorCode::kBadRange, name + " gives " + problem.what());
    ranges = {};
    return false;
  }
}

}  // namespace

std::vector<Diagnostic> catalogueOf(const QZLab& lab) {
  std::vector<Diagnostic> catalogue;
  for (const QZLab::Registration& one : lab.registrations()) {
    if (one.kind != QZLab::Kind::kDiagnostic) continue;
    const QZLab::Registration* experiment = lab.find(QZLab::Kind::kExperiment, one.experimentName);
    const QZLab::Registration* analysis = lab.find(QZLab::Kind::kAnalysis, one.analysisName);
    if (experiment == nullptr || analysis == nullptr) continue;
    catalogue.push_back({one.name, one.summary, one.experimentName, one.analysisName, experiment->makeExperiment,
                         analysis->makeAnalysis});
  }
  for (const QZLab::Registration& one : lab.registrations()) {
    if (one.kind != QZLab::Kind::kExperiment) continue;
    catalogue.push_back(
        {one.name, {}, one.name, {}, one.makeExperiment, nullptr, true, diagnosticsWith(lab, one.name)});
  }
  return catalogue;
}

std::optional<Diagnostic> registeredDiagnostic(const QZLab& lab, const Diagnostic& wanted) {
  for (Diagnostic& one : catalogueOf(lab)) {
    if (isSame(one, wanted)) return std::move(one);
  }
  return std::nullopt;
}

DiagnosticDescription describeDiagnostic(const Diagnostic& diagnostic) {
  DiagnosticDescription description;
  installPlatform(nullPlatform());
  const bool isDescribed =
      callPlugin("describing " + diagnostic.experimentName, &description.error, [&](DiagnosticErrorPtr* error) {
        const std::shared_ptr<QZExperiment> experiment = diagnostic.makeExperiment();
        if (experiment == nullptr) return failNothingMade(diagnostic.experimentName, error);
        description.experiment = experiment->experimentDescription();
        description.experimentRanges = rangesOf(*experiment);
        return checkRanges(diagnostic.experimentName, description.experimentRanges, description.experiment, error);
      });
  if (!isDescribed) description.experiment = QZDescription("");
  if (!isDescribed || diagnostic.experimentOnly) return description;
  callPlugin("describing " + diagnostic.analysisName, &description.error, [&](DiagnosticErrorPtr* error) {
    const std::shared_ptr<QZAnalysis> analysis = diagnostic.makeAnalysis();
    if (analysis == nullptr) return failNothingMade(diagnostic.analysisName, error);
    description.analysis = analysis->analysisDescription();
    description.analysisRanges = rangesOf(*analysis);
    return checkRanges(diagnostic.analysisName, description.analysisRanges, description.analysis, error);
  });
  return description;
}

DiagnosticDescription describeIfWanted(const Diagnostic& diagnostic, const std::vector<Diagnostic>& wanted) {
  if (contains(wanted, diagnostic)) return describeDiagnostic(diagnostic);
  DiagnosticDescription none;
  none.isAsked = false;
  return none;
}

std::vector<Diagnostic> allOf(const std::vector<Diagnostic>& catalogue, Wanted wanted) {
  return thoseThat(catalogue, [wanted](const Diagnostic& one) { return isWanted(one, wanted); });
}

std::vector<Diagnostic> selectDiagnostics(const std::vector<Diagnostic>& catalogue, Wanted wanted,
                                          const std::vector<std::string>& names) {
  std::vector<Diagnostic> selected;
  const std::vector<Diagnostic> all = allOf(catalogue, wanted);
  const std::vector<Diagnostic> byName = reachable(catalogue, wanted);
  for (const std::string& name : names) {
    std::vector<Diagnostic> found = thoseThat(byName, [&name](const Diagnostic& one) { return one.name == name; });
    const auto matches = [&name](const Diagnostic& one) { return matchesName(name, one.name); };
    if (found.empty()) found = thoseThat(all, matches);
    if (found.empty()) found = thoseThat(byName, matches);
    if (found.empty()) refuseName(catalogue, wanted, name);
    for (Diagnostic& one : found) {
      if (!contains(selected, one)) selected.push_back(std::move(one));
    }
  }
  return selected;
}

bool contains(const std::vector<Diagnostic>& diagnostics, const Diagnostic& wanted) {
  return std::any_of(diagnostics.begin(), diagnostics.end(),
                     [&wanted](const Diagnostic& one) { return isSame(one, wanted); });
}

std::vector<std::string> namesOf(const std::vector<Diagnostic>& diagnostics) {
  std::vector<std::string> names;
  names.reserve(diagnostics.size());
  for (const Diagnostic& diagnostic : diagnostics) names.push_back(diagnostic.name);
  return names;
}

}  // namespace quazor
