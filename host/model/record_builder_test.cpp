#include "host/model/record_builder.h"

#include "host/error/host_error.h"
#include "host/testing/test_events.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using namespace std::chrono_literals;

class RecordBuilderTest : public testing::Test {
 protected:
  void takeAll(const std::vector<RunEvent>& events) {
    for (const RunEvent& event : events) builder_.onEvent(event);
  }

  void close() { takeAll(builder_.ending(momentAt(90))); }

  RecordBuilder builder_;
};

TEST_F(RecordBuilderTest, FoldsEverythingThatADiagnosticTells) {
  takeAll(wholeDiagnostic("Good", 90));
  close();
  const DiagnosticRecord record = builder_.takeRecord();
  EXPECT_EQ(record.name, "Good");
  EXPECT_EQ(record.summary, "Its summary.");
  EXPECT_EQ(record.experimentName, "E");
  EXPECT_EQ(record.analysisName, "A");
  EXPECT_FALSE(record.experimentOnly);
  EXPECT_EQ(record.parameters.experiment[0].value, Value(3));
  EXPECT_EQ(record.seed, 5U);
  EXPECT_EQ(record.verdict, Verdict::kPass);
  EXPECT_EQ(record.error, nullptr);
  EXPECT_EQ(record.begin, momentAt(1));
  EXPECT_EQ(record.end, momentAt(90));
  ASSERT_EQ(record.measuredResults.size(), 1U);
  EXPECT_EQ(record.measuredResults[0].verdict, ResultVerdict::kPass);
  EXPECT_EQ(record.measurements.size(), 1U);
  EXPECT_EQ(*record.auxiliaryData.find("bytes"), Value(Bytes{0xA5}));
  ASSERT_EQ(record.log.size(), 1U);
  EXPECT_EQ(record.log[0].text, "a line");
  EXPECT_EQ(record.faults[0].fired, 1U);
  EXPECT_EQ(record.durations.setup, 0ns);
  EXPECT_EQ(record.durations.run, 3s);
  EXPECT_EQ(record.durations.teardown, std::nullopt);
  EXPECT_EQ(record.durations.analysis, std::nullopt);
  ASSERT_EQ(record.stages.size(), 3U);
  EXPECT_EQ(record.stages[1].stage, Stage::kRun);
  EXPECT_EQ(record.stages[1].begin, momentAt(3));
  EXPECT_EQ(record.stages[1].end, momentAt(5));
}

TEST_F(RecordBuilderTest, TimesTeardownAndAnalysis) {
  takeAll({beginningOf("A"), StageStarted{Stage::kTeardown, momentAt(2)},
           StageEnded{Stage::kTeardown, 5ns, momentAt(3)}, StageStarted{Stage::kAnalyze, momentAt(4)},
           StageEnded{Stage::kAnalyze, 6ns, momentAt(5)}});
  EXPECT_EQ(builder_.record().durations.teardown, 5ns);
  EXPECT_EQ(builder_.record().durations.analysis, 6ns);
  EXPECT_EQ(builder_.record().durations.setup, std::nullopt);
  EXPECT_EQ(builder_.record().durations.run, std::nullopt);
}

TEST_F(RecordBuilderTest, KnowsWhatIsOpen) {
  EXPECT_FALSE(builder_.isOpen());
  EXPECT_EQ(builder_.stage(), std::nullopt);
  builder_.onEvent(runOf({"A"}));
  EXPECT_FALSE(builder_.isOpen());
  takeAll({beginningOf("A"), StageStarted{Stage::kSetup, momentAt(2)}});
  EXPECT_TRUE(builder_.isOpen());
  EXPECT_FALSE(builder_.isCompleted());
  EXPECT_EQ(builder_.stage(), Stage::kSetup);
  builder_.onEvent(StageEnded{Stage::kSetup, 0ns, momentAt(3)});
  EXPECT_EQ(builder_.stage(), std::nullopt);
  builder_.onEvent(DiagnosticCompleted{});
  EXPECT_TRUE(builder_.isCompleted());
  EXPECT_TRUE(builder_.isOpen());
  builder_.onEvent(DiagnosticEnded{Verdict::kError, momentAt(4)});
  EXPECT_FALSE(builder_.isOpen());
  builder_.onEvent(RunEnded{std::nullopt, momentAt(5)});
  EXPECT_EQ(builder_.record().end, momentAt(4));
}

TEST_F(RecordBuilderTest, LeavesAStageOpenWhenAnotherOneEnds) {
  takeAll({beginningOf("A"), StageStarted{Stage::kSetup, momentAt(2)}, StageEnded{Stage::kRun, 0ns, momentAt(3)}});
  EXPECT_EQ(builder_.stage(), Stage::kSetup);
  EXPECT_EQ(builder_.record().end, momentAt(3));
}

TEST_F(RecordBuilderTest, BeginsEachDiagnosticAnew) {
  takeAll(wholeDiagnostic("A", 90));
  builder_.onEvent(beginningOf("B"));
  EXPECT_EQ(builder_.record().name, "B");
  EXPECT_TRUE(builder_.record().measuredResults.empty());
  EXPECT_TRUE(builder_.record().stages.empty());
  EXPECT_FALSE(builder_.isCompleted());
}

TEST_F(RecordBuilderTest, KeepsTheFirstFailure) {
  const DiagnosticErrorPtr first = errorWithMessage("D", 1, "first", nullptr);
  takeAll({beginningOf("A"), Failed{Stage::kTeardown, first},
           Failed{Stage::kAnalyze, errorWithMessage("D", 2, "second", nullptr)}});
  EXPECT_EQ(builder_.record().error, first);
  EXPECT_EQ(builder_.record().errorStage, Stage::kTeardown);
}

TEST_F(RecordBuilderTest, EndsWithTheVerdictThatFollows) {
  struct Row {
    const char* name;
    std::vector<RunEvent> events;
    const char* ending;
    Verdict verdict;
  };
  const DiagnosticErrorPtr error = errorWithMessage("D", 1, "m", nullptr);
  const double nan = std::numeric_limits<double>::quiet_NaN();
  const Row rows[] = {
      {"a pass", {ResultsReported{{resultOf(90)}}, DiagnosticCompleted{}}, "diagnosticEnded", Verdict::kPass},
      {"a failure", {ResultsReported{{resultOf(89)}}, DiagnosticCompleted{}}, "diagnosticEnded", Verdict::kFail},
      {"an error of its own", {Failed{Stage::kRun, error}, DiagnosticCompleted{}}, "diagnosticEnded", Verdict::kError},
      {"an error with results",
       {ResultsReported{{resultOf(90)}}, Failed{Stage::kTeardown, error}, DiagnosticCompleted{}},
       "diagnosticEnded",
       Verdict::kError},
      {"the judge's error",
       {ResultsReported{{resultOf(nan)}}, DiagnosticCompleted{}},
       "failed diagnosticEnded",
       Verdict::kError},
      {"nothing measured", {DiagnosticCompleted{}}, "failed diagnosticEnded", Verdict::kError},
      {"not completed", {ResultsReported{{resultOf(90)}}}, "failed diagnosticEnded", Verdict::kError},
      {"a verdict of the plug-in's",
       {DiagnosticEnded{Verdict::kPass, momentAt(2)}},
       "failed diagnosticEnded",
       Verdict::kError},
  };
  for (const Row& row : rows) {
    builder_.onEvent(beginningOf("A"));
    takeAll(row.events);
    const std::vector<RunEvent> ending = builder_.ending(momentAt(9));
    EXPECT_EQ(namesOf(ending), row.ending) << row.name;
    const auto& last = std::get<DiagnosticEnded>(ending.back());
    EXPECT_EQ(last.verdict, row.verdict) << row.name;
    EXPECT_EQ(last.date, momentAt(9)) << row.name;
    if (ending.size() > 1) {
      EXPECT_EQ(std::get<Failed>(ending.front()).stage, std::nullopt) << row.name;
    }
  }
}

}  // namespace
}  // namespace quazor
