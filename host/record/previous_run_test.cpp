#include "host/record/previous_run.h"

#include "host/error/exit_code.h"
#include "host/record/record_file.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_events.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using testing::ElementsAre;

TEST(LastRunFile, IsInTheDirectoryForState) {
  struct Row {
    const char* state;
    const char* home;
    const char* file;
  };
  constexpr Row kRows[] = {
      {"/state", "/home/a", "/state/quazor/last_run.jsonl"},
      {"/state", nullptr, "/state/quazor/last_run.jsonl"},
      {nullptr, "/home/a", "/home/a/.local/state/quazor/last_run.jsonl"},
      {"", "/home/a", "/home/a/.local/state/quazor/last_run.jsonl"},
      {"relative", "/home/a", "/home/a/.local/state/quazor/last_run.jsonl"},
      {nullptr, nullptr, ""},
      {nullptr, "relative", ""},
      {"", "", ""},
  };
  for (const Row& row : kRows) {
    const EnvironmentVariable state("XDG_STATE_HOME", row.state);
    const EnvironmentVariable home("HOME", row.home);
    EXPECT_EQ(previousRunFile(), row.file);
  }
}

class NamesNotPassedTest : public testing::Test {
 protected:
  std::vector<std::string> namesAfter(const std::vector<RunEvent>& events) const {
    const std::filesystem::path file = directory_.path() / "record";
    {
      RecordWriter writer(file, RecordWriter::Existing::kReplace);
      for (const RunEvent& event : events) writer.onEvent(event);
    }
    return failedNames(runIn(file));
  }

  TestDirectory directory_;
};

TEST_F(NamesNotPassedTest, AreThoseThatFailedOrEndedInAnError) {
  EXPECT_THAT(namesAfter(wholeRun()), ElementsAre("Bad", "Strange", "Broken"));
}

TEST_F(NamesNotPassedTest, HoldWhatDidNotComeToItsEndOrToItsBeginning) {
  std::vector<RunEvent> events = wholeRun();
  while (!std::holds_alternative<DiagnosticEnded>(events.back())) events.pop_back();  // of Broken
  EXPECT_THAT(namesAfter(events), ElementsAre("Bad", "Strange", "Broken"));
  events.resize(5);  // in the middle of Good
  EXPECT_THAT(namesAfter(events), ElementsAre("Good", "Bad", "Strange", "Broken"));
  events.resize(1);
  EXPECT_THAT(namesAfter(events), ElementsAre("Good", "Bad", "Strange", "Broken"));
}

TEST_F(NamesNotPassedTest, AreNoneWhenAllPassed) { EXPECT_THAT(namesAfter({runOf({})}), testing::IsEmpty()); }

}  // namespace
}  // namespace quazor
