// RealClock: the clocks of the machine.
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
  // The system clock, at full precision.
  Date date() const override;
  // Blocks forever if the duration exceeds the range of the clock.
  void sleep(std::chrono::nanoseconds duration) override;
};

}  // namespace quazor
