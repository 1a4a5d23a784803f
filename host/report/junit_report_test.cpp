#include "host/report/junit_report.h"

#include "host/error/host_error.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::AllOf;
using testing::HasSubstr;
using testing::Not;

DiagnosticRecord record(Verdict verdict) {
  DiagnosticRecord record = recordOf("Diagnostic", verdict);
  record.end = record.begin + 3s;
  return record;
}

std::string reportOf(const DiagnosticRecord& record) { return junitReport(startedRun(), {record}, std::nullopt); }

TEST(JUnitReport, HasASuiteForEachRecordAndACaseForEachResult) {
  EXPECT_EQ(reportOf(record(Verdict::kPass)),
            R"(<?xml version="1.0" encoding="UTF-8"?>
<testsuites name="quazor" tests="2" failures="0" errors="0" skipped="0" time="3.000" timestamp="1970-01-01T00:00:00.000000000Z">
  <testsuite name="Diagnostic" tests="2" failures="0" errors="0" skipped="0" time="3.000" timestamp="1970-01-01T00:00:00.000000000Z">
    <properties>
      <property name="verdict" value="pass"/>
      <property name="summary" value="Its summary."/>
      <property name="seed" value="7"/>
      <property name="parameter.experiment.duration" value="3"/>
      <property name="source.experiment.duration" value="command line"/>
      <property name="program" value="0.1.0"/>
      <property name="contract" value="2"/>
      <property name="plugin" value="p.so"/>
      <property name="phone" value="phone.json"/>
      <property name="run.verdict" value="pass"/>
      <property name="run.exitCode" value="0"/>
    </properties>
    <testcase classname="Diagnostic" name="Count">
      <properties>
        <property name="verdict" value="pass"/>
        <property name="value" value="90"/>
        <property name="unit" value="frames"/>
        <property name="limit" value="Enough"/>
        <property name="lower" value="90"/>
        <property name="lowerOpen" value="false"/>
      </properties>
    </testcase>
    <testcase classname="Diagnostic" name="Offset">
      <properties>
        <property name="verdict" value="none"/>
        <property name="value" value="0.5"/>
        <property name="unit" value="events"/>
      </properties>
    </testcase>
    <system-out>1970-01-01T00:00:00.000000000Z error a line
</system-out>
  </testsuite>
</testsuites>
)");
}

TEST(JUnitReport, HasAFailureForAResultOutsideItsLimit) {
  EXPECT_THAT(reportOf(record(Verdict::kFail)),
              AllOf(HasSubstr("<testsuites name=\"quazor\" tests=\"2\" failures=\"1\" errors=\"0\" skipped=\"0\""),
                    HasSubstr("<failure message=\"Count is 89 frames, limit Enough: &gt;= 90\" "
                              "type=\"outside-limit\"/>"),
                    Not(HasSubstr("<error"))));
}

TEST(JUnitReport, HasACaseForTheErrorOfAStage) {
  DiagnosticRecord failed = record(Verdict::kError);
  failed.measuredResults.clear();
  failed.errorStage = Stage::kSetup;
  EXPECT_THAT(reportOf(failed),
              AllOf(HasSubstr("<testsuite name=\"Diagnostic\" tests=\"1\" failures=\"0\" errors=\"1\" skipped=\"0\""),
                    HasSubstr("    <testcase classname=\"Diagnostic\" name=\"setup\">\n"
                              "      <error message=\"it failed\" type=\"Domain:-1\">Domain code -1: it failed\n"
                              "caused by Deep code 2: the cause\n</error>\n")));
}

TEST(JUnitReport, HasOneErrorForAResultThatCannotBeJudged) {
  DiagnosticRecord one = record(Verdict::kPass);
  one.measuredResults = judgeResults({resultWithMinimum(std::numeric_limits<double>::quiet_NaN(), 90)});
  const RecordJudgement judged = judgeRecord(one, true);
  one.verdict = judged.verdict;
  one.error = judged.error;
  EXPECT_THAT(reportOf(one), AllOf(HasSubstr("tests=\"1\" failures=\"0\" errors=\"1\""),
                                   HasSubstr("<property name=\"verdict\" value=\"error\"/>"),
                                   HasSubstr("<error message=\"the result Count cannot be judged: its value is nan\" "
                                             "type=\"QuazorHostErrorDomain:5\">")));
}

TEST(JUnitReport, HasACaseForAnErrorWithoutStage) {
  DiagnosticRecord one = record(Verdict::kError);
  EXPECT_THAT(reportOf(one), HasSubstr("name=\"analyze\">\n      <error "));
  one.error = hostError(HostErrorCode::kNotRecorded, "the disk is full");
  EXPECT_THAT(reportOf(one), HasSubstr("name=\"record\">\n      <error "));
}

TEST(JUnitReport, CallsAResultThatCannotBeJudgedAnError) {
  DiagnosticRecord unjudged = record(Verdict::kError);
  unjudged.measuredResults = {judgeResult(resultWithMinimum(std::numeric_limits<double>::quiet_NaN(), 1))};
  EXPECT_THAT(reportOf(unjudged),
              AllOf(HasSubstr("tests=\"2\" failures=\"0\" errors=\"2\""),
                    HasSubstr("<error message=\"the result Count cannot be judged: its value is nan\" "
                              "type=\"QuazorHostErrorDomain:5\">")));
}

TEST(JUnitReport, HasBothBoundsOfALimit) {
  DiagnosticRecord passed = record(Verdict::kPass);
  passed.measuredResults = {resultWithMaximum(2, 2.5)};
  EXPECT_THAT(reportOf(passed), AllOf(HasSubstr("<property name=\"upper\" value=\"2.5\"/>\n"
                                                "        <property name=\"upperOpen\" value=\"true\"/>"),
                                      Not(HasSubstr("name=\"lower"))));
}

TEST(JUnitReport, HasTheParametersOfTheAnalysisToo) {
  DiagnosticRecord passed = record(Verdict::kPass);
  passed.parameters.analysis.push_back({"gain", QZNumberParameter("", true), Value(0.5), "a & b"});
  EXPECT_THAT(reportOf(passed), AllOf(HasSubstr("<property name=\"parameter.analysis.gain\" value=\"0.5\"/>"),
                                      HasSubstr("<property name=\"source.analysis.gain\" value=\"a &amp; b\"/>")));
}

TEST(JUnitReport, HasACaseForTheResultOfAnExperiment) {
  DiagnosticRecord experiment = record(Verdict::kPass);
  experiment.experimentOnly = true;
  experiment.measuredResults.clear();
  EXPECT_THAT(reportOf(experiment),
              AllOf(HasSubstr("tests=\"1\" failures=\"0\" errors=\"0\" skipped=\"0\""),
                    HasSubstr("<testcase classname=\"Diagnostic\" name=\"result\">\n      <properties>\n"
                              "        <property name=\"measurement.Raw\" value=\"90 frames\"/>\n")));
  DiagnosticRecord failed = record(Verdict::kError);
  failed.experimentOnly = true;
  failed.measuredResults.clear();
  EXPECT_THAT(reportOf(failed),
              AllOf(HasSubstr("tests=\"1\" failures=\"0\" errors=\"1\""), Not(HasSubstr("name=\"result\""))));
}

TEST(JUnitReport, AddsTheSuitesUp) {
  EXPECT_THAT(junitReport(startedRun(), {record(Verdict::kPass), record(Verdict::kFail), record(Verdict::kError)}, {}),
              HasSubstr("<testsuites name=\"quazor\" tests=\"7\" failures=\"1\" errors=\"1\" skipped=\"0\" "
                        "time=\"9.000\""));
}

TEST(JUnitReport, TellsWhatWasInterruptedAndWhatNeverRan) {
  RunStarted three = startedRun();
  three.names = {"Diagnostic", "Second", "Third"};
  const std::string report = junitReport(three, {record(Verdict::kPass)}, "Second");
  EXPECT_THAT(
      report,
      AllOf(HasSubstr("tests=\"4\" failures=\"0\" errors=\"1\" skipped=\"1\""),
            HasSubstr("<testsuite name=\"Second\" tests=\"1\" failures=\"0\" errors=\"1\" skipped=\"0\" "
                      "time=\"0.000\" timestamp=\"1970-01-01T00:00:03.000000000Z\">\n"
                      "    <properties>\n      <property name=\"seed\" value=\"5\"/>\n"),
            HasSubstr("name=\"interrupted\">\n      <error message=\"Second was interrupted\" "
                      "type=\"QuazorHostErrorDomain:11\">"),
            HasSubstr("<testsuite name=\"Third\" tests=\"1\" failures=\"0\" errors=\"0\" skipped=\"1\""),
            HasSubstr("name=\"never-run\">\n      <skipped message=\"The run ended before this was started.\"/>")));
}

TEST(JUnitReport, TellsAnInterruptBetweenTwo) {
  EXPECT_THAT(junitReport(startedRun(), {}, ""), AllOf(HasSubstr("<testsuite name=\"quazor\" tests=\"1\""),
                                                       HasSubstr("interrupted while no diagnostic was running")));
  EXPECT_THAT(junitReport(startedRun(), {}, std::nullopt), HasSubstr("<testsuites name=\"quazor\" tests=\"0\""));
}

}  // namespace
}  // namespace quazor
