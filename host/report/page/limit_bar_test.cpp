#include "host/report/page/limit_bar.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <memory>

namespace quazor {
namespace {

using testing::HasSubstr;

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kLargest = std::numeric_limits<double>::max();

std::shared_ptr<const QZBound> boundAt(double value, bool open = false) {
  return std::make_shared<const QZBound>(Measurement(value, QZDimensionlessUnit::frames()), open);
}

QZLimit between(std::shared_ptr<const QZBound> lower, std::shared_ptr<const QZBound> upper) {
  QZLimit limit("L");
  limit.setLowerBound(std::move(lower));
  limit.setUpperBound(std::move(upper));
  return limit;
}

TEST(Deviation, SaysByHowMuchAValueIsOutside) {
  const QZLimit limit = between(boundAt(90), boundAt(92, true));
  EXPECT_EQ(deviationText(86, limit), "4 below the limit");
  EXPECT_EQ(deviationText(92.3, limit), "0.3 above the limit");
  EXPECT_EQ(deviationText(92, limit), "on the limit, which is excluded");
  EXPECT_EQ(deviationText(90, limit), "");
}

TEST(Deviation, IsNotSaidOfWhatCannotBeCompared) {
  EXPECT_EQ(deviationText(1, std::nullopt), "");
  EXPECT_EQ(deviationText(1, between(nullptr, nullptr)), "");
  EXPECT_EQ(deviationText(std::numeric_limits<double>::quiet_NaN(), between(boundAt(90), nullptr)), "");
  EXPECT_EQ(deviationText(-kLargest, between(boundAt(kLargest), nullptr)), "");
}

TEST(LimitBar, ShowsRangeBoundsAndValue) {
  const std::string bar = limitBar(86, between(boundAt(90), boundAt(94)), false);
  // 86 to 94 and a fifth of that on each side are 160 wide.
  EXPECT_THAT(bar, HasSubstr("<rect class=\"allowed\" x=\"80\" y=\"4\" width=\"57.1\""));
  EXPECT_THAT(bar, HasSubstr("<circle class=\"fail\" cx=\"22.9\""));
  EXPECT_THAT(bar, HasSubstr("outside the limit"));
  EXPECT_THAT(limitBar(92, between(boundAt(90), boundAt(94)), true), HasSubstr("<circle class=\"pass\" cx=\"80\""));
}

TEST(LimitBar, ReachesTheEdgeWithoutABound) {
  EXPECT_THAT(limitBar(1, between(boundAt(0), nullptr), true), HasSubstr("x=\"22.9\" y=\"4\" width=\"137.1\""));
}

TEST(LimitBar, IsNotDrawnWithNothingToSee) {
  EXPECT_EQ(limitBar(0, between(boundAt(0), boundAt(0)), true), "");
  EXPECT_EQ(limitBar(5, between(boundAt(0), boundAt(0)), false), "");
  EXPECT_EQ(limitBar(0, between(nullptr, boundAt(0)), true), "");
}

TEST(LimitBar, IsNotDrawnWithoutFiniteNumbers) {
  EXPECT_EQ(limitBar(1, std::nullopt, true), "");
  EXPECT_EQ(limitBar(1, between(nullptr, nullptr), true), "");
  EXPECT_EQ(limitBar(std::numeric_limits<double>::quiet_NaN(), between(boundAt(0), nullptr), false), "");
  EXPECT_EQ(limitBar(1, between(boundAt(-kInfinity), nullptr), true), "");
  EXPECT_EQ(limitBar(kLargest, between(boundAt(-kLargest), nullptr), true), "");
}

}  // namespace
}  // namespace quazor
