// Clock: time as experiments see it.
#pragma once

#include "contract/contract.h"
#include "contract/value.h"

#include <chrono>

namespace QUAZOR_CONTRACT {

// Converts seconds to nanoseconds: truncates toward zero and saturates; NaN becomes 0.
QUAZOR_EXPORT std::chrono::nanoseconds nanosecondsFromSeconds(double seconds);

// Thread: any.
class QUAZOR_EXPORT Clock {
 public:
  Clock() = default;
  Clock(const Clock&) = delete;
  Clock& operator=(const Clock&) = delete;
  virtual ~Clock();

  // Monotonic time since some fixed moment.
  virtual std::chrono::nanoseconds now() const = 0;
  // The wall clock.
  virtual Date date() const = 0;
  // Blocks the calling thread for that duration; returns at once if it is zero or negative.
  virtual void sleep(std::chrono::nanoseconds duration) = 0;
};

}  // namespace QUAZOR_CONTRACT
