#include "backends/threads/task_list.h"

#include <gtest/gtest.h>

#include <array>
#include <cstddef>
#include <memory>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {
namespace {

// Runs and removes the oldest task; false if there is none.
bool runOne(TaskList& list) {
  Task* const task = list.front();
  if (task == nullptr) return false;
  (*task)();
  list.pop();
  return true;
}

TEST(TaskListTest, IsEmptyAtFirst) {
  TaskList list;
  EXPECT_EQ(list.front(), nullptr);
}

TEST(TaskListTest, KeepsTheOrderAcrossSegments) {
  TaskList list;
  std::vector<int> ran;
  std::vector<int> expected;
  int pushed = 0;
  // Bursts of all sizes up to several segments, so that they end at every position.
  for (int burst = 1; burst < 300; ++burst) {
    for (int i = 0; i < burst; ++i, ++pushed) {
      expected.push_back(pushed);
      EXPECT_FALSE(list.push([&ran, pushed] { ran.push_back(pushed); }));
    }
    while (runOne(list)) {
    }
  }
  EXPECT_EQ(ran, expected);
}

TEST(TaskListTest, AShownTaskStaysUntilItIsRemoved) {
  TaskList list;
  const auto held = std::make_shared<int>(0);
  EXPECT_FALSE(list.push([held] {}));
  EXPECT_EQ(list.front(), list.front());
  EXPECT_EQ(held.use_count(), 2);
  list.pop();
  EXPECT_EQ(held.use_count(), 1);
  EXPECT_EQ(list.front(), nullptr);
}

TEST(TaskListTest, DestroysTheTasksThatAreLeft) {
  for (const int count : {1, 126, 127, 128, 1000}) {
    const auto held = std::make_shared<int>(0);
    {
      TaskList list;
      for (int i = 0; i < count; ++i) EXPECT_FALSE(list.push([held] {}));
      EXPECT_EQ(held.use_count(), count + 1);
    }
    EXPECT_EQ(held.use_count(), 1) << count << " tasks";
  }
}

TEST(TaskListTest, TheFirstTaskAfterTheSleepBeganSaysSo) {
  TaskList list;
  for (int round = 0; round < 300; ++round) {  // at every position in a segment
    ASSERT_TRUE(list.beginSleep());
    EXPECT_TRUE(list.push([] {}));
    EXPECT_FALSE(list.push([] {}));
    EXPECT_TRUE(runOne(list));
    EXPECT_TRUE(runOne(list));
  }
}

TEST(TaskListTest, SleepDoesNotBeginWhileATaskWaits) {
  TaskList list;
  for (int round = 0; round < 300; ++round) {
    EXPECT_FALSE(list.push([] {}));
    EXPECT_FALSE(list.beginSleep());
    EXPECT_FALSE(list.push([] {})) << "a refused sleep leaves no trace";
    EXPECT_TRUE(runOne(list));
    EXPECT_FALSE(list.beginSleep());
    EXPECT_TRUE(runOne(list));
  }
}

TEST(TaskListTest, EndingASleepIsToldOnce) {
  TaskList list;
  EXPECT_FALSE(list.endSleep());
  ASSERT_TRUE(list.beginSleep());
  EXPECT_TRUE(list.endSleep());
  EXPECT_FALSE(list.endSleep());
  EXPECT_FALSE(list.push([] {}));
  EXPECT_TRUE(runOne(list));
}

TEST(TaskListTest, ATaskMayPushWhileItRunsAndWhileItIsDestroyed) {
  struct PushesAtDestruction {
    explicit PushesAtDestruction(TaskList& target, int& count) : list(&target), ran(&count) {}
    PushesAtDestruction(PushesAtDestruction&& other) noexcept
        : list(std::exchange(other.list, nullptr)), ran(other.ran) {}
    PushesAtDestruction(const PushesAtDestruction&) = delete;
    ~PushesAtDestruction() {
      if (list != nullptr) static_cast<void>(list->push([count = ran] { ++*count; }));
    }
    TaskList* list;
    int* ran;
  };
  TaskList list;
  int ran = 0;
  for (int round = 0; round < 300; ++round) {
    static_cast<void>(list.push(
        [&list, &ran, last = PushesAtDestruction(list, ran)] { static_cast<void>(list.push([&ran] { ++ran; })); }));
    while (runOne(list)) {
    }
  }
  EXPECT_EQ(ran, 600);
}

// Queues enough tasks at once to fill `segments` segments beyond the first, then runs them.
void fillAndRun(TaskList& list, int segments) {
  for (int i = 0; i < 127 * segments; ++i) EXPECT_FALSE(list.push([] {}));
  while (runOne(list)) {
  }
}

TEST(TaskListTest, KeepsTheMemoryOfABurstForTheNextOne) {
  TaskList list;
  EXPECT_FALSE(list.hasSpares());
  fillAndRun(list, 3);
  EXPECT_TRUE(list.hasSpares());
  list.freeUnneededSpares();
  EXPECT_TRUE(list.hasSpares()) << "they were needed until now";
}

TEST(TaskListTest, FreesTheMemoryThatWasNotNeededSinceTheLastTime) {
  TaskList list;
  fillAndRun(list, 3);
  list.freeUnneededSpares();
  fillAndRun(list, 2);
  list.freeUnneededSpares();
  EXPECT_TRUE(list.hasSpares()) << "two of the three were needed";
  fillAndRun(list, 2);
  list.freeUnneededSpares();
  EXPECT_TRUE(list.hasSpares());
  list.freeUnneededSpares();
  EXPECT_FALSE(list.hasSpares());
  fillAndRun(list, 3);
  EXPECT_TRUE(list.hasSpares());
}

TEST(TaskListTest, ManyProducersLoseNothingAndKeepEachTheirOrder) {
  constexpr std::size_t kProducers = 4;
  constexpr int kTasks = 20'000;
  TaskList list;
  std::array<int, kProducers> next{};
  std::size_t ran = 0;
  bool ordered = true;
  std::vector<std::thread> producers;
  for (std::size_t producer = 0; producer < kProducers; ++producer) {
    producers.emplace_back([&, producer] {
      for (int i = 0; i < kTasks; ++i) {
        static_cast<void>(list.push([&, producer, i] {
          ordered = ordered && next[producer] == i;
          ++next[producer];
        }));
      }
    });
  }
  Backoff backoff;
  while (ran < kProducers * kTasks) {
    if (runOne(list)) {
      ++ran;
    } else {
      backoff.pause();
    }
  }
  for (std::thread& producer : producers) producer.join();
  EXPECT_TRUE(ordered);
  EXPECT_FALSE(runOne(list));
}

}  // namespace
}  // namespace quazor
