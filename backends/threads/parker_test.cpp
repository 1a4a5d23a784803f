#include "backends/threads/parker.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>

namespace quazor {
namespace {

std::chrono::nanoseconds now() { return std::chrono::steady_clock::now().time_since_epoch(); }

TEST(ParkerTest, AWakeUpBeforeTheSleepIsNotLost) {
  Parker parker;
  parker.prepare();
  parker.unpark();
  parker.park(std::chrono::nanoseconds::max());
}

TEST(ParkerTest, PreparingForgetsAnOlderWakeUp) {
  Parker parker;
  parker.unpark();
  parker.prepare();
  const auto deadline = now() + std::chrono::milliseconds(2);
  parker.park(deadline);
  EXPECT_GE(now(), deadline);
}

TEST(ParkerTest, ADeadlineThatHasPassedEndsTheSleepAtOnce) {
  Parker parker;
  parker.prepare();
  const auto before = now();
  parker.park(before - std::chrono::hours(1));
  parker.park(std::chrono::nanoseconds::zero());
  EXPECT_LT(now() - before, std::chrono::seconds(10));
}

TEST(ParkerTest, AnotherThreadEndsTheSleep) {
  Parker parker;
  parker.prepare();
  std::atomic<bool> awake = false;
  std::thread sleeper([&] {
    parker.park(std::chrono::nanoseconds::max());
    awake = true;
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(2));
  EXPECT_FALSE(awake);
  parker.unpark();
  sleeper.join();
}

}  // namespace
}  // namespace quazor
