#include "host/diagnostic_run.h"

#include "host/host_error.h"
#include "host/idle_platform.h"

#include <memory>
#include <utility>

namespace quazor {

namespace {

using namespace std::chrono_literals;

// One run's state between its stages.
class Run {
 public:
  Run(const Diagnostic& diagnostic, DiagnosticRecord& record, const Clock& clock)
      : diagnostic_(diagnostic), record_(record), clock_(clock) {}

  void perform() {
    std::unique_ptr<QZExperimentResult> result = experiment();
    if (result == nullptr) return;
    record_.measurements = result->measurements();
    record_.auxiliaryData = result->auxiliaryData();
    if (diagnostic_.experimentOnly) {
      record_.verdict = record_.error == nullptr ? Verdict::kPass : Verdict::kError;
      return;
    }
    const std::unique_ptr<QZAnalysisResult> analysed = analysis(*result);
    if (analysed == nullptr) return;
    judgeResults(analysed->measuredResults());
  }

 private:
  // Calls into the plug-in; the first failure of the run becomes its error.
  template <class Call>
  bool attempt(const std::string& operation, Call&& call) {
    DiagnosticErrorPtr failure;
    if (callPlugin(operation, &failure, std::forward<Call>(call))) return true;
    if (record_.error == nullptr) record_.error = std::move(failure);
    return false;
  }

  // As attempt, and keeps how long it took.
  template <class Call>
  bool timedAttempt(std::optional<std::chrono::nanoseconds>* duration, const std::string& operation, Call&& call) {
    const std::chrono::nanoseconds begin = clock_.now();
    const bool succeeded = attempt(operation, std::forward<Call>(call));
    *duration = duration->value_or(0ns) + (clock_.now() - begin);
    return succeeded;
  }

  // Makes an experiment or analysis by its factory, and asks its description as every host does.
  template <class Factory, class Describe>
  auto make(const std::string& name, const Factory& factory, Describe&& describe) {
    decltype(factory()) made;
    const bool usable =
        attempt("making " + name,
                [&](DiagnosticErrorPtr* error) {
                  made = factory();
                  if (made == nullptr)
                    *error = hostError(HostErrorCode::kNothingMade, "the factory of " + name + " made nothing");
                  return made != nullptr;
                }) &&
        attempt("describing " + name, [&](DiagnosticErrorPtr* /*error*/) {
          describe(*made);
          return true;
        });
    if (!usable) made = nullptr;
    return made;
  }

  std::unique_ptr<QZExperimentResult> experiment() {
    const std::string& name = diagnostic_.experimentName;
    const auto experiment = make(name, diagnostic_.makeExperiment,
                                 [](const QZExperiment& made) { static_cast<void>(made.experimentDescription()); });
    if (experiment == nullptr) return nullptr;
    const Dictionary parameters = dictionaryOf(record_.parameters.experiment);
    const bool ready = timedAttempt(&record_.durations.setup, "setup of " + name, [&](DiagnosticErrorPtr* error) {
      return experiment->setupWithParameters(parameters, &host_, error);
    });
    if (!ready) return nullptr;
    std::unique_ptr<QZExperimentResult> result;
    timedAttempt(&record_.durations.run, "run of " + name, [&](DiagnosticErrorPtr* error) {
      result = experiment->run(error);
      return result != nullptr;
    });
    if (auto* const teardown = dynamic_cast<QZTeardown*>(experiment.get())) {
      timedAttempt(&record_.durations.teardown, "teardown of " + name,
                   [&](DiagnosticErrorPtr* error) { return teardown->teardown(error); });
    }
    return result;
  }

  std::unique_ptr<QZAnalysisResult> analysis(const QZExperimentResult& measured) {
    const std::string& name = diagnostic_.analysisName;
    const auto analysis = make(name, diagnostic_.makeAnalysis,
                               [](const QZAnalysis& made) { static_cast<void>(made.analysisDescription()); });
    if (analysis == nullptr) return nullptr;
    if (auto* const setup = dynamic_cast<QZAnalysisSetup*>(analysis.get())) {
      const Dictionary parameters = dictionaryOf(record_.parameters.analysis);
      const bool ready = timedAttempt(&record_.durations.analysis, "setup of " + name, [&](DiagnosticErrorPtr* error) {
        return setup->setupWithParameters(parameters, &host_, error);
      });
      if (!ready) return nullptr;
    }
    std::unique_ptr<QZAnalysisResult> result;
    timedAttempt(&record_.durations.analysis, "analyzing of " + name, [&](DiagnosticErrorPtr* error) {
      result = analysis->analyzeExperimentResult(measured, error);
      return result != nullptr;
    });
    return result;
  }

  void judgeResults(const std::vector<QZMeasuredResult>& results) {
    const Judgement judgement = judge(results);
    for (std::size_t i = 0; i < results.size(); ++i) {
      record_.measuredResults.push_back({results[i], judgement.results[i]});
    }
    if (record_.error == nullptr && judgement.problemCode) {
      record_.error = hostError(*judgement.problemCode, judgement.problem);
    }
    record_.verdict = record_.error == nullptr ? judgement.verdict : Verdict::kError;
  }

  const Diagnostic& diagnostic_;
  DiagnosticRecord& record_;
  const Clock& clock_;
  QZDiagnosticHost host_;
};

}  // namespace

DiagnosticRecord runDiagnostic(const DescribedDiagnostic& diagnostic, const BoundParameters& parameters,
                               const RunOptions& options) {
  DiagnosticRecord record;
  record.name = diagnostic.diagnostic.name;
  record.summary = diagnostic.summary();
  record.experimentOnly = diagnostic.diagnostic.experimentOnly;
  record.parameters = parameters;
  record.seed = options.seed;
  record.error = diagnostic.description.error;
  if (record.error != nullptr) return record;

  const std::shared_ptr<const Phone> phone = options.makePhone();
  if (options.watchPhone) options.watchPhone(phone);
  const Platform platform = phone->platform();
  std::vector<RunLog::Listener> listeners;
  if (options.makeListeners) listeners = options.makeListeners(platform.clock);
  const auto log = std::make_shared<RunLog>(platform.clock, std::move(listeners));
  sharedLog().setBackend(log, options.logLevel);
  installPlatform(platform);
  Run(diagnostic.diagnostic, record, *platform.clock).perform();
  installPlatform(idlePlatform());
  sharedLog().setBackend(nullptr, options.logLevel);
  record.log = log->lines();
  record.faults = phone->faults();
  return record;
}

}  // namespace quazor
