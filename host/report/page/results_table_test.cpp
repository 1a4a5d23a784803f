#include "host/report/page/results_table.h"

#include "host/limits/user_limit.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

UserLimit limitOf(const std::string& text, const std::string& source) {
  UserLimit limit = parseUserLimit(text);
  limit.source = source;
  return limit;
}

QZMeasuredResult namedResult(const std::string& name, double value) {
  return QZMeasuredResult(name, Measurement(value, QZDimensionlessUnit::frames()));
}

QZMeasuredResult limitedResult(const std::string& name, double value, double minimum) {
  QZMeasuredResult result = namedResult(name, value);
  result.setLimit(*resultWithMinimum(value, minimum).limit());
  return result;
}

TEST(ResultsTable, HasFailuresFirst) {
  DiagnosticRecord record = recordOf("A", Verdict::kFail);
  record.limits = {limitOf("Warned > 5", "command line")};
  record.limits[0].severity = LimitSeverity::kWarn;
  record.measuredResults =
      judgeResults({namedResult("Free", 1), limitedResult("Good", 90, 90), namedResult("Warned", 2),
                    limitedResult("Bad", 89, 90), limitedResult("Nan", std::numeric_limits<double>::quiet_NaN(), 90),
                    limitedResult("Worse", 2, 90), limitedResult("Fine", 91, 90)});
  const std::string table = resultsTable(record);
  std::size_t last = 0;
  for (const char* name : {"Bad", "Worse", "Nan", "Warned", "Good", "Fine", "Free"}) {
    const std::size_t at = table.find(std::string(">") + name + "</th>");
    ASSERT_NE(at, std::string::npos) << name;
    EXPECT_GT(at, last) << name;
    last = at;
  }
}

TEST(ResultsTable, HasAllLimitsOfAResultInOneGroup) {
  DiagnosticRecord record = recordOf("A", Verdict::kFail);
  record.limits = {limitOf("Count >= 95", "profile strict.json")};
  record.measuredResults = judgeResults({limitedResult("Count", 90, 90)});
  const std::string table = resultsTable(record);
  EXPECT_THAT(table, HasSubstr("<th scope=\"row\" rowspan=\"2\">Count</th><td class=\"number\" rowspan=\"2\">90</td>"
                               "<td rowspan=\"2\">frames</td><td><span class=\"badge pass\">"));
  EXPECT_THAT(table, HasSubstr("<td>Enough: &gt;= 90</td><td class=\"soft\">the plug-in</td>"));
  EXPECT_THAT(table, HasSubstr("<tr class=\"bad\"><td><span class=\"badge fail\">"));
  EXPECT_THAT(table,
              HasSubstr("<small>5 below the limit</small></td><td>Count &gt;= 95</td><td>profile strict.json</td>"));
  EXPECT_THAT(failureSentences(record),
              testing::ElementsAre("<strong>Count</strong> is <strong>90 frames</strong>, <strong>5 below the "
                                   "limit</strong> (Count &gt;= 95 (profile strict.json)). The plug-in's own limit is "
                                   "met (Enough: &gt;= 90)."));
}

TEST(ResultsTable, HasNoRowForALimitThatIsNotThere) {
  DiagnosticRecord record = recordOf("A", Verdict::kPass);
  record.limits = {limitOf("Count >= 5", "command line")};
  record.measuredResults = judgeResults({namedResult("Count", 90)});
  EXPECT_THAT(resultsTable(record), Not(HasSubstr("rowspan")));
}

TEST(ResultsTable, HasNoColumnOfBarsWithoutABar) {
  DiagnosticRecord record = recordOf("A", Verdict::kPass);
  record.measuredResults = judgeResults({namedResult("Count", 90)});
  EXPECT_THAT(resultsTable(record), Not(HasSubstr("In the limit")));
}

TEST(ResultsTable, ShowsADifferenceFromAnotherResult) {
  DiagnosticRecord record = recordOf("A", Verdict::kFail);
  record.limits = {limitOf("A <= B", "command line")};
  record.measuredResults = judgeResults({namedResult("A", 30.000000006741573), namedResult("B", 30.00000000674157)});
  EXPECT_THAT(resultsTable(record), HasSubstr(">30.000000006741573</td>"));
  EXPECT_THAT(resultsTable(record), HasSubstr(">30.00000000674157</td>"));
}

}  // namespace
}  // namespace quazor
