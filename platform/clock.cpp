#include "platform/clock.h"

namespace QUAZOR_CONTRACT {

Clock::~Clock() = default;

std::chrono::nanoseconds nanosecondsFromSeconds(double seconds) {
  const Value nanoseconds(seconds * 1'000'000'000.0);
  return std::chrono::nanoseconds(toSigned(&nanoseconds));
}

}  // namespace QUAZOR_CONTRACT
