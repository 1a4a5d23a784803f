// Parker: where one thread sleeps until another thread, or the clock, wakes it.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>

namespace quazor {

// One thread sleeps here; any thread wakes it. The sleeper prepares, then makes known that it will sleep, then parks:
// a wake-up that falls between is not lost.
// Thread: the sleeper's, but for unpark(): any.
class Parker {
 public:
  // Forgets the wake-ups so far.
  // Thread: the sleeper.
  void prepare() { woken_.store(0, std::memory_order_relaxed); }

  // Sleeps until unpark, or until the steady clock reads `deadline`; the largest value means for ever. May return
  // early: the caller looks again at what it waits for.
  // Thread: the sleeper.
  void park(std::chrono::nanoseconds deadline);

  // Thread: any. REQUIRES: this object lives until the call returns.
  void unpark();

 private:
  std::atomic<std::uint32_t> woken_{0};
};

}  // namespace quazor
