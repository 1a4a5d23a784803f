#include "host/report/page/limit_bar.h"

#include "host/report/page/html.h"

#include <algorithm>
#include <cmath>
#include <vector>

namespace quazor {

namespace {

constexpr double kBarWidth = 160;   // of the picture
constexpr double kBarMargin = 0.2;  // of the range that is shown, on each side

std::optional<double> boundOf(const std::shared_ptr<const QZBound>& bound) {
  if (bound == nullptr) return std::nullopt;
  return bound->value().value();
}

std::string line(std::string_view kind, double x, double from, double to) {
  return "<path class=\"" + std::string(kind) + "\" d=\"M" + coordinate(x) + " " + coordinate(from) + "V" +
         coordinate(to) + "\"/>";
}

}  // namespace

std::string limitBar(double value, const std::optional<QZLimit>& limit, bool passed) {
  if (!limit) return {};
  const std::optional<double> lower = boundOf(limit->lowerBound());
  const std::optional<double> upper = boundOf(limit->upperBound());
  if (!lower && !upper) return {};
  std::vector<double> numbers = {value};
  for (const auto& bound : {lower, upper}) {
    if (bound) numbers.push_back(*bound);
  }
  const auto isFinite = [](double one) { return std::isfinite(one); };
  if (!std::all_of(numbers.begin(), numbers.end(), isFinite)) return {};
  const auto [least, greatest] = std::minmax_element(numbers.begin(), numbers.end());
  const double span = *greatest - *least;
  if (span == 0 || (lower && upper && *lower == *upper)) return {};
  const double begin = *least - span * kBarMargin;
  const double range = *greatest + span * kBarMargin - begin;
  if (!std::isfinite(range) || range <= 0) return {};
  const auto place = [&](double number) { return (number - begin) / range * kBarWidth; };
  const double left = lower ? place(*lower) : 0;
  const double right = upper ? place(*upper) : kBarWidth;
  std::string svg = "<svg class=\"bar\" viewBox=\"0 0 160 16\" role=\"img\" aria-label=\"";
  svg += passed ? "inside the limit" : "outside the limit";
  svg += R"("><path class="axis" d="M0 8H160"/>)";
  if (right > left) {
    svg += "<rect class=\"allowed\" x=\"" + coordinate(left) + "\" y=\"4\" width=\"" + coordinate(right - left) +
           "\" height=\"8\"/>";
  }
  if (lower) svg += line("bound", left, 2, 14);
  if (upper) svg += line("bound", right, 2, 14);
  svg += "<circle class=\"" + std::string(passed ? "pass" : "fail") + "\" cx=\"" + coordinate(place(value)) +
         "\" cy=\"8\" r=\"4\"/></svg>";
  return svg;
}

std::string deviationText(double value, const std::optional<QZLimit>& limit) {
  if (!limit || !std::isfinite(value)) return {};
  const QZBound* const lower = limit->lowerBound().get();
  const QZBound* const upper = limit->upperBound().get();
  const auto outside = [](double distance, const char* side) {
    return std::isfinite(distance) ? roundedText(distance) + " " + side + " the limit" : std::string();
  };
  if (lower != nullptr && value < lower->value().value()) return outside(lower->value().value() - value, "below");
  if (upper != nullptr && value > upper->value().value()) return outside(value - upper->value().value(), "above");
  const auto isExcluded = [value](const QZBound* bound) {
    return bound != nullptr && bound->open() && value == bound->value().value();
  };
  return isExcluded(lower) || isExcluded(upper) ? "on the limit, which is excluded" : std::string();
}

}  // namespace quazor
