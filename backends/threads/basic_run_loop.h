// BasicRunLoop: run loops independent of the kind of time: modes, sources, observers and nested runs.
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

// Blocks and wakes the thread of a loop.
// Thread: the loop's, unless a function says otherwise.
class RunLoopWaiter {
 public:
  // A time that is never reached.
  static constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

  RunLoopWaiter() = default;
  RunLoopWaiter(const RunLoopWaiter&) = delete;
  RunLoopWaiter& operator=(const RunLoopWaiter&) = delete;
  virtual ~RunLoopWaiter() = default;

  // A monotonic, non-negative time.
  // Thread: the loop's.
  virtual std::chrono::nanoseconds now() = 0;
  // Signals the sources of external events that do not notify this process. Called at the beginning of every round of a
  // run; must not block.
  // Thread: the loop's.
  virtual void look() {}
  // Blocks until `ready` returns true or now() reaches `deadline`.
  // Thread: the loop's.
  virtual void wait(std::chrono::nanoseconds deadline, const std::function<bool()>& ready) = 0;
  // Called after another thread may have made `ready` true: a wait in progress checks it again.
  // Thread: any.
  virtual void wake() = 0;
};

// Each round of a run handles the signalled sources. If the run does not end then and nothing was signalled in the
// meantime, the thread waits. Every run has at least one round.
//
// Thread: as in RunLoop. A call of signal() or stop() that ends a thread, and with it the loop, may outlast the loop.
class BasicRunLoop final : public RunLoop {
 public:
  // `waiter` must not be null.
  explicit BasicRunLoop(std::shared_ptr<RunLoopWaiter> waiter);
  // Destroys sources and observers. The destructor of a handler may still call the loop.
  ~BasicRunLoop() override;

  std::shared_ptr<RunLoopSource> makeSource(std::function<void()> handler) override;
  void addSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override;
  void removeSource(const std::shared_ptr<RunLoopSource>& source, std::string_view mode) override;
  std::shared_ptr<RunLoopObserver> makeObserver(RunLoopActivities activities, bool repeats, std::int64_t order,
                                                std::function<void(RunLoopActivities activity)> handler) override;
  void addObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override;
  void removeObserver(const std::shared_ptr<RunLoopObserver>& observer, std::string_view mode) override;
  // Passes on exceptions of the waiter; the loop can be run again afterwards.
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
  std::atomic<bool> stopped_{false};                // applies to the innermost run; meaningless without a run
  std::map<std::string, Mode, std::less<>> modes_;  // modes are not removed before the loop is destroyed
  std::uint64_t additions_ = 0;
};

}  // namespace quazor
