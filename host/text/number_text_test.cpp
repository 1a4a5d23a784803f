#include "host/text/number_text.h"

#include <cmath>
#include <limits>

#include <gtest/gtest.h>

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

}  // namespace
}  // namespace quazor
