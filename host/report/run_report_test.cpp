#include "host/report/run_report.h"

#include "host/testing/test_directory.h"
#include "host/testing/test_events.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <sstream>

namespace quazor {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using Json = nlohmann::ordered_json;

class RunReportTest : public testing::Test {
 protected:
  // A record of a diagnostic or experiment with that verdict and without log lines.
  DiagnosticRecord quietRecord(const std::string& name, Verdict verdict) const {
    DiagnosticRecord record = recordOf(name, verdict);
    record.log.clear();
    record.experimentOnly = ofExperiments_;
    if (ofExperiments_) {
      record.measuredResults.clear();
      record.auxiliaryData.set("samples", Array{0, 1, 2, 3, 4, 5, 6, 7});
    }
    return record;
  }

  // Runs diagnostics with these verdicts, named A, B and so on.
  void run(RunReport& report, const std::vector<Verdict>& verdicts) const {
    RunStarted began = runOf({});
    began.ofExperiments = ofExperiments_;
    report.onEvent(began);
    std::string name = "A";
    for (const Verdict verdict : verdicts) {
      report.addRecord(quietRecord(name, verdict));
      ++name[0];
    }
  }

  static ExitCode end(RunReport& report, const std::optional<std::string>& interrupted = std::nullopt) {
    report.onEvent(RunEnded{interrupted, momentAt(99)});
    return report.exitCode();
  }

  bool ofExperiments_ = false;
  TestDirectory directory_;
  std::ostringstream out_;
  std::ostringstream err_;
  Console console_{out_, err_};
};

TEST_F(RunReportTest, PrintsEachRecordAsItIsFinished) {
  RunReport report({}, console_);
  run(report, {Verdict::kPass});
  EXPECT_THAT(out_.str(), HasSubstr("PASS"));
}

TEST_F(RunReportTest, SummarizesSeveralDiagnosticsButNotOne) {
  RunReport one({}, console_);
  run(one, {Verdict::kPass});
  EXPECT_EQ(end(one), ExitCode::kAllPassed);
  EXPECT_THAT(out_.str(), testing::Not(HasSubstr("1 diagnostic")));
  RunReport two({}, console_);
  run(two, {Verdict::kPass, Verdict::kFail});
  EXPECT_EQ(end(two), ExitCode::kFailed);
  EXPECT_THAT(out_.str(), EndsWith("2 diagnostics: 1 passed, 1 failed, 0 ended in an error\nFAIL  B: Count\n"));
}

TEST_F(RunReportTest, PrintsOneJsonDocumentAndNothingElse) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_EQ(out_.str(), "");
  EXPECT_EQ(end(report), ExitCode::kError);
  EXPECT_EQ(Json::parse(out_.str())["diagnostics"].size(), 2U);
}

TEST_F(RunReportTest, WritesTheOutputFileAndPrintsTheVerdicts) {
  for (const Format format : {Format::kText, Format::kJson}) {
    out_.str("");
    RunReport report({format, directory_.path() / "out"}, console_);
    run(report, {Verdict::kPass, Verdict::kFail});
    EXPECT_FALSE(std::filesystem::exists(directory_.path() / "out"));
    EXPECT_EQ(end(report), ExitCode::kFailed);
    EXPECT_EQ(out_.str(), "PASS  A\nFAIL  B\n2 diagnostics: 1 passed, 1 failed, 0 ended in an error\nFAIL  B: Count\n");
    const std::string written = directory_.read("out");
    if (format == Format::kJson) {
      EXPECT_EQ(Json::parse(written)["diagnostics"].size(), 2U);
    } else {
      EXPECT_THAT(written, testing::AllOf(HasSubstr("Count      89  frames  Enough: >= 90  fail"), HasSubstr("FAIL")));
    }
    std::filesystem::remove(directory_.path() / "out");
  }
}

TEST_F(RunReportTest, TellsWhenTheOutputFileCannotBeWrittenAndStillPrintsTheVerdicts) {
  const std::filesystem::path file = directory_.path() / "nowhere" / "out";
  RunReport report({Format::kJson, file}, console_);
  run(report, {Verdict::kFail});
  EXPECT_EQ(end(report), ExitCode::kCannotWrite);
  EXPECT_EQ(out_.str(), "FAIL  A\nFAIL  A: Count\n");
  EXPECT_EQ(err_.str(),
            "quazor: the output file '" + file.string() + "' cannot be written: No such file or directory\n");
}

TEST_F(RunReportTest, TellsWhenTheStandardOutputCannotBeWritten) {
  RunReport report({}, console_);
  run(report, {Verdict::kPass});
  out_.setstate(std::ios::badbit);
  EXPECT_EQ(end(report), ExitCode::kCannotWrite);
  EXPECT_EQ(err_.str(), "quazor: standard output cannot be written\n");
}

class ExperimentReportTest : public RunReportTest {
 protected:
  ExperimentReportTest() { ofExperiments_ = true; }
};

TEST_F(ExperimentReportTest, PrintsEachExperimentAndHowManyThereWere) {
  RunReport report({}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_THAT(out_.str(), testing::AllOf(HasSubstr("  DONE\n"), HasSubstr("  ERROR\n"), HasSubstr("\n  .:::::::\n")));
  EXPECT_EQ(end(report), ExitCode::kError);
  EXPECT_THAT(out_.str(), EndsWith("2 experiments: 1 returned a result, 1 ended in an error\n"));
}

TEST_F(ExperimentReportTest, DrawsBlocksWhereTheConsoleTakesThem) {
  console_.blocks = true;
  RunReport report({}, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(end(report), ExitCode::kAllPassed);
  EXPECT_THAT(out_.str(), HasSubstr("\u2588"));
}

TEST_F(ExperimentReportTest, WritesTheDocumentOfExperiments) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(end(report), ExitCode::kAllPassed);
  EXPECT_EQ(Json::parse(out_.str())["experiments"].size(), 1U);
}

// The first line of a table of measurements, and the end of every other line, with the run.
const std::string kHeader = "experiment,measurement,value,unit,run,date,host,program,contract,plugins,phone,seed\n";
const std::string kRun = ",,2026-11-21T01:08:00.000000000Z,,0.1.0,2,p.so,phone.json,7\n";

TEST_F(ExperimentReportTest, WritesOneTableAndTellsErrorsBesideIt) {
  RunReport report({Format::kCsv, {}}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_EQ(out_.str(), "");
  EXPECT_EQ(end(report), ExitCode::kError);
  EXPECT_EQ(out_.str(), kHeader + "A,Raw,90,frames" + kRun + "B,Raw,90,frames" + kRun);
  EXPECT_EQ(err_.str(),
            "quazor: B ended in an error\n  Domain code -1: it failed\n  caused by Deep code 2: the cause\n");
}

TEST_F(ExperimentReportTest, WritesTheTableToAFile) {
  RunReport report({Format::kCsv, directory_.path() / "out"}, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(end(report), ExitCode::kAllPassed);
  EXPECT_EQ(directory_.read("out"), kHeader + "A,Raw,90,frames" + kRun);
  EXPECT_EQ(out_.str(), "DONE  A\n");
}

TEST_F(ExperimentReportTest, SpeaksOfExperimentsWhenInterruptedBetweenTwo) {
  RunReport report({Format::kCsv, {}}, console_);
  run(report, {Verdict::kPass});
  end(report, "");
  EXPECT_EQ(err_.str(), "quazor: interrupted while no experiment was running\n");
  EXPECT_THAT(out_.str(), HasSubstr("A,Raw,90,frames" + kRun));
}

TEST_F(RunReportTest, PointsOutUnfiredFaults) {
  RunReport report({}, console_);
  DiagnosticRecord record = quietRecord("A", Verdict::kPass);
  record.faults[0].fired = 0;
  report.addRecord(record);
  EXPECT_THAT(err_.str(), HasSubstr("A: a fault of the simulated phone never fired"));
}

TEST_F(RunReportTest, WritesWhatIsFinishedWhenInterrupted) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_EQ(end(report, "B"), ExitCode::kError);
  const Json document = Json::parse(out_.str());
  EXPECT_EQ(document["diagnostics"].size(), 2U);
  EXPECT_EQ(document["interrupted"], "B");
  EXPECT_EQ(err_.str(), "quazor: interrupted while B was running\n");
}

TEST_F(RunReportTest, WritesTheOutputFileWhenInterrupted) {
  RunReport report({Format::kText, directory_.path() / "out"}, console_);
  run(report, {Verdict::kPass});
  end(report, "Slow");
  EXPECT_THAT(directory_.read("out"), EndsWith("1 diagnostic: 1 passed, 0 failed, 0 ended in an error\n"
                                               "Interrupted while Slow was running.\n"));
}

TEST_F(RunReportTest, SaysSoWhenInterruptedBetweenTwoDiagnostics) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass});
  end(report, "");
  EXPECT_EQ(Json::parse(out_.str())["interrupted"], "");
  EXPECT_EQ(err_.str(), "quazor: interrupted while no diagnostic was running\n");
}

TEST_F(RunReportTest, WritesATimeLineOfEveryEventToEachPlace) {
  ReportOptions options;
  options.format = Format::kTrace;
  for (const char* const file : {"one", "two"}) options.outputs.push_back({Format::kTrace, directory_.path() / file});
  RunReport report(options, console_);
  for (const RunEvent& event : wholeRun()) report.onEvent(event);
  EXPECT_EQ(report.exitCode(), ExitCode::kAllPassed);
  EXPECT_EQ(out_.str(), timelineText(wholeRun()));
  EXPECT_EQ(directory_.read("one"), out_.str());
  EXPECT_EQ(directory_.read("two"), out_.str());
}

TEST_F(RunReportTest, WritesNoTimeLineThatIsTooLarge) {
  ReportOptions options;
  options.outputs = {{Format::kTrace, directory_.path() / "line"}, {Format::kJson, directory_.path() / "json"}};
  options.maxTimeline = timelineText(wholeRun()).size() / 2;
  RunReport report(options, console_);
  for (const RunEvent& event : wholeRun()) report.onEvent(event);
  EXPECT_EQ(report.exitCode(), ExitCode::kCannotWrite);
  EXPECT_THAT(err_.str(), HasSubstr("quazor: the time line is longer than 0 MB, which few viewers open, and is not "
                                    "written; 'quazor report RECORD --format trace' makes one of a part of a record"));
  EXPECT_FALSE(std::filesystem::exists(directory_.path() / "line"));
  EXPECT_TRUE(std::filesystem::exists(directory_.path() / "json"));
}

TEST_F(RunReportTest, WritesFurtherReportsInTheirFormats) {
  ReportOptions options;
  for (const Format format : kFormats) {
    options.outputs.push_back({format, directory_.path() / std::string(nameOf(format))});
  }
  options.text.page = [](const ShownRun& shown) { return "page of " + shown.records.front().name; };
  RunReport report(options, console_);
  run(report, {Verdict::kPass});
  EXPECT_FALSE(std::filesystem::exists(directory_.path() / "text"));
  EXPECT_EQ(end(report), ExitCode::kAllPassed);
  EXPECT_THAT(out_.str(), testing::StartsWith("PASS  A  2 results"));
  EXPECT_EQ(directory_.read("text"), out_.str());
  EXPECT_EQ(Json::parse(directory_.read("json"))["diagnostics"].size(), 1U);
  EXPECT_THAT(directory_.read("csv"), testing::StartsWith("diagnostic,verdict,result,"));
  EXPECT_THAT(directory_.read("junit"), testing::StartsWith("<?xml"));
  EXPECT_THAT(directory_.read("ocp"), testing::StartsWith("{\"schemaVersion\""));
  EXPECT_EQ(directory_.read("html"), "page of A");
  EXPECT_EQ(Json::parse(directory_.read("trace")).count("traceEvents"), 1U);
}

TEST_F(RunReportTest, GivesThePageTheFramesOfEachDiagnostic) {
  ReportOptions options;
  options.outputs.push_back({Format::kHtml, directory_.path() / "page"});
  RunStreams streams;
  options.text.page = [&streams](const ShownRun& shown) {
    streams = shown.streams;
    return std::string();
  };
  RunReport report(options, console_);
  report.onEvent(runOf({"A", "B", "C"}));
  for (const char* const name : {"A", "B", "C"}) {
    report.onEvent(beginningOf(name));
    const std::string diagnostic = name;
    if (diagnostic != "A") {
      for (std::int64_t number : {1, 2}) report.onEvent(FramesTraced{"of " + diagnostic, 1, {{number, 0, 0, {}}}, 0});
    }
    report.addRecord(recordOf(name, Verdict::kPass));
  }
  EXPECT_EQ(end(report), ExitCode::kAllPassed);
  ASSERT_EQ(streams.size(), 3U);
  EXPECT_TRUE(streams[0].empty());
  ASSERT_EQ(streams[1].size(), 1U);
  EXPECT_EQ(streams[1][0].name, "of B");
  EXPECT_EQ(streams[1][0].frames.size(), 2U);
  EXPECT_EQ(streams[2][0].name, "of C");
}

TEST_F(RunReportTest, WritesTheOtherReportsWhenOneCannotBeWritten) {
  ReportOptions options;
  options.outputs = {{Format::kJson, directory_.path() / "nowhere" / "a"}, {Format::kJson, directory_.path() / "b"}};
  RunReport report(options, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(end(report), ExitCode::kCannotWrite);
  EXPECT_TRUE(Json::accept(directory_.read("b")));
}

TEST_F(RunReportTest, ShowsLogLinesUpToTheirLevelByTheWallClock) {
  ReportOptions options;
  options.shownLog = LogLevel::kDefault;
  RunReport report(options, console_);
  report.onEvent(beginningOf("A"));
  report.onEvent(Logged{{{}, LogLevel::kError, "an error", momentAt(250)}});
  report.onEvent(Logged{{{}, LogLevel::kDefault, "two\nlines", momentAt(1000)}});
  report.onEvent(Logged{{{}, LogLevel::kDebug, "a detail", momentAt(1001)}});
  const std::string category(sharedLog().category());
  EXPECT_EQ(err_.str(), "2026-11-21 01:08:00.250 error " + category + ": an error\n" +
                            "2026-11-21 01:08:01.000 default " + category + ": two\n    lines\n");
}

TEST_F(RunReportTest, ShowsLogLinesThatCannotSteerTheTerminal) {
  RunReport report({}, console_);
  report.onEvent(beginningOf("A"));
  report.onEvent(Logged{{{}, LogLevel::kError, "a\033[2Jb\r\xFF\xC2\x9B\tc\nd\a\n", momentAt(250)}});
  const std::string category(sharedLog().category());
  EXPECT_EQ(err_.str(), "2026-11-21 01:08:00.250 error " + category + ": a\\x1b[2Jb\\x0d\\xff\\x9b\tc\n    d\\x07\n");
}

TEST_F(RunReportTest, ShowsNothingThatIsNotUtf8OnTheStandardOutput) {
  ReportOptions options;
  options.text.verbose = true;
  RunReport report(options, console_);
  report.onEvent(runOf({}));
  DiagnosticRecord record = quietRecord("N\xFF", Verdict::kError);
  record.measuredResults.clear();
  record.measuredResults.push_back(
      judgeResult(QZMeasuredResult("r\xC3", Measurement(1, QZDimensionlessUnit::frames()))));
  record.error = makeError("D", 1, "it\x80 broke");
  report.addRecord(record);
  end(report);
  EXPECT_THAT(out_.str(), HasSubstr("N\\xff\n"));
  EXPECT_THAT(out_.str(), HasSubstr("  r\\xc3 "));
  EXPECT_THAT(out_.str(), HasSubstr("D code 1: it\\x80 broke\n"));
}

TEST_F(RunReportTest, ShowsTheProgressOfWhatIsRunning) {
  console_.showsProgress = true;
  RunReport report({}, console_);
  EXPECT_TRUE(report.progress().isShown());
  report.onEvent(beginningOf("Slow"));
  while (err_.str().empty()) report.progress().update();
  EXPECT_EQ(err_.str(), "Running Slow: 0.3 s of 3 s");
  report.onEvent(Logged{{{}, LogLevel::kError, "a line", momentAt(250)}});
  EXPECT_THAT(err_.str(), testing::StartsWith("Running Slow: 0.3 s of 3 s\r\033[K2026-11-21"));
  report.addRecord(quietRecord("Slow", Verdict::kPass));
  EXPECT_THAT(err_.str(), EndsWith("a line\n"));
}

TEST(ExitCodeOf, LetsAnErrorWinOverAFailure) {
  const auto codeOf = [](const std::vector<Verdict>& verdicts) {
    std::vector<DiagnosticRecord> records;
    for (const Verdict verdict : verdicts) records.push_back(recordOf("A", verdict));
    return exitCodeOf(records);
  };
  EXPECT_EQ(codeOf({}), ExitCode::kAllPassed);
  EXPECT_EQ(codeOf({Verdict::kPass, Verdict::kPass}), ExitCode::kAllPassed);
  EXPECT_EQ(codeOf({Verdict::kFail, Verdict::kPass}), ExitCode::kFailed);
  EXPECT_EQ(codeOf({Verdict::kFail, Verdict::kError}), ExitCode::kError);
  EXPECT_EQ(codeOf({Verdict::kError, Verdict::kFail}), ExitCode::kError);
}

}  // namespace
}  // namespace quazor
