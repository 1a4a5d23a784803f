// Watch: looking out for what a thread waits for, for a moment, before the thread sleeps.
#pragma once

#include "backends/threads/task_list.h"

#include <algorithm>
#include <chrono>

namespace quazor {

// To sleep and be woken takes the system tens of microseconds; what comes sooner is had sooner by looking. A look-out
// in vain costs that time, so the next ones are left out: one after the first, twice as many after each further one in
// vain, until one succeeds. A thread that is woken now and then looks out once in a thousand times.
//
// Thread: the waiting one.
class Watch {
 public:
  // As long as a sleep and a wake-up take.
  static constexpr std::chrono::nanoseconds kMaxLength = std::chrono::microseconds(40);

  // Asks `ready` again and again until it holds, kMaxLength has passed or `now` has reached `deadline`; or does not ask
  // at all. True when it held.
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
