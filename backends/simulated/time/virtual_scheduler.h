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

// Everything that happens on a simulated phone is a task of one scheduler. Tasks stand in lanes: the tasks of one lane
// run one at a time, in the order in which they became due; between lanes there is no order.
//
// Nothing runs by itself. When the main flow, which is whoever is not in a task, makes a blocking call, tasks run until
// what it waits for has come. A task may block as well: it is put aside, on its own stack, its lane waits for it, and
// everything else goes on. Whenever more than one thing can happen (the main flow goes on, a task that blocked goes
// on, a lane runs its next task), the Chooser picks. Time stands still while there is anything to do and then jumps
// to the next due time.
//
// All this is one thread, so a lock that a task holds while it blocks does not keep other tasks out or, where it is not
// recursive, blocks the whole simulation.
//
// Thread: all calls on one thread.
class VirtualScheduler final {
 public:
  // Due times that do not fit the clock become this one; it never comes.
  static constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

  // A sequence of tasks that never overlap. Made by makeStrand; it lives as long as it is held or has tasks.
  class Strand {
   private:
    friend class VirtualScheduler;
    std::deque<Task> due;  // waiting to run, in order
    bool running = false;  // one of its tasks has begun and not ended
  };

  // `chooser` must not be null.
  explicit VirtualScheduler(std::shared_ptr<ScheduleStrategy> chooser);
  VirtualScheduler(const VirtualScheduler&) = delete;
  VirtualScheduler& operator=(const VirtualScheduler&) = delete;
  // As discardPending().
  ~VirtualScheduler();

  // Virtual time since the scheduler was made.
  std::chrono::nanoseconds now() const { return now_; }
  // The moment `delay` from now: now for zero and less, kNever beyond the clock's range.
  std::chrono::nanoseconds after(std::chrono::nanoseconds delay) const;

  std::shared_ptr<Strand> makeStrand();
  // The lane of the task that is executing; null when it is the main flow.
  std::shared_ptr<Strand> currentStrand() const;
  // Adds a task at the end of the lane.
  void submit(const std::shared_ptr<Strand>& strand, Task task);
  // Adds the task when its time has come, behind those that are waiting then; at once when it has come already.
  void submitAt(std::chrono::nanoseconds due, const std::shared_ptr<Strand>& strand, Task task);
  // Destroys the lane's tasks whose time has not come.
  void dropDelayed(const Strand& strand);
  // Destroys all pending tasks, and those that their destruction submits; a task that has begun and blocks gets a
  // SimulationStall out of its blocking call. Breaks the circle of a pending task that holds an object that holds the
  // scheduler. The scheduler goes on working.
  void discardPending();

  // Blocks until `due` has come. `what` names the wait in a stall.
  // Throws SimulationStall when it would never come. On the main flow, also throws whatever a task throws.
  void blockUntil(std::chrono::nanoseconds due, std::string_view what);
  // Blocks until `condition` holds; it is asked before every step and must have no effect.
  // Throws SimulationStall when nothing is left that could make it hold. On the main flow, also throws whatever a task
  // throws.
  void blockUntil(const std::function<bool()>& condition, std::string_view what);
  // Blocks until `condition` holds or `due` has come; as above otherwise.
  void blockUntil(const std::function<bool()>& condition, std::chrono::nanoseconds due, std::string_view what);

  // Throws a SimulationStall about `what`, for calls that are never to return.
  [[noreturn]] void stall(std::string_view what) const;

 private:
  class Flow;
  struct Delayed {
    std::shared_ptr<Strand> strand;
    Task task;
  };
  using DueTime = std::pair<std::chrono::nanoseconds, std::uint64_t>;  // equal times keep the order of submission

  // A blocking call that has not returned; `due` is when the condition comes to hold by itself.
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
  std::map<DueTime, Delayed> delayed_;             // all after now_
  std::vector<std::shared_ptr<Strand>> runnable_;  // lanes with due tasks of which none is running, longest there first
  Flow* current_ = nullptr;                        // the task that is executing; null while the main flow is
  std::vector<std::unique_ptr<Flow>> blocked_;     // tasks in a blocking call, longest there first
  std::vector<std::unique_ptr<Flow>> idle_;        // kept for their stacks
};

}  // namespace quazor
