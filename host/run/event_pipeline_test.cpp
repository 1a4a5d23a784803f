#include "host/run/event_pipeline.h"

#include "host/error/host_error.h"
#include "host/record/previous_run.h"
#include "host/record/verification.h"
#include "host/testing/test_directory.h"
#include "host/testing/test_environment.h"
#include "host/testing/test_events.h"
#include "host/testing/test_refusals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <sstream>
#include <thread>

namespace quazor {
namespace {

namespace fs = std::filesystem;
using testing::HasSubstr;
using testing::IsEmpty;

class EventPipelineTest : public testing::Test {
 protected:
  EventPipelineTest() {
    options_.record = record_;
    options_.replacesRecord = true;
  }

  static void takeAll(EventPipeline& events, const std::vector<RunEvent>& some) {
    for (const RunEvent& event : some) events.onEvent(event);
  }

  // The events that the process of a diagnostic sends, and the end of the diagnostic.
  static void perform(EventPipeline& events, const std::string& name, double value) {
    takeAll(events, wholeDiagnostic(name, value));
    events.endDiagnostic();
  }

  std::string lastRun() const { return directory_.read("state/quazor/last_run.jsonl"); }

  TestDirectory directory_;
  const EnvironmentVariable state_{"XDG_STATE_HOME", (directory_.path() / "state").c_str()};
  const fs::path record_ = directory_.path() / "record";
  EventPipelineOptions keeping() const {
    EventPipelineOptions options = options_;
    options.keepsLastRun = true;
    return options;
  }

  EventPipelineOptions options_;
  std::ostringstream out_;
  std::ostringstream err_;
  Console console_{out_, err_};
};

TEST_F(EventPipelineTest, RecordsAndReportsARun) {
  EventPipeline events(keeping(), console_);
  events.onEvent(runOf({"A", "B"}));
  perform(events, "A", 90);
  perform(events, "B", 89);
  events.onEvent(RunEnded{std::nullopt, momentAt(99)});
  EXPECT_EQ(events.exitCode(), ExitCode::kFailed);
  EXPECT_THAT(
      out_.str(),
      testing::AllOf(HasSubstr("PASS  A  1 result"),
                     testing::EndsWith("2 diagnostics: 1 passed, 1 failed, 0 ended in an error\nFAIL  B: Count\n")));
  EXPECT_THAT(problemsOf(readRecord(record_).events), IsEmpty());
  EXPECT_EQ(runIn(record_).records.size(), 2U);
  EXPECT_EQ(lastRun(), directory_.read("record"));
}

TEST_F(EventPipelineTest, RecordsWhatTheUserIsToldBeforehand) {
  // At each flush of the console, checks that the record already contains what the console shows.
  class Watcher final : public std::stringbuf {
   public:
    explicit Watcher(fs::path record) : record_(std::move(record)) {}

    int sync() override {
      if (!isRecorded.has_value() && str().find("PASS") != std::string::npos) {
        const RecordedRun run = runIn(record_);
        isRecorded = !run.records.empty() && run.records[0].verdict == Verdict::kPass;
      }
      return 0;
    }

    std::optional<bool> isRecorded;  // set when the verdict first appears on the console

   private:
    const fs::path record_;
  };
  Watcher watcher(record_);
  std::ostream out(&watcher);
  Console console{out, err_};
  EventPipeline events(options_, console);
  events.onEvent(runOf({"A"}));
  perform(events, "A", 90);
  EXPECT_EQ(watcher.isRecorded, true);
}

TEST_F(EventPipelineTest, KeepsTheLastRunOnlyWhenItShould) {
  { EventPipeline events(options_, console_); }
  EXPECT_FALSE(fs::exists(previousRunFile()));
  { EventPipeline events(keeping(), console_); }
  EXPECT_TRUE(fs::exists(previousRunFile()));
}

TEST_F(EventPipelineTest, RunsWithoutAPlaceForTheLastRun) {
  directory_.write("state", "a file where a directory should be");
  {
    EventPipeline events(keeping(), console_);
    events.onEvent(runOf({"A"}));
    perform(events, "A", 90);
  }
  EXPECT_EQ(runIn(record_).records.size(), 1U);
  const EnvironmentVariable none("XDG_STATE_HOME", nullptr);
  const EnvironmentVariable noHome("HOME", nullptr);
  EventPipeline others(keeping(), console_);
  others.onEvent(runOf({}));
}

TEST_F(EventPipelineTest, RefusesARecordThatCannotBeBegun) {
  options_.record = directory_.path() / "nowhere" / "record";
  EXPECT_NE(refusalOf(ExitCode::kCannotWrite, [&] { const EventPipeline events(keeping(), console_); }), "accepted");
  EXPECT_FALSE(fs::exists(previousRunFile()));
}

TEST_F(EventPipelineTest, EndsADiagnosticInAnErrorWhenItsRecordCannotBeWritten) {
  options_.record = "/dev/full";
  EventPipeline events(keeping(), console_);
  events.onEvent(runOf({"A"}));
  perform(events, "A", 90);
  events.onEvent(RunEnded{std::nullopt, momentAt(99)});
  EXPECT_EQ(events.exitCode(), ExitCode::kError);
  EXPECT_THAT(out_.str(), HasSubstr("\n\n  QuazorHostErrorDomain code 10: the record '/dev/full' cannot be "
                                    "written: No space left on device\n"));
  EXPECT_THAT(problemsOf(readRecord(previousRunFile()).events), IsEmpty());
}

TEST_F(EventPipelineTest, EndsADiagnosticThatWasNotCompletedInAnError) {
  EventPipeline events(options_, console_);
  events.onEvent(runOf({"A"}));
  std::vector<RunEvent> some = wholeDiagnostic("A", 90);
  some.pop_back();
  takeAll(events, some);
  events.endDiagnostic();
  EXPECT_THAT(out_.str(), HasSubstr("QuazorHostErrorDomain code 9: the run was not completed"));
}

TEST_F(EventPipelineTest, ClosesTheOpenDiagnosticAndTheRunWhenInterrupted) {
  EventPipeline events(options_, console_);
  events.onEvent(runOf({"A", "B", "C"}));
  perform(events, "A", 90);
  takeAll(events, {beginningOf("B"), StageStarted{Stage::kRun, momentAt(2)}});
  bool left = false;
  events.interruptAndLeave([&] {
    left = true;
    EXPECT_TRUE(runIn(record_).ended);  // everything is written by then
  });
  EXPECT_TRUE(left);
  const RecordedRun run = runIn(record_);
  ASSERT_EQ(run.records.size(), 2U);
  EXPECT_EQ(run.records[1].verdict, Verdict::kError);
  EXPECT_EQ(run.records[1].error->code(), static_cast<std::int64_t>(HostErrorCode::kInterrupted));
  EXPECT_EQ(run.records[1].error->localizedDescription(), "B was interrupted");
  EXPECT_EQ(run.records[1].errorStage, Stage::kRun);
  EXPECT_EQ(run.ended->interrupted, "B");
  EXPECT_THAT(problemsOf(readRecord(record_).events), IsEmpty());
  EXPECT_EQ(err_.str().find("interrupted while B was running"), err_.str().find("interrupted"));
}

TEST_F(EventPipelineTest, ClosesTheRunWhenInterruptedBetweenTwo) {
  EventPipeline events(options_, console_);
  events.onEvent(runOf({"A", "B"}));
  perform(events, "A", 90);
  events.interruptAndLeave([] {});
  EXPECT_EQ(runIn(record_).ended->interrupted, "");
  EXPECT_EQ(runIn(record_).records.size(), 1U);
}

TEST_F(EventPipelineTest, TakesAnInterruptBetweenTwoStagesForOneOfTheDescription) {
  EventPipeline events(options_, console_);
  takeAll(events, {runOf({"A"}), beginningOf("A")});
  events.interruptAndLeave([] {});
  EXPECT_EQ(runIn(record_).records[0].errorStage, Stage::kDescribe);
}

TEST_F(EventPipelineTest, OnlyLeavesAfterTheEndOfTheRun) {
  EventPipeline events(options_, console_);
  events.onEvent(runOf({"A"}));
  perform(events, "A", 90);
  events.onEvent(RunEnded{std::nullopt, momentAt(99)});
  const std::string before = directory_.read("record");
  const std::string printed = out_.str();
  bool left = false;
  events.interruptAndLeave([&left] { left = true; });
  EXPECT_TRUE(left);
  EXPECT_EQ(directory_.read("record"), before);
  EXPECT_EQ(out_.str(), printed);
}

TEST_F(EventPipelineTest, LetsOneEventThroughAtATime) {
  options_.report.shownLog = LogLevel::kDebug;
  EventPipeline events(options_, console_);
  takeAll(events, {runOf({"A"}), beginningOf("A")});
  constexpr int kLines = 500;
  const auto log = [&events] {
    for (int i = 0; i < kLines; ++i) events.onEvent(Logged{{{}, LogLevel::kDebug, "a line", momentAt(3)}});
  };
  {
    std::thread one(log);
    std::thread other(log);
    one.join();
    other.join();
  }
  events.endDiagnostic();
  EXPECT_EQ(runIn(record_).records[0].log.size(), 2U * kLines);
}

// The texts of the log lines of a recorded diagnostic.
std::vector<std::string> logOf(const DiagnosticRecord& record) {
  std::vector<std::string> texts;
  for (const LogLine& line : record.log) texts.push_back(line.text);
  return texts;
}

Logged lineOf(std::string text) { return {{{}, LogLevel::kDefault, std::move(text), momentAt(3)}}; }

TEST_F(EventPipelineTest, KeepsNoMoreLogLinesThanTheLimitOfEachDiagnostic) {
  options_.logLimit = {2, 1000};
  EventPipeline events(keeping(), console_);
  events.onEvent(runOf({"A", "B"}));
  for (const char* const name : {"A", "B"}) {
    events.onEvent(beginningOf(name));
    for (const char* const text : {"one", "two", "three", "four"}) events.onEvent(lineOf(text));
    events.onEvent(Logged{lineOf("of the host").line, true});
    events.endDiagnostic();
  }
  events.onEvent(RunEnded{std::nullopt, momentAt(99)});
  const RecordedRun run = runIn(record_);
  ASSERT_EQ(run.records.size(), 2U);
  for (const DiagnosticRecord& record : run.records) {
    EXPECT_THAT(logOf(record),
                testing::ElementsAre("one", "two", "of the host", "2 more log lines were left out (--log-limit)"));
  }
  EXPECT_EQ(lastRun(), directory_.read("record"));
  EXPECT_THAT(problemsOf(readRecord(record_).events), IsEmpty());
}

TEST_F(EventPipelineTest, TellsWhatWasLeftOutAlsoOfAnInterruptedDiagnostic) {
  options_.logLimit = {1, 1000};
  EventPipeline events(options_, console_);
  takeAll(events, {runOf({"A"}), beginningOf("A"), lineOf("one"), lineOf("two")});
  events.interruptAndLeave([] {});
  EXPECT_THAT(logOf(runIn(record_).records[0]),
              testing::ElementsAre("one", "1 more log line was left out (--log-limit)"));
}

TEST_F(EventPipelineTest, KeepsNoMoreTextOfTheLogThanItsLimit) {
  options_.logLimit = {1000, 10};
  EventPipeline events(options_, console_);
  takeAll(events, {runOf({"A"}), beginningOf("A"), lineOf("12345"), lineOf("123456"), lineOf("1")});
  events.endDiagnostic();
  EXPECT_THAT(logOf(runIn(record_).records[0]),
              testing::ElementsAre("12345", "2 more log lines were left out (--log-limit)"));
}

TEST_F(EventPipelineTest, SendsLogLinesToTheSystemsLogWhenAskedTo) {
  // A test cannot read the system log, so it only checks that nothing else changes.
  options_.systemLog = true;
  EventPipeline events(options_, console_);
  events.onEvent(runOf({"A"}));
  perform(events, "A", 90);
  EXPECT_EQ(runIn(record_).records[0].log.size(), 1U);
}

TEST_F(EventPipelineTest, ShowsItsProgress) {
  console_.showsProgress = true;
  EventPipeline events(options_, console_);
  EXPECT_TRUE(events.progress().isShown());
}

}  // namespace
}  // namespace quazor
