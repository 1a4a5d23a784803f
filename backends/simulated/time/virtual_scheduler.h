// VirtualScheduler: virtual time on one thread.
#pragma once

#include "backends/simulated/time/schedule_strategy.h"
#include "platform/task.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// Everything that happens on a simulated phone is a task of one scheduler. Tasks are grouped in strands: the tasks of a
// strand run one at a time, in the order in which they became due; tasks of different strands are unordered.
//
// Tasks run only during blocking calls. When the main flow, which is the code outside of tasks, makes a blocking call,
// tasks run until its condition is met. A task may also block: it is suspended on its own stack, its strand waits for
// it, and everything else continues. Whenever several events are possible (the main flow continues, a blocked task
// continues, a strand runs its next task), the ScheduleStrategy picks one. Time stands still while anything can run and
// then advances to the next due time.
//
// All of this is one thread, so a lock that a task holds while it blocks does not exclude other tasks or, if it is not
// recursive, deadlocks the whole simulation.
//
// Thread: all calls on one thread.
class VirtualScheduler final {
 public:
  // Represents all due times beyond the range of the clock; it is never reached.
  static constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

  // A sequence of tasks that never overlap. Created by makeStrand(); it lives while it is referenced or has tasks.
  class Strand {
   private:
    friend class VirtualScheduler;
    std::deque<Task> due;  // ready to run, in order
    bool running = false;  // one of its tasks has started and not ended
  };

  // `chooser` must not be null.
  explicit VirtualScheduler(std::shared_ptr<ScheduleStrategy> chooser);
  VirtualScheduler(const VirtualScheduler&) = delete;
  VirtualScheduler& operator=(const VirtualScheduler&) = delete;
  // Calls discardPending().
  ~VirtualScheduler();

  // The virtual time since the scheduler was created.
  std::chrono::nanoseconds now() const { return now_; }
  // The time `delay` from now: now if it is not positive, kNever beyond the range of the clock.
  std::chrono::nanoseconds after(std::chrono::nanoseconds delay) const;

  std::shared_ptr<Strand> makeStrand();
  // The strand of the running task; null in the main flow.
  std::shared_ptr<Strand> currentStrand() const;
  // Appends a task to the strand.
  void submit(const std::shared_ptr<Strand>& strand, Task task);
  // Appends the task when it becomes due, after those that are ready then; at once if it is already due.
  void submitAt(std::chrono::nanoseconds due, const std::shared_ptr<Strand>& strand, Task task);
  // Destroys the tasks of the strand that are not yet due.
  void dropDelayed(const Strand& strand);
  // Destroys all pending tasks, and those that their destructors submit. Blocked tasks receive a SimulationStall from
  // their blocking call. Breaks reference cycles between the scheduler and objects that pending tasks hold. The
  // scheduler remains usable.
  void discardPending();

  // Blocks until `due`. `what` describes the wait in a SimulationStall, which is thrown if `due` would never be
  // reached. In the main flow, also rethrows the exceptions of tasks.
  void blockUntil(std::chrono::nanoseconds due, std::string_view what);
  // Blocks until `condition` returns true; it is called before every step and must have no side effects. Throws
  // SimulationStall if no event is left that could make it true. In the main flow, also rethrows the exceptions of
  // tasks.
  void blockUntil(const std::function<bool()>& condition, std::string_view what);
  // Blocks until `condition` returns true or `due` is reached; otherwise like the above.
  void blockUntil(const std::function<bool()>& condition, std::chrono::nanoseconds due, std::string_view what);

  // Throws a SimulationStall with `what`, for calls that must never return.
  [[noreturn]] void stall(std::string_view what) const;

 private:
  class Flow;
  struct Delayed {
    std::shared_ptr<Strand> strand;
    Task task;
  };
  using DueTime = std::pair<std::chrono::nanoseconds, std::uint64_t>;  // the number orders tasks with equal times

  // A blocking call in progress; `due` is when it ends without its condition.
  struct Wait {
    const std::function<bool()>& condition;
    std::chrono::nanoseconds due;
    std::string_view what;
  };

  void block(const Wait& wait);
  void runUntilReady(const Wait& wait);
  std::chrono::nanoseconds nextDue(std::chrono::nanoseconds due) const;
  std::size_t choose(std::size_t count);
  void beginTaskOf(std::size_t strand);
  void resume(std::unique_ptr<Flow> flow);
  void advanceTo(std::chrono::nanoseconds time);

  std::shared_ptr<ScheduleStrategy> chooser_;
  std::chrono::nanoseconds now_{0};
  std::uint64_t submitted_ = 0;
  std::map<DueTime, Delayed> delayed_;             // all later than now_
  std::vector<std::shared_ptr<Strand>> runnable_;  // with due tasks and no running one, the longest-waiting first
  Flow* current_ = nullptr;                        // the running task; null in the main flow
  std::vector<std::unique_ptr<Flow>> blocked_;     // tasks in a blocking call, the longest-waiting first
  std::vector<std::unique_ptr<Flow>> idle_;        // kept for reuse of their stacks
};

}  // namespace quazor
