#include "host/report/rerun_command.h"

#include "host/testing/test_records.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

// A run of the diagnostics A and B, with the same values.
struct TwoDiagnostics {
  RunStarted began = startedRun();
  std::vector<DiagnosticRecord> records = {recordOf("A", Verdict::kPass), recordOf("B", Verdict::kPass)};
  RunStreams streams{};

  TwoDiagnostics() { began.names = {"A", "B"}; }
  std::string commands() const { return rerunCommands({began, records, streams}); }
};

UserLimit limitOf(const std::string& text, bool ofProfile) {
  UserLimit limit = parseUserLimit(text);
  limit.onlyIfSelected = ofProfile;
  return limit;
}

TEST(RerunCommand, IsOneForDiagnosticsOfTheSameValues) {
  TwoDiagnostics run;
  run.began.tags.set("serial", "C 1");
  EXPECT_EQ(run.commands(),
            "quazor run A B \\\n  --plugin p.so \\\n  --phone phone.json \\\n  --seed 7 \\\n  --profile none \\\n"
            "  --set experiment.duration=3 \\\n  --tag 'serial=C 1'\n");
}

TEST(RerunCommand, IsOnePerDiagnosticIfTheirValuesDiffer) {
  TwoDiagnostics run;
  run.records[1].parameters.experiment[0].value = Value(4);
  EXPECT_THAT(run.commands(), HasSubstr("--set experiment.duration=3\nquazor run B "));
  EXPECT_THAT(run.commands(), HasSubstr("--set experiment.duration=4\n"));
}

// A setting would also reach the diagnostic in which it was not set.
TEST(RerunCommand, SetsNothingThatWasNotSet) {
  TwoDiagnostics run;
  run.records[1].parameters.experiment[0].value.reset();
  EXPECT_THAT(run.commands(), testing::EndsWith("quazor run B \\\n  --plugin p.so \\\n  --phone phone.json \\\n"
                                                "  --seed 7 \\\n  --profile none\n"));
}

TEST(RerunCommand, GivesTheSeedOfEachDiagnostic) {
  TwoDiagnostics run;
  run.records[1].seed = 8;
  EXPECT_THAT(run.commands(), HasSubstr("--seed 7 "));
  EXPECT_THAT(run.commands(), HasSubstr("--seed 8 "));
}

TEST(RerunCommand, HasNoSeedForAMachine) {
  TwoDiagnostics run;
  run.began.phone = "linux:board.json";
  EXPECT_THAT(run.commands(), HasSubstr("--phone linux:board.json \\\n  --profile none"));
}

TEST(RerunCommand, TracesTheQueuesAgain) {
  TwoDiagnostics run;
  EXPECT_THAT(run.commands(), Not(HasSubstr("--trace")));
  run.began.tracesTasks = true;
  EXPECT_THAT(run.commands(), HasSubstr("--trace queues\n"));
}

// A limit that fits no result of a command would be an error of it.
TEST(RerunCommand, HasTheLimitsThatCountForItsDiagnostics) {
  TwoDiagnostics run;
  run.records[1].seed = 8;
  run.began.limits = {limitOf("A:Count >= 3", true), limitOf("C:Count >= 4", true), limitOf("Count >= 5", false)};
  run.began.limits[2].severity = LimitSeverity::kWarn;
  const std::string commands = run.commands();
  const std::size_t second = commands.find("quazor run B");
  EXPECT_THAT(commands.substr(0, second), HasSubstr("--limit 'A:Count >= 3'"));
  EXPECT_THAT(commands.substr(second), Not(HasSubstr("--limit")));
  EXPECT_THAT(commands, Not(HasSubstr("Count >= 4")));
  EXPECT_THAT(commands, Not(HasSubstr("Count >= 5")));
}

TEST(RerunCommand, SkipsWhatTheUserSkipped) {
  TwoDiagnostics run;
  run.records[1].skip = Skip{SkipKind::kNotAllowed, "no lab"};
  EXPECT_THAT(run.commands(), HasSubstr("--skip 'B=no lab'"));
}

TEST(RerunCommand, RunsWhatTheRunDidNotReachWithItsPlannedValuesAndLimits) {
  TwoDiagnostics run;
  run.began.names.push_back("Never");
  EXPECT_THAT(run.commands(), Not(HasSubstr("Never"))) << "an earlier record has no values of it";
  run.began.seed = 7;
  run.began.planned = {{"A", run.records[0].parameters}, {"Never", run.records[0].parameters}};
  EXPECT_THAT(run.commands(), HasSubstr("quazor run A B Never \\\n"));
  run.began.planned[1].parameters.experiment[0].value = Value(4);
  run.began.limits = {limitOf("Never:Count >= 3", true), limitOf("Other:Count >= 3", true)};
  const std::string commands = run.commands();
  EXPECT_THAT(commands, HasSubstr("quazor run A B \\\n"));
  EXPECT_THAT(commands, testing::EndsWith("quazor run Never \\\n  --plugin p.so \\\n  --phone phone.json \\\n"
                                          "  --seed 7 \\\n  --profile none \\\n  --set experiment.duration=4 \\\n"
                                          "  --limit 'Never:Count >= 3'\n"));
}

}  // namespace
}  // namespace quazor
