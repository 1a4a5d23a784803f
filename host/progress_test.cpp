#include "host/progress.h"

#include "backends/threads/recording_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

namespace quazor {
namespace {

BoundParameters withParameters(const std::vector<std::pair<std::string, std::optional<Value>>>& values) {
  BoundParameters parameters;
  for (const auto& [name, value] : values) {
    parameters.experiment.push_back({name, QZNumberParameter("", true), value, ""});
  }
  return parameters;
}

TEST(ExpectedSeconds, IsTheDurationElseTheTimeout) {
  EXPECT_EQ(expectedSeconds(withParameters({{"timeout", 10}, {"duration", 2.5}})), 2.5);
  EXPECT_EQ(expectedSeconds(withParameters({{"frameCount", 90}, {"timeout", 10}})), 10);
  EXPECT_EQ(expectedSeconds(withParameters({{"duration", std::nullopt}, {"timeout", 10}})), 10);
  EXPECT_EQ(expectedSeconds(withParameters({{"duration", 0}, {"timeout", -1}})), std::nullopt);
  EXPECT_EQ(expectedSeconds(withParameters({{"frameCount", 90}})), std::nullopt);
}

TEST(ProgressText, ComparesElapsedWithExpected) {
  EXPECT_EQ(progressText("Name", 1.26, 3.0), "Running Name: 1.3 s of 3 s");
  EXPECT_EQ(progressText("Name", 2.0, 2.5), "Running Name: 2 s of 2.5 s");
  EXPECT_EQ(progressText("Na\nme", 0.34, std::nullopt), "Running Na\\x0ame: 0.3 s");
  EXPECT_EQ(progressText("Name", 1, 1.7e300), "Running Name: 1 s of 1.7e+300 s");
}

TEST(Progress, ShowsNothingOfAShortRun) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  progress.start("Name", 3.0);
  progress.stop();
  EXPECT_EQ(terminal.str(), "");
}

TEST(Progress, ShowsNothingWithoutATerminal) {
  Progress progress(nullptr);
  progress.start("Name", 3.0);
  bool called = false;
  progress.aside([&called] { called = true; });
  progress.stop();
  EXPECT_TRUE(called);
}

TEST(Progress, CanRunAgainAndBeStoppedTwice) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  progress.stop();
  for (int i = 0; i < 3; ++i) {
    progress.start("Name", std::nullopt);
    progress.stop();
    progress.stop();
  }
  EXPECT_EQ(terminal.str(), "");
}

TEST(LogBesideProgress, HandsLinesOnAsTheyAre) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  const auto log = std::make_shared<RecordingLog>();
  LogBesideProgress(progress, log).write(LogLevel::kDebug, "s", "c", "text");
  EXPECT_THAT(log->records(), testing::ElementsAre(LogRecord{LogLevel::kDebug, "s", "c", "text"}));
}

}  // namespace
}  // namespace quazor
