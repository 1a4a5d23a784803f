// Clock, queues and semaphores in virtual time.
#pragma once

#include "backends/simulated/time/virtual_scheduler.h"
#include "platform/clock.h"
#include "platform/concurrency.h"

#include <memory>

namespace quazor {

// The scheduler's time. The wall clock shows 2026-01-01 00:00:00 UTC at virtual time 0. Sleeping runs the scheduler;
// sleeping beyond the range of the clock throws SimulationStall when no other event is left.
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

// Queues are strands of the scheduler and run whenever something blocks; the quality of service has no effect, because
// any order is possible. Waiting for a semaphore that nothing can signal any more throws SimulationStall.
//
// Thread: the scheduler's, also for the queues and semaphores.
class VirtualConcurrency final : public Concurrency {
 public:
  explicit VirtualConcurrency(std::shared_ptr<VirtualScheduler> scheduler) : scheduler_(std::move(scheduler)) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override;
  std::shared_ptr<Semaphore> makeSemaphore(long count) override;

 private:
  std::shared_ptr<VirtualScheduler> scheduler_;
};

}  // namespace quazor
