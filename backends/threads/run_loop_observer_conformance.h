// Requirements on the notifications of observers by every run loop, as a typed test suite.
#pragma once

#include "backends/threads/run_loop_fixture.h"

#include <chrono>
#include <cstdint>
#include <limits>
#include <memory>
#include <vector>

namespace quazor {

template <class UnderTest>
class RunLoopObserverConformance : public RunLoopFixture<UnderTest> {};

TYPED_TEST_SUITE_P(RunLoopObserverConformance);

TYPED_TEST_P(RunLoopObserverConformance, ARunTellsAllItDoesFromEntryToExit) {
  const auto first = this->addWord("first");
  const auto second = this->addSource([this] {
    this->words_.push_back("second");
    this->loop_.stop();
  });
  first->signal();
  this->addObserver(kRunLoopBeforeWaiting, [&](RunLoopActivities) { this->elsewhere([second] { second->signal(); }); });
  this->addWitness();
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(this->takeWords(),
            "entry, before sources, first, before waiting, after waiting, before sources, second, exit");
}

TYPED_TEST_P(RunLoopObserverConformance, ARunThatHasMoreToHandleDoesNotTellThatItWaits) {
  int times = 0;
  typename TestFixture::Source source;
  source = this->addSource([&] {
    this->words_.push_back("handled");
    if (++times == 1) {
      source->signal();
    } else {
      this->loop_.stop();
    }
  });
  source->signal();
  this->addWitness();
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(this->takeWords(), "entry, before sources, handled, before sources, handled, exit");
}

TYPED_TEST_P(RunLoopObserverConformance, ARunThatTimesOutTellsThatItWasWoken) {
  this->addIdleSource();
  this->addWitness();
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
  EXPECT_EQ(this->takeWords(), "entry, before waiting, after waiting, exit");
}

TYPED_TEST_P(RunLoopObserverConformance, EntryAndExitAreToldAlsoWhenThereIsNothingToWaitFor) {
  this->addWitness();
  EXPECT_EQ(this->run(), RunLoopResult::kFinished);
  EXPECT_EQ(this->takeWords(), "entry, exit");
  EXPECT_EQ(this->run(std::chrono::nanoseconds::zero()), RunLoopResult::kTimedOut);
  EXPECT_EQ(this->takeWords(), "entry, exit");
}

TYPED_TEST_P(RunLoopObserverConformance, ExitIsToldWhateverEndsTheRun) {
  this->addWitness(kRunLoopExit);
  const auto source = this->addSource([] {});
  source->signal();
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "exit");
  EXPECT_EQ(this->run(std::chrono::nanoseconds(-1)), RunLoopResult::kTimedOut);
  EXPECT_EQ(this->takeWords(), "exit");
  this->elsewhere([this] { this->loop_.stop(); });
  EXPECT_EQ(this->run(), RunLoopResult::kStopped);
  EXPECT_EQ(this->takeWords(), "exit");
}

TYPED_TEST_P(RunLoopObserverConformance, AnObserverIsToldOfItsActivitiesOnly) {
  struct Row {
    RunLoopActivities activities;
    std::string expected;
  };
  const std::vector<Row> rows = {
      {kRunLoopEntry, "entry"},
      {kRunLoopBeforeSources, "before sources"},
      {kRunLoopBeforeWaiting, "before waiting"},
      {kRunLoopAfterWaiting, "after waiting"},
      {kRunLoopExit, "exit"},
      {kRunLoopEntry | kRunLoopExit, "entry, exit"},
      {kRunLoopAllActivities, "entry, before sources, before waiting, after waiting, exit"},
      {0, ""},
  };
  const auto source = this->addSource([] {});
  for (const Row& row : rows) {
    const auto witness = this->addWitness(row.activities);
    source->signal();
    EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
    EXPECT_EQ(this->takeWords(), row.expected) << row.activities;
    this->loop_.removeObserver(witness, TestFixture::kDefault);
  }
}

TYPED_TEST_P(RunLoopObserverConformance, TheLowestOrderIsToldFirstAndEqualOnesAsTheyWereAdded) {
  this->addWitness(kRunLoopExit, "highest ", true, std::numeric_limits<std::int64_t>::max());
  this->addWitness(kRunLoopExit, "zero ");
  this->addWitness(kRunLoopExit, "minus one ", true, -1);
  this->addWitness(kRunLoopExit, "zero again ");
  this->addWitness(kRunLoopExit, "lowest ", true, std::numeric_limits<std::int64_t>::min());
  EXPECT_EQ(this->runOnceForWords(), "lowest exit, minus one exit, zero exit, zero again exit, highest exit");
}

TYPED_TEST_P(RunLoopObserverConformance, ObserversTakePartOnlyInRunsInTheirModes) {
  const auto observer = this->addWitness(kRunLoopExit, "other ", true, 0, TestFixture::kOther);
  EXPECT_EQ(this->runOnceForWords(), "");
  EXPECT_EQ(this->runOnceForWords(TestFixture::kOther), "other exit");
  this->loop_.removeObserver(observer, TestFixture::kOther);
  EXPECT_EQ(this->runOnceForWords(TestFixture::kOther), "");
}

TYPED_TEST_P(RunLoopObserverConformance, AnObserverOfTheCommonModesIsToldInTheDefaultMode) {
  const auto observer = this->addWitness(kRunLoopExit, "", true, 0, kRunLoopCommonModes);
  this->loop_.addObserver(observer, TestFixture::kDefault);  // is there
  EXPECT_EQ(this->runOnceForWords(), "exit");
  this->runOnce(kRunLoopCommonModes);
  EXPECT_EQ(this->runOnceForWords(TestFixture::kOther), "");
  this->loop_.removeObserver(observer, kRunLoopCommonModes);
  this->loop_.removeObserver(observer, kRunLoopCommonModes);
  EXPECT_EQ(this->runOnceForWords(), "");
}

TYPED_TEST_P(RunLoopObserverConformance, OneThatDoesNotRepeatIsToldOnceInAllItsModes) {
  const auto observer = this->addWitness(kRunLoopExit, "once ", false);
  this->loop_.addObserver(observer, TestFixture::kOther);
  this->addWitness(kRunLoopExit);
  this->runOnce();
  this->runOnce();
  EXPECT_EQ(this->runOnceForWords(TestFixture::kOther), "once exit, exit, exit");
}

TYPED_TEST_P(RunLoopObserverConformance, OneThatDoesNotRepeatIsRemovedBeforeItIsTold) {
  typename TestFixture::Observer observer;
  int times = 0;
  observer = this->addObserver(
      kRunLoopEntry,
      [&](RunLoopActivities) {
        if (++times == 1) this->runOnce();  // no observer is notified of this entry
        if (times == 1) this->loop_.addObserver(observer, TestFixture::kDefault);
      },
      false);
  this->runOnce();
  EXPECT_EQ(times, 1);
  this->runOnce();
  EXPECT_EQ(times, 2);
  this->runOnce();
  EXPECT_EQ(times, 2);
}

TYPED_TEST_P(RunLoopObserverConformance, WhatAnObserverRemovesIsNotToldAnyMore) {
  typename TestFixture::Observer second;
  typename TestFixture::Observer first;
  first = this->addObserver(kRunLoopExit, [&](RunLoopActivities) {
    this->words_.push_back("first");
    this->loop_.removeObserver(first, TestFixture::kDefault);
    this->loop_.removeObserver(second, TestFixture::kDefault);
  });
  second = this->addWitness(kRunLoopExit, "second ");
  this->addWitness(kRunLoopExit, "third ");
  this->runOnce();
  EXPECT_EQ(this->runOnceForWords(), "first, third exit, third exit");
}

TYPED_TEST_P(RunLoopObserverConformance, WhatAnObserverAddsIsToldFromTheNextActivityOn) {
  this->addObserver(
      kRunLoopEntry,
      [&](RunLoopActivities) {
        this->addWitness(kRunLoopAllActivities, "behind ", true, 1);
        this->addWitness(kRunLoopAllActivities, "before ", true, -1);
      },
      false);
  EXPECT_EQ(this->runOnceForWords(), "before exit, behind exit");
}

TYPED_TEST_P(RunLoopObserverConformance, AnObserverThatRemovesItselfLivesUntilItHasReturned) {
  for (const bool repeats : {true, false}) {
    std::weak_ptr<RunLoopObserver> weak;
    weak = this->addObserver(
        kRunLoopEntry,
        [this, &weak, guard = atDestruction([this] { this->words_.push_back("gone"); })](RunLoopActivities) {
          this->loop_.removeObserver(weak.lock(), TestFixture::kDefault);
          this->words_.push_back("returns");
        },
        repeats);
    EXPECT_EQ(this->runOnceForWords(), "returns, gone") << repeats;
  }
}

TYPED_TEST_P(RunLoopObserverConformance, AnObserverMayStopTheRunThatItIsToldOf) {
  for (const RunLoopActivities activity :
       {kRunLoopEntry, kRunLoopBeforeSources, kRunLoopBeforeWaiting, kRunLoopAfterWaiting}) {
    const auto source = this->addWord("handled");
    if (activity == kRunLoopBeforeSources) source->signal();
    if (activity == kRunLoopAfterWaiting) this->elsewhere([source] { source->signal(); });
    const auto stopper = this->addObserver(activity, [this](RunLoopActivities) { this->loop_.stop(); });
    const auto witness = this->addWitness(kRunLoopExit);
    EXPECT_EQ(this->run(), RunLoopResult::kStopped) << nameOfActivity(activity);
    const bool was_signalled = activity == kRunLoopBeforeSources || activity == kRunLoopAfterWaiting;
    EXPECT_EQ(this->takeWords(), was_signalled ? "handled, exit" : "exit") << nameOfActivity(activity);
    this->loop_.removeObserver(stopper, TestFixture::kDefault);
    this->loop_.removeObserver(witness, TestFixture::kDefault);
    this->loop_.removeSource(source, TestFixture::kDefault);
  }
}

TYPED_TEST_P(RunLoopObserverConformance, AStopAtTheExitChangesNeitherThisRunNorTheNext) {
  this->addIdleSource();
  this->addObserver(kRunLoopExit, [this](RunLoopActivities) { this->loop_.stop(); });
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopObserverConformance, WhatAnObserverSignalsBeforeTheWaitIsHandled) {
  const auto source = this->addWord("handled");
  this->addObserver(kRunLoopBeforeWaiting, [source](RunLoopActivities) { source->signal(); });
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "handled");
}

TYPED_TEST_P(RunLoopObserverConformance, WhatAnObserverSignalsAtTheEntryIsHandledBeforeTheWait) {
  const auto source = this->addWord("handled");
  this->addWitness(kRunLoopAllActivities & ~kRunLoopEntry);
  this->addObserver(kRunLoopEntry, [source](RunLoopActivities) { source->signal(); });
  EXPECT_EQ(this->run(TestFixture::kLong, true), RunLoopResult::kHandledSource);
  EXPECT_EQ(this->takeWords(), "before sources, handled, exit");
}

TYPED_TEST_P(RunLoopObserverConformance, SourcesThatAnObserverRemovesBeforeTheyAreHandledAreNotHandled) {
  const auto source = this->addWord("handled");
  this->addIdleSource();
  source->signal();
  this->addObserver(kRunLoopBeforeSources,
                    [&](RunLoopActivities) { this->loop_.removeSource(source, TestFixture::kDefault); });
  EXPECT_EQ(this->run(std::chrono::milliseconds(1), true), RunLoopResult::kTimedOut);
  EXPECT_EQ(this->takeWords(), "");
}

TYPED_TEST_P(RunLoopObserverConformance, ASourceThatIsAddedAtTheEntryKeepsTheRunFromBeingFinished) {
  this->addObserver(kRunLoopEntry, [this](RunLoopActivities) { this->addIdleSource(); });
  EXPECT_EQ(this->run(std::chrono::milliseconds(1)), RunLoopResult::kTimedOut);
}

TYPED_TEST_P(RunLoopObserverConformance, ALastSourceThatIsRemovedBeforeTheWaitEndsTheRun) {
  const auto source = this->addIdleSource();
  this->addObserver(kRunLoopBeforeWaiting,
                    [&](RunLoopActivities) { this->loop_.removeSource(source, TestFixture::kDefault); });
  EXPECT_EQ(this->run(std::chrono::nanoseconds::max()), RunLoopResult::kFinished);
}

TYPED_TEST_P(RunLoopObserverConformance, RunsWithinRunsTellTheObserversOfTheirOwnModes) {
  this->addWitness(kRunLoopEntry | kRunLoopExit, "outer ");
  this->addWitness(kRunLoopEntry | kRunLoopExit, "inner ", true, 0, TestFixture::kOther);
  const auto source = this->addSource([this] { this->runOnce(TestFixture::kOther); });
  source->signal();
  EXPECT_EQ(this->runOnceForWords(), "outer entry, inner entry, inner exit, outer exit");
}

REGISTER_TYPED_TEST_SUITE_P(RunLoopObserverConformance, ARunTellsAllItDoesFromEntryToExit,
                            ARunThatHasMoreToHandleDoesNotTellThatItWaits, ARunThatTimesOutTellsThatItWasWoken,
                            EntryAndExitAreToldAlsoWhenThereIsNothingToWaitFor, ExitIsToldWhateverEndsTheRun,
                            AnObserverIsToldOfItsActivitiesOnly, TheLowestOrderIsToldFirstAndEqualOnesAsTheyWereAdded,
                            ObserversTakePartOnlyInRunsInTheirModes, AnObserverOfTheCommonModesIsToldInTheDefaultMode,
                            OneThatDoesNotRepeatIsToldOnceInAllItsModes, OneThatDoesNotRepeatIsRemovedBeforeItIsTold,
                            WhatAnObserverRemovesIsNotToldAnyMore, WhatAnObserverAddsIsToldFromTheNextActivityOn,
                            AnObserverThatRemovesItselfLivesUntilItHasReturned, AnObserverMayStopTheRunThatItIsToldOf,
                            AStopAtTheExitChangesNeitherThisRunNorTheNext, WhatAnObserverSignalsBeforeTheWaitIsHandled,
                            WhatAnObserverSignalsAtTheEntryIsHandledBeforeTheWait,
                            SourcesThatAnObserverRemovesBeforeTheyAreHandledAreNotHandled,
                            ASourceThatIsAddedAtTheEntryKeepsTheRunFromBeingFinished,
                            ALastSourceThatIsRemovedBeforeTheWaitEndsTheRun,
                            RunsWithinRunsTellTheObserversOfTheirOwnModes);

}  // namespace quazor
