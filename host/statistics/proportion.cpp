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

double chanceOfAtLeast(std::uint64_t hits, std::uint64_t trials, double rate) {
  if (hits == 0 || rate >= 1) return 1;
  if (rate <= 0) return 0;
  // Each term follows from the one before; the first is the only one that needs factorials, as logarithms.
  const auto n = static_cast<double>(trials);
  auto k = static_cast<double>(hits);
  double term = std::exp(std::lgamma(n + 1) - std::lgamma(k + 1) - std::lgamma(n - k + 1) + k * std::log(rate) +
                         (n - k) * std::log1p(-rate));
  double sum = 0;
  for (; k <= n; ++k) {
    sum += term;
    // Beyond the most probable number the terms only fall.
    if (k > n * rate && term < sum * 1e-17) break;
    term *= (n - k) / (k + 1) * rate / (1 - rate);
  }
  return std::min(1.0, sum);
}

}  // namespace quazor
