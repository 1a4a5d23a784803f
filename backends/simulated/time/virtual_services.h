// Clock, queues and semaphores in virtual time.
#pragma once

#include "backends/simulated/time/virtual_scheduler.h"
#include "platform/clock.h"
#include "platform/concurrency.h"

#include <memory>

namespace quazor {

// The scheduler's time. The wall clock reads 2026-01-01 00:00:00 UTC at virtual time 0. Sleeping runs the scheduler;
// sleeping beyond the clock's range throws SimulationStall when nothing else is left to happen.
//
// Thread: the scheduler's.
class VirtualClock final : public Clock {
 public:
  explicit VirtualClock(std::shared_ptr<VirtualScheduler> scheduler) : scheduler_(std::move(scheduler)) {}

  std::chrono::nanoseconds now() const override { return scheduler_->now(); }
  Date date() const override;
  void sleep(std::chrono::nanoseconds duration) override;

 private:
  std::shared_ptr<VirtualScheduler> scheduler_;
};

// Queues are lanes of the scheduler and run whenever something blocks; the quality of service has no influence: any
// order may come. A semaphore that nothing can signal any more throws SimulationStall out of its wait.
//
// Thread: the scheduler's, for what it makes too.
class VirtualConcurrency final : public Concurrency {
 public:
  explicit VirtualConcurrency(std::shared_ptr<VirtualScheduler> scheduler) : scheduler_(std::move(scheduler)) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override;
  std::shared_ptr<Semaphore> makeSemaphore(long count) override;

 private:
  std::shared_ptr<VirtualScheduler> scheduler_;
};

}  // namespace quazor
