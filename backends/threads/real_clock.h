// RealClock: the machine's own time.
#pragma once

#include "platform/clock.h"

#include <chrono>

namespace quazor {

// Stateless.
// Thread: any.
class RealClock final : public Clock {
 public:
  // The steady clock.
  std::chrono::nanoseconds now() const override;
  // The system clock, to the precision it has.
  Date date() const override;
  // A duration that the clock does not reach blocks for ever.
  void sleep(std::chrono::nanoseconds duration) override;
};

}  // namespace quazor
