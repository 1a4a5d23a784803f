// The limits of the user in every report.
#include "host/error/host_error.h"
#include "host/model/judge.h"
#include "host/report/record_difference.h"
#include "host/report/report_format.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <string>
#include <string_view>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

UserLimit limitFrom(std::string_view text, LimitSeverity severity) {
  UserLimit limit = parseUserLimit(text);
  limit.severity = severity;
  limit.source = "command line";
  return limit;
}

// A passed diagnostic with the limits: one passes, one fails, and one is a warning.
DiagnosticRecord limitedRecord() {
  DiagnosticRecord record = recordOf("Good", Verdict::kPass);
  record.limits = {limitFrom("Count >= 80", LimitSeverity::kFail), limitFrom("Count == 80 +- 2", LimitSeverity::kFail),
                   limitFrom("Count < Offset", LimitSeverity::kWarn)};
  record.limits[0].name = "many";
  record.verdict = judgeRecord(record, true).verdict;
  return record;
}

std::string reportOf(Format format, const DiagnosticRecord& record) {
  RunStarted run;
  run.names = {record.name};
  return reportText(format, run, {record}, std::nullopt);
}

// The line of a report with that text.
std::string lineWith(const std::string& report, std::string_view text) {
  const std::size_t found = report.find(text);
  if (found == std::string::npos) return {};
  const std::size_t begin = report.rfind('\n', found) + 1;
  return report.substr(begin, report.find('\n', found) - begin);
}

TEST(LimitsInReports, StandBelowTheResultInTheText) {
  const std::string text = reportOf(Format::kText, limitedRecord());
  EXPECT_THAT(lineWith(text, "many: "), HasSubstr("frames  many: Count >= 80 (command line)"));
  EXPECT_THAT(lineWith(text, "many: "), testing::EndsWith("  pass"));
  EXPECT_THAT(lineWith(text, "+- 2"), testing::EndsWith("  fail"));
  EXPECT_THAT(lineWith(text, "Count < Offset"), testing::EndsWith("  warn"));
  EXPECT_THAT(text, testing::StartsWith("FAIL  Good  2 results, 1 with a limit, 1 failed, 1 warning\n"));
  RunStarted run;
  const std::string two = reportText(Format::kText, run, {limitedRecord(), limitedRecord()}, std::nullopt);
  EXPECT_THAT(two, HasSubstr("2 diagnostics: 0 passed, 2 failed, 0 ended in an error, 2 warnings\n"));
}

TEST(LimitsInReports, AreInTheJsonOfTheResult) {
  const auto document = nlohmann::ordered_json::parse(reportOf(Format::kJson, limitedRecord()));
  const auto& results = document["diagnostics"][0]["measuredResults"];
  EXPECT_EQ(document["diagnostics"][0]["verdict"], "fail");
  EXPECT_EQ(results[0]["verdict"], "pass");
  EXPECT_EQ(results[0]["userLimits"][0].dump(),
            R"({"limit":"Count >= 80","name":"many","severity":"fail","source":"command line","verdict":"pass"})");
  EXPECT_EQ(results[0]["userLimits"][1]["verdict"], "fail");
  EXPECT_EQ(results[0]["userLimits"][2]["verdict"], "warn");
  EXPECT_EQ(results[0]["userLimits"][2]["problem"],
            "the result Count cannot be compared with the limit 'Count < Offset': the limit is in 'events' but the "
            "value is in 'frames'");
  EXPECT_FALSE(results[1].contains("userLimits"));
}

TEST(LimitsInReports, HaveLinesInTheCsv) {
  const std::string csv = reportOf(Format::kCsv, limitedRecord());
  EXPECT_THAT(csv, HasSubstr("\nGood,fail,Count,90,frames,many: Count >= 80 (command line),80,0,,,fail,pass,"));
  EXPECT_THAT(csv, HasSubstr("\nGood,fail,Count,90,frames,Count == 80 +- 2 (command line),78,0,82,0,fail,fail,"));
  EXPECT_THAT(csv, HasSubstr("\nGood,fail,Count,90,frames,Count < Offset (command line),,,,,warn,warn,"));
}

TEST(LimitsInReports, AreTestCasesOfJUnit) {
  const std::string xml = reportOf(Format::kJunit, limitedRecord());
  EXPECT_THAT(xml, HasSubstr("name=\"Count: many: Count &gt;= 80 (command line)\""));
  EXPECT_THAT(lineWith(xml, "<failure "), HasSubstr("Count is 90 frames, limit Count == 80 +- 2 (command line)"));
  EXPECT_THAT(xml, HasSubstr("<property name=\"verdict\" value=\"warn\"/>"));
  EXPECT_THAT(lineWith(xml, "<testsuite "), HasSubstr("tests=\"5\" failures=\"1\" errors=\"0\""));
}

TEST(LimitsInReports, AreValidatorsAndDiagnosesOfOcp) {
  const std::string ocp = reportOf(Format::kOcp, limitedRecord());
  EXPECT_THAT(
      lineWith(ocp, "\"measurement\":{\"name\":\"Count\""),
      HasSubstr(R"json("name":"Count == 80 +- 2 (command line)","type":"LESS_THAN_OR_EQUAL","value":82.0)json"));
  EXPECT_THAT(lineWith(ocp, "Count-limit-fail"), HasSubstr(R"("type":"FAIL")"));
  EXPECT_THAT(lineWith(ocp, "Count-limit-pass"), HasSubstr(R"("type":"PASS")"));
  EXPECT_THAT(lineWith(ocp, "\"WARNING\""), HasSubstr("Count is 90 frames, limit Count < Offset (command line)"));
}

TEST(LimitsInReports, StandInTheCommandThatRepeatsTheRun) {
  const std::string ocp = reportOf(Format::kOcp, limitedRecord());
  // A warning would become a failure there.
  EXPECT_THAT(ocp, HasSubstr("--limit 'Count >= 80' --limit 'Count == 80 +- 2'\""));
  RunStarted run;
  run.names = {"Good"};
  DiagnosticRecord without;
  without.name = "Cuont > 1";
  without.error = hostError(HostErrorCode::kLimitWithoutResult, "it fits nothing");
  EXPECT_THAT(reportText(Format::kOcp, run, {without}, std::nullopt),
              HasSubstr("\"quazor run Good --seed 0 --profile none --limit 'Cuont > 1'\""));
}

TEST(LimitsInReports, AreErrorsWhereTheyCannotBeCompared) {
  DiagnosticRecord record = limitedRecord();
  record.limits = {limitFrom("Count > Offset", LimitSeverity::kFail)};
  const RecordJudgement judged = judgeRecord(record, true);
  record.verdict = judged.verdict;
  record.error = judged.error;
  EXPECT_THAT(lineWith(reportOf(Format::kJunit, record), "<error "), HasSubstr("the limit is in 'events'"));
  const std::string ocp = reportOf(Format::kOcp, record);
  EXPECT_THAT(lineWith(ocp, "Count-limit-unknown"), HasSubstr(R"("type":"UNKNOWN")"));
  EXPECT_THAT(ocp, Not(HasSubstr("Count > Offset (command line)\",\"type\"")));
}

TEST(LimitsInReports, HaveTheirSeverityWhenTheyPass) {
  DiagnosticRecord record = limitedRecord();
  record.limits = {limitFrom("Count >= 80", LimitSeverity::kFail), limitFrom("Count <= 99", LimitSeverity::kWarn)};
  record.verdict = judgeRecord(record, true).verdict;
  RunStarted run;
  const std::string text = reportText(Format::kText, run, {record}, std::nullopt, {.verbose = true});
  EXPECT_THAT(lineWith(text, "Result "), testing::EndsWith("Severity  Verdict"));
  EXPECT_THAT(lineWith(text, "Count >= 80"), testing::EndsWith("  fail      pass"));
  EXPECT_THAT(lineWith(text, "Count <= 99"), testing::EndsWith("  warn      pass"));
  EXPECT_THAT(lineWith(text, "Offset"), testing::EndsWith("  -         -"));
  const std::string csv = reportOf(Format::kCsv, record);
  EXPECT_THAT(csv, HasSubstr("Count <= 99 (command line),,,99,0,warn,pass,"));
  EXPECT_THAT(reportOf(Format::kJunit, record), HasSubstr("<property name=\"severity\" value=\"warn\"/>"));
  EXPECT_THAT(
      lineWith(reportOf(Format::kOcp, record), "\"measurement\":{\"name\":\"Count\""),
      HasSubstr(R"({"limit":"Count <= 99","name":"","severity":"warn","source":"command line","verdict":"pass"})"));
}

TEST(LimitsInReports, AreSkippedOnAResultThatIsAnErrorByItsOwn) {
  DiagnosticRecord record = limitedRecord();
  record.limits = {limitFrom("Count >= 80", LimitSeverity::kFail), limitFrom("Count <= 99", LimitSeverity::kWarn)};
  QZMeasuredResult broken("Count",
                          Measurement(std::numeric_limits<double>::quiet_NaN(), QZDimensionlessUnit::frames()));
  broken.setLimit(*record.measuredResults[0].result.limit());
  record.measuredResults[0] = judgeResult(broken);
  const RecordJudgement judged = judgeRecord(record, true);
  record.verdict = judged.verdict;
  record.error = judged.error;
  EXPECT_EQ(record.verdict, Verdict::kError);
  const std::string xml = reportOf(Format::kJunit, record);
  EXPECT_THAT(lineWith(xml, "<testsuite "), HasSubstr("errors=\"1\" skipped=\"2\""));
  EXPECT_THAT(lineWith(xml, "<skipped "),
              HasSubstr("the result Count was not compared with the limit 'Count &gt;= 80': "
                        "it cannot be judged by its own limit"));
  const std::string csv = reportOf(Format::kCsv, record);
  EXPECT_THAT(csv, HasSubstr("Count >= 80 (command line),80,0,,,fail,skip,"));
  EXPECT_THAT(csv, HasSubstr("Count <= 99 (command line),,,99,0,warn,skip,"));
  EXPECT_THAT(reportOf(Format::kJson, record), HasSubstr("\"verdict\": \"skip\""));
  const std::string ocp = reportOf(Format::kOcp, record);
  EXPECT_THAT(lineWith(ocp, "Count-limit-unknown"), HasSubstr(R"("type":"UNKNOWN")"));
  EXPECT_THAT(ocp, Not(HasSubstr("\"WARNING\"")));
  EXPECT_THAT(reportOf(Format::kText, record), Not(HasSubstr("warning")));
}

TEST(LimitsInReports, AreComparedByDiff) {
  RecordedRun before;
  before.records = {limitedRecord()};
  RecordedRun after = before;
  after.records[0].limits[0] = limitFrom("Count >= 99", LimitSeverity::kFail);
  EXPECT_THAT(differencesOf(before, after),
              testing::ElementsAre("Good: limit 'Count >= 80' of Count is only in the first: pass",
                                   "Good: limit 'Count >= 99' of Count is only in the second: fail"));
}

}  // namespace
}  // namespace quazor
