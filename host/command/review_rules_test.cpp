#include "host/command/review_rules.h"

#include "host/testing/test_records.h"

#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

bool explainsAll(const std::string& /*name*/) { return true; }
bool explainsNothing(const std::string& /*name*/) { return false; }

// "advice problem": the ratings in their order.
std::string ratings(const ReviewFindings& findings) {
  std::string text;
  for (const ReviewFinding& one : findings) text += (text.empty() ? "" : " ") + std::string(nameOf(one.rating));
  return text;
}

TEST(ReviewParameterRange, AsksForRangeUnitAndDefault) {
  const QZNumberParameter optional("How much.", false);
  const QZNumberParameter required("How much.", true);
  const auto said = [](const QZNumberParameter& declaration, const QZParameterRange* range) {
    const ReviewFindings findings = reviewParameterRange("E", "p", declaration, range);
    if (findings.empty()) return std::string();
    const std::string& text = findings.front().text;
    return text.substr(0, text.find(", so that"));
  };
  EXPECT_EQ(said(optional, nullptr), "the parameter 'p' has no range, no unit, no default");
  EXPECT_EQ(said(required, nullptr), "the parameter 'p' has no range, no unit");
  QZParameterRange range;
  range.setMaximum(5);
  EXPECT_EQ(said(optional, &range), "the parameter 'p' has no unit, no default");
  range.setDefault(1);
  EXPECT_EQ(said(optional, &range), "the parameter 'p' has no unit");
  range.setInteger();
  EXPECT_EQ(said(optional, &range), "");
  EXPECT_EQ(ratings(reviewParameterRange("E", "p", optional, nullptr)), "advice");
}

TEST(ReviewName, JudgesFormKindAndLength) {
  const struct {
    const char* kind;
    std::string name;
    const char* expected;
  } kRows[] = {
      {"Diagnostic", "CameraSyncDiagnostic.Back", ""},
      {"Analysis", "A1Analysis", ""},
      {"Diagnostic", "", "problem"},
      {"Diagnostic", "Camera Diagnostic", "problem"},
      {"Diagnostic", "Camera*Diagnostic", "problem"},
      {"Diagnostic", "Camera:Diagnostic", "problem"},
      {"Diagnostic", "CameraDiagnostic\n", "problem"},
      {"Diagnostic", "CameraDiagnostic\xC2\x9B", "problem"},
      {"Diagnostic", "cameraDiagnostic", "advice"},
      {"Diagnostic", "Camera_Diagnostic", "advice"},
      {"Diagnostic", "CameraDiagnostic.", "advice"},
      {"Diagnostic", "CameraDiagnostic..Back", "advice"},
      {"Diagnostic", "K\xC3\xA4meraDiagnostic", "advice"},
      {"Diagnostic", "CameraCheck", "advice"},
      {"Experiment", "camera", "advice advice"},
      {"Diagnostic", "Diagnostic" + std::string(38, 'a'), ""},
      {"Diagnostic", "Diagnostic" + std::string(39, 'a'), "advice"},
  };
  for (const auto& row : kRows) EXPECT_EQ(ratings(reviewName(row.kind, row.name)), row.expected) << row.name;
}

TEST(ReviewParameterName, MustBePossibleOnACommandLine) {
  EXPECT_EQ(ratings(reviewParameterName("E", "frameCount2")), "");
  EXPECT_EQ(ratings(reviewParameterName("E", "Frames")), "advice");
  for (const char* name : {"", "a b", "a=b", "experiment.a", "a:b"}) {
    EXPECT_EQ(ratings(reviewParameterName("E", name)), "problem") << name;
  }
}

TEST(ReviewSummary, IsOneSentence) {
  const struct {
    std::string summary;
    bool mayBeSeveral;
    const char* expected;
  } kRows[] = {
      {"Look at 3.5 mm of something, e.g. a jack.", false, ""},
      {"Look. Then listen.", false, "advice"},
      {"Look. Then listen.", true, ""},
      {"Look", false, "advice"},
      {"look.", false, "advice"},
      {" Look.", false, "advice"},
      {"Look. ", false, "advice"},
      {" ", false, "advice"},
      {"Look.\nListen.", false, "advice"},
      {"Look.\033[2J", false, "problem"},
      {"Look.\xC2\x9B\n", false, "problem"},
      {"", true, "problem"},
      {std::string(159, 'L') + ".", false, ""},
      {std::string(160, 'L') + ".", false, "advice"},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(ratings(reviewSummary("S", row.summary, row.mayBeSeveral)), row.expected) << row.summary;
  }
}

TEST(ReviewLinking, NamesTheOptions) {
  LinkProperties linked{true, true, true, false, false, {"$ORIGIN/..", "$ORIGIN"}};
  EXPECT_EQ(ratings(reviewLinking(linked)), "ok");
  linked.bindsNow = false;
  linked.hasStackProtector = false;
  const ReviewFindings advice = reviewLinking(linked);
  ASSERT_EQ(ratings(advice), "advice");
  EXPECT_EQ(advice.front().text,
            "link with -Wl,-z,now, compile with -fstack-protector-strong; quazor_add_plugin() of CMake does");
  linked.hasExecutableStack = true;
  linked.hasTextRelocations = true;
  EXPECT_EQ(ratings(reviewLinking(linked)), "problem problem advice");
}

TEST(ReviewLinking, ARunPathMustNotDependOnTheWorkingDirectory) {
  const std::vector<std::pair<std::string, std::string>> rows = {
      {"/opt/lib", "ok advice"}, {"", "ok problem"}, {"lib", "ok problem"}, {"$ORIGINAL", "ok problem"}};
  for (const auto& [entry, expected] : rows) {
    EXPECT_EQ(ratings(reviewLinking({true, true, true, false, false, {entry}})), expected) << entry;
  }
}

TEST(ReviewCost, AdvisesAboveHalfASecondAnd64Mebibytes) {
  EXPECT_EQ(reviewCost("loading", {500ms, 64 << 20}).rating, Rating::kOk);
  EXPECT_EQ(reviewCost("loading", {501ms, 0}).rating, Rating::kAdvice);
  EXPECT_EQ(reviewCost("loading", {0ms, (64 << 20) + 1}).rating, Rating::kAdvice);
  EXPECT_EQ(reviewCost("loading", {1500us, 3 << 19}).text, "1.5 ms, 1.5 MiB");
}

TEST(ReviewResults, ADiagnosticWithoutALimitCanNeverFail) {
  DiagnosticRecord record;
  record.measuredResults = judgeResults({QZMeasuredResult("A", Measurement(1, QZDimensionlessUnit::frames()))});
  EXPECT_EQ(ratings(reviewResults(record, explainsAll)), "problem");
  record.measuredResults = judgeResults({resultWithMinimum(1, 0)});
  EXPECT_EQ(ratings(reviewResults(record, explainsAll)), "ok");
  EXPECT_EQ(ratings(reviewResults(record, explainsNothing)), "ok advice");
}

TEST(ReviewResults, OnlyWhatCanFailNeedsAnExplanation) {
  DiagnosticRecord record;
  record.measuredResults =
      judgeResults({resultWithMinimum(1, 0), QZMeasuredResult("Info", Measurement(1, QZDimensionlessUnit::frames()))});
  EXPECT_EQ(ratings(reviewResults(record, [](const std::string& name) { return name == "Count"; })), "ok");
}

TEST(ReviewResults, UnitsAreThoseOfOthers) {
  DiagnosticRecord record;
  record.experimentOnly = true;
  record.measurements.set("A", Measurement(1, QZUnit::unitWithSymbol("ms")));
  EXPECT_EQ(ratings(reviewResults(record, explainsAll)), "ok");
  record.measurements.set("B", Measurement(1, QZUnit::unitWithSymbol("furlongs")));
  record.measurements.set("C", Measurement(1, QZUnit::unitWithSymbol("")));
  EXPECT_EQ(ratings(reviewResults(record, explainsAll)), "ok advice advice");
}

}  // namespace
}  // namespace quazor
