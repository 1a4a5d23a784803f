// Counters that grow over time.
#pragma once

#include <chrono>
#include <cstdint>

namespace quazor {

// The growth of a counter by `perSecond` after `time`, which must not be negative: whole counts, exact, wrapping at 64
// bits.
inline std::uint64_t grownBy(std::uint64_t perSecond, std::chrono::nanoseconds time) {
  __extension__ using Wide = unsigned __int128;
  return static_cast<std::uint64_t>(Wide{perSecond} * static_cast<std::uint64_t>(time.count()) / 1'000'000'000);
}

}  // namespace quazor
