#include "host/model/judge.h"

#include "host/error/host_error.h"
#include "host/model/record_builder.h"
#include "host/record/verification.h"
#include "host/testing/test_events.h"
#include "host/testing/test_oracle.h"
#include "host/testing/test_records.h"
#include "host/testing/test_values.h"
#include "tests/support/effort.h"

#include <gtest/gtest.h>

#include <iostream>
#include <limits>

namespace quazor {
namespace {

DiagnosticErrorPtr someError() { return errorWithMessage("D", 1, "m", nullptr); }

DiagnosticRecord recordWith(const std::vector<QZMeasuredResult>& results, const DiagnosticErrorPtr& error) {
  DiagnosticRecord record;
  record.measuredResults = judgeResults(results);
  record.error = error;
  return record;
}

TEST(JudgeRecord, TellsWhyItIsAnError) {
  const DiagnosticErrorPtr error = someError();
  EXPECT_EQ(judgeRecord(recordWith({resultOf(90)}, error), true).error, error);
  const auto codeOf = [](const std::vector<QZMeasuredResult>& results, bool completed) {
    const RecordJudgement judgement = judgeRecord(recordWith(results, nullptr), completed);
    return judgement.error == nullptr ? 0 : judgement.error->code();
  };
  EXPECT_EQ(codeOf({resultOf(90)}, true), 0);
  EXPECT_EQ(codeOf({resultOf(89)}, true), 0);
  EXPECT_EQ(codeOf({}, true), static_cast<std::int64_t>(HostErrorCode::kNothingMeasured));
  EXPECT_EQ(codeOf({resultOf(kNan)}, true), static_cast<std::int64_t>(HostErrorCode::kCannotBeJudged));
  EXPECT_EQ(codeOf({resultOf(90)}, false), static_cast<std::int64_t>(HostErrorCode::kConnectionLost));
}

TEST(JudgedWith, TakesTheLimitsThatAreForTheRun) {
  DiagnosticRecord record = recordOf("D", Verdict::kPass);
  record.measuredResults = judgeResults({resultWithMinimum(90, 80)});
  const auto judgedBy = [&record](const char* limit) { return judgedWith(record, {parseUserLimit(limit)}); };
  EXPECT_EQ(judgedBy("D:Count > 85").verdict, Verdict::kPass);
  EXPECT_EQ(judgedBy("D:Count > 85").limits.size(), 1U);
  EXPECT_EQ(judgedBy("D:Count > 95").verdict, Verdict::kFail);
  EXPECT_EQ(judgedBy("E:Count > 95").verdict, Verdict::kPass);
  EXPECT_TRUE(judgedBy("E:Count > 95").limits.empty());
  const DiagnosticRecord error = judgedBy("D:Count > 95 seconds");
  EXPECT_EQ(error.verdict, Verdict::kError);
  EXPECT_EQ(error.error->code(), static_cast<std::int64_t>(HostErrorCode::kCannotBeJudged));
  record.error = someError();
  EXPECT_EQ(judgedBy("D:Count > 85").error, record.error);
}

TEST(JudgeRecord, AgreesWithTheOracleOnEveryCombination) {
  const std::vector<QZMeasuredResult> kinds = {resultOf(90), resultOf(89), resultOf(kNan),
                                               QZMeasuredResult("Info", resultOf(kNan).measurement())};
  int rows = 0;
  for (std::size_t length = 0; length <= 3; ++length) {
    for (std::size_t number = 0; number < std::size_t{1} << 2 * length; ++number) {
      std::vector<QZMeasuredResult> results;
      for (std::size_t i = 0; i < length; ++i) results.push_back(kinds[number >> 2 * i & 3]);
      for (int flags = 0; flags < 8; ++flags) {
        const bool hasError = (flags & 1) != 0;
        const bool completed = (flags & 2) != 0;
        DiagnosticRecord record = recordWith(results, hasError ? someError() : nullptr);
        record.experimentOnly = (flags & 4) != 0;
        for (const Verdict stored : {Verdict::kPass, Verdict::kFail, Verdict::kError}) {
          record.verdict = stored;
          const RecordJudgement judgement = judgeRecord(record, completed);
          const Verdict due = !record.experimentOnly   ? oracleVerdict(results, hasError, completed)
                              : completed && !hasError ? Verdict::kPass
                                                       : Verdict::kError;
          ASSERT_EQ(judgement.verdict, due) << length << " " << number << " " << flags;
          ASSERT_EQ(judgement.error != nullptr, due == Verdict::kError) << length << " " << number << " " << flags;
          ++rows;
        }
      }
    }
  }
  EXPECT_EQ(rows, 85 * 8 * 3);
}

// The facts in a sequence of events that determine the verdict.
struct Told {
  std::vector<QZMeasuredResult> results;
  bool hasError = false;
  bool completed = false;
};

class RandomEvents {
 public:
  explicit RandomEvents(std::uint64_t seed) : random_(seed) {}

  // A random sequence of events, as a plug-in's process could send it; it need not make sense.
  std::vector<RunEvent> sequence(Told* told) {
    std::vector<RunEvent> events = {beginningOf("A")};
    for (std::uint64_t i = random_.below(9); i > 0; --i) events.push_back(event(told));
    if (random_.chance(70)) events.push_back(completed(told));
    if (random_.chance(20)) events.push_back(event(told));
    return events;
  }

 private:
  RunEvent event(Told* told) {
    switch (random_.below(16)) {
      case 0: return StageStarted{stage(), momentAt(2)};
      case 1: return StageEnded{stage(), std::nullopt, momentAt(2)};
      case 2: return Logged{{{}, LogLevel::kError, random_.text(), momentAt(3)}};
      case 3: return MeasurementsAdded{{{random_.text(), random_.measurement()}}};
      case 4: return AuxiliaryDataAdded{random_.text(), random_.value(1)};
      case 5: return FaultsCounted{};
      case 6: told->hasError = true; return Failed{stage(), someError()};
      case 7: return random_.chance(20) ? completed(told) : RunEvent(StageStarted{stage(), momentAt(2)});
      default: return found(told);
    }
  }

  RunEvent completed(Told* told) {
    told->completed = true;
    return DiagnosticCompleted{};
  }

  Stage stage() { return kStages[random_.below(std::size(kStages))]; }

  RunEvent found(Told* told) {
    ResultsReported found;
    for (std::uint64_t i = random_.below(3); i > 0; --i) {
      // Chosen to make all verdicts frequent.
      if (random_.chance(10)) {
        found.results.push_back(random_.result());
      } else if (random_.chance(10)) {
        found.results.push_back(resultOf(random_.number()));
      } else {
        found.results.push_back(resultOf(random_.chance(90) ? 90 : 89));
      }
    }
    told->results.insert(told->results.end(), found.results.begin(), found.results.end());
    return found;
  }

  RandomValues random_;
};

TEST(JudgeRecord, AgreesWithTheOracleOnWhateverAPluginTells) {
  const int sequences = roundsOf(20'000);
  RandomEvents random(1);
  int count[3] = {};
  for (int i = 0; i < sequences; ++i) {
    Told told;
    std::vector<RunEvent> events = random.sequence(&told);
    RecordBuilder builder;
    for (const RunEvent& event : events) builder.onEvent(event);
    for (RunEvent& event : builder.ending(momentAt(9))) events.push_back(std::move(event));
    Verdict& verdict = std::get<DiagnosticEnded>(events.back()).verdict;
    ASSERT_EQ(verdict, oracleVerdict(told.results, told.hasError, told.completed)) << i;
    ++count[static_cast<int>(verdict)];

    // Verification accepts this verdict and no other.
    events.insert(events.begin(), runOf({"A"}));
    ASSERT_TRUE(problemsOf(events).empty()) << i << ": " << problemsOf(events)[0];
    Verdict& stored = std::get<DiagnosticEnded>(events.back()).verdict;
    stored = stored == Verdict::kPass ? Verdict::kFail : Verdict::kPass;
    ASSERT_FALSE(problemsOf(events).empty()) << i;
  }
  for (const int one : count) EXPECT_GT(one, sequences / 20);
  std::cout << sequences << " sequences of events: " << count[0] << " pass, " << count[1] << " fail, " << count[2]
            << " error\n";
}

// Wherever it stands, a skip changes no verdict of what was run.
TEST(JudgeRecord, TakesNothingForSkippedThatWasRun) {
  const int sequences = roundsOf(20'000);
  RandomEvents random(2);
  RandomValues places(3);
  int skips = 0;
  for (int i = 0; i < sequences; ++i) {
    Told told;
    std::vector<RunEvent> events = random.sequence(&told);
    const std::size_t place = 1 + places.below(events.size());
    events.insert(events.begin() + static_cast<std::ptrdiff_t>(place), DiagnosticSkipped{{SkipKind::kNotAllowed, "r"}});
    RecordBuilder builder;
    for (const RunEvent& event : events) builder.onEvent(event);
    for (RunEvent& event : builder.ending(momentAt(9))) events.push_back(std::move(event));
    for (const RunEvent& event : events) builder.onEvent(event);
    const Verdict due = oracleVerdict(told.results, told.hasError, told.completed);
    const Verdict verdict = builder.record().verdict;
    ASSERT_EQ(builder.record().skip.has_value(), verdict == Verdict::kSkip) << i;
    events.insert(events.begin(), runOf({"A"}));
    if (verdict == Verdict::kSkip) {
      ASSERT_TRUE(told.results.empty() && !told.hasError && !told.completed) << i;
      ASSERT_TRUE(problemsOf(events).empty()) << i << ": " << problemsOf(events)[0];
      ++skips;
    } else {
      ASSERT_EQ(verdict, due) << i;
    }
  }
  EXPECT_GT(skips, 100);
  EXPECT_LT(skips, sequences / 2);
}

}  // namespace
}  // namespace quazor
