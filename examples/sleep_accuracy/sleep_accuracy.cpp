// An example plug-in: measures how late the platform's clock wakes a sleeping thread.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/parameter_range.h"
#include "platform/platform.h"

#include <chrono>
#include <memory>
#include <string_view>
#include <utility>

namespace {

using namespace quazor;

constexpr std::string_view kLateness = "Lateness";
constexpr int kBadParameterValue = 5;   // of QZErrorDomain, shared by all plug-ins
constexpr int kMissingMeasurement = 6;  // the same
constexpr std::string_view kSleepAccuracyErrorDomain = "SleepAccuracyErrorDomain";
constexpr int kClockStoodStill = 1;  // of the domain above

// A symbol identifies a unit, which is created on first use.
const QZUnit& milliseconds() { return QZUnit::unitWithSymbol("ms"); }

// Sleeps once and measures how much longer that took than requested.
class SleepAccuracyExperiment final : public QZExperiment, public QZParameterRanges {
 public:
  explicit SleepAccuracyExperiment(const Platform& platform = installedPlatform()) : clock_(platform.clock) {}

  QZDescription experimentDescription() const override {
    QZDescription description("Sleep once and measure how late the thread wakes.");
    description.addParameter(QZNumberParameter("How long to sleep, in seconds.", true), "duration");
    return description;
  }

  OrderedMap<QZParameterRange> parameterRanges() const override {
    QZParameterRange duration;
    duration.setMinimum(0);
    duration.setUnit("s");
    OrderedMap<QZParameterRange> ranges;
    ranges.set("duration", duration);
    return ranges;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost*, DiagnosticErrorPtr* error) override {
    const double seconds = toDouble(parameters.find("duration"));
    if (!(seconds >= 0.001)) {  // also rejects not-a-number
      fail(error, QZErrorDomain, kBadParameterValue, nullptr, "duration must be at least 0.001 s, not %@", seconds);
      return false;
    }
    duration_ = nanosecondsFromSeconds(seconds);
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    const auto start = clock_->now();
    clock_->sleep(duration_);
    const auto slept = clock_->now() - start;
    if (slept.count() <= 0) {
      logError("The clock stood still at %@ ns.", start.count());
      fail(error, kSleepAccuracyErrorDomain, kClockStoodStill, nullptr, "The clock stood still during the sleep.");
      return nullptr;
    }
    const std::chrono::duration<double, std::milli> lateness = slept - duration_;
    logDebug("Slept, and woke %lf ms late.", lateness.count());
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kLateness, Measurement(lateness.count(), milliseconds()));
    return result;
  }

 private:
  const std::shared_ptr<Clock> clock_;
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
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "The experiment did not measure %@.", kLateness);
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

// Registers the plug-in's diagnostic when the plug-in is loaded.
[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("SleepAccuracyExperiment", [] { return std::make_shared<SleepAccuracyExperiment>(); });
  lab.addAnalysisWithName("SleepAccuracyAnalysis", [] { return std::make_shared<SleepAccuracyAnalysis>(); });
  lab.addDiagnosticWithName("SleepAccuracyDiagnostic", "Sleep once and ensure the thread wakes in time.",
                            "SleepAccuracyExperiment", "SleepAccuracyAnalysis");
}

}  // namespace
