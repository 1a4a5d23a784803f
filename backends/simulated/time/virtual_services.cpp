#include "backends/simulated/time/virtual_services.h"

#include <utility>

namespace quazor {
namespace {

constexpr Date kDateAtZero = std::chrono::sys_days(std::chrono::year(2026) / 1 / 1);

class VirtualSerialQueue final : public SerialQueue {
 public:
  explicit VirtualSerialQueue(std::shared_ptr<VirtualScheduler> scheduler)
      : scheduler_(std::move(scheduler)), lane_(scheduler_->makeStrand()) {}
  ~VirtualSerialQueue() override { scheduler_->dropDelayed(*lane_); }

  void async(Task task) override { scheduler_->submit(lane_, std::move(task)); }
  void asyncAfter(std::chrono::nanoseconds delay, Task task) override {
    scheduler_->submitAt(scheduler_->after(delay), lane_, std::move(task));
  }

 private:
  std::shared_ptr<VirtualScheduler> scheduler_;
  std::shared_ptr<VirtualScheduler::Strand> lane_;
};

class VirtualSemaphore final : public Semaphore {
 public:
  VirtualSemaphore(std::shared_ptr<VirtualScheduler> scheduler, long count)
      : scheduler_(std::move(scheduler)), count_(count) {}

  void signal() override { ++count_; }
  void wait() override {
    scheduler_->blockUntil([this] { return count_ > 0; }, "a semaphore is waited for that nothing will signal");
    --count_;
  }

 private:
  std::shared_ptr<VirtualScheduler> scheduler_;
  long count_;
};

}  // namespace

Date VirtualClock::date() const {
  const std::chrono::nanoseconds sinceEpoch = kDateAtZero.time_since_epoch();
  return now() > Date::duration::max() - sinceEpoch ? Date::max() : kDateAtZero + now();
}

void VirtualClock::sleep(std::chrono::nanoseconds duration) {
  if (duration <= std::chrono::nanoseconds::zero()) return;
  scheduler_->blockUntil(scheduler_->after(duration), "a sleep has no end within the clock's range");
}

std::shared_ptr<SerialQueue> VirtualConcurrency::makeSerialQueue(std::string_view, QualityOfService) {
  return std::make_shared<VirtualSerialQueue>(scheduler_);
}

std::shared_ptr<Semaphore> VirtualConcurrency::makeSemaphore(long count) {
  return std::make_shared<VirtualSemaphore>(scheduler_, count);
}

}  // namespace quazor
