#include "host/report/report_format.h"

#include "host/error/exit_code.h"

#include "host/record/value_json.h"
#include "host/report/json_report.h"
#include "host/report/run_identity.h"
#include "host/report/variation_report.h"
#include "host/testing/test_events.h"
#include "host/testing/test_records.h"
#include "host/testing/test_refusals.h"
#include "host/text/timestamp.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <sstream>

namespace quazor {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::StartsWith;

TEST(Formats, HaveNamesByWhichTheyAreFound) {
  constexpr std::string_view kNames[] = {"text", "json", "csv", "ocp", "junit", "html", "trace"};
  for (std::size_t i = 0; i < std::size(kFormats); ++i) {
    EXPECT_EQ(nameOf(kFormats[i]), kNames[i]);
    EXPECT_EQ(formatNamed(kNames[i]), kFormats[i]);
  }
  for (const char* name : {"", "xml", "JSON", "json "}) EXPECT_EQ(formatNamed(name), std::nullopt) << name;
}

TEST(ParseOutput, RefusesAWordBeforeAColonThatIsNoFormat) {
  EXPECT_EQ(refusalOf(ExitCode::kUsage, [] { parseOutput("jnuit:report", Format::kText); }),
            "--output 'jnuit:report': unknown format 'jnuit' (for a file of this name, write "
            "'./jnuit:report'); did you mean 'junit'? The formats are text, json, csv, ocp, junit, html, trace");
  EXPECT_THAT(refusalOf(ExitCode::kUsage, [] { parseOutput("xml:report", Format::kText); }),
              testing::EndsWith("; the formats are text, json, csv, ocp, junit, html, trace"));
}

TEST(ParseOutput, TakesAFormatBeforeAColon) {
  struct Row {
    const char* text;
    Format format;
    const char* file;
  };
  constexpr Row kRows[] = {
      {"report", Format::kCsv, "report"},
      {"junit:report.xml", Format::kJunit, "report.xml"},
      {"text:a:b", Format::kText, "a:b"},
      {"./xml:report", Format::kCsv, "./xml:report"},
      {"C3:report", Format::kCsv, "C3:report"},
      {"json", Format::kCsv, "json"},
      {"json:", Format::kJson, ""},
      {"trace:run.json", Format::kTrace, "run.json"},
      {"./json:report", Format::kCsv, "./json:report"},
      {":report", Format::kCsv, ":report"},
      {":json", Format::kCsv, ":json"},
      {"./a:json", Format::kCsv, "./a:json"},
      {"text:a:json", Format::kText, "a:json"},
  };
  for (const Row& row : kRows) {
    const OutputRequest request = parseOutput(row.text, Format::kCsv);
    EXPECT_EQ(request.format, row.format) << row.text;
    EXPECT_EQ(request.file, row.file) << row.text;
  }
}

class ReportTextTest : public testing::Test {
 protected:
  std::string report(Format format, const std::optional<std::string>& interrupted = std::nullopt) const {
    return reportText(format, run_, records_, interrupted);
  }

  nlohmann::ordered_json withRun(nlohmann::ordered_json document) const {
    document["run"] = runJson(run_);
    return document;
  }

  RunStarted run_ = runOf({"A", "B"});
  std::vector<DiagnosticRecord> records_ = {recordOf("A", Verdict::kPass), recordOf("B", Verdict::kFail)};
};

TEST_F(ReportTextTest, HasEachRecordInEveryFormat) {
  EXPECT_THAT(report(Format::kText),
              testing::AllOf(StartsWith("PASS  A  2 results"), HasSubstr("\nFAIL  B  2 results"),
                             EndsWith("2 diagnostics: 1 passed, 1 failed, 0 ended in an error\nFAIL  B: Count\n")));
  EXPECT_THAT(reportText(Format::kText, run_, records_, std::nullopt, {true, {}}),
              testing::AllOf(HasSubstr("\n  PASS\n"), HasSubstr("\n  FAIL\n"), EndsWith("\nFAIL  B: Count\n")));
  EXPECT_EQ(report(Format::kJson), documentText(withRun(runDocument(records_, std::nullopt))));
  EXPECT_THAT(report(Format::kCsv), testing::AllOf(StartsWith("diagnostic,verdict,"), HasSubstr("\nB,fail,")));
  EXPECT_THAT(report(Format::kJunit), testing::AllOf(StartsWith("<?xml"), HasSubstr("<testsuite name=\"B\"")));
  EXPECT_THAT(report(Format::kOcp), StartsWith("{\"schemaVersion\":"));
}

TEST_F(ReportTextTest, HasADocumentAndATableOfItsOwnForExperiments) {
  run_.ofExperiments = true;
  for (DiagnosticRecord& record : records_) record.experimentOnly = true;
  EXPECT_EQ(report(Format::kJson), documentText(withRun(experimentDocument(records_, std::nullopt))));
  EXPECT_THAT(report(Format::kCsv), StartsWith("experiment,measurement,"));
  EXPECT_THAT(report(Format::kText), testing::AllOf(HasSubstr("  DONE\n"), HasSubstr("2 experiments: ")));
}

TEST_F(ReportTextTest, SaysWhichRunItWasInEveryFormatForPrograms) {
  run_.id = "0af3";
  run_.host = "bench 7";
  run_.seed = 5;
  run_.plugins = {"a.so", "b,c.so"};
  run_.tags = {{"serial", "C02X"}, {"station", "line \"3\""}};
  const auto json = nlohmann::ordered_json::parse(report(Format::kJson))["run"];
  EXPECT_EQ(json["id"], "0af3");
  EXPECT_EQ(json["host"], "bench 7");
  EXPECT_EQ(json["seed"], 5);
  EXPECT_EQ(json["plugins"].dump(), R"(["a.so","b,c.so"])");
  EXPECT_EQ(json["tags"].dump(), R"({"serial":"C02X","station":"line \"3\""})");
  const std::string csv = report(Format::kCsv);
  EXPECT_THAT(csv,
              HasSubstr(",errorMessage,run,date,host,program,contract,plugins,phone,seed,tag.serial,tag.station\n"));
  EXPECT_THAT(csv, HasSubstr(",0af3," + timestampText(run_.date) + ",bench 7," + run_.program + "," +
                             std::to_string(run_.contract) + ",\"a.so; b,c.so\"," + run_.phone +
                             ",7,C02X,\"line \"\"3\"\"\"\n"));
  records_[0].error = errorWithMessage("D", 1, "two\nlines", nullptr);
  EXPECT_THAT(report(Format::kCsv), HasSubstr("\"two\nlines\",0af3,"));
  const std::string xml = report(Format::kJunit);
  EXPECT_THAT(xml, HasSubstr("<property name=\"run\" value=\"0af3\"/>"));
  EXPECT_THAT(xml, HasSubstr("<property name=\"host\" value=\"bench 7\"/>"));
  EXPECT_THAT(xml, HasSubstr("<property name=\"tag.serial\" value=\"C02X\"/>"));
  const std::string ocp = report(Format::kOcp);
  EXPECT_THAT(ocp, HasSubstr(R"("hardwareInfos":[{"hardwareInfoId":"phone","name":"phone","serialNumber":"C02X"}])"));
  EXPECT_THAT(ocp, HasSubstr(R"("run":"0af3","host":"bench 7","tags":{"serial":"C02X",)"));
}

TEST_F(ReportTextTest, CountsOneRecordOnlyWhenTheRunWasInterrupted) {
  records_.pop_back();
  EXPECT_THAT(report(Format::kText), testing::Not(HasSubstr("1 diagnostic")));
  EXPECT_THAT(report(Format::kText, ""),
              EndsWith("1 diagnostic: 1 passed, 0 failed, 0 ended in an error, 1 not reached\n"));
  EXPECT_THAT(report(Format::kText, "B"), EndsWith("an error\nInterrupted while B was running.\n"));
  EXPECT_THAT(report(Format::kText, "B\n"), EndsWith("\nInterrupted while B\\x0a was running.\n"));
  EXPECT_EQ(nlohmann::json::parse(report(Format::kJson, "B"))["interrupted"], "B");
}

TEST_F(ReportTextTest, HasWhatWasInterruptedInTheRecordOfAnAnalysis) {
  records_.pop_back();
  run_.analyzed.emplace();
  const std::string text = report(Format::kText, "B");
  EXPECT_THAT(text, testing::AllOf(HasSubstr("\nERROR B\n  The recorded run stopped while this was running.\n\n  "
                                             "QuazorHostErrorDomain code 11: B was interrupted\n"),
                                   HasSubstr("2 diagnostics: 1 passed, 0 failed, 1 ended in an error\n"),
                                   HasSubstr("\nERROR B: QuazorHostErrorDomain code 11\n")));
  EXPECT_THAT(report(Format::kCsv, "B"), HasSubstr("\nB,error,,,,,,,,,,,,QuazorHostErrorDomain,11,B was interrupted,"));
  for (const Format format : {Format::kText, Format::kCsv}) {
    EXPECT_THAT(report(format, ""), testing::Not(HasSubstr("code 11"))) << nameOf(format);
  }
}

TEST(PrintVariation, RoundsNumbersButNotAcrossALimit) {
  std::vector<DiagnosticRecord> records;
  for (const double value : {90.0000000001, 33.33333333, 12.0}) {
    DiagnosticRecord record = recordOf("A", Verdict::kPass);
    record.trial = {0, 0, records.size() + 1, 3};
    record.measuredResults = judgeResults({resultWithMinimum(value, 90)});
    records.push_back(record);
  }
  const auto varied = [&records](bool whole) {
    std::ostringstream out;
    printVariation(out, records, whole);
    return out.str();
  };
  EXPECT_THAT(varied(false), HasSubstr("  12  3  33.3333  90.0000000001  1  "));
  EXPECT_THAT(varied(true), HasSubstr("  12  3  33.33333333  90.0000000001  1  "));
  for (DiagnosticRecord& record : records) record.limits.push_back(parseUserLimit("Count <= 33.3333"));
  EXPECT_THAT(varied(false), HasSubstr("  12  3  33.33333  90.0000000001  1  "));
}

}  // namespace
}  // namespace quazor
