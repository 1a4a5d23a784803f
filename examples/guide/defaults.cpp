// Defaults: how bright the display is, with a limit that a user may change.
#include "contract/diagnostic_contract.h"
#include "contract/lab.h"
#include "contract/parameter_range.h"
#include "platform/platform.h"

#include <memory>
#include <optional>
#include <string_view>
#include <utility>

namespace {

using namespace quazor;

constexpr std::string_view kProperty = "DSPLY Brightness";
constexpr std::string_view kEntry = "value";
constexpr std::string_view kBrightness = "Brightness";
constexpr double kDefaultMinimum = 10;  // percent

constexpr int kBadParameterValue = 5;   // of QZErrorDomain
constexpr int kMissingMeasurement = 6;  // the same
constexpr std::string_view kBrightnessErrorDomain = "BrightnessErrorDomain";
constexpr int kNotReadable = 1;

const QZUnit& percent() { return QZUnit::unitWithSymbol("%"); }

class BrightnessExperiment final : public QZExperiment {
 public:
  explicit BrightnessExperiment(const Platform& platform = installedPlatform()) : framebuffer_(platform.framebuffer) {}

  QZDescription experimentDescription() const override {
    return QZDescription("Read the brightness of the main display.");
  }

  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override {
    const auto display = framebuffer_->mainDisplay();
    const auto service = display == nullptr ? nullptr : display->registryService();
    const std::optional<Value> property = service == nullptr ? std::nullopt : service->registryProperty(kProperty);
    const Value* const brightness = entryOf(pointerTo(property), kEntry);
    if (brightness == nullptr) {
      fail(error, kBrightnessErrorDomain, kNotReadable, nullptr, "The brightness of the display cannot be read.");
      return nullptr;
    }
    auto result = std::make_unique<QZExperimentResult>();
    result->measurements().set(kBrightness, Measurement(toDouble(brightness) * 100, percent()));
    return result;
  }

 private:
  const std::shared_ptr<FramebufferService> framebuffer_;
};

class BrightnessAnalysis final : public QZAnalysis, public QZAnalysisSetup, public QZParameterRanges {
 public:
  QZDescription analysisDescription() const override {
    QZDescription description("Ensure that the display is bright enough to be seen.");
    description.addParameter(QZNumberParameter("The lowest brightness that passes.", false), "minimum");
    return description;
  }

  OrderedMap<QZParameterRange> parameterRanges() const override {
    QZParameterRange minimum;
    minimum.setMinimum(0);
    minimum.setMaximum(100);
    minimum.setUnit("%");
    minimum.setDefault(kDefaultMinimum);
    OrderedMap<QZParameterRange> ranges;
    ranges.set("minimum", minimum);
    return ranges;
  }

  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost*, DiagnosticErrorPtr* error) override {
    // Not toDouble() alone, which cannot tell a missing parameter from 0.
    const Value* const given = parameters.find("minimum");
    minimum_ = given == nullptr ? kDefaultMinimum : toDouble(given);
    if (minimum_ >= 0 && minimum_ <= 100) return true;
    fail(error, QZErrorDomain, kBadParameterValue, nullptr, "minimum must be from 0 to 100 %%, not %@", minimum_);
    return false;
  }

  std::unique_ptr<QZAnalysisResult> analyzeExperimentResult(const QZExperimentResult& result,
                                                            DiagnosticErrorPtr* error) override {
    const Measurement* const brightness = result.measurements().find(kBrightness);
    if (brightness == nullptr) {
      fail(error, QZErrorDomain, kMissingMeasurement, nullptr, "The experiment did not measure %@.", kBrightness);
      return nullptr;
    }
    QZLimit limit("BrightnessLimit");
    limit.setLowerBound(std::make_shared<QZBound>(Measurement(minimum_, percent()), false));
    auto analysis = std::make_unique<QZAnalysisResult>();
    analysis->measuredResults().emplace_back(kBrightness, *brightness);
    analysis->measuredResults().back().setLimit(std::move(limit));
    return analysis;
  }

 private:
  double minimum_ = kDefaultMinimum;
};

[[gnu::constructor]] void registerCatalogue() {
  QZLab& lab = QZLab::defaultLab();
  lab.addExperimentWithName("BrightnessExperiment", [] { return std::make_shared<BrightnessExperiment>(); });
  lab.addAnalysisWithName("BrightnessAnalysis", [] { return std::make_shared<BrightnessAnalysis>(); });
  lab.addDiagnosticWithName("BrightnessDiagnostic", "Ensure that the display is bright enough.", "BrightnessExperiment",
                            "BrightnessAnalysis");
}

}  // namespace
