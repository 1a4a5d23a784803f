#include "host/model/trials.h"

#include "host/error/host_error.h"
#include "host/model/limit_check.h"
#include "host/testing/test_records.h"

#include <gtest/gtest.h>

#include <set>

namespace quazor {
namespace {

DiagnosticRecord entry(Verdict verdict, std::uint64_t attempt, std::uint64_t repetition = 0) {
  DiagnosticRecord record = recordOf("A", verdict);
  record.trial = {attempt, 3, repetition, 3};
  return record;
}

TEST(SeedOf, IsThatOfTheRunForTheFirstAndAnotherForEachOther) {
  EXPECT_EQ(seedOf(7, 0, 0), 7U);
  EXPECT_EQ(seedOf(7, 1, 1), 7U);
  std::set<std::uint64_t> seeds;
  std::size_t count = 0;
  for (const std::uint64_t seed : {std::uint64_t{0}, std::uint64_t{1}, UINT64_MAX}) {
    for (std::uint64_t repetition = 1; repetition <= 100; ++repetition) {
      for (std::uint64_t attempt = 1; attempt <= 100; ++attempt, ++count) {
        const std::uint64_t derived = seedOf(seed, repetition, attempt);
        seeds.insert(derived);
        if (attempt > 1 || repetition > 1) {
          EXPECT_LT(derived, std::uint64_t{1} << 53);
        }
      }
    }
  }
  EXPECT_EQ(seeds.size(), count);
}

TEST(MayTryAgain, OnlyAfterAnErrorThatMayGoAway) {
  DiagnosticRecord record = entry(Verdict::kError, 1);
  record.errorStage = Stage::kRun;
  EXPECT_TRUE(mayTryAgain(record));
  for (const Verdict verdict : {Verdict::kPass, Verdict::kFail, Verdict::kSkip}) {
    EXPECT_FALSE(mayTryAgain(entry(verdict, 1)));
  }
  record.error = hostError(HostErrorCode::kCrashed, "m");
  EXPECT_TRUE(mayTryAgain(record));
  record.error = hostError(HostErrorCode::kInterrupted, "m");
  EXPECT_FALSE(mayTryAgain(record));
  record.error = hostError(HostErrorCode::kNotRecorded, "m");
  EXPECT_FALSE(mayTryAgain(record));
  record.error = errorWithMessage("D", static_cast<std::int64_t>(HostErrorCode::kInterrupted), "a plug-in's", nullptr);
  EXPECT_TRUE(mayTryAgain(record));
  record.errorStage = Stage::kDescribe;  // before any stage: there is nothing to run
  EXPECT_FALSE(mayTryAgain(record));
  record.stages.push_back({Stage::kDescribe, {}, {}});
  EXPECT_TRUE(mayTryAgain(record));
}

// A failed teardown, for example, does not take back what was measured.
TEST(Attempts, EndWithAFailedResultWhateverElseWentWrong) {
  for (const bool ofUser : {false, true}) {
    DiagnosticRecord record = entry(Verdict::kError, 1);
    record.error = hostError(HostErrorCode::kCrashed, "m");
    record.errorStage = Stage::kTeardown;
    record.measuredResults = judgeResults({resultWithMinimum(ofUser ? 95 : 80, 90)});
    if (ofUser) record.limits = {parseUserLimit("Count >= 99")};
    EXPECT_TRUE(hasFailedResult(record));
    EXPECT_FALSE(mayTryAgain(record));
    const std::vector<DiagnosticRecord> records = {record, entry(Verdict::kPass, 2)};
    EXPECT_FALSE(isSuperseded(records, 0));
    EXPECT_EQ(runVerdictOf(records, true), Verdict::kError);
    if (ofUser) record.limits.front().severity = LimitSeverity::kWarn;
    EXPECT_EQ(mayTryAgain(record), ofUser) << "a warning is no failure";
  }
}

TEST(IsSuperseded, OnlyByALaterAttemptOfTheSameRepetition) {
  const auto first = [](const std::vector<DiagnosticRecord>& records) { return isSuperseded(records, 0); };
  EXPECT_TRUE(first({entry(Verdict::kError, 1), entry(Verdict::kPass, 2)}));
  EXPECT_TRUE(first({entry(Verdict::kError, 1), entry(Verdict::kError, 2), entry(Verdict::kFail, 3)}));
  EXPECT_FALSE(first({entry(Verdict::kError, 1), entry(Verdict::kSkip, 2)}));
  EXPECT_FALSE(first({entry(Verdict::kError, 1, 1), entry(Verdict::kPass, 1, 2)}));
  EXPECT_FALSE(first({entry(Verdict::kError, 1, 1), entry(Verdict::kPass, 2, 2)}));
  EXPECT_FALSE(first({entry(Verdict::kError, 2), entry(Verdict::kPass, 1)}));
  EXPECT_FALSE(first({entry(Verdict::kError, 0), entry(Verdict::kPass, 2)}));
  EXPECT_FALSE(first({entry(Verdict::kFail, 1), entry(Verdict::kPass, 2)}));
  std::vector<DiagnosticRecord> others = {entry(Verdict::kError, 1), entry(Verdict::kPass, 2)};
  others[1].name = "B";
  EXPECT_FALSE(first(others));
}

TEST(TrialSuffix, SaysNothingOfTheFirst) {
  EXPECT_EQ(trialSuffix(entry(Verdict::kPass, 0)), "");
  EXPECT_EQ(trialSuffix(entry(Verdict::kPass, 1, 1)), "");
  EXPECT_EQ(trialSuffix(entry(Verdict::kPass, 2)), " (attempt 2)");
  EXPECT_EQ(trialSuffix(entry(Verdict::kPass, 1, 3)), " (repetition 3)");
  EXPECT_EQ(trialSuffix(entry(Verdict::kPass, 2, 1)), " (repetition 1, attempt 2)");
}

}  // namespace
}  // namespace quazor
