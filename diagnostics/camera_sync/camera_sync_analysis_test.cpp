#include "diagnostics/camera_sync/camera_sync_analysis.h"

#include "contract/diagnostic_error.h"
#include "contract/message_format.h"
#include "contract/unit.h"
#include "platform/capture_keys.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

const std::vector<std::string> kBackPorts{std::string(port_type::BackFacingCamera),
                                          std::string(port_type::BackFacingTelephotoCamera),
                                          std::string(port_type::BackFacingSuperWideCamera)};
const std::vector<std::string> kBackKeys{"BackWide.FrameOffset", "BackWide.Frames",           "BackTele.FrameOffset",
                                         "BackTele.Frames",      "BackSuperWide.FrameOffset", "BackSuperWide.Frames"};

QZExperimentResult experimentResult(const std::vector<std::pair<std::string, double>>& measurements) {
  QZExperimentResult result;
  for (const auto& [key, value] : measurements) {
    result.measurements().set(key, Measurement(value, QZDimensionlessUnit::frames()));
  }
  return result;
}

QZExperimentResult backResult() {
  return experimentResult({{"BackWide.FrameOffset", 0},
                           {"BackWide.Frames", 100},
                           {"BackTele.FrameOffset", 1},
                           {"BackTele.Frames", 89},
                           {"BackSuperWide.FrameOffset", 2},
                           {"BackSuperWide.Frames", 98}});
}

std::string boundText(const std::shared_ptr<const QZBound>& bound) {
  if (bound == nullptr) return "none";
  return defaultText(bound->value().value()) + ' ' + bound->value().unit().symbol() +
         (bound->open() ? " open" : " closed");
}

// Formats a measured result as NAME = VALUE UNIT [LIMIT: LOWER to UPPER].
std::string told(const QZAnalysisResult& result) {
  std::string text;
  for (const QZMeasuredResult& measured : result.measuredResults()) {
    text += measured.name() + " = " + defaultText(measured.measurement().value()) + ' ' +
            measured.measurement().unit().symbol();
    if (const auto& limit = measured.limit()) {
      text +=
          " [" + limit->name() + ": " + boundText(limit->lowerBound()) + " to " + boundText(limit->upperBound()) + ']';
    }
    text += '\n';
  }
  return text;
}

// Formats measurements and auxiliary data in their order.
std::string told(const QZExperimentResult& result) {
  std::string text;
  for (const auto& [key, measurement] : result.measurements()) {
    text += key + " = " + defaultText(measurement.value()) + ' ' + measurement.unit().symbol() + '\n';
  }
  for (const auto& [key, value] : result.auxiliaryData()) text += key + ": " + defaultText(value) + '\n';
  return text;
}

TEST(CameraSyncAnalysis, KnowsItsCamerasInTheOrderOfThePorts) {
  EXPECT_EQ(QZCameraSyncAnalysis(kBackPorts).cameras(),
            (std::vector<std::string>{"BackWide", "BackTele", "BackSuperWide"}));
  EXPECT_EQ(QZCameraSyncAnalysis({"FrontFacingInfraredCamera", "FrontFacingCamera"}).cameras(),
            (std::vector<std::string>{"FrontInfrared", "Front"}));
}

TEST(CameraSyncAnalysis, LeavesOutPortsWithoutACameraName) {
  QZCameraSyncAnalysis analysis({"SideFacingCamera", "FrontFacingCamera", "", "FrontFacingInfraredCamera"});
  EXPECT_EQ(analysis.cameras(), (std::vector<std::string>{"Front", "FrontInfrared"}));

  const auto result = analysis.analyzeExperimentResult(experimentResult({{"Front.FrameOffset", 0},
                                                                         {"Front.Frames", 60},
                                                                         {"FrontInfrared.FrameOffset", 1},
                                                                         {"FrontInfrared.Frames", 59}}),
                                                       nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result),
            "Front.FrameOffset = 0 frames\n"
            "Front.Frames = 60 frames\n"
            "Front.Total = 60 frames\n"
            "FrontInfrared.FrameOffset = 1 frames\n"
            "FrontInfrared.Frames = 59 frames\n"
            "FrontInfrared.Total = 60 frames [FrameTotalLimit: 60 frames closed to 60 frames closed]\n");
}

TEST(CameraSyncAnalysis, DescribesItselfWithoutParameters) {
  const QZDescription description = QZCameraSyncAnalysis(kBackPorts).analysisDescription();
  EXPECT_EQ(
      description.summary(),
      "Analyze the measurements of a multicam sesison status.\n"
      "    Each port produces an offset and frame count. The offset represents how many frames after the previous "
      "camera was started.\n"
      "    The primary port will always have an offset of 0. The sum of the offset and frame count of all "
      "synchronized cameras should be equal.");
  EXPECT_TRUE(description.parameters().empty());
}

TEST(CameraSyncAnalysis, HasNoSetup) {
  QZCameraSyncAnalysis analysis(kBackPorts);
  EXPECT_EQ(dynamic_cast<QZAnalysisSetup*>(static_cast<QZAnalysis*>(&analysis)), nullptr);
}

TEST(CameraSyncAnalysis, GivesOffsetFramesAndTotalPerCameraAndLimitsEveryTotalButTheFirstByItself) {
  DiagnosticErrorPtr error = makeError("CallerErrorDomain", 1, "Here before.");
  const DiagnosticErrorPtr before = error;
  const auto result = QZCameraSyncAnalysis(kBackPorts).analyzeExperimentResult(backResult(), &error);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result),
            "BackWide.FrameOffset = 0 frames\n"
            "BackWide.Frames = 100 frames\n"
            "BackWide.Total = 100 frames\n"
            "BackTele.FrameOffset = 1 frames\n"
            "BackTele.Frames = 89 frames\n"
            "BackTele.Total = 90 frames [FrameTotalLimit: 90 frames closed to 90 frames closed]\n"
            "BackSuperWide.FrameOffset = 2 frames\n"
            "BackSuperWide.Frames = 98 frames\n"
            "BackSuperWide.Total = 100 frames [FrameTotalLimit: 100 frames closed to 100 frames closed]\n");
  EXPECT_EQ(error, before);
}

TEST(CameraSyncAnalysis, TheFirstCameraIsWithoutALimitWhateverItsTotal) {
  QZCameraSyncAnalysis analysis({"FrontFacingInfraredCamera", "FrontFacingCamera"});
  const auto result = analysis.analyzeExperimentResult(experimentResult({{"FrontInfrared.FrameOffset", 0},
                                                                         {"FrontInfrared.Frames", 0},
                                                                         {"Front.FrameOffset", 0},
                                                                         {"Front.Frames", 0}}),
                                                       nullptr);
  ASSERT_NE(result, nullptr);
  ASSERT_EQ(result->measuredResults().size(), 6U);
  EXPECT_FALSE(result->measuredResults()[2].limit().has_value());
  EXPECT_TRUE(result->measuredResults()[5].limit().has_value());
}

TEST(CameraSyncAnalysis, PassesMeasurementsOnInTheirOwnUnitAndCountsTotalsInFrames) {
  QZExperimentResult measured;
  measured.measurements().set("Front.FrameOffset", Measurement(0.25, QZDimensionlessUnit::errors()));
  measured.measurements().set("Front.Frames", Measurement(1.5, QZDimensionlessUnit::events()));
  const auto result = QZCameraSyncAnalysis({"FrontFacingCamera"}).analyzeExperimentResult(measured, nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result),
            "Front.FrameOffset = 0.25 errors\n"
            "Front.Frames = 1.5 events\n"
            "Front.Total = 1.75 frames\n");
}

TEST(CameraSyncAnalysis, SumsAsDoubles) {
  constexpr double kHuge = 1e308;
  const auto result =
      QZCameraSyncAnalysis({"FrontFacingCamera"})
          .analyzeExperimentResult(experimentResult({{"Front.FrameOffset", kHuge}, {"Front.Frames", kHuge}}), nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(result->measuredResults().at(2).measurement().value(), std::numeric_limits<double>::infinity());

  const auto negative =
      QZCameraSyncAnalysis({"FrontFacingCamera"})
          .analyzeExperimentResult(experimentResult({{"Front.FrameOffset", -3}, {"Front.Frames", 1}}), nullptr);
  ASSERT_NE(negative, nullptr);
  EXPECT_EQ(negative->measuredResults().at(2).measurement().value(), -2);
}

TEST(CameraSyncAnalysis, FailsAtEachMissingMeasurementByItsKey) {
  for (const std::string& missing : kBackKeys) {
    QZExperimentResult incomplete = backResult();
    ASSERT_TRUE(incomplete.measurements().erase(missing));
    DiagnosticErrorPtr error = makeError("CallerErrorDomain", 1, "Here before.");
    EXPECT_EQ(QZCameraSyncAnalysis(kBackPorts).analyzeExperimentResult(incomplete, &error), nullptr) << missing;
    ASSERT_NE(error, nullptr) << missing;
    EXPECT_EQ(defaultText(error), "QZErrorDomain code 6: Missing measurement for " + missing);
    EXPECT_EQ(error->underlyingError(), nullptr) << missing;
    EXPECT_EQ(QZCameraSyncAnalysis(kBackPorts).analyzeExperimentResult(incomplete, nullptr), nullptr) << missing;
  }
}

TEST(CameraSyncAnalysis, NamesTheFirstOfSeveralMissingMeasurements) {
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZCameraSyncAnalysis(kBackPorts).analyzeExperimentResult(QZExperimentResult(), &error), nullptr);
  EXPECT_EQ(defaultText(error), "QZErrorDomain code 6: Missing measurement for BackWide.FrameOffset");

  const QZExperimentResult onlyTheFirst =
      experimentResult({{"BackWide.Frames", 60}, {"BackWide.FrameOffset", 0}, {"BackTele.FrameOffset", 0}});
  EXPECT_EQ(QZCameraSyncAnalysis(kBackPorts).analyzeExperimentResult(onlyTheFirst, &error), nullptr);
  EXPECT_EQ(defaultText(error), "QZErrorDomain code 6: Missing measurement for BackTele.Frames");
}

TEST(CameraSyncAnalysis, IsEmptyWithoutCameras) {
  for (const std::vector<std::string>& ports : {std::vector<std::string>{}, {"SideFacingCamera"}}) {
    DiagnosticErrorPtr error;
    const auto result = QZCameraSyncAnalysis(ports).analyzeExperimentResult(QZExperimentResult(), &error);
    ASSERT_NE(result, nullptr);
    EXPECT_TRUE(result->measuredResults().empty());
    EXPECT_EQ(error, nullptr);
  }
}

TEST(CameraSyncAnalysis, NeverChangesTheExperimentResult) {
  QZExperimentResult complete = backResult();
  complete.measurements().set("Unrelated", Measurement(7, QZDimensionlessUnit::events()));
  complete.auxiliaryData().set("ErrorCounters", Dictionary{{"BackWide", Dictionary{{"I2CErrorCount", 3}}}});
  QZExperimentResult incomplete = complete;
  ASSERT_TRUE(incomplete.measurements().erase("BackSuperWide.Frames"));

  for (const QZExperimentResult& measured : {complete, incomplete, QZExperimentResult()}) {
    const std::string before = told(measured);
    (void)QZCameraSyncAnalysis(kBackPorts).analyzeExperimentResult(measured, nullptr);
    EXPECT_EQ(told(measured), before);
  }
}

TEST(CameraSyncAnalysis, GivesTheSameAnswerWhenItIsAskedAgain) {
  QZCameraSyncAnalysis analysis(kBackPorts);
  const auto first = analysis.analyzeExperimentResult(backResult(), nullptr);
  const auto second = analysis.analyzeExperimentResult(backResult(), nullptr);
  ASSERT_NE(first, nullptr);
  ASSERT_NE(second, nullptr);
  EXPECT_EQ(told(*first), told(*second));
}

}  // namespace
}  // namespace quazor
