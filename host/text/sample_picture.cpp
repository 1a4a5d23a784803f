#include "host/text/sample_picture.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <span>
#include <string_view>

namespace quazor {

namespace {

constexpr long kRows = 4;

// Characters for a cell by its filled fraction, from empty to full.
using Glyphs = std::span<const std::string_view>;

constexpr std::string_view kBlocks[] = {" ",      "\u2581", "\u2582", "\u2583", "\u2584",
                                        "\u2585", "\u2586", "\u2587", "\u2588"};
constexpr std::string_view kAscii[] = {" ", ".", ":"};

// The length of each sample's bar: 1 to `longest`, or 0 for no bar.
std::vector<long> barsOf(const std::vector<double>& samples, long longest) {
  double low = std::numeric_limits<double>::infinity();
  double high = -low;
  for (const double sample : samples) {
    if (!std::isfinite(sample)) continue;
    low = std::min(low, sample);
    high = std::max(high, sample);
  }
  const double span = high / 2 - low / 2;  // halved, because the full span may overflow
  std::vector<long> bars;
  bars.reserve(samples.size());
  for (const double sample : samples) {
    long bar = std::isfinite(sample) ? 1 : 0;
    if (bar == 1 && span > 0) bar += std::lround((sample / 2 - low / 2) / span * static_cast<double>(longest - 1));
    bars.push_back(bar);
  }
  return bars;
}

}  // namespace

std::vector<std::string> pictureOf(const std::vector<double>& samples, bool blocks) {
  const Glyphs glyphs = blocks ? Glyphs(kBlocks) : Glyphs(kAscii);
  const long steps = static_cast<long>(glyphs.size()) - 1;
  const std::vector<long> bars = barsOf(samples, kRows * steps);
  std::vector<std::string> lines;
  for (long row = kRows - 1; row >= 0; --row) {
    std::string line;
    for (const long bar : bars) line += glyphs[static_cast<std::size_t>(std::clamp(bar - row * steps, 0L, steps))];
    line.erase(line.find_last_not_of(' ') + 1);
    if (!line.empty()) lines.push_back(std::move(line));
  }
  return lines;
}

}  // namespace quazor
