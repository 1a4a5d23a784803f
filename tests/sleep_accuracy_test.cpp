// The example plug-in, with a clock whose lateness the tests set.
#include "contract/lab.h"
#include "contract/message_format.h"
#include "platform/platform.h"

#include <dlfcn.h>
#include <gtest/gtest.h>

#include <chrono>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using Kind = QZLab::Kind;

// Every sleep takes `lateness` longer than requested.
class ClockWithLateness final : public Clock {
 public:
  explicit ClockWithLateness(std::chrono::nanoseconds lateness) : lateness_(lateness) {}

  std::chrono::nanoseconds now() const override { return now_; }
  Date date() const override { return Date(now_); }
  void sleep(std::chrono::nanoseconds duration) override { now_ += duration + lateness_; }

 private:
  const std::chrono::nanoseconds lateness_;
  std::chrono::nanoseconds now_ = 1h;
};

class SleepAccuracy : public ::testing::Test {
 protected:
  // Loads the plug-in, which registers once with this process's lab and stays loaded.
  static void SetUpTestSuite() {
    ASSERT_NE(dlopen(SLEEP_ACCURACY_PLUGIN, RTLD_NOW | RTLD_LOCAL), nullptr) << dlerror();
    ASSERT_TRUE(QZLab::defaultLab().refusedNames().empty());
  }

  static std::shared_ptr<QZExperiment> makeExperiment(std::chrono::nanoseconds lateness) {
    const Platform before = installedPlatform();
    Platform platform;
    platform.clock = std::make_shared<ClockWithLateness>(lateness);
    installPlatform(std::move(platform));
    std::shared_ptr<QZExperiment> experiment =
        QZLab::defaultLab().find(Kind::kExperiment, "SleepAccuracyExperiment")->makeExperiment();
    installPlatform(before);
    return experiment;
  }

  // The error of a setup with this value as text, or nothing if it succeeds.
  static std::optional<std::string> refusalOf(const Dictionary& parameters) {
    DiagnosticErrorPtr error;
    if (makeExperiment(0s)->setupWithParameters(parameters, nullptr, &error)) return std::nullopt;
    return defaultText(error);
  }

  // The result of sleeping for a second.
  static std::unique_ptr<QZExperimentResult> sleepWithLateness(std::chrono::nanoseconds lateness,
                                                               DiagnosticErrorPtr* error) {
    const std::shared_ptr<QZExperiment> experiment = makeExperiment(lateness);
    Dictionary parameters;
    parameters.set("duration", 1.0);
    EXPECT_TRUE(experiment->setupWithParameters(parameters, nullptr, nullptr));
    return experiment->run(error);
  }

  static std::unique_ptr<QZAnalysisResult> analyze(const QZExperimentResult& result, DiagnosticErrorPtr* error) {
    return QZLab::defaultLab()
        .find(Kind::kAnalysis, "SleepAccuracyAnalysis")
        ->makeAnalysis()
        ->analyzeExperimentResult(result, error);
  }
};

Dictionary durationOf(const Value& value) {
  Dictionary parameters;
  parameters.set("duration", value);
  return parameters;
}

TEST_F(SleepAccuracy, IsOneDiagnosticOfAnExperimentAndAnAnalysis) {
  const QZLab::Registration* diagnostic = QZLab::defaultLab().find(Kind::kDiagnostic, "SleepAccuracyDiagnostic");
  ASSERT_NE(diagnostic, nullptr);
  EXPECT_EQ(diagnostic->experimentName, "SleepAccuracyExperiment");
  EXPECT_EQ(diagnostic->analysisName, "SleepAccuracyAnalysis");
  const QZDescription description = makeExperiment(0s)->experimentDescription();
  ASSERT_NE(description.parameters().find("duration"), nullptr);
  EXPECT_TRUE(description.parameters().find("duration")->required());
}

TEST_F(SleepAccuracy, TakesADurationOfAMillisecondAndMore) {
  const std::string refusal = "QZErrorDomain code 5: duration must be at least 0.001 s, not ";
  EXPECT_EQ(refusalOf(durationOf(0.001)), std::nullopt);
  EXPECT_EQ(refusalOf(durationOf(3)), std::nullopt);
  EXPECT_EQ(refusalOf(durationOf(0.0009)), refusal + "9e-04");
  EXPECT_EQ(refusalOf(durationOf(-1)), refusal + "-1");
  EXPECT_EQ(refusalOf(durationOf(std::numeric_limits<double>::quiet_NaN())), refusal + "nan");
  EXPECT_EQ(refusalOf({}), refusal + "0");
}

TEST_F(SleepAccuracy, MeasuresTheLatenessInMillisecondsAndLimitsIt) {
  for (const auto& [lateness, milliseconds] : {std::pair(-250ms, -250.0), {0ms, 0.0}, {7ms, 7.0}}) {
    const auto result = sleepWithLateness(lateness, nullptr);
    ASSERT_NE(result, nullptr);
    const Measurement expected(milliseconds, QZUnit::unitWithSymbol("ms"));
    ASSERT_NE(result->measurements().find("Lateness"), nullptr);
    EXPECT_EQ(*result->measurements().find("Lateness"), expected);
    const auto analysis = analyze(*result, nullptr);
    ASSERT_NE(analysis, nullptr);
    ASSERT_EQ(analysis->measuredResults().size(), 1U);
    const QZMeasuredResult& measured = analysis->measuredResults().front();
    EXPECT_EQ(measured.name(), "Lateness");
    EXPECT_EQ(measured.measurement(), expected);
    ASSERT_TRUE(measured.limit());
    EXPECT_EQ(measured.limit()->lowerBound()->value(), Measurement(0, expected.unit()));
    EXPECT_EQ(measured.limit()->upperBound()->value(), Measurement(100, expected.unit()));
    EXPECT_FALSE(measured.limit()->lowerBound()->open());
    EXPECT_FALSE(measured.limit()->upperBound()->open());
  }
}

TEST_F(SleepAccuracy, FailsOnAClockThatStandsStillOrGoesBack) {
  for (const auto lateness : {-1s, -2s}) {
    DiagnosticErrorPtr error;
    EXPECT_EQ(sleepWithLateness(lateness, &error), nullptr);
    EXPECT_EQ(defaultText(error), "SleepAccuracyErrorDomain code 1: The clock stood still during the sleep.");
    EXPECT_EQ(sleepWithLateness(lateness, nullptr), nullptr);
  }
}

TEST_F(SleepAccuracy, AnalysesNoResultWithoutTheMeasurement) {
  DiagnosticErrorPtr error;
  EXPECT_EQ(analyze(QZExperimentResult(), &error), nullptr);
  EXPECT_EQ(defaultText(error), "QZErrorDomain code 6: The experiment did not measure Lateness.");
}

}  // namespace
}  // namespace quazor
