// Signals and stops concurrent with waits and ends of runs, at pseudo-random times from a fixed seed, as a typed test
// suite for loops of real threads. Also run it under the thread sanitizer.
//
// A backend instantiates it with a type that has a default constructor and the member
//
//   RunLoop& loop();  // the calling thread's, which outlives the object
#pragma once

#include "platform/run_loop.h"
#include "tests/support/effort.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <functional>
#include <iostream>
#include <memory>
#include <random>
#include <string_view>
#include <thread>
#include <vector>

namespace quazor {

template <class UnderTest>
class RunLoopStress : public ::testing::Test {
 protected:
  static constexpr std::string_view kMode = kRunLoopDefaultMode;
  static constexpr std::chrono::seconds kLong{60};

  static RunLoop& currentLoop() { return UnderTest().loop(); }
};

TYPED_TEST_SUITE_P(RunLoopStress);

// Spins for a random time of up to `most`.
inline void delay(std::minstd_rand& random, std::chrono::nanoseconds most) {
  const auto end =
      std::chrono::steady_clock::now() + std::chrono::nanoseconds(random() % static_cast<unsigned>(most.count()));
  while (std::chrono::steady_clock::now() < end) {
  }
}

// A thread that performs the same action once per round.
class StressHelper {
 public:
  StressHelper(unsigned seed, std::function<void(int round)> act)
      : thread_([this, seed, work = std::move(act)] {
          std::minstd_rand random(seed);
          for (int round = 1;; ++round) {
            begun_.wait(round - 1);
            if (begun_.load() < 0) return;
            delay(random, std::chrono::microseconds(10));
            work(round);
            ended_.store(round);
            ended_.notify_one();
          }
        }) {}
  StressHelper(const StressHelper&) = delete;
  StressHelper& operator=(const StressHelper&) = delete;
  ~StressHelper() {
    begin(-1);
    thread_.join();
  }

  void begin(int round) {
    begun_.store(round);
    begun_.notify_one();
  }
  void waitForEndOf(int round) { ended_.wait(round - 1); }

 private:
  std::atomic<int> begun_{0};
  std::atomic<int> ended_{0};
  std::thread thread_;
};

// In each round other threads, started together with a run, signal it, stop it or both.
TYPED_TEST_P(RunLoopStress, NoSignalAndNoStopIsLostHoweverItMeetsTheWaitOrTheEndOfARun) {
  enum class Race { kStop, kSignal, kBothAgainstTheLimit };
  const int rounds = isThorough() ? 1'000'000 : 20'000;
  RunLoop& loop = TestFixture::currentLoop();
  int message = 0;  // passed from the signaller to the handler, synchronised only by the loop
  int handled = 0;
  const auto source = loop.makeSource([&] { handled = message; });
  loop.addSource(source, TestFixture::kMode);
  StressHelper signaller(1, [&](int round) {
    message = round;
    source->signal();
  });
  StressHelper stopper(2, [&](int) { loop.stop(); });
  Race race{};
  int signals = 0;
  int stops = 0;
  const auto observer = loop.makeObserver(kRunLoopEntry, true, 0, [&](RunLoopActivities) {
    if (race != Race::kStop) signaller.begin(++signals);
    if (race != Race::kSignal) stopper.begin(++stops);
  });
  std::minstd_rand random(3);
  int wrong = 0;
  std::array<int, 4> ends{};
  for (int round = 0; round < rounds; ++round) {
    race = static_cast<Race>(random() % 3);
    const bool is_against_limit = race == Race::kBothAgainstTheLimit;
    const std::chrono::nanoseconds limit =
        is_against_limit ? std::chrono::nanoseconds(random() % 20'000) : TestFixture::kLong;
    loop.addObserver(observer, TestFixture::kMode);
    const RunLoopResult result = loop.runInMode(TestFixture::kMode, limit, true);
    loop.removeObserver(observer, TestFixture::kMode);
    ++ends[static_cast<std::size_t>(result)];
    if (race == Race::kStop && result != RunLoopResult::kStopped) ++wrong;
    if (race == Race::kSignal && result != RunLoopResult::kHandledSource) ++wrong;
    signaller.waitForEndOf(signals);
    stopper.waitForEndOf(stops);
    if (is_against_limit && result != RunLoopResult::kHandledSource) {  // the signal is still pending
      if (loop.runInMode(TestFixture::kMode, std::chrono::seconds(0), true) != RunLoopResult::kHandledSource) ++wrong;
    }
    if (handled != signals) ++wrong;
  }
  loop.removeSource(source, TestFixture::kMode);
  std::cout << rounds << " rounds: " << ends[0] << " handled, " << ends[1] << " timed out, " << ends[2] << " stopped\n";
  EXPECT_EQ(wrong, 0);
  EXPECT_EQ(ends[3], 0) << "finished, with a source";
}

TYPED_TEST_P(RunLoopStress, AStopMayEndTheThreadAndItsLoop) {
  const int rounds = isThorough() ? 10'000 : 500;
  std::minstd_rand random(4);
  for (int round = 0; round < rounds; ++round) {
    std::atomic<RunLoop*> running = nullptr;
    std::thread thread([&running] {
      RunLoop& loop = TestFixture::currentLoop();
      loop.addSource(loop.makeSource([] {}), TestFixture::kMode);
      loop.addObserver(loop.makeObserver(kRunLoopEntry, true, 0,
                                         [&](RunLoopActivities) {
                                           running.store(&loop);
                                           running.notify_one();
                                         }),
                       TestFixture::kMode);
      EXPECT_EQ(loop.runInMode(TestFixture::kMode, TestFixture::kLong, false), RunLoopResult::kStopped);
    });
    running.wait(nullptr);
    delay(random, std::chrono::microseconds(20));
    running.load()->stop();
    thread.join();
  }
}

TYPED_TEST_P(RunLoopStress, WhatSeveralThreadsSignalIsHandledAfterTheLastSignalOfEach) {
  constexpr std::size_t kThreads = 4;
  const int signals = isThorough() ? 200'000 : 5'000;
  RunLoop& loop = TestFixture::currentLoop();
  std::array<std::atomic<int>, kThreads> sent{};
  std::size_t complete = 0;
  const auto source = loop.makeSource([&] {
    complete = 0;
    for (const std::atomic<int>& count : sent) complete += count.load(std::memory_order_relaxed) == signals ? 1 : 0;
  });
  loop.addSource(source, TestFixture::kMode);
  std::vector<std::thread> threads;
  for (std::atomic<int>& count : sent) {
    threads.emplace_back([&] {
      for (int i = 1; i <= signals; ++i) {
        count.store(i, std::memory_order_relaxed);
        source->signal();
      }
    });
  }
  while (complete < kThreads)
    ASSERT_EQ(loop.runInMode(TestFixture::kMode, TestFixture::kLong, true), RunLoopResult::kHandledSource);
  for (std::thread& thread : threads) thread.join();
  loop.removeSource(source, TestFixture::kMode);
}

REGISTER_TYPED_TEST_SUITE_P(RunLoopStress, NoSignalAndNoStopIsLostHoweverItMeetsTheWaitOrTheEndOfARun,
                            AStopMayEndTheThreadAndItsLoop, WhatSeveralThreadsSignalIsHandledAfterTheLastSignalOfEach);

}  // namespace quazor
