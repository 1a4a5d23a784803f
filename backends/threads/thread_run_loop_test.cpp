#include "backends/threads/thread_run_loop.h"

#include "backends/threads/real_clock.h"
#include "backends/threads/run_loop_conformance.h"
#include "backends/threads/run_loop_observer_conformance.h"
#include "backends/threads/thread_concurrency.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <functional>
#include <memory>
#include <thread>

namespace quazor {
namespace {

using namespace std::chrono_literals;

class ThreadRunLoopUnderTest {
 public:
  RunLoop& loop() { return *loops_.currentRunLoop(); }
  std::shared_ptr<Concurrency> concurrency() { return std::make_shared<ThreadConcurrency>(); }
  std::shared_ptr<Clock> clock() { return std::make_shared<RealClock>(); }

 private:
  ThreadRunLoops loops_;
};

INSTANTIATE_TYPED_TEST_SUITE_P(Threads, RunLoopConformance, ThreadRunLoopUnderTest);
INSTANTIATE_TYPED_TEST_SUITE_P(Threads, RunLoopObserverConformance, ThreadRunLoopUnderTest);

RunLoop& currentLoop() { return *ThreadRunLoops().currentRunLoop(); }

TEST(ThreadRunLoopTest, ThreadsHaveLoopsOfTheirOwn) {
  RunLoop* const here = &currentLoop();
  EXPECT_EQ(here, &currentLoop());
  std::thread([here] { EXPECT_NE(here, &currentLoop()); }).join();
}

TEST(ThreadRunLoopTest, ASourceIsHandledOnTheLoopsThreadWhoeverSignalsIt) {
  RunLoop& loop = currentLoop();
  std::thread::id handled_on;
  const auto source = loop.makeSource([&handled_on] { handled_on = std::this_thread::get_id(); });
  loop.addSource(source, kRunLoopDefaultMode);
  std::thread signaller([source] { source->signal(); });
  EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 10s, true), RunLoopResult::kHandledSource);
  signaller.join();
  EXPECT_EQ(handled_on, std::this_thread::get_id());
  loop.removeSource(source, kRunLoopDefaultMode);
}

TEST(ThreadRunLoopTest, AThreadLetsGoWhatItsLoopHoldsWhenItEnds) {
  int gone = 0;
  std::weak_ptr<RunLoopSource> source;
  std::thread([&] {
    RunLoop& loop = currentLoop();
    const auto made = loop.makeSource([guard = atDestruction([&gone] { ++gone; })] {});
    loop.addSource(made, kRunLoopDefaultMode);
    loop.addSource(made, "org.quazor.other");
    loop.addObserver(
        loop.makeObserver(kRunLoopExit, true, 0, [guard = atDestruction([&gone] { ++gone; })](RunLoopActivities) {}),
        kRunLoopDefaultMode);
    source = made;
  }).join();
  EXPECT_EQ(gone, 2);
  EXPECT_TRUE(source.expired());
}

TEST(ThreadRunLoopTest, AHandlerThatGoesWithItsLoopMayCallTheLoop) {
  int gone = 0;
  std::thread([&gone] {
    RunLoop& loop = currentLoop();
    const auto other = loop.makeSource([guard = atDestruction([&gone] { ++gone; })] {});
    loop.addSource(other, kRunLoopDefaultMode);
    loop.addSource(other, "org.quazor.other");
    const auto source = loop.makeSource([guard = atDestruction([&gone, &loop, other] {
                                           ++gone;
                                           loop.removeSource(other, kRunLoopDefaultMode);
                                           loop.removeSource(other, "org.quazor.other");
                                           loop.addSource(other, "org.quazor.third");
                                         })] {});
    loop.addSource(source, kRunLoopDefaultMode);
  }).join();
  EXPECT_EQ(gone, 2);
}

TEST(ThreadRunLoopTest, ASignalAfterTheThreadHasEndedHasNoEffect) {
  std::shared_ptr<RunLoopSource> source;
  std::thread([&source] {
    source = currentLoop().makeSource([] { ADD_FAILURE(); });
    currentLoop().addSource(source, kRunLoopDefaultMode);
  }).join();
  source->signal();
}

std::chrono::nanoseconds processorTimeOfThisThread() {
  timespec used{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
  return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
}

TEST(ThreadRunLoopTest, AThreadThatWaitsUsesLessThanAThousandthOfAProcessor) {
  constexpr std::chrono::nanoseconds kWait = 200ms;
  RunLoop& loop = currentLoop();
  const auto source = loop.makeSource([] {});
  loop.addSource(source, kRunLoopDefaultMode);
  // On a busy machine one wake-up may be expensive, but a loop that polls is always expensive.
  std::chrono::nanoseconds least = kWait;
  for (int attempt = 0; attempt < 25 && least >= kWait / 1000; ++attempt) {
    const auto before = processorTimeOfThisThread();
    EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, kWait, false), RunLoopResult::kTimedOut);
    least = std::min(least, processorTimeOfThisThread() - before);
  }
  EXPECT_LT(least, kWait / 1000);
  loop.removeSource(source, kRunLoopDefaultMode);
}

}  // namespace
}  // namespace quazor
