#include "host/statistics/moments.h"

#include <algorithm>
#include <cmath>

namespace quazor {

void Moments::add(double value) { merge({1, value, 0, value, value}); }

// The update of Chan, Golub and LeVeque.
void Moments::merge(const Moments& other) {
  if (other.count_ == 0) return;
  if (count_ == 0) {
    *this = other;
    return;
  }
  const double own = static_cast<double>(count_);
  const double others = static_cast<double>(other.count_);
  const double distance = other.mean_ - mean_;
  squares_ += other.squares_ + distance * distance * own * others / (own + others);
  mean_ += distance * others / (own + others);
  count_ += other.count_;
  low_ = std::min(low_, other.low_);
  high_ = std::max(high_, other.high_);
}

double Moments::deviation() const { return count_ < 2 ? 0 : std::sqrt(squares_ / static_cast<double>(count_ - 1)); }

}  // namespace quazor
