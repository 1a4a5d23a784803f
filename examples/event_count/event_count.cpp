// A plug-in with one diagnostic: counts the events that the display's driver reports, and limits their number.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/parameter_range.h"
#include "platform/platform.h"

#include <memory>
#include <string>
#include <string_view>
#include <utility>

namespace {

using namespace quazor;

// The report channel, as `EventCountExperiment` finds it.
constexpr std::string_view kGroup = "Backlight";
constexpr std::string_view kChannel = "Level changes";
constexpr std::string_view kTotal = "EventCount.Total";
constexpr double kUsualMaximum = 100;

constexpr int kBadParameterValue = 5;   // of QZErrorDomain, shared by all plug-ins
constexpr int kMissingMeasurement = 6;  // the same
constexpr std::string_view kEventCountErrorDomain = "EventCountErrorDomain";
constexpr int kNoReport = 1;   // of the domain above
constexpr int kNoChannel = 2;  // the same

// Measures, and judges nothing.
class EventCountExperiment final : public QZExperiment {
 public:
  explicit EventCountExperiment(const Platform& platform = installedPlatform()) : reports_(platform.reports) {}

  QZDescription experimentDescription() const override {
    return QZDescription("Read how often the brightness of the display has changed.");
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    DiagnosticErrorPtr reason;
    const auto all = reports_->reportWithOnlySimpleChannels(&reason);
    const auto snapshot = all == nullptr ? nullptr : all->reportByFilteringChannels(isWanted)->snapshot(&reason);
    if (snapshot == nullptr) {
      fail(error, kEventCountErrorDomain, kNoReport, reason, "The report channels cannot be read.");
      return nullptr;
    }
    if (snapshot->samples().empty() || !snapshot->samples().front().channel().count()) {
      fail(error, kEventCountErrorDomain, kNoChannel, nullptr, "There is no count of %@.", kChannel);
      return nullptr;
    }
    const double total = toDouble(&*snapshot->samples().front().channel().count());
    logDebug("%@ counts %lf.", kChannel, total);
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kTotal, Measurement(total, QZDimensionlessUnit::events()));
    return result;
  }

 private:
  static bool isWanted(const ReportChannelDescription& channel) {
    return channel.groupName == kGroup && channel.name == kChannel;
  }

  const std::shared_ptr<ReportFacility> reports_;
};

// Turns the measurement into a result with a limit, which quazor judges.
class EventCountAnalysis final : public QZAnalysis, public QZAnalysisSetup, public QZParameterRanges {
 public:
  QZDescription analysisDescription() const override {
    QZDescription description("Ensure the brightness has not changed too often.");
    description.addParameter(QZNumberParameter("The largest number of changes that passes.", false), "maximum");
    return description;
  }

  // What `quazor describe` shows, and what `quazor run` refuses otherwise.
  OrderedMap<QZParameterRange> parameterRanges() const override {
    QZParameterRange maximum;
    maximum.setMinimum(0);
    maximum.setUnit("events");
    maximum.setDefault(kUsualMaximum);
    OrderedMap<QZParameterRange> ranges;
    ranges.set("maximum", maximum);
    return ranges;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost*, DiagnosticErrorPtr* error) override {
    const Value* const given = parameters.find("maximum");
    maximum_ = given == nullptr ? kUsualMaximum : toDouble(given);
    if (maximum_ >= 0) return true;
    fail(error, QZErrorDomain, kBadParameterValue, nullptr, "maximum must be at least 0, not %@", maximum_);
    return false;
  }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override {
    const Measurement* const total = result.measurements().find(kTotal);
    if (total == nullptr) {
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "The experiment did not measure %@.", kTotal);
      return nullptr;
    }
    QZLimit limit("TotalLimit");
    limit.setUpperBound(std::make_shared<QZBound>(Measurement(maximum_, QZDimensionlessUnit::events()), false));
    auto analysis = std::make_unique<QZAnalysisResult>();
    analysis->measuredResults().emplace_back(kTotal, *total);
    analysis->measuredResults().back().setLimit(std::move(limit));
    return analysis;
  }

 private:
  double maximum_ = kUsualMaximum;
};

// Registers the diagnostic when the plug-in is loaded.
[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("EventCountExperiment", [] { return std::make_shared<EventCountExperiment>(); });
  lab.addAnalysisWithName("EventCountAnalysis", [] { return std::make_shared<EventCountAnalysis>(); });
  lab.addDiagnosticWithName("EventCountDiagnostic", "Read a counter of the display and ensure it is not too high.",
                            "EventCountExperiment", "EventCountAnalysis");
}

}  // namespace
