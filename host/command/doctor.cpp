#include "host/command/commands.h"

#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/command/expectations.h"
#include "host/command/explanations.h"
#include "host/command/plugin_review.h"
#include "host/command/selection.h"
#include "host/device/phone.h"
#include "host/plugin/profile.h"
#include "host/plugin/profile_check.h"
#include "host/plugin/shared_object.h"
#include "host/record/previous_run.h"
#include "host/text/table.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <functional>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

namespace quazor {

namespace {

// Why no file can be made at that place, for which missing folders would be made; empty if it can.
std::string problemOfNewFile(const std::filesystem::path& file) {
  std::filesystem::path folder = file.parent_path();
  std::error_code error;
  while (!folder.empty() && !std::filesystem::exists(std::filesystem::symlink_status(folder, error)) &&
         folder != folder.parent_path()) {
    folder = folder.parent_path();
  }
  if (!std::filesystem::is_directory(folder, error)) return "'" + folder.string() + "' is not a folder";
  if (::access(folder.c_str(), W_OK | X_OK) == 0) return {};
  return "'" + folder.string() + "': " + std::strerror(errno);
}

class Doctor {
 public:
  Doctor(const Options& options, const Installation& installation, Console& console)
      : options_(options), installation_(installation), console_(console) {}

  ExitCode examine() {
    const std::vector<std::filesystem::path> plugins = installation_.allPlugins();
    if (plugins.empty()) {
      tell(false, "plug-in", installation_.shippedPlugin().string(), "no plug-in found in this directory");
    }
    for (const std::filesystem::path& plugin : plugins) {
      check("plug-in", plugin.string(), [&] { return findingOfPlugin(plugin); });
    }
    checkHiddenPlugins();
    areAllLoaded_ = allFine_ && installation_.hiddenPlugins().empty();
    checkProfiles();
    checkPhones();
    check("explanations", installation_.explanations().back().string(),
          [&] { return countText(readExplanations(installation_.explanations()).size(), "explanation"); });
    checkLastRun();
    console_.out.flush();
    return allFine_ ? ExitCode::kAllPassed : ExitCode::kCannotRead;
  }

 private:
  // `look` returns a description of what it found, or throws an InputError with the reason for the refusal.
  void check(std::string_view kind, const std::string& name, const std::function<std::string()>& look) {
    try {
      tell(true, kind, name, look());
    } catch (const InputError& problem) {
      tell(false, kind, name, problem.what());
    }
  }

  void tell(bool fine, std::string_view kind, const std::string& name, const std::string& finding) {
    allFine_ = allFine_ && fine;
    print(fine ? "ok       " : "REFUSED  ", kind, name, finding);
  }

  // Something that works, but may not be what the user meant.
  void remark(std::string_view kind, const std::string& name, const std::string& finding) {
    print("REMARK   ", kind, name, finding);
  }

  void print(std::string_view rating, std::string_view kind, const std::string& name, const std::string& finding) {
    console_.out << rating << kind << ' ' << printable(name) << "\n           " << printable(finding) << '\n';
  }

  // Loads each plug-in alone: one that cannot be loaded must not hide another.
  std::string findingOfPlugin(const std::filesystem::path& plugin) {
    Options alone = options_;
    alone.plugins = {plugin};
    const PluginScan scan = scanOf(alone, installation_, [](const std::vector<Diagnostic>& all) { return all; });
    if (!scan.failed.empty()) {
      throw CommandError(ExitCode::kCannotRead, scan.failed.front().error->localizedDescription());
    }
    std::size_t diagnostics = 0;
    catalogue_.insert(catalogue_.end(), scan.catalogue.begin(), scan.catalogue.end());
    for (const DescribedDiagnostic& one : scan.catalogue) {
      if (one.description.error != nullptr) {
        throw CommandError(ExitCode::kCannotRead, one.diagnostic.name + " cannot be described: " +
                                                      one.description.error->localizedDescription());
      }
      if (!one.diagnostic.experimentOnly) ++diagnostics;
    }
    return countText(diagnostics, "diagnostic") + ", " + countText(scan.catalogue.size() - diagnostics, "experiment") +
           (isLoadedOnlyWhenNamed(plugin) ? "; loaded only if --plugin names it" : "");
  }

  void checkHiddenPlugins() {
    for (const HiddenPlugin& one : installation_.hiddenPlugins()) {
      remark("plug-in", one.file.string(),
             "it is not loaded, because '" + one.by.string() +
                 "' has its file name and hides it; to load both, rename that one");
    }
  }

  // A profile may be for other plug-ins, so that an entry that fits nothing is no mistake in a run.
  void remarkUnusedEntries(const Profile& profile) {
    Profile strict = profile;
    strict.mayNameOthers = false;
    try {
      checkProfile(strict, catalogue_);
    } catch (const CommandError& problem) {
      remark("profile", profile.file.string(), problem.what());
    }
  }

  // What the profile, the last one of `all`, is based on, and the installed one that it hides.
  std::string relationsOf(const std::filesystem::path& file, const std::vector<Profile>& all) const {
    std::string relations;
    if (all.size() > 1) relations += "; based on '" + all[all.size() - 2].file.string() + "'";
    const std::filesystem::path hidden = installation_.profileSource()(file.stem().string(), {file});
    const bool isBase = std::ranges::find(all, hidden, &Profile::file) != all.end();
    if (!hidden.empty() && !isBase) relations += "; it hides '" + hidden.string() + "'";
    return relations;
  }

  // The default profile comes first, and is missed if it is not there.
  void checkProfiles() {
    const std::filesystem::path byDefault = installation_.defaultProfile();
    std::vector<std::filesystem::path> files = {byDefault};
    for (const std::string& name : installation_.profileNames()) {
      const std::filesystem::path file = installation_.namedProfile(name);
      if (file != byDefault) files.push_back(file);
    }
    for (const std::filesystem::path& file : files) {
      Profile read;
      bool hidesDefault = false;
      check("profile", file.string(), [&] {
        const std::vector<Profile> all = readProfileAndBases(file, installation_.profileSource());
        for (const Profile& one : all) one.mistakes.throwIfAny();
        read = all.back();
        hidesDefault = file == byDefault && !hiddenDefaultProfile(installation_).empty();
        return "entries for " + countText(read.entries.size(), "diagnostic") + " and " +
               countText(read.experiments.size(), "experiment") + relationsOf(file, all) +
               (file == byDefault ? "; the default profile" : "");
      });
      if (hidesDefault) remark("profile", file.string(), std::string("it ") + kHidesDefaultProfile);
      if (areAllLoaded_) remarkUnusedEntries(read);
    }
  }

  void checkPhones() {
    const std::vector<std::string> names = installation_.scenarioNames();
    check("backend", "simulated", [&] {
      phonesOfScenario(installation_.defaultScenario(), false, 0, installation_.scenarioSource())();
      return "created the healthy phone; " + countText(names.size(), "phone") + " installed";
    });
    for (const std::string& name : names) {
      try {
        remarkUnknownExpectations(name);
      } catch (const InputError& problem) {
        tell(false, "phone", name, problem.what());
      }
    }
    checkBindings();
    check("backend", "real time (--realtime)", [&] {
      phonesOfScenario(installation_.defaultScenario(), true, 0, installation_.scenarioSource())();
      return std::string("created the healthy phone");
    });
  }

  // Reads the phone, and remarks what it expects of a diagnostic that may have been removed.
  void remarkUnknownExpectations(const std::string& name) {
    const std::filesystem::path file = installation_.scenario(name);
    const ScenarioSummary summary = summaryOfScenario(file, installation_.scenarioSource());
    if (!areAllLoaded_) return;
    std::vector<std::string> unknown;
    for (const ExpectedOutcome& one : summary.expected) {
      if (diagnosticOf(catalogue_, one) == nullptr && isNamedIn(file, one)) unknown.push_back(one.name);
    }
    if (unknown.empty()) return;
    remark("phone", file.string(),
           "it expects something of " + listText(unknown) +
               ", which no installed plug-in has; if the plug-in was removed, remove the phone, too");
  }

  void checkBindings() {
    const std::vector<std::string> names = installation_.bindingNames();
    const std::string here = "'quazor phone probe' lists this machine's devices; ";
    tell(true, "backend", "linux (--phone linux:FILE)", here + countText(names.size(), "binding") + " installed");
    for (const std::string& name : names) {
      try {
        phonesOfBinding(installation_.binding(name));
      } catch (const InputError& problem) {
        tell(false, "binding", name, problem.what());
      }
    }
  }

  void checkLastRun() {
    const std::filesystem::path file = previousRunFile();
    if (const std::string problem = problemOfNewFile(file); !file.empty() && !problem.empty()) {
      remark("last run", file.string(),
             "it cannot be written, so that 'run --only failed' does not know the last run: " + problem);
    }
    if (file.empty()) {
      tell(true, "last run", "-", "not recorded: neither XDG_STATE_HOME nor HOME is set");
    } else if (!hasPreviousRun(file)) {
      tell(true, "last run", file.string(), "no run recorded yet");
    } else {
      check("last run", file.string(),
            [&] { return countText(failedNames(runIn(file)).size(), "diagnostic") + " did not pass"; });
    }
  }

  const Options& options_;
  const Installation& installation_;
  Console& console_;
  std::vector<DescribedDiagnostic> catalogue_;  // of all plug-ins that could be loaded
  bool areAllLoaded_ = false;  // or else a plug-in that was refused or is hidden may have what a file names
  bool allFine_ = true;
};

ExitCode reviewPlugins(const Options& options, const Installation& installation, Console& console,
                       WatchedSignals* signals) {
  if (signals == nullptr) {
    throw CommandError(ExitCode::kUsage,
                       "doctor --plugin judges a plug-in in processes of its own; leave out "
                       "--in-process");
  }
  std::size_t problems = 0;
  std::size_t advice = 0;
  for (const std::filesystem::path& plugin : options.plugins) {
    const ReviewFindings findings = reviewPlugin(plugin, options, installation, *signals);
    console.out << "plug-in " << printable(plugin.string()) << '\n';
    for (const ReviewFinding& one : findings) {
      std::string rating(nameOf(one.rating));
      rating.resize(9, ' ');
      printWrapped(console.out, one.subject + ": " + one.text, "  " + rating, std::string(11, ' '));
      if (one.rating == Rating::kProblem) ++problems;
      if (one.rating == Rating::kAdvice) ++advice;
    }
  }
  console.out << countText(options.plugins.size(), "plug-in") << ": " << countText(problems, "problem") << ", "
              << advice << (advice == 1 ? " piece" : " pieces") << " of advice\n"
              << std::flush;
  return problems == 0 ? ExitCode::kAllPassed : ExitCode::kCannotRead;
}

}  // namespace

ExitCode doctorCommand(const Options& options, const Installation& installation, Console& console,
                       WatchedSignals* signals) {
  if (!options.plugins.empty()) return reviewPlugins(options, installation, console, signals);
  if (options.withoutProfile || !options.profile.empty() || !options.parameterFiles.empty() ||
      !options.settings.empty()) {
    throw CommandError(ExitCode::kUsage, "--set, --parameters and --profile are for the runs of 'doctor --plugin'");
  }
  return Doctor(options, installation, console).examine();
}

}  // namespace quazor
