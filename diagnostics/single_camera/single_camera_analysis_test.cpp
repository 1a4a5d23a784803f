#include "diagnostics/single_camera/single_camera_analysis.h"

#include "diagnostics/single_camera/single_camera_names.h"

#include <gtest/gtest.h>

#include <cmath>
#include <iterator>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

using namespace single_camera;

constexpr std::string_view kJudged[] = {kFrames, kFrameRate,      kMissingFrames, kUntimedFrames, kBackwardTimeStamps,
                                        kJitter, kSilenceAtStart, kSilenceAtEnd};

QZExperimentResult healthyResult() {
  QZExperimentResult result;
  for (const std::string_view name : kJudged) result.measurements().set(name, Measurement(0, milliseconds()));
  result.measurements().set(kRequestedFrameRate, Measurement(40, framesPerSecond()));
  result.measurements().set("Errors.LateFrames", Measurement(0, QZDimensionlessUnit::errors()));
  return result;
}

std::string boundText(const std::shared_ptr<const QZBound>& bound) {
  return bound == nullptr ? "-" : std::to_string(bound->value().value());
}

// "LOWER UPPER" of a result's limit; empty if it has none.
std::string limitOf(std::string_view name, const Dictionary& parameters = {}) {
  QZSingleCameraAnalysis analysis;
  EXPECT_TRUE(analysis.setupWithParameters(parameters, nullptr, nullptr));
  const auto analyzed = analysis.analyzeExperimentResult(healthyResult(), nullptr);
  if (analyzed == nullptr) return "no result";
  for (const QZMeasuredResult& result : analyzed->measuredResults()) {
    if (result.name() != name) continue;
    if (!result.limit()) return "";
    return boundText(result.limit()->lowerBound()) + ' ' + boundText(result.limit()->upperBound());
  }
  return "not there";
}

TEST(SingleCameraAnalysisTest, HasLimitsByDefault) {
  EXPECT_EQ(limitOf(kFrames), "");
  EXPECT_EQ(limitOf(kRequestedFrameRate), "not there");
  EXPECT_EQ(limitOf(kFrameRate), "38.000000 42.000000");
  EXPECT_EQ(limitOf(kMissingFrames), "- 0.000000");
  EXPECT_EQ(limitOf(kUntimedFrames), "- 0.000000");
  EXPECT_EQ(limitOf(kBackwardTimeStamps), "- 0.000000");
  EXPECT_EQ(limitOf(kJitter), "- 5.000000");
  EXPECT_EQ(limitOf(kSilenceAtStart), "- 2000.000000");
  EXPECT_EQ(limitOf(kSilenceAtEnd), "- 500.000000");
  EXPECT_EQ(limitOf("Errors.LateFrames"), "0.000000 0.000000");
}

TEST(SingleCameraAnalysisTest, TakesLimitsFromParameters) {
  EXPECT_EQ(limitOf(kFrameRate, {{"frameRateTolerance", 50}}), "20.000000 60.000000");
  EXPECT_EQ(limitOf(kMissingFrames, {{"maximumMissingFrames", 3}}), "- 3.000000");
  EXPECT_EQ(limitOf(kJitter, {{"maximumJitter", 0.25}}), "- 0.250000");
  EXPECT_EQ(limitOf("Errors.LateFrames", {{"maximumErrors", 2}}), "0.000000 2.000000");
  EXPECT_EQ(limitOf(kSilenceAtStart, {{"maximumSilenceAtStart", 100}}), "- 100.000000");
  EXPECT_EQ(limitOf(kSilenceAtEnd, {{"maximumSilenceAtEnd", 100}}), "- 100.000000");
}

TEST(SingleCameraAnalysisTest, RefusesParametersBelowZero) {
  for (const std::string_view name : {"frameRateTolerance", "maximumMissingFrames", "maximumJitter", "maximumErrors",
                                      "maximumSilenceAtStart", "maximumSilenceAtEnd"}) {
    for (const double value : {-1.0, std::nan("")}) {
      DiagnosticErrorPtr error;
      Dictionary parameters;
      parameters.set(name, value);
      EXPECT_FALSE(QZSingleCameraAnalysis().setupWithParameters(parameters, nullptr, &error)) << name;
      ASSERT_NE(error, nullptr);
      EXPECT_EQ(error->code(), 5);
      EXPECT_TRUE(error->localizedDescription().starts_with(std::string(name) + " must be at least 0, not "));
    }
  }
}

TEST(SingleCameraAnalysisTest, NamesTheMeasurementThatIsMissing) {
  std::vector<std::string_view> names(std::begin(kJudged), std::end(kJudged));
  names.push_back(kRequestedFrameRate);
  const QZExperimentResult healthy = healthyResult();
  for (const std::string_view missing : names) {
    QZExperimentResult result;
    for (const auto& [name, measurement] : healthy.measurements()) {
      if (name != missing) result.measurements().set(name, measurement);
    }
    DiagnosticErrorPtr error;
    EXPECT_EQ(QZSingleCameraAnalysis().analyzeExperimentResult(result, &error), nullptr);
    ASSERT_NE(error, nullptr);
    EXPECT_EQ(error->domain(), QZErrorDomain);
    EXPECT_EQ(error->code(), 6);
    EXPECT_EQ(error->localizedDescription(), "Missing measurement for " + std::string(missing));
  }
}

}  // namespace
}  // namespace quazor
