#include "host/text/number_text.h"

#include "contract/message_format.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <iterator>

namespace quazor {

namespace {

constexpr int kFewestDigits = 6;
constexpr int kEnoughDigits = 17;  // for any double
constexpr double kLargestCount = 1e15;

}  // namespace

std::string significantDigits(double value, int digits) {
  char text[32];  // 17 digits, a sign, a point and an exponent
  const auto [end, ignored] =
      std::to_chars(std::begin(text), std::end(text), value, std::chars_format::general, digits);
  return {text, end};
}

std::string shownNumber(double value, const std::vector<double>& thresholds) {
  std::string whole = defaultText(value);
  if (!std::isfinite(value) || (value == std::trunc(value) && std::abs(value) < kLargestCount)) return whole;
  for (int digits = kFewestDigits; digits < kEnoughDigits; ++digits) {
    std::string text = significantDigits(value, digits);
    if (text.size() >= whole.size()) break;
    double rounded = 0;
    std::from_chars(text.data(), text.data() + text.size(), rounded);
    const auto isOnTheSameSide = [value, rounded](double threshold) {
      return (rounded < threshold) == (value < threshold) && (rounded > threshold) == (value > threshold);
    };
    if (std::ranges::all_of(thresholds, isOnTheSameSide)) return text;
  }
  return whole;
}

}  // namespace quazor
