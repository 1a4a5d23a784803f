#include "backends/log/tee_log.h"

#include "backends/log/recording_log.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>

namespace quazor {
namespace {

TEST(TeeLogTest, EveryBackendGetsEveryLine) {
  const auto one = std::make_shared<RecordingLog>();
  const auto other = std::make_shared<RecordingLog>();
  TeeLog log({one, other});
  log.write(LogLevel::kError, "s", "c", "first");
  log.write(LogLevel::kDebug, "s2", "c2", "second");
  const auto expected = testing::ElementsAre(LogRecord{LogLevel::kError, "s", "c", "first"},
                                             LogRecord{LogLevel::kDebug, "s2", "c2", "second"});
  EXPECT_THAT(one->records(), expected);
  EXPECT_THAT(other->records(), expected);
}

TEST(TeeLogTest, WithoutBackendsALineIsDropped) { TeeLog({}).write(LogLevel::kError, "s", "c", "text"); }

}  // namespace
}  // namespace quazor
