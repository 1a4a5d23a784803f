#include "host/text/sample_picture.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

using testing::ElementsAre;

constexpr double kInfinity = std::numeric_limits<double>::infinity();
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

TEST(PictureOf, HasABarForEverySampleFromTheLowestToTheHighest) {
  EXPECT_THAT(pictureOf({0, 1, 2, 3, 4, 5, 6, 7}, false),
              ElementsAre("      .:",  //
                          "    .:::",  //
                          "  .:::::",  //
                          ".:::::::"));
}

TEST(PictureOf, DrawsBlocksInEightStepsALine) {
  EXPECT_THAT(pictureOf({0, 7, 8, 31, 9}, true),
              ElementsAre("   \u2588",             //
                          "   \u2588",             //
                          "  \u2581\u2588\u2582",  //
                          "\u2581\u2588\u2588\u2588\u2588"));
}

TEST(PictureOf, DrawsNegativeSamplesFromTheLowest) {
  EXPECT_THAT(pictureOf({-70, 0}, false), ElementsAre(" :", " :", " :", ".:"));
}

TEST(PictureOf, DrawsEqualSamplesAsOneLowLine) {
  EXPECT_THAT(pictureOf({5, 5, 5}, false), ElementsAre("..."));
  EXPECT_THAT(pictureOf({5, 5, 5}, true), ElementsAre("\u2581\u2581\u2581"));
}

TEST(PictureOf, LeavesOutWhatIsNotFinite) {
  EXPECT_THAT(pictureOf({kNaN, 0, kInfinity, 7, -kInfinity}, false), ElementsAre("   :", "   :", "   :", " . :"));
  EXPECT_THAT(pictureOf({kNaN, -kInfinity}, false), ElementsAre());
  EXPECT_THAT(pictureOf({}, true), ElementsAre());
}

TEST(PictureOf, TakesTheWholeRangeOfNumbers) {
  const double most = std::numeric_limits<double>::max();
  EXPECT_THAT(pictureOf({-most, 0, most}, false), ElementsAre("  :", " .:", " ::", ".::"));
}

}  // namespace
}  // namespace quazor
