#include "host/system/descendants.h"

#include "host/system/child_for_tests.h"
#include "tests/support/effort.h"

#include <gtest/gtest.h>

#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cstddef>
#include <functional>
#include <optional>
#include <thread>
#include <vector>

namespace quazor {
namespace {

using Processes = std::vector<pid_t>;
using Children = std::function<Processes()>;

// Every way to find the children must find the same.
const Children kWays[] = {childrenOfThisProcess, childrenByParent, [] { return childrenOfThreads().value(); }};

Processes sorted(Processes processes) {
  std::sort(processes.begin(), processes.end());
  return processes;
}

pid_t startHanging() {
  const pid_t child = ::fork();
  if (child == 0) hang();
  return child;
}

void endAll(const Processes& processes) {
  for (const pid_t one : processes) {
    ::kill(one, SIGKILL);
    ::waitpid(one, nullptr, 0);
  }
}

TEST(Descendants, AreNoneWithoutChildren) {
  for (const Children& children : kWays) EXPECT_EQ(children(), Processes());
}

// More than fit into a page of the kernel's list; with a sanitizer each fork takes long.
TEST(Descendants, AreAllChildren) {
  Processes started;
  for (int i = 0; i < (triesAll() ? 900 : 100); ++i) started.push_back(startHanging());
  for (const Children& children : kWays) EXPECT_EQ(sorted(children()), sorted(started));
  endAll(started);
  for (const Children& children : kWays) EXPECT_EQ(children(), Processes());
}

TEST(Descendants, AreThoseOfEveryThread) {
  Processes started = {startHanging()};
  std::atomic<bool> isStarted = false;
  std::atomic<bool> mayEnd = false;
  pid_t ofLasting = -1;
  pid_t ofEnded = -1;
  std::thread lasting([&] {
    ofLasting = startHanging();
    isStarted = true;
    isStarted.notify_one();
    mayEnd.wait(false);
  });
  std::thread([&] { ofEnded = startHanging(); }).join();
  isStarted.wait(false);
  started.insert(started.end(), {ofLasting, ofEnded});
  for (const Children& children : kWays) EXPECT_EQ(sorted(children()), sorted(started));
  mayEnd = true;
  mayEnd.notify_one();
  lasting.join();
  for (const Children& children : kWays) EXPECT_EQ(sorted(children()), sorted(started));
  endAll(started);
}

TEST(Descendants, AreAlsoThoseThatHaveEndedAndAreNotReaped) {
  const pid_t child = ::fork();
  if (child == 0) ::_exit(0);
  siginfo_t info{};
  ASSERT_EQ(::waitid(P_PID, static_cast<id_t>(child), &info, WEXITED | WNOWAIT), 0);
  for (const Children& children : kWays) EXPECT_EQ(children(), Processes{child});
  endAll({child});
}

TEST(Descendants, AreNotGrandchildren) {
  int ends[2] = {-1, -1};
  ASSERT_EQ(::pipe(ends), 0);
  const pid_t child = ::fork();
  if (child == 0) {
    const pid_t grandchild = startHanging();
    ::write(ends[1], &grandchild, sizeof grandchild) == sizeof grandchild ? hang() : ::_exit(1);
  }
  pid_t grandchild = -1;
  ASSERT_EQ(::read(ends[0], &grandchild, sizeof grandchild), static_cast<ssize_t>(sizeof grandchild));
  for (const Children& children : kWays) EXPECT_EQ(children(), Processes{child});
  ::kill(grandchild, SIGKILL);
  endAll({child});
  ::close(ends[0]);
  ::close(ends[1]);
}

}  // namespace
}  // namespace quazor
