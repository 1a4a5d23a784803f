#include "backends/linux/system/descriptor_run_loop.h"

#include "backends/threads/real_clock.h"
#include "backends/threads/run_loop_conformance.h"
#include "backends/threads/run_loop_observer_conformance.h"
#include "backends/threads/thread_concurrency.h"
#include "backends/threads/thread_run_loop.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fcntl.h>
#include <malloc.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <memory>
#include <set>
#include <string>
#include <thread>
#include <utility>

namespace quazor {
namespace {

using namespace std::chrono_literals;

RunLoop& currentLoop() { return *makeLinuxRunLoops()->currentRunLoop(); }

class LinuxUnderTest {
 public:
  RunLoop& loop() { return currentLoop(); }
  std::shared_ptr<Concurrency> concurrency() { return std::make_shared<ThreadConcurrency>(); }
  std::shared_ptr<Clock> clock() { return std::make_shared<RealClock>(); }
};

INSTANTIATE_TYPED_TEST_SUITE_P(Linux, RunLoopConformance, LinuxUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Linux, RunLoopObserverConformance, LinuxUnderTest);

std::chrono::nanoseconds processorTimeOfThisThread() {
  timespec used{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
  return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
}

// Two connected sockets. One end is watched for a source that counts signals and reads only if it is told to.
class DescriptorRunLoopTest : public ::testing::Test {
 protected:
  static constexpr std::string_view kMode = kRunLoopDefaultMode;
  static constexpr std::string_view kOther = "org.quazor.other";

  DescriptorRunLoopTest() {
    std::array<int, 2> ends{};
    EXPECT_EQ(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0, ends.data()), 0);
    near_ = std::make_shared<const FileDescriptor>(ends[0]);
    far_ = FileDescriptor(ends[1]);
    source_ = loop_.makeSource([this] {
      ++handled_;
      if (armsAgain_) watch_->arm();
      if (reads_) read();
      if (onHandled_) onHandled_();
    });
    loop_.addSource(source_, kMode);
    watch_ = watchDescriptor(loop_, near_, source_);
  }
  ~DescriptorRunLoopTest() override {
    for (const std::string_view mode : {kMode, kOther}) {
      loop_.removeSource(source_, mode);
      loop_.removeSource(idle_, mode);
    }
  }

  void send() { EXPECT_EQ(::write(far_.get(), "x", 1), 1); }
  void read() {
    char byte = 0;
    while (::read(near_->get(), &byte, 1) == 1) {
    }
  }
  RunLoopResult run(std::chrono::nanoseconds limit = 0ns, bool returnAfterSourceHandled = false,
                    std::string_view mode = kMode) {
    return loop_.runInMode(mode, limit, returnAfterSourceHandled);
  }

  RunLoop& loop_ = currentLoop();
  const std::shared_ptr<RunLoopSource> idle_ = loop_.makeSource([] {});
  std::shared_ptr<const FileDescriptor> near_;
  FileDescriptor far_;
  std::shared_ptr<RunLoopSource> source_;
  std::shared_ptr<DescriptorWatch> watch_;
  bool armsAgain_ = true;
  bool reads_ = true;
  int handled_ = 0;
  std::function<void()> onHandled_;
};

TEST_F(DescriptorRunLoopTest, ThreadsHaveLoopsOfTheirOwn) {
  RunLoop* const here = &currentLoop();
  EXPECT_EQ(here, &currentLoop());
  std::thread([here] { EXPECT_NE(here, &currentLoop()); }).join();
}

TEST_F(DescriptorRunLoopTest, AWatchIsNotArmedByItself) {
  send();
  EXPECT_EQ(run(), RunLoopResult::kTimedOut);
  EXPECT_EQ(handled_, 0);
  watch_->arm();
  run();
  EXPECT_EQ(handled_, 1);
}

TEST_F(DescriptorRunLoopTest, BytesWakeALoopThatSleepsOnItsOwnThread) {
  watch_->arm();
  std::thread::id handledOn;
  onHandled_ = [&] { handledOn = std::this_thread::get_id(); };
  std::thread sender([this] {
    std::this_thread::sleep_for(2ms);
    send();
  });
  EXPECT_EQ(run(10s, true), RunLoopResult::kHandledSource);
  sender.join();
  EXPECT_EQ(handledOn, std::this_thread::get_id());
  EXPECT_EQ(handled_, 1);
}

TEST_F(DescriptorRunLoopTest, ALimitOfZeroLooksAtDescriptors) {
  watch_->arm();
  EXPECT_EQ(run(0ns, true), RunLoopResult::kTimedOut);
  send();
  EXPECT_EQ(run(0ns, true), RunLoopResult::kHandledSource);
  send();
  EXPECT_EQ(run(-1s, false), RunLoopResult::kTimedOut);
  EXPECT_EQ(handled_, 2);
}

TEST_F(DescriptorRunLoopTest, ASourceThatIsAlwaysSignalledDoesNotKeepDescriptorsFromTheirs) {
  watch_->arm();
  onHandled_ = [this] { loop_.stop(); };
  std::shared_ptr<RunLoopSource> busy;
  busy = loop_.makeSource([&busy] { busy->signal(); });
  loop_.addSource(busy, kMode);
  busy->signal();
  send();
  EXPECT_EQ(run(10s), RunLoopResult::kStopped);
  EXPECT_EQ(handled_, 1);
  loop_.removeSource(busy, kMode);
}

TEST_F(DescriptorRunLoopTest, WhatIsNotReadIsToldAgainWhenItIsArmedAgain) {
  watch_->arm();
  reads_ = false;
  send();
  for (int i = 1; i <= 3; ++i) {
    EXPECT_EQ(run(10s, true), RunLoopResult::kHandledSource);
    EXPECT_EQ(handled_, i);
  }
  armsAgain_ = false;
  run();
  EXPECT_EQ(handled_, 4);
  EXPECT_EQ(run(1ms, true), RunLoopResult::kTimedOut);
  EXPECT_EQ(handled_, 4);
}

TEST_F(DescriptorRunLoopTest, AHandlerThatRunsTheLoopIsCalledAgainInThatRun) {
  watch_->arm();
  reads_ = false;
  onHandled_ = [this] {
    if (handled_ == 1) {
      EXPECT_EQ(run(10s, true), RunLoopResult::kHandledSource);
      read();
    }
  };
  send();
  EXPECT_EQ(run(10s, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(handled_, 2);
}

TEST_F(DescriptorRunLoopTest, ReadinessIsKeptForTheModeOfTheSourceAndDoesNotKeepOtherModesAwake) {
  loop_.addSource(idle_, kOther);
  watch_->arm();
  send();
  const auto before = processorTimeOfThisThread();
  EXPECT_EQ(run(50ms, false, kOther), RunLoopResult::kTimedOut);
  EXPECT_LT(processorTimeOfThisThread() - before, 25ms);
  EXPECT_EQ(handled_, 0);
  EXPECT_EQ(run(0ns, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(handled_, 1);
}

TEST_F(DescriptorRunLoopTest, AHangUpIsTold) {
  watch_->arm();
  armsAgain_ = false;
  far_.reset();
  EXPECT_EQ(run(10s, true), RunLoopResult::kHandledSource);
}

// A handler does not arm the watch of an unusable descriptor again, although the descriptor stays ready.
TEST_F(DescriptorRunLoopTest, ADeadDescriptorDoesNotKeepTheLoopAwake) {
  watch_->arm();
  armsAgain_ = false;
  far_.reset();
  const auto before = processorTimeOfThisThread();
  EXPECT_EQ(run(100ms), RunLoopResult::kTimedOut);
  EXPECT_EQ(handled_, 1);
  EXPECT_LT(processorTimeOfThisThread() - before, 50ms);
}

TEST_F(DescriptorRunLoopTest, AThreadThatWaitsForADescriptorUsesLessThanAThousandthOfAProcessor) {
  constexpr std::chrono::nanoseconds kWait = 200ms;
  watch_->arm();
  std::chrono::nanoseconds least = kWait;
  for (int attempt = 0; attempt < 25 && least >= kWait / 1000; ++attempt) {
    const auto before = processorTimeOfThisThread();
    EXPECT_EQ(run(kWait), RunLoopResult::kTimedOut);
    least = std::min(least, processorTimeOfThisThread() - before);
  }
  EXPECT_LT(least, kWait / 1000);
}

TEST_F(DescriptorRunLoopTest, AWatchThatHasGoneTellsNothing) {
  watch_->arm();
  send();
  watch_.reset();
  EXPECT_EQ(run(1ms, true), RunLoopResult::kTimedOut);
  EXPECT_EQ(handled_, 0);
}

TEST_F(DescriptorRunLoopTest, WatchesThatHaveGoneLeaveNothingBehind) {
  const auto comeAndGo = [this] {
    for (int i = 0; i < 1000; ++i) {
      watchDescriptor(loop_, near_, source_)->arm();
      run();
    }
    return ::mallinfo2().uordblks;
  };
  const std::size_t before = comeAndGo();
  EXPECT_LT(comeAndGo(), before + 10'000);
}

TEST_F(DescriptorRunLoopTest, AWatchKeepsItsDescriptorAndNotItsSource) {
  const int descriptor = near_->get();
  near_.reset();
  EXPECT_NE(::fcntl(descriptor, F_GETFD), -1);
  loop_.removeSource(source_, kMode);
  const std::weak_ptr<RunLoopSource> weak = source_;
  source_.reset();
  EXPECT_TRUE(weak.expired());
  watch_->arm();
  send();
  run();
  watch_.reset();
  EXPECT_EQ(::fcntl(descriptor, F_GETFD), -1);
}

TEST_F(DescriptorRunLoopTest, AWatchMayGoOnAnotherThreadWhileTheLoopSleeps) {
  watch_->arm();
  const int descriptor = near_->get();
  near_.reset();
  std::atomic<bool> runs = false;
  loop_.addObserver(loop_.makeObserver(kRunLoopBeforeWaiting, false, 0,
                                       [&runs](RunLoopActivities) {
                                         runs = true;
                                         runs.notify_one();
                                       }),
                    kMode);
  std::thread other([this, &runs] {
    runs.wait(false);
    std::this_thread::sleep_for(2ms);
    watch_.reset();
    loop_.stop();
  });
  EXPECT_EQ(run(10s), RunLoopResult::kStopped);
  other.join();
  EXPECT_EQ(::fcntl(descriptor, F_GETFD), -1);
}

TEST_F(DescriptorRunLoopTest, TwoWatchesOfOneDescriptorTellEachForItself) {
  int others = 0;
  loop_.removeSource(source_, kMode);
  loop_.addSource(source_, kOther);
  const auto second = loop_.makeSource([&others] { ++others; });
  loop_.addSource(second, kMode);
  const auto watch = watchDescriptor(loop_, near_, second);
  watch->arm();
  watch_->arm();
  send();
  run();
  EXPECT_EQ(others, 1);
  EXPECT_EQ(handled_, 0);
  run(0ns, false, kOther);
  EXPECT_EQ(handled_, 1);
  loop_.removeSource(second, kMode);
}

TEST_F(DescriptorRunLoopTest, LoopsThatCannotWaitForDescriptorsAreToldApart) {
  RunLoop& foreign = *ThreadRunLoops().currentRunLoop();
  EXPECT_EQ(watchDescriptor(foreign, near_, foreign.makeSource([] {})), nullptr);
  std::thread([this] { EXPECT_EQ(watchDescriptor(loop_, near_, source_), nullptr); }).join();
}

TEST_F(DescriptorRunLoopTest, AThreadGetsNoLoopWithoutADescriptorForItAndOneLater) {
  rlimit before{};
  ASSERT_EQ(::getrlimit(RLIMIT_NOFILE, &before), 0);
  std::thread([&before] {
    rlimit none = before;
    none.rlim_cur = 0;
    EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &none), 0);
    EXPECT_EQ(makeLinuxRunLoops()->currentRunLoop(), nullptr);
    EXPECT_EQ(::setrlimit(RLIMIT_NOFILE, &before), 0);
    EXPECT_NE(makeLinuxRunLoops()->currentRunLoop(), nullptr);
  }).join();
}

// The kernel's IDs of this process's event descriptors.
std::set<std::string> eventDescriptors() {
  std::set<std::string> found;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fdinfo")) {
    std::ifstream stream(entry.path());
    for (std::string line; std::getline(stream, line);) {
      if (line.starts_with("eventfd-id:")) found.insert(line);
    }
  }
  return found;
}

TEST_F(DescriptorRunLoopTest, AProcessMadeByForkDoesNotShareTheWakeUpsOfItsParent) {
  const std::set<std::string> mine = eventDescriptors();
  ASSERT_FALSE(mine.empty());
  const pid_t child = ::fork();
  ASSERT_NE(child, -1);
  if (child == 0) {
    RunLoop* const loop = makeLinuxRunLoops()->currentRunLoop();
    const std::set<std::string> inChild = eventDescriptors();
    ::_exit(loop == &loop_ && !inChild.empty() && inChild != mine ? 0 : 1);
  }
  int status = 0;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_TRUE(WIFEXITED(status));
  EXPECT_EQ(WEXITSTATUS(status), 0);
}

}  // namespace
}  // namespace quazor
