#include "host/report/page/shown_number.h"

#include "contract/message_format.h"
#include "host/report/page/html.h"
#include "host/text/number_text.h"

#include <algorithm>
#include <charconv>
#include <cmath>

namespace quazor {

namespace {

constexpr int kFewestDigits = 6;
constexpr int kEnoughDigits = 17;  // for any double
constexpr double kLargestCount = 1e15;

}  // namespace

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

std::string numberCell(double value, const std::vector<double>& thresholds, std::string_view attributes) {
  const std::string shown = shownNumber(value, thresholds);
  const std::string whole = defaultText(value);
  std::string tag = "td class=\"number\"" + std::string(attributes);
  if (shown != whole) tag += " title=\"" + whole + "\"";
  return element(tag, shown);
}

}  // namespace quazor
