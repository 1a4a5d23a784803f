// Every value against every limit of a small set, and all short lists of results.
#include "host/testing/test_oracle.h"

#include "host/testing/test_records.h"
#include "host/testing/test_values.h"

#include <gtest/gtest.h>

#include <iostream>
#include <limits>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

constexpr double kNumbers[] = {-kInf, -1, -0.0, 0, std::numeric_limits<double>::denorm_min(), 1, kInf, kNan};

using Bound = std::shared_ptr<const QZBound>;

// No bound, and bounds at every number, open and closed, in the unit of the values and in another unit.
std::vector<Bound> allBounds() {
  std::vector<Bound> bounds = {nullptr};
  for (const double number : kNumbers) {
    for (const bool open : {false, true}) {
      for (const QZUnit* unit : {&QZDimensionlessUnit::frames(), &QZDimensionlessUnit::errors()}) {
        bounds.push_back(std::make_shared<const QZBound>(Measurement(number, *unit), open));
      }
    }
  }
  return bounds;
}

QZMeasuredResult resultWith(double value, const Bound& lower, const Bound& upper) {
  QZMeasuredResult result("R", Measurement(value, QZDimensionlessUnit::frames()));
  QZLimit limit("L");
  limit.setLowerBound(lower);
  limit.setUpperBound(upper);
  result.setLimit(limit);
  return result;
}

std::string textOf(const Bound& bound) {
  if (bound == nullptr) return "none";
  return std::to_string(bound->value().value()) + " " + bound->value().unit().symbol() + (bound->open() ? " open" : "");
}

TEST(JudgeTable, AgreesWithTheOracleOnEveryValueAndLimit) {
  const std::vector<Bound> bounds = allBounds();
  int rows = 0;
  int passes = 0;
  for (const double value : kNumbers) {
    for (const Bound& lower : bounds) {
      for (const Bound& upper : bounds) {
        const QZMeasuredResult result = resultWith(value, lower, upper);
        const OracleResult due = oracleResult(result);
        const ResultVerdict verdict = !due.isLimited     ? ResultVerdict::kNone
                                      : !due.isJudgeable ? ResultVerdict::kError
                                      : due.isInside     ? ResultVerdict::kPass
                                                         : ResultVerdict::kFail;
        const JudgedResult judged = judgeResult(result);
        const std::string row = std::to_string(value) + " in " + textOf(lower) + " to " + textOf(upper);
        ASSERT_EQ(judged.verdict, verdict) << row;
        ASSERT_EQ(judged.problem.empty(), !due.isLimited || due.isJudgeable) << row;
        ASSERT_EQ(judge({judged}).verdict, oracleVerdict({result}, false, true)) << row;
        ++rows;
        passes += verdict == ResultVerdict::kPass ? 1 : 0;
      }
    }
  }
  EXPECT_EQ(rows, 8 * 33 * 33);
  EXPECT_GT(passes, 50);
  std::cout << rows << " values and limits judged, " << passes << " of them inside\n";
}

TEST(JudgeTable, AgreesWithTheOracleOnEveryListOfUpToFourResults) {
  const Bound one = std::make_shared<const QZBound>(Measurement(1, QZDimensionlessUnit::frames()), false);
  const std::vector<QZMeasuredResult> kinds = {resultWith(1, one, nullptr), resultWith(0, one, nullptr),
                                               resultWith(kNan, one, nullptr), resultWith(kNan, nullptr, nullptr)};
  int lists = 0;
  for (std::size_t length = 0; length <= 4; ++length) {
    for (std::size_t number = 0; number < std::size_t{1} << 2 * length; ++number) {
      std::vector<QZMeasuredResult> results;
      for (std::size_t i = 0; i < length; ++i) results.push_back(kinds[number >> 2 * i & 3]);
      const Judgement judgement = judge(judgeResults(results));
      ASSERT_EQ(judgement.verdict, oracleVerdict(results, false, true)) << length << " " << number;
      ++lists;
    }
  }
  EXPECT_EQ(lists, 1 + 4 + 16 + 64 + 256);
}

}  // namespace
}  // namespace quazor
