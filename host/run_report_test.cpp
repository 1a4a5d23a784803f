#include "host/run_report.h"

#include "host/test_directory.h"
#include "host/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <sstream>

namespace quazor {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using Json = nlohmann::ordered_json;

class RunReportTest : public testing::Test {
 protected:
  // Runs diagnostics with these verdicts, named A, B and so on.
  static void run(RunReport& report, const std::vector<Verdict>& verdicts) {
    std::string name = "A";
    for (const Verdict verdict : verdicts) {
      report.begin(name, {});
      report.finish(recordOf(name, verdict));
      ++name[0];
    }
  }

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
  EXPECT_EQ(one.conclude(), ExitCode::kAllPassed);
  EXPECT_THAT(out_.str(), Not(HasSubstr("1 diagnostic")));
  RunReport two({}, console_);
  run(two, {Verdict::kPass, Verdict::kFail});
  EXPECT_EQ(two.conclude(), ExitCode::kFailed);
  EXPECT_THAT(out_.str(), EndsWith("2 diagnostics: 1 passed, 1 failed, 0 ended in an error\n"));
}

TEST_F(RunReportTest, PrintsOneJsonDocumentAndNothingElse) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_EQ(out_.str(), "");
  EXPECT_EQ(report.conclude(), ExitCode::kError);
  EXPECT_EQ(Json::parse(out_.str())["diagnostics"].size(), 2U);
}

TEST_F(RunReportTest, WritesTheOutputFileAndPrintsTheVerdicts) {
  for (const Format format : {Format::kText, Format::kJson}) {
    out_.str("");
    RunReport report({format, directory_.path() / "out"}, console_);
    run(report, {Verdict::kPass, Verdict::kFail});
    EXPECT_FALSE(std::filesystem::exists(directory_.path() / "out"));
    EXPECT_EQ(report.conclude(), ExitCode::kFailed);
    EXPECT_EQ(out_.str(), "PASS  A\nFAIL  B\n2 diagnostics: 1 passed, 1 failed, 0 ended in an error\n");
    const std::string written = directory_.read("out");
    if (format == Format::kJson) {
      EXPECT_EQ(Json::parse(written)["diagnostics"].size(), 2U);
    } else {
      EXPECT_THAT(written, testing::AllOf(HasSubstr("Count      90  frames  Enough: >= 90  pass"), HasSubstr("FAIL")));
    }
    std::filesystem::remove(directory_.path() / "out");
  }
}

TEST_F(RunReportTest, TellsWhenTheOutputFileCannotBeWrittenAndStillPrintsTheVerdicts) {
  const std::filesystem::path file = directory_.path() / "nowhere" / "out";
  RunReport report({Format::kJson, file}, console_);
  run(report, {Verdict::kFail});
  EXPECT_EQ(report.conclude(), ExitCode::kCannotWrite);
  EXPECT_EQ(out_.str(), "FAIL  A\n");
  EXPECT_EQ(err_.str(),
            "quazor: the output file '" + file.string() + "' cannot be written: No such file or directory\n");
}

TEST_F(RunReportTest, TellsWhenTheStandardOutputCannotBeWritten) {
  RunReport report({}, console_);
  run(report, {Verdict::kPass});
  out_.setstate(std::ios::badbit);
  EXPECT_EQ(report.conclude(), ExitCode::kCannotWrite);
  EXPECT_EQ(err_.str(), "quazor: the standard output cannot be written\n");
}

class ExperimentReportTest : public RunReportTest {
 protected:
  static void run(RunReport& report, const std::vector<Verdict>& verdicts) {
    std::string name = "A";
    for (const Verdict verdict : verdicts) {
      DiagnosticRecord record = recordOf(name, verdict);
      record.experimentOnly = true;
      record.auxiliaryData.set("samples", Array{0, 1, 2, 3, 4, 5, 6, 7});
      report.begin(name, {});
      report.finish(std::move(record));
      ++name[0];
    }
  }
};

TEST_F(ExperimentReportTest, PrintsEachExperimentAndHowManyThereWere) {
  RunReport report({Format::kText, {}, true}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_THAT(out_.str(), testing::AllOf(HasSubstr("  DONE\n"), HasSubstr("  ERROR\n"), HasSubstr("\n  .:::::::\n")));
  EXPECT_EQ(report.conclude(), ExitCode::kError);
  EXPECT_THAT(out_.str(), EndsWith("2 experiments: 1 returned a result, 1 ended in an error\n"));
}

TEST_F(ExperimentReportTest, DrawsBlocksWhereTheConsoleTakesThem) {
  console_.blocks = true;
  RunReport report({Format::kText, {}, true}, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(report.conclude(), ExitCode::kAllPassed);
  EXPECT_THAT(out_.str(), HasSubstr("\u2588"));
}

TEST_F(ExperimentReportTest, WritesTheDocumentOfExperiments) {
  RunReport report({Format::kJson, {}, true}, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(report.conclude(), ExitCode::kAllPassed);
  EXPECT_EQ(Json::parse(out_.str())["experiments"].size(), 1U);
}

TEST_F(ExperimentReportTest, WritesOneTableAndTellsErrorsBesideIt) {
  RunReport report({Format::kCsv, {}, true}, console_);
  run(report, {Verdict::kPass, Verdict::kError});
  EXPECT_EQ(out_.str(), "");
  EXPECT_EQ(report.conclude(), ExitCode::kError);
  EXPECT_EQ(out_.str(), "experiment,measurement,value,unit\nA,Raw,90,frames\nB,Raw,90,frames\n");
  EXPECT_EQ(err_.str(),
            "quazor: B ended in an error\n  Domain code -1: it failed\n  caused by Deep code 2: the cause\n");
}

TEST_F(ExperimentReportTest, WritesTheTableToAFile) {
  RunReport report({Format::kCsv, directory_.path() / "out", true}, console_);
  run(report, {Verdict::kPass});
  EXPECT_EQ(report.conclude(), ExitCode::kAllPassed);
  EXPECT_EQ(directory_.read("out"), "experiment,measurement,value,unit\nA,Raw,90,frames\n");
  EXPECT_EQ(out_.str(), "DONE  A\n");
}

TEST_F(ExperimentReportTest, SpeaksOfExperimentsWhenInterruptedBetweenTwo) {
  RunReport report({Format::kCsv, {}, true}, console_);
  run(report, {Verdict::kPass});
  report.interrupt([] {});
  EXPECT_EQ(err_.str(), "quazor: interrupted between two experiments\n");
  EXPECT_THAT(out_.str(), HasSubstr("A,Raw,90,frames\n"));
}

TEST_F(RunReportTest, PointsOutUnfiredFaults) {
  RunReport report({}, console_);
  DiagnosticRecord record = recordOf("A", Verdict::kPass);
  record.faults[0].fired = 0;
  report.begin("A", {});
  report.finish(std::move(record));
  EXPECT_THAT(err_.str(), HasSubstr("A: a fault of the phone never fired"));
}

TEST_F(RunReportTest, WritesWhatIsFinishedWhenInterrupted) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass});
  report.begin("Slow", {});
  bool left = false;
  report.interrupt([&left] { left = true; });
  EXPECT_TRUE(left);
  const Json document = Json::parse(out_.str());
  EXPECT_EQ(document["diagnostics"].size(), 1U);
  EXPECT_EQ(document["interrupted"], "Slow");
  EXPECT_EQ(err_.str(), "quazor: interrupted while Slow was running\n");
}

TEST_F(RunReportTest, WritesTheOutputFileWhenInterrupted) {
  RunReport report({Format::kText, directory_.path() / "out"}, console_);
  run(report, {Verdict::kPass});
  report.begin("Slow", {});
  report.interrupt([] {});
  EXPECT_THAT(directory_.read("out"), EndsWith("1 diagnostic: 1 passed, 0 failed, 0 ended in an error\n"
                                               "Interrupted while Slow was running.\n"));
}

TEST_F(RunReportTest, SaysSoWhenInterruptedBetweenTwoDiagnostics) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass});
  report.interrupt([] {});
  EXPECT_EQ(Json::parse(out_.str())["interrupted"], "");
  EXPECT_EQ(err_.str(), "quazor: interrupted between two diagnostics\n");
}

TEST_F(RunReportTest, IgnoresAnInterruptAfterItsEnd) {
  RunReport report({Format::kJson, {}}, console_);
  run(report, {Verdict::kPass});
  report.conclude();
  const std::string before = out_.str();
  report.interrupt([] { FAIL() << "it left"; });
  EXPECT_EQ(out_.str(), before);
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
