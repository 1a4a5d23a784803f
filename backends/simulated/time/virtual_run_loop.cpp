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
  // Does nothing: the scheduler checks the condition before every step.
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
  const std::shared_ptr<VirtualScheduler::Strand> strand = scheduler_->currentStrand();
  if (strand == nullptr) return main_loop_.get();
  const auto found = strand_loops_.find(strand);
  if (found != strand_loops_.end()) return found->second.get();
  std::erase_if(strand_loops_, [](const auto& entry) { return entry.first.expired(); });
  return strand_loops_.emplace(strand, makeLoop(scheduler_)).first->second.get();
}

}  // namespace quazor
