// Parker: blocks one thread until another thread or the clock wakes it.
#pragma once

#include <atomic>
#include <chrono>
#include <cstdint>

namespace quazor {

// One thread sleeps, any thread wakes it. The sleeper calls prepare(), then announces that it will sleep, then calls
// park(). A wake-up in between is not lost.
// Thread: the sleeper's, except unpark(): any.
class Parker {
 public:
  // Discards earlier wake-ups.
  // Thread: the sleeper.
  void prepare() { woken_.store(0, std::memory_order_relaxed); }

  // Blocks until unpark() or until the steady clock reaches `deadline`; the largest value means no deadline. May return
  // early: the caller must check its condition again.
  // Thread: the sleeper.
  void park(std::chrono::nanoseconds deadline);

  // Thread: any. REQUIRES: this object lives until the call returns.
  void unpark();

 private:
  std::atomic<std::uint32_t> woken_{0};
};

}  // namespace quazor
