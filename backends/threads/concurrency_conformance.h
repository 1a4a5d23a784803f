// Requirements on every implementation of Concurrency and Clock, as a typed test suite.
//
// A backend instantiates it with a type that has a default constructor and the members
//
//   std::shared_ptr<Concurrency> concurrency();
//   std::shared_ptr<Clock> clock();
//
//   INSTANTIATE_TYPED_TEST_SUITE_P(Threads, ConcurrencyConformance, ThreadsUnderTest);
//
// The suite waits only through the services under test, so it also runs on one thread in virtual time.
#pragma once

#include "platform/clock.h"
#include "platform/concurrency.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

template <class UnderTest>
class ConcurrencyConformance : public ::testing::Test {
 protected:
  using Queue = std::shared_ptr<SerialQueue>;
  using Words = std::vector<std::string>;

  Queue makeQueue() { return concurrency_->makeSerialQueue("org.quazor.conformance", QualityOfService::kDefault); }
  std::shared_ptr<Semaphore> makeSemaphore(long count = 0) { return concurrency_->makeSemaphore(count); }

  // Waits until the queue has run all tasks that are pending now.
  void finish(SerialQueue& queue) {
    const auto done = makeSemaphore();
    queue.async([done] { done->signal(); });
    done->wait();
  }

  // Yields until `condition` is true; returns false after a few seconds.
  template <class Condition>
  bool eventually(Condition condition) {
    for (int i = 0; i < 300'000; ++i) {
      if (condition()) return true;
      clock_->sleep(std::chrono::microseconds(100));
    }
    return false;
  }

  // Repeats `attempt` until no more than `limit` passes between the two times that it returns: on a busy machine a
  // thread may be preempted at that point, which changes the order of due tasks. Returns false if every attempt was too
  // slow.
  template <class Attempt>
  bool inTime(std::chrono::nanoseconds limit, Attempt attempt) {
    for (int i = 0; i < 500; ++i) {
      const auto [begin, end] = attempt();
      if (end - begin < limit) return true;
    }
    return false;
  }

  UnderTest under_test_;
  std::shared_ptr<Concurrency> concurrency_ = under_test_.concurrency();
  std::shared_ptr<Clock> clock_ = under_test_.clock();
};

// Runs a function in its destructor: captured in a task, it reports the destruction of the task.
class AtDestruction {
 public:
  template <class Function>
  explicit AtDestruction(Function function) : task_(std::make_unique<Task>(std::move(function))) {}
  AtDestruction(AtDestruction&&) = default;
  AtDestruction(const AtDestruction&) = delete;
  AtDestruction& operator=(const AtDestruction&) = delete;
  ~AtDestruction() {
    if (task_ != nullptr) (*task_)();
  }

 private:
  std::unique_ptr<Task> task_;
};

TYPED_TEST_SUITE_P(ConcurrencyConformance);

TYPED_TEST_P(ConcurrencyConformance, TasksRunInTheOrderOfTheirSubmission) {
  constexpr int kTasks = 1000;
  const auto queue = this->makeQueue();
  std::vector<int> ran;
  std::vector<int> expected;
  for (int i = 0; i < kTasks; ++i) {
    expected.push_back(i);
    queue->async([&ran, i] { ran.push_back(i); });
  }
  this->finish(*queue);
  EXPECT_EQ(ran, expected);
}

TYPED_TEST_P(ConcurrencyConformance, ATaskThatBlocksHoldsUpTheNext) {
  const auto queue = this->makeQueue();
  typename TestFixture::Words words;
  queue->async([&] {
    words.push_back("first begins");
    this->clock_->sleep(std::chrono::milliseconds(1));
    words.push_back("first ends");
  });
  queue->async([&] { words.push_back("second"); });
  this->finish(*queue);
  EXPECT_EQ(words, (typename TestFixture::Words{"first begins", "first ends", "second"}));
}

TYPED_TEST_P(ConcurrencyConformance, ATaskThatBlocksDoesNotHoldUpAnotherQueue) {
  const auto blocked = this->makeQueue();
  const auto free = this->makeQueue();
  const auto gate = this->makeSemaphore();
  bool passed = false;
  blocked->async([&] {
    gate->wait();
    passed = true;
  });
  free->async([gate] { gate->signal(); });
  this->finish(*blocked);
  EXPECT_TRUE(passed);
}

TYPED_TEST_P(ConcurrencyConformance, ATaskIsDestroyedBeforeTheNextStarts) {
  const auto queue = this->makeQueue();
  const auto gate = this->makeSemaphore();
  typename TestFixture::Words words;
  queue->async([gate] { gate->wait(); });  // makes the next three wait at the same time
  for (const char* name : {"a", "b", "c"}) {
    queue->async([&words, name, guard = AtDestruction([&words, name] { words.push_back(std::string("-") + name); })] {
      words.push_back(std::string("+") + name);
    });
  }
  gate->signal();
  this->finish(*queue);
  EXPECT_EQ(words, (typename TestFixture::Words{"+a", "-a", "+b", "-b", "+c", "-c"}));
}

TYPED_TEST_P(ConcurrencyConformance, ATaskIsDestroyedAlthoughNothingFollowsIt) {
  const auto queue = this->makeQueue();
  std::atomic<bool> destroyed = false;
  queue->async([guard = AtDestruction([&destroyed] { destroyed = true; })] {});
  EXPECT_TRUE(this->eventually([&] { return destroyed.load(); }));
}

TYPED_TEST_P(ConcurrencyConformance, ALargeTaskRunsAndIsDestroyedLikeASmallOne) {
  const auto queue = this->makeQueue();
  struct Large {
    char bytes[4 * Task::kInlineSize];
  };
  typename TestFixture::Words words;
  queue->async([&words, large = Large{"large"}, guard = AtDestruction([&words] { words.push_back("gone"); })] {
    words.push_back(large.bytes);
  });
  this->finish(*queue);
  EXPECT_EQ(words, (typename TestFixture::Words{"large", "gone"}));
}

TYPED_TEST_P(ConcurrencyConformance, ATaskPostedByATaskRunsBehindThoseThatWait) {
  const auto queue = this->makeQueue();
  const auto gate = this->makeSemaphore();
  const auto done = this->makeSemaphore();
  typename TestFixture::Words words;
  queue->async([&, gate] {
    gate->wait();
    words.push_back("posting");
    queue->async([&] {
      words.push_back("posted");
      done->signal();
    });
  });
  queue->async([&] { words.push_back("waiting"); });
  gate->signal();
  done->wait();
  EXPECT_EQ(words, (typename TestFixture::Words{"posting", "waiting", "posted"}));
}

TYPED_TEST_P(ConcurrencyConformance, ATaskMayPostWhileItIsBeingDestroyed) {
  const auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  queue->async([guard = AtDestruction([&queue, done] { queue->async([done] { done->signal(); }); })] {});
  done->wait();
}

TYPED_TEST_P(ConcurrencyConformance, ADelayedTaskRunsNoEarlierThanItsDelay) {
  const auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  const auto posted = this->clock_->now();
  std::chrono::nanoseconds ran{};
  queue->asyncAfter(std::chrono::milliseconds(2), [&] {
    ran = this->clock_->now();
    done->signal();
  });
  done->wait();
  EXPECT_GE(ran - posted, std::chrono::milliseconds(2));
}

TYPED_TEST_P(ConcurrencyConformance, DelayedTasksRunInTheOrderOfTheirDueTimes) {
  const auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  typename TestFixture::Words words;
  EXPECT_TRUE(this->inTime(std::chrono::microseconds(500), [&] {
    std::pair<std::chrono::nanoseconds, std::chrono::nanoseconds> posting;
    words.clear();
    queue->async([&] {  // one task posts all, before the first is due
      posting.first = this->clock_->now();
      queue->asyncAfter(std::chrono::microseconds(3000), [&] { done->signal(); });
      queue->asyncAfter(std::chrono::microseconds(2000), [&] { words.push_back("2"); });
      queue->asyncAfter(std::chrono::microseconds(1000), [&] { words.push_back("1"); });
      queue->asyncAfter(std::chrono::microseconds(1000), [&] { words.push_back("1, posted later"); });
      queue->asyncAfter(std::chrono::microseconds(1500), [&] { words.push_back("1.5"); });
      queue->async([&] { words.push_back("0"); });
      posting.second = this->clock_->now();
    });
    done->wait();
    this->finish(*queue);
    return posting;
  }));
  EXPECT_EQ(words, (typename TestFixture::Words{"0", "1", "1, posted later", "1.5", "2"}));
}

TYPED_TEST_P(ConcurrencyConformance, AShorterDelayCutsTheWaitForALongerOneShort) {
  const auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  queue->asyncAfter(std::chrono::hours(1), [] {});
  this->clock_->sleep(std::chrono::milliseconds(1));  // by now the queue waits for the longer delay
  const auto posted = this->clock_->now();
  queue->asyncAfter(std::chrono::milliseconds(1), [done] { done->signal(); });
  done->wait();
  EXPECT_LT(this->clock_->now() - posted, std::chrono::minutes(1));
}

TYPED_TEST_P(ConcurrencyConformance, ADelayOfZeroOrLessIsNoDelay) {
  const auto queue = this->makeQueue();
  const auto gate = this->makeSemaphore();
  typename TestFixture::Words words;
  queue->async([gate] { gate->wait(); });
  queue->async([&] { words.push_back("async"); });
  queue->asyncAfter(std::chrono::nanoseconds::zero(), [&] { words.push_back("zero"); });
  queue->asyncAfter(std::chrono::nanoseconds(-1), [&] { words.push_back("negative"); });
  queue->asyncAfter(std::chrono::nanoseconds::min(), [&] { words.push_back("lowest"); });
  queue->async([&] { words.push_back("async again"); });
  gate->signal();
  this->finish(*queue);
  EXPECT_EQ(words, (typename TestFixture::Words{"async", "zero", "negative", "lowest", "async again"}));
}

TYPED_TEST_P(ConcurrencyConformance, ADelayBeyondTheClocksRangeNeverPasses) {
  auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  std::atomic<int> fired = 0;
  std::atomic<int> destroyed = 0;
  for (const auto delay : {std::chrono::nanoseconds::max(), std::chrono::nanoseconds::max() - this->clock_->now()}) {
    queue->asyncAfter(delay, [&fired, guard = AtDestruction([&destroyed] { ++destroyed; })] { ++fired; });
  }
  queue->asyncAfter(std::chrono::milliseconds(1), [done] { done->signal(); });
  done->wait();
  this->finish(*queue);
  EXPECT_EQ(fired, 0);
  EXPECT_EQ(destroyed, 0);
  queue.reset();
  EXPECT_TRUE(this->eventually([&] { return destroyed == 2; }));
  EXPECT_EQ(fired, 0);
}

TYPED_TEST_P(ConcurrencyConformance, ATaskThatBecomesDueGoesBehindThoseThatWaitAndBeforeThoseThatCome) {
  const auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  typename TestFixture::Words words;
  EXPECT_TRUE(this->inTime(std::chrono::milliseconds(1), [&] {
    std::pair<std::chrono::nanoseconds, std::chrono::nanoseconds> posting;
    words.clear();
    queue->async([&] {
      posting.first = this->clock_->now();
      queue->asyncAfter(std::chrono::milliseconds(1), [&] { words.push_back("due while the queue was busy"); });
      queue->async([&] { words.push_back("waiting"); });
      posting.second = this->clock_->now();
      this->clock_->sleep(std::chrono::milliseconds(2));
      queue->async([&] {
        words.push_back("posted afterwards");
        done->signal();
      });
    });
    done->wait();
    return posting;
  }));
  EXPECT_EQ(words, (typename TestFixture::Words{"waiting", "due while the queue was busy", "posted afterwards"}));
}

TYPED_TEST_P(ConcurrencyConformance, DroppingTheQueueRunsWhatIsDueAndDestroysTheRestUnrun) {
  const auto gate = this->makeSemaphore();
  const auto done = this->makeSemaphore();
  std::atomic<bool> undue_ran = false;
  std::atomic<bool> destroyed = false;
  typename TestFixture::Words words;
  EXPECT_TRUE(this->inTime(std::chrono::milliseconds(1), [&] {
    destroyed = false;
    words.clear();
    auto queue = this->makeQueue();
    queue->async([gate] { gate->wait(); });
    const auto begin = this->clock_->now();
    queue->asyncAfter(std::chrono::milliseconds(1), [&words, done] {
      words.push_back("overdue");
      done->signal();
    });
    queue->asyncAfter(std::chrono::hours(1),
                      [&undue_ran, guard = AtDestruction([&destroyed] { destroyed = true; })] { undue_ran = true; });
    queue->async([&words] { words.push_back("waiting"); });
    const auto end = this->clock_->now();
    this->clock_->sleep(std::chrono::milliseconds(2));
    queue.reset();
    gate->signal();
    done->wait();
    EXPECT_TRUE(this->eventually([&] { return destroyed.load(); }));
    return std::pair(begin, end);
  }));
  EXPECT_EQ(words, (typename TestFixture::Words{"waiting", "overdue"}));
  EXPECT_FALSE(undue_ran);
}

TYPED_TEST_P(ConcurrencyConformance, ADelayThatPassesAfterTheQueueWasDroppedDoesNotRunItsTask) {
  auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  std::atomic<bool> ran = false;
  queue->async([this, done] {
    this->clock_->sleep(std::chrono::milliseconds(3));
    done->signal();
  });
  const auto posted = this->clock_->now();
  queue->asyncAfter(std::chrono::milliseconds(2),
                    [&ran, guard = AtDestruction([done] { done->signal(); })] { ran = true; });
  queue.reset();
  const bool dropped_in_time = this->clock_->now() - posted < std::chrono::milliseconds(2);
  done->wait();
  done->wait();
  EXPECT_FALSE(ran && dropped_in_time);  // inconclusive if a busy machine dropped the queue too late
}

TYPED_TEST_P(ConcurrencyConformance, ATaskMayDropTheLastReferenceToItsOwnQueue) {
  auto queue = this->makeQueue();
  const auto gate = this->makeSemaphore();
  const auto done = this->makeSemaphore();
  std::atomic<bool> undue_ran = false;
  typename TestFixture::Words words;
  SerialQueue& observer = *queue;
  std::weak_ptr<SerialQueue> weak = queue;
  queue->asyncAfter(std::chrono::hours(1),
                    [&undue_ran, guard = AtDestruction([done] { done->signal(); })] { undue_ran = true; });
  observer.async([&words, gate, weak, own = std::move(queue)]() mutable {
    gate->wait();
    own.reset();
    words.push_back(weak.expired() ? "dropped" : "still there");
  });
  observer.async([&words] { words.push_back("waiting"); });
  gate->signal();
  done->wait();
  EXPECT_EQ(words, (typename TestFixture::Words{"dropped", "waiting"}));
  EXPECT_FALSE(undue_ran);
}

TYPED_TEST_P(ConcurrencyConformance, TheDestructionOfATaskMayDropTheLastReferenceToItsQueue) {
  auto queue = this->makeQueue();
  const auto gate = this->makeSemaphore();
  const auto done = this->makeSemaphore();
  typename TestFixture::Words words;
  SerialQueue& observer = *queue;
  std::weak_ptr<SerialQueue> weak = queue;
  observer.async([&words, gate, own = std::move(queue)] {
    gate->wait();
    words.push_back("ran");
  });
  observer.async([&words, weak, done] {
    words.push_back(weak.expired() ? "dropped" : "still there");
    done->signal();
  });
  gate->signal();
  done->wait();
  EXPECT_EQ(words, (typename TestFixture::Words{"ran", "dropped"}));
}

TYPED_TEST_P(ConcurrencyConformance, WhatItMadeOutlivesTheFactory) {
  const auto queue = this->makeQueue();
  const auto done = this->makeSemaphore();
  this->concurrency_.reset();
  queue->async([done] { done->signal(); });
  done->wait();
}

TYPED_TEST_P(ConcurrencyConformance, QueuesOfEveryQualityRunTheirTasks) {
  for (const auto quality :
       {QualityOfService::kUserInteractive, QualityOfService::kDefault, QualityOfService::kBackground}) {
    const auto queue = this->concurrency_->makeSerialQueue("", quality);
    int ran = 0;
    queue->async([&ran] { ++ran; });
    this->finish(*queue);
    EXPECT_EQ(ran, 1) << static_cast<int>(quality);
  }
}

TYPED_TEST_P(ConcurrencyConformance, ASemaphoreLetsAsManyPassAsItCounts) {
  const auto semaphore = this->makeSemaphore(2);
  const auto queue = this->makeQueue();
  std::atomic<int> passed = 0;
  for (int i = 0; i < 4; ++i) {
    queue->async([&passed, semaphore] {
      semaphore->wait();
      ++passed;
    });
  }
  EXPECT_TRUE(this->eventually([&] { return passed == 2; }));
  this->clock_->sleep(std::chrono::milliseconds(1));
  EXPECT_EQ(passed, 2);
  semaphore->signal();
  EXPECT_TRUE(this->eventually([&] { return passed == 3; }));
  this->clock_->sleep(std::chrono::milliseconds(1));
  EXPECT_EQ(passed, 3);
  semaphore->signal();
  this->finish(*queue);
  EXPECT_EQ(passed, 4);
}

TYPED_TEST_P(ConcurrencyConformance, SignalsThatComeBeforeTheWaitAreKept) {
  const auto semaphore = this->makeSemaphore();
  semaphore->signal();
  semaphore->signal();
  semaphore->wait();
  semaphore->wait();
}

TYPED_TEST_P(ConcurrencyConformance, OneSignalWakesOneOfSeveralWaiters) {
  const auto semaphore = this->makeSemaphore();
  const auto one = this->makeQueue();
  const auto other = this->makeQueue();
  std::atomic<int> passed = 0;
  for (const auto& queue : {one, other}) {
    queue->async([&passed, semaphore] {
      semaphore->wait();
      ++passed;
    });
  }
  this->clock_->sleep(std::chrono::milliseconds(1));
  semaphore->signal();
  EXPECT_TRUE(this->eventually([&] { return passed == 1; }));
  this->clock_->sleep(std::chrono::milliseconds(1));
  EXPECT_EQ(passed, 1);
  semaphore->signal();
  this->finish(*one);
  this->finish(*other);
  EXPECT_EQ(passed, 2);
}

TYPED_TEST_P(ConcurrencyConformance, TheClockNeverGoesBackAndASleepLastsAtLeastItsDuration) {
  const auto before = this->clock_->now();
  this->clock_->sleep(std::chrono::milliseconds(1));
  const auto after = this->clock_->now();
  EXPECT_GE(after - before, std::chrono::milliseconds(1));
  EXPECT_GE(this->clock_->now(), after);
}

TYPED_TEST_P(ConcurrencyConformance, TheDateMovesWithTheClock) {
  const auto date = this->clock_->date();
  const auto before = this->clock_->now();
  this->clock_->sleep(std::chrono::milliseconds(2));
  const auto by_date = this->clock_->date() - date;
  const auto by_clock = this->clock_->now() - before;
  EXPECT_GE(by_date, std::chrono::milliseconds(1));
  EXPECT_LE(by_date, by_clock + std::chrono::seconds(1));
}

TYPED_TEST_P(ConcurrencyConformance, ASleepOfZeroOrLessReturnsAtOnce) {
  const auto before = this->clock_->now();
  this->clock_->sleep(std::chrono::nanoseconds::zero());
  this->clock_->sleep(std::chrono::nanoseconds(-1));
  this->clock_->sleep(std::chrono::nanoseconds::min());
  EXPECT_LT(this->clock_->now() - before, std::chrono::seconds(10));
}

REGISTER_TYPED_TEST_SUITE_P(
    ConcurrencyConformance, TasksRunInTheOrderOfTheirSubmission, ATaskThatBlocksHoldsUpTheNext,
    ATaskThatBlocksDoesNotHoldUpAnotherQueue, ATaskIsDestroyedBeforeTheNextStarts,
    ATaskIsDestroyedAlthoughNothingFollowsIt, ALargeTaskRunsAndIsDestroyedLikeASmallOne,
    ATaskPostedByATaskRunsBehindThoseThatWait, ATaskMayPostWhileItIsBeingDestroyed,
    ADelayedTaskRunsNoEarlierThanItsDelay, DelayedTasksRunInTheOrderOfTheirDueTimes,
    AShorterDelayCutsTheWaitForALongerOneShort, ADelayOfZeroOrLessIsNoDelay, ADelayBeyondTheClocksRangeNeverPasses,
    ATaskThatBecomesDueGoesBehindThoseThatWaitAndBeforeThoseThatCome,
    DroppingTheQueueRunsWhatIsDueAndDestroysTheRestUnrun, ADelayThatPassesAfterTheQueueWasDroppedDoesNotRunItsTask,
    ATaskMayDropTheLastReferenceToItsOwnQueue, TheDestructionOfATaskMayDropTheLastReferenceToItsQueue,
    WhatItMadeOutlivesTheFactory, QueuesOfEveryQualityRunTheirTasks, ASemaphoreLetsAsManyPassAsItCounts,
    SignalsThatComeBeforeTheWaitAreKept, OneSignalWakesOneOfSeveralWaiters,
    TheClockNeverGoesBackAndASleepLastsAtLeastItsDuration, TheDateMovesWithTheClock, ASleepOfZeroOrLessReturnsAtOnce);

}  // namespace quazor
