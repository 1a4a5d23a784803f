#include "host/report/text_report.h"

#include "host/error/host_error.h"
#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

using testing::HasSubstr;

enum class End { kNone, kClosed, kOpen };

std::shared_ptr<const QZBound> boundOf(End end, double value) {
  if (end == End::kNone) return nullptr;
  return std::make_shared<const QZBound>(Measurement(value, QZDimensionlessUnit::frames()), end == End::kOpen);
}

std::string printed(const DiagnosticRecord& record, bool colour = false) {
  std::ostringstream out;
  printRecord(out, record, colour);
  return out.str();
}

TEST(LimitText, TellsNameAndRange) {
  struct Row {
    End lower;
    double low;
    End upper;
    double high;
    const char* text;
  };
  const Row rows[] = {
      {End::kClosed, 90, End::kNone, 0, "L: >= 90"},    {End::kOpen, 90, End::kNone, 0, "L: > 90"},
      {End::kNone, 0, End::kClosed, 0.5, "L: <= 0.5"},  {End::kNone, 0, End::kOpen, 0.5, "L: < 0.5"},
      {End::kClosed, 1, End::kOpen, 2, "L: >= 1, < 2"}, {End::kClosed, 0, End::kClosed, 0, "L: = 0"},
      {End::kClosed, 0, End::kOpen, 0, "L: >= 0, < 0"}, {End::kNone, 0, End::kNone, 0, "L: no bounds"},
  };
  for (const Row& row : rows) {
    QZLimit limit("L");
    limit.setLowerBound(boundOf(row.lower, row.low));
    limit.setUpperBound(boundOf(row.upper, row.high));
    EXPECT_EQ(limitText(limit), row.text);
  }
  EXPECT_EQ(limitText(std::nullopt), "-");
}

TEST(PrintRecord, ShowsATableAndTheVerdict) {
  EXPECT_EQ(printed(recordOf("Name", Verdict::kFail)),
            "Name\n"
            "  Its summary.\n"
            "\n"
            "  Result  Value  Unit    Limit          Verdict\n"
            "  Count      89  frames  Enough: >= 90  fail\n"
            "  Offset    0.5  events  -              -\n"
            "\n"
            "  FAIL\n"
            "\n");
}

TEST(PrintRecord, ShowsTheErrorAndWhatCausedIt) {
  DiagnosticRecord record = recordOf("Name", Verdict::kError);
  record.measuredResults.clear();
  EXPECT_EQ(printed(record), kTextOfErrorAlone);
}

TEST(PrintRecord, UsesColourOnlyWhenAsked) {
  EXPECT_THAT(printed(recordOf("Name", Verdict::kPass)), testing::Not(HasSubstr("\033")));
  EXPECT_THAT(printed(recordOf("Name", Verdict::kPass), true),
              testing::AllOf(HasSubstr("  \033[32mPASS\033[0m\n"), HasSubstr("\033[32mpass\033[0m\n")));
  EXPECT_THAT(printed(recordOf("Name", Verdict::kFail), true),
              testing::AllOf(HasSubstr("  \033[31mFAIL\033[0m\n"), HasSubstr("\033[31mfail\033[0m\n")));
  EXPECT_THAT(printed(recordOf("Name", Verdict::kError), true), HasSubstr("  \033[33mERROR\033[0m\n"));
}

TEST(PrintRecord, KeepsTerminalSequencesOfAPluginFromTheTerminal) {
  DiagnosticRecord record = recordOf("Na\033[2Jme", Verdict::kPass);
  record.summary = "Sum\033mary";
  record.measuredResults = {judgeResult(QZMeasuredResult("R\033", Measurement(1, QZUnit::unitWithSymbol("u\033"))))};
  EXPECT_THAT(printed(record), testing::Not(HasSubstr("\033")));
}

TEST(PrintVerdict, IsOneLine) {
  std::ostringstream out;
  printVerdict(out, recordOf("One", Verdict::kPass), false);
  printVerdict(out, recordOf("Two", Verdict::kError), false);
  EXPECT_EQ(out.str(), "PASS  One\nERROR Two\n");
}

TEST(VerdictText, DoesNotCallAnExperimentPassed) {
  DiagnosticRecord record = recordOf("X", Verdict::kPass);
  EXPECT_EQ(verdictText(record, false), "PASS");
  record.experimentOnly = true;
  EXPECT_EQ(verdictText(record, false), "DONE");
  EXPECT_EQ(verdictText(record, true), "\033[32mDONE\033[0m");
  record.verdict = Verdict::kError;
  EXPECT_EQ(verdictText(record, false), "ERROR");
  EXPECT_EQ(verdictText(recordOf("X", Verdict::kFail), false), "FAIL");
}

TEST(PrintSummary, CountsTheVerdicts) {
  std::ostringstream out;
  printSummary(out, {recordOf("A", Verdict::kPass), recordOf("B", Verdict::kFail), recordOf("C", Verdict::kPass),
                     recordOf("D", Verdict::kError)});
  printSummary(out, {recordOf("A", Verdict::kFail)});
  EXPECT_EQ(out.str(),
            "4 diagnostics: 2 passed, 1 failed, 1 ended in an error\n"
            "1 diagnostic: 0 passed, 1 failed, 0 ended in an error\n");
}

TEST(PrintUnfiredFaults, PointsOutOnlyThoseThatNeverFired) {
  DiagnosticRecord record = recordOf("Name", Verdict::kPass);
  record.faults = {{{{"operation", "a"}}, 1}, {{{"operation", "b"}}, 0}};
  std::ostringstream out;
  printUnfiredFaults(out, record);
  EXPECT_EQ(out.str(), "quazor: Name: a fault of the simulated phone never fired: {\"operation\":\"b\"}\n");
}

DescribedDiagnostic experimentAlone(const std::string& name) {
  DescribedDiagnostic described;
  described.diagnostic.name = described.diagnostic.experimentName = name;
  described.diagnostic.experimentOnly = true;
  described.description.experiment = QZDescription("About it.");
  return described;
}

std::string listed(const std::vector<DescribedDiagnostic>& diagnostics) {
  std::ostringstream out;
  printList(out, diagnostics);
  return out.str();
}

TEST(PrintList, HasALineForEachDiagnostic) {
  EXPECT_EQ(
      listed({{{"A.Long", "First.", "", "", nullptr, nullptr}, {}}, {{"B", "Second.", "", "", nullptr, nullptr}, {}}}),
      "A.Long  First.\nB       Second.\n");
}

TEST(PrintList, HasExperimentsApart) {
  DescribedDiagnostic broken = experimentAlone("X.Broken");
  broken.description.error = hostError(HostErrorCode::kException, "it\033 threw");
  const std::string experiments =
      "Experiments that no diagnostic uses (run one with 'quazor experiment NAME'):\n"
      "  X         About it.\n"
      "  X.Broken  could not be described: it\\x1b threw\n";
  EXPECT_EQ(listed({experimentAlone("X"), broken}), experiments);
  EXPECT_EQ(listed({{{"A", "First.", "", "", nullptr, nullptr}, {}}, experimentAlone("X"), broken}),
            "A  First.\n\n" + experiments);
}

TEST(PrintDescriptions, ShowsAnExperimentOnItsOwn) {
  ResolvedDiagnostic bound;
  bound.described = experimentAlone("X");
  bound.parameters.experiment.push_back({"x", QZNumberParameter("About x.", true), Value(2.5), "profile p.json"});
  ResolvedDiagnostic used;
  used.described = experimentAlone("Y");
  used.described.diagnostic.usedBy = {"D.One", "D.Two"};
  std::ostringstream out;
  printDescriptions(out, {bound, used});
  EXPECT_EQ(out.str(),
            "X\n"
            "  An experiment. No diagnostic uses it.\n"
            "\n"
            "  Experiment X\n"
            "    About it.\n"
            "    Parameter  Value  From            Meaning\n"
            "    x            2.5  profile p.json  About x.\n"
            "\n"
            "Y\n"
            "  An experiment, used by D.One, D.Two.\n"
            "\n"
            "  Experiment Y\n"
            "    About it.\n"
            "    It takes no parameters.\n");
}

TEST(PrintDescriptions, ShowsValuesAndWhereTheyComeFrom) {
  ResolvedDiagnostic bound;
  bound.described.diagnostic = {"D", "S.", "E", "A", nullptr, nullptr};
  bound.described.description = {QZDescription("About E."), QZDescription("About A.\nMore."), nullptr};
  bound.parameters.experiment.push_back({"x", QZNumberParameter("About x.", true), Value(2.5), "profile p.json"});
  bound.parameters.experiment.push_back({"yy", QZNumberParameter("About y.", false), std::nullopt, ""});
  bound.parameters.experiment.push_back({"z", QZNumberParameter("About z.", true), std::nullopt, ""});
  std::ostringstream out;
  printDescriptions(out, {bound});
  EXPECT_EQ(out.str(),
            "D\n"
            "  S.\n"
            "\n"
            "  Experiment E\n"
            "    About E.\n"
            "    Parameter  Value  From               Meaning\n"
            "    x            2.5  profile p.json     About x.\n"
            "    yy             -  not set            About y.\n"
            "    z              -  not set, required  About z.\n"
            "\n"
            "  Analysis A\n"
            "    About A.\n"
            "    More.\n"
            "    It takes no parameters.\n");
}

TEST(PrintDescriptions, TellsWhyADiagnosticCannotBeDescribed) {
  ResolvedDiagnostic bound;
  bound.described.diagnostic = {"D", "S.", "E", "A", nullptr, nullptr};
  bound.described.description.error = hostError(HostErrorCode::kException, "it threw");
  std::ostringstream out;
  printDescriptions(out, {bound});
  EXPECT_EQ(out.str(), "D\n  S.\n\n  It could not be described.\n    QuazorHostErrorDomain code 2: it threw\n");
}

}  // namespace
}  // namespace quazor
