#include "host/run/log_limit.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstddef>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// Keeps the texts of the log lines, and the number of other events.
// Thread: one at a time.
class Kept final : public RunEventSink {
 public:
  void onEvent(const RunEvent& event) override {
    if (const auto* const logged = std::get_if<Logged>(&event)) {
      texts.push_back(logged->line.text);
    } else {
      ++others;
    }
  }

  std::vector<std::string> texts;
  int others = 0;
};

RunEvent eventOf(std::string text) { return Logged{{0ns, LogLevel::kDefault, std::move(text), {}}}; }

TEST(LogCap, AdmitsAsManyLinesAsItsLimitAndNoneAfterwards) {
  LogCap cap({3, 1000});
  for (int i = 0; i < 3; ++i) EXPECT_TRUE(cap.admits(1));
  EXPECT_EQ(cap.leftOut(), 0U);
  EXPECT_FALSE(cap.admits(0));
  EXPECT_FALSE(cap.admits(1));
  EXPECT_EQ(cap.leftOut(), 2U);
}

TEST(LogCap, AdmitsAsMuchTextAsItsLimitAndNothingAfterTheFirstLineThatDoesNotFit) {
  LogCap cap({1000, 10});
  EXPECT_TRUE(cap.admits(4));
  EXPECT_TRUE(cap.admits(6));
  EXPECT_TRUE(cap.admits(0));
  EXPECT_FALSE(cap.admits(1));
  EXPECT_FALSE(cap.admits(0));  // it would fit, but the log would have a gap
  EXPECT_EQ(cap.leftOut(), 2U);
}

TEST(LogCap, WithoutALimitAdmitsAnyLine) {
  LogCap cap(LogLimit::none());
  EXPECT_TRUE(cap.admits(std::size_t{1} << 40U));
  EXPECT_TRUE(cap.admits(std::size_t{1} << 60U));
}

TEST(LogCap, ByDefaultAdmitsAMillionLinesOr64MiB) {
  LogCap lines{LogLimit()};
  for (int i = 0; i < 1'000'000; ++i) ASSERT_TRUE(lines.admits(1));
  EXPECT_FALSE(lines.admits(1));
  LogCap text{LogLimit()};
  EXPECT_TRUE(text.admits(std::size_t{64} << 20U));
  EXPECT_FALSE(text.admits(1));
}

TEST(LimitedLog, PassesOnOtherEventsAndCountsTheLinesThatItLeavesOut) {
  Kept kept;
  SharedCounter leftOut;
  LimitedLog limited(kept, {2, 1000}, leftOut);
  for (const char* const text : {"a", "b", "c", "d"}) limited.onEvent(eventOf(text));
  limited.onEvent(DiagnosticCompleted{});
  EXPECT_THAT(kept.texts, testing::ElementsAre("a", "b"));
  EXPECT_EQ(kept.others, 1);
  EXPECT_EQ(leftOut.get(), 2U);
}

TEST(LeftOutLine, CountsInASentence) {
  EXPECT_EQ(leftOutLine(1, 5ns).line.text, "1 more log line was left out (--log-limit)");
  const Logged several = leftOutLine(2, 5ns);
  EXPECT_EQ(several.line.text, "2 more log lines were left out (--log-limit)");
  EXPECT_EQ(several.line.time, 5ns);
  EXPECT_TRUE(several.isOfHost);
}

}  // namespace
}  // namespace quazor
