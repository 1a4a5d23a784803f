// BasicRunLoop: what run loops do in whatever time they live: modes, sources, observers, runs within runs.
#pragma once

#include "backends/threads/ordered_members.h"
#include "platform/run_loop.h"

#include <atomic>
#include <chrono>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// How the thread of a loop waits, and how it is woken.
// Thread: the loop's, unless a function says otherwise.
class RunLoopWaiter {
 public:
  // A moment that never comes.
  static constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

  RunLoopWaiter() = default;
  RunLoopWaiter(const RunLoopWaiter&) = delete;
  RunLoopWaiter& operator=(const RunLoopWaiter&) = delete;
  virtual ~RunLoopWaiter() = default;

  // Time since some moment: not negative, and it never goes back.
  // Thread: the loop's.
  virtual std::chrono::nanoseconds now() = 0;
  // Signals the sources of what has happened elsewhere, where nobody calls this process for it. Called at the beginning
  // of every round of a run; it must not wait.
  // Thread: the loop's.
  virtual void look() {}
  // Sleeps until `ready` holds or now() has reached `deadline`.
  // Thread: the loop's.
  virtual void wait(std::chrono::nanoseconds deadline, const std::function<bool()>& ready) = 0;
  // What another thread changed may have made `ready` hold: a wait that is going on asks it again.
  // Thread: any.
  virtual void wake() = 0;
};

// A run goes round: the sources that are signalled are handled; when the run is not to end then and nothing has been
// signalled meanwhile, the thread waits. Every run goes round at least once.
//
// Thread: as RunLoop says. A signal or a stop that ends a thread, and so its loop, may outlast it.
class BasicRunLoop final : public RunLoop {
 public:
  // `waiter` must not be null.
  explicit BasicRunLoop(std::shared_ptr<RunLoopWaiter> waiter);
  // Lets go what is added; a handler that is destroyed may call the loop still.
  ~BasicRunLoop() override;

  std::shared_ptr<RunLoopSource> makeSource(std::function<void()> handler) override;
  void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override;
  void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override;
  std::shared_ptr<RunLoopObserver> makeObserver(RunLoopActivities activities, bool repeats, std::int64_t order,
                                                std::function<void(RunLoopActivities activity)> handler) override;
  void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override;
  void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override;
  // Lets through what a waiter throws; the loop can be run again afterwards.
  RunLoopResult runInMode(std::string_view mode, std::chrono::nanoseconds limit,
                          bool returnAfterSourceHandled) override;
  void stop() override;

 private:
  class Source;
  class Observer;
  class Nesting;
  struct Mode {
    OrderedMembers<Source> sources;
    OrderedMembers<Observer> observers;
  };

  Mode& modeNamed(std::string_view name);
  Mode& modeToChange(std::string_view name);
  void tell(Mode& mode, RunLoopActivities activity);
  bool handleSources(Mode& mode);
  std::chrono::nanoseconds deadlineAfter(std::chrono::nanoseconds limit);
  std::optional<RunLoopResult> reasonToEnd(const Mode& mode, std::chrono::nanoseconds deadline, bool handledEnough);
  bool hasWork(const Mode& mode) const;
  void waitFor(Mode& mode, std::chrono::nanoseconds deadline);

  const std::shared_ptr<RunLoopWaiter> waiter_;
  std::atomic<bool> stopped_{false};                // the innermost run; without a run it says nothing
  std::map<std::string, Mode, std::less<>> modes_;  // a mode stays where it is as long as the loop
  std::uint64_t additions_ = 0;
};

}  // namespace quazor
