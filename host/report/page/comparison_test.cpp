#include "host/report/page/comparison.h"

#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

RecordedRun runWith(std::vector<DiagnosticRecord> records, std::int64_t secondFrame) {
  RecordedRun run;
  run.began = startedRun();
  run.began.traced = true;
  run.records = std::move(records);
  run.ended.emplace();
  for (std::size_t i = 0; i < run.records.size(); ++i) {
    run.streams.push_back({{"wide", {{0, 0, 0, {}}, {1, secondFrame, secondFrame, {}}}, 0}});
  }
  return run;
}

TEST(ComparisonPage, HasBothValuesOfWhatDiffers) {
  const RecordedRun before = runWith({recordOf("A", Verdict::kPass), recordOf("<Old>", Verdict::kPass)}, 33'000'000);
  const RecordedRun after = runWith({recordOf("A", Verdict::kFail)}, 66'000'000);
  const std::string page = comparisonPage({before, "a.jsonl"}, {after, "b.jsonl"}, true);
  EXPECT_THAT(page, HasSubstr("<span class=\"word\">DIFFERENT</span>"));
  EXPECT_THAT(page, HasSubstr("<td>verdict</td><td class=\"line\">pass</td><td class=\"line\">fail</td>"));
  EXPECT_THAT(page, HasSubstr("<th scope=\"row\">&lt;Old&gt;</th><td>the diagnostic</td><td class=\"line\">there</td>"
                              "<td><em>not there</em></td>"));
  EXPECT_THAT(page,
              HasSubstr("<td>stream wide: frame 2, the first that differs</td><td class=\"line\">number 1, captured "
                        "at 33000000 ns"));
  EXPECT_THAT(page, HasSubstr("<h3>A: stream wide</h3>"));
  EXPECT_THAT(page, HasSubstr("First: 2 frames. No frame number is missing. Second: 2 frames."));
  EXPECT_THAT(comparisonPage({before, ""}, {after, ""}, false), Not(HasSubstr("<h3>A: stream wide</h3>")));
}

TEST(ComparisonPage, RoundsNumbersButNotTheirDifference) {
  const auto pageWith = [](double before, double after) {
    std::vector<RecordedRun> runs;
    for (const double value : {before, after}) {
      DiagnosticRecord record = recordOf("A", Verdict::kPass);
      record.measuredResults = judgeResults({resultWithMinimum(value, 90)});
      runs.push_back(runWith({record}, 33'000'000));
    }
    return comparisonPage({runs[0], "a.jsonl"}, {runs[1], "b.jsonl"}, true);
  };
  EXPECT_THAT(pageWith(95.123456789, 96),
              HasSubstr("<td class=\"line\" title=\"95.123456789 frames, Enough: &gt;= 90, pass\">95.1235 frames, "
                        "Enough: &gt;= 90, pass</td><td class=\"line\">96 frames, Enough: &gt;= 90, pass</td>"));
  EXPECT_THAT(pageWith(95.123456789, 95.123456788),
              HasSubstr("<td class=\"line\">95.123456789 frames, Enough: &gt;= 90, pass</td>"));
  EXPECT_THAT(pageWith(89.99999999, 96), HasSubstr(">89.99999999 frames, Enough: &gt;= 90, fail</td>"));
}

TEST(ComparisonPage, SaysThatNothingDiffers) {
  const RecordedRun run = runWith({recordOf("A", Verdict::kPass)}, 33'000'000);
  const std::string page = comparisonPage({run, "a.jsonl"}, {run, "a.jsonl"}, true);
  EXPECT_THAT(page, HasSubstr("<span class=\"sentence\">The records do not differ"));
  EXPECT_THAT(page, Not(HasSubstr("What differs")));
}

}  // namespace
}  // namespace quazor
