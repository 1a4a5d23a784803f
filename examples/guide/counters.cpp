// Counters: how often the rails of the image signal processor are switched, in all and while a camera streams.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "platform/platform.h"

#include <chrono>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>

namespace {

using namespace quazor;

constexpr std::string_view kGroup = "K42ISP";
constexpr std::string_view kSubGroup = "K42ISP Power";
constexpr std::string_view kChannel = "Rail switches";
constexpr std::string_view kBefore = "Switches Before";
constexpr std::string_view kRise = "Switches Meanwhile";

constexpr std::string_view kRailSwitchErrorDomain = "RailSwitchErrorDomain";
constexpr int kNoReport = 1;
constexpr int kNoCount = 2;
constexpr int kNotStreaming = 3;
constexpr int kMissingMeasurement = 6;  // of QZErrorDomain

class RailSwitchExperiment final : public QZExperiment, public QZTeardown {
 public:
  explicit RailSwitchExperiment(const Platform& platform = installedPlatform())
      : reports_(platform.reports), capture_(platform.capture), clock_(platform.clock) {}

  QZDescription experimentDescription() const override {
    return QZDescription("Count the switches of the rails, and those while a camera streams for a second.");
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    DiagnosticErrorPtr reason;
    const auto all = reports_->reportWithOnlySimpleChannels(&reason);
    const auto wanted = all == nullptr ? nullptr : all->reportByFilteringChannels(isWanted);
    const auto before = wanted == nullptr ? nullptr : wanted->snapshot(&reason);
    if (before == nullptr) return failReport(error, reason);

    const auto plugIn = capture_->createPlugIn();
    device_ = plugIn == nullptr ? nullptr : plugIn->device(&reason);
    if (device_ == nullptr || !startFirstCamera(*device_, &reason)) return failStream(error, reason);
    clock_->sleep(std::chrono::seconds(1));
    const auto after = wanted->snapshot(&reason);
    const auto rise = after == nullptr ? nullptr : after->snapshotWithBaseline(*before, &reason);
    if (rise == nullptr) return failReport(error, reason);

    auto result = std::make_unique<QZExperimentResult>();
    if (!measure(*before, kBefore, *result) || !measure(*rise, kRise, *result)) {
      fail(error, kRailSwitchErrorDomain, kNoCount, nullptr, "There is no count of %@.", kChannel);
      return nullptr;
    }
    return result;
  }

  // Also called after a run that failed. Stops the streams of the device and releases their control.
  bool teardown(DiagnosticErrorPtr* error) override { return device_ == nullptr || device_->invalidate(error); }

 private:
  static bool isWanted(const ReportChannelDescription& channel) {
    return channel.groupName == kGroup && channel.subGroupName == kSubGroup && channel.name == kChannel;
  }

  static std::unique_ptr<QZExperimentResult> failReport(DiagnosticErrorPtr* error, const DiagnosticErrorPtr& reason) {
    fail(error, kRailSwitchErrorDomain, kNoReport, reason, "The report channels cannot be read.");
    return nullptr;
  }

  static std::unique_ptr<QZExperimentResult> failStream(DiagnosticErrorPtr* error, const DiagnosticErrorPtr& reason) {
    fail(error, kRailSwitchErrorDomain, kNotStreaming, reason, "No camera can be started.");
    return nullptr;
  }

  static bool startFirstCamera(CaptureDevice& device, DiagnosticErrorPtr* reason) {
    const std::optional<CaptureStreams> streams = device.streams(reason);
    return streams && !streams->empty() && device.requestControlOfStreams({streams->front()}, reason) &&
           streams->front()->start(reason);
  }

  // Returns false if the snapshot has no such channel, or one without a count.
  static bool measure(const ReportSnapshot& snapshot, std::string_view name, QZExperimentResult& result) {
    if (snapshot.samples().empty() || !snapshot.samples().front().channel().count()) return false;
    const double count = toDouble(&*snapshot.samples().front().channel().count());
    result.measurements().set(name, Measurement(count, QZDimensionlessUnit::events()));
    return true;
  }

  const std::shared_ptr<ReportFacility> reports_;
  const std::shared_ptr<CaptureService> capture_;
  const std::shared_ptr<Clock> clock_;
  std::shared_ptr<CaptureDevice> device_;  // of the run, until teardown
};

class RailSwitchAnalysis final : public QZAnalysis {
 public:
  QZDescription analysisDescription() const override {
    return QZDescription("Ensure that the rails were switched seldom, and not at all while the camera streamed.");
  }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override {
    auto analysis = std::make_unique<QZAnalysisResult>();
    for (const auto& [name, maximum] : {std::pair(kBefore, 100.0), std::pair(kRise, 0.0)}) {
      const Measurement* const count = result.measurements().find(name);
      if (count == nullptr) {
        fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "The experiment did not measure %@.", name);
        return nullptr;
      }
      QZLimit limit("SwitchLimit");
      limit.setUpperBound(std::make_shared<QZBound>(Measurement(maximum, QZDimensionlessUnit::events()), false));
      analysis->measuredResults().emplace_back(name, *count);
      analysis->measuredResults().back().setLimit(std::move(limit));
    }
    return analysis;
  }
};

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("RailSwitchExperiment", [] { return std::make_shared<RailSwitchExperiment>(); });
  lab.addAnalysisWithName("RailSwitchAnalysis", [] { return std::make_shared<RailSwitchAnalysis>(); });
  lab.addDiagnosticWithName("RailSwitchDiagnostic", "Ensure that the rails are not switched all the time.",
                            "RailSwitchExperiment", "RailSwitchAnalysis");
}

}  // namespace
