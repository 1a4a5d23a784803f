#include "backends/threads/thread_semaphore.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <thread>
#include <vector>

namespace quazor {
namespace {

TEST(ThreadSemaphoreTest, ACountBelowZeroAsksForMoreSignals) {
  ThreadSemaphore semaphore(-2);
  ThreadSemaphore passed(0);
  bool all_signalled = false;
  bool seen = false;
  std::thread waiter([&] {
    semaphore.wait();
    seen = all_signalled;
    passed.signal();
  });
  semaphore.signal();
  semaphore.signal();
  std::this_thread::sleep_for(std::chrono::milliseconds(2));
  all_signalled = true;
  semaphore.signal();
  passed.wait();
  waiter.join();
  EXPECT_TRUE(seen);
}

TEST(ThreadSemaphoreTest, MayGoAsSoonAsAWaitReturns) {
  for (int round = 0; round < 2000; ++round) {
    auto semaphore = std::make_unique<ThreadSemaphore>(0);
    std::thread signaller([&target = *semaphore] { target.signal(); });
    semaphore->wait();
    semaphore.reset();
    signaller.join();
  }
}

TEST(ThreadSemaphoreTest, ManyThreadsPassExactlyAsOftenAsThereAreSignals) {
  constexpr int kThreads = 4;
  constexpr int kRounds = 5000;
  ThreadSemaphore mutual_exclusion(1);
  ThreadSemaphore finished(0);
  int counter = 0;
  std::vector<std::thread> threads;
  for (int i = 0; i < kThreads; ++i) {
    threads.emplace_back([&] {
      for (int round = 0; round < kRounds; ++round) {
        mutual_exclusion.wait();
        ++counter;
        mutual_exclusion.signal();
      }
      finished.signal();
    });
  }
  for (int i = 0; i < kThreads; ++i) finished.wait();
  EXPECT_EQ(counter, kThreads * kRounds);
  for (std::thread& thread : threads) thread.join();
}

}  // namespace
}  // namespace quazor
