#include "host/text/number_text.h"

#include <gtest/gtest.h>

#include <bit>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <limits>
#include <random>
#include <string>

namespace quazor {
namespace {

TEST(SignificantDigits, AreAsManyAsAskedFor) {
  EXPECT_EQ(significantDigits(1.23456, 5), "1.2346");
  EXPECT_EQ(significantDigits(90, 5), "90");
  EXPECT_EQ(significantDigits(1234567, 5), "1.2346e+06");
  EXPECT_EQ(significantDigits(-std::numeric_limits<double>::max(), 17), "-1.7976931348623157e+308");
  EXPECT_EQ(significantDigits(1e-7, 5), "1e-07");
  EXPECT_EQ(significantDigits(std::nan(""), 5), "nan");
  EXPECT_EQ(significantDigits(-HUGE_VAL, 5), "-inf");
}

double numberIn(const std::string& text) {
  double number = 0;
  std::from_chars(text.data(), text.data() + text.size(), number);
  return number;
}

int sideOf(double value, double threshold) { return value < threshold ? -1 : value > threshold ? 1 : 0; }

TEST(ShownNumber, IsRounded) {
  EXPECT_EQ(shownNumber(1.457643675973142e-13), "1.45764e-13");
  EXPECT_EQ(shownNumber(30.000000006741573), "30");
  EXPECT_EQ(shownNumber(33.333334), "33.3333");
}

TEST(ShownNumber, OfACountIsWhole) {
  EXPECT_EQ(shownNumber(123456789), "123456789");
  EXPECT_EQ(shownNumber(-0.0), "-0");
  EXPECT_EQ(shownNumber(0.5), "0.5");
}

TEST(ShownNumber, TakesMoreDigitsNearAThreshold) {
  EXPECT_EQ(shownNumber(30.000000006741573, {30}), "30.00000001");
  EXPECT_EQ(shownNumber(89.99999999999999, {90}), "89.99999999999999");
}

TEST(ShownNumber, OfNoNumberIsThat) { EXPECT_EQ(shownNumber(std::numeric_limits<double>::quiet_NaN(), {1}), "nan"); }

// A value that is outside a limit is never shown as one that is on it or inside, nor the other way round.
TEST(ShownNumber, IsOnTheSideOfTheValue) {
  std::mt19937_64 random(1);
  for (int i = 0; i < 50'000; ++i) {
    const auto bits = random();
    double threshold = i % 2 == 0 ? std::bit_cast<double>(bits) : static_cast<double>(bits % 2000) / 16 - 60;
    if (!std::isfinite(threshold)) continue;
    double value = threshold;
    // From one unit in the last place to far away.
    const double distance = std::ldexp(std::abs(threshold), -static_cast<int>(random() % 54));
    switch (random() % 4) {
      case 0: value = std::nextafter(threshold, HUGE_VAL); break;
      case 1: value = std::nextafter(threshold, -HUGE_VAL); break;
      case 2: value = threshold + distance; break;
      default: value = threshold - distance;
    }
    const std::string text = shownNumber(value, {threshold, 0});
    ASSERT_EQ(sideOf(numberIn(text), threshold), sideOf(value, threshold)) << text << " " << i;
    ASSERT_EQ(sideOf(numberIn(text), 0), sideOf(value, 0)) << text << " " << i;
  }
}

}  // namespace
}  // namespace quazor
