// Moments: number, mean and spread of values, without keeping them.
#pragma once

#include <cstdint>

namespace quazor {

// Values may come one at a time or in parts that are merged; both give the same figures, up to rounding. There is no
// sum of squares, in which a small spread around a large mean would be lost.
// Thread: one at a time.
class Moments {
 public:
  Moments() = default;
  // Of stored figures. `squares` is the sum of the squared distances from the mean.
  Moments(std::uint64_t count, double mean, double squares, double low, double high)
      : count_(count), mean_(mean), squares_(squares), low_(low), high_(high) {}

  // REQUIRES: the value is finite.
  void add(double value);
  void merge(const Moments& other);

  std::uint64_t count() const { return count_; }
  double mean() const { return mean_; }  // 0 without a value, as the next three
  double squares() const { return squares_; }
  double low() const { return low_; }
  double high() const { return high_; }
  // Of the sample, with n - 1 in the denominator; 0 for fewer than two values.
  double deviation() const;

 private:
  std::uint64_t count_ = 0;
  double mean_ = 0;
  double squares_ = 0;
  double low_ = 0;
  double high_ = 0;
};

}  // namespace quazor
