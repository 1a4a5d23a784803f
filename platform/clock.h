// Clock: time as experiments see it.
#pragma once

#include "contract/contract.h"
#include "contract/value.h"

#include <chrono>

namespace QUAZOR_CONTRACT {

// Seconds as nanoseconds: truncated toward zero, saturating; not-a-number is 0.
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
  // Blocks the calling thread for that long; zero and less return at once.
  virtual void sleep(std::chrono::nanoseconds duration) = 0;
};

}  // namespace QUAZOR_CONTRACT
