// Runs of the projector fault experiment in virtual time.
#pragma once

#include "backends/simulated/time/schedule_strategy.h"
#include "backends/simulated/time/virtual_scheduler.h"
#include "tests/sweeps/projector_trace.h"

#include <cstddef>
#include <memory>
#include <utility>
#include <vector>

namespace quazor {

// Leads a program that is run again and again into every order of events there is, one after another: depth first, by
// repeating the choices of the run before up to the last one that had another possibility.
class EveryOrder final : public ScheduleStrategy {
 public:
  // The next choice of this run.
  std::size_t choose(std::size_t count) override;
  // To be called between two runs. False when there is no further order.
  bool toNextOrder();

  // The choices of this run: which one, of how many.
  const std::vector<std::pair<std::size_t, std::size_t>>& choices() const { return choices_; }

 private:
  std::vector<std::pair<std::size_t, std::size_t>> choices_;
  std::size_t at_ = 0;
};

// Runs the plan to its end, with what is left to happen when the host has let go of the experiment. Leaves the
// scheduler with nothing to do, fit for another run.
ProjectorRun runVirtually(const ProjectorPlan& plan, const std::shared_ptr<VirtualScheduler>& scheduler);

}  // namespace quazor
