#include "base/text/hexadecimal.h"

#include "base/text/input_error.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

namespace quazor {
namespace {

TEST(Hexadecimal, HasTwoLowercaseDigitsAByte) {
  EXPECT_EQ(hexadecimal(""), "");
  EXPECT_EQ(hexadecimal(std::string_view("\0\x0F\xf0\xAb", 4)), "000ff0ab");
  EXPECT_EQ(hexadecimal(std::vector<std::uint8_t>{0, 0x9A, 0xFF}), "009aff");
}

TEST(ParseHexadecimal, ReadsWhatHexadecimalWrote) {
  std::string bytes;
  for (int byte = 0; byte < 256; ++byte) bytes += static_cast<char>(byte);
  EXPECT_EQ(parseHexadecimal(hexadecimal(bytes)), bytes);
}

TEST(ParseHexadecimal, RefusesEverythingElse) {
  const RefusedText kRows[] = {{"0", "odd number of hexadecimal digits"}, {"abc", "odd number of hexadecimal digits"},
                               {"0G", "invalid hexadecimal digit"},       {"g0", "invalid hexadecimal digit"},
                               {"A0", "invalid hexadecimal digit"},       {" 0", "invalid hexadecimal digit"}};
  for (const auto& row : kRows) {
    EXPECT_THAT([&] { static_cast<void>(parseHexadecimal(row.text)); }, testing::ThrowsMessage<InputError>(row.problem))
        << row.text;
  }
}

TEST(HexadecimalNumber, HasAtLeastSoManyUppercaseDigits) {
  EXPECT_EQ(hexadecimalNumber(0xAC, 2), "0xAC");
  EXPECT_EQ(hexadecimalNumber(0xAC, 4), "0x00AC");
  EXPECT_EQ(hexadecimalNumber(0x12345, 4), "0x12345");
  EXPECT_EQ(hexadecimalNumber(0, 1), "0x0");
  EXPECT_EQ(hexadecimalNumber(UINT64_MAX, 2), "0xFFFFFFFFFFFFFFFF");
}

}  // namespace
}  // namespace quazor
