#include "backends/threads/thread_semaphore.h"

namespace quazor {

void ThreadSemaphore::signal() {
  const std::lock_guard lock(mutex_);
  ++count_;
  // Notifies under the lock: otherwise the woken thread could destroy the condition variable too early.
  above_zero_.notify_one();
}

void ThreadSemaphore::wait() {
  std::unique_lock lock(mutex_);
  above_zero_.wait(lock, [this] { return count_ > 0; });
  --count_;
}

}  // namespace quazor
