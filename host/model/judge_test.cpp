#include "host/model/judge.h"

#include "host/testing/test_records.h"
#include "host/testing/test_values.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr double kMinimum = std::numeric_limits<double>::denorm_min();

enum class End { kNone, kClosed, kOpen };

const QZUnit& frames() { return QZDimensionlessUnit::frames(); }

std::shared_ptr<const QZBound> boundOf(End end, double value, const QZUnit& unit) {
  if (end == End::kNone) return nullptr;
  return std::make_shared<const QZBound>(Measurement(value, unit), end == End::kOpen);
}

QZMeasuredResult limited(double value, std::shared_ptr<const QZBound> lower, std::shared_ptr<const QZBound> upper) {
  QZMeasuredResult result("Count", Measurement(value, frames()));
  QZLimit limit("Limit");
  limit.setLowerBound(std::move(lower));
  limit.setUpperBound(std::move(upper));
  result.setLimit(std::move(limit));
  return result;
}

QZMeasuredResult passing() { return limited(1, boundOf(End::kClosed, 1, frames()), nullptr); }
QZMeasuredResult failing() { return limited(0, boundOf(End::kClosed, 1, frames()), nullptr); }
QZMeasuredResult unjudgeable() { return limited(kNan, boundOf(End::kClosed, 1, frames()), nullptr); }
QZMeasuredResult unlimited(double value) { return {"Info", Measurement(value, frames())}; }

TEST(JudgeResult, ComparesTheValueWithItsBounds) {
  struct Row {
    const char* name;
    double value;
    End lower;
    double low;
    End upper;
    double high;
    ResultVerdict verdict;
  };
  constexpr auto kPass = ResultVerdict::kPass;
  constexpr auto kFail = ResultVerdict::kFail;
  constexpr End kNo = End::kNone;
  constexpr End kClosed = End::kClosed;
  constexpr End kOpen = End::kOpen;
  const Row rows[] = {
      {"on a closed lower bound", 90, kClosed, 90, kNo, 0, kPass},
      {"just below a closed lower bound", std::nextafter(90, 0), kClosed, 90, kNo, 0, kFail},
      {"just above a closed lower bound", std::nextafter(90, 91), kClosed, 90, kNo, 0, kPass},
      {"on an open lower bound", 90, kOpen, 90, kNo, 0, kFail},
      {"just above an open lower bound", std::nextafter(90, 91), kOpen, 90, kNo, 0, kPass},
      {"on a closed upper bound", 90, kNo, 0, kClosed, 90, kPass},
      {"just above a closed upper bound", std::nextafter(90, 91), kNo, 0, kClosed, 90, kFail},
      {"just below a closed upper bound", std::nextafter(90, 0), kNo, 0, kClosed, 90, kPass},
      {"on an open upper bound", 90, kNo, 0, kOpen, 90, kFail},
      {"just below an open upper bound", std::nextafter(90, 0), kNo, 0, kOpen, 90, kPass},
      {"between two closed bounds", 5, kClosed, 1, kClosed, 9, kPass},
      {"below both", 0, kClosed, 1, kClosed, 9, kFail},
      {"above both", 10, kClosed, 1, kClosed, 9, kFail},
      {"between two open bounds", 5, kOpen, 1, kOpen, 9, kPass},
      {"on the open end of a half-open range", 9, kClosed, 1, kOpen, 9, kFail},
      {"on the closed end of a half-open range", 1, kClosed, 1, kOpen, 9, kPass},
      {"the one value of a zero limit", 0, kClosed, 0, kClosed, 0, kPass},
      {"negative zero in a zero limit", -0.0, kClosed, 0, kClosed, 0, kPass},
      {"the least value above a zero limit", kMinimum, kClosed, 0, kClosed, 0, kFail},
      {"the least value below a zero limit", -kMinimum, kClosed, 0, kClosed, 0, kFail},
      {"a negative value above a negative bound", -1, kClosed, -2, kNo, 0, kPass},
  };
  for (const Row& row : rows) {
    const JudgedResult judgement =
        judgeResult(limited(row.value, boundOf(row.lower, row.low, frames()), boundOf(row.upper, row.high, frames())));
    EXPECT_EQ(judgement.verdict, row.verdict) << row.name;
    EXPECT_EQ(judgement.problem, "") << row.name;
  }
}

TEST(JudgeResult, SaysWhyAResultCannotBeJudged) {
  const QZUnit& errors = QZDimensionlessUnit::errors();
  struct Row {
    const char* name;
    QZMeasuredResult result;
    const char* problem;
  };
  const Row rows[] = {
      {"a value that is not a number", limited(kNan, boundOf(End::kClosed, 0, frames()), nullptr), "its value is nan"},
      {"an infinite value above a lower bound", limited(kInf, boundOf(End::kClosed, 0, frames()), nullptr),
       "its value is inf"},
      {"an infinite value below an upper bound", limited(-kInf, nullptr, boundOf(End::kOpen, 0, frames())),
       "its value is -inf"},
      {"a lower bound that is not a number", limited(1, boundOf(End::kClosed, kNan, frames()), nullptr),
       "its lower bound is nan"},
      {"an infinite lower bound", limited(1, boundOf(End::kClosed, -kInf, frames()), nullptr),
       "its lower bound is -inf"},
      {"an infinite upper bound", limited(1, nullptr, boundOf(End::kClosed, kInf, frames())), "its upper bound is inf"},
      {"a lower bound in another unit", limited(1, boundOf(End::kClosed, 0, errors), nullptr),
       "its lower bound is in 'errors' but its value is in 'frames'"},
      {"an upper bound in another unit", limited(1, nullptr, boundOf(End::kClosed, 2, errors)),
       "its upper bound is in 'errors' but its value is in 'frames'"},
      {"one bound in the right unit and one not",
       limited(1, boundOf(End::kClosed, 0, frames()), boundOf(End::kClosed, 2, errors)),
       "its upper bound is in 'errors' but its value is in 'frames'"},
      {"bounds that are crossed", limited(1, boundOf(End::kClosed, 2, frames()), boundOf(End::kClosed, 1, frames())),
       "no value can lie between its bounds"},
      {"equal bounds with the lower open",
       limited(1, boundOf(End::kOpen, 1, frames()), boundOf(End::kClosed, 1, frames())),
       "no value can lie between its bounds"},
      {"equal bounds with the upper open",
       limited(1, boundOf(End::kClosed, 1, frames()), boundOf(End::kOpen, 1, frames())),
       "no value can lie between its bounds"},
  };
  for (const Row& row : rows) {
    const JudgedResult judgement = judgeResult(row.result);
    EXPECT_EQ(judgement.verdict, ResultVerdict::kError) << row.name;
    EXPECT_EQ(judgement.problem, std::string("the result Count cannot be judged: ") + row.problem) << row.name;
  }
}

TEST(JudgeResult, IsNoneWithoutALimitWhateverTheValue) {
  for (const double value : {0.0, -1.0, kNan, kInf}) {
    const JudgedResult judgement = judgeResult(unlimited(value));
    EXPECT_EQ(judgement.verdict, ResultVerdict::kNone) << value;
    EXPECT_EQ(judgement.problem, "") << value;
  }
}

TEST(JudgeResult, IsNoneWhenTheLimitSetsNoBound) {
  const JudgedResult judgement = judgeResult(limited(kNan, nullptr, nullptr));
  EXPECT_EQ(judgement.verdict, ResultVerdict::kNone);
  EXPECT_EQ(judgement.problem, "");
}

TEST(JudgeResult, TakesOneObjectAsBothBounds) {
  const auto zero = boundOf(End::kClosed, 0, frames());
  EXPECT_EQ(judgeResult(limited(0, zero, zero)).verdict, ResultVerdict::kPass);
  EXPECT_EQ(judgeResult(limited(1, zero, zero)).verdict, ResultVerdict::kFail);
}

TEST(Judge, CombinesTheResults) {
  struct Row {
    const char* name;
    std::vector<QZMeasuredResult> results;
    Verdict verdict;
  };
  const Row rows[] = {
      {"nothing measured", {}, Verdict::kError},
      {"one that passes", {passing()}, Verdict::kPass},
      {"one that fails", {failing()}, Verdict::kFail},
      {"one that cannot be judged", {unjudgeable()}, Verdict::kError},
      {"only one for information", {unlimited(kNan)}, Verdict::kPass},
      {"a failure after a pass", {passing(), failing()}, Verdict::kFail},
      {"a failure before a pass", {failing(), passing()}, Verdict::kFail},
      {"an error after a failure", {failing(), unjudgeable()}, Verdict::kError},
      {"an error before a failure", {unjudgeable(), failing()}, Verdict::kError},
      {"a pass with information", {unlimited(0), passing(), unlimited(1)}, Verdict::kPass},
  };
  for (const Row& row : rows) {
    const Judgement judgement = judge(judgeResults(row.results));
    EXPECT_EQ(judgement.verdict, row.verdict) << row.name;
    EXPECT_EQ(judgement.problemCode.has_value(), row.verdict == Verdict::kError) << row.name;
    EXPECT_EQ(judgement.problem.empty(), row.verdict != Verdict::kError) << row.name;
  }
}

TEST(Judge, TellsNothingMeasuredFromWhatCannotBeJudged) {
  EXPECT_EQ(judge({}).problemCode, HostErrorCode::kNothingMeasured);
  EXPECT_EQ(judge({}).problem, "nothing was measured");
  EXPECT_EQ(judge({judgeResult(unjudgeable())}).problemCode, HostErrorCode::kCannotBeJudged);
}

TEST(Judge, ReportsTheFirstProblem) {
  const QZMeasuredResult crossed = limited(1, boundOf(End::kClosed, 2, frames()), boundOf(End::kClosed, 1, frames()));
  EXPECT_THAT(judge(judgeResults({passing(), crossed, unjudgeable()})).problem,
              testing::HasSubstr("between its bounds"));
}

TEST(Verdicts, HaveNames) {
  EXPECT_EQ(nameOf(Verdict::kPass), "pass");
  EXPECT_EQ(nameOf(Verdict::kFail), "fail");
  EXPECT_EQ(nameOf(Verdict::kError), "error");
  EXPECT_EQ(nameOf(ResultVerdict::kPass), "pass");
  EXPECT_EQ(nameOf(ResultVerdict::kFail), "fail");
  EXPECT_EQ(nameOf(ResultVerdict::kError), "error");
  EXPECT_EQ(nameOf(ResultVerdict::kNone), "none");
}

}  // namespace
}  // namespace quazor
