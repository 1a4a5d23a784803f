#include "backends/simulated/time/schedule_strategy.h"

namespace quazor {

ScheduleStrategy::~ScheduleStrategy() = default;

std::size_t RandomStrategy::choose(std::size_t count) {
  state_ += 0x9E3779B97F4A7C15U;
  std::uint64_t mixed = state_;
  mixed = (mixed ^ (mixed >> 30)) * 0xBF58476D1CE4E5B9U;
  mixed = (mixed ^ (mixed >> 27)) * 0x94D049BB133111EBU;
  mixed ^= mixed >> 31;
  return static_cast<std::size_t>(mixed % count);
}

}  // namespace quazor
