// DelayedTasks: the tasks of a queue whose delay has not yet passed.
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
  // A due time that never comes.
  static constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

  // Keeps a task until `due`. True when no other task is due before it. Tasks with one due time keep their order.
  bool add(std::chrono::nanoseconds due, Task task);

  // The earliest due time, or kNever. One load: what a thread added itself, or learnt of, it sees.
  std::chrono::nanoseconds nextDue() const {
    return std::chrono::nanoseconds(next_due_.load(std::memory_order_relaxed));
  }

  // Hands the tasks that are due at `now` to `post`, in the order of their due times. True when there was one. Calls do
  // not overlap: a thread that comes second waits until the first has posted what was due.
  template <class Post>
  bool postDue(std::chrono::nanoseconds now, Post&& post);

  // Lets no task become due any more.
  void close();

  // Destroys the tasks that are kept, one after another.
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
