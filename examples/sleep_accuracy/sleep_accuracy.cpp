// A plug-in of one's own: how late does the platform's clock wake a thread that sleeps?
#include "frame/diagnostic_contract.h"
#include "frame/lab.h"
#include "platform/platform.h"

#include <memory>

namespace {

using namespace quazor;

constexpr std::string_view kLateness = "Lateness";

// A unit is known by its symbol; there need not have been one before.
const QZUnit& milliseconds() { return QZUnit::unitWithSymbol("ms"); }

// Sleeps once, and measures by how much longer that took than it should have.
class SleepAccuracyExperiment final : public QZExperiment {
 public:
  QZDescription experimentDescription() const override {
    QZDescription description("Sleep once and measure how late the thread wakes.");
    description.addParameter(QZNumberParameter("How long to sleep, in seconds.", true), "duration");
    return description;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* /*host*/,
                           DiagnosticErrorPtr* error) override {
    const double seconds = toDouble(parameters.find("duration"));
    if (!(seconds > 0)) {  // not-a-number is refused too
      fail(error, QZErrorDomain, 5, nullptr, "duration must be more than 0 seconds, not %@", seconds);
      return false;
    }
    duration_ = nanosecondsFromSeconds(seconds);
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* /*error*/) override {
    Clock& clock = *installedPlatform().clock;
    const auto start = clock.now();
    clock.sleep(duration_);
    const std::chrono::duration<double, std::milli> lateness = clock.now() - start - duration_;
    logDebug("Slept, and woke %lf ms late.", lateness.count());
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kLateness, Measurement(lateness.count(), milliseconds()));
    return result;
  }

 private:
  std::chrono::nanoseconds duration_{};
};

// A thread must not wake early, and at most 100 ms late.
class SleepAccuracyAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override {
    return QZDescription("Ensure the thread woke neither early nor more than 100 ms late.");
  }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override {
    const Measurement* lateness = result.measurements().find(kLateness);
    if (lateness == nullptr) {
      fail(error, QZErrorDomain, 6, nullptr, "The experiment did not measure %@.", kLateness);
      return nullptr;
    }
    QZLimit limit("LatenessLimit");
    limit.setLowerBound(std::make_shared<QZBound>(Measurement(0, milliseconds()), false));
    limit.setUpperBound(std::make_shared<QZBound>(Measurement(100, milliseconds()), false));
    auto analysis = std::make_unique<QZAnalysisResult>();
    analysis->measuredResults().emplace_back(kLateness, *lateness);
    analysis->measuredResults().back().setLimit(std::move(limit));
    return analysis;
  }
};

// Loading the plug-in registers what it has.
[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("SleepAccuracyExperiment", [] { return std::make_shared<SleepAccuracyExperiment>(); });
  lab.addAnalysisWithName("SleepAccuracyAnalysis", [] { return std::make_shared<SleepAccuracyAnalysis>(); });
  lab.addDiagnosticWithName("SleepAccuracyDiagnostic", "Sleep once and ensure the thread wakes in time.",
                            "SleepAccuracyExperiment", "SleepAccuracyAnalysis");
}

}  // namespace
