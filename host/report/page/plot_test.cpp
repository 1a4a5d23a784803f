#include "host/report/page/plot.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace quazor {
namespace {

using testing::HasSubstr;
using testing::Not;

Plot plotOf(std::size_t points) {
  Plot plot{"Interval", "ms", {}};
  for (std::size_t i = 0; i < points; ++i) {
    plot.points.push_back({static_cast<double>(i), i == points / 2 ? 66.0 : 33.0});
  }
  plot.median = 33;
  return plot;
}

TEST(PlotSvg, ShowsEveryPointOfAFew) {
  EXPECT_THAT(plotSvg(plotOf(3)), HasSubstr("d=\"M70 108.8L390 17.2L710 108.8\""));
}

// A mark at every point and a name as long as it may be do not make it grow either.
TEST(PlotSvg, IsBoundedAndKeepsTheOneExtreme) {
  Plot plot = plotOf(1'000'000);
  for (const PlotPoint& point : plot.points) plot.marks.push_back(point.x);
  const std::string svg = plotSvg(plot);
  EXPECT_LT(svg.size(), 30'000U);
  EXPECT_THAT(svg, HasSubstr(" 17.2L"));  // the extreme is the highest point
  EXPECT_THAT(svg, HasSubstr(">66 ms</text>"));
}

TEST(PlotSvg, ShowsTwoCurvesOnOneScale) {
  Plot plot = plotOf(3);
  plot.others = {{0, 33}, {4, 99}};
  const std::string svg = plotSvg(plot);
  EXPECT_THAT(svg, HasSubstr("<path class=\"curve\" d=\"M70 108.8L230 63L390 108.8\""));
  EXPECT_THAT(svg, HasSubstr("<path class=\"curve1\" d=\"M70 108.8L710 17.2\""));
}

TEST(PlotSvg, TakesValuesThatAreAllEqual) {
  Plot plot = plotOf(2);
  plot.points = {{0, 5}, {1, 5}};
  plot.median = 5;
  EXPECT_THAT(plotSvg(plot), HasSubstr("d=\"M70 63L710 63\""));
}

TEST(PlotSvg, DoesNotStretchTheStepsOfAClock) {
  Plot plot = plotOf(2);
  plot.points = {{0, 33.333333}, {1, 33.333334}};
  plot.leastSpan = 0.1;
  EXPECT_THAT(plotSvg(plot), HasSubstr("d=\"M70 63L710 63\""));
  EXPECT_THAT(plotSvg(plot), HasSubstr(">33.33 ms</text>"));
  plot.leastSpan = 0;
  EXPECT_THAT(plotSvg(plot), Not(HasSubstr("d=\"M70 63L710 63\"")));
}

TEST(PlotSvg, TakesTimesThatAreAllEqual) {
  Plot plot = plotOf(2);
  plot.points = {{1, 5}, {1, 6}};
  EXPECT_THAT(plotSvg(plot), Not(HasSubstr("nan")));
}

TEST(PlotSvg, IsEmptyForOnePoint) { EXPECT_EQ(plotSvg(plotOf(1)), ""); }

TEST(PlotSvg, EscapesItsLabel) {
  Plot plot = plotOf(3);
  plot.label = "\"><script>";
  EXPECT_THAT(plotSvg(plot), HasSubstr("aria-label=\"&quot;&gt;&lt;script&gt;\""));
}

TEST(SamplesSvg, LeavesOutWhatIsNotFinite) {
  const double notFinite[] = {std::numeric_limits<double>::quiet_NaN(), std::numeric_limits<double>::infinity()};
  EXPECT_THAT(samplesSvg("I", {{0, notFinite[0], 2}}), HasSubstr("d=\"M4 56L196 4\""));
  EXPECT_EQ(samplesSvg("I", {{notFinite[0], notFinite[1]}}), "");
  EXPECT_EQ(samplesSvg("I", {}), "");
}

}  // namespace
}  // namespace quazor
