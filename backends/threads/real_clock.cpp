#include "backends/threads/real_clock.h"

#include <thread>

namespace quazor {

std::chrono::nanoseconds RealClock::now() const { return std::chrono::steady_clock::now().time_since_epoch(); }

Date RealClock::date() const {
  return std::chrono::time_point_cast<std::chrono::nanoseconds>(std::chrono::system_clock::now());
}

void RealClock::sleep(std::chrono::nanoseconds duration) {
  // Sleeps for a duration, not until a time: the sum of now and a huge duration would overflow.
  std::this_thread::sleep_for(duration);
}

}  // namespace quazor
