// What records and report pages tell of frames, read by their public descriptions alone.
#pragma once

#include "host/device/traced_frame.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// The frames of the columns in the lines of a record with one diagnostic, by stream. Throws if a line is no JSON or
// has other members, a step other than 1, or lost frames.
std::map<std::string, std::vector<TracedFrame>> framesInColumns(const std::string& record);

// What a page says of one stream. Times are in milliseconds, but `first`, `last` and `gapAt` in seconds.
struct ShownStream {
  std::size_t frames = 0;
  std::uint64_t missing = 0;
  std::uint64_t lost = 0;
  std::vector<double> interval;  // median, minimum, maximum; empty: none
  std::vector<double> captured;  // the first and the last; empty: not said
  std::size_t gaps = 0;
  std::int64_t gapAfter = -1;  // the number of the frame before the first gap
  double gapAt = 0;
  // The plot of the intervals, both empty without one: its points, in the units of the picture, and the numbers at its
  // axes: the times of the first and the last interval; the greatest interval, and the least if there is room for it.
  std::vector<std::pair<double, double>> curve;
  std::vector<double> times;
  std::vector<double> heights;
};

// Throws std::out_of_range if the page does not tell of the stream, or not as pages do.
ShownStream streamOnPage(const std::string& page, const std::string& stream);

}  // namespace quazor
