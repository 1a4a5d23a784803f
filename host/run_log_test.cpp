#include "host/run_log.h"

#include "backends/threads/recording_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;

class ManualClock final : public Clock {
 public:
  std::chrono::nanoseconds now() const override { return time; }
  Date date() const override { return Date(time); }
  void sleep(std::chrono::nanoseconds duration) override { time += duration; }

  std::chrono::nanoseconds time = 100s;
};

TEST(RunLog, KeepsEveryLineWithItsTimeSinceTheBeginning) {
  const auto clock = std::make_shared<ManualClock>();
  RunLog log(clock, {});
  clock->sleep(250ms);
  log.write(LogLevel::kError, "s", "c", "first");
  clock->sleep(1s);
  log.write(LogLevel::kDebug, "s", "c", "second");
  const std::vector<LogLine> lines = log.lines();
  ASSERT_EQ(lines.size(), 2U);
  EXPECT_EQ(lines[0].time, 250ms);
  EXPECT_EQ(lines[0].level, LogLevel::kError);
  EXPECT_EQ(lines[0].text, "first");
  EXPECT_EQ(lines[1].time, 1250ms);
  EXPECT_EQ(lines[1].level, LogLevel::kDebug);
}

TEST(RunLog, HandsOnWhatEachListenerWants) {
  const auto errors = std::make_shared<RecordingLog>();
  const auto defaults = std::make_shared<RecordingLog>();
  RunLog log(std::make_shared<ManualClock>(), {{errors, LogLevel::kError}, {defaults, LogLevel::kDefault}});
  log.write(LogLevel::kError, "sub", "cat", "e");
  log.write(LogLevel::kDefault, "sub", "cat", "d");
  log.write(LogLevel::kDebug, "sub", "cat", "g");
  const LogRecord error{LogLevel::kError, "sub", "cat", "e"};
  const LogRecord plain{LogLevel::kDefault, "sub", "cat", "d"};
  EXPECT_THAT(errors->records(), ElementsAre(error));
  EXPECT_THAT(defaults->records(), ElementsAre(error, plain));
  EXPECT_EQ(log.lines().size(), 3U);
}

TEST(LogLevels, HaveNames) {
  EXPECT_EQ(nameOf(LogLevel::kError), "error");
  EXPECT_EQ(nameOf(LogLevel::kDefault), "default");
  EXPECT_EQ(nameOf(LogLevel::kDebug), "debug");
}

}  // namespace
}  // namespace quazor
