#include "platform/clock.h"

#include <gtest/gtest.h>

#include <limits>

namespace quazor {
namespace {

TEST(NanosecondsFromSecondsTest, TruncatesTowardZeroAndSaturates) {
  constexpr auto lowest = std::numeric_limits<std::int64_t>::min();
  constexpr auto highest = std::numeric_limits<std::int64_t>::max();
  constexpr double infinity = std::numeric_limits<double>::infinity();
  const struct {
    const char* name;
    double seconds;
    std::int64_t nanoseconds;
  } kRows[] = {
      {"zero", 0, 0},
      {"minus zero", -0.0, 0},
      {"two seconds", 2, 2'000'000'000},
      {"half a second", 0.5, 500'000'000},
      {"minus half a second", -0.5, -500'000'000},
      {"one and a half nanoseconds", 1.5e-9, 1},
      {"minus one and a half nanoseconds", -1.5e-9, -1},
      {"less than a nanosecond", 0.9e-9, 0},
      {"ten minutes", 600, 600'000'000'000},
      {"the last whole second that fits", 9'223'372'036, 9'223'372'036'000'000'000},
      {"the first whole second that does not fit", 9'223'372'037, highest},
      {"the first negative whole second that does not fit", -9'223'372'037, lowest},
      {"more seconds than any clock has", 1e300, highest},
      {"minus as many", -1e300, lowest},
      {"so many that the product overflows", std::numeric_limits<double>::max(), highest},
      {"infinity", infinity, highest},
      {"minus infinity", -infinity, lowest},
      {"not a number", std::numeric_limits<double>::quiet_NaN(), 0},
  };
  for (const auto& row : kRows) EXPECT_EQ(nanosecondsFromSeconds(row.seconds).count(), row.nanoseconds) << row.name;
}

}  // namespace
}  // namespace quazor
