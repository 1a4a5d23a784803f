#include "host/model/limit_check.h"

#include "contract/message_format.h"
#include "host/error/host_error.h"
#include "host/model/diagnostic_record.h"
#include "host/model/judge.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <random>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

QZMeasuredResult measured(std::string_view name, double value, std::string_view unit = "frames") {
  return {name, Measurement(value, QZUnit::unitWithSymbol(unit))};
}

UserLimit limitFrom(std::string_view text, LimitSeverity severity = LimitSeverity::kFail) {
  UserLimit limit = parseUserLimit(text);
  limit.severity = severity;
  limit.source = "command line";
  return limit;
}

DiagnosticRecord limitedRecord(std::vector<QZMeasuredResult> results, const std::vector<UserLimit>& limits) {
  DiagnosticRecord record;
  record.name = "Cameras.Back";
  record.experimentName = "CamerasExperiment";
  record.limits = limitsFor(record.name, limits);
  for (QZMeasuredResult& one : results) record.measuredResults.push_back(judgeResult(std::move(one)));
  return record;
}

TEST(LimitCheck, ComparesAResultWithANumber) {
  struct Row {
    const char* limit;
    double value;
    bool passed;
  };
  constexpr Row kRows[] = {
      {"A < 5", 4.9, true},
      {"A < 5", 5, false},
      {"A <= 5", 5, true},
      {"A <= 5", 5.1, false},
      {"A > 5", 5.1, true},
      {"A > 5", 5, false},
      {"A >= 5", 5, true},
      {"A >= 5", 4.9, false},
      {"A == 5", 5, true},
      {"A == 5", 5.0000001, false},
      {"A == 5 +- 0.5", 5.5, true},
      {"A == 5 +- 0.5", 4.5, true},
      {"A == 5 +- 0.5", 5.51, false},
      {"A == 5 +- 0.5", 4.49, false},
      {"A in [1, 2]", 1, true},
      {"A in [1, 2]", 2, true},
      {"A in (1, 2)", 1, false},
      {"A in (1, 2)", 2, false},
      {"A in (1, 2)", 1.5, true},
      {"A in [1, 2]", 0.9, false},
      {"A in [1, 2]", 2.1, false},
      {"A >= 5 frames", 5, true},
      {"A in [1, 2] frames", 3, false},
  };
  for (const Row& row : kRows) {
    const std::vector<LimitCheck> checks =
        limitChecksOf(limitedRecord({measured("A", row.value)}, {limitFrom(row.limit)}));
    ASSERT_EQ(checks.size(), 1U) << row.limit;
    EXPECT_EQ(checks[0].passed, row.passed) << row.limit << ' ' << row.value;
    EXPECT_EQ(checks[0].problem, "") << row.limit;
  }
}

TEST(LimitCheck, ComparesTwoResults) {
  const std::vector<QZMeasuredResult> results = {measured("A", 5), measured("B", 6)};
  const auto passes = [&results](const char* text) {
    return limitChecksOf(limitedRecord(results, {limitFrom(text)})).at(0).passed;
  };
  EXPECT_TRUE(passes("A < B"));
  EXPECT_FALSE(passes("B < A"));
  EXPECT_FALSE(passes("A == B"));
  EXPECT_TRUE(passes("A == B +- 1"));
  EXPECT_TRUE(passes("B == A +- 1"));
}

TEST(LimitCheck, SaysWhyAComparisonIsImpossible) {
  constexpr double kNan = std::numeric_limits<double>::quiet_NaN();
  struct Row {
    const char* limit;
    const char* why;
  };
  constexpr Row kRows[] = {
      {"A > 5 ms", "the limit is in 'ms' but the value is in 'frames'"},
      {"A in [1, 2] ms", "the limit is in 'ms' but the value is in 'frames'"},
      {"A > T", "the limit is in 'ms' but the value is in 'frames'"},
      {"A > C", "there is no result 'C'"},
      {"A > Twice", "several results have the name 'Twice'"},
      {"A > N", "the value of N is nan"},
      {"N > 1", "the value is nan"},
      {"N in [1, 2]", "the value is nan"},
      {"N > A", "the value is nan"},
  };
  for (const Row& row : kRows) {
    const DiagnosticRecord record = limitedRecord(
        {measured("A", 5), measured("N", kNan), measured("T", 1, "ms"), measured("Twice", 1), measured("Twice", 2)},
        {limitFrom(row.limit)});
    const std::vector<LimitCheck> checks = limitChecksOf(record);
    ASSERT_EQ(checks.size(), 1U) << row.limit;
    EXPECT_EQ(checks[0].problem, "the result " + checks[0].result.name() + " cannot be compared with the limit '" +
                                     canonicalText(checks[0].limit) + "': " + row.why);
    EXPECT_FALSE(checks[0].passed);
    const RecordJudgement judged = judgeRecord(record, true);
    EXPECT_EQ(judged.verdict, Verdict::kError);
    EXPECT_EQ(judged.error->code(), static_cast<std::int64_t>(HostErrorCode::kCannotBeJudged));
    EXPECT_EQ(judged.error->localizedDescription(), checks[0].problem);
  }
}

TEST(LimitCheck, HasTheBoundsOfItsConditionInTheUnitOfTheResult) {
  struct Row {
    const char* limit;
    const char* lower;  // "" for none, as is `upper`
    const char* upper;
  };
  constexpr Row kRows[] = {
      {"A < 5", "", "5 ms open"},           {"A <= 5", "", "5 ms"},
      {"A > 5", "5 ms open", ""},           {"A >= 5", "5 ms", ""},
      {"A == 5 +- 1", "4 ms", "6 ms"},      {"A in [1, 2)", "1 ms", "2 ms open"},
      {"A in (1, 2]", "1 ms open", "2 ms"}, {"A == 1e308 +- 1e308", "0 ms", ""},
  };
  const auto textOf = [](const std::shared_ptr<const QZBound>& bound) {
    if (bound == nullptr) return std::string();
    const Measurement& value = bound->value();
    return formatMessage("%@ %@", value.value(), value.unit().symbol()) + (bound->open() ? " open" : "");
  };
  for (const Row& row : kRows) {
    const auto checks = limitChecksOf(limitedRecord({measured("A", 3, "ms")}, {limitFrom(row.limit)}));
    const std::optional<QZLimit> bounds = boundsOf(checks.at(0));
    ASSERT_TRUE(bounds) << row.limit;
    EXPECT_EQ(textOf(bounds->lowerBound()), row.lower) << row.limit;
    EXPECT_EQ(textOf(bounds->upperBound()), row.upper) << row.limit;
  }
  const auto relation = limitChecksOf(limitedRecord({measured("A", 3), measured("B", 4)}, {limitFrom("A < B")}));
  EXPECT_FALSE(boundsOf(relation.at(0))) << "a comparison of two results has none";
}

TEST(LimitCheck, ComparesNamesBehindZeroBytes) {
  using namespace std::string_literals;
  UserLimit limit = limitFrom("A < 5");
  limit.result = "A\0B"s;
  const auto checks =
      limitChecksOf(limitedRecord({measured("A\0C"s, 1), measured("A", 1), measured("A\0B"s, 1)}, {limit}));
  ASSERT_EQ(checks.size(), 1U);
  EXPECT_EQ(checks[0].index, 2U);
}

TEST(LimitCheck, TakesPatternsInTheOrderOfTheResults) {
  const DiagnosticRecord record =
      limitedRecord({measured("B.Total", 2), measured("A.Total", 1), measured("A.Rest", 0)},
                    {limitFrom("*.Total >= 2"), limitFrom("Cameras.*:A.* >= 0"), limitFrom("Projector:* >= 9")});
  std::vector<std::string> seen;
  for (const LimitCheck& one : limitChecksOf(record)) {
    seen.push_back(one.result.name() + " " + conditionText(one.limit) + (one.passed ? " pass" : " fail"));
  }
  EXPECT_THAT(seen,
              testing::ElementsAre("B.Total >= 2 pass", "A.Total >= 2 fail", "A.Total >= 0 pass", "A.Rest >= 0 pass"));
}

TEST(LimitCheck, DecidesTheVerdictUnlessItOnlyWarns) {
  const auto verdict = [](const std::vector<UserLimit>& limits) {
    return judgeRecord(limitedRecord({measured("A", 1)}, limits), true).verdict;
  };
  EXPECT_EQ(verdict({limitFrom("A >= 1")}), Verdict::kPass);
  EXPECT_EQ(verdict({limitFrom("A >= 2")}), Verdict::kFail);
  EXPECT_EQ(verdict({limitFrom("A >= 2", LimitSeverity::kWarn)}), Verdict::kPass);
  EXPECT_EQ(verdict({limitFrom("A >= 2 ms", LimitSeverity::kWarn)}), Verdict::kPass);
  EXPECT_EQ(verdict({limitFrom("A >= 2"), limitFrom("A >= 2 ms")}), Verdict::kError);
}

int severityRank(Verdict verdict) {
  if (verdict == Verdict::kPass) return 0;
  return verdict == Verdict::kFail ? 1 : 2;
}

// Whatever the limits, a verdict is never better than without them.
TEST(LimitCheck, OnlyMakesVerdictsStricter) {
  std::mt19937 random(7);
  constexpr const char* kLimits[] = {"A >= 3", "B < 3 ms", "* == 2 +- 1", "A > B", "B == C", "D > 1", "A in [0, 9]"};
  for (int i = 0; i < 2'000; ++i) {
    std::vector<QZMeasuredResult> results;
    for (const char* name : {"A", "B", "C"}) {
      if (random() % 4 == 0) continue;
      QZMeasuredResult result = measured(
          name, random() % 8 == 0 ? std::numeric_limits<double>::infinity() : static_cast<double>(random() % 6));
      if (random() % 2 == 0) {
        QZLimit limit("own");
        limit.setLowerBound(std::make_shared<QZBound>(
            Measurement(static_cast<double>(random() % 6), QZUnit::unitWithSymbol("frames")), false));
        result.setLimit(std::move(limit));
      }
      results.push_back(std::move(result));
    }
    std::vector<UserLimit> limits;
    for (const char* text : kLimits) {
      if (random() % 2 == 0) {
        limits.push_back(limitFrom(text, random() % 2 == 0 ? LimitSeverity::kFail : LimitSeverity::kWarn));
      }
    }
    DiagnosticRecord record = limitedRecord(results, limits);
    const Verdict with = judgeRecord(record, true).verdict;
    record.limits.clear();
    const Verdict without = judgeRecord(record, true).verdict;
    ASSERT_GE(severityRank(with), severityRank(without)) << i;
  }
}

TEST(LimitWithoutResult, IsFoundAmongAllDiagnostics) {
  DiagnosticRecord passed = limitedRecord({measured("A", 1)}, {});
  DiagnosticRecord failed;
  failed.name = "Projector";
  failed.error = hostError(HostErrorCode::kCrashed, "it crashed");
  const auto without = [](const char* text, bool onlyIfSelected, const std::vector<DiagnosticRecord>& records) {
    UserLimit limit = limitFrom(text);
    limit.onlyIfSelected = onlyIfSelected;
    return !limitsWithoutResult({limit}, records).empty();
  };
  EXPECT_FALSE(without("A > 0", false, {passed}));
  EXPECT_FALSE(without("Cameras.*:A > 0", true, {passed}));
  EXPECT_TRUE(without("X > 0", false, {passed}));
  EXPECT_TRUE(without("Cameras.*:X > 0", true, {passed}));
  EXPECT_TRUE(without("Projector:X > 0", false, {passed}));
  EXPECT_FALSE(without("Projector:X > 0", true, {passed}));          // not selected
  EXPECT_FALSE(without("Projector:X > 0", true, {passed, failed}));  // its diagnostic has no results
  EXPECT_FALSE(without("X > 0", false, {passed, failed}));
  EXPECT_TRUE(without("X > 0", false, {}));
  DiagnosticRecord skipped;
  skipped.name = "Projector";
  skipped.skip = Skip{SkipKind::kNoSuchHardware, "r"};
  EXPECT_TRUE(without("Projector:X > 0", false, {passed, skipped}));
  EXPECT_FALSE(without("Projector:X > 0", true, {passed, skipped}));  // of a profile
  EXPECT_TRUE(without("X > 0", false, {passed, skipped}));            // the other one ran and has no such result
  skipped.skip->kind = SkipKind::kNotReached;
  EXPECT_FALSE(without("X > 0", false, {passed, skipped}));  // something failed before
  // An error that a later attempt replaced excuses nothing.
  std::vector<DiagnosticRecord> attempts = {failed, passed};
  attempts[1].name = "Projector";
  attempts[0].verdict = Verdict::kError;
  attempts[1].verdict = Verdict::kPass;
  attempts[0].trial = {1, 2, 0, 0};
  attempts[1].trial = {2, 2, 0, 0};
  EXPECT_TRUE(without("X > 0", false, attempts));
  EXPECT_FALSE(without("A > 0", false, attempts));
}

TEST(LimitWithoutResult, HasAnErrorThatNamesAPatternThatIsNear) {
  const auto suggestionFor = [](const std::string& limit) {
    DiagnosticRecord record = recordOf("Cameras.Back", Verdict::kPass);
    record.measuredResults.clear();
    for (const char* name : {"BackTele.Total", "BackTele.Offset", "BackWide.Total", "Count"}) {
      record.measuredResults.push_back(
          judgeResult(QZMeasuredResult(name, Measurement(1, QZDimensionlessUnit::frames()))));
    }
    const std::string text = errorOfLimitWithoutResult(limitFrom(limit), {record})->localizedDescription();
    const std::size_t end = text.find("; did you mean ");
    return end == std::string::npos ? std::string() : text.substr(end);
  };
  EXPECT_EQ(suggestionFor("*.Totals > 0"), "; did you mean '*.Total'?");
  EXPECT_EQ(suggestionFor("Totals > 0"), "; did you mean '*.Total'?");
  EXPECT_EQ(suggestionFor("BackTeel.* > 0"), "; did you mean 'BackTele.*'?");
  EXPECT_EQ(suggestionFor("BackW*.Ofset > 0"), "");  // that would fit nothing either
  EXPECT_EQ(suggestionFor("Counts > 0"), "; did you mean 'Count'?");
  EXPECT_EQ(suggestionFor("*.*.Total > 0"), "");
}

TEST(LimitWithoutResult, HasAnErrorThatNamesWhatIsNear) {
  const std::vector<DiagnosticRecord> records = {limitedRecord({measured("BackTele.Total", 1)}, {})};
  EXPECT_EQ(errorOfLimitWithoutResult(limitFrom("BackTele.Totl > 0"), records)->localizedDescription(),
            "the limit 'BackTele.Totl > 0' (command line) was compared with nothing: no result has the name "
            "'BackTele.Totl'; did you mean 'BackTele.Total'?");
  EXPECT_EQ(errorOfLimitWithoutResult(limitFrom("Cameras.Bakc:A > 0"), records)->localizedDescription(),
            "the limit 'Cameras.Bakc:A > 0' (command line) was compared with nothing: no diagnostic was selected "
            "that has the name 'Cameras.Bakc'; did you mean 'Cameras.Back'?");
}

DiagnosticRecord measuredRecord(const std::string& name, const std::vector<std::string>& results) {
  DiagnosticRecord record;
  record.name = name;
  for (const std::string& one : results) {
    record.measuredResults.push_back(judgeResult(QZMeasuredResult(one, Measurement(1, QZDimensionlessUnit::frames()))));
  }
  return record;
}

TEST(AreOnSameResults, ComparesTheResultsOfTheRecordsAndNotTheWords) {
  const std::vector<DiagnosticRecord> records = {measuredRecord("D", {"A.Total", "A.Offset"}),
                                                 measuredRecord("E", {"A.Total"})};
  const auto areSame = [&records](const char* one, const char* other) {
    return areOnSameResults(parseUserLimit(one), parseUserLimit(other), records);
  };
  EXPECT_TRUE(areSame("A.Total > 1", "*.Total < A.Offset"));
  EXPECT_TRUE(areSame("D:A.Offset > 1", "A.Offset > 1"));
  EXPECT_TRUE(areSame("E:* > 1", "E:A.Total > 1"));
  EXPECT_FALSE(areSame("D:A.Total > 1", "A.Total > 1"));
  EXPECT_FALSE(areSame("D:* > 1", "D:A.Total > 1"));
  EXPECT_FALSE(areSame("A.Offset > A.Total", "A.Total > 1"));
  // What no result of the records has.
  EXPECT_TRUE(areSame("F:B > 1", "F:B > 2"));
  EXPECT_FALSE(areSame("F:B > 1", "F:C > 1"));
}

}  // namespace
}  // namespace quazor
