#include "host/text/parameter_number.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>

namespace quazor {
namespace {

TEST(ParseNumber, KeepsTheKindOfTheNumber) {
  struct Row {
    const char* text;
    Value value;
  };
  const Row rows[] = {
      {"0", 0},
      {"-0", 0},
      {"3", 3},
      {"-7", -7},
      {"007", 7},
      {"9223372036854775807", std::numeric_limits<std::int64_t>::max()},
      {"-9223372036854775808", std::numeric_limits<std::int64_t>::min()},
      {"9223372036854775808", std::uint64_t{1} << 63U},
      {"18446744073709551615", std::numeric_limits<std::uint64_t>::max()},
      {"18446744073709551616", 18446744073709551616.0},
      {"-9223372036854775809", -9223372036854775809.0},
      {"3.0", 3.0},
      {"2.5", 2.5},
      {"-.5", -0.5},
      {"5.", 5.0},
      {"1e3", 1000.0},
      {"1E-3", 0.001},
      {"1.7976931348623157e308", std::numeric_limits<double>::max()},
      {"5e-324", std::numeric_limits<double>::denorm_min()},
  };
  for (const Row& row : rows) {
    EXPECT_EQ(parseNumber(row.text), row.value) << row.text;
  }
}

TEST(ParseNumber, RefusesWhatIsNoFiniteNumber) {
  constexpr RefusedText kRows[] = {
      {"", "a number is missing"},
      {" ", "' ' is not a number"},
      {"abc", "'abc' is not a number"},
      {"3x", "'3x' is not a number"},
      {"3 ", "'3 ' is not a number"},
      {" 3", "' 3' is not a number"},
      {"3,5", "'3,5' is not a number"},
      {"1.2.3", "'1.2.3' is not a number"},
      {"0x10", "'0x10' is not a number"},
      {"+3", "'+3' is not a number"},
      {"--3", "'--3' is not a number"},
      {"-", "'-' is not a number"},
      {".", "'.' is not a number"},
      {"e5", "'e5' is not a number"},
      {"true", "'true' is not a number"},
      {"nan", "'nan' is not a finite number"},
      {"-nan", "'-nan' is not a finite number"},
      {"inf", "'inf' is not a finite number"},
      {"-inf", "'-inf' is not a finite number"},
      {"INFINITY", "'INFINITY' is not a finite number"},
      {"1e999", "'1e999' is outside the range of numbers"},
      {"-1e999", "'-1e999' is outside the range of numbers"},
      {"1e-999", "'1e-999' is outside the range of numbers"},
      {"1e999x", "'1e999x' is not a number"},
  };
  for (const auto& row : kRows) {
    EXPECT_THAT([&] { static_cast<void>(parseNumber(row.text)); }, testing::ThrowsMessage<InputError>(row.problem));
  }
}

}  // namespace
}  // namespace quazor
