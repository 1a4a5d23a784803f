#include "host/command/plugin_review.h"

#include "base/text/input_error.h"
#include "base/text/name_list.h"
#include "contract/message_format.h"
#include "host/command/explanations.h"
#include "host/command/selection.h"
#include "host/error/host_error.h"
#include "host/plugin/plugin_trust.h"
#include "host/run/single_run.h"
#include "host/text/table.h"

#include <algorithm>
#include <functional>
#include <iterator>
#include <optional>
#include <set>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

namespace quazor {

namespace {

namespace fs = std::filesystem;

// A phone, and what it expects of the plug-in's diagnostics.
struct JudgedPhone {
  std::string name;
  fs::path file;
  std::vector<ExpectedOutcome> expected;

  bool expects(const std::string& diagnostic, bool pass) const {
    return std::any_of(expected.begin(), expected.end(), [&](const ExpectedOutcome& one) {
      return one.name == diagnostic && (one.verdict == nameOf(Verdict::kPass)) == pass;
    });
  }
};

// Thread: one at a time.
class PluginReview {
 public:
  PluginReview(fs::path plugin, const Options& options, const Installation& installation, WatchedSignals& signals)
      : plugin_(std::move(plugin)),
        options_(optionsFor(plugin_, options)),
        installation_(installation),
        signals_(signals) {}

  ReviewFindings perform() {
    if (!reviewFile() || !reviewLoading()) return std::move(findings_);
    reviewNames();
    reviewDescriptions();
    readPhones();
    readBesideExplanations();
    reviewRanges();
    reviewRuns();
    reviewPhones();
    return std::move(findings_);
  }

 private:
  static Options optionsFor(const fs::path& plugin, Options options) {
    options.plugins = {plugin};
    options.command = Command::kDescribe;  // selects diagnostics, and experiments that none of them uses
    options.all = true;
    return options;
  }

  void tell(Rating rating, std::string subject, std::string text) {
    findings_.push_back({rating, std::move(subject), std::move(text)});
  }

  void add(ReviewFindings more) { std::move(more.begin(), more.end(), std::back_inserter(findings_)); }

  // Without running any of its code. Returns false if it must not be loaded.
  bool reviewFile() {
    try {
      validateTrust(plugin_, trustedOwners());
      validateSharedObject(plugin_);
      tell(Rating::kOk, "file",
           std::string("a shared object that nobody else may change") +
               (isLoadedOnlyWhenNamed(plugin_) ? "; loaded only if --plugin names it" : ""));
      add(reviewLinking(linkPropertiesOf(plugin_)));
      return true;
    } catch (const InputError& problem) {
      tell(Rating::kProblem, "file", formatMessage("it %@", problem.what()));
      return false;
    }
  }

  bool reviewLoading() {
    try {
      scan_ = scanOf(
          options_, installation_, [](const std::vector<Diagnostic>& all) { return all; }, &signals_);
    } catch (const CommandError& refusal) {
      if (refusal.code() != ExitCode::kCannotRead) throw;
      tell(Rating::kProblem, "loading", refusal.what());
      return false;
    }
    if (!scan_.failed.empty()) {
      tell(Rating::kProblem, "loading", scan_.failed.front().error->localizedDescription());
      return false;
    }
    tell(Rating::kOk, "contract",
         formatMessage("built for version %@, which this quazor has", QUAZOR_CONTRACT_VERSION));
    for (const Cost& cost : scan_.loading) add({reviewCost("loading", cost)});
    Cost describing;
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      const std::optional<Cost>& cost = one.description.cost;
      if (!cost) continue;
      describing.time += cost->time;
      describing.bytes += cost->bytes;
    }
    if (!scan_.catalogue.empty()) {
      add({reviewCost("describing", describing)});
    } else {
      tell(Rating::kAdvice, "loading",
           "it registers neither a diagnostic nor an experiment, so that nothing of it can be run");
    }
    return true;
  }

  void reviewNames() {
    std::set<std::pair<std::string, std::string>> names;  // kind and name
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      const Diagnostic& diagnostic = one.diagnostic;
      names.emplace("Experiment", diagnostic.experimentName);
      if (diagnostic.experimentOnly) continue;
      names.emplace("Diagnostic", diagnostic.name);
      names.emplace("Analysis", diagnostic.analysisName);
    }
    const std::size_t before = findings_.size();
    for (const auto& [kind, name] : names) add(reviewName(kind, name));
    reviewFileName();
    reviewClashes(names);
    if (findings_.size() == before) {
      tell(Rating::kOk, "name",
           formatMessage("%@, of the usual form and used by no installed plug-in", countText(names.size(), "name")));
    }
  }

  // A plug-in of the user that has the name of a shipped one hides it. One's own installed plug-in is an earlier build.
  void reviewFileName() {
    std::error_code ignored;
    for (const fs::path& shipped : installation_.shippedPlugins()) {
      if (shipped.filename() != plugin_.filename() || fs::equivalent(shipped, plugin_, ignored)) continue;
      tell(Rating::kAdvice, "name",
           formatMessage("'%@' has the same file name, and is not loaded where this one is installed for a user; give "
                         "this one another name",
                         shipped.string()));
    }
  }

  // With the plug-ins of the installation, except for one of the same file name, which would hide it or be hidden.
  void reviewClashes(const std::set<std::pair<std::string, std::string>>& names) {
    IsolationOptions others = isolationOf(options_, installation_);
    others.unasked = true;
    others.plugins = installation_.allPlugins();
    std::erase_if(others.plugins, [this](const fs::path& one) {
      std::error_code ignored;
      return one.filename() == plugin_.filename() || fs::equivalent(one, plugin_, ignored);
    });
    if (others.plugins.empty()) return;
    const PluginScan scan =
        scanPlugins(others, signals_, [](const std::vector<Diagnostic>&) { return std::vector<Diagnostic>(); });
    refuseInterrupted();
    std::set<std::pair<std::string, std::string>> told;
    for (const DescribedDiagnostic& one : scan.catalogue) {
      const Diagnostic& other = one.diagnostic;
      std::vector<std::pair<std::string, std::string>> taken = {{"Experiment", other.experimentName}};
      if (!other.experimentOnly) taken = {{"Diagnostic", other.name}, {"Analysis", other.analysisName}};
      for (const auto& name : taken) {
        if (!names.contains(name) || !told.insert(name).second) continue;
        tell(Rating::kProblem, "name",
             formatMessage("'%@' is a name of '%@' too, so that the two cannot be loaded together; choose another one",
                           name.second, other.plugins.empty() ? std::string() : other.plugins.front().string()));
      }
    }
  }

  void reviewDescriptions() {
    const std::size_t before = findings_.size();
    std::set<std::string> seen;  // the parts that were reviewed: diagnostics may share them
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      const Diagnostic& diagnostic = one.diagnostic;
      if (one.description.error != nullptr) {
        if (diagnostic.experimentOnly && !diagnostic.usedBy.empty()) continue;  // said of its diagnostic
        tell(Rating::kProblem, diagnostic.name,
             "it cannot be described: " + one.description.error->localizedDescription());
        continue;
      }
      if (!diagnostic.experimentOnly) add(reviewSummary(diagnostic.name, diagnostic.summary, false));
      reviewPart(diagnostic.experimentName, one.description.experiment, seen);
      if (!diagnostic.experimentOnly) reviewPart(diagnostic.analysisName, one.description.analysis, seen);
    }
    if (findings_.size() == before && !scan_.catalogue.empty()) {
      tell(Rating::kOk, "description", "every summary is one sentence, and every parameter has one");
    }
  }

  void reviewPart(const std::string& name, const QZDescription& description, std::set<std::string>& seen) {
    if (!seen.insert(name).second) return;
    add(reviewSummary(name, description.summary(), false));
    for (const auto& [parameter, declaration] : description.parameters()) {
      add(reviewParameterName(name, parameter));
      add(reviewSummary(formatMessage("%@, parameter %@", name, parameter), declaration.summary(), true));
    }
  }

  // The installed phones, and those beside the plug-in or its build folder.
  void readPhones() {
    for (const std::string& name : installation_.scenarioNames()) {
      const fs::path file = installation_.scenario(name);
      try {
        phones_.push_back({name, file, summaryOfScenario(file, installation_.scenarioSource()).expected});
      } catch (const InputError&) {  // 'quazor doctor' without --plugin says it
      }
    }
    for (const fs::path& folder : foldersBeside("phones")) {
      std::error_code ignored;
      for (const auto& entry : fs::directory_iterator(folder, ignored)) {
        const fs::path& file = entry.path();
        if (file.extension() != ".json") continue;
        try {
          phones_.push_back({file.string(), file, summaryOfScenario(file, installation_.scenarioSource()).expected});
        } catch (const InputError& problem) {
          tell(Rating::kProblem, "phones", problem.what());
        }
      }
    }
    std::stable_sort(phones_.begin(), phones_.end(),
                     [](const JudgedPhone& a, const JudgedPhone& b) { return a.name < b.name; });
  }

  std::vector<fs::path> foldersBeside(const char* name) const {
    std::vector<fs::path> folders;
    std::error_code error;
    const fs::path folder = fs::absolute(plugin_, error).parent_path();
    for (const fs::path& one : {folder / name, folder.parent_path() / name}) {
      if (fs::is_directory(one, error)) folders.push_back(one);
    }
    return folders;
  }

  void readBesideExplanations() {
    std::vector<fs::path> folders = foldersBeside("explanations");
    const std::vector<fs::path> beside = folders;
    for (const fs::path& installed : installation_.explanations()) folders.push_back(installed);
    try {
      readExplanations(folders);
      if (!beside.empty()) {
        for (const Explanation& one : readExplanations(beside)) reviewExplanation(one);
      }
      addExplainedRanges(folders, scan_.catalogue);
    } catch (const InputError& problem) {
      tell(Rating::kProblem, "explanations", problem.what());
    }
    isExplained_ = explainedTopics(std::move(folders));
  }

  // Finds what is left of the template, or of an earlier name.
  void reviewExplanation(const Explanation& one) {
    std::vector<std::string> about = one.from;
    if (one.kind != "result") about.insert(about.end(), one.names.begin(), one.names.end());
    for (const ExplainedMessage& message : one.messages)
      about.insert(about.end(), message.from.begin(), message.from.end());
    std::erase_if(about, [this](const std::string& name) {
      return std::ranges::any_of(scan_.catalogue, [&name](const DescribedDiagnostic& known) {
        const Diagnostic& diagnostic = known.diagnostic;
        return name == diagnostic.name || name == diagnostic.experimentName || name == diagnostic.analysisName;
      });
    });
    const std::string topic = one.isError() ? keyOf(one.domain, one.code) : one.names.front();
    if (!about.empty()) {
      tell(Rating::kAdvice, "explanations",
           formatMessage("that of %@ is about %@, which the plug-in does not have; correct the name, or remove what is "
                         "left of an earlier one",
                         topic, listText(about)));
    }
    for (const std::string& text : {one.title, one.meaning}) {
      if (text.find("TODO") == std::string::npos && text.find("FIXME") == std::string::npos) continue;
      tell(Rating::kAdvice, "explanations", formatMessage("that of %@ is not written yet: '%@'", topic, text));
    }
  }

  void reviewRanges() {
    std::set<std::string> seen;
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      if (one.description.error != nullptr) continue;
      for (const Part part : kParts) {
        const bool isExperiment = part == Part::kExperiment;
        const std::string& owner = isExperiment ? one.diagnostic.experimentName : one.diagnostic.analysisName;
        if ((!isExperiment && one.diagnostic.experimentOnly) || !seen.insert(owner).second) continue;
        for (const auto& [name, declaration] : one.parameters(part)) {
          add(reviewParameterRange(owner, name, declaration, one.ranges(part).find(name)));
        }
      }
    }
  }

  void reviewRuns() {
    if (scan_.catalogue.empty()) return;
    std::vector<std::string> unexplained;
    const Selection selection = select(options_, installation_, &signals_);
    for (const FailedPlugin& failed : selection.failed) {
      tell(Rating::kProblem, "loading", "the second time: " + failed.error->localizedDescription());
    }
    for (const ResolvedDiagnostic& one : selection.diagnostics) {
      const std::string& name = one.described.diagnostic.name;
      if (one.described.description.error == nullptr) reviewRun(one);
      if (!isExplained_(name)) unexplained.push_back(name);
    }
    if (unexplained.empty()) return;
    tell(Rating::kAdvice, "explanations",
         formatMessage("none of %@; write explanations/%@.json beside the plug-in and install it "
                       "(explanations.md in share/doc/quazor)",
                       listText(unexplained), plugin_.stem().string()));
  }

  void reviewRun(const ResolvedDiagnostic& one) {
    const std::string& name = one.described.diagnostic.name;
    if (const std::string missing = missingParameterOf(one, options_, installation_); !missing.empty()) {
      tell(Rating::kAdvice, name,
           formatMessage("it was not run: %@ 'quazor run --all' gives it an error; give its parameters defaults, and "
                         "run this command with --set",
                         asSentence(missing)));
      return;
    }
    const DiagnosticRecord healthy = run(one, installation_.defaultScenario());
    if (!endedInItsOwnError(healthy)) return reviewRecord(healthy, "the healthy phone");
    for (const JudgedPhone& phone : phones_) {
      if (!phone.expects(name, true)) continue;
      return reviewRecord(run(one, phone.file), phone.name);
    }
    tell(Rating::kAdvice, name,
         formatMessage("on the healthy phone it ends in an error: %@ Write a phone on which it passes "
                       "(docs/scenarios.md)",
                       asSentence(healthy.error->localizedDescription())));
  }

  static std::string asSentence(const std::string& text) { return text.ends_with('.') ? text : text + "."; }

  DiagnosticRecord run(const ResolvedDiagnostic& one, const fs::path& scenario) {
    RunOptions runOptions;
    runOptions.makePhone = phonesOfScenario(scenario, false, 0, installation_.scenarioSource());
    runOptions.logLevel = LogLevel::kError;
    DiagnosticRecord record =
        recordOfRun(one.described, one.parameters, runOptions, 0, isolationOf(options_, installation_), &signals_);
    refuseInterrupted();
    return record;
  }

  // True if the diagnostic returned an error, as on a phone without its hardware; false if the host found it to be
  // wrong.
  static bool endedInItsOwnError(const DiagnosticRecord& record) {
    return record.verdict == Verdict::kError && !isHostError(record.error);
  }

  void reviewRecord(const DiagnosticRecord& record, const std::string& phone) {
    if (record.verdict == Verdict::kError) {
      tell(Rating::kProblem, record.name,
           formatMessage("on %@ it ends in an error: %@", phone, record.error->localizedDescription()));
      return;
    }
    if (record.verdict == Verdict::kPass) {
      tell(Rating::kOk, record.name, (record.experimentOnly ? "returns a result on " : "passes on ") + phone);
    } else {
      tell(Rating::kProblem, record.name, formatMessage("fails on %@, which must pass", phone));
    }
    add(reviewResults(record, isExplained_));
  }

  void reviewPhones() {
    std::vector<std::string> judged;
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      if (one.diagnostic.experimentOnly) continue;
      const std::string& name = one.diagnostic.name;
      const auto isExpected = [&](bool pass) {
        return std::any_of(phones_.begin(), phones_.end(),
                           [&](const JudgedPhone& phone) { return phone.expects(name, pass); });
      };
      if (isExpected(true) && isExpected(false)) {
        judged.push_back(name);
        continue;
      }
      const char* const missing = isExpected(true)    ? "no phone on which it must fail or end in an error"
                                  : isExpected(false) ? "no phone on which it must pass"
                                                      : "no phone says what it must find";
      tell(Rating::kAdvice, name,
           formatMessage("%@, so that 'quazor selftest' does not test it; write one with the key \"expect\" "
                         "(docs/scenarios.md)",
                         missing));
    }
    if (!judged.empty()) {
      tell(Rating::kOk, "phones",
           formatMessage("%@ with a phone that must pass and one that must not",
                         countText(judged.size(), "diagnostic")));
    }
  }

  void refuseInterrupted() const {
    if (signals_.requestsToEnd() > 0) {
      throw CommandError(ExitCode::kInterrupted, "interrupted while the plug-in was reviewed");
    }
  }

  const fs::path plugin_;
  const Options options_;
  const Installation& installation_;
  WatchedSignals& signals_;
  PluginScan scan_;
  std::vector<JudgedPhone> phones_;
  std::function<bool(const std::string&)> isExplained_;
  ReviewFindings findings_;
};

}  // namespace

ReviewFindings reviewPlugin(const fs::path& plugin, const Options& options, const Installation& installation,
                            WatchedSignals& signals) {
  return PluginReview(plugin, options, installation, signals).perform();
}

}  // namespace quazor
