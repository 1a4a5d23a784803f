#include "backends/simulated/time/virtual_scheduler.h"

#include "backends/simulated/time/simulation_stall.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <limits>
#include <memory>
#include <set>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using Words = std::vector<std::string>;

// Chooses as told, then always the first; keeps how many things there were to choose from.
class ScriptedChooser final : public ScheduleStrategy {
 public:
  explicit ScriptedChooser(std::vector<std::size_t> script = {}) : script_(std::move(script)) {}

  std::size_t choose(std::size_t count) override {
    counts.push_back(count);
    return counts.size() <= script_.size() ? script_[counts.size() - 1] : 0;
  }

  std::vector<std::size_t> counts;

 private:
  std::vector<std::size_t> script_;
};

class VirtualSchedulerTest : public ::testing::Test {
 protected:
  Task say(std::string word) {
    return [this, word = std::move(word)] { words_.push_back(word); };
  }

  VirtualScheduler scheduler_{std::make_shared<ScriptedChooser>()};
  Words words_;
};

TEST_F(VirtualSchedulerTest, TimeBeginsAtZeroAndStandsStillUntilSomethingBlocks) {
  const auto strand = scheduler_.makeStrand();
  scheduler_.submit(strand, say("task"));
  scheduler_.submitAt(1s, strand, say("delayed"));
  EXPECT_EQ(scheduler_.now(), 0s);
  EXPECT_TRUE(words_.empty());
}

TEST_F(VirtualSchedulerTest, TimeJumpsToWhatIsDueNext) {
  const auto strand = scheduler_.makeStrand();
  std::vector<std::chrono::nanoseconds> times;
  for (const auto due : {3s, 1s, 2s}) scheduler_.submitAt(due, strand, [&] { times.push_back(scheduler_.now()); });
  scheduler_.blockUntil(10s, "the test");
  EXPECT_THAT(times, ElementsAre(1s, 2s, 3s));
  EXPECT_EQ(scheduler_.now(), 10s);
}

TEST_F(VirtualSchedulerTest, TheMainFlowGoesOnAsSoonAsItIsChosen) {
  const auto strand = scheduler_.makeStrand();
  scheduler_.submitAt(1s, strand, say("due at the same time"));
  scheduler_.blockUntil(1s, "the test");
  EXPECT_TRUE(words_.empty());
  scheduler_.blockUntil(2s, "the test");
  EXPECT_THAT(words_, ElementsAre("due at the same time"));
}

TEST_F(VirtualSchedulerTest, TasksDueAtOneTimeKeepTheOrderOfTheirSubmission) {
  const auto strand = scheduler_.makeStrand();
  for (const char* word : {"a", "b", "c"}) scheduler_.submitAt(1s, strand, say(word));
  scheduler_.blockUntil(2s, "the test");
  EXPECT_THAT(words_, ElementsAre("a", "b", "c"));
}

TEST_F(VirtualSchedulerTest, ADueTimeThatHasComeIsNoDelay) {
  const auto strand = scheduler_.makeStrand();
  scheduler_.blockUntil(5s, "the test");
  scheduler_.submit(strand, say("first"));
  scheduler_.submitAt(5s, strand, say("now"));
  scheduler_.submitAt(1s, strand, say("in the past"));
  scheduler_.blockUntil(5s + 1ns, "the test");
  EXPECT_THAT(words_, ElementsAre("first", "now", "in the past"));
}

TEST_F(VirtualSchedulerTest, DueTimesSaturateAndTheLastOneNeverComes) {
  constexpr auto kMax = std::chrono::nanoseconds::max();
  EXPECT_EQ(scheduler_.after(-1s), 0s);
  EXPECT_EQ(scheduler_.after(1s), 1s);
  EXPECT_EQ(scheduler_.after(kMax), kMax);
  scheduler_.blockUntil(kMax - 5ns, "the test");
  EXPECT_EQ(scheduler_.after(4ns), kMax - 1ns);
  EXPECT_EQ(scheduler_.after(5ns), kMax);
  EXPECT_EQ(scheduler_.after(6ns), kMax);
  EXPECT_EQ(scheduler_.after(kMax), kMax);
  EXPECT_EQ(scheduler_.after(std::chrono::nanoseconds::min()), kMax - 5ns);

  scheduler_.submitAt(kMax, scheduler_.makeStrand(), say("never"));
  scheduler_.blockUntil(kMax - 1ns, "the test");
  EXPECT_THROW(scheduler_.blockUntil(kMax, "the end of time"), SimulationStall);
  EXPECT_TRUE(words_.empty());
}

TEST_F(VirtualSchedulerTest, ALaneWaitsForItsTaskThatBlocksAndOthersDoNot) {
  const auto one = scheduler_.makeStrand();
  const auto other = scheduler_.makeStrand();
  scheduler_.submit(one, [&] {
    words_.push_back("one begins");
    scheduler_.blockUntil(2s, "the task");
    words_.push_back("one ends");
  });
  scheduler_.submit(one, say("next of one"));
  scheduler_.submitAt(1s, other, say("other"));
  scheduler_.blockUntil(3s, "the test");
  EXPECT_THAT(words_, ElementsAre("one begins", "other", "one ends", "next of one"));
}

TEST_F(VirtualSchedulerTest, AWaitThatWasBegunEarlierMayEndEarlier) {
  const auto one = scheduler_.makeStrand();
  const auto other = scheduler_.makeStrand();
  scheduler_.submit(one, [&] {
    scheduler_.blockUntil(1s, "the short wait");
    words_.push_back("short");
  });
  scheduler_.submit(other, [&] {
    scheduler_.blockUntil(5s, "the long wait");
    words_.push_back("long");
  });
  scheduler_.blockUntil(2s, "the test");
  EXPECT_THAT(words_, ElementsAre("short"));
  scheduler_.blockUntil(6s, "the test");
  EXPECT_THAT(words_, ElementsAre("short", "long"));
}

TEST_F(VirtualSchedulerTest, ATaskIsDestroyedWhenItHasRunAndBeforeTheNextStarts) {
  const auto strand = scheduler_.makeStrand();
  struct Says {
    Words& words;
    ~Says() { words.push_back("destroyed"); }
  };
  scheduler_.submit(strand, [this, says = std::make_unique<Says>(Says{words_})] { words_.push_back("runs"); });
  words_.clear();  // of the temporary above
  scheduler_.submit(strand, say("next"));
  scheduler_.blockUntil(1s, "the test");
  EXPECT_THAT(words_, ElementsAre("runs", "destroyed", "next"));
}

TEST_F(VirtualSchedulerTest, DroppingWhatIsDelayedLeavesWhatIsDueAndOtherLanes) {
  const auto strand = scheduler_.makeStrand();
  const auto other = scheduler_.makeStrand();
  const auto token = std::make_shared<int>();
  scheduler_.submit(strand, say("due"));
  scheduler_.submitAt(1s, strand, [this, token] { words_.push_back("delayed"); });
  scheduler_.submitAt(1s, other, say("of another lane"));
  scheduler_.dropDelayed(*strand);
  EXPECT_EQ(token.use_count(), 1);
  scheduler_.blockUntil(2s, "the test");
  EXPECT_THAT(words_, ElementsAre("due", "of another lane"));
}

TEST_F(VirtualSchedulerTest, AStallSaysWhatWasWaitedForAndWhen) {
  scheduler_.blockUntil(1500ms, "the test");
  EXPECT_EQ(thrownText<SimulationStall>([&] { scheduler_.blockUntil([] { return false; }, "a lamp is to light up"); }),
            "The simulated phone waits for ever: a lamp is to light up, at 1.5 s of virtual time.");
}

TEST_F(VirtualSchedulerTest, AWaitEndsWhenALaterTaskMakesItsConditionHold) {
  const auto strand = scheduler_.makeStrand();
  bool lit = false;
  scheduler_.submitAt(7s, strand, [&] { lit = true; });
  scheduler_.blockUntil([&] { return lit; }, "a lamp is to light up");
  EXPECT_EQ(scheduler_.now(), 7s);
}

TEST_F(VirtualSchedulerTest, AWaitWithADueTimeEndsWhenItsConditionHoldsOrWithTheTime) {
  bool lit = false;
  const auto strand = scheduler_.makeStrand();
  scheduler_.submitAt(3s, strand, [&lit] { lit = true; });
  scheduler_.blockUntil([&lit] { return lit; }, 2s, "a lamp is to light up");
  EXPECT_EQ(scheduler_.now(), 2s);
  EXPECT_FALSE(lit);
  scheduler_.blockUntil([&lit] { return lit; }, 10s, "a lamp is to light up");
  EXPECT_EQ(scheduler_.now(), 3s);
  EXPECT_THROW(scheduler_.blockUntil([] { return false; }, VirtualScheduler::kNever, "a lamp is to light up"),
               SimulationStall);
}

TEST_F(VirtualSchedulerTest, ATaskIsToldItsLaneAndTheMainFlowHasNone) {
  const auto first = scheduler_.makeStrand();
  const auto second = scheduler_.makeStrand();
  std::vector<std::shared_ptr<VirtualScheduler::Strand>> strands;
  const auto tellLane = [&] { strands.push_back(scheduler_.currentStrand()); };
  scheduler_.submit(first, [&] {
    tellLane();
    scheduler_.blockUntil(1s, "the task");
    tellLane();
  });
  scheduler_.submitAt(1s, second, tellLane);
  scheduler_.blockUntil(2s, "the test");
  EXPECT_THAT(strands, testing::UnorderedElementsAre(first, first, second));
  EXPECT_EQ(strands.front(), first);
  EXPECT_EQ(scheduler_.currentStrand(), nullptr);
}

TEST_F(VirtualSchedulerTest, WhatATaskThrowsComesOutOfTheMainFlowsWaitAndTheLaneGoesOn) {
  const auto strand = scheduler_.makeStrand();
  scheduler_.submit(strand, [] { throw std::runtime_error("broken"); });
  scheduler_.submit(strand, say("next"));
  EXPECT_THROW(scheduler_.blockUntil(1s, "the test"), std::runtime_error);
  scheduler_.blockUntil(1s, "the test");
  scheduler_.blockUntil(2s, "the test");
  EXPECT_THAT(words_, ElementsAre("next"));
}

TEST_F(VirtualSchedulerTest, DiscardingDestroysPendingTasksAndThoseThatTheyLeaveBehind) {
  const auto strand = scheduler_.makeStrand();
  const auto token = std::make_shared<int>();
  struct SubmitsWhenDestroyed {
    VirtualScheduler& scheduler;
    std::shared_ptr<VirtualScheduler::Strand> strand;
    std::shared_ptr<int> token;
    ~SubmitsWhenDestroyed() {
      scheduler.submit(strand, [token = token] {});
    }
  };
  auto leaves = std::make_unique<SubmitsWhenDestroyed>(SubmitsWhenDestroyed{scheduler_, strand, token});
  scheduler_.discardPending();  // what the temporary left
  scheduler_.submit(strand, [token] {});
  scheduler_.submitAt(1h, strand, [leaves = std::move(leaves)] {});
  EXPECT_EQ(token.use_count(), 3);
  scheduler_.discardPending();
  EXPECT_EQ(token.use_count(), 1);
}

TEST_F(VirtualSchedulerTest, DiscardingUnwindsATaskThatBlocks) {
  const auto strand = scheduler_.makeStrand();
  struct Says {
    Words& words;
    ~Says() { words.push_back("unwound"); }
  };
  scheduler_.submit(strand, [&] {
    const Says says{words_};
    EXPECT_THAT(
        thrownText<SimulationStall>([&] { scheduler_.blockUntil([] { return false; }, "a lamp is to light up"); }),
        testing::HasSubstr("a lamp is to light up"));
    words_.push_back("stalled");
    EXPECT_THROW(scheduler_.blockUntil(1h, "another wait"), SimulationStall);
  });
  scheduler_.blockUntil(1s, "the test");
  EXPECT_TRUE(words_.empty());
  scheduler_.discardPending();
  EXPECT_THAT(words_, ElementsAre("stalled", "unwound"));
}

TEST_F(VirtualSchedulerTest, AStallLeavesBlockedTasksToBeDiscardedWithTheScheduler) {
  auto scheduler = std::make_unique<VirtualScheduler>(std::make_shared<ScriptedChooser>());
  const auto strand = scheduler->makeStrand();
  const auto token = std::make_shared<int>();
  scheduler->submit(strand, [&scheduler = *scheduler, token] {
    scheduler.blockUntil([] { return false; }, "a lamp is to light up");
  });
  EXPECT_THROW(scheduler->blockUntil([] { return false; }, "another lamp is to light up"), SimulationStall);
  EXPECT_EQ(token.use_count(), 2);
  scheduler.reset();
  EXPECT_EQ(token.use_count(), 1);
}

TEST(VirtualSchedulerChoices, AChoiceThatThereIsNotIsRefused) {
  VirtualScheduler scheduler(std::make_shared<ScriptedChooser>(std::vector<std::size_t>{2}));
  for (int i = 0; i < 2; ++i) scheduler.submit(scheduler.makeStrand(), [] {});
  EXPECT_THROW(scheduler.blockUntil(1s, "the test"), std::out_of_range);
}

TEST(VirtualSchedulerChoices, WithOneThingToDoTheChooserIsNotAsked) {
  const auto chooser = std::make_shared<ScriptedChooser>();
  VirtualScheduler scheduler(chooser);
  const auto strand = scheduler.makeStrand();
  for (int i = 0; i < 3; ++i) scheduler.submit(strand, [] {});
  scheduler.blockUntil(1s, "the test");
  EXPECT_TRUE(chooser->counts.empty());
}

// Two lanes of two tasks each, and the main flow that waits for both.
Words runOfTwoLanes(const std::shared_ptr<ScheduleStrategy>& chooser) {
  VirtualScheduler scheduler(chooser);
  Words words;
  int left = 4;
  for (const char* strand : {"a", "b"}) {
    const auto made = scheduler.makeStrand();
    for (const char* number : {"1", "2"}) {
      scheduler.submit(made, [&words, &left, word = std::string(strand) + number] {
        words.push_back(word);
        --left;
      });
    }
  }
  scheduler.blockUntil([&] { return left == 0; }, "the tasks");
  return words;
}

TEST(VirtualSchedulerChoices, ReplayingPrefixesOfChoicesReachesEveryInterleaving) {
  std::set<Words> reached;
  std::vector<std::vector<std::size_t>> open{{}};
  int runs = 0;
  while (!open.empty()) {
    const std::vector<std::size_t> prefix = open.back();
    open.pop_back();
    const auto chooser = std::make_shared<ScriptedChooser>(prefix);
    reached.insert(runOfTwoLanes(chooser));
    ++runs;
    for (std::size_t at = prefix.size(); at < chooser->counts.size(); ++at) {
      for (std::size_t choice = 1; choice < chooser->counts[at]; ++choice) {
        std::vector<std::size_t> next = prefix;
        next.resize(at, 0);
        next.push_back(choice);
        open.push_back(next);
      }
    }
  }
  EXPECT_EQ(runs, 6);  // the ways to merge two sequences of two
  EXPECT_EQ(reached.size(), 6U);
  for (const Words& words : reached) {
    EXPECT_LT(std::ranges::find(words, "a1"), std::ranges::find(words, "a2"));
    EXPECT_LT(std::ranges::find(words, "b1"), std::ranges::find(words, "b2"));
  }
}

TEST(VirtualSchedulerChoices, OneSeedIsOneOrderAndSeedsDiffer) {
  std::set<Words> reached;
  for (std::uint64_t seed = 0; seed < 64; ++seed) {
    const Words words = runOfTwoLanes(std::make_shared<RandomStrategy>(seed));
    EXPECT_EQ(words, runOfTwoLanes(std::make_shared<RandomStrategy>(seed)));
    reached.insert(words);
  }
  EXPECT_EQ(reached.size(), 6U);
}

TEST(VirtualSchedulerChoices, OtherTasksMayRunBeforeAWaitReturnsThatNeedNotBlock) {
  VirtualScheduler scheduler(std::make_shared<ScriptedChooser>(std::vector<std::size_t>{1}));
  bool ran = false;
  scheduler.submit(scheduler.makeStrand(), [&] { ran = true; });
  scheduler.blockUntil([] { return true; }, "nothing");
  EXPECT_TRUE(ran);
}

}  // namespace
}  // namespace quazor
