#include "backends/threads/delayed_tasks.h"

namespace quazor {

bool DelayedTasks::add(std::chrono::nanoseconds due, Task task) {
  const std::lock_guard lock(mutex_);
  const auto added = tasks_.emplace(due, std::move(task));
  updateNextDue();
  return added == tasks_.begin();
}

void DelayedTasks::close() {
  const std::lock_guard lock(mutex_);
  closed_ = true;
  updateNextDue();
}

void DelayedTasks::clear() {
  std::multimap<std::chrono::nanoseconds, Task> tasks;
  {
    const std::lock_guard lock(mutex_);
    tasks.swap(tasks_);
    updateNextDue();
  }
  // The tasks are destroyed here, outside the lock, because their destructors may call anything.
}

void DelayedTasks::updateNextDue() {
  const bool none = closed_ || tasks_.empty();
  next_due_.store((none ? kNever : tasks_.begin()->first).count(), std::memory_order_relaxed);
}

}  // namespace quazor
