#include "host/run/diagnostic_run.h"

#include "base/text/utf8.h"
#include "host/error/host_error.h"
#include "host/error/nesting.h"
#include "host/model/run_log.h"
#include "host/plugin/null_platform.h"
#include "host/run/run_concurrency.h"
#include "host/text/timestamp.h"

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>
#include <variant>

namespace quazor {

namespace {

// The number of measurements or results per event: large enough to make the overhead negligible, small enough to keep a
// reader from waiting.
constexpr std::size_t kChunk = 500;

// Serializes events from several threads, and keeps the last log line of level error.
// Thread: any.
class OneAtATime final : public RunEventSink {
 public:
  explicit OneAtATime(RunEventSink& events) : events_(events) {}

  void onEvent(const RunEvent& event) override {
    const std::lock_guard lock(mutex_);
    const auto* const logged = std::get_if<Logged>(&event);
    if (logged != nullptr && logged->line.level == LogLevel::kError) lastErrorLine_ = logged->line.text;
    events_.onEvent(event);
  }

  // The last error line since the last call; empty if there was none.
  std::string takeLastErrorLine() {
    const std::lock_guard lock(mutex_);
    return std::exchange(lastErrorLine_, {});
  }

 private:
  std::mutex mutex_;
  RunEventSink& events_;
  std::string lastErrorLine_;
};

// Only the log can tell the cause of a failure without an error. A longer line is cut between two characters.
DiagnosticErrorPtr withErrorLine(DiagnosticErrorPtr failure, std::string line) {
  constexpr std::size_t kMaxQuoted = 500;
  if (!isHostError(failure, HostErrorCode::kNoErrorGiven) || line.empty()) return failure;
  if (line.size() > kMaxQuoted) {
    std::size_t end = kMaxQuoted;
    while (end > 0 && continuesUtf8(line[end])) --end;
    line.replace(end, std::string::npos, "...");
  }
  return hostError(HostErrorCode::kNoErrorGiven,
                   failure->localizedDescription() + "; the last error line of its log: " + line);
}

// Sends the log lines of a run as events during its lifetime.
class LogOfRun {
 public:
  LogOfRun(std::shared_ptr<const Clock> clock, LogLevel level, RunEventSink& events)
      : log_(std::make_shared<RunLog>(std::move(clock), events)), level_(level) {
    sharedLog().setBackend(log_, level);
  }
  LogOfRun(const LogOfRun&) = delete;
  LogOfRun& operator=(const LogOfRun&) = delete;
  ~LogOfRun() {
    sharedLog().setBackend(nullptr, level_);
    log_->close();
  }

  std::shared_ptr<const RunLog> log() const { return log_; }

 private:
  const std::shared_ptr<RunLog> log_;
  const LogLevel level_;
};

// The state of one run between its stages.
class Run {
 public:
  Run(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const Clock& clock, OneAtATime& events,
      std::function<bool()> isInterrupted = nullptr)
      : diagnostic_(diagnostic),
        parameters_(parameters),
        clock_(clock),
        events_(events),
        isInterrupted_(std::move(isInterrupted)) {}

  bool isInterrupted() const { return isInterrupted_ && isInterrupted_(); }

  // Returns the experiment's result, or null.
  std::unique_ptr<QZExperimentResult> experiment() {
    const std::string& name = diagnostic_.experimentName;
    std::shared_ptr<QZExperiment> experiment;
    inStage(Stage::kDescribe, [&] {
      experiment = make(name, diagnostic_.makeExperiment,
                        [](const QZExperiment& made) { static_cast<void>(made.experimentDescription()); });
    });
    if (experiment == nullptr || isInterrupted()) return nullptr;
    bool ready = false;
    inStage(Stage::kSetup, [&] {
      const Dictionary parameters = dictionaryOf(parameters_.experiment);
      ready = attempt("setup of " + name, [&](DiagnosticErrorPtr* error) {
        return experiment->setupWithParameters(parameters, &host_, error);
      });
    });
    if (!ready) return nullptr;
    std::unique_ptr<QZExperimentResult> result;
    if (!isInterrupted()) result = resultOf(*experiment);
    if (result != nullptr) tell(*result);
    if (auto* const teardown = dynamic_cast<QZTeardown*>(experiment.get())) {
      inStage(Stage::kTeardown, [&] {
        attempt("teardown of " + name, [&](DiagnosticErrorPtr* error) { return teardown->teardown(error); });
      });
    }
    return result;
  }

  void tell(const QZExperimentResult& result) {
    MeasurementsAdded chunk;
    for (const auto& one : result.measurements()) {
      chunk.measurements.push_back(one);
      if (chunk.measurements.size() < kChunk) continue;
      events_.onEvent(std::exchange(chunk, MeasurementsAdded()));
    }
    if (!chunk.measurements.empty()) events_.onEvent(chunk);
    for (const auto& [key, value] : result.auxiliaryData()) events_.onEvent(AuxiliaryDataAdded{key, value});
  }

  void analyze(const QZExperimentResult& measured) {
    std::unique_ptr<QZAnalysisResult> result;
    inStage(Stage::kAnalyze, [&] { result = analysis(measured); });
    if (result == nullptr) return;
    const std::vector<QZMeasuredResult>& results = result->measuredResults();
    for (std::size_t i = 0; i < results.size(); i += kChunk) {
      const auto begin = results.begin() + static_cast<std::ptrdiff_t>(i);
      events_.onEvent(
          ResultsReported{{begin, begin + static_cast<std::ptrdiff_t>(std::min(kChunk, results.size() - i))}});
    }
  }

 private:
  // Returns null if the run failed.
  std::unique_ptr<QZExperimentResult> resultOf(QZExperiment& experiment) {
    std::unique_ptr<QZExperimentResult> result;
    inStage(Stage::kRun, [&] {
      const bool succeeded = attempt("run of " + diagnostic_.experimentName, [&](DiagnosticErrorPtr* error) {
        result = experiment.run(error);
        return result != nullptr && isRecordable(*result, error);
      });
      if (!succeeded) result = nullptr;
    });
    return result;
  }

  bool isRecordable(const QZExperimentResult& result, DiagnosticErrorPtr* error) const {
    for (const auto& [key, value] : result.auxiliaryData()) {
      if (isWithinLevels(value)) continue;
      *error = errorOfDeepEntry(key, diagnostic_.experimentName);
      return false;
    }
    return true;
  }

  template <class Work>
  void inStage(Stage stage, Work&& work) {
    stage_ = stage;
    events_.onEvent(StageStarted{stage, dateNow()});
    const std::chrono::nanoseconds begin = clock_.now();
    std::forward<Work>(work)();
    const std::chrono::nanoseconds duration = clock_.now() - begin;
    events_.onEvent(StageEnded{stage, duration, dateNow()});
  }

  // Calls into the plug-in.
  template <class Call>
  bool attempt(const std::string& operation, Call&& call) {
    DiagnosticErrorPtr failure;
    events_.takeLastErrorLine();  // of an earlier operation
    if (callPlugin(operation, &failure, std::forward<Call>(call))) return true;
    failure = withErrorLine(std::move(failure), events_.takeLastErrorLine());
    events_.onEvent(Failed{stage_, errorWithinLevels(std::move(failure))});
    return false;
  }

  // Creates an experiment or analysis and asks for its description, like every host.
  template <class Made, class Describe>
  std::shared_ptr<Made> make(const std::string& name, const std::function<std::shared_ptr<Made>()>& factory,
                             Describe&& describe) {
    std::shared_ptr<Made> made;
    const bool usable =
        attempt("making " + name,
                [&](DiagnosticErrorPtr* error) {
                  made = factory();
                  if (made == nullptr)
                    *error = hostError(HostErrorCode::kNothingMade, "the factory of " + name + " returned no object");
                  return made != nullptr;
                }) &&
        attempt("describing " + name, [&](DiagnosticErrorPtr* /*error*/) {
          describe(*made);
          return true;
        });
    if (!usable) made = nullptr;
    return made;
  }

  std::unique_ptr<QZAnalysisResult> analysis(const QZExperimentResult& measured) {
    const std::string& name = diagnostic_.analysisName;
    const auto analysis = make(name, diagnostic_.makeAnalysis,
                               [](const QZAnalysis& made) { static_cast<void>(made.analysisDescription()); });
    if (analysis == nullptr) return nullptr;
    if (auto* const setup = dynamic_cast<QZAnalysisSetup*>(analysis.get())) {
      const Dictionary parameters = dictionaryOf(parameters_.analysis);
      const bool ready = attempt("setup of " + name, [&](DiagnosticErrorPtr* error) {
        return setup->setupWithParameters(parameters, &host_, error);
      });
      if (!ready) return nullptr;
    }
    std::unique_ptr<QZAnalysisResult> result;
    attempt("analysis by " + name, [&](DiagnosticErrorPtr* error) {
      result = analysis->analyzeExperimentResult(measured, error);
      return result != nullptr;
    });
    return result;
  }

  const Diagnostic& diagnostic_;
  const ResolvedParameters& parameters_;
  const Clock& clock_;
  OneAtATime& events_;
  const std::function<bool()> isInterrupted_;
  Stage stage_ = Stage::kDescribe;
  QZDiagnosticHost host_;
};

}  // namespace

void runDiagnostic(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const RunOptions& options,
                   RunEventSink& events) {
  OneAtATime serial(events);
  const std::shared_ptr<Phone> phone = options.makePhone();
  if (options.watchPhone) options.watchPhone(phone);
  Platform platform = phone->platform();
  {
    const LogOfRun log(platform.clock, options.logLevel, serial);
    if (options.frames != nullptr) {
      options.frames->begin(log.log()->begin());
      phone->traceFrames(*options.frames);
    }
    TaskTrace tasks;
    if (options.trace.tasks) tasks = {options.frames, platform.clock, phone->whenTraceIsFull()};
    platform.concurrency = concurrencyOfRun(std::move(platform.concurrency), log.log(), std::move(tasks));
    installPlatform(platform);
    Run run(diagnostic, parameters, *platform.clock, serial, options.isInterrupted);
    const std::unique_ptr<QZExperimentResult> result = run.experiment();
    if (result != nullptr && !diagnostic.experimentOnly && !run.isInterrupted()) run.analyze(*result);
    installPlatform(nullPlatform());
  }
  events.onEvent(FaultsCounted{phone->faults()});
  events.onEvent(DiagnosticCompleted{});
}

void analyzeResult(const Diagnostic& diagnostic, const ResolvedParameters& parameters, const QZExperimentResult& result,
                   LogLevel logLevel, RunEventSink& events) {
  OneAtATime serial(events);
  const Platform platform = nullPlatform();
  {
    const LogOfRun log(platform.clock, logLevel, serial);
    installPlatform(platform);
    Run run(diagnostic, parameters, *platform.clock, serial);
    run.tell(result);  // makes it possible to analyze the new record again
    run.analyze(result);
  }
  events.onEvent(DiagnosticCompleted{});
}

}  // namespace quazor
