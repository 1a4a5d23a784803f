// The exit code of every short run, with every permission.
#include "host/model/record_builder.h"
#include "host/report/run_report.h"
#include "host/testing/test_events.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <vector>

namespace quazor {
namespace {

constexpr Verdict kVerdicts[] = {Verdict::kPass, Verdict::kFail, Verdict::kError, Verdict::kSkip};

std::vector<DiagnosticRecord> recordsWith(const std::vector<Verdict>& verdicts) {
  std::vector<DiagnosticRecord> records;
  for (const Verdict verdict : verdicts) {
    records.emplace_back();
    records.back().verdict = verdict;
    if (verdict == Verdict::kSkip) records.back().skip = Skip{SkipKind::kNotAllowed, "r"};
  }
  return records;
}

bool has(const std::vector<Verdict>& verdicts, Verdict wanted) {
  return std::find(verdicts.begin(), verdicts.end(), wanted) != verdicts.end();
}

TEST(ExitCodeOfRun, IsZeroOnlyIfNothingFailedAndSomethingPassed) {
  constexpr std::size_t kLongest = 6;
  std::vector<std::vector<Verdict>> runs = {{}};
  std::size_t passed = 0;
  for (std::size_t at = 0; at < runs.size(); ++at) {
    const std::vector<Verdict> run = runs[at];
    for (const bool allowed : {false, true}) {
      const ExitCode code = exitCodeOf(recordsWith(run), {allowed});
      const bool isGood = run.empty() || (!has(run, Verdict::kFail) && !has(run, Verdict::kError) &&
                                          has(run, Verdict::kPass) && (allowed || !has(run, Verdict::kSkip)));
      ASSERT_EQ(code == ExitCode::kAllPassed, isGood) << at;
      if (has(run, Verdict::kError)) {
        ASSERT_EQ(code, ExitCode::kError) << at;
      } else if (has(run, Verdict::kFail)) {
        ASSERT_EQ(code, ExitCode::kFailed) << at;
      }
      passed += isGood ? 1 : 0;
    }
    if (run.size() == kLongest) continue;
    for (const Verdict verdict : kVerdicts) {
      runs.push_back(run);
      runs.back().push_back(verdict);
    }
  }
  EXPECT_EQ(runs.size(), 5461U);  // 4^0 + ... + 4^6
  EXPECT_GT(passed, 100U);
}

}  // namespace
}  // namespace quazor
