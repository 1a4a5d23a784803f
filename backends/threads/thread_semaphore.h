// ThreadSemaphore: a counting semaphore for real threads.
#pragma once

#include "platform/concurrency.h"

#include <condition_variable>
#include <mutex>

namespace quazor {

// If the count is negative, that many additional signals are needed before a wait returns.
// Thread: any.
class ThreadSemaphore final : public Semaphore {
 public:
  explicit ThreadSemaphore(long count) : count_(count) {}

  // The last reference may be released as soon as a wait returns, even before this call has returned.
  void signal() override;
  void wait() override;

 private:
  std::mutex mutex_;
  std::condition_variable above_zero_;
  long count_;  // guarded by mutex_
};

}  // namespace quazor
