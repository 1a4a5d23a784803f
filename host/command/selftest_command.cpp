#include "host/command/commands.h"

#include "base/text/input_error.h"
#include "contract/message_format.h"
#include "host/command/expectations.h"
#include "host/command/selection.h"
#include "host/command/selftest.h"
#include "host/command/unknown_name.h"
#include "host/model/judge.h"
#include "host/model/limit_check.h"
#include "host/record/value_json.h"
#include "host/run/single_run.h"
#include "host/text/table.h"

#include <algorithm>
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

bool namesOnlyPlugins(const Options& options) { return !options.plugins.empty() && options.names.empty(); }

std::string whyNothingWasTested(const Options& options) {
  if (namesOnlyPlugins(options)) {
    return "no installed phone expects anything of what --plugin names; name the files of phones that do, as in "
           "'quazor "
           "selftest phones/*.json --plugin FILE'";
  }
  return R"(no phone has an expected outcome; say it in the phone's file, as in "expect": {"DIAGNOSTIC": {"verdict": "fail"}})";
}

// Like wantedScenarios(); bindings come last, each once.
std::vector<std::string> wantedPhones(const std::vector<std::string>& names, const Installation& installation) {
  std::vector<std::string> simulated;
  std::vector<std::string> real;
  for (const std::string& name : names) {
    std::vector<std::string>& kind = bindingNamed(name) ? real : simulated;
    if (std::find(kind.begin(), kind.end(), name) == kind.end()) kind.push_back(name);
  }
  if (simulated.empty() && !real.empty()) return real;
  std::vector<std::string> wanted = wantedScenarios(simulated, installation);
  wanted.insert(wanted.end(), real.begin(), real.end());
  return wanted;
}

// A profile with those that it is based on, and what it was used for.
struct Judge {
  std::string name;
  std::vector<Profile> profiles;
  std::vector<UserLimit> limits;
  // Of each diagnostic that ended without an error, with any phone, the name and the results.
  std::vector<DiagnosticRecord> measured{};
};

Judge judgeOf(std::string name, const std::filesystem::path& file, const Installation& installation) {
  std::vector<Profile> profiles = profilesIn(file, installation);
  std::vector<UserLimit> limits = limitsOf(profiles);
  return {std::move(name), std::move(profiles), std::move(limits)};
}

// Adds the names of results that are new.
void noteResults(std::vector<DiagnosticRecord>& measured, const DiagnosticRecord& record) {
  if (record.error != nullptr || record.experimentOnly) return;
  auto known = std::find_if(measured.begin(), measured.end(),
                            [&record](const DiagnosticRecord& one) { return one.name == record.name; });
  if (known == measured.end()) {
    DiagnosticRecord first;
    first.name = record.name;
    known = measured.insert(measured.end(), std::move(first));
  }
  for (const JudgedResult& result : record.measuredResults) {
    const bool isKnown =
        std::any_of(known->measuredResults.begin(), known->measuredResults.end(),
                    [&result](const JudgedResult& other) { return other.result.name() == result.result.name(); });
    if (!isKnown) known->measuredResults.push_back(result);
  }
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
      : isForNamedPlugins_(namesOnlyPlugins(options)),
        options_(withAllPlugins(options, installation)),
        installation_(installation),
        scan_(scanOf(
            options_, installation, [](const std::vector<Diagnostic>& all) { return all; }, signals)),
        isolation_(withoutFailed(isolationOf(options_, installation), scan_.failed)),
        err_(console.err),
        status_(console.showsProgress ? &console.err : nullptr),
        signals_(signals) {
    default_ = judgeOf("default", installation.defaultProfile(), installation);
    const std::filesystem::path strict = installation.namedProfile(kStrict);
    if (!strict.empty()) strict_ = judgeOf(kStrict, strict, installation);
  }

  // Ends at an interrupt; the phone that was running then is left out. A phone that is refused does not keep the others
  // from being run.
  SelftestOutcome perform() {
    SelftestOutcome outcome;
    outcome.seeds = options_.seeds;
    const std::vector<WantedPhone> wanted = readPhones(outcome);
    outcome.wanted = wanted.size();
    for (const WantedPhone& phone : wanted) {
      showProgress(outcome, phone.name);
      if (!performPhone(phone, outcome)) break;
    }
    status_.erase();
    if (outcome.isComplete()) {
      addUnusedLimits(default_, outcome.unusedLimits);
      if (strict_) addUnusedLimits(*strict_, outcome.unusedLimits);
    }
    return outcome;
  }

 private:
  struct WantedPhone {
    std::string name;
    std::filesystem::path file;
    ScenarioSummary summary;
    bool isReal = false;  // the machine of a binding
  };

  struct HealthyRun {
    std::filesystem::path phone;
    std::string name;
    DiagnosticRecord record;
  };

  static Options withAllPlugins(Options options, const Installation& installation) {
    if (options.plugins.empty()) options.plugins = installation.allPlugins();
    return options;
  }

  // The phones with an expected outcome. Those that cannot be run are told and added to the outcome.
  std::vector<WantedPhone> readPhones(SelftestOutcome& outcome) {
    std::vector<WantedPhone> phones;
    for (const std::string& name : wantedPhones(options_.names, installation_)) {
      const std::optional<std::filesystem::path> binding = bindingNamed(name);
      const std::filesystem::path file = binding ? installation_.binding(*binding) : installation_.scenario(name);
      try {
        ScenarioSummary summary =
            binding ? summaryOfBinding(file) : summaryOfScenario(file, installation_.scenarioSource());
        if (isForOthers(summary)) continue;
        const std::string unloaded =
            leaveOutUnloaded(summary, file, scan_, [this]() -> const PluginScan& { return others(); });
        if (!summary.expected.empty()) {
          phones.push_back({name, file, std::move(summary), binding.has_value()});
        } else if (!unloaded.empty()) {
          outcome.notJudged.push_back({name, unloaded});
        }
        if (!unloaded.empty()) err_ << "quazor: " << printable(name) << ": " << printable(unloaded) << '\n';
      } catch (const InputError& problem) {
        err_ << "quazor: REFUSED phone " << printable(name) << ": " << printable(problem.what()) << '\n';
        outcome.refused.push_back({name, problem.what()});
      }
    }
    const auto healthy = std::find_if(phones.begin(), phones.end(),
                                      [](const WantedPhone& one) { return one.isReal && !one.summary.isFaulty(); });
    if (healthy != phones.end()) healthyMachine_ = healthy->file;
    return phones;
  }

  // The phone that the others of its kind are compared with. Of real ones, it is the first that must pass and declares
  // no fault; empty if there is none.
  std::filesystem::path healthyFor(const WantedPhone& phone) const {
    return phone.isReal ? healthyMachine_ : installation_.defaultScenario();
  }

  // With --plugin and no name of a phone, only the phones of these plug-ins are meant.
  bool isForOthers(const ScenarioSummary& summary) const {
    return isForNamedPlugins_ && scan_.failed.empty() &&
           std::none_of(summary.expected.begin(), summary.expected.end(),
                        [this](const ExpectedOutcome& one) { return findLoaded(one) != nullptr; });
  }

  // What is installed and not loaded; asked once, and not without processes of its own.
  const PluginScan& others() {
    if (!others_) others_ = signals_ == nullptr ? PluginScan() : scanOfOthers(options_, installation_, signals_);
    return *others_;
  }

  void showProgress(const SelftestOutcome& outcome, const std::string& name) {
    status_.show(formatMessage("Selftest: %@ of %@ phones done, now %@", outcome.phones.size(), outcome.wanted,
                               printable(name)));
  }

  bool isInterrupted() const { return signals_ != nullptr && signals_->requestsToEnd() > 0; }

  // What the runs of one profile on a phone came to.
  struct ProfileRuns {
    Judge& judge;
    Detection& detection;
    std::vector<DiagnosticRecord> records{};  // with the first seed
    std::vector<std::string> alarms{};        // of the last seed
  };

  // A phone whose own file says that it passes, and that declares no fault, is no fault.
  PhoneKind kindOf(const WantedPhone& wanted) const {
    if (wanted.file == healthyFor(wanted)) return PhoneKind::kHealthy;
    const std::vector<ExpectedOutcome>& expected = wanted.summary.expected;
    const bool saysSo = std::any_of(expected.begin(), expected.end(),
                                    [&wanted](const ExpectedOutcome& one) { return isNamedIn(wanted.file, one); });
    return saysSo && !wanted.summary.isFaulty() ? PhoneKind::kChanged : PhoneKind::kFaulty;
  }

  // The diagnostics that `run --all` runs on the phone besides those of which its file expects something.
  std::vector<ExpectedOutcome> othersFor(const ScenarioSummary& summary) const {
    std::vector<ExpectedOutcome> others;
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      const std::string& name = one.diagnostic.name;
      const bool isExpected = std::any_of(summary.expected.begin(), summary.expected.end(),
                                          [&](const ExpectedOutcome& outcome) { return findLoaded(outcome) == &one; });
      if (one.diagnostic.experimentOnly || isExpected || skipOf(name, summary.absent)) continue;
      ExpectedOutcome other;
      other.name = name;
      if (hasItsParameters(other, default_) && (!strict_ || hasItsParameters(other, *strict_))) {
        others.push_back(std::move(other));
      }
    }
    return others;
  }

  bool hasItsParameters(const ExpectedOutcome& one, const Judge& judge) const {
    const DescribedDiagnostic& described = find(one);
    return missingParameterOf(described, parametersOf(described, one, judge.profiles)).empty();
  }

  // Adds the rows of the phone and its detection. Returns false if it was interrupted; then it adds nothing.
  bool performPhone(const WantedPhone& wanted, SelftestOutcome& outcome) {
    const ScenarioSummary& summary = wanted.summary;
    PhoneDetection phone{wanted.name, summary.title, kindOf(wanted), !summary.mustPass()};
    phone.saysNothing = std::none_of(summary.expected.begin(), summary.expected.end(),
                                     [&wanted](const ExpectedOutcome& one) { return isNamedIn(wanted.file, one); });
    std::vector<SelftestRow> rows;
    for (const ExpectedOutcome& expected : summary.expected) {
      SelftestRow& row = rows.emplace_back(SelftestRow{wanted.name, expected, 0, 0, 0, {}, {}});
      row.isInherited = !isNamedIn(wanted.file, expected);
      row.concernsFault = !expected.mustPass();
    }
    std::vector<ExpectedOutcome> wantedRuns = summary.expected;
    // Of the other diagnostics the file of a changed phone does not say that they pass, and a real one may lack their
    // hardware.
    if (phone.kind != PhoneKind::kChanged && !wanted.isReal) {
      for (ExpectedOutcome& other : othersFor(summary)) wantedRuns.push_back(std::move(other));
    }
    std::vector<ProfileRuns> profiles{{default_, phone.byDefault}};
    if (strict_) profiles.push_back({*strict_, phone.byStrict.emplace()});
    for (std::uint64_t seed = 0; seed < options_.seeds; ++seed) {
      for (std::size_t i = 0; i < wantedRuns.size(); ++i) {
        const ExpectedOutcome& expected = wantedRuns[i];
        const bool isNamed = i < rows.size();
        const DiagnosticRecord record = run(wanted, expected, seed, default_.profiles);
        if (isInterrupted()) return false;
        if (isNamed) count(rows[i], record);
        for (ProfileRuns& one : profiles) {
          DiagnosticRecord judged = recordBy(one.judge, wanted, expected, record);
          const bool isAlarm =
              judged.verdict != Verdict::kPass && (isNamed || isNews(phone.kind, wanted, expected, one.judge));
          if (isInterrupted()) return false;
          if (isAlarm) one.alarms.push_back(alarmText(judged));
          if (isNamed) countFound(rows[i], judged, &one.judge == &default_);
          noteResults(one.judge.measured, judged);
          if (seed == 0) one.records.push_back(std::move(judged));
        }
      }
      for (ProfileRuns& one : profiles) addSeed(one, phone.kind);
    }
    if (phone.kind == PhoneKind::kFaulty && summary.mustPass()) {
      for (SelftestRow& row : rows) {
        row.concernsFault = !row.isInherited || row.foundByDefault > 0 || row.foundByStrict.value_or(0) > 0;
      }
    }
    for (ProfileRuns& one : profiles) {
      if (needsReasons(phone.kind, one.detection)) one.detection.reasons = reasonsOf(wanted, wantedRuns, one);
      if (isInterrupted()) return false;
    }
    outcome.phones.push_back(std::move(phone));
    std::move(rows.begin(), rows.end(), std::back_inserter(outcome.rows));
    return true;
  }

  static void addSeed(ProfileRuns& runs, PhoneKind kind) {
    Detection& detection = runs.detection;
    ++detection.seeds;
    if (!runs.alarms.empty()) ++detection.found;
    if (kind != PhoneKind::kFaulty && detection.reasons.empty()) detection.reasons = runs.alarms;
    runs.alarms.clear();
  }

  static bool needsReasons(PhoneKind kind, const Detection& detection) {
    if (kind == PhoneKind::kFaulty) return !detection.isComplete();
    return kind == PhoneKind::kChanged && detection.found == 0;
  }

  // The run by the profile. One whose parameters the profile does not change is only judged again.
  DiagnosticRecord recordBy(const Judge& judge, const WantedPhone& wanted, const ExpectedOutcome& expected,
                            const DiagnosticRecord& record) {
    if (expected.experimentOnly) return record;
    if (haveSameValues(parametersOf(find(expected), expected, judge.profiles), record.parameters)) {
      return judgedWith(record, judge.limits);
    }
    return judgedWith(run(wanted, expected, record.seed, judge.profiles), judge.limits);
  }

  // A diagnostic that does not pass on the healthy phone either says nothing about another one.
  bool isNews(PhoneKind kind, const WantedPhone& wanted, const ExpectedOutcome& expected, const Judge& judge) {
    if (kind == PhoneKind::kHealthy) return true;
    const std::optional<DiagnosticRecord> healthy = healthyRun(wanted, expected, judge);
    return !healthy || healthy->verdict == Verdict::kPass;
  }

  // Why the runs on a phone that differs from the healthy one passed.
  std::vector<std::string> reasonsOf(const WantedPhone& wanted, const std::vector<ExpectedOutcome>& wantedRuns,
                                     const ProfileRuns& runs) {
    if (runs.detection.found > 0) return {"whether it is detected depends on the order of simultaneous events"};
    std::vector<std::string> reasons;
    for (std::size_t i = 0; i < wantedRuns.size(); ++i) {
      const std::optional<DiagnosticRecord> healthy = healthyRun(wanted, wantedRuns[i], runs.judge);
      if (!healthy) return {"there is no healthy phone to compare it with"};
      if (runs.records[i].verdict != Verdict::kPass) {
        reasons.push_back(wantedRuns[i].name + " does not pass on the healthy phone either");
        continue;
      }
      for (std::string& one : undetectedChanges(*healthy, runs.records[i])) reasons.push_back(std::move(one));
    }
    for (const DescribedDiagnostic& one : scan_.catalogue) {
      if (one.diagnostic.experimentOnly) continue;
      const std::optional<Skip> skip = skipOf(one.diagnostic.name, wanted.summary.absent);
      if (skip) reasons.push_back(one.diagnostic.name + " is skipped: " + skip->reason);
    }
    if (reasons.empty()) reasons.emplace_back("it changes nothing that is measured or logged");
    return reasons;
  }

  // The same run, with the first seed, on the healthy phone of its kind, by the profile; nothing if there is none. Each
  // is run once.
  std::optional<DiagnosticRecord> healthyRun(const WantedPhone& wanted, const ExpectedOutcome& expected,
                                             const Judge& judge) {
    const WantedPhone healthy{{}, healthyFor(wanted), {}, wanted.isReal};
    if (!std::filesystem::exists(healthy.file)) return std::nullopt;
    const ResolvedParameters parameters = parametersOf(find(expected), expected, judge.profiles);
    auto known = std::find_if(healthyRuns_.begin(), healthyRuns_.end(), [&](const HealthyRun& one) {
      return one.phone == healthy.file && one.name == expected.name &&
             haveSameValues(one.record.parameters, parameters);
    });
    if (known == healthyRuns_.end()) {
      known = healthyRuns_.insert(healthyRuns_.end(),
                                  {healthy.file, expected.name, run(healthy, expected, 0, judge.profiles)});
    }
    return expected.experimentOnly ? known->record : judgedWith(known->record, judge.limits);
  }

  static void addUnusedLimits(const Judge& judge, std::vector<UnusedLimit>& unused) {
    for (const UserLimit& limit : limitsWithoutResult(judge.limits, judge.measured)) {
      unused.push_back({judge.name, errorOfLimitWithoutResult(limit, judge.measured)->localizedDescription()});
    }
  }

  static void countFound(SelftestRow& row, const DiagnosticRecord& judged, bool isByDefault) {
    if (!isByDefault && !row.foundByStrict) row.foundByStrict = 0;
    std::uint64_t& found = isByDefault ? row.foundByDefault : *row.foundByStrict;
    if (judged.verdict != Verdict::kPass) ++found;
  }

  static void count(SelftestRow& row, const DiagnosticRecord& record) {
    ++row.runs;
    if (record.verdict == Verdict::kPass) ++row.passes;
    const std::string difference = differenceOf(row.expected, record);
    if (difference.empty()) {
      ++row.asExpected;
    } else if (row.difference.empty()) {
      row.difference = "seed " + std::to_string(record.seed) + ": " + difference;
      row.outcome = expectationOf(row.expected, record);
    }
    row.faultsFired.resize(std::max(row.faultsFired.size(), record.faults.size()));
    for (std::size_t i = 0; i < record.faults.size(); ++i) row.faultsFired[i] += record.faults[i].fired;
  }

  const DescribedDiagnostic* findLoaded(const ExpectedOutcome& expected) const {
    return diagnosticOf(scan_.catalogue, expected);
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

  DiagnosticRecord run(const WantedPhone& phone, const ExpectedOutcome& expected, std::uint64_t seed,
                       const std::vector<Profile>& profiles) {
    const DescribedDiagnostic& described = find(expected);
    const ResolvedParameters parameters = parametersOf(described, expected, profiles);
    RunOptions runOptions;
    runOptions.makePhone = phone.isReal ? phonesOfBinding(phone.file)
                                        : phonesOfScenario(phone.file, false, seed, installation_.scenarioSource());
    runOptions.logLevel = LogLevel::kError;
    runOptions.logLimit = options_.logLimit;
    return recordOfRun(described, parameters, runOptions, seed, isolation_, signals_);
  }

  const bool isForNamedPlugins_;
  const Options options_;
  const Installation& installation_;
  const PluginScan scan_;
  std::optional<PluginScan> others_;  // what is installed and not loaded, once it is asked
  const IsolationOptions isolation_;
  std::ostream& err_;
  StatusLine status_;
  Judge default_;
  std::optional<Judge> strict_;
  WatchedSignals* const signals_;
  std::filesystem::path healthyMachine_;
  std::vector<HealthyRun> healthyRuns_;
};

}  // namespace

ExitCode selftestCommand(const Options& options, const Installation& installation, Console& console,
                         WatchedSignals* signals) {
  const SelftestOutcome outcome = Selftest(options, installation, console, signals).perform();
  const std::size_t refused = outcome.refused.size();
  const std::string refusal = formatMessage("%@ of %@ phones were refused", refused, outcome.wanted + refused);
  if (outcome.rows.empty()) {
    if (!outcome.isComplete()) throw CommandError(ExitCode::kInterrupted, "interrupted before any phone was tested");
    const std::string untested = outcome.notJudged.empty()
                                     ? whyNothingWasTested(options)
                                     : "no loaded plug-in has what the phones expect something of";
    const std::string why = refused == 0 ? untested : refusal;
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
