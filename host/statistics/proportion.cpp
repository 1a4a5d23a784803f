#include "host/statistics/proportion.h"

#include <algorithm>
#include <cmath>

namespace quazor {

namespace {

constexpr double kQuantile = 1.959963984540054;  // of the normal distribution at 97.5 %

}  // namespace

Interval wilsonInterval(std::uint64_t hits, std::uint64_t trials) {
  if (trials == 0) return {};
  const double n = static_cast<double>(trials);
  const double rate = static_cast<double>(hits) / n;
  const double square = kQuantile * kQuantile;
  const double middle = (rate + square / (2 * n)) / (1 + square / n);
  const double half = kQuantile * std::sqrt(rate * (1 - rate) / n + square / (4 * n * n)) / (1 + square / n);
  // Rounding must not move an end that is exact.
  return {hits == 0 ? 0.0 : std::max(0.0, middle - half), hits == trials ? 1.0 : std::min(1.0, middle + half)};
}

}  // namespace quazor
