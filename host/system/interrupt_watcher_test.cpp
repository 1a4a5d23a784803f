#include "host/system/interrupt_watcher.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <thread>

#include <signal.h>
#include <unistd.h>

namespace quazor {
namespace {

using namespace std::chrono_literals;

bool interruptIsBlocked() {
  sigset_t mask;
  pthread_sigmask(SIG_BLOCK, nullptr, &mask);
  return sigismember(&mask, SIGINT) == 1;
}

// Restores the default action of SIGINT, which a shell ignores in background jobs.
class InterruptWatcherTest : public testing::Test {
 protected:
  InterruptWatcherTest() { setAction(SIG_DFL, &before_); }
  ~InterruptWatcherTest() override { sigaction(SIGINT, &before_, nullptr); }

  static void setAction(void (*handler)(int), struct sigaction* before) {
    struct sigaction action {};
    action.sa_handler = handler;
    EXPECT_EQ(sigaction(SIGINT, &action, before), 0);
  }

 private:
  struct sigaction before_ {};
};

TEST_F(InterruptWatcherTest, CallsOnItsOwnThreadWhenAnInterruptComes) {
  std::promise<std::thread::id> called;
  const InterruptWatcher watcher([&called] { called.set_value(std::this_thread::get_id()); });
  ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
  std::future<std::thread::id> thread = called.get_future();
  ASSERT_EQ(thread.wait_for(1min), std::future_status::ready);
  EXPECT_NE(thread.get(), std::this_thread::get_id());
}

TEST_F(InterruptWatcherTest, DoesNothingWithoutAnInterruptAndLeavesTheMaskAsItWas) {
  ASSERT_FALSE(interruptIsBlocked());
  bool called = false;
  {
    const InterruptWatcher watcher([&called] { called = true; });
    EXPECT_TRUE(interruptIsBlocked());
  }
  EXPECT_FALSE(called);
  EXPECT_FALSE(interruptIsBlocked());
}

TEST_F(InterruptWatcherTest, LeavesIgnoredInterruptsIgnored) {
  setAction(SIG_IGN, nullptr);
  bool called = false;
  {
    const InterruptWatcher watcher([&called] { called = true; });
    ASSERT_EQ(::kill(::getpid(), SIGINT), 0);
    EXPECT_FALSE(interruptIsBlocked());
  }
  EXPECT_FALSE(called);
}

}  // namespace
}  // namespace quazor
