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

// Runs a program repeatedly in every possible order of events, depth first: repeats the choices of the previous run up
// to the last one that had another alternative.
class EveryOrder final : public ScheduleStrategy {
 public:
  // The next choice of this run.
  std::size_t choose(std::size_t count) override;
  // Call this between two runs. Returns false if there are no further orders.
  bool toNextOrder();

  // The choices of this run: the index, and the number of alternatives.
  const std::vector<std::pair<std::size_t, std::size_t>>& choices() const { return choices_; }

 private:
  std::vector<std::pair<std::size_t, std::size_t>> choices_;
  std::size_t at_ = 0;
};

// Runs the plan to its end, including the events after the host has released the experiment. Afterwards the scheduler
// is idle and can be used for another run.
ProjectorRun runVirtually(const ProjectorPlan& plan, const std::shared_ptr<VirtualScheduler>& scheduler);

}  // namespace quazor
