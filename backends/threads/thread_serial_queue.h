// ThreadSerialQueue: a serial queue that runs its tasks on its own thread.
#pragma once

#include "platform/concurrency.h"

#include <chrono>
#include <memory>
#include <string_view>

namespace quazor {

// The queue does not own its thread: the last reference to the queue may be released in one of its own tasks, the
// thread ends after it has run the tasks that were due then, and nothing joins it. The process may end at any time,
// even with pending or delayed tasks.
//
// Posting a task needs no allocation, no lock and, while the thread is busy, no system call. An idle thread polls for
// the next task before it sleeps: for up to five microseconds if tasks have recently arrived that quickly, much less
// otherwise. Memory for peak loads is freed within a few tenths of a second of idle time.
//
// A delayed task is posted, as if by async(), when it becomes due: tasks that are posted later run later, even if the
// thread was busy at that time.
// Thread: any.
class ThreadSerialQueue final : public SerialQueue {
 public:
  // The thread is named after the last 15 characters of `label`, the maximum length; labels of one subject share their
  // beginning. A background thread gets a lower priority if the system permits.
  //
  // Throws std::system_error if no thread can be created.
  ThreadSerialQueue(std::string_view label, QualityOfService quality);
  // Does not block. Delayed tasks that are not yet due are destroyed on the thread, after the tasks that still run.
  ~ThreadSerialQueue() override;

  void async(Task task) override;
  void asyncAfter(std::chrono::nanoseconds delay, Task task) override;

 private:
  class Worker;

  std::shared_ptr<Worker> worker_;
};

}  // namespace quazor
