#include "host/text/timestamp.h"

#include "host/testing/test_values.h"

#include <gtest/gtest.h>

#include <chrono>

namespace quazor {
namespace {

using namespace std::chrono_literals;

Date dateOf(int year, unsigned month, unsigned day, std::chrono::nanoseconds time) {
  return Date(std::chrono::sys_days(std::chrono::year(year) / static_cast<int>(month) / static_cast<int>(day))) + time;
}

TEST(TimestampText, HasAlwaysNineDigitsAfterThePoint) {
  EXPECT_EQ(timestampText(dateOf(2026, 11, 21, 1h + 8min + 123456789ns)), "2026-11-21T01:08:00.123456789Z");
  EXPECT_EQ(timestampText(dateOf(2024, 2, 29, 23h + 59min + 59s + 1ns)), "2024-02-29T23:59:59.000000001Z");
  EXPECT_EQ(timestampText(Date{}), "1970-01-01T00:00:00.000000000Z");
  EXPECT_EQ(timestampText(Date{} - 1ns), "1969-12-31T23:59:59.999999999Z");
}

TEST(ParseTimestamp, ReadsBackEveryMomentBetween1678And2261) {
  RandomValues random(1);
  for (int i = 0; i < 5000; ++i) {
    const Date date = random.date();
    ASSERT_EQ(parseTimestamp(timestampText(date)), date) << timestampText(date);
  }
  EXPECT_EQ(parseTimestamp("1678-01-01T00:00:00.000000000Z"), dateOf(1678, 1, 1, 0ns));
  EXPECT_EQ(parseTimestamp("2261-12-31T23:59:59.999999999Z"), dateOf(2262, 1, 1, -1ns));
}

TEST(ParseTimestamp, RefusesEveryOtherText) {
  constexpr const char* kTexts[] = {
      "",
      "2026-11-21",
      "2026-11-21T01:08:00Z",
      "2026-11-21T01:08:00.123456789",
      "2026-11-21T01:08:00.123456789z",
      "2026-11-21 01:08:00.123456789Z",
      "2026-11-21T01:08:00.12345678xZ",
      "2026-11-21T01:08:00,123456789Z",
      "2026-11-21T01:08:00.123456789Z ",
      "-026-11-21T01:08:00.123456789Z",
      "2026-00-21T01:08:00.123456789Z",
      "2026-13-21T01:08:00.123456789Z",
      "2026-11-00T01:08:00.123456789Z",
      "2026-11-31T01:08:00.123456789Z",
      "2025-02-29T01:08:00.123456789Z",
      "2026-11-21T24:08:00.123456789Z",
      "2026-11-21T01:60:00.123456789Z",
      "2026-11-21T01:08:60.123456789Z",
      "1677-12-31T23:59:59.999999999Z",
      "2262-01-01T00:00:00.000000000Z",
      "9999-11-21T01:08:00.123456789Z",
  };
  for (const char* text : kTexts) EXPECT_EQ(parseTimestamp(text), std::nullopt) << text;
}

TEST(DateNow, IsTheSystemsClock) {
  const auto before = std::chrono::system_clock::now();
  const Date now = dateNow();
  EXPECT_LE(before, now);
  EXPECT_LE(now, std::chrono::system_clock::now());
}

}  // namespace
}  // namespace quazor
