// Waiting: how many input reports a HID device sends while the thread's run loop runs.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "platform/platform.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <utility>

namespace {

using namespace quazor;

constexpr std::int64_t kConsumerPage = 12;
constexpr std::int64_t kConsumerControl = 1;
constexpr std::string_view kReports = "Reports";
constexpr double kDefaultSeconds = 0.5;

constexpr int kBadParameterValue = 5;   // of QZErrorDomain
constexpr int kMissingMeasurement = 6;  // the same
constexpr std::string_view kButtonReportErrorDomain = "ButtonReportErrorDomain";
constexpr int kNoDevice = 1;
constexpr int kDeviceFailed = 2;

class ButtonReportExperiment final : public QZExperiment {
 public:
  explicit ButtonReportExperiment(const Platform& platform = installedPlatform())
      : hid_(platform.hid), runLoops_(platform.runLoops) {}

  ~ButtonReportExperiment() override { close(); }

  QZDescription experimentDescription() const override {
    QZDescription description("Count the reports that the buttons of the display send.");
    description.addParameter(QZNumberParameter("How long to wait, in seconds; default 0.5.", false), "duration");
    return description;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost*, DiagnosticErrorPtr* error) override {
    const Value* const given = parameters.find("duration");
    const double seconds = given == nullptr ? kDefaultSeconds : toDouble(given);
    if (!(seconds > 0 && seconds <= 60)) {
      fail(error, QZErrorDomain, kBadParameterValue, nullptr, "duration must be above 0 s and at most 60 s, not %@",
           seconds);
      return false;
    }
    duration_ = nanosecondsFromSeconds(seconds);
    return true;
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    loop_ = runLoops_->currentRunLoop();  // of this thread: setup may have another one
    DiagnosticErrorPtr reason;
    if (loop_ == nullptr || !open(&reason)) {
      fail(error, kButtonReportErrorDomain, kNoDevice, reason, "The buttons cannot be opened.");
      return nullptr;
    }
    // The loop ends at its limit; onReport() ends it earlier if the device fails.
    loop_->runInMode(kRunLoopDefaultMode, duration_, false);
    if (failure_ != nullptr) {
      fail(error, kButtonReportErrorDomain, kDeviceFailed, failure_, "The buttons failed after %@ reports.", reports_);
      return nullptr;
    }
    close();
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kReports, Measurement(static_cast<double>(reports_), QZDimensionlessUnit::events()));
    return result;
  }

 private:
  bool open(DiagnosticErrorPtr* reason) {
    const std::shared_ptr<HidManager> manager = hid_->createManager();
    if (manager == nullptr) return false;
    manager->enumerateDevicesMatching({Dictionary{{std::string(kHidPrimaryUsagePage), kConsumerPage},
                                                  {std::string(kHidPrimaryUsage), kConsumerControl}}});
    const auto devices = manager->devices();
    if (devices.empty() || !devices.front()->open(reason)) return false;
    device_ = devices.front();
    device_->setInputReportCallback(
        [this](std::uint8_t, std::span<const std::uint8_t>, const DiagnosticErrorPtr& failure) { onReport(failure); });
    device_->scheduleWithRunLoop(*loop_, kRunLoopDefaultMode);
    return true;
  }

  // On the thread of the run loop, while it runs.
  void onReport(const DiagnosticErrorPtr& failure) {
    if (failure == nullptr) {
      ++reports_;
      return;
    }
    failure_ = failure;
    loop_->stop();
  }

  void close() {
    if (device_ == nullptr) return;
    device_->unscheduleFromRunLoop(*loop_, kRunLoopDefaultMode);
    device_->setInputReportCallback(nullptr);
    device_->close(0);
    device_ = nullptr;
  }

  const std::shared_ptr<HidService> hid_;
  const std::shared_ptr<RunLoops> runLoops_;
  std::chrono::nanoseconds duration_{};
  RunLoop* loop_ = nullptr;
  std::shared_ptr<HidDevice> device_;
  std::uint64_t reports_ = 0;
  DiagnosticErrorPtr failure_;
};

class ButtonReportAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override { return QZDescription("Ensure that at least one report came."); }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override {
    const Measurement* const reports = result.measurements().find(kReports);
    if (reports == nullptr) {
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "The experiment did not measure %@.", kReports);
      return nullptr;
    }
    QZLimit limit("ReportLimit");
    limit.setLowerBound(std::make_shared<QZBound>(Measurement(1, QZDimensionlessUnit::events()), false));
    auto analysis = std::make_unique<QZAnalysisResult>();
    analysis->measuredResults().emplace_back(kReports, *reports);
    analysis->measuredResults().back().setLimit(std::move(limit));
    return analysis;
  }
};

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("ButtonReportExperiment", [] { return std::make_shared<ButtonReportExperiment>(); });
  lab.addAnalysisWithName("ButtonReportAnalysis", [] { return std::make_shared<ButtonReportAnalysis>(); });
  lab.addDiagnosticWithName("ButtonReportDiagnostic", "Ensure that the buttons of the display report something.",
                            "ButtonReportExperiment", "ButtonReportAnalysis");
}

}  // namespace
