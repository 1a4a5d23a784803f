#include "host/report/short_report.h"

#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

std::string shortText(const DiagnosticRecord& record, std::size_t nameWidth = 0) {
  std::ostringstream out;
  printShortRecord(out, record, false, nameWidth);
  return out.str();
}

std::string failures(const std::vector<DiagnosticRecord>& records,
                     const std::function<bool(const std::string&)>& isExplained = {}) {
  std::ostringstream out;
  printFailures(out, records, false, isExplained);
  return out.str();
}

DiagnosticRecord withLimit(DiagnosticRecord record, std::string_view text, LimitSeverity severity) {
  UserLimit limit = parseUserLimit(text);
  limit.severity = severity;
  limit.source = "command line";
  record.limits.push_back(limit);
  return record;
}

TEST(ResultCounts, TellHowManyResultsHaveALimit) {
  DiagnosticRecord record = recordOf("A", Verdict::kPass);
  EXPECT_EQ(resultCountsText(record), "2 results, 1 with a limit");
  EXPECT_EQ(resultCountsText(withLimit(record, "Offset > 0", LimitSeverity::kFail)), "2 results, 2 with limits");
  EXPECT_EQ(resultCountsText(withLimit(record, "Count < 80", LimitSeverity::kWarn)),
            "2 results, 1 with a limit, 1 warning");
  EXPECT_EQ(resultCountsText(withLimit(record, "Count < 80", LimitSeverity::kFail)),
            "2 results, 1 with a limit, 1 failed");
  EXPECT_EQ(resultCountsText(withLimit(record, "Count < Offset", LimitSeverity::kFail)),
            "2 results, 1 with a limit, 1 not judged");
  record.measuredResults.erase(record.measuredResults.begin());
  EXPECT_EQ(resultCountsText(record), "1 result, none with a limit");
  record.measuredResults.clear();
  EXPECT_EQ(resultCountsText(record), "");
}

TEST(PrintShortRecord, IsOneLineForADiagnosticThatPasses) {
  EXPECT_EQ(shortText(recordOf("A", Verdict::kPass), 4), "PASS  A     2 results, 1 with a limit\n");
}

TEST(PrintShortRecord, ShowsTheTextsOfTheAuxiliaryData) {
  DiagnosticRecord record = recordOf("A", Verdict::kPass);
  record.auxiliaryData.set("Camera", "0, Front\nFacing");
  record.auxiliaryData.set("Number", 1);
  record.auxiliaryData.set("Long", std::string(1000, 'x'));
  const std::string text = shortText(record);
  EXPECT_THAT(
      text, testing::StartsWith("PASS  A  2 results, 1 with a limit\n  Camera: 0, Front\\x0aFacing\n  Long:\n    xxx"));
  EXPECT_LT(text.size(), 350U);
  record = recordOf("A", Verdict::kFail);
  record.auxiliaryData.set("Camera", "0");
  EXPECT_THAT(shortText(record), testing::HasSubstr("  Its summary.\n  Camera: 0\n\n"));
}

TEST(PrintShortRecord, ShowsTheRowsThatFailOrHaveALimitOfTheUser) {
  EXPECT_EQ(shortText(recordOf("A", Verdict::kFail)),
            "FAIL  A  2 results, 1 with a limit, 1 failed\n"
            "  Its summary.\n"
            "\n"
            "  Result  Value  Unit    Limit          Verdict\n"
            "  Count      89  frames  Enough: >= 90  fail\n"
            "\n");
  EXPECT_EQ(shortText(withLimit(recordOf("A", Verdict::kPass), "Offset > 0", LimitSeverity::kFail)),
            "PASS  A  2 results, 2 with limits\n"
            "  Result  Value  Unit    Limit                      Verdict\n"
            "  Offset    0.5  events  Offset > 0 (command line)  pass\n"
            "\n");
}

TEST(ShownFailures, AreTheFirstRepetitionOfADiagnosticWholeAndALineForEachOtherKind) {
  ShownFailures shown;
  const auto add = [&shown](const char* name, Verdict verdict, std::uint64_t repetition) {
    DiagnosticRecord record = recordOf(name, verdict);
    record.trial.repetition = repetition;
    return shown.add(record);
  };
  EXPECT_EQ(add("A", Verdict::kFail, 1), Shown::kWhole);
  EXPECT_EQ(add("B", Verdict::kFail, 1), Shown::kWhole) << "each diagnostic has a first one";
  EXPECT_EQ(add("A", Verdict::kFail, 2), Shown::kNothing);
  EXPECT_EQ(add("A", Verdict::kError, 3), Shown::kLine);
  EXPECT_EQ(add("A", Verdict::kError, 4), Shown::kNothing);
  EXPECT_EQ(add("A", Verdict::kPass, 5), Shown::kWhole) << "it has a warning";
  EXPECT_EQ(add("A", Verdict::kPass, 6), Shown::kWhole);
  EXPECT_EQ(add("A", Verdict::kFail, 0), Shown::kWhole) << "without repetitions everything is shown";
}

TEST(PrintShortRecord, IsALineWithTheFailureIfItIsOfAnotherKind) {
  const auto lineOf = [](DiagnosticRecord record, Shown shown) {
    record.trial.repetition = 2;
    std::ostringstream out;
    printShortRecord(out, record, false, 0, shown);
    return out.str();
  };
  EXPECT_EQ(lineOf(recordOf("A", Verdict::kFail), Shown::kLine), "FAIL  A  repetition 2, seed 7, Count\n");
  EXPECT_EQ(lineOf(recordOf("A", Verdict::kError), Shown::kLine),
            "ERROR A  repetition 2, seed 7, Domain code -1: it failed\n");
  EXPECT_EQ(lineOf(recordOf("A", Verdict::kFail), Shown::kNothing), "");
}

TEST(PrintShortRecord, ShowsTheErrorAndItsCause) {
  DiagnosticRecord record = recordOf("A", Verdict::kError);
  record.measuredResults.clear();
  EXPECT_EQ(shortText(record),
            "ERROR A\n"
            "  Its summary.\n"
            "\n"
            "  Domain code -1: it failed\n"
            "  caused by Deep code 2: the cause\n"
            "\n");
}

std::string unlimited(const std::vector<DiagnosticRecord>& records) {
  std::ostringstream out;
  printUnlimited(out, records);
  return out.str();
}

DiagnosticRecord withoutLimits(const std::string& name, Verdict verdict) {
  DiagnosticRecord record = recordOf(name, verdict);
  record.measuredResults.clear();
  record.measuredResults.push_back(judgeResult(QZMeasuredResult("R", Measurement(1, QZDimensionlessUnit::events()))));
  return record;
}

TEST(PrintUnlimited, NamesDiagnosticsThatPassWhateverIsMeasured) {
  const std::string advice = " measured. Add limits: --limit 'RESULT >= NUMBER', or --profile.\n";
  EXPECT_EQ(unlimited({withoutLimits("A", Verdict::kPass)}),
            "No result of A has a limit, so it passes whatever is" + advice);
  EXPECT_EQ(unlimited({withoutLimits("A", Verdict::kPass), withoutLimits("B\033", Verdict::kPass),
                       withoutLimits("A", Verdict::kPass)}),
            "No result of A, B\\x1b has a limit, so they pass whatever is" + advice);
}

TEST(PrintUnlimited, SaysNothingOfWhatIsJudgedOrDidNotPass) {
  DiagnosticRecord nothing = withoutLimits("A", Verdict::kPass);
  nothing.measuredResults.clear();
  for (const LimitSeverity severity : {LimitSeverity::kFail, LimitSeverity::kWarn}) {
    EXPECT_EQ(unlimited({withLimit(withoutLimits("A", Verdict::kPass), "R >= 0", severity)}), "");
  }
  EXPECT_EQ(unlimited({recordOf("A", Verdict::kPass), withoutLimits("A", Verdict::kError), nothing}), "");
}

TEST(PrintFailures, NamesWhatDidNotPassAndTheCommandThatExplainsIt) {
  const std::vector<DiagnosticRecord> records = {recordOf("A", Verdict::kPass), recordOf("B\033", Verdict::kFail),
                                                 recordOf("C", Verdict::kError), recordOf("D", Verdict::kError)};
  const std::string lines = "FAIL  B\\x1b: Count\nERROR C: Domain code -1\nERROR D: Domain code -1\n";
  EXPECT_EQ(failures(records), lines);
  EXPECT_EQ(failures(records, [](const std::string&) { return false; }), lines);
  EXPECT_EQ(failures(records, [](const std::string&) { return true; }),
            lines + "Next: quazor explain Count Domain:-1\n");
  EXPECT_EQ(failures(records, [](const std::string& topic) { return topic == "D"; }),
            lines + "Next: quazor explain D\n");
  EXPECT_EQ(failures({recordOf("A", Verdict::kPass)}, [](const std::string&) { return true; }), "");
}

DiagnosticRecord failedIn(const std::vector<std::string>& names) {
  DiagnosticRecord record = recordOf("A", Verdict::kFail);
  record.measuredResults.clear();
  for (const std::string& name : names) {
    QZMeasuredResult result(name, Measurement(1, QZDimensionlessUnit::events()));
    QZLimit limit("L");
    limit.setUpperBound(std::make_shared<const QZBound>(Measurement(0, QZDimensionlessUnit::events()), false));
    result.setLimit(std::move(limit));
    record.measuredResults.push_back(judgeResult(result));
  }
  return record;
}

bool isAnything(const std::string&) { return true; }

TEST(PrintFailures, NamesNotMoreThanThreeResults) {
  const DiagnosticRecord record = failedIn({"a b", "c", "d", "e", "e", "f"});
  EXPECT_EQ(failures({record}, isAnything),
            "FAIL  A: a b, c, d and 2 more\nNext: quazor explain 'a b' c d\n      and 2 more\n");
  EXPECT_EQ(failures({record}, [](const std::string& topic) { return topic == "c" || topic == "f"; }),
            "FAIL  A: a b, c, d and 2 more\nNext: quazor explain c f\n");
  EXPECT_EQ(failures({record}, [](const std::string& topic) { return topic == "A"; }),
            "FAIL  A: a b, c, d and 2 more\nNext: quazor explain A\n");
}

TEST(PrintFailures, AsksForEachTopicOnceAndNotForTooMany) {
  std::vector<DiagnosticRecord> records = {failedIn({"a", "b", "c", "d"}), failedIn({"d", "a", "e"})};
  EXPECT_THAT(failures(records, isAnything), testing::EndsWith("\nNext: quazor explain a b c d e\n"));
  for (char name = 'f'; name <= 'n'; ++name) records.push_back(failedIn({std::string(1, name)}));
  EXPECT_THAT(failures(records, isAnything),
              testing::EndsWith("\nNext: quazor explain a b c d e f g h i j k l\n      and 2 more\n"));
}

}  // namespace
}  // namespace quazor
