// VirtualRunLoops: run loops in virtual time.
#pragma once

#include "backends/simulated/time/virtual_scheduler.h"
#include "platform/run_loop.h"

#include <map>
#include <memory>

namespace quazor {

// The main flow has a loop, and so has every lane of the scheduler, as if it were a thread: tasks of one lane get the
// same loop. A run that waits blocks in the scheduler, so that all other tasks go on; it throws SimulationStall when
// nothing is left that could end it, and nobody is told of the end of such a run.
//
// Thread: the scheduler's, for what it makes too; other tasks may do with a loop what other threads may.
class VirtualRunLoops final : public RunLoops {
 public:
  // `scheduler` must not be null.
  explicit VirtualRunLoops(std::shared_ptr<VirtualScheduler> scheduler);
  ~VirtualRunLoops() override;

  // Never null. The loop lives as long as this object; that of a lane may go when the lane has gone.
  RunLoop* currentRunLoop() override;

 private:
  using Strand = std::weak_ptr<VirtualScheduler::Strand>;

  std::shared_ptr<VirtualScheduler> scheduler_;
  std::unique_ptr<RunLoop> main_loop_;
  std::map<Strand, std::unique_ptr<RunLoop>, std::owner_less<Strand>> strand_loops_;
};

}  // namespace quazor
