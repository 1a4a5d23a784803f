// Rates of events, with what a limited number of trials leaves open.
#pragma once

#include <cstdint>

namespace quazor {

struct Interval {
  double low = 0;
  double high = 1;
};

// The 95 % interval of Wilson for the rate of `hits` among `trials`; 0 to 1 without a trial.
// REQUIRES: hits <= trials.
Interval wilsonInterval(std::uint64_t hits, std::uint64_t trials);

}  // namespace quazor
