#include "diagnostics/single_camera/frame_times.h"

#include <algorithm>
#include <cmath>
#include <iterator>

namespace quazor {

namespace {

// The whole number of intervals that is nearest to a gap; at least one.
double intervalsIn(double gap, double interval) { return std::max(1.0, std::round(gap / interval)); }

}  // namespace

void FrameTimes::add(const MediaTime& time) {
  ++frames_;
  if ((time.flags & MediaTime::kValid) != 0 && time.timescale > 0) seconds_.push_back(time.seconds());
}

// The positive gaps between successive frames, in order.
std::vector<double> FrameTimes::gaps() const {
  std::vector<double> gaps;
  for (std::size_t i = 1; i < seconds_.size(); ++i) {
    const double gap = seconds_[i] - seconds_[i - 1];
    if (gap > 0) gaps.push_back(gap);
  }
  return gaps;
}

double FrameTimes::interval() const {
  std::vector<double> sorted = gaps();
  if (sorted.empty()) return 0;
  const auto middle = sorted.begin() + static_cast<std::ptrdiff_t>(sorted.size() / 2);
  std::nth_element(sorted.begin(), middle, sorted.end());
  return *middle;
}

double FrameTimes::rate() const {
  if (seconds_.size() < 2) return 0;
  const double span = seconds_.back() - seconds_.front();
  return span > 0 ? static_cast<double>(seconds_.size() - 1) / span : 0;
}

double FrameTimes::missing() const {
  const double one = interval();
  double missing = 0;
  for (const double gap : gaps()) missing += intervalsIn(gap, one) - 1;
  return missing;
}

double FrameTimes::jitter() const {
  const std::vector<double> all = gaps();
  if (all.empty()) return 0;
  const double one = interval();
  double squares = 0;
  for (const double gap : all) {
    const double deviation = gap - intervalsIn(gap, one) * one;
    squares += deviation * deviation;
  }
  return std::sqrt(squares / static_cast<double>(all.size()));
}

std::size_t FrameTimes::backward() const {
  std::size_t backward = 0;
  for (std::size_t i = 1; i < seconds_.size(); ++i) {
    if (!(seconds_[i] > seconds_[i - 1])) ++backward;
  }
  return backward;
}

}  // namespace quazor
