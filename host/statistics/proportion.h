// Rates of events, with what a limited number of trials leaves open.
#pragma once

#include <cstddef>
#include <cstdint>

namespace quazor {

struct Interval {
  double low = 0;
  double high = 1;
};

// The 95 % interval of Wilson for the rate of `hits` among `trials`; 0 to 1 without a trial.
// REQUIRES: hits <= trials.
Interval wilsonInterval(std::uint64_t hits, std::uint64_t trials);

// How probable at least so many hits among the trials are, if the rate of all is `rate`: the upper end of a binomial
// distribution.
// REQUIRES: hits <= trials and 0 <= rate <= 1.
double chanceOfAtLeast(std::uint64_t hits, std::uint64_t trials, double rate);

// Below this, chance is no explanation of the most striking of so many figures: one time in 100 one of them is so far
// off.
inline double chanceLimit(std::size_t figures) { return 0.01 / static_cast<double>(figures == 0 ? 1 : figures); }

}  // namespace quazor
