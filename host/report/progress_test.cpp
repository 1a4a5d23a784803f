#include "host/report/progress.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>
#include <sstream>

namespace quazor {
namespace {

ResolvedParameters withParameters(const std::vector<std::pair<std::string, std::optional<Value>>>& values) {
  ResolvedParameters parameters;
  for (const auto& [name, value] : values) {
    parameters.experiment.push_back({name, QZNumberParameter("", true), value, ""});
  }
  return parameters;
}

TEST(ExpectationOf, TakesTheDurationElseTheTimeout) {
  const auto seconds = [](const std::vector<std::pair<std::string, std::optional<Value>>>& values) {
    return expectedProgressOf(withParameters(values)).seconds;
  };
  EXPECT_EQ(seconds({{"timeout", 10}, {"duration", 2.5}}), 2.5);
  EXPECT_EQ(seconds({{"frameCount", 90}, {"timeout", 10}}), 10);
  EXPECT_EQ(seconds({{"duration", std::nullopt}, {"timeout", 10}}), 10);
  EXPECT_EQ(seconds({{"duration", 0}, {"timeout", -1}}), std::nullopt);
  EXPECT_EQ(seconds({{"frameCount", 90}}), std::nullopt);
}

TEST(ExpectationOf, TakesTheFrameCount) {
  const auto frames = [](const std::vector<std::pair<std::string, std::optional<Value>>>& values) {
    return expectedProgressOf(withParameters(values)).frames;
  };
  EXPECT_EQ(frames({{"frameCount", 90}, {"timeout", 10}}), 90U);
  EXPECT_EQ(frames({{"frameCount", 90.9}}), 90U);
  EXPECT_EQ(frames({{"frameCount", UINT64_MAX}}), UINT64_MAX);
  EXPECT_EQ(frames({{"frameCount", 0}}), std::nullopt);
  EXPECT_EQ(frames({{"frameCount", 0.5}}), std::nullopt);
  EXPECT_EQ(frames({{"frameCount", -1}}), std::nullopt);
  EXPECT_EQ(frames({{"frameCount", std::nullopt}}), std::nullopt);
  EXPECT_EQ(frames({{"timeout", 10}}), std::nullopt);
}

TEST(ProgressText, ComparesElapsedWithExpected) {
  const auto text = [](const std::string& name, double elapsed, std::optional<double> seconds) {
    return progressText(name, elapsed, {seconds, std::nullopt}, std::nullopt);
  };
  EXPECT_EQ(text("Name", 1.26, 3.0), "Running Name: 1.3 s of 3 s");
  EXPECT_EQ(text("Name", 2.0, 2.5), "Running Name: 2 s of 2.5 s");
  EXPECT_EQ(text("Na\nme", 0.34, std::nullopt), "Running Na\\x0ame: 0.3 s");
  EXPECT_EQ(text("Name", 1, 1.7e300), "Running Name: 1 s of 1.7e+300 s");
}

TEST(ProgressText, ShortensTheNameIfTheTerminalIsNarrow) {
  const auto text = [](std::size_t columns) { return progressText("CameraDiagnostic", 4.1, {10, 300}, 123, columns); };
  EXPECT_EQ(text(58), "Running CameraDiagnostic: 4.1 s of 10 s, 123 of 300 frames");
  EXPECT_EQ(text(57), "Running CameraDiagno...: 4.1 s of 10 s, 123 of 300 frames");
  EXPECT_EQ(text(54), "Running CameraDia...: 4.1 s of 10 s, 123 of 300 frames");
  EXPECT_EQ(text(53), "CameraDiagnostic: 4.1 s of 10 s, 123 of 300 frames");
  EXPECT_EQ(text(40), "Cam...: 4.1 s of 10 s, 123 of 300 frames");
}

TEST(StatusLine, IsShorterThanTheTerminal) {
  std::ostringstream terminal;
  setColumns(terminal, 10);
  StatusLine line(&terminal);
  line.show("0123456789");
  line.show("\u6D4B\u8BD5\u6D4B\u8BD5\u6D4B");
  line.erase();
  line.erase();
  EXPECT_EQ(terminal.str(), "012345...\r\033[K\u6D4B\u8BD5\u6D4B...\r\033[K");
}

TEST(ProgressText, ComparesFramesOnlyWhenTheyAreExpectedAndCounted) {
  EXPECT_EQ(progressText("Name", 4.1, {10, 300}, 123), "Running Name: 4.1 s of 10 s, 123 of 300 frames");
  EXPECT_EQ(progressText("Name", 4.1, {std::nullopt, 300}, 0), "Running Name: 4.1 s, 0 of 300 frames");
  EXPECT_EQ(progressText("Name", 4.1, {10, std::nullopt}, 123), "Running Name: 4.1 s of 10 s");
  EXPECT_EQ(progressText("Name", 4.1, {10, 300}, std::nullopt), "Running Name: 4.1 s of 10 s");
}

TEST(Progress, ShowsNothingOfAShortRun) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  progress.start("Name", {3.0, std::nullopt});
  progress.stop();
  EXPECT_EQ(terminal.str(), "");
}

TEST(Progress, ShowsNothingWithoutATerminal) {
  Progress progress(nullptr);
  progress.start("Name", {3.0, std::nullopt});
  bool called = false;
  progress.printAbove([&called] { called = true; });
  progress.stop();
  EXPECT_TRUE(called);
}

TEST(Progress, CanRunAgainAndBeStoppedTwice) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  progress.stop();
  for (int i = 0; i < 3; ++i) {
    progress.start("Name", {});
    progress.stop();
    progress.stop();
  }
  EXPECT_EQ(terminal.str(), "");
}

TEST(Progress, KeepsTheCounterOfFramesNoLongerThanTheRun) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  const auto watched = std::make_shared<int>(0);
  const auto count = [watched] { return std::uint64_t{7}; };
  progress.countFrames(count);
  EXPECT_EQ(watched.use_count(), 2);  // nothing is running, so only `count` holds it
  progress.start("Name", {});
  progress.countFrames(count);
  EXPECT_EQ(watched.use_count(), 3);
  progress.stop();
  EXPECT_EQ(watched.use_count(), 2);
}

TEST(Progress, ShowsALongRunAndErasesItsLine) {
  std::ostringstream terminal;
  Progress progress(&terminal);
  progress.start("Name", {});
  progress.countFrames([] { return std::uint64_t{7}; });
  while (terminal.str().empty()) progress.update();
  EXPECT_EQ(terminal.str(), "Running Name: 0.3 s");
  progress.printAbove([&terminal] { terminal << "|"; });
  progress.stop();
  EXPECT_EQ(terminal.str(), "Running Name: 0.3 s\r\033[K|");
}

}  // namespace
}  // namespace quazor
