// Serial queues and semaphores.
#pragma once

#include "contract/contract.h"
#include "platform/task.h"

#include <chrono>
#include <memory>
#include <string_view>

namespace QUAZOR_CONTRACT {

// Runs tasks one at a time, in the order of their submission.
//
// Any thread may submit tasks, including a task of the queue itself. A task object is destroyed after it has run and
// before the next one starts. A task must not throw.
//
// Destroying a queue never blocks, and a task may destroy its own queue: tasks that were due still run, and tasks whose
// delay had not expired are destroyed without running.
// Thread: any.
class QUAZOR_EXPORT SerialQueue {
 public:
  SerialQueue() = default;
  SerialQueue(const SerialQueue&) = delete;
  SerialQueue& operator=(const SerialQueue&) = delete;
  virtual ~SerialQueue();

  // Submits a task; returns without waiting for it.
  virtual void async(Task task) = 0;
  // Submits a task that becomes due `delay` from now. It then runs after the tasks already waiting; delayed tasks run
  // in the order of their due times. Zero or a negative delay is due at once. A delay beyond the clock's range never
  // expires early.
  virtual void asyncAfter(std::chrono::nanoseconds delay, Task task) = 0;
};

// A counting semaphore.
// Thread: any.
class QUAZOR_EXPORT Semaphore {
 public:
  Semaphore() = default;
  Semaphore(const Semaphore&) = delete;
  Semaphore& operator=(const Semaphore&) = delete;
  virtual ~Semaphore();

  // Adds one and wakes one waiter.
  virtual void signal() = 0;
  // Blocks until the count is above zero, then decrements it.
  virtual void wait() = 0;
};

// How soon a queue's tasks should run when the machine is busy.
enum class QualityOfService { kUserInteractive, kDefault, kBackground };

// Creates queues and semaphores, which may outlive it.
// Thread: any.
class QUAZOR_EXPORT Concurrency {
 public:
  Concurrency() = default;
  Concurrency(const Concurrency&) = delete;
  Concurrency& operator=(const Concurrency&) = delete;
  virtual ~Concurrency();

  // `label` names the queue in lists of threads and in traces.
  virtual std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) = 0;
  virtual std::shared_ptr<Semaphore> makeSemaphore(long count) = 0;
};

}  // namespace QUAZOR_CONTRACT
