#include "diagnostics/report_channels/tessel_telemon_analysis.h"

#include "diagnostics/report_channels/expectations_for_tests.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <string_view>

namespace quazor {
namespace {

// The results of a module whose channels are all 0, as text.
std::string quietResults() {
  std::string text;
  for (const std::string_view name : moduleChannels()) {
    text += std::string(name) + " = 0 events [Max Reports: 0 events closed to 0 events closed]\n";
  }
  return text;
}

TEST(TesselTelemonAnalysis, DescribesItselfWithoutParameters) {
  const QZDescription description = QZTesselTelemonAnalysis().analysisDescription();
  EXPECT_EQ(description.summary(), "Make sure all the Tessel Telemons were measured.");
  EXPECT_TRUE(description.parameters().empty());
}

TEST(TesselTelemonAnalysis, HasNoSetup) {
  const std::unique_ptr<QZAnalysis> analysis = std::make_unique<QZTesselTelemonAnalysis>();
  EXPECT_EQ(dynamic_cast<QZAnalysisSetup*>(analysis.get()), nullptr);
}

TEST(TesselTelemonAnalysis, LimitsEveryChannelToZeroEvents) {
  const DiagnosticErrorPtr earlier = earlierError();
  DiagnosticErrorPtr error = earlier;
  const auto result = QZTesselTelemonAnalysis().analyzeExperimentResult(resultOfQuietModule(), &error);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), quietResults());
  EXPECT_EQ(result->measuredResults().size(), 60U);
  for (const QZMeasuredResult& measured : result->measuredResults()) EXPECT_TRUE(isInside(measured)) << told(measured);
  EXPECT_EQ(error, earlier);
}

TEST(TesselTelemonAnalysis, KeepsItsOrderWhateverTheOrderOfTheMeasurements) {
  QZExperimentResult backwards;
  for (auto name = moduleChannels().rbegin(); name != moduleChannels().rend(); ++name) {
    backwards.measurements().set(*name, Measurement(0, QZDimensionlessUnit::events()));
  }
  const auto result = QZTesselTelemonAnalysis().analyzeExperimentResult(backwards, nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), quietResults());
}

TEST(TesselTelemonAnalysis, LeavesOtherChannelsOut) {
  QZExperimentResult measured = resultOfQuietModule();
  measured.measurements().set("Number Vok INT_FAULT_XEF2", Measurement(4, QZDimensionlessUnit::events()));
  measured.measurements().set("number fenk ntc", Measurement(5, QZDimensionlessUnit::events()));
  measured.measurements().set("", Measurement(6, QZDimensionlessUnit::events()));
  const auto result = QZTesselTelemonAnalysis().analyzeExperimentResult(measured, nullptr);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), quietResults());
}

TEST(TesselTelemonAnalysis, TellsACountThatIsNotZeroAndLeavesTheVerdictToTheHost) {
  QZExperimentResult measured = resultOfQuietModule();
  measured.measurements().set("Number Fenk NTC", Measurement(3, QZDimensionlessUnit::events()));
  DiagnosticErrorPtr error;
  const auto result = QZTesselTelemonAnalysis().analyzeExperimentResult(measured, &error);
  ASSERT_NE(result, nullptr);
  ASSERT_EQ(result->measuredResults().size(), 60U);
  const QZMeasuredResult& last = result->measuredResults().back();
  EXPECT_EQ(told(last), "Number Fenk NTC = 3 events [Max Reports: 0 events closed to 0 events closed]");
  EXPECT_FALSE(isInside(last));
  EXPECT_EQ(error, nullptr);
}

TEST(TesselTelemonAnalysis, PassesMeasurementsOnAsTheyAre) {
  QZExperimentResult measured = resultOfQuietModule();
  measured.measurements().set("Number Dwna NTC", Measurement(-0.25, QZDimensionlessUnit::errors()));
  const auto result = QZTesselTelemonAnalysis().analyzeExperimentResult(measured, nullptr);
  ASSERT_NE(result, nullptr);
  ASSERT_EQ(result->measuredResults().size(), 60U);
  const QZMeasuredResult& passedOn = result->measuredResults()[58];
  EXPECT_EQ(told(passedOn), "Number Dwna NTC = -0.25 errors [Max Reports: 0 events closed to 0 events closed]");
  EXPECT_FALSE(isInside(passedOn));
}

TEST(TesselTelemonAnalysis, FailsWhenAnyOneOfTheChannelsIsMissing) {
  for (const std::string_view name : moduleChannels()) {
    SCOPED_TRACE(name);
    QZExperimentResult measured = resultOfQuietModule();
    ASSERT_TRUE(measured.measurements().erase(name));
    DiagnosticErrorPtr error = earlierError();
    EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(measured, &error), nullptr);
    EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for " + std::string(name));
  }
}

TEST(TesselTelemonAnalysis, NamesTheFirstOfSeveralMissingChannels) {
  QZExperimentResult measured = resultOfQuietModule();
  for (const char* name : {"Number Fenk NTC", "Number ZE FAULT_OV", "Number ZE FAULT_UV"}) {
    ASSERT_TRUE(measured.measurements().erase(name));
  }
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(measured, &error), nullptr);
  EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for Number ZE FAULT_UV");
}

TEST(TesselTelemonAnalysis, FailsAtTheFirstChannelOfAnEmptyResult) {
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(QZExperimentResult(), &error), nullptr);
  EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for Number Vok INT_ADC_READY_LATCH");
}

TEST(TesselTelemonAnalysis, TakesNoOtherSpellingForAChannel) {
  QZExperimentResult measured = resultOfQuietModule();
  ASSERT_TRUE(measured.measurements().erase("Number ZE FAULT_A"));
  measured.measurements().set("Number ZE Fault_A", Measurement(0, QZDimensionlessUnit::events()));
  measured.measurements().set("Number ZE FAULT_A ", Measurement(0, QZDimensionlessUnit::events()));
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(measured, &error), nullptr);
  EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for Number ZE FAULT_A");
}

TEST(TesselTelemonAnalysis, LooksForMeasurementsAndNotInTheAuxiliaryData) {
  QZExperimentResult measured = resultOfQuietModule();
  ASSERT_TRUE(measured.measurements().erase("Number KT EN_PIN_STATE"));
  measured.auxiliaryData().set("Number KT EN_PIN_STATE", 0);
  DiagnosticErrorPtr error;
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(measured, &error), nullptr);
  EXPECT_EQ(told(error), "QZErrorDomain 6 Missing measurement for Number KT EN_PIN_STATE");
}

TEST(TesselTelemonAnalysis, FailsJustSoForACallerThatWantsNoError) {
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(QZExperimentResult(), nullptr), nullptr);
}

TEST(TesselTelemonAnalysis, LeavesTheExperimentsResultAsItIs) {
  QZExperimentResult measured = resultOfQuietModule();
  measured.measurements().set("Number Of Others", Measurement(7, QZDimensionlessUnit::frames()));
  measured.auxiliaryData().set("note", "kept");
  const std::string before = told(measured);
  const auto first = QZTesselTelemonAnalysis().analyzeExperimentResult(measured, nullptr);
  ASSERT_NE(first, nullptr);
  EXPECT_EQ(told(measured), before);
  ASSERT_TRUE(measured.measurements().erase("Number Fenk NTC"));
  const std::string beforeFailure = told(measured);
  EXPECT_EQ(QZTesselTelemonAnalysis().analyzeExperimentResult(measured, nullptr), nullptr);
  EXPECT_EQ(told(measured), beforeFailure);
}

}  // namespace
}  // namespace quazor
