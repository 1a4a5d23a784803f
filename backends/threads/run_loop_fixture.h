// The fixture shared by the conformance suites for run loops.
//
// A backend instantiates the suites with a type that has a default constructor and the members
//
//   RunLoop& loop();                                // the calling thread's
//   std::shared_ptr<Concurrency> concurrency();
//   std::shared_ptr<Clock> clock();
//
//   INSTANTIATE_TYPED_TEST_SUITE_P(Threads, RunLoopConformance, ThreadsUnderTest);
//
// The suites wait only through the loop and the services under test, so they also run on one thread in virtual time.
#pragma once

#include "platform/clock.h"
#include "platform/concurrency.h"
#include "platform/run_loop.h"

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <memory>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

inline std::string nameOfActivity(RunLoopActivities activity) {
  switch (activity) {
    case kRunLoopEntry: return "entry";
    case kRunLoopBeforeSources: return "before sources";
    case kRunLoopBeforeWaiting: return "before waiting";
    case kRunLoopAfterWaiting: return "after waiting";
    case kRunLoopExit: return "exit";
    default: return "several or unknown activities";
  }
}

template <class UnderTest>
class RunLoopFixture : public ::testing::Test {
 protected:
  using Source = std::shared_ptr<RunLoopSource>;
  using Observer = std::shared_ptr<RunLoopObserver>;

  static constexpr std::string_view kDefault = kRunLoopDefaultMode;
  static constexpr std::string_view kOther = "org.quazor.other";
  // Long enough that a run which does not end early is visible in its result.
  static constexpr std::chrono::seconds kLong{10};

  // Removes everything, because a thread may keep its loop for longer than one test.
  ~RunLoopFixture() override {
    for (const std::string_view mode : {kDefault, kOther}) {
      for (const std::weak_ptr<RunLoopSource>& source : sources_) {
        if (const Source there = source.lock()) loop_.removeSource(there, mode);
      }
      for (const std::weak_ptr<RunLoopObserver>& observer : observers_) {
        if (const Observer there = observer.lock()) loop_.removeObserver(there, mode);
      }
    }
  }

  // A source that is not added to the loop.
  Source makeSource(std::function<void()> handler) {
    Source source = loop_.makeSource(std::move(handler));
    sources_.push_back(source);
    return source;
  }
  Source addSource(std::function<void()> handler, std::string_view mode = kDefault) {
    Source source = makeSource(std::move(handler));
    loop_.addSource(source, mode);
    return source;
  }
  // Adds a source whose handler records the word.
  Source addWord(const std::string& word, std::string_view mode = kDefault) {
    return addSource([this, word] { words_.push_back(word); }, mode);
  }
  // Adds a source that is never signalled: a mode without sources does not wait.
  Source addIdleSource(std::string_view mode = kDefault) {
    return addSource([] { ADD_FAILURE() << "a source was handled without a signal"; }, mode);
  }

  Observer makeObserver(RunLoopActivities activities, std::function<void(RunLoopActivities)> handler,
                        bool repeats = true, std::int64_t order = 0) {
    Observer observer = loop_.makeObserver(activities, repeats, order, std::move(handler));
    observers_.push_back(observer);
    return observer;
  }
  Observer addObserver(RunLoopActivities activities, std::function<void(RunLoopActivities)> handler,
                       bool repeats = true, std::int64_t order = 0, std::string_view mode = kDefault) {
    Observer observer = makeObserver(activities, std::move(handler), repeats, order);
    loop_.addObserver(observer, mode);
    return observer;
  }
  // Adds an observer that records the name of each activity.
  Observer addWitness(RunLoopActivities activities = kRunLoopAllActivities, const std::string& prefix = "",
                      bool repeats = true, std::int64_t order = 0, std::string_view mode = kDefault) {
    return addObserver(
        activities, [this, prefix](RunLoopActivities activity) { words_.push_back(prefix + nameOfActivity(activity)); },
        repeats, order, mode);
  }

  RunLoopResult run(std::chrono::nanoseconds limit = kLong, bool returnAfterSourceHandled = false,
                    std::string_view mode = kDefault) {
    return loop_.runInMode(mode, limit, returnAfterSourceHandled);
  }
  // Handles the signalled sources without waiting.
  void runOnce(std::string_view mode = kDefault) { run(std::chrono::nanoseconds::zero(), false, mode); }

  // Runs the function soon, outside the loop's thread.
  void elsewhere(std::function<void()> function) {
    queue_->asyncAfter(std::chrono::milliseconds(1), [work = std::move(function)] { work(); });
  }

  // The words since the last time: "first, second".
  std::string takeWords() {
    std::string taken;
    for (const std::string& word : std::exchange(words_, {})) taken += (taken.empty() ? "" : ", ") + word;
    return taken;
  }
  // The words of one turn that does not wait, and those before it.
  std::string runOnceForWords(std::string_view mode = kDefault) {
    runOnce(mode);
    return takeWords();
  }

  UnderTest under_test_;
  RunLoop& loop_ = under_test_.loop();
  std::shared_ptr<Clock> clock_ = under_test_.clock();
  std::shared_ptr<SerialQueue> queue_ =
      under_test_.concurrency()->makeSerialQueue("org.quazor.elsewhere", QualityOfService::kDefault);
  std::vector<std::string> words_;

 private:
  std::vector<std::weak_ptr<RunLoopSource>> sources_;
  std::vector<std::weak_ptr<RunLoopObserver>> observers_;
};

// Captured in a handler, it reports the destruction of the handler.
inline std::shared_ptr<void> atDestruction(std::function<void()> function) {
  return std::shared_ptr<void>(nullptr, [call = std::move(function)](void*) { call(); });
}

}  // namespace quazor
