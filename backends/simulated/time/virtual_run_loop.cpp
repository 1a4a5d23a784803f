#include "backends/simulated/time/virtual_run_loop.h"

#include "backends/threads/basic_run_loop.h"

#include <utility>

namespace quazor {
namespace {

class VirtualWaiter final : public RunLoopWaiter {
 public:
  explicit VirtualWaiter(std::shared_ptr<VirtualScheduler> scheduler) : scheduler_(std::move(scheduler)) {}

  std::chrono::nanoseconds now() override { return scheduler_->now(); }
  void wait(std::chrono::nanoseconds deadline, const std::function<bool()>& ready) override {
    scheduler_->blockUntil(ready, deadline, "a run loop waits for what nothing will signal or stop");
  }
  // The scheduler asks before every step.
  void wake() override {}

 private:
  std::shared_ptr<VirtualScheduler> scheduler_;
};

std::unique_ptr<RunLoop> makeLoop(const std::shared_ptr<VirtualScheduler>& scheduler) {
  return std::make_unique<BasicRunLoop>(std::make_shared<VirtualWaiter>(scheduler));
}

}  // namespace

VirtualRunLoops::VirtualRunLoops(std::shared_ptr<VirtualScheduler> scheduler)
    : scheduler_(std::move(scheduler)), main_loop_(makeLoop(scheduler_)) {}

VirtualRunLoops::~VirtualRunLoops() = default;

RunLoop* VirtualRunLoops::currentRunLoop() {
  const std::shared_ptr<VirtualScheduler::Lane> lane = scheduler_->currentLane();
  if (lane == nullptr) return main_loop_.get();
  const auto found = lane_loops_.find(lane);
  if (found != lane_loops_.end()) return found->second.get();
  std::erase_if(lane_loops_, [](const auto& entry) { return entry.first.expired(); });
  return lane_loops_.emplace(lane, makeLoop(scheduler_)).first->second.get();
}

}  // namespace quazor
