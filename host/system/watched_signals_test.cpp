#include "host/system/watched_signals.h"

#include "host/testing/test_signals.h"

#include <gtest/gtest.h>
#include <poll.h>
#include <unistd.h>

#include <chrono>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using std::chrono::steady_clock;

constexpr int kInterrupted = 130;

void handlerOfTest(int /*signal*/) {}

// The action of a signal.
auto actionOf(int signal) {
  struct sigaction action {};
  EXPECT_EQ(sigaction(signal, nullptr, &action), 0);
  return action.sa_handler;
}

class WatchedSignalsTest : public testing::Test {
 protected:
  static void ask(int times) {
    for (int i = 0; i < times; ++i) ::raise(SIGINT);
  }

  const DefaultRequestsToEnd defaults_;
};

TEST_F(WatchedSignalsTest, CountWhatAsksTheProcessToEnd) {
  for (const int one : {SIGINT, SIGTERM, SIGHUP}) {
    const WatchedSignals signals;
    ASSERT_EQ(::kill(::getpid(), one), 0);
    EXPECT_EQ(signals.requestsToEnd(), 1);
    ASSERT_EQ(::kill(::getpid(), one), 0);
    EXPECT_EQ(signals.requestsToEnd(), 2);
  }
}

TEST_F(WatchedSignalsTest, WakeAPoll) {
  const WatchedSignals signals;
  pollfd watched{signals.descriptor(), POLLIN, 0};
  EXPECT_EQ(::poll(&watched, 1, 0), 0);
  ask(1);
  EXPECT_EQ(::poll(&watched, 1, 0), 1);
  signals.drain();
  EXPECT_EQ(::poll(&watched, 1, 0), 0);
  EXPECT_EQ(signals.requestsToEnd(), 1);
}

TEST_F(WatchedSignalsTest, LeaveActionsAndMaskAsTheyWere) {
  const SignalAction alarm(SIGALRM, handlerOfTest);
  sigset_t blocked;
  sigset_t before;
  sigemptyset(&blocked);
  sigaddset(&blocked, SIGTERM);
  ASSERT_EQ(::sigprocmask(SIG_BLOCK, &blocked, &before), 0);
  {
    const WatchedSignals signals;
    ::raise(SIGTERM);
    EXPECT_EQ(signals.requestsToEnd(), 1) << "it was blocked before";
  }
  EXPECT_EQ(actionOf(SIGINT), SIG_DFL);
  EXPECT_EQ(actionOf(SIGALRM), handlerOfTest);
  sigset_t after;
  ASSERT_EQ(::sigprocmask(SIG_SETMASK, &before, &after), 0);
  EXPECT_EQ(sigismember(&after, SIGTERM), 1);
  EXPECT_EQ(sigismember(&after, SIGINT), 0);
}

TEST_F(WatchedSignalsTest, LeaveIgnoredOnesIgnored) {
  const SignalAction ignored(SIGINT, SIG_IGN);
  const WatchedSignals signals;
  ask(3);
  EXPECT_EQ(signals.requestsToEnd(), 0);
  EXPECT_EQ(actionOf(SIGINT), SIG_IGN);
}

using WatchedSignalsDeathTest = WatchedSignalsTest;

TEST_F(WatchedSignalsDeathTest, EndTheProcessAtTheThirdRequest) {
  EXPECT_EXIT(
      {
        const WatchedSignals signals;
        ask(3);
        ::_exit(1);
      },
      testing::ExitedWithCode(kInterrupted), "");
}

// Writes to a pipe that nobody reads.
void writeForEver() {
  int ends[2];
  char bytes[4096] = {};
  while (::pipe(ends) == 0 && ::write(ends[1], bytes, sizeof bytes) > 0) {
    while (::write(ends[1], bytes, sizeof bytes) > 0) {
    }
  }
}

TEST_F(WatchedSignalsDeathTest, EndTheProcessWhenAnOutputBlocksAfterTheSecondRequest) {
  const steady_clock::time_point begin = steady_clock::now();
  EXPECT_EXIT(
      {
        const WatchedSignals signals;
        ask(2);
        writeForEver();
        ::_exit(1);
      },
      testing::ExitedWithCode(kInterrupted), "");
  EXPECT_GE(steady_clock::now() - begin, 2s);
}

TEST_F(WatchedSignalsDeathTest, DoNotEndAProcessThatWaitsForAChildAfterTheSecondRequest) {
  EXPECT_EXIT(
      {
        const WatchedSignals signals;
        ask(2);
        const steady_clock::time_point end = steady_clock::now() + 3s;
        {
          const WaitForChild wait;
          while (steady_clock::now() < end) ::usleep(100'000);
        }
        ::_exit(7);
      },
      testing::ExitedWithCode(7), "");
}

TEST_F(WatchedSignalsDeathTest, DoNotEndAProcessThatComputesAfterTheSecondRequest) {
  EXPECT_EXIT(
      {
        const WatchedSignals signals;
        ask(2);
        const steady_clock::time_point end = steady_clock::now() + 3s;
        while (steady_clock::now() < end) {
        }
        ::_exit(7);
      },
      testing::ExitedWithCode(7), "");
}

}  // namespace
}  // namespace quazor
