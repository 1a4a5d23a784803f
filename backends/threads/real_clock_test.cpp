#include "backends/threads/real_clock.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <thread>

namespace quazor {
namespace {

TEST(RealClockTest, ReadsTheSteadyClock) {
  const auto before = std::chrono::steady_clock::now().time_since_epoch();
  const auto now = RealClock().now();
  const auto after = std::chrono::steady_clock::now().time_since_epoch();
  EXPECT_LE(before, now);
  EXPECT_LE(now, after);
}

TEST(RealClockTest, DatesComeFromTheSystemClock) {
  const auto difference = RealClock().date() - std::chrono::system_clock::now();
  EXPECT_LT(std::chrono::abs(difference), std::chrono::minutes(1));
}

TEST(RealClockTest, ASleepBeyondTheClocksRangeDoesNotReturn) {
  const auto returned = std::make_shared<std::atomic<int>>(0);
  for (const auto duration : {std::chrono::nanoseconds::max(), std::chrono::nanoseconds::max() - RealClock().now(),
                              std::chrono::nanoseconds::max() / 2}) {
    std::thread([returned, duration] {
      RealClock().sleep(duration);
      ++*returned;
    }).detach();  // sleeps until the process ends
  }
  RealClock().sleep(std::chrono::milliseconds(5));
  EXPECT_EQ(*returned, 0);
}

}  // namespace
}  // namespace quazor
