#include "host/model/run_log.h"

#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

using namespace std::chrono_literals;

TEST(RunLog, TellsEveryLineWithItsTimeSinceTheBeginning) {
  const auto clock = std::make_shared<ManualClock>();
  EventList events;
  RunLog log(clock, events);
  clock->sleep(250ms);
  const auto before = std::chrono::system_clock::now();
  log.write(LogLevel::kError, "s", "c", "first");
  clock->sleep(1s);
  log.write(LogLevel::kDebug, "s", "c", "second\nline");
  const auto after = std::chrono::system_clock::now();
  ASSERT_EQ(events.events.size(), 2U);
  const LogLine first = std::get<Logged>(events.events[0]).line;
  EXPECT_EQ(first.time, 250ms);
  EXPECT_EQ(first.level, LogLevel::kError);
  EXPECT_EQ(first.text, "first");
  EXPECT_LE(before, first.date);
  EXPECT_LE(first.date, after);
  const LogLine second = std::get<Logged>(events.events[1]).line;
  EXPECT_EQ(second.time, 1250ms);
  EXPECT_EQ(second.level, LogLevel::kDebug);
  EXPECT_EQ(second.text, "second\nline");
}

TEST(RunLog, DropsWhatIsWrittenAfterItWasClosed) {
  EventList events;
  RunLog log(std::make_shared<ManualClock>(), events);
  log.close();
  log.write(LogLevel::kError, "s", "c", "too late");
  EXPECT_TRUE(events.events.empty());
}

TEST(RunLog, TakesTheLinesOfAThreadThatBelongsToItOrToNone) {
  EventList events;
  RunLog log(std::make_shared<ManualClock>(), events);
  EventList eventsOfNext;
  RunLog next(std::make_shared<ManualClock>(), eventsOfNext);
  {
    const RunLog::Owner owner(log);
    log.write(LogLevel::kError, "s", "c", "its own");
    next.write(LogLevel::kError, "s", "c", "late for its own");
  }
  next.write(LogLevel::kError, "s", "c", "of no run");
  ASSERT_EQ(events.events.size(), 1U);
  EXPECT_EQ(std::get<Logged>(events.events[0]).line.text, "its own");
  ASSERT_EQ(eventsOfNext.events.size(), 1U);
  EXPECT_EQ(std::get<Logged>(eventsOfNext.events[0]).line.text, "of no run");
}

TEST(LogLevels, HaveNames) {
  EXPECT_EQ(nameOf(LogLevel::kError), "error");
  EXPECT_EQ(nameOf(LogLevel::kDefault), "default");
  EXPECT_EQ(nameOf(LogLevel::kDebug), "debug");
}

}  // namespace
}  // namespace quazor
