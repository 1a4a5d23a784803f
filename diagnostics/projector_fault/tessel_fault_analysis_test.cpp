#include "diagnostics/projector_fault/tessel_fault_analysis.h"

#include "diagnostics/report_channels/expectations_for_tests.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <initializer_list>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// The result of a run with 100 frames and no fault.
QZExperimentResult resultOfSoundRun() {
  QZExperimentResult result = resultOfQuietModule();
  result.measurements().set("FrameCount", Measurement(100, QZDimensionlessUnit::frames()));
  for (const char* counter : {"I2C", "MIPI", "LPDP", "UART", "SIF", "Projector"}) {
    result.measurements().set(counter, Measurement(0, QZDimensionlessUnit::errors()));
  }
  return result;
}

// The measured results as text: the module's channels without events, then `frames`, then the counters without errors.
std::string soundResults(const std::string& frames) {
  std::string text;
  for (const std::string_view name : moduleChannels()) {
    text += std::string(name) + " = 0 events [Limit: 0 events closed to 0 events closed]\n";
  }
  return text + frames +
         "\nI2C Errors = 0 errors [Limit: 0 errors closed to 0 errors closed]\n"
         "MIPI Errors = 0 errors [Limit: 0 errors closed to 0 errors closed]\n"
         "SIF Errors = 0 errors [Limit: 0 errors closed to 0 errors closed]\n";
}

// An analysis that requires `minimum` frames.
std::unique_ptr<QZTesselFaultAnalysis> analysisOf(std::optional<Value> minimum) {
  auto analysis = std::make_unique<QZTesselFaultAnalysis>();
  analysis->setFrameCount(std::move(minimum));
  return analysis;
}

const QZMeasuredResult* find(const QZAnalysisResult& result, std::string_view name) {
  for (const QZMeasuredResult& measured : result.measuredResults()) {
    if (measured.name() == name) return &measured;
  }
  return nullptr;
}

TEST(TesselFaultAnalysis, DescribesItselfWithOneParameter) {
  const QZDescription description = QZTesselFaultAnalysis().analysisDescription();
  EXPECT_EQ(description.summary(), "Analyse the results of a Tessel Stream with Telemon capture.");
  ASSERT_EQ(description.parameters().size(), 1U);
  const auto& [name, parameter] = *description.parameters().begin();
  EXPECT_EQ(name, "frameCount");
  EXPECT_EQ(parameter.summary(), "The minimum number of frames required in this analysis.");
  EXPECT_TRUE(parameter.required());
}

TEST(TesselFaultAnalysis, HasASetupForTheHostToFind) {
  const std::unique_ptr<QZAnalysis> analysis = std::make_unique<QZTesselFaultAnalysis>();
  EXPECT_NE(dynamic_cast<QZAnalysisSetup*>(analysis.get()), nullptr);
}

TEST(TesselFaultAnalysis, HasNoFrameCountUntilOneIsSet) {
  QZTesselFaultAnalysis analysis;
  EXPECT_EQ(analysis.frameCount(), std::nullopt);
  analysis.setFrameCount(Value(90U));
  EXPECT_EQ(analysis.frameCount(), Value(90U));
  analysis.setFrameCount(std::nullopt);
  EXPECT_EQ(analysis.frameCount(), std::nullopt);
}

TEST(TesselFaultAnalysis, TakesItsFrameCountFromTheParametersAsItStands) {
  const Array values{0, 100, -1, std::numeric_limits<std::uint64_t>::max(), 99.5, 2.5F, true, "many", Date(), Array{1}};
  for (const Value& value : values) {
    SCOPED_TRACE(defaultText(value));
    QZTesselFaultAnalysis analysis;
    QZDiagnosticHost host;
    const DiagnosticErrorPtr earlier = earlierError();
    DiagnosticErrorPtr error = earlier;
    EXPECT_TRUE(analysis.setupWithParameters({{"framecount", 1}, {"frameCount", value}}, &host, &error));
    EXPECT_EQ(analysis.frameCount(), value);
    EXPECT_EQ(error, earlier);
    EXPECT_TRUE(QZTesselFaultAnalysis().setupWithParameters({{"frameCount", value}}, nullptr, nullptr));
  }
}

TEST(TesselFaultAnalysis, TakesAnAbsentFrameCountAsAbsent) {
  const auto analysis = analysisOf(Value(100));
  const DiagnosticErrorPtr earlier = earlierError();
  DiagnosticErrorPtr error = earlier;
  EXPECT_TRUE(analysis->setupWithParameters({{"timeout", 5}}, nullptr, &error));
  EXPECT_EQ(analysis->frameCount(), std::nullopt);
  EXPECT_EQ(error, earlier);
}

TEST(TesselFaultAnalysis, LimitsChannelsThenFramesThenErrors) {
  QZTesselFaultAnalysis analysis;
  ASSERT_TRUE(analysis.setupWithParameters({{"frameCount", 90}}, nullptr, nullptr));
  const DiagnosticErrorPtr earlier = earlierError();
  DiagnosticErrorPtr error = earlier;
  const auto result = analysis.analyzeExperimentResult(resultOfSoundRun(), &error);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(result->measuredResults().size(), 64U);
  EXPECT_EQ(told(*result), soundResults("Actual Frames = 100 frames [Min Frame Count: 90 frames closed to none]"));
  for (const QZMeasuredResult& measured : result->measuredResults()) EXPECT_TRUE(isInside(measured)) << told(measured);
  EXPECT_EQ(error, earlier);
}

TEST(TesselFaultAnalysis, KeepsItsOrderWhateverTheOrderOfTheMeasurements) {
  const QZExperimentResult sound = resultOfSoundRun();
  std::vector<std::pair<std::string, Measurement>> entries(sound.measurements().begin(), sound.measurements().end());
  QZExperimentResult backwards;
  for (auto entry = entries.rbegin(); entry != entries.rend(); ++entry) {
    backwards.measurements().set(entry->first, entry->second);
  }
  const auto result = analysisOf(Value(90))->analyzeExperimentResult(backwards, nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), soundResults("Actual Frames = 100 frames [Min Frame Count: 90 frames closed to none]"));
}

TEST(TesselFaultAnalysis, UsesOneBoundForBothEndsOfAZeroLimit) {
  const auto result = analysisOf(Value(90))->analyzeExperimentResult(resultOfSoundRun(), nullptr);
  ASSERT_NE(result, nullptr);
  int zeroLimits = 0;
  for (const QZMeasuredResult& measured : result->measuredResults()) {
    ASSERT_TRUE(measured.limit().has_value()) << measured.name();
    if (measured.limit()->name() != "Limit") continue;
    ++zeroLimits;
    ASSERT_NE(measured.limit()->lowerBound(), nullptr) << measured.name();
    EXPECT_EQ(measured.limit()->lowerBound(), measured.limit()->upperBound()) << measured.name();
  }
  EXPECT_EQ(zeroLimits, 63);
}

TEST(TesselFaultAnalysis, RequiresAtLeastTheMinimumOfFrames) {
  const struct {
    const char* name;
    std::optional<Value> minimum;
    double frames;
    const char* want;
    bool inside;
  } rows[] = {
      {"just enough", Value(100), 100, "100 frames [Min Frame Count: 100 frames closed to none]", true},
      {"one short", Value(100), 99, "99 frames [Min Frame Count: 100 frames closed to none]", false},
      {"more than enough", Value(100), 101, "101 frames [Min Frame Count: 100 frames closed to none]", true},
      {"no minimum", std::nullopt, 0, "0 frames [Min Frame Count: 0 frames closed to none]", true},
      {"a minimum of zero", Value(0), 0, "0 frames [Min Frame Count: 0 frames closed to none]", true},
      {"an unsigned minimum", Value(100U), 99, "99 frames [Min Frame Count: 100 frames closed to none]", false},
      {"a minimum with a fraction", Value(99.5), 99, "99 frames [Min Frame Count: 99.5 frames closed to none]", false},
      {"a minimum as a float", Value(2.5F), 3, "3 frames [Min Frame Count: 2.5 frames closed to none]", true},
      {"a boolean minimum", Value(true), 0, "0 frames [Min Frame Count: 1 frames closed to none]", false},
      {"a negative minimum", Value(-5), 0, "0 frames [Min Frame Count: -5 frames closed to none]", true},
      {"a minimum that is no number", Value("100"), 0, "0 frames [Min Frame Count: 0 frames closed to none]", true},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    QZExperimentResult run = resultOfSoundRun();
    run.measurements().set("FrameCount", Measurement(row.frames, QZDimensionlessUnit::frames()));
    const auto result = analysisOf(row.minimum)->analyzeExperimentResult(run, nullptr);
    ASSERT_NE(result, nullptr);
    const QZMeasuredResult* frames = find(*result, "Actual Frames");
    ASSERT_NE(frames, nullptr);
    EXPECT_EQ(told(*frames), std::string("Actual Frames = ") + row.want);
    EXPECT_EQ(isInside(*frames), row.inside);
  }
}

TEST(TesselFaultAnalysis, TellsFaultsAndErrorsAndLeavesTheVerdictToTheHost) {
  const struct {
    const char* key;
    const char* name;
    const char* unit;
    const QZUnit& stored;
  } rows[] = {
      {"Number Vok INT_ADC_READY_LATCH", "Number Vok INT_ADC_READY_LATCH", "events", QZDimensionlessUnit::events()},
      {"Number Fenk NTC", "Number Fenk NTC", "events", QZDimensionlessUnit::events()},
      {"I2C", "I2C Errors", "errors", QZDimensionlessUnit::errors()},
      {"MIPI", "MIPI Errors", "errors", QZDimensionlessUnit::errors()},
      {"SIF", "SIF Errors", "errors", QZDimensionlessUnit::errors()},
  };
  for (const auto& row : rows) {
    for (const double count : {1.0, -1.0}) {
      SCOPED_TRACE(std::string(row.key) + " of " + defaultText(count));
      QZExperimentResult run = resultOfSoundRun();
      run.measurements().set(row.key, Measurement(count, row.stored));
      DiagnosticErrorPtr error;
      const auto result = analysisOf(Value(100))->analyzeExperimentResult(run, &error);
      ASSERT_NE(result, nullptr);
      EXPECT_EQ(result->measuredResults().size(), 64U);
      EXPECT_EQ(error, nullptr);
      for (const QZMeasuredResult& measured : result->measuredResults()) {
        EXPECT_EQ(isInside(measured), measured.name() != row.name) << told(measured);
      }
      const QZMeasuredResult* measured = find(*result, row.name);
      ASSERT_NE(measured, nullptr);
      const std::string unit = row.unit;
      EXPECT_EQ(told(*measured), std::string(row.name) + " = " + defaultText(count) + ' ' + unit + " [Limit: 0 " +
                                     unit + " closed to 0 " + unit + " closed]");
    }
  }
}

TEST(TesselFaultAnalysis, PassesMeasurementsOnAsTheyAreAndLimitsThemInItsOwnUnits) {
  QZExperimentResult run = resultOfSoundRun();
  run.measurements().set("Number ZE FAULT_A", Measurement(0.5, QZDimensionlessUnit::frames()));
  run.measurements().set("SIF", Measurement(2, QZDimensionlessUnit::events()));
  run.measurements().set("FrameCount", Measurement(120, QZDimensionlessUnit::errors()));
  const auto result = analysisOf(Value(100))->analyzeExperimentResult(run, nullptr);
  ASSERT_NE(result, nullptr);
  const struct {
    const char* name;
    const char* want;
  } rows[] = {
      {"Number ZE FAULT_A", "Number ZE FAULT_A = 0.5 frames [Limit: 0 events closed to 0 events closed]"},
      {"SIF Errors", "SIF Errors = 2 events [Limit: 0 errors closed to 0 errors closed]"},
      {"Actual Frames", "Actual Frames = 120 errors [Min Frame Count: 100 frames closed to none]"},
  };
  for (const auto& row : rows) {
    const QZMeasuredResult* measured = find(*result, row.name);
    ASSERT_NE(measured, nullptr) << row.name;
    EXPECT_EQ(told(*measured), row.want);
  }
}

TEST(TesselFaultAnalysis, DoesNotJudgeTheOtherErrorCounters) {
  for (const bool present : {true, false}) {
    QZExperimentResult run = resultOfSoundRun();
    for (const char* counter : {"LPDP", "UART", "Projector"}) {
      ASSERT_TRUE(run.measurements().erase(counter));
      if (present) run.measurements().set(counter, Measurement(9, QZDimensionlessUnit::errors()));
    }
    const auto result = analysisOf(Value(90))->analyzeExperimentResult(run, nullptr);
    ASSERT_NE(result, nullptr);
    EXPECT_EQ(told(*result), soundResults("Actual Frames = 100 frames [Min Frame Count: 90 frames closed to none]"));
  }
}

TEST(TesselFaultAnalysis, FailsWhenAnyOneOfTheChannelsIsMissing) {
  for (const std::string_view name : moduleChannels()) {
    QZExperimentResult run = resultOfSoundRun();
    ASSERT_TRUE(run.measurements().erase(name));
    DiagnosticErrorPtr error = earlierError();
    EXPECT_EQ(analysisOf(Value(1))->analyzeExperimentResult(run, &error), nullptr) << name;
    EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for " + std::string(name));
  }
}

TEST(TesselFaultAnalysis, NamesTheFirstMissingMeasurement) {
  const struct {
    const char* name;
    std::initializer_list<const char*> missing;
    const char* want;
  } rows[] = {
      {"the frame count", {"FrameCount"}, "QZErrorDomain 6 Missing FrameCount measurement!"},
      {"I2C", {"I2C"}, "QZErrorDomain 6 Missing measurement named I2C!"},
      {"MIPI", {"MIPI"}, "QZErrorDomain 6 Missing measurement named MIPI!"},
      {"SIF", {"SIF"}, "QZErrorDomain 6 Missing measurement named SIF!"},
      {"all counters",
       {"I2C", "MIPI", "LPDP", "UART", "SIF", "Projector"},
       "QZErrorDomain 6 Missing measurement named I2C!"},
      {"MIPI before SIF", {"SIF", "MIPI"}, "QZErrorDomain 6 Missing measurement named MIPI!"},
      {"frames before counters", {"I2C", "FrameCount"}, "QZErrorDomain 6 Missing FrameCount measurement!"},
      {"channels before frames",
       {"FrameCount", "SIF", "Number Fenk NTC"},
       "QZErrorDomain 6 Missing measurement for Number Fenk NTC"},
      {"channels in their order",
       {"Number ZE FAULT_OV", "Number ZE FAULT_UV"},
       "QZErrorDomain 6 Missing measurement for Number ZE FAULT_UV"},
  };
  for (const auto& row : rows) {
    SCOPED_TRACE(row.name);
    QZExperimentResult run = resultOfSoundRun();
    for (const char* key : row.missing) ASSERT_TRUE(run.measurements().erase(key)) << key;
    DiagnosticErrorPtr error = earlierError();
    EXPECT_EQ(analysisOf(Value(1))->analyzeExperimentResult(run, &error), nullptr);
    EXPECT_EQ(told(error), row.want);
    EXPECT_EQ(analysisOf(Value(1))->analyzeExperimentResult(run, nullptr), nullptr);
  }
}

TEST(TesselFaultAnalysis, FailsAtTheFirstChannelOfAnEmptyResult) {
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZTesselFaultAnalysis().analyzeExperimentResult(QZExperimentResult(), &error), nullptr);
  EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for Number Vok INT_ADC_READY_LATCH");
  EXPECT_EQ(QZTesselFaultAnalysis().analyzeExperimentResult(QZExperimentResult(), nullptr), nullptr);
}

TEST(TesselFaultAnalysis, LooksForMeasurementsByTheirKeysAndNotByTheNamesOfItsResults) {
  QZExperimentResult run = resultOfSoundRun();
  ASSERT_TRUE(run.measurements().erase("MIPI"));
  run.measurements().set("MIPI Errors", Measurement(0, QZDimensionlessUnit::errors()));
  run.auxiliaryData().set("MIPI", 0);
  DiagnosticErrorPtr error;
  EXPECT_EQ(analysisOf(Value(1))->analyzeExperimentResult(run, &error), nullptr);
  EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement named MIPI!");
}

TEST(TesselFaultAnalysis, LeavesTheExperimentsResultAsItIsAndStartsAfreshEachTime) {
  QZExperimentResult run = resultOfSoundRun();
  run.auxiliaryData().set("note", "kept");
  const std::string before = told(run);
  const auto analysis = analysisOf(Value(90));
  const auto first = analysis->analyzeExperimentResult(run, nullptr);
  const auto second = analysis->analyzeExperimentResult(run, nullptr);
  ASSERT_NE(first, nullptr);
  ASSERT_NE(second, nullptr);
  EXPECT_EQ(told(run), before);
  EXPECT_EQ(told(*first), told(*second));
  ASSERT_TRUE(run.measurements().erase("SIF"));
  const std::string beforeFailure = told(run);
  EXPECT_EQ(analysis->analyzeExperimentResult(run, nullptr), nullptr);
  EXPECT_EQ(told(run), beforeFailure);
  EXPECT_EQ(analysis->frameCount(), Value(90));
}

}  // namespace
}  // namespace quazor
