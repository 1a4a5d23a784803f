// ThreadSerialQueue: a serial queue that runs its tasks on a thread of its own.
#pragma once

#include "platform/concurrency.h"

#include <chrono>
#include <memory>
#include <string_view>

namespace quazor {

// The thread and what it works on belong to each other, not to the queue: the last reference to the queue may go in
// one of its own tasks, the thread ends when it has run what was due then, and nobody waits for it. A process may end
// at any time, whatever is waiting or delayed.
//
// A posted task costs no allocation of its own, no lock and, while the thread is at work, no system call. An idle
// thread watches for the next task before it sleeps: for up to five microseconds when tasks have come that soon before,
// hardly at all when they have not. The memory of the most tasks that waited is given back within a few tenths of a
// second without work.
//
// A delayed task is posted, as if by async, at the moment it becomes due: a task that is posted later runs later, even
// when the thread was busy at that moment.
// Thread: any.
class ThreadSerialQueue final : public SerialQueue {
 public:
  // The thread is named with the last 15 characters of `label`, as many as the system keeps: labels of one subject
  // share their beginning. A background thread gets a lower priority; where the system refuses, it goes without.
  //
  // Throws std::system_error when the process can have no more threads.
  ThreadSerialQueue(std::string_view label, QualityOfService quality);
  // Never blocks. Delayed tasks that are not yet due are destroyed on the thread, behind the tasks that still run.
  ~ThreadSerialQueue() override;

  void async(Task task) override;
  void asyncAfter(std::chrono::nanoseconds delay, Task task) override;

 private:
  class Worker;

  std::shared_ptr<Worker> worker_;
};

}  // namespace quazor
