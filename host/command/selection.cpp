#include "host/command/selection.h"

#include "base/text/nearest_name.h"
#include "contract/message_format.h"
#include "host/command/explanations.h"
#include "host/command/unknown_name.h"
#include "host/error/nesting.h"
#include "host/model/limit_check.h"
#include "host/plugin/plugin_loader.h"
#include "host/plugin/plugin_trust.h"
#include "host/plugin/profile.h"
#include "host/plugin/profile_check.h"
#include "host/text/name_pattern.h"
#include "host/text/shell_word.h"
#include "host/text/table.h"

#include <algorithm>
#include <cstddef>
#include <iterator>
#include <optional>
#include <system_error>
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
  if (wanted == Wanted::kExperiments) throw CommandError(ExitCode::kUsage, "the loaded plug-ins have no experiments");
  const std::string hint = catalogue.empty() ? "" : ", only experiments; run them with 'quazor experiment --all'";
  throw CommandError(ExitCode::kUsage, "the loaded plug-ins have no diagnostics" + hint);
}

std::vector<Diagnostic> namedBy(const std::vector<Diagnostic>& catalogue, const Options& options, bool mayBeNone) {
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

// Removes what the pattern of --except fits.
void leaveOut(const std::string& pattern, bool mayBeNone, std::vector<Diagnostic>& selected) {
  const std::size_t removed =
      std::erase_if(selected, [&pattern](const Diagnostic& one) { return matchesName(pattern, one.name); });
  if (removed > 0 || mayBeNone) return;
  throw CommandError(ExitCode::kUsage, "--except '" + pattern + "' fits nothing of what is selected to run");
}

// Adds the profile in the file, after those that it is based on. The installed ones serve any set of plug-ins.
void addProfile(const std::filesystem::path& file, const Installation& installation, std::vector<Profile>& profiles) {
  for (Profile& one : readProfileAndBases(file, installation.profileSource())) {
    one.mayNameOthers = installation.isInstalledProfile(one.file);
    one.showsPath = !one.mayNameOthers && !installation.profileSource()(one.file.stem().string(), {one.file}).empty();
    profiles.push_back(std::move(one));
  }
}

// Adds the profile that --profile or --parameters names.
void addChosenProfile(const std::filesystem::path& name, const Installation& installation,
                      std::vector<Profile>& profiles) {
  const std::filesystem::path file = installation.profile(name);
  std::error_code ignored;
  if (file == name && !name.has_parent_path() && !std::filesystem::exists(name, ignored)) {
    throw CommandError(ExitCode::kCannotRead,
                       name.string() + ": the file does not exist" +
                           didYouMeanOf(name.string(), "the installed profiles", installation.profileNames()));
  }
  addProfile(file, installation, profiles);
}

[[noreturn]] void refuseInterrupted() {
  throw CommandError(ExitCode::kInterrupted, "interrupted while loading the plug-ins");
}

// What the installed plug-ins have that are not loaded; nothing if one of them could not be asked.
std::optional<std::vector<Diagnostic>> diagnosticsOfOthers(const Options& options, const Installation& installation,
                                                           WatchedSignals* signals) {
  std::vector<Diagnostic> diagnostics;
  // The loaded plug-ins may have started threads, so that no process can be made.
  if (options.inProcess) return diagnostics;
  const PluginScan scan = scanOfOthers(options, installation, signals);
  if (scan.interrupted) refuseInterrupted();
  for (const DescribedDiagnostic& one : scan.catalogue) diagnostics.push_back(one.diagnostic);
  return scan.failed.empty() ? std::optional(std::move(diagnostics)) : std::nullopt;
}

// Checks a profile with an entry that fits nothing that is loaded. If that is its only mistake, it is refused with what
// to do, or a remark is returned if it `isOnlyTold`. Returns an empty text if others have what the entries are for.
std::string remarkOnUnmatched(Profile profile, bool isOnlyTold, const std::vector<DescribedDiagnostic>& catalogue,
                              const std::vector<Diagnostic>& others) {
  profile.mayNameOthers = false;
  try {
    checkProfile(profile, catalogue, others);
  } catch (const CommandError& problem) {
    profile.mayNameOthers = true;
    checkProfile(profile, catalogue);
    if (isOnlyTold) return problem.what();
    throw CommandError(problem.code(),
                       problem.what() + std::string(" An entry must be for a plug-in that is loaded or installed: "
                                                    "correct the name, remove the entry, or load the plug-in with "
                                                    "--plugin."));
  }
  return {};
}

// Checks the profiles, and returns the remarks on them. An installed one has entries for plug-ins that are loaded only
// when they are named, so that of it only what seems misspelt is looked for in them; with --plugin or a hidden plug-in,
// it may have entries for what is not loaded. A plug-in that could not be asked may have what an entry is for.
std::vector<std::string> checkProfilesToRun(const std::vector<Profile>& profiles, const Options& options,
                                            const Installation& installation, const PluginScan& loaded,
                                            WatchedSignals* signals) {
  std::vector<std::string> remarks;
  std::optional<std::optional<std::vector<Diagnostic>>> asked;  // once, for all profiles
  for (const Profile& one : profiles) {
    const bool isExpected = one.mayNameOthers && (!options.plugins.empty() || !installation.hiddenPlugins().empty());
    const bool isInDoubt =
        loaded.failed.empty() && !isExpected && namesOthers(one, loaded.catalogue, one.mayNameOthers);
    if (isInDoubt && !asked) asked = diagnosticsOfOthers(options, installation, signals);
    if (isInDoubt && *asked) {
      // Not every user can change an installed one, and with --in-process the other plug-ins are not asked.
      std::string remark = remarkOnUnmatched(one, one.mayNameOthers || options.inProcess, loaded.catalogue, **asked);
      if (!remark.empty()) remarks.push_back(std::move(remark));
    } else {
      Profile lenient = one;
      lenient.mayNameOthers = true;
      checkProfile(lenient, loaded.catalogue);
    }
  }
  return remarks;
}

std::vector<Profile> profilesOf(const Options& options, const Installation& installation) {
  std::vector<Profile> profiles;
  if (!options.withoutProfile && options.profile.empty()) {
    addProfile(installation.defaultProfile(), installation, profiles);
    // The record has all limits of its run, those of that run's default profile, too.
    if (options.recorded) {
      for (Profile& one : profiles) one.limits.clear();
    }
  }
  if (options.recorded) profiles.push_back(*options.recorded);
  if (!options.withoutProfile && !options.profile.empty()) {
    addChosenProfile(options.profile, installation, profiles);
  }
  for (const std::filesystem::path& name : options.parameterFiles) addChosenProfile(name, installation, profiles);
  return profiles;
}

// The end of a sentence about a parameter without a value, if the hidden default profile has an entry for it.
std::string hintOfHiddenDefault(const Diagnostic& diagnostic, const Installation& installation) {
  const std::filesystem::path hidden = hiddenDefaultProfile(installation);
  if (hidden.empty()) return {};
  const Profile shipped = readProfileToCheck(hidden);
  const std::vector<ProfileEntry>& entries = diagnostic.experimentOnly ? shipped.experiments : shipped.entries;
  const bool hasEntry = std::any_of(entries.begin(), entries.end(), [&diagnostic](const ProfileEntry& entry) {
    return matchesName(entry.name, diagnostic.name);
  });
  return hasEntry ? "; " + installation.defaultProfile().string() + " " + kHidesDefaultProfile : std::string();
}

// Requests the descriptions that are needed to check the profiles.
void describeForProfiles(const Options& options, const Installation& installation, const std::vector<Profile>& profiles,
                         std::vector<DescribedDiagnostic>& catalogue, WatchedSignals* signals) {
  std::vector<Diagnostic> undescribed;
  for (const Profile& profile : profiles) {
    const std::vector<Diagnostic> more = diagnosticsToDescribe(profile, catalogue);
    undescribed.insert(undescribed.end(), more.begin(), more.end());
  }
  if (undescribed.empty()) return;
  if (options.inProcess) {  // the plug-ins are already loaded
    for (DescribedDiagnostic& one : catalogue) {
      if (contains(undescribed, one.diagnostic)) one.description = describeDiagnostic(one.diagnostic);
    }
    return;
  }
  std::optional<WatchedSignals> own;
  if (signals == nullptr) signals = &own.emplace();
  if (!describeIsolated(isolationOf(options, installation), *signals, undescribed, catalogue)) refuseInterrupted();
}

}  // namespace

std::vector<Diagnostic> wantedOf(const std::vector<Diagnostic>& catalogue, const Options& options, bool mayBeNone) {
  std::vector<Diagnostic> selected = namedBy(catalogue, options, mayBeNone);
  for (const std::string& pattern : options.choice.except) leaveOut(pattern, mayBeNone, selected);
  if (selected.empty() && !options.choice.except.empty() && !mayBeNone) {
    throw CommandError(ExitCode::kUsage, "--except leaves nothing to run");
  }
  return selected;
}

std::vector<Diagnostic> wantedWithWayOut(const std::vector<Diagnostic>& catalogue, const Options& options,
                                         const Installation& installation, bool mayBeNone) {
  try {
    return wantedOf(catalogue, options, mayBeNone);
  } catch (const CommandError& refusal) {
    refuseUnknownName(catalogue, options, installation, refusal);
    throw;
  }
}

namespace {

// The options that load the plug-ins of a record, with the installed one of the same file name for one that is not
// where it was, or else FILE.
std::string pluginOptions(const std::vector<std::string>& recorded,
                          const std::vector<std::filesystem::path>& installed) {
  std::string options;
  for (const std::string& name : recorded) {
    std::error_code ignored;
    std::string now = std::filesystem::exists(name, ignored) ? shellWord(name) : "FILE";
    for (const std::filesystem::path& one : installed) {
      if (now == "FILE" && one.filename() == std::filesystem::path(name).filename()) now = shellWord(one.string());
    }
    options += " --plugin " + now;
  }
  return options;
}

}  // namespace

std::vector<std::filesystem::path> recordedPlugins(const std::vector<std::string>& recorded,
                                                   const Installation& installation) {
  const std::vector<std::filesystem::path> installed = installation.allPlugins();
  std::vector<std::filesystem::path> plugins;
  for (const std::string& name : recorded) {
    const auto found = std::find_if(installed.begin(), installed.end(), [&name](const std::filesystem::path& one) {
      std::error_code ignored;
      return std::filesystem::equivalent(one, name, ignored);
    });
    if (found == installed.end()) {
      std::error_code ignored;
      const bool isThere = std::filesystem::exists(name, ignored);
      throw CommandError(ExitCode::kCannotRead, formatMessage("the record names the plug-in '%@', which is %@:%@", name,
                                                              isThere ? "not an installed one; to load it, name it"
                                                                      : "no longer there; say where it is now",
                                                              pluginOptions(recorded, installed)));
    }
    plugins.push_back(*found);
  }
  return plugins;
}

IsolationOptions isolationOf(const Options& options, const Installation& installation) {
  IsolationOptions isolation{options.plugins, options.memory, options.deadlines, options.grace, options.heartbeat};
  if (!isolation.plugins.empty()) return isolation;
  isolation.plugins = installation.defaultPlugins();
  isolation.unasked = !isolation.plugins.empty();
  if (!isolation.unasked) isolation.plugins.push_back(installation.shippedPlugin());  // to be told that it is missing
  return isolation;
}

namespace {

// Adds to the errors of plug-ins that could not be loaded that others are not loaded because of them.
void tellWhatFailedOnesHide(const std::vector<HiddenPlugin>& hidden, std::vector<FailedPlugin>& failed) {
  for (FailedPlugin& one : failed) {
    for (const HiddenPlugin& other : hidden) {
      if (other.by != one.file) continue;
      const std::string hint = formatMessage("; it hides '%@', which has the same file name", other.file.string());
      one.error = errorWithMore(*one.error, hint);
    }
  }
}

}  // namespace

PluginScan scanOf(const Options& options, const Installation& installation, const DiagnosticChoice& described,
                  WatchedSignals* signals) {
  const IsolationOptions isolation = isolationOf(options, installation);
  PluginScan scan;
  if (options.inProcess) {
    requireTrustedPlugins(isolation.plugins);
    loadPlugins(isolation.plugins);
    const std::vector<Diagnostic> catalogue = catalogueOf(QZLab::defaultLab());
    const std::vector<Diagnostic> wanted = described(catalogue);
    for (const Diagnostic& one : catalogue) scan.catalogue.push_back({one, describeIfWanted(one, wanted)});
    return scan;
  }
  std::optional<WatchedSignals> own;
  if (signals == nullptr) signals = &own.emplace();
  scan = scanPlugins(isolation, *signals, described);
  if (signals->requestsToEnd() > 0) refuseInterrupted();
  if (options.plugins.empty()) tellWhatFailedOnesHide(installation.hiddenPlugins(), scan.failed);
  return scan;
}

PluginScan scanForSelection(const Options& options, const Installation& installation, WatchedSignals* signals) {
  return scanOf(
      options, installation,
      [&options](const std::vector<Diagnostic>& catalogue) { return wantedOf(catalogue, options, true); }, signals);
}

Selection select(const Options& options, const Installation& installation, WatchedSignals* signals) {
  PluginScan scan = scanForSelection(options, installation, signals);
  std::vector<DescribedDiagnostic>& described = scan.catalogue;
  std::vector<Diagnostic> catalogue;
  catalogue.reserve(described.size());
  for (const DescribedDiagnostic& one : described) catalogue.push_back(one.diagnostic);

  const std::vector<Diagnostic> wanted = wantedWithWayOut(catalogue, options, installation, !scan.failed.empty());
  std::vector<Profile> profiles = profilesOf(options, installation);
  describeForProfiles(options, installation, profiles, described, signals);
  addExplainedRanges(installation.explanations(), described);
  std::vector<std::string> remarks = checkProfilesToRun(profiles, options, installation, scan, signals);
  std::vector<ParameterOverride> settings = overridesOfEnvironment();
  settings.insert(settings.end(), options.settings.begin(), options.settings.end());
  std::vector<DescribedDiagnostic> selected;
  for (const Diagnostic& one : wanted) {
    for (const DescribedDiagnostic& candidate : described) {
      const Diagnostic& other = candidate.diagnostic;
      if (other.name == one.name && other.experimentOnly == one.experimentOnly) selected.push_back(candidate);
    }
  }
  if (!selected.empty()) checkOverrides(settings, selected);
  Selection selection{{}, std::move(scan.failed), limitsOf(profiles), {}, std::move(remarks)};
  selection.limits.insert(selection.limits.end(), options.limits.begin(), options.limits.end());
  for (DescribedDiagnostic& one : selected) {
    ResolvedParameters parameters = resolveParameters(one, profiles, settings);
    selection.diagnostics.push_back({std::move(one), std::move(parameters)});
  }
  selection.profiles = std::move(profiles);
  return selection;
}

void tellRemarks(const Selection& selection, const std::vector<ResolvedDiagnostic>& selected, std::ostream& err) {
  std::vector<std::string> remarks = selection.remarks;
  for (const Profile& profile : selection.profiles) {
    std::vector<std::string> more = limitsForOtherValues(profile, selected);
    std::move(more.begin(), more.end(), std::back_inserter(remarks));
  }
  for (const std::string& one : remarks) err << "quazor: " << printable(one) << '\n';
}

std::filesystem::path hiddenDefaultProfile(const Installation& installation) {
  const std::filesystem::path own = installation.defaultProfile();
  const ProfileSource source = installation.profileSource();
  std::filesystem::path shipped = source("default", {own});
  return shipped.empty() || readProfileAndBases(own, source).size() > 1 ? std::filesystem::path() : shipped;
}

std::string missingParameterOf(const ResolvedDiagnostic& one, const Options& options,
                               const Installation& installation) {
  std::string problem = missingParameterOf(one.described, one.parameters);
  if (problem.empty() || options.withoutProfile) return problem;
  if (options.profile.empty() || installation.profile(options.profile) == installation.defaultProfile()) {
    return problem + hintOfHiddenDefault(one.described.diagnostic, installation);
  }
  const std::string name = options.profile.string();
  return problem + "; --profile " + name + " replaces the default profile, and --parameters " + name + " adds to it";
}

std::optional<Skip> skipOf(const std::string& name, const std::vector<SkipRule>& rules) {
  const auto fitting = std::find_if(rules.begin(), rules.end(),
                                    [&name](const SkipRule& rule) { return matchesName(rule.pattern, name); });
  return fitting == rules.end() ? std::nullopt : std::optional(fitting->skip);
}

std::vector<std::string> wantedScenarios(const std::vector<std::string>& names, const Installation& installation) {
  std::vector<std::string> all = installation.scenarioNames();
  if (names.empty()) return all;
  std::vector<std::string> wanted;
  for (const std::string& name : names) {
    if (std::filesystem::is_regular_file(name)) {
      wanted.push_back(name);
      continue;
    }
    const std::size_t before = wanted.size();
    for (const std::string& one : all) {
      if (matchesName(name, one) && std::find(wanted.begin(), wanted.end(), one) == wanted.end()) wanted.push_back(one);
    }
    const bool found = wanted.size() > before || std::find(wanted.begin(), wanted.end(), name) != wanted.end();
    if (found) continue;
    refuseGroupOfPhones(name, ExitCode::kUsage, name, installation);
    std::string wayOut = didYouMeanPath(name, all);
    if (wayOut.empty()) wayOut = std::string("; ") + kWayToPhones;
    throw CommandError(ExitCode::kUsage, formatMessage("no installed phone is called '%@'%@", name, wayOut));
  }
  return wanted;
}

}  // namespace quazor
