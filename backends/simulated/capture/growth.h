// Counters that grow while something runs.
#pragma once

#include <chrono>
#include <cstdint>

namespace quazor {

// What a counter that grows by `perSecond` has grown by after `time`, which is not negative: whole counts, exact, and
// wrapping at 64 bits.
inline std::uint64_t grownBy(std::uint64_t perSecond, std::chrono::nanoseconds time) {
  __extension__ using Wide = unsigned __int128;
  return static_cast<std::uint64_t>(Wide{perSecond} * static_cast<std::uint64_t>(time.count()) / 1'000'000'000);
}

}  // namespace quazor
