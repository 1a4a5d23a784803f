// DelayedTasks: the tasks of a queue that are not yet due.
#pragma once

#include "platform/task.h"

#include <atomic>
#include <chrono>
#include <map>
#include <mutex>
#include <utility>

namespace quazor {

// Times are readings of the steady clock.
// Thread: any.
class DelayedTasks {
 public:
  // A due time that is never reached.
  static constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

  // Adds a task. Returns true if it is now the first to become due. Tasks with the same due time keep their order.
  bool add(std::chrono::nanoseconds due, Task task);

  // The earliest due time, or kNever. A single atomic load: a thread sees tasks that it added or was informed of.
  std::chrono::nanoseconds nextDue() const {
    return std::chrono::nanoseconds(next_due_.load(std::memory_order_relaxed));
  }

  // Passes the tasks that are due at `now` to `post`, in the order of their due times. Returns true if there was one.
  // Calls are serialized: a second caller waits until the first has posted the due tasks.
  template <class Post>
  bool postDue(std::chrono::nanoseconds now, Post&& post);

  // No task becomes due after this.
  void close();

  // Destroys the remaining tasks one by one.
  void clear();

 private:
  void updateNextDue();

  std::atomic<std::chrono::nanoseconds::rep> next_due_{kNever.count()};
  std::mutex mutex_;
  bool closed_ = false;                                  // guarded by mutex_
  std::multimap<std::chrono::nanoseconds, Task> tasks_;  // guarded by mutex_
};

template <class Post>
bool DelayedTasks::postDue(std::chrono::nanoseconds now, Post&& post) {
  const std::lock_guard lock(mutex_);
  if (now < nextDue() || nextDue() == kNever) return false;
  while (!tasks_.empty() && tasks_.begin()->first <= now) {
    post(std::move(tasks_.begin()->second));
    tasks_.erase(tasks_.begin());
  }
  updateNextDue();
  return true;
}

}  // namespace quazor
