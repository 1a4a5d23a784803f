#include "host/model/variation.h"

#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace quazor {
namespace {

DiagnosticRecord entry(const std::string& name, Verdict verdict, Trial trial,
                       const std::vector<QZMeasuredResult>& results = {}) {
  DiagnosticRecord record;
  record.name = name;
  record.verdict = verdict;
  record.trial = trial;
  record.measuredResults = judgeResults(results);
  if (verdict == Verdict::kError) record.error = errorWithMessage("D", 1, "m", nullptr);
  return record;
}

QZMeasuredResult value(const std::string& name, double number, const QZUnit& unit = QZDimensionlessUnit::frames()) {
  return QZMeasuredResult(name, Measurement(number, unit));
}

// The repetitions of one diagnostic whose only result has these values.
VaryingResult varyingOf(const std::vector<double>& numbers) {
  std::vector<DiagnosticRecord> records;
  for (const double number : numbers) {
    records.push_back(entry("A", Verdict::kPass, {0, 0, records.size() + 1, numbers.size()}, {value("R", number)}));
    records.back().seed = 100 + records.size();
  }
  const std::vector<DiagnosticVariation> variations = variationOf(records);
  return variations.at(0).varying.empty() ? VaryingResult() : variations[0].varying[0];
}

TEST(Variation, CountsVerdictsOfRepetitionsAndNotOfAttempts) {
  const std::vector<DiagnosticRecord> records = {
      entry("A", Verdict::kError, {1, 2, 1, 4}), entry("A", Verdict::kPass, {2, 2, 1, 4}),
      entry("B", Verdict::kSkip, {1, 2, 1, 4}),  entry("A", Verdict::kError, {1, 2, 2, 4}),
      entry("A", Verdict::kError, {2, 2, 2, 4}), entry("A", Verdict::kFail, {1, 2, 3, 4}),
      entry("A", Verdict::kPass, {1, 2, 4, 4}),  entry("limit", Verdict::kError, {})};
  const std::vector<DiagnosticVariation> variations = variationOf(records);
  ASSERT_EQ(variations.size(), 2U);
  EXPECT_EQ(variations[0].name, "A");
  const VerdictCounts& counts = variations[0].verdicts;
  EXPECT_THAT((std::vector{counts.passed, counts.flaky, counts.failed, counts.errors, counts.skipped}),
              testing::ElementsAre(1U, 1U, 1U, 1U, 0U));
  EXPECT_EQ(variations[1].verdicts.skipped, 1U);
  EXPECT_EQ(verdictCountsOf(records).all(), 6U);
}

TEST(Variation, IsNothingWithoutRepetitions) {
  EXPECT_TRUE(variationOf({entry("A", Verdict::kPass, {}), entry("A", Verdict::kPass, {1, 2, 0, 0})}).empty());
}

TEST(Variation, HasTheMedianOfEvenAndOddNumbers) {
  EXPECT_EQ(varyingOf({3, 1, 2}).median, 2);
  EXPECT_EQ(varyingOf({4, 1, 3, 2}).median, 2.5);
  constexpr double kMost = std::numeric_limits<double>::max();
  EXPECT_EQ(varyingOf({kMost, 0, kMost, kMost}).median, kMost);
  EXPECT_EQ(varyingOf({5, 5, 5}).values, 0U);  // never varied
}

TEST(Variation, HasTheFirstRepetitionsOfMinimumAndMaximum) {
  const VaryingResult some = varyingOf({2, 1, 3, 1, std::nan(""), 3});
  EXPECT_EQ(some.minimumRepetition, 2U);
  EXPECT_EQ(some.maximumRepetition, 3U);
  EXPECT_EQ(varyingOf({7, 7, 6}).minimumRepetition, 3U);
  EXPECT_EQ(varyingOf({7, 7, 6}).maximumRepetition, 1U);
  EXPECT_EQ(varyingOf({std::nan(""), HUGE_VAL}).minimumRepetition, 0U);
}

TEST(Variation, HasTheFirstRepetitionWhoseRareValueIsFarthestFromTheUsualOne) {
  const double nan = std::nan("");
  constexpr double kMost = std::numeric_limits<double>::max();
  const std::pair<std::vector<double>, std::uint64_t> cases[] = {
      {{90, 90, 87, 90}, 3},          // from the most frequent value
      {{90, 90, 87, 70, 87}, 4},      // from the median
      {{2, 1, 9, 9}, 2},              // half of the values are enough
      {{90, 87, 90, 87, 90, 89}, 6},  // the farthest is not rare
      {{90, 87, 90, 87}, 0},          // none is rare
      {{10, 1}, 0},                   // each is half of all
      {{90, 80, 90}, 0},              // more than a quarter
      {{1.5, 1.6, 1.4, 1.9}, 4},
      {{5, 5, 4, 6}, 3},  // the first of two
      {{1, 2, nan, 50, HUGE_VAL}, 3},
      {{nan, nan, nan, 7}, 4},
      {{-kMost, kMost, kMost / 2, kMost / 4}, 1}};
  for (const auto& [values, repetition] : cases) {
    SCOPED_TRACE(testing::PrintToString(values));
    const VaryingResult some = varyingOf(values);
    EXPECT_EQ(some.outlierRepetition, repetition);
    EXPECT_EQ(some.outlierSeed, repetition == 0 ? 0 : 100 + repetition);
  }
}

TEST(Variation, LeavesOutValuesThatAreNotFinite) {
  const double nan = std::nan("");
  const VaryingResult some = varyingOf({nan, 2, HUGE_VAL, 4});
  EXPECT_EQ(some.values, 4U);
  EXPECT_EQ(some.minimum, 2);
  EXPECT_EQ(some.median, 3);
  EXPECT_EQ(some.maximum, 4);
  EXPECT_EQ(varyingOf({nan, nan}).values, 0U);
  EXPECT_TRUE(std::isnan(varyingOf({nan, HUGE_VAL}).median));
}

TEST(Variation, TellsResultsOfOneNameAndOtherUnitsApart) {
  const std::vector<DiagnosticVariation> variations =
      variationOf({entry("A", Verdict::kPass, {0, 0, 1, 2}, {value("R", 1), value("R", 2), value("S", 1)}),
                   entry("A", Verdict::kPass, {0, 0, 2, 2},
                         {value("R", 1), value("R", 3), value("S", 2, QZDimensionlessUnit::events())})});
  ASSERT_EQ(variations.at(0).varying.size(), 1U);
  EXPECT_EQ(variations[0].varying[0].maximum, 3);
  EXPECT_EQ(variations[0].constant, 3U);
}

TEST(Variation, LeavesOutTheResultsOfErrorsAndKeepsALimit) {
  const std::vector<DiagnosticVariation> variations =
      variationOf({entry("A", Verdict::kError, {0, 0, 1, 3}, {resultWithMinimum(-1, 90)}),
                   entry("A", Verdict::kFail, {0, 0, 2, 3}, {resultWithMinimum(80, 90)}),
                   entry("A", Verdict::kPass, {0, 0, 3, 3}, {resultWithMinimum(95, 90)})});
  ASSERT_EQ(variations.at(0).varying.size(), 1U);
  EXPECT_EQ(variations[0].varying[0].values, 2U);
  EXPECT_EQ(variations[0].varying[0].minimum, 80);
  EXPECT_EQ(variations[0].varying[0].limit->name(), "Enough");
}

}  // namespace
}  // namespace quazor
