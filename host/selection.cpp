#include "host/selection.h"

#include "host/plugin_loader.h"
#include "host/profile.h"

#include <algorithm>
#include <utility>

namespace quazor {

namespace {

Wanted wantedBy(Command command) {
  if (command == Command::kRun) return Wanted::kDiagnostics;
  return command == Command::kExperiment ? Wanted::kExperiments : Wanted::kDescribable;
}

std::vector<Diagnostic> allWanted(const std::vector<Diagnostic>& catalogue, Wanted wanted, bool mayBeNone) {
  std::vector<Diagnostic> all = allOf(catalogue, wanted);
  if (!all.empty() || mayBeNone) return all;
  if (wanted == Wanted::kExperiments) throw Refusal(ExitCode::kUsage, "the loaded plug-ins have no experiment");
  const std::string hint = catalogue.empty() ? "" : ", only experiments; 'quazor experiment --all' runs them";
  throw Refusal(ExitCode::kUsage, "the loaded plug-ins have no diagnostic" + hint);
}

std::vector<Diagnostic> wantedOf(const std::vector<Diagnostic>& catalogue, const Options& options, bool mayBeNone) {
  const Wanted wanted = wantedBy(options.command);
  if (options.all) return allWanted(catalogue, wanted, mayBeNone);
  std::vector<std::string> names = options.names;
  if (mayBeNone) {
    std::erase_if(names, [&](const std::string& name) {
      return std::none_of(catalogue.begin(), catalogue.end(),
                          [&name](const Diagnostic& one) { return matchesName(name, one.name); });
    });
  }
  return selectDiagnostics(catalogue, wanted, names);
}

std::vector<Profile> profilesOf(const Options& options, const Installation& installation,
                                const std::vector<DescribedDiagnostic>& catalogue) {
  std::vector<Profile> profiles;
  if (!options.withoutProfile) {
    // The installed profile may have entries for plug-ins that are not loaded now; a file that was named may not.
    const bool named = !options.profile.empty();
    profiles.push_back(readProfile(named ? options.profile : installation.defaultProfile()));
    checkProfile(profiles.back(), catalogue, named);
  }
  for (const std::filesystem::path& file : options.parameterFiles) {
    profiles.push_back(readProfile(file));
    checkProfile(profiles.back(), catalogue, true);
  }
  return profiles;
}

}  // namespace

IsolationOptions isolationOf(const Options& options, const Installation& installation) {
  IsolationOptions isolation{options.plugins, options.memory, options.deadlines};
  if (isolation.plugins.empty()) isolation.plugins.push_back(installation.defaultPlugin());
  return isolation;
}

Survey surveyOf(const Options& options, const Installation& installation,
                const std::function<bool(const Diagnostic&)>& isDescribed) {
  const IsolationOptions isolation = isolationOf(options, installation);
  Survey survey;
  if (options.inProcess) {
    loadPlugins(isolation.plugins);
    for (const Diagnostic& one : catalogueOf(QZLab::defaultLab())) {
      survey.catalogue.push_back({one, isDescribed(one) ? describeDiagnostic(one) : DiagnosticDescription()});
    }
    return survey;
  }
  WatchedSignals signals;
  survey = surveyPlugins(isolation, signals, isDescribed);
  if (survey.interrupted) throw Refusal(ExitCode::kInterrupted, "interrupted while the plug-ins were loaded");
  return survey;
}

Selection select(const Options& options, const Installation& installation) {
  Survey survey = surveyOf(options, installation, [](const Diagnostic& /*one*/) { return true; });
  const std::vector<DescribedDiagnostic>& described = survey.catalogue;
  std::vector<Diagnostic> catalogue;
  catalogue.reserve(described.size());
  for (const DescribedDiagnostic& one : described) catalogue.push_back(one.diagnostic);

  const std::vector<Diagnostic> wanted = wantedOf(catalogue, options, !survey.failed.empty());
  const std::vector<Profile> profiles = profilesOf(options, installation, described);
  std::vector<Setting> settings = settingsOfEnvironment();
  settings.insert(settings.end(), options.settings.begin(), options.settings.end());
  std::vector<DescribedDiagnostic> selected;
  for (const Diagnostic& one : wanted) {
    for (const DescribedDiagnostic& candidate : described) {
      const Diagnostic& other = candidate.diagnostic;
      if (other.name == one.name && other.experimentOnly == one.experimentOnly) selected.push_back(candidate);
    }
  }
  if (!selected.empty()) checkSettings(settings, selected);
  Selection selection{{}, std::move(survey.failed)};
  for (DescribedDiagnostic& one : selected) {
    BoundParameters parameters = bindParameters(one, profiles, settings);
    selection.diagnostics.push_back({std::move(one), std::move(parameters)});
  }
  return selection;
}

}  // namespace quazor
