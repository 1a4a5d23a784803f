#include "backends/simulated/time/virtual_run_loop.h"

#include "backends/simulated/time/simulation_stall.h"
#include "backends/simulated/time/virtual_services.h"
#include "backends/threads/run_loop_conformance.h"
#include "backends/threads/run_loop_observer_conformance.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

template <std::uint64_t seed>
class VirtualRunLoopUnderTest {
 public:
  ~VirtualRunLoopUnderTest() { scheduler_->discardPending(); }

  RunLoop& loop() { return *loops_.currentRunLoop(); }
  std::shared_ptr<Concurrency> concurrency() { return std::make_shared<VirtualConcurrency>(scheduler_); }
  std::shared_ptr<Clock> clock() { return std::make_shared<VirtualClock>(scheduler_); }

 private:
  std::shared_ptr<VirtualScheduler> scheduler_ =
      std::make_shared<VirtualScheduler>(std::make_shared<RandomStrategy>(seed));
  VirtualRunLoops loops_{scheduler_};
};

using Seeds = ::testing::Types<VirtualRunLoopUnderTest<1>, VirtualRunLoopUnderTest<2>>;
INSTANTIATE_TYPED_TEST_SUITE_P(VirtualTime, RunLoopConformance, Seeds);
INSTANTIATE_TYPED_TEST_SUITE_P(VirtualTime, RunLoopObserverConformance, Seeds);

class VirtualRunLoopTest : public ::testing::Test {
 protected:
  ~VirtualRunLoopTest() override { scheduler_->discardPending(); }

  std::shared_ptr<SerialQueue> makeQueue() {
    return VirtualConcurrency(scheduler_).makeSerialQueue("org.quazor.lane", QualityOfService::kDefault);
  }
  // Runs until there is nothing left to do at the current time.
  void settle() { VirtualClock(scheduler_).sleep(1ns); }

  int gone_ = 0;  // destroyed handlers, including those destroyed with their loops
  std::shared_ptr<VirtualScheduler> scheduler_ =
      std::make_shared<VirtualScheduler>(std::make_shared<RandomStrategy>(3));
  VirtualRunLoops loops_{scheduler_};
};

TEST_F(VirtualRunLoopTest, ALongWaitIsOneStepOfVirtualTime) {
  RunLoop& loop = *loops_.currentRunLoop();
  loop.addSource(loop.makeSource([] {}), kRunLoopDefaultMode);
  EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 24h, false), RunLoopResult::kTimedOut);
  EXPECT_EQ(scheduler_->now(), 24h);
}

TEST_F(VirtualRunLoopTest, OtherTasksGoOnWhileARunWaits) {
  RunLoop& loop = *loops_.currentRunLoop();
  std::vector<std::chrono::nanoseconds> ran;
  const auto source = loop.makeSource([] {});
  loop.addSource(source, kRunLoopDefaultMode);
  const auto queue = makeQueue();
  queue->asyncAfter(1s, [&] { ran.push_back(scheduler_->now()); });
  queue->asyncAfter(2s, [&] {
    ran.push_back(scheduler_->now());
    source->signal();
  });
  queue->asyncAfter(3s, [&] { ran.push_back(scheduler_->now()); });
  EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 1h, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(ran, (std::vector<std::chrono::nanoseconds>{1s, 2s}));
  EXPECT_EQ(scheduler_->now(), 2s);
}

TEST_F(VirtualRunLoopTest, AWaitThatNothingCanEndIsAStallAndTheLoopCanBeRunAgain) {
  RunLoop& loop = *loops_.currentRunLoop();
  std::string told;
  loop.addSource(loop.makeSource([] {}), kRunLoopDefaultMode);
  loop.addObserver(loop.makeObserver(kRunLoopExit, true, 0, [&told](RunLoopActivities) { told += "exit "; }),
                   kRunLoopDefaultMode);
  EXPECT_THROW(loop.runInMode(kRunLoopDefaultMode, std::chrono::nanoseconds::max(), false), SimulationStall);
  EXPECT_EQ(told, "");
  loop.stop();  // without a run
  EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 1s, false), RunLoopResult::kTimedOut);
  EXPECT_EQ(told, "exit ");
}

TEST_F(VirtualRunLoopTest, AStallOfAHandlerComesOutOfTheRun) {
  RunLoop& loop = *loops_.currentRunLoop();
  const auto never = VirtualConcurrency(scheduler_).makeSemaphore(0);
  const auto source = loop.makeSource([never] { never->wait(); });
  loop.addSource(source, kRunLoopDefaultMode);
  source->signal();
  EXPECT_THROW(loop.runInMode(kRunLoopDefaultMode, 1s, false), SimulationStall);
  EXPECT_EQ(loop.runInMode(kRunLoopDefaultMode, 1s, false), RunLoopResult::kTimedOut);
}

TEST_F(VirtualRunLoopTest, TheMainFlowAndEveryLaneHaveLoopsOfTheirOwn) {
  std::vector<RunLoop*> of_one;
  std::vector<RunLoop*> of_other;
  const auto one = makeQueue();
  const auto other = makeQueue();
  for (int i = 0; i < 2; ++i) {
    one->async([&] { of_one.push_back(loops_.currentRunLoop()); });
    other->async([&] { of_other.push_back(loops_.currentRunLoop()); });
  }
  settle();
  ASSERT_EQ(of_one.size(), 2U);
  ASSERT_EQ(of_other.size(), 2U);
  EXPECT_EQ(of_one[0], of_one[1]);
  EXPECT_EQ(of_other[0], of_other[1]);
  EXPECT_NE(of_one[0], of_other[0]);
  EXPECT_NE(of_one[0], loops_.currentRunLoop());
  EXPECT_NE(of_other[0], loops_.currentRunLoop());
}

TEST_F(VirtualRunLoopTest, LoopsOfTheMainFlowAndOfALaneRunAtTheSameTime) {
  RunLoop& here = *loops_.currentRunLoop();
  std::string words;
  const auto answer = here.makeSource([&words] { words += "answer "; });
  here.addSource(answer, kRunLoopDefaultMode);
  std::shared_ptr<RunLoopSource> question;
  const auto queue = makeQueue();
  queue->async([&] {
    RunLoop& there = *loops_.currentRunLoop();
    question = there.makeSource([&] {
      words += "question ";
      answer->signal();
    });
    there.addSource(question, kRunLoopDefaultMode);
    EXPECT_EQ(there.runInMode(kRunLoopDefaultMode, 1h, true), RunLoopResult::kHandledSource);
  });
  settle();
  question->signal();
  EXPECT_EQ(here.runInMode(kRunLoopDefaultMode, 1h, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(words, "question answer ");
}

TEST_F(VirtualRunLoopTest, TheLoopOfALaneThatIsGoneGoesWhenAnotherIsMade) {
  const auto fillLoop = [this] {
    RunLoop& loop = *loops_.currentRunLoop();
    loop.addSource(loop.makeSource([guard = atDestruction([this] { ++gone_; })] {}), kRunLoopDefaultMode);
  };
  makeQueue()->async(fillLoop);
  const auto lasting = makeQueue();
  settle();
  EXPECT_EQ(gone_, 0);
  lasting->async(fillLoop);
  settle();
  EXPECT_EQ(gone_, 1);
  makeQueue()->async(fillLoop);
  settle();
  EXPECT_EQ(gone_, 1);
}

TEST_F(VirtualRunLoopTest, ATaskThatWaitsInARunEndsWhenTheSchedulerDiscardsIt) {
  bool ended = false;
  const auto queue = makeQueue();
  queue->async([&] {
    const auto end = atDestruction([&ended] { ended = true; });
    RunLoop& loop = *loops_.currentRunLoop();
    loop.addSource(loop.makeSource([] {}), kRunLoopDefaultMode);
    loop.runInMode(kRunLoopDefaultMode, 1h, false);
    ADD_FAILURE() << "the run has returned";
  });
  settle();
  EXPECT_FALSE(ended);
  scheduler_->discardPending();
  EXPECT_TRUE(ended);
}

}  // namespace
}  // namespace quazor
