#include "host/statistics/trend.h"

#include <cmath>
#include <map>

namespace quazor {

std::optional<Trend> trendOf(const std::vector<double>& values) {
  if (values.size() < kValuesOfTrend) return std::nullopt;
  double rises = 0;  // pairs that rise, less those that fall
  std::map<double, double> alike;
  for (std::size_t later = 0; later < values.size(); ++later) {
    ++alike[values[later]];
    for (std::size_t earlier = 0; earlier < later; ++earlier) {
      if (values[earlier] < values[later]) ++rises;
      if (values[earlier] > values[later]) --rises;
    }
  }
  const auto number = static_cast<double>(values.size());
  const double pairs = number * (number - 1) / 2;
  double tiedPairs = 0;
  double variance = number * (number - 1) * (2 * number + 5);
  for (const auto& [value, times] : alike) {
    tiedPairs += times * (times - 1) / 2;
    variance -= times * (times - 1) * (2 * times + 5);
  }
  if (tiedPairs == pairs) return std::nullopt;
  return Trend{rises / std::sqrt(pairs * (pairs - tiedPairs)),
               std::erfc(std::abs(rises) / std::sqrt(variance / 18) / std::sqrt(2.0))};
}

}  // namespace quazor
