// VirtualRunLoops: run loops in virtual time.
#pragma once

#include "backends/simulated/time/virtual_scheduler.h"
#include "platform/run_loop.h"

#include <map>
#include <memory>

namespace quazor {

// The main flow has a loop, and so has every strand of the scheduler, like a thread: tasks of one strand share a loop.
// A run that waits blocks in the scheduler, which runs all other tasks. If no event is left that could end it, it
// throws SimulationStall without notifying observers.
//
// Thread: the scheduler's, also for the loops; tasks of other strands may use a loop like other threads may.
class VirtualRunLoops final : public RunLoops {
 public:
  // `scheduler` must not be null.
  explicit VirtualRunLoops(std::shared_ptr<VirtualScheduler> scheduler);
  ~VirtualRunLoops() override;

  // Never null. The loop lives as long as this object; that of a strand may end with the strand.
  RunLoop* currentRunLoop() override;

 private:
  using Strand = std::weak_ptr<VirtualScheduler::Strand>;

  std::shared_ptr<VirtualScheduler> scheduler_;
  std::unique_ptr<RunLoop> main_loop_;
  std::map<Strand, std::unique_ptr<RunLoop>, std::owner_less<Strand>> strand_loops_;
};

}  // namespace quazor
