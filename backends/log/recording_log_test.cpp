#include "backends/log/recording_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <memory>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;

TEST(RecordingLogTest, KeepsEveryLineInItsOrder) {
  RecordingLog log;
  log.write(LogLevel::kError, "subsystem", "category", "one");
  log.write(LogLevel::kDebug, "other", "", "two\nlines");
  EXPECT_THAT(log.records(), ElementsAre(LogRecord{LogLevel::kError, "subsystem", "category", "one"},
                                         LogRecord{LogLevel::kDebug, "other", "", "two\nlines"}));
  EXPECT_EQ(log.records().size(), 2U);
}

TEST(RecordingLogTest, TakingTheRecordsLeavesNone) {
  RecordingLog log;
  log.write(LogLevel::kDefault, "s", "c", "one");
  EXPECT_THAT(log.takeRecords(), ElementsAre(LogRecord{LogLevel::kDefault, "s", "c", "one"}));
  EXPECT_THAT(log.takeRecords(), testing::IsEmpty());
  log.write(LogLevel::kDefault, "s", "c", "two");
  EXPECT_THAT(log.records(), ElementsAre(LogRecord{LogLevel::kDefault, "s", "c", "two"}));
}

TEST(RecordingLogTest, KeepsTheTextAfterTheCallersIsGone) {
  RecordingLog log;
  {
    std::string text(100, 'a');
    log.write(LogLevel::kDefault, "s", "c", text);
    text.assign(100, 'b');
  }
  EXPECT_EQ(log.records().at(0).text, std::string(100, 'a'));
}

TEST(RecordingLogTest, TakesLinesOfSeveralThreads) {
  RecordingLog log;
  std::vector<std::thread> threads;
  for (const char* name : {"a", "b", "c"}) {
    threads.emplace_back([&log, name] {
      for (int i = 0; i < 1000; ++i) log.write(LogLevel::kDefault, "s", "c", name);
    });
  }
  for (std::thread& thread : threads) thread.join();
  const std::vector<LogRecord> records = log.records();
  EXPECT_EQ(records.size(), 3000U);
  for (const char* name : {"a", "b", "c"}) {
    EXPECT_EQ(std::count(records.begin(), records.end(), LogRecord{LogLevel::kDefault, "s", "c", name}), 1000) << name;
  }
}

TEST(RecordingLogTest, ReceivesTheLinesOfTheSharedLog) {
  const auto log = std::make_shared<RecordingLog>();
  sharedLog().setBackend(log, LogLevel::kDefault);
  logError("Failed %d times.", 2);
  logDebug("Not enabled.");
  sharedLog().setBackend(nullptr, LogLevel::kError);
  EXPECT_THAT(log->records(),
              ElementsAre(LogRecord{LogLevel::kError, sharedLog().subsystem(), "quazor", "Failed 2 times."}));
}

TEST(RecordingLogTest, ARecordIsPrintedWithAllItsParts) {
  std::ostringstream out;
  out << LogRecord{LogLevel::kDebug, "s", "c", "text"};
  EXPECT_EQ(out.str(), "3/s/c/text");
}

}  // namespace
}  // namespace quazor
