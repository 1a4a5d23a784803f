// Whether values go up or down in the course of time.
#pragma once

#include <cstddef>
#include <optional>
#include <vector>

namespace quazor {

// Fewer values show no trend.
inline constexpr std::size_t kValuesOfTrend = 10;

// Kendall's rank correlation of values with their order.
struct Trend {
  double tau = 0;  // 1: each value is above those before it; -1: below; ties count half
  double chance =
      1;  // how probable a tau so far from 0 is if the order is random, both sides, by the normal approximation
};

// The trend of values in their order, as tau-b and its asymptotic probability. Nothing for fewer than kValuesOfTrend,
// or if all are the same. Source: M. G. Kendall, Rank Correlation Methods.
std::optional<Trend> trendOf(const std::vector<double>& values);

}  // namespace quazor
