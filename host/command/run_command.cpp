#include "host/command/commands.h"

#include "base/text/nearest_name.h"
#include "contract/contract.h"
#include "contract/message_format.h"
#include "host/command/conductor.h"
#include "host/command/explanations.h"
#include "host/command/failed_only.h"
#include "host/command/limit_notes.h"
#include "host/command/output_check.h"
#include "host/command/records/records_command.h"
#include "host/command/report_command.h"
#include "host/command/selection.h"
#include "host/command/unknown_name.h"
#include "host/device/phone.h"
#include "host/error/host_error.h"
#include "host/model/incomplete_run.h"
#include "host/model/limit_check.h"
#include "host/model/trials.h"
#include "host/record/record_file.h"
#include "host/record/record_place.h"
#include "host/run/event_pipeline.h"
#include "host/run/isolation.h"
#include "host/system/identity.h"
#include "host/system/interrupt_watcher.h"
#include "host/text/name_pattern.h"
#include "host/text/table.h"
#include "host/text/timestamp.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <memory>
#include <optional>
#include <utility>

namespace quazor {

namespace {

// Reports a plug-in that could not be loaded like a diagnostic.
void tellFailedPlugin(const FailedPlugin& plugin, EventPipeline& events) {
  events.onEvent(DiagnosticStarted{
      plugin.file.filename().string(), "A plug-in that could not be loaded.", {}, {}, false, {}, 0, dateNow()});
  events.onEvent(Failed{Stage::kLoad, plugin.error});
  events.endDiagnostic();
}

// Reports a limit that fits no result like a diagnostic that ended in an error.
void tellLimitWithoutResult(const UserLimit& limit, EventPipeline& events) {
  DiagnosticErrorPtr error = errorOfLimitWithoutResult(limit, events.records());
  events.onEvent(DiagnosticStarted{
      canonicalText(limit), "A limit that fits no result of this run.", {}, {}, false, {}, 0, dateNow()});
  events.onEvent(Failed{Stage::kAnalyze, std::move(error)});
  events.endDiagnostic();
}

// The given limits, and those of the record that they do not replace. Tells those that they replace.
std::vector<UserLimit> limitsOfAnalysis(const std::vector<UserLimit>& recorded, const std::vector<UserLimit>& given,
                                        const std::vector<DiagnosticRecord>& records, std::ostream& err) {
  std::vector<UserLimit> limits;
  for (const UserLimit& limit : recorded) {
    const auto replacing = std::find_if(given.begin(), given.end(), [&limit, &records](const UserLimit& other) {
      return areOnSameResults(limit, other, records);
    });
    if (replacing == given.end()) {
      limits.push_back(limit);
    } else if (canonicalText(limit) != canonicalText(*replacing)) {
      err << printable(formatMessage("quazor: the limit '%@' of the record is replaced by '%@' (%@)",
                                     canonicalText(limit), canonicalText(*replacing), replacing->source))
          << '\n';
    }
  }
  limits.insert(limits.end(), given.begin(), given.end());
  return limits;
}

// Adds the parameters of a diagnostic, once: those of its repetitions are the same.
void addPlanned(RunStarted& began, const std::string& name, const ResolvedParameters& parameters) {
  const auto isOfName = [&name](const PlannedParameters& one) { return one.name == name; };
  if (std::any_of(began.planned.begin(), began.planned.end(), isOfName)) return;
  began.planned.push_back({name, parameters});
}

RunStarted beginningOf(const Options& options, const Installation& installation, const std::vector<Job>& jobs,
                       const std::vector<FailedPlugin>& failed) {
  RunStarted began{QUAZOR_VERSION, QUAZOR_CONTRACT_VERSION, dateNow(), {}, {}, options.seed, false, {}};
  for (const auto& file : isolationOf(options, installation).plugins) {
    began.plugins.push_back(std::filesystem::absolute(file).lexically_normal().string());
  }
  began.id = randomIdentifier();
  began.host = nameOfThisMachine();
  began.tags = options.tags;
  if (options.choice.attempts > 1) began.attempts = options.choice.attempts;
  if (options.choice.repetitions > 1) began.repetitions = options.choice.repetitions;
  began.acceptFlaky = options.choice.acceptFlaky;
  began.traced = options.trace.isOn;
  began.tracesTasks = options.trace.tasks;
  began.ofExperiments = options.command == Command::kExperiment;
  for (const FailedPlugin& plugin : failed) began.names.push_back(plugin.file.filename().string());
  for (const Job& job : jobs) {
    began.names.push_back(job.bound.described.diagnostic.name);
    addPlanned(began, began.names.back(), job.bound.parameters);
  }
  return began;
}

// Checks the outputs and makes those that receive events. A record in a folder gets its name from the run.
// The file of --record; empty if there is none.
std::filesystem::path recordOf(const Options& options, const RunStarted& began) {
  return isFolderOfRecords(options.record) ? options.record / recordNameOf(began) : options.record;
}

// Takes the record of the run into the store. The verdicts stay as they are.
ExitCode importedInto(const std::filesystem::path& store, const std::filesystem::path& record, ExitCode code,
                      Console& console) {
  const std::string problem = importAfterRun(store, record);
  if (problem.empty()) return code;
  console.err << "quazor: the run is not in the store: " << printable(problem)
              << "\nTo try again: quazor records import " << printable(record.string()) << '\n';
  return code == ExitCode::kInterrupted ? code : ExitCode::kCannotWrite;
}

std::unique_ptr<EventPipeline> beginEvents(Options options, const Installation& installation, const RunStarted& began,
                                           bool keepsLastRun, Console& console) {
  const std::filesystem::path folder = isFolderOfRecords(options.record) ? options.record : "";
  options.record = recordOf(options, began);
  checkOutputs(options, installation, began);
  if (!folder.empty()) makeFolderOfRecords(folder);
  EventPipelineOptions outputs;
  outputs.record = options.record;
  outputs.replacesRecord = options.replace;
  outputs.tellsRecord = !folder.empty();
  outputs.keepsLastRun = keepsLastRun;
  outputs.systemLog = options.systemLog;
  outputs.report = options.report;
  outputs.report.text.isExplained = explainedTopics(installation.explanations());
  outputs.report.text.page = pageWriter(installation);
  outputs.report.text.allowSkips = options.choice.allowSkips;
  outputs.logLimit = options.logLimit;
  return std::make_unique<EventPipeline>(outputs, console);
}

// The time to wait between two diagnostics. Each gets a new phone, so the time of one that is simulated passes at once.
std::chrono::nanoseconds realSettleOf(const Options& options) {
  const bool isSimulated = !bindingNamed(options.phone) && !options.realTime;
  return isSimulated ? std::chrono::nanoseconds::zero() : options.choice.settle;
}

ExitCode perform(const Options& options, const Installation& installation, Console& console, RunStarted began,
                 const std::vector<Job>& jobs, const std::vector<FailedPlugin>& failed, const RunOptions& runOptions,
                 const SeededPhoneMaker& phones, WatchedSignals* signals,
                 const std::optional<std::string>& recordedInterruption = std::nullopt) {
  const auto pipeline = beginEvents(options, installation, began, options.command == Command::kRun, console);
  EventPipeline& events = *pipeline;
  std::optional<InterruptWatcher> watcher;
  if (options.inProcess) {
    watcher.emplace([&events] { events.interruptAndLeave([] { ::_exit(static_cast<int>(ExitCode::kInterrupted)); }); });
  }
  const std::vector<UserLimit> limits = began.limits;
  const bool acceptFlaky = began.acceptFlaky;
  IsolationOptions isolation = withoutFailed(isolationOf(options, installation), failed);
  isolation.onInterrupt = [&events, grace = isolation.grace](Stage stage) { events.tellInterrupt(stage, grace); };
  Conductor conductor(std::move(isolation), runOptions, signals, events);
  events.onEvent(std::move(began));
  for (const FailedPlugin& plugin : failed) tellFailedPlugin(plugin, events);
  if (conductor.isInterrupted()) {
    events.onEvent(RunEnded{"", dateNow()});
    return ExitCode::kInterrupted;
  }
  const Choice& choice = options.choice;
  const bool mayTakeLong = options.command == Command::kRun;
  const Plan plan{choice.stopOn,   realSettleOf(options),
                  choice.attempts, choice.repetitions,
                  phones,          mayTakeLong ? limits : std::vector<UserLimit>()};
  if (std::optional<std::string> interrupted = conductor.performAll(jobs, plan)) {
    events.onEvent(RunEnded{std::move(interrupted), dateNow()});
    return ExitCode::kInterrupted;
  }
  if (recordedInterruption) {
    events.onEvent(RunEnded{recordedInterruption, dateNow()});
    events.requireRecords();
    return events.exitCode() == ExitCode::kAllPassed ? ExitCode::kIncomplete : events.exitCode();
  }
  for (const UserLimit& limit : limitsWithoutResult(limits, events.records())) tellLimitWithoutResult(limit, events);
  RunEnded ended{std::nullopt, dateNow()};
  if (hasTrials(events.records())) ended.verdict = runVerdictOf(events.records(), acceptFlaky);
  events.onEvent(ended);
  events.requireRecords();
  return events.exitCode();
}

// Handles the case that nothing failed: still writes the requested files.
ExitCode performNothing(const Options& options, const Installation& installation, Console& console) {
  RunStarted began = beginningOf(options, installation, {}, {});
  began.phone = options.phone.string();
  const auto events = beginEvents(options, installation, began, false, console);
  events->onEvent(std::move(began));
  const bool isForPeople = options.report.format == Format::kText || !options.report.output.empty();
  const std::string which =
      options.failedOf.empty() ? "in the last run" : "in the run of '" + options.failedOf.string() + "'";
  (isForPeople ? console.out : console.err) << "Everything passed " << printable(which) << ".\n" << std::flush;
  events->onEvent(RunEnded{std::nullopt, dateNow()});
  events->requireRecords();
  return events->exitCode();
}

// A plug-in that could not be loaded may have what the pattern fits.
void refuseUnusedSkips(const std::vector<SkipRule>& rules, const Selection& selection) {
  for (const SkipRule& rule : rules) {
    const bool fits = std::any_of(
        selection.diagnostics.begin(), selection.diagnostics.end(),
        [&rule](const ResolvedDiagnostic& one) { return matchesName(rule.pattern, one.described.diagnostic.name); });
    if (fits || !selection.failed.empty()) continue;
    throw CommandError(ExitCode::kUsage, "--skip '" + rule.pattern + "' fits nothing of what is selected to run");
  }
}

// Tells the limits that will probably be compared with nothing.
void tellDoubtfulLimits(const std::vector<UserLimit>& limits, const std::vector<Job>& jobs,
                        const Installation& installation, std::ostream& err) {
  std::vector<std::string> selected;
  std::vector<std::string> toRun;
  for (const Job& job : jobs) {
    selected.push_back(job.bound.described.diagnostic.name);
    if (!job.skip) toRun.push_back(selected.back());
  }
  const auto tell = [&err](const std::string& one) { err << "quazor: " << printable(one) << '\n'; };
  std::ranges::for_each(limitsOfUnselected(limits, selected), tell);
  std::ranges::for_each(limitsOnUnexplained(limits, toRun, installation.explanations()), tell);
}

// The error of a diagnostic that lacks a required parameter, or null. Throws a CommandError (kUsage) instead for one
// that the user named: the others are not worth running without it.
DiagnosticErrorPtr missingParameter(const ResolvedDiagnostic& one, const Options& options,
                                    const Installation& installation) {
  const std::string problem = missingParameterOf(one, options, installation);
  if (problem.empty()) return nullptr;
  const std::string& name = one.described.diagnostic.name;
  const bool isNamed = std::find(options.names.begin(), options.names.end(), name) != options.names.end();
  if (isNamed) throw CommandError(ExitCode::kUsage, problem);
  return hostError(HostErrorCode::kParameterMissing, problem);
}

// A phone of a run must be a file, or the name of one that is installed.
void requirePhone(const std::filesystem::path& file, const Options& options, const Installation& installation) {
  std::error_code ignored;
  if (std::filesystem::exists(std::filesystem::symlink_status(file, ignored)) || file.is_absolute()) return;
  const std::string text = "--phone " + options.phone.string() + ": ";
  if (bindingNamed(options.phone)) {
    throw CommandError(ExitCode::kCannotRead,
                       text + "the file does not exist" +
                           didYouMeanOf(file.string(), "the installed bindings", installation.bindingNames()));
  }
  refuseGroupOfPhones(file.string(), ExitCode::kCannotRead, "--phone " + options.phone.string(), installation);
  throw CommandError(ExitCode::kCannotRead,
                     text + "the file does not exist, and no installed phone has this name; " + kWayToPhones);
}

void addFilesOf(const std::vector<Profile>& profiles, std::vector<std::filesystem::path>& files) {
  for (const Profile& one : profiles) files.push_back(one.file);
}

// The selected phone.
struct ChosenPhone {
  std::string name;  // as records have it
  SeededPhoneMaker make;
  std::vector<SkipRule> absent;
  std::vector<std::filesystem::path> bases{};  // the files that it is based on
};

ChosenPhone choosePhone(const Options& options, const Installation& installation) {
  if (const auto binding = bindingNamed(options.phone)) {
    const std::filesystem::path file = installation.binding(*binding);
    requirePhone(file, options, installation);
    const auto make = [phones = phonesOfBinding(file)](std::uint64_t /*seed*/) { return phones; };
    return {std::string(kLinuxPrefix) + file.string(), make, summaryOfBinding(file).absent};
  }
  const std::filesystem::path scenario =
      options.phone.empty() ? installation.defaultScenario() : installation.scenario(options.phone);
  requirePhone(scenario, options, installation);
  const ScenarioSource source = installation.scenarioSource();
  ScenarioSummary summary = summaryOfScenario(scenario, source);
  return {scenario.string(), seededPhonesOfScenario(scenario, options.realTime, source), std::move(summary.absent),
          std::move(summary.bases)};
}

}  // namespace

ExitCode runCommand(const Options& given, const Installation& installation, Console& console, WatchedSignals* signals) {
  Options options = given.onlyFailed ? optionsToRunAgain(given, installation) : given;
  if (options.onlyFailed && options.names.empty()) return performNothing(options, installation, console);
  if (options.onlyFailed) tellUnrecorded(options, console.err);
  Selection selection = select(options, installation, signals);
  refuseUnusedSkips(options.choice.skips, selection);
  const ChosenPhone phone = choosePhone(options, installation);
  options.bases = phone.bases;
  addFilesOf(selection.profiles, options.bases);
  tellRemarks(selection, selection.diagnostics, console.err);
  std::vector<Job> jobs;
  for (ResolvedDiagnostic& one : selection.diagnostics) {
    std::optional<Skip> skip = skipOf(one.described.diagnostic.name, options.choice.skips);
    if (!skip) skip = skipOf(one.described.diagnostic.name, phone.absent);
    DiagnosticErrorPtr problem = skip ? nullptr : missingParameter(one, options, installation);
    const auto own = options.seedOf.find(one.described.diagnostic.name);
    const std::uint64_t seed = own == options.seedOf.end() ? options.seed : own->second;
    jobs.push_back({std::move(one), nullptr, seed, std::move(skip), std::move(problem)});
  }
  tellDoubtfulLimits(selection.limits, jobs, installation, console.err);
  RunOptions runOptions;
  runOptions.logLevel = options.logLevel.value_or(LogLevel::kDefault);
  runOptions.logLimit = options.logLimit;
  runOptions.trace = options.trace;
  RunStarted began = beginningOf(options, installation, jobs, selection.failed);
  began.phone = phone.name;
  began.limits = std::move(selection.limits);
  const std::filesystem::path record = recordOf(options, began);
  if (!options.store.empty()) requireStoreFor(options.store);
  const ExitCode code = perform(options, installation, console, std::move(began), jobs, selection.failed, runOptions,
                                phone.make, signals);
  return options.store.empty() ? code : importedInto(options.store, record, code, console);
}

namespace {

// The parameters of a recorded run, in which the settings of the command line replace those of the analysis.
ResolvedParameters reboundParameters(const DiagnosticRecord& record, const ResolvedDiagnostic& now) {
  ResolvedParameters parameters{record.parameters.experiment, now.parameters.analysis};
  for (ResolvedParameter& one : parameters.analysis) {
    const auto& before = record.parameters.analysis;
    const auto found = std::find_if(before.begin(), before.end(),
                                    [&one](const ResolvedParameter& other) { return other.name == one.name; });
    if (one.value || found == before.end() || !found->value) continue;
    one.value = found->value;
    one.source = found->source + ", in the record";
  }
  return parameters;
}

// The limits of the record. One that was not missed in the run, for example because its diagnostic ended in an error,
// is not missed in the analysis.
std::vector<UserLimit> limitsToAnalyze(const RecordedRun& run) {
  std::vector<UserLimit> limits = run.began.limits;
  for (UserLimit& limit : limits) {
    if (limit.diagnostic.empty()) continue;
    limit.onlyIfSelected = limit.onlyIfSelected || limitsWithoutResult({limit}, run.records).empty();
  }
  return limits;
}

// The diagnostic in which the recorded run stopped before its end, as in RunEnded; nothing if it came to its end. One
// whose experiment returned a result is analyzed, and so nothing of it is missing.
std::optional<std::string> interruptionIn(const RecordedRun& run,
                                          const std::vector<const DiagnosticRecord*>& analysable) {
  if (run.ended && !run.ended->interrupted) return std::nullopt;
  std::string running = run.ended ? *run.ended->interrupted : "";
  if (!run.ended && run.isLastOpen) running = run.records.back().name;
  const bool isAnalyzed = !analysable.empty() && analysable.back() == &run.records.back();
  return isAnalyzed ? std::string() : running;
}

}  // namespace

ExitCode analyzeCommand(const Options& given, const Installation& installation, Console& console,
                        WatchedSignals* signals) {
  const RecordedRun run = runIn(given.records.front());
  Options options = given;
  if (options.profile.empty()) options.withoutProfile = true;  // the record contains the profile's values
  for (ParameterOverride& setting : options.settings) {
    if (setting.part == Part::kExperiment) {
      throw CommandError(ExitCode::kUsage, "--set '" + setting.text + "': 'quazor analyze' does not run experiments");
    }
    setting.part = Part::kAnalysis;
  }
  std::vector<const DiagnosticRecord*> analysable;
  for (const DiagnosticRecord& record : run.records) {
    const bool hasResult = std::any_of(record.stages.begin(), record.stages.end(),
                                       [](const StagePeriod& one) { return one.stage == Stage::kAnalyze; });
    if (record.experimentOnly) continue;
    if (hasResult) {
      analysable.push_back(&record);
      options.names.push_back(record.name);
    } else {
      console.err << "quazor: " << printable(record.name) << " has no experiment result in the record and is skipped\n";
    }
  }
  if (analysable.empty()) {
    throw CommandError(ExitCode::kCannotRead,
                       "the record '" + given.records.front().string() + "' contains no experiment result to analyze");
  }
  if (options.plugins.empty()) options.plugins = recordedPlugins(run.began.plugins, installation);
  const Selection selection = select(options, installation, signals);
  addFilesOf(selection.profiles, options.bases);
  std::vector<QZExperimentResult> results(analysable.size());
  std::vector<ResolvedDiagnostic> rebound;
  std::vector<Job> jobs;
  for (std::size_t i = 0; i < analysable.size(); ++i) {
    const DiagnosticRecord& record = *analysable[i];
    for (const ResolvedDiagnostic& one : selection.diagnostics) {
      if (one.described.diagnostic.name != record.name) continue;
      results[i].measurements() = record.measurements;
      results[i].auxiliaryData() = record.auxiliaryData;
      rebound.push_back({one.described, reboundParameters(record, one)});
      jobs.push_back({rebound.back(), &results[i], record.seed});
      jobs.back().attempt = record.trial.attempt;
      jobs.back().repetition = record.trial.repetition;
    }
  }
  RunOptions runOptions;
  runOptions.logLevel = options.logLevel.value_or(LogLevel::kDefault);
  runOptions.logLimit = options.logLimit;
  RunStarted began = beginningOf(options, installation, jobs, selection.failed);
  tellRemarks(selection, rebound, console.err);
  began.phone = run.began.phone;
  began.seed = run.began.seed;
  began.analyzed = run.began.analyzed.value_or(AnalyzedRun{run.began.id, run.began.date, run.began.host});
  began.tags = run.began.tags;
  for (const auto& [key, value] : options.tags) began.tags.set(key, value);
  began.acceptFlaky = run.began.acceptFlaky;
  began.limits = limitsOfAnalysis(limitsToAnalyze(run), selection.limits, run.records, console.err);
  const std::optional<std::string> interruption = interruptionIn(run, analysable);
  if (interruption) {
    for (const PlannedDiagnostic& one : missingOf(run.began, run.records)) began.names.push_back(one.name);
    if (!interruption->empty()) began.names.push_back(*interruption);
    for (const auto& [name, parameters] : run.began.planned) {
      const bool isNamed = std::find(began.names.begin(), began.names.end(), name) != began.names.end();
      if (isNamed) addPlanned(began, name, parameters);
    }
  }
  return perform(options, installation, console, std::move(began), jobs, selection.failed, runOptions, nullptr, signals,
                 interruption);
}

}  // namespace quazor
