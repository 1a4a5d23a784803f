#include "contract/results.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace quazor {
namespace {

Measurement frames(double count) { return {count, QZDimensionlessUnit::frames()}; }

TEST(DescriptionTest, HasASummaryAndNoParametersWhenItIsMade) {
  for (const QZDescription& description :
       {QZDescription("Counts frames."), QZDescription::descriptionWithSummary("Counts frames.")}) {
    EXPECT_EQ(description.summary(), "Counts frames.");
    EXPECT_TRUE(description.parameters().empty());
  }
}

TEST(DescriptionTest, KeepsParametersUnderTheirNamesInOrder) {
  QZDescription description("Counts frames.");
  description.addParameter(QZNumberParameter("Seconds to wait.", true), "timeout");
  description.addParameter(QZNumberParameter("Frames to take.", false), "frameCount");
  std::vector<std::string> names;
  for (const auto& [name, parameter] : description.parameters()) names.push_back(name);
  EXPECT_EQ(names, (std::vector<std::string>{"timeout", "frameCount"}));
  EXPECT_EQ(description.parameters().find("timeout")->summary(), "Seconds to wait.");
  EXPECT_TRUE(description.parameters().find("timeout")->required());
  EXPECT_FALSE(description.parameters().find("frameCount")->required());
}

TEST(ExperimentResultTest, IsMadeEmptyAndKeepsWhatIsPutIn) {
  QZExperimentResult result;
  const QZExperimentResult& reader = result;
  EXPECT_TRUE(reader.measurements().empty());
  EXPECT_TRUE(reader.auxiliaryData().empty());
  result.measurements().set("Lamp.Frames", frames(3));
  result.auxiliaryData().set("counters", Dictionary{{"errors", 2}});
  EXPECT_EQ(*reader.measurements().find("Lamp.Frames"), frames(3));
  EXPECT_EQ(*reader.auxiliaryData().find("counters"), Value(Dictionary{{"errors", 2}}));
}

TEST(AnalysisResultTest, IsMadeEmptyAndKeepsTheOrderOfItsMeasuredResults) {
  QZAnalysisResult result;
  const QZAnalysisResult& reader = result;
  EXPECT_TRUE(reader.measuredResults().empty());
  result.measuredResults().emplace_back("second", frames(2));
  result.measuredResults().emplace_back("first", frames(1));
  ASSERT_EQ(reader.measuredResults().size(), 2U);
  EXPECT_EQ(reader.measuredResults()[0].name(), "second");
  EXPECT_EQ(reader.measuredResults()[0].measurement(), frames(2));
  EXPECT_EQ(reader.measuredResults()[1].name(), "first");
}

TEST(MeasuredResultTest, StaysWithoutALimitUntilOneIsSet) {
  QZAnalysisResult result;
  result.measuredResults().emplace_back("Offset", frames(0));
  EXPECT_FALSE(result.measuredResults().front().limit().has_value());
  result.measuredResults().front().setLimit(QZLimit("OffsetLimit"));
  ASSERT_TRUE(result.measuredResults().front().limit().has_value());
  EXPECT_EQ(result.measuredResults().front().limit()->name(), "OffsetLimit");
}

TEST(LimitTest, HasNoBoundsWhenItIsMade) {
  const QZLimit limit("Min Frame Count");
  EXPECT_EQ(limit.name(), "Min Frame Count");
  EXPECT_EQ(limit.lowerBound(), nullptr);
  EXPECT_EQ(limit.upperBound(), nullptr);
}

TEST(LimitTest, WithALowerBoundAloneLeavesTheUpperOneAbsent) {
  QZLimit limit("Min Frame Count");
  limit.setLowerBound(std::make_shared<QZBound>(frames(30), false));
  ASSERT_NE(limit.lowerBound(), nullptr);
  EXPECT_EQ(limit.lowerBound()->value(), frames(30));
  EXPECT_FALSE(limit.lowerBound()->open());
  EXPECT_EQ(limit.upperBound(), nullptr);
}

TEST(LimitTest, WithAnUpperBoundAloneLeavesTheLowerOneAbsent) {
  QZLimit limit("Max Lateness");
  limit.setUpperBound(std::make_shared<QZBound>(frames(1), true));
  EXPECT_EQ(limit.lowerBound(), nullptr);
  EXPECT_TRUE(limit.upperBound()->open());
}

TEST(LimitTest, BothBoundsMayBeOneObject) {
  const auto zero = std::make_shared<const QZBound>(Measurement(0, QZDimensionlessUnit::errors()), false);
  QZLimit limit("Zero");
  limit.setLowerBound(zero);
  limit.setUpperBound(zero);
  EXPECT_EQ(limit.lowerBound(), zero);
  EXPECT_EQ(limit.upperBound(), zero);
}

}  // namespace
}  // namespace quazor
