#include "host/command/commands.h"

#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/command/selection.h"
#include "host/command/selftest.h"
#include "host/model/judge.h"
#include "host/model/limit_check.h"
#include "host/record/value_json.h"
#include "host/run/single_run.h"
#include "host/text/table.h"

#include <algorithm>
#include <deque>
#include <iterator>
#include <optional>
#include <ostream>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

namespace {

constexpr const char* kStrict = "strict";  // an installed profile

// The profile in the file and what it is based on.
std::vector<Profile> profilesIn(const std::filesystem::path& file, const Installation& installation) {
  std::vector<Profile> profiles = readProfileAndBases(file, installation.profileSource());
  for (const Profile& one : profiles) one.mistakes.throwIfAny();
  return profiles;
}

// The verdict on the run with the limits of the profiles in place of its own.
Verdict verdictWith(DiagnosticRecord record, const std::vector<Profile>& profiles) {
  if (record.verdict == Verdict::kError) return Verdict::kError;
  record.limits = limitsFor(record.name, limitsOf(profiles));
  return judgeRecord(record, true).verdict;
}

bool haveSameValues(const ResolvedParameters& a, const ResolvedParameters& b) {
  const auto isSame = [](const ResolvedParameter& one, const ResolvedParameter& other) {
    return one.name == other.name && one.value == other.value;
  };
  return std::equal(a.experiment.begin(), a.experiment.end(), b.experiment.begin(), b.experiment.end(), isSame) &&
         std::equal(a.analysis.begin(), a.analysis.end(), b.analysis.begin(), b.analysis.end(), isSame);
}

class Selftest {
 public:
  // `signals` is null if the diagnostics run in this process.
  Selftest(const Options& options, const Installation& installation, Console& console, WatchedSignals* signals)
      : options_(withAllPlugins(options, installation)),
        installation_(installation),
        scan_(scanOf(
            options_, installation, [](const std::vector<Diagnostic>& all) { return all; }, signals)),
        isolation_(withoutFailed(isolationOf(options_, installation), scan_.failed)),
        err_(console.err),
        status_(console.showsProgress ? &console.err : nullptr),
        signals_(signals) {
    profiles_ = profilesIn(installation.defaultProfile(), installation);
    const std::filesystem::path strict = installation.namedProfile(kStrict);
    if (!strict.empty()) strict_ = profilesIn(strict, installation);
  }

  // Ends at an interrupt; the phone that was running then is left out. A phone that is refused does not keep the others
  // from being run.
  SelftestOutcome perform() {
    SelftestOutcome outcome;
    outcome.seeds = options_.seeds;
    const std::vector<WantedPhone> wanted = readPhones(outcome.refused);
    outcome.wanted = wanted.size();
    for (const WantedPhone& phone : wanted) {
      showProgress(outcome, phone.name);
      if (!performPhone(phone, outcome)) break;
    }
    status_.erase();
    return outcome;
  }

 private:
  struct WantedPhone {
    std::string name;
    std::filesystem::path file;
    ScenarioSummary summary;
  };

  struct HealthyRun {
    std::string name;
    DiagnosticRecord record;
  };

  static Options withAllPlugins(Options options, const Installation& installation) {
    if (options.plugins.empty()) options.plugins = installation.allPlugins();
    return options;
  }

  // The phones with an expected outcome. Those that cannot be run are told and added to `refused`.
  std::vector<WantedPhone> readPhones(std::vector<RefusedPhone>& refused) {
    std::vector<WantedPhone> phones;
    for (const std::string& name : wantedScenarios(options_.names, installation_)) {
      const std::filesystem::path file = installation_.scenario(name);
      try {
        ScenarioSummary summary = summaryOfScenario(file, installation_.scenarioSource());
        leaveOutInherited(summary.expected, file);
        if (!summary.expected.empty()) phones.push_back({name, file, std::move(summary)});
      } catch (const InputError& problem) {
        err_ << "quazor: REFUSED phone " << printable(name) << ": " << printable(problem.what()) << '\n';
        refused.push_back({name, problem.what()});
      }
    }
    return phones;
  }

  // Whoever bases a phone on another one need not load the diagnostics of that one: removes what is expected of
  // diagnostics that are not loaded. Throws InputError if the file itself expects it, or if a plug-in that failed to
  // load may have the diagnostic.
  void leaveOutInherited(std::vector<ExpectedOutcome>& expected, const std::filesystem::path& file) const {
    std::erase_if(expected, [&](const ExpectedOutcome& one) {
      if (findLoaded(one) != nullptr) return false;
      const std::string problem = "no loaded plug-in has " + one.name;
      failIfNamedIn(file, one, problem + "; load it with --plugin, or remove this entry.");
      if (scan_.failed.empty()) return true;
      throw InputError(file.string() + ": " + problem + ", and " + scan_.failed.front().file.string() +
                       " failed to load.");
    });
  }

  void showProgress(const SelftestOutcome& outcome, const std::string& name) {
    status_.show(formatMessage("Selftest: %@ of %@ phones done, now %@", outcome.phones.size(), outcome.wanted,
                               printable(name)));
  }

  bool isInterrupted() const { return signals_ != nullptr && signals_->requestsToEnd() > 0; }

  // Adds the rows of the phone and its detection. Returns false if it was interrupted; then it adds nothing.
  bool performPhone(const WantedPhone& wanted, SelftestOutcome& outcome) {
    const auto& [name, file, summary] = wanted;
    PhoneDetection phone{name, summary.title, file == installation_.defaultScenario(), false, {}, {}, {}};
    std::vector<SelftestRow> rows;
    for (const ExpectedOutcome& expected : summary.expected) {
      rows.push_back({name, expected, 0, 0, 0, {}, {}});
      if (expected.verdict != nameOf(Verdict::kPass)) phone.isExpected = true;
    }
    if (strict_) phone.byStrict.emplace();
    std::vector<DiagnosticRecord> passed;  // with the first seed
    for (std::uint64_t seed = 0; seed < options_.seeds; ++seed) {
      bool found = false;
      bool foundByStrict = false;
      for (SelftestRow& row : rows) {
        DiagnosticRecord record = run(file, row.expected, seed, profiles_);
        if (isInterrupted()) return false;
        count(row, record);
        if (record.verdict != Verdict::kPass) found = true;
        if (strict_ && strictVerdict(file, row.expected, record) != Verdict::kPass) foundByStrict = true;
        if (isInterrupted()) return false;
        if (seed == 0) passed.push_back(std::move(record));
      }
      add(phone.byDefault, found);
      if (phone.byStrict) add(*phone.byStrict, foundByStrict);
    }
    if (!phone.healthy && !phone.byDefault.isComplete()) {
      phone.reasons = reasonsOf(rows, passed, phone.byDefault);
      if (isInterrupted()) return false;
    }
    outcome.phones.push_back(std::move(phone));
    std::move(rows.begin(), rows.end(), std::back_inserter(outcome.rows));
    return true;
  }

  static void add(Detection& detection, bool found) {
    ++detection.seeds;
    if (found) ++detection.found;
  }

  // The verdict with the profile strict. A run whose parameters it does not change is only judged again.
  Verdict strictVerdict(const std::filesystem::path& file, const ExpectedOutcome& expected,
                        const DiagnosticRecord& record) {
    if (expected.experimentOnly) return record.verdict;
    if (haveSameValues(parametersOf(find(expected), expected, *strict_), record.parameters)) {
      return verdictWith(record, *strict_);
    }
    return verdictWith(run(file, expected, record.seed, *strict_), *strict_);
  }

  // Why the runs of a phone with a fault passed.
  std::vector<std::string> reasonsOf(const std::vector<SelftestRow>& rows, const std::vector<DiagnosticRecord>& records,
                                     const Detection& detection) {
    if (detection.found > 0) return {"whether it is detected depends on the order of simultaneous events"};
    std::vector<std::string> reasons;
    for (std::size_t i = 0; i < rows.size(); ++i) {
      const DiagnosticRecord* const healthy = healthyRun(rows[i].expected);
      if (healthy == nullptr) return {"there is no healthy phone to compare it with"};
      for (std::string& one : undetectedChanges(*healthy, records[i])) reasons.push_back(std::move(one));
    }
    if (reasons.empty()) reasons.emplace_back("it changes nothing that is measured or logged");
    return reasons;
  }

  // The same run, with the first seed, on the healthy phone; null if there is none. Each is run once.
  const DiagnosticRecord* healthyRun(const ExpectedOutcome& expected) {
    const std::filesystem::path file = installation_.defaultScenario();
    if (!std::filesystem::exists(file)) return nullptr;
    for (const HealthyRun& one : healthyRuns_) {
      if (one.name == expected.name &&
          haveSameValues(one.record.parameters, parametersOf(find(expected), expected, profiles_)))
        return &one.record;
    }
    healthyRuns_.push_back({expected.name, run(file, expected, 0, profiles_)});
    return &healthyRuns_.back().record;
  }

  static void count(SelftestRow& row, const DiagnosticRecord& record) {
    ++row.runs;
    if (record.verdict == Verdict::kPass) ++row.passes;
    const std::string difference = differenceOf(row.expected, record);
    if (difference.empty()) {
      ++row.asExpected;
    } else if (row.difference.empty()) {
      row.difference = "seed " + std::to_string(record.seed) + ": " + difference;
    }
    row.faultsFired.resize(std::max(row.faultsFired.size(), record.faults.size()));
    for (std::size_t i = 0; i < record.faults.size(); ++i) row.faultsFired[i] += record.faults[i].fired;
  }

  // Null if no loaded plug-in has it.
  const DescribedDiagnostic* findLoaded(const ExpectedOutcome& expected) const {
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      const Diagnostic& diagnostic = one.diagnostic;
      if (diagnostic.name == expected.name && diagnostic.experimentOnly == expected.experimentOnly) return &one;
    }
    return nullptr;
  }

  // readPhones() kept only what is loaded.
  const DescribedDiagnostic& find(const ExpectedOutcome& expected) const { return *findLoaded(expected); }

  static ResolvedParameters parametersOf(const DescribedDiagnostic& described, const ExpectedOutcome& expected,
                                         const std::vector<Profile>& profiles) {
    if (!expected.experimentOnly) return resolveParameters(described, profiles, {});
    std::vector<ParameterOverride> settings;
    for (const auto& [name, value] : expected.parameters) {
      // Formats the value like on a command line, where a whole number is an integer.
      settings.push_back(parseOverride(formatMessage("%@=%@", name, value)));
    }
    return resolveParameters(described, {}, settings);
  }

  DiagnosticRecord run(const std::filesystem::path& file, const ExpectedOutcome& expected, std::uint64_t seed,
                       const std::vector<Profile>& profiles) {
    const DescribedDiagnostic& described = find(expected);
    const ResolvedParameters parameters = parametersOf(described, expected, profiles);
    RunOptions runOptions;
    runOptions.makePhone = phonesOfScenario(file, false, seed, installation_.scenarioSource());
    runOptions.logLevel = LogLevel::kError;
    runOptions.logLimit = options_.logLimit;
    return recordOfRun(described, parameters, runOptions, seed, isolation_, signals_);
  }

  const Options options_;
  const Installation& installation_;
  const PluginScan scan_;
  const IsolationOptions isolation_;
  std::ostream& err_;
  StatusLine status_;
  std::vector<Profile> profiles_;  // the default one and what it is based on
  std::optional<std::vector<Profile>> strict_;
  WatchedSignals* const signals_;
  std::deque<HealthyRun> healthyRuns_;  // a growing deque does not move them
};

}  // namespace

ExitCode selftestCommand(const Options& options, const Installation& installation, Console& console,
                         WatchedSignals* signals) {
  const SelftestOutcome outcome = Selftest(options, installation, console, signals).perform();
  const std::size_t refused = outcome.refused.size();
  const std::string refusal = formatMessage("%@ of %@ phones were refused", refused, outcome.wanted + refused);
  if (outcome.rows.empty()) {
    if (!outcome.isComplete()) throw CommandError(ExitCode::kInterrupted, "interrupted before any phone was tested");
    const std::string why = refused == 0 ? "no phone has an expected outcome" : refusal;
    throw CommandError(ExitCode::kCannotRead, "nothing was tested: " + why);
  }
  std::ostringstream text = textFor(options.report, console);
  if (options.report.format == Format::kJson) {
    text << documentText(selftestDocument(outcome));
  } else {
    printSelftest(text, outcome);
  }
  writeOutput(options.report, console, text.str());
  if (!outcome.isComplete()) {
    throw CommandError(ExitCode::kInterrupted,
                       formatMessage("interrupted: %@ of %@ phones were run", outcome.phones.size(), outcome.wanted));
  }
  if (refused > 0) throw CommandError(ExitCode::kCannotRead, refusal);
  return allPassed(verdictsOf(outcome.rows)) ? ExitCode::kAllPassed : ExitCode::kFailed;
}

}  // namespace quazor
