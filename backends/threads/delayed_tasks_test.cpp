#include "backends/threads/delayed_tasks.h"

#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

using std::chrono::nanoseconds;

class DelayedTasksTest : public ::testing::Test {
 protected:
  bool add(int due, const std::string& name) {
    return tasks_.add(nanoseconds(due), [this, name] { ran_.push_back(name); });
  }
  bool runDue(int now) {
    return tasks_.postDue(nanoseconds(now), [](Task&& task) { task(); });
  }

  DelayedTasks tasks_;
  std::vector<std::string> ran_;
};

TEST_F(DelayedTasksTest, NothingIsDueWhileThereIsNoTask) {
  EXPECT_EQ(tasks_.nextDue(), DelayedTasks::kNever);
  EXPECT_FALSE(tasks_.postDue(nanoseconds::max(), [](Task&&) { FAIL(); }));
}

TEST_F(DelayedTasksTest, SaysWhetherATaskIsTheNext) {
  EXPECT_TRUE(add(10, "a"));
  EXPECT_FALSE(add(10, "b"));
  EXPECT_FALSE(add(11, "c"));
  EXPECT_TRUE(add(9, "d"));
  EXPECT_EQ(tasks_.nextDue(), nanoseconds(9));
}

TEST_F(DelayedTasksTest, PostsWhatIsDueInTheOrderOfTheDueTimes) {
  add(30, "c");
  add(10, "a");
  add(20, "b");
  add(20, "b, added later");
  EXPECT_FALSE(runDue(9));
  EXPECT_TRUE(runDue(20));
  EXPECT_EQ(ran_, (std::vector<std::string>{"a", "b", "b, added later"}));
  EXPECT_EQ(tasks_.nextDue(), nanoseconds(30));
  EXPECT_TRUE(runDue(30));
  EXPECT_EQ(ran_.back(), "c");
  EXPECT_EQ(tasks_.nextDue(), DelayedTasks::kNever);
}

TEST_F(DelayedTasksTest, WhatIsNeverDueIsNotDueAtTheLastMomentEither) {
  tasks_.add(DelayedTasks::kNever, [] { FAIL(); });
  EXPECT_FALSE(tasks_.postDue(nanoseconds::max(), [](Task&&) { FAIL(); }));
}

TEST_F(DelayedTasksTest, WhatIsNeverDueIsNotPostedWithWhatIsDue) {
  tasks_.add(DelayedTasks::kNever, [] { FAIL(); });
  add(10, "a");
  EXPECT_TRUE(runDue(11));
  EXPECT_EQ(ran_, std::vector<std::string>{"a"});
  EXPECT_EQ(tasks_.nextDue(), DelayedTasks::kNever);
}

TEST_F(DelayedTasksTest, OnceClosedNothingBecomesDue) {
  add(10, "a");
  tasks_.close();
  EXPECT_EQ(tasks_.nextDue(), DelayedTasks::kNever);
  EXPECT_FALSE(runDue(11));
  add(5, "b");
  EXPECT_FALSE(runDue(11));
  EXPECT_TRUE(ran_.empty());
}

TEST_F(DelayedTasksTest, ClearingDestroysTheTasksUnrun) {
  const auto held = std::make_shared<int>(0);
  tasks_.add(nanoseconds(10), [this, held] { ran_.push_back("held"); });
  tasks_.add(nanoseconds(20), [this, held] { ran_.push_back("held"); });
  EXPECT_EQ(held.use_count(), 3);
  tasks_.clear();
  EXPECT_EQ(held.use_count(), 1);
  EXPECT_TRUE(ran_.empty());
  EXPECT_EQ(tasks_.nextDue(), DelayedTasks::kNever);
}

}  // namespace
}  // namespace quazor
