// Watch: spins briefly before a thread sleeps.
#pragma once

#include "backends/threads/task_list.h"

#include <algorithm>
#include <chrono>

namespace quazor {

// Sleeping and waking takes tens of microseconds; spinning is faster if the event comes sooner. A spin in vain wastes
// that time, so the following spins are skipped: one after the first failure, and twice as many after each further one,
// until a spin succeeds. A thread that is rarely woken spins once in a thousand times.
//
// Thread: the waiting one.
class Watch {
 public:
  // The cost of a sleep and a wake-up.
  static constexpr std::chrono::nanoseconds kMaxLength = std::chrono::microseconds(40);

  // Calls `ready` repeatedly until it returns true, kMaxLength has passed or `now` has reached `deadline`; may skip the
  // calls. Returns true if `ready` did.
  template <class Ready, class Now>
  bool spin(Ready&& ready, Now&& now, std::chrono::nanoseconds deadline) {
    if (toLeaveOut_ > 0) {
      --toLeaveOut_;
      return false;
    }
    const std::chrono::nanoseconds begin = now();
    const std::chrono::nanoseconds end = std::min(deadline, begin + kMaxLength);
    do {
      for (int i = 0; i < kLooksBetweenTimes; ++i) {
        if (ready()) {
          nextToLeaveOut_ = 1;
          return true;
        }
        cpuRelax();
      }
    } while (now() < end);
    toLeaveOut_ = nextToLeaveOut_;
    nextToLeaveOut_ = std::min(2 * nextToLeaveOut_, kMaxToLeaveOut);
    return false;
  }

 private:
  static constexpr int kLooksBetweenTimes = 16;
  static constexpr int kMaxToLeaveOut = 1024;

  int toLeaveOut_ = 0;
  int nextToLeaveOut_ = 1;
};

}  // namespace quazor
