// Many concurrent threads at pseudo-random times from a fixed seed. Also run it under the thread sanitizer.
#include "backends/threads/thread_semaphore.h"
#include "backends/threads/thread_serial_queue.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <memory>
#include <random>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

class ThreadSerialQueueStressTest : public ::testing::TestWithParam<QualityOfService> {
 protected:
  std::shared_ptr<SerialQueue> makeQueue() { return std::make_shared<ThreadSerialQueue>("stress", GetParam()); }
};

std::string nameOf(const ::testing::TestParamInfo<QualityOfService>& info) {
  return info.param == QualityOfService::kBackground ? "Background" : "UserInteractive";
}

INSTANTIATE_TEST_SUITE_P(Qualities, ThreadSerialQueueStressTest,
                         ::testing::Values(QualityOfService::kUserInteractive, QualityOfService::kBackground), nameOf);

// Spins for a random time of up to `most`.
void delay(std::minstd_rand& random, std::chrono::nanoseconds most) {
  const auto length = std::chrono::nanoseconds(random() % static_cast<unsigned>(most.count()));
  const auto end = std::chrono::steady_clock::now() + length;
  while (std::chrono::steady_clock::now() < end) {
  }
}

TEST_P(ThreadSerialQueueStressTest, SeveralProducersLoseNothingAndKeepEachTheirOrder) {
  constexpr std::size_t kProducers = 4;
  constexpr int kTasks = 20'000;
  auto queue = makeQueue();
  std::array<int, kProducers> next{};
  ThreadSemaphore done(0);
  bool ordered = true;
  std::vector<std::thread> producers;
  for (std::size_t producer = 0; producer < kProducers; ++producer) {
    producers.emplace_back([&, producer, own = queue] {
      for (int i = 0; i < kTasks; ++i) {
        own->async([&, producer, i] {
          ordered = ordered && next[producer] == i;
          ++next[producer];
        });
      }
      own->async([&done] { done.signal(); });
    });
  }
  queue.reset();  // the last producer drops it
  for (std::size_t producer = 0; producer < kProducers; ++producer) done.wait();
  for (std::thread& producer : producers) producer.join();
  EXPECT_TRUE(ordered);
  for (const int count : next) EXPECT_EQ(count, kTasks);
}

TEST_P(ThreadSerialQueueStressTest, NoTaskIsForgottenHoweverItsPostMeetsTheThreadFallingAsleep) {
  auto queue = makeQueue();
  std::minstd_rand random(1);
  ThreadSemaphore done(0);
  for (int round = 0; round < 10'000; ++round) {
    queue->async([&done] { done.signal(); });
    done.wait();  // never returns if the thread missed the task
    delay(random, std::chrono::microseconds(20));
  }
}

TEST_P(ThreadSerialQueueStressTest, NoDelayIsForgottenHoweverItMeetsTheThreadFallingAsleep) {
  auto queue = makeQueue();
  std::minstd_rand random(2);
  ThreadSemaphore done(0);
  queue->asyncAfter(std::chrono::hours(1), [] {});
  for (int round = 0; round < 2'000; ++round) {
    queue->asyncAfter(std::chrono::nanoseconds(random() % 30'000), [&done] { done.signal(); });
    done.wait();
    delay(random, std::chrono::microseconds(20));
  }
}

TEST_P(ThreadSerialQueueStressTest, DelayedTasksOfSeveralThreadsRunOnceInTheOrderOfTheirDueTimes) {
  constexpr int kThreads = 3;
  constexpr int kTasks = 500;
  auto queue = makeQueue();
  ThreadSemaphore done(0);
  std::atomic<int> early = 0;
  std::vector<std::thread> threads;
  for (int thread = 0; thread < kThreads; ++thread) {
    threads.emplace_back([&, thread] {
      std::minstd_rand random(static_cast<unsigned>(thread) + 3);
      for (int i = 0; i < kTasks; ++i) {
        const auto due = std::chrono::steady_clock::now() + std::chrono::nanoseconds(random() % 200'000);
        queue->asyncAfter(due - std::chrono::steady_clock::now(), [&, due] {
          if (std::chrono::steady_clock::now() < due) ++early;
          done.signal();
        });
        queue->async([&done] { done.signal(); });
      }
    });
  }
  for (int i = 0; i < 2 * kThreads * kTasks; ++i) done.wait();
  for (std::thread& thread : threads) thread.join();
  EXPECT_EQ(early, 0);
}

TEST_P(ThreadSerialQueueStressTest, QueuesMayGoAtAnyMomentOfTheirWork) {
  constexpr int kQueues = 500;
  std::minstd_rand random(4);
  std::atomic<int> ran = 0;
  std::atomic<int> undue = 0;
  const auto held = std::make_shared<int>(0);
  for (int i = 0; i < kQueues; ++i) {
    auto queue = makeQueue();
    queue->asyncAfter(std::chrono::hours(1), [&undue, held] { ++undue; });
    queue->async([&ran, held] { ++ran; });
    SerialQueue& same = *queue;
    delay(random, std::chrono::microseconds(50));
    // Either the task or this thread drops the last reference.
    same.async([&ran, held, own = queue] { ++ran; });
    delay(random, std::chrono::microseconds(50));
  }
  for (int i = 0; i < 10'000 && held.use_count() > 1; ++i) std::this_thread::sleep_for(std::chrono::milliseconds(1));
  EXPECT_EQ(held.use_count(), 1);
  EXPECT_EQ(ran, 2 * kQueues);
  EXPECT_EQ(undue, 0);
}

}  // namespace
}  // namespace quazor
