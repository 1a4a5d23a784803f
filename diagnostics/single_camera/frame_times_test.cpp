#include "diagnostics/single_camera/frame_times.h"

#include <gtest/gtest.h>

#include <initializer_list>

namespace quazor {
namespace {

// Time stamps in milliseconds.
FrameTimes timesOf(std::initializer_list<int> milliseconds) {
  FrameTimes times;
  for (const int value : milliseconds) times.add({.value = value, .timescale = 1000});
  return times;
}

TEST(FrameTimesTest, SaysNothingAboutNoFrame) {
  const FrameTimes none;
  EXPECT_EQ(none.frames(), 0U);
  EXPECT_EQ(none.rate(), 0);
  EXPECT_EQ(none.interval(), 0);
  EXPECT_EQ(none.missing(), 0);
  EXPECT_EQ(none.jitter(), 0);
  EXPECT_EQ(none.backward(), 0U);
}

TEST(FrameTimesTest, HasNoRateOfOneFrame) {
  const FrameTimes one = timesOf({7});
  EXPECT_EQ(one.frames(), 1U);
  EXPECT_EQ(one.rate(), 0);
  EXPECT_EQ(one.jitter(), 0);
}

TEST(FrameTimesTest, MeasuresTheRateFromTheFirstFrameToTheLast) {
  const FrameTimes steady = timesOf({1000, 1040, 1080, 1120, 1160});
  EXPECT_DOUBLE_EQ(steady.rate(), 25);
  EXPECT_NEAR(steady.interval(), 0.040, 1e-12);
  EXPECT_EQ(steady.missing(), 0);
  EXPECT_NEAR(steady.jitter(), 0, 1e-12);
}

TEST(FrameTimesTest, CountsTheFramesThatAGapHasRoomFor) {
  EXPECT_EQ(timesOf({0, 10, 20, 40, 50, 60}).missing(), 1);
  EXPECT_EQ(timesOf({0, 10, 20, 60, 70, 80, 100, 110}).missing(), 4);
  EXPECT_NEAR(timesOf({0, 10, 20, 60, 70, 80, 100, 110}).rate(), 7 / 0.110, 1e-9);
}

TEST(FrameTimesTest, DoesNotTakeAMissingFrameForJitter) {
  EXPECT_NEAR(timesOf({0, 10, 20, 40, 50, 60}).jitter(), 0, 1e-12);
}

TEST(FrameTimesTest, MeasuresJitterAsTheRootMeanSquareOfTheDeviations) {
  // Gaps of 10, 12, 8 and 10 ms.
  EXPECT_NEAR(timesOf({0, 10, 22, 30, 40}).jitter(), 0.001 * 1.4142135623730951, 1e-9);
}

TEST(FrameTimesTest, CountsTimeStampsThatDoNotAdvance) {
  const FrameTimes repeated = timesOf({0, 10, 10, 20, 15, 30});
  EXPECT_EQ(repeated.backward(), 2U);
  EXPECT_EQ(repeated.frames(), 6U);
}

TEST(FrameTimesTest, HasNoRateIfNoTimePasses) { EXPECT_EQ(timesOf({5, 5, 5}).rate(), 0); }

TEST(FrameTimesTest, CountsFramesWithoutATimeStamp) {
  FrameTimes times = timesOf({0, 10, 20});
  times.add({.value = 25, .timescale = 1000, .flags = 0});
  times.add({.value = 25, .timescale = 0});
  EXPECT_EQ(times.frames(), 5U);
  EXPECT_EQ(times.untimed(), 2U);
  EXPECT_DOUBLE_EQ(times.rate(), 100);
}

}  // namespace
}  // namespace quazor
