// Requirements on the sources, limits and stops of every run loop, as a typed test suite.
#pragma once

#include "backends/threads/run_loop_fixture.h"

#include <algorithm>
#include <chrono>
#include <memory>

namespace quazor {

template <class UnderTest>
class RunLoopConformance : public RunLoopFixture<UnderTest> {};

TYPED_TEST_SUITE_P(RunLoopConformance);

TYPED_TEST_P(RunLoopConformance, AThreadHasTheSameLoopAtEveryCall) {
  EXPECT_EQ(&this->under_test_.loop(), &this->under_test_.loop());
}

TYPED_TEST_P(RunLoopConformance, OfTheReasonsToEndTheFirstOfTheListIsTheResult) {
  // Every set of reasons except the empty one, with which the run would not end.
  for (unsigned reasons = 1; reasons < 16; ++reasons) {
    const bool handled = (reasons & 1) != 0;
    const bool timed_out = (reasons & 2) != 0;
    const bool stopped = (reasons & 4) != 0;
    const bool finished = (reasons & 8) != 0;
    typename TestFixture::Source source;
    source = this->addSource([&] {
      if (stopped) this->loop_.stop();
      if (finished) this->loop_.removeSource(source, kRunLoopDefaultMode);
    });
    source->signal();
    const RunLoopResult expected = handled     ? RunLoopResult::kHandledSource
                                   : timed_out ? RunLoopResult::kTimedOut
                                   : stopped   ? RunLoopResult::kStopped
                                               : RunLoopResult::kFinished;
    EXPECT_EQ(this->run(timed_out ? std::chrono::seconds(0) : TestFixture::kLong, handled), expected) << reasons;
    this->loop_.removeSource(source, kRunLoopDefaultMode);
  }
}

TYPED_TEST_P(RunLoopConformance, SignalledSourcesAreHandledOnceEvenWhenTheLimitIsZeroOrLess) {
  const auto source = this->addSource([this] { this->words_.push_back("handled"); });
  for (const auto limit :
       {std::chrono::nanoseconds::zero(), std::chrono::nanoseconds(-1), std::chrono::nanoseconds::min()}) {
    source->signal();
    EXPECT_EQ(this->run(limit), RunLoopResult::kTimedOut) << limit.count();
    EXPECT_EQ(this->takeWords(), "handled") << limit.count();
    source->signal();
    EXPECT_EQ(this->run(limit, true), RunLoopResult::kHandledSource) << limit.count();
    EXPECT_EQ(this->takeWords(), "handled") << limit.count();
    EXPECT_EQ(this->run(limit, true), RunLoopResult::kTimedOut) << limit.count();
  }
  EXPECT_EQ(this->takeWords(), "");
}

TYPED_TEST_P(RunLoopConformance, ASourceThatSignalsItselfDoesNotOutlastTheLimit) {
  typename TestFixture::Source source;
  source = this->addSource([&] {
    this->words_.push_back("handled");
    source->signal();
  });
  source->signal();
  EXPECT_EQ(this->run(std::chrono::nanoseconds::zero()), RunLoopResult::kTimedOut);
  EXPECT_EQ(this->takeWords(), "handled");
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "handled");
}

TYPED_TEST_P(RunLoopConformance, ALimitPassesBeforeTheRunTimesOut) {
  this->addIdleSource();
  const auto before = this->clock_->now();
  EXPECT_EQ(this->run(std::chrono::milliseconds(2)), RunLoopResult::kTimedOut);
  EXPECT_GE(this->clock_->now() - before, std::chrono::milliseconds(2));
  EXPECT_LT(this->clock_->now() - before, TestFixture::kLong);
}

TYPED_TEST_P(RunLoopConformance, AHandlerUsesUpTheLimitToo) {
  const auto source = this->addSource([this] { this->clock_->sleep(std::chrono::milliseconds(2)); });
  source->signal();
  this->addObserver(kRunLoopBeforeWaiting, [](RunLoopActivities) { ADD_FAILURE() << "nothing is left to wait for"; });
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopConformance, LimitsBeyondTheClocksRangeNeverCome) {
  const auto source = this->addWord("handled");
  for (const auto limit : {std::chrono::nanoseconds::max(), std::chrono::nanoseconds::max() - this->clock_->now(),
                           std::chrono::nanoseconds::max() - std::chrono::nanoseconds(1)}) {
    this->elsewhere([source] { source->signal(); });
    EXPECT_EQ(this->run(limit, true), RunLoopResult::kHandledSource) << limit.count();
  }
  EXPECT_EQ(this->takeWords(), "handled, handled, handled");
}

TYPED_TEST_P(RunLoopConformance, ARunThatIsNotToReturnAfterASourceGoesOnUntilSomethingElseEndsIt) {
  const auto first = this->addWord("first");
  const auto second = this->addSource([this] {
    this->words_.push_back("second");
    this->elsewhere([this] { this->loop_.stop(); });
  });
  first->signal();
  this->elsewhere([second] { second->signal(); });
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(this->takeWords(), "first, second");
}

TYPED_TEST_P(RunLoopConformance, SignalsBeforeASourceIsHandledAreOne) {
  const auto source = this->addWord("handled");
  for (int i = 0; i < 3; ++i) source->signal();
  this->runOnce();
  EXPECT_EQ(this->runOnceForWords(), "handled");
}

TYPED_TEST_P(RunLoopConformance, ASignalInTheSourcesOwnHandlerIsHandledOnceMore) {
  int times = 0;
  typename TestFixture::Source source;
  source = this->addSource([&] {
    if (++times == 1) source->signal();
    if (times == 2) this->loop_.stop();
  });
  source->signal();
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(times, 2);
}

TYPED_TEST_P(RunLoopConformance, ASignalWakesARunThatSleeps) {
  const auto source = this->addWord("handled");
  this->addObserver(kRunLoopBeforeWaiting, [&](RunLoopActivities) { this->elsewhere([source] { source->signal(); }); });
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "handled");
}

TYPED_TEST_P(RunLoopConformance, ASignalIsKeptWhileItsSourceIsNotAdded) {
  const auto source = this->makeSource([this] { this->words_.push_back("handled"); });
  source->signal();
  this->loop_.addSource(source, TestFixture::kDefault);
  EXPECT_EQ(this->runOnceForWords(), "handled");
  this->loop_.removeSource(source, TestFixture::kDefault);
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "");
  this->loop_.addSource(source, TestFixture::kDefault);
  EXPECT_EQ(this->runOnceForWords(), "handled");
}

TYPED_TEST_P(RunLoopConformance, SourcesTakePartOnlyInRunsInTheirModes) {
  const auto source = this->addWord("handled", TestFixture::kOther);
  this->addIdleSource();
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "");
  EXPECT_EQ(this->runOnceForWords(TestFixture::kOther), "handled");
}

TYPED_TEST_P(RunLoopConformance, ASourceOfTwoModesIsHandledInOneOfThem) {
  const auto source = this->addWord("handled");
  this->loop_.addSource(source, TestFixture::kOther);
  source->signal();
  this->runOnce(TestFixture::kOther);
  EXPECT_EQ(this->runOnceForWords(), "handled");
  this->loop_.removeSource(source, TestFixture::kDefault);
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "");
  EXPECT_EQ(this->runOnceForWords(TestFixture::kOther), "handled");
}

TYPED_TEST_P(RunLoopConformance, SourcesAreHandledInTheOrderOfTheirAddition) {
  const auto first = this->addWord("first");
  const auto second = this->addWord("second");
  const auto third = this->addWord("third");
  for (const auto& source : {third, first, second}) source->signal();
  EXPECT_EQ(this->runOnceForWords(), "first, second, third");
  this->loop_.addSource(first, TestFixture::kDefault);  // is there: no effect
  this->loop_.removeSource(second, TestFixture::kDefault);
  this->loop_.addSource(second, TestFixture::kDefault);
  for (const auto& source : {third, first, second}) source->signal();
  EXPECT_EQ(this->runOnceForWords(), "first, third, second");
}

TYPED_TEST_P(RunLoopConformance, AddingTwiceIsAddingOnceAndRemovingWhatIsNotThereHasNoEffect) {
  const auto source = this->addWord("handled");
  this->loop_.addSource(source, TestFixture::kDefault);
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "handled");
  this->loop_.removeSource(source, TestFixture::kOther);
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "handled");
  this->loop_.removeSource(source, TestFixture::kDefault);
  this->loop_.removeSource(source, TestFixture::kDefault);
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
}

TYPED_TEST_P(RunLoopConformance, AllSourcesOfARoundAreHandledBeforeTheRunEnds) {
  for (const bool stops : {true, false}) {
    const auto first = this->addSource([this, stops] {
      this->words_.push_back("first");
      if (stops) this->loop_.stop();
    });
    const auto second = this->addWord("second");
    first->signal();
    second->signal();
    EXPECT_EQ(this->run(TestFixture::kLong, !stops), stops ? RunLoopResult::kStopped : RunLoopResult::kHandledSource);
    EXPECT_EQ(this->takeWords(), "first, second");
    for (const auto& source : {first, second}) this->loop_.removeSource(source, TestFixture::kDefault);
  }
}

TYPED_TEST_P(RunLoopConformance, TheCommonModesAreTheDefaultModeAndNoRunIsInThem) {
  const auto source = this->addWord("handled", kRunLoopCommonModes);
  source->signal();
  EXPECT_EQ(this->run(TestFixture::kLong, true, TestFixture::kOther), RunLoopResult::kFinished);
  EXPECT_EQ(this->run(TestFixture::kLong, true, kRunLoopCommonModes), RunLoopResult::kFinished);
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "handled");
  this->loop_.addSource(source, TestFixture::kDefault);  // is there
  this->loop_.removeSource(source, kRunLoopCommonModes);
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
}

TYPED_TEST_P(RunLoopConformance, WithoutSourcesARunIsFinished) {
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
  EXPECT_EQ(this->run(std::chrono::nanoseconds::max(), true), RunLoopResult::kFinished);
  EXPECT_EQ(this->run(std::chrono::nanoseconds::zero()), RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopConformance, ARunIsFinishedWhenItsLastSourceIsRemoved) {
  const auto idle = this->addIdleSource();
  typename TestFixture::Source last;
  last = this->addSource([&] { this->loop_.removeSource(last, TestFixture::kDefault); });
  last->signal();
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);  // only the idle source is left
  this->loop_.addSource(last, TestFixture::kDefault);
  this->loop_.removeSource(idle, TestFixture::kDefault);
  last->signal();
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
}

TYPED_TEST_P(RunLoopConformance, WhatAHandlerRemovesIsNotCalledAndKeepsItsSignal) {
  typename TestFixture::Source second;
  const auto first = this->addSource([&] {
    this->words_.push_back("first");
    this->loop_.removeSource(second, TestFixture::kDefault);
  });
  second = this->addWord("second");
  const auto third = this->addWord("third");
  for (const auto& source : {first, second, third}) source->signal();
  EXPECT_EQ(this->runOnceForWords(), "first, third");
  this->loop_.addSource(second, TestFixture::kDefault);
  EXPECT_EQ(this->runOnceForWords(), "second");
}

TYPED_TEST_P(RunLoopConformance, WhatAHandlerAddsIsHandledAfterTheRound) {
  const auto added = this->makeSource([this] { this->words_.push_back("added"); });
  const auto first = this->addSource([&] {
    this->words_.push_back("adding");
    added->signal();
    this->loop_.addSource(added, TestFixture::kDefault);
    this->words_.push_back("has added");
  });
  first->signal();
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "adding, has added");
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "added");
}

TYPED_TEST_P(RunLoopConformance, AHandlerThatAddsItsSourceAgainIsNotCalledTwiceInARound) {
  typename TestFixture::Source source;
  source = this->addSource([&] {
    this->words_.push_back("handled");
    this->loop_.removeSource(source, TestFixture::kDefault);
    this->loop_.addSource(source, TestFixture::kDefault);
    source->signal();
  });
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "handled");
}

TYPED_TEST_P(RunLoopConformance, TheLoopHoldsASourceWhileItIsAdded) {
  auto source = this->addSource([guard = atDestruction([this] { this->words_.push_back("gone"); })] {});
  this->loop_.addSource(source, TestFixture::kOther);
  std::weak_ptr<RunLoopSource> weak = source;
  source.reset();
  this->loop_.removeSource(weak.lock(), TestFixture::kDefault);
  EXPECT_EQ(this->takeWords(), "");
  this->loop_.removeSource(weak.lock(), TestFixture::kOther);
  EXPECT_EQ(this->takeWords(), "gone");
}

TYPED_TEST_P(RunLoopConformance, AHandlerThatRemovesItselfLivesUntilItHasReturned) {
  std::weak_ptr<RunLoopSource> weak;
  {
    const auto source =
        this->addSource([this, &weak, guard = atDestruction([this] { this->words_.push_back("gone"); })] {
          this->loop_.removeSource(weak.lock(), TestFixture::kDefault);
          this->words_.push_back("returns");
        });
    weak = source;
    source->signal();
  }
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
  EXPECT_EQ(this->takeWords(), "returns, gone");
}

TYPED_TEST_P(RunLoopConformance, TheDestructionOfAHandlerMayRemoveAnotherSource) {
  const auto other = this->addWord("other");
  auto source = this->addSource(
      [guard = atDestruction([this, other] { this->loop_.removeSource(other, TestFixture::kDefault); })] {});
  std::weak_ptr<RunLoopSource> weak = source;
  source.reset();
  other->signal();
  this->loop_.removeSource(weak.lock(), TestFixture::kDefault);
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
  EXPECT_EQ(this->takeWords(), "");
}

TYPED_TEST_P(RunLoopConformance, AStopWithoutARunHasNoEffect) {
  const auto source = this->addWord("handled");
  this->loop_.stop();
  this->elsewhere([source] { source->signal(); });
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  this->loop_.stop();
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopConformance, AStopFromElsewhereEndsARunThatSleeps) {
  this->addIdleSource();
  this->elsewhere([this] { this->loop_.stop(); });
  EXPECT_EQ(this->run(std::chrono::nanoseconds::max()), RunLoopResult::kStopped);
}

TYPED_TEST_P(RunLoopConformance, SeveralStopsEndOneRun) {
  const auto source = this->addSource([this] {
    this->loop_.stop();
    this->loop_.stop();
  });
  source->signal();
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopConformance, AStopEndsTheInnermostRunOnly) {
  RunLoopResult inner{};
  this->addIdleSource(TestFixture::kOther);
  this->addIdleSource();
  const auto source = this->addSource([&] {
    this->elsewhere([this] { this->loop_.stop(); });
    inner = this->run(TestFixture::kLong, false, TestFixture::kOther);
  });
  source->signal();
  EXPECT_EQ(this->run(std::chrono::milliseconds(5)), RunLoopResult::kTimedOut);
  EXPECT_EQ(inner, RunLoopResult::kStopped);
}

TYPED_TEST_P(RunLoopConformance, AStopBeforeARunWithinTheRunIsMeantForTheOuterOne) {
  RunLoopResult inner{};
  this->addIdleSource(TestFixture::kOther);
  const auto source = this->addSource([&] {
    this->loop_.stop();
    inner = this->run(std::chrono::milliseconds(1), false, TestFixture::kOther);
  });
  source->signal();
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(inner, RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopConformance, ARunWithinARunHandlesWhatIsSignalledInItsModeOnce) {
  const auto other = this->addWord("other mode", TestFixture::kOther);
  typename TestFixture::Source inner;
  const auto outer = this->addSource([&] {
    this->words_.push_back("outer begins");
    this->runOnce(TestFixture::kOther);
    this->runOnce();
    this->words_.push_back("outer ends");
  });
  inner = this->addWord("same mode");
  for (const auto& source : {outer, inner, other}) source->signal();
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "outer begins, other mode, same mode, outer ends");
  EXPECT_EQ(this->runOnceForWords(), "");
}

TYPED_TEST_P(RunLoopConformance, AHandlerIsCalledAgainInARunThatItBegan) {
  int depth = 0;
  int deepest = 0;
  typename TestFixture::Source source;
  source = this->addSource([&] {
    deepest = std::max(deepest, ++depth);
    if (depth < 3) {
      source->signal();
      this->runOnce();
    }
    --depth;
  });
  source->signal();
  this->runOnce();
  EXPECT_EQ(deepest, 3);
}

REGISTER_TYPED_TEST_SUITE_P(
    RunLoopConformance, AThreadHasTheSameLoopAtEveryCall, OfTheReasonsToEndTheFirstOfTheListIsTheResult,
    SignalledSourcesAreHandledOnceEvenWhenTheLimitIsZeroOrLess, ASourceThatSignalsItselfDoesNotOutlastTheLimit,
    ALimitPassesBeforeTheRunTimesOut, AHandlerUsesUpTheLimitToo, LimitsBeyondTheClocksRangeNeverCome,
    ARunThatIsNotToReturnAfterASourceGoesOnUntilSomethingElseEndsIt, SignalsBeforeASourceIsHandledAreOne,
    ASignalInTheSourcesOwnHandlerIsHandledOnceMore, ASignalWakesARunThatSleeps, ASignalIsKeptWhileItsSourceIsNotAdded,
    SourcesTakePartOnlyInRunsInTheirModes, ASourceOfTwoModesIsHandledInOneOfThem,
    SourcesAreHandledInTheOrderOfTheirAddition, AddingTwiceIsAddingOnceAndRemovingWhatIsNotThereHasNoEffect,
    AllSourcesOfARoundAreHandledBeforeTheRunEnds, TheCommonModesAreTheDefaultModeAndNoRunIsInThem,
    WithoutSourcesARunIsFinished, ARunIsFinishedWhenItsLastSourceIsRemoved,
    WhatAHandlerRemovesIsNotCalledAndKeepsItsSignal, WhatAHandlerAddsIsHandledAfterTheRound,
    AHandlerThatAddsItsSourceAgainIsNotCalledTwiceInARound, TheLoopHoldsASourceWhileItIsAdded,
    AHandlerThatRemovesItselfLivesUntilItHasReturned, TheDestructionOfAHandlerMayRemoveAnotherSource,
    AStopWithoutARunHasNoEffect, AStopFromElsewhereEndsARunThatSleeps, SeveralStopsEndOneRun,
    AStopEndsTheInnermostRunOnly, AStopBeforeARunWithinTheRunIsMeantForTheOuterOne,
    ARunWithinARunHandlesWhatIsSignalledInItsModeOnce, AHandlerIsCalledAgainInARunThatItBegan);

}  // namespace quazor
