#include "host/report/page/advised_command.h"

#include "host/testing/test_records.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

// A run in which A failed and B passed.
struct TestRun {
  RunStarted began = startedRun();
  std::vector<DiagnosticRecord> records = {recordOf("A", Verdict::kFail), recordOf("B", Verdict::kPass),
                                           recordOf("C", Verdict::kFail)};
  RunStreams streams{};

  std::string fitted(const std::string& command) const {
    const ShownRun run{began, records, streams};
    return fittedCommand(command, {run, records[0]});
  }
  std::string known(const std::string& command) const {
    const ShownRun run{began, records, streams};
    return knownOfCommand(command, {run, records[0]});
  }
};

TEST(AdvisedCommand, RunsOnTheSamePhone) {
  TestRun run;
  EXPECT_EQ(run.fitted("quazor run B --set duration=10"), "quazor run B --set duration=10 --phone phone.json");
  EXPECT_EQ(run.fitted("quazor run B --phone healthy"), "quazor run B --phone healthy");
  run.began.phone = "my phone.json";
  EXPECT_EQ(run.fitted("quazor run --all"), "quazor run --all --phone 'my phone.json'");
}

TEST(AdvisedCommand, NamesTheDiagnosticOrItsExperiment) {
  TestRun run;
  run.records[0].experimentName = "AExperiment";
  EXPECT_EQ(run.fitted("quazor run NAME --log-level debug"), "quazor run A --log-level debug --phone phone.json");
  EXPECT_EQ(run.fitted("quazor experiment NAME"), "quazor experiment AExperiment --phone phone.json");
}

TEST(AdvisedCommand, LeavesOtherTextsAsTheyAre) {
  const TestRun run;
  for (const char* text : {"quazor explain NAME", "--profile  strict", "quazor run", "NAME"}) {
    EXPECT_EQ(run.fitted(text), text);
  }
}

TEST(KnownOfCommand, IsTheOutcomeOfADiagnosticThatRan) {
  const TestRun run;
  EXPECT_EQ(run.known("quazor run B"), "already run here: passed");
  EXPECT_EQ(run.known("quazor run C"), "already run here: failed");
  EXPECT_EQ(run.known("quazor run D"), "");
  EXPECT_EQ(run.known("quazor run B --set duration=10"), "");
  EXPECT_EQ(run.known("quazor explain B"), "");
  // It is to be run again.
  EXPECT_EQ(run.known("quazor run A"), "");
}

TEST(KnownOfCommand, SaysThatAProfileWasUsed) {
  TestRun run;
  EXPECT_EQ(run.known("--profile strict"), "");
  EXPECT_EQ(run.known("quazor run B --profile strict"), "");
  run.records[1].parameters.experiment[0].source = "profile strict.json";
  EXPECT_EQ(run.known("--profile strict"), "used in this run");
  EXPECT_EQ(run.known("quazor run B --profile strict"), "already run here: passed");
  EXPECT_EQ(run.known("--profile"), "");
}

}  // namespace
}  // namespace quazor
