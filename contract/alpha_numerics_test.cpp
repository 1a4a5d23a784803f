#include "contract/alpha_numerics.h"

#include <gtest/gtest.h>
#include <unicode/uchar.h>

#include <cstdint>
#include <string>
#include <string_view>

namespace quazor {
namespace {

// Encodes a code point of up to 21 bits like UTF-8; the result is not always well-formed.
std::string encoded(char32_t codePoint) {
  const auto byte = [](char32_t bits) { return static_cast<char>(static_cast<unsigned char>(bits)); };
  const auto tail = [&](unsigned shift) { return byte(0x80U | ((codePoint >> shift) & 0x3FU)); };
  if (codePoint < 0x80) return {byte(codePoint)};
  if (codePoint < 0x800) return {byte(0xC0U | codePoint >> 6U), tail(0)};
  if (codePoint < 0x10000) return {byte(0xE0U | codePoint >> 12U), tail(6), tail(0)};
  return {byte(0xF0U | codePoint >> 18U), tail(12), tail(6), tail(0)};
}

TEST(AlphaNumericsTest, EveryCodePointIsJudgedAsIcuCategorisesIt) {
  constexpr std::uint32_t wanted = U_GC_L_MASK | U_GC_M_MASK | U_GC_N_MASK;
  int alphaNumeric = 0;
  for (char32_t codePoint = 0; codePoint <= 0x10FFFF; ++codePoint) {
    const auto category = U_MASK(static_cast<std::uint32_t>(u_charType(static_cast<UChar32>(codePoint))));
    const bool expected = (category & wanted) != 0;
    ASSERT_EQ(isAlphaNumeric(encoded(codePoint)), expected) << "U+" << std::hex << static_cast<unsigned>(codePoint);
    alphaNumeric += expected ? 1 : 0;
  }
  EXPECT_GT(alphaNumeric, 130'000);  // rules out a comparison without letters
}

TEST(AlphaNumericsTest, TextsAreJudgedByEveryCharacterInThem) {
  const struct {
    const char* name;
    std::string_view text;
    bool expected;
  } kRows[] = {
      {"an empty text", "", true},
      {"letters and digits", "abcXYZ0189", true},
      {"a space between letters", "a b", false},
      {"a hyphen between letters", "a-b", false},
      {"an underscore", "a_b", false},
      {"a space at the end", "ab ", false},
      {"a space at the start", " ab", false},
      {"a null character", std::string_view("a\0b", 3), false},
      {"Greek, Cyrillic and Han letters", "\u03B1\u0416\u6F22", true},
      {"a combining mark", "e\u0301", true},
      {"Devanagari digits", "\u0966\u096F", true},
      {"a Roman numeral and a vulgar fraction", "\u2167\u00BD", true},
      {"a letter of four bytes", "\U00020000", true},
      {"an emoji", "a\U0001F600", false},
      {"the no-break space", "a\u00A0b", false},
      {"a currency sign", "\u20AC", false},
      {"a private-use character", "\uE000", false},
      {"a character that is not assigned", "\u0378", false},
  };
  for (const auto& row : kRows) EXPECT_EQ(isAlphaNumeric(row.text), row.expected) << row.name;
}

TEST(AlphaNumericsTest, TextThatIsNotWellFormedIsRefused) {
  const struct {
    const char* name;
    std::string_view text;
  } kRows[] = {
      {"a continuation byte alone", "\x80"},
      {"the last continuation byte alone", "\xBF"},
      {"a two-byte character without its end", "\xC3"},
      {"a three-byte character without its end", "\xE6\xBC"},
      {"a four-byte character without its end", "\xF0\xA0\x80"},
      {"a letter where a continuation byte must stand",
       "\xC3"
       "a"},
      {"a lead byte where a continuation byte must stand", "\xE6\xBC\xE6"},
      {"a capital A spread over two bytes", "\xC1\x81"},
      {"a capital A spread over three bytes", "\xE0\x81\x81"},
      {"a capital A spread over four bytes", "\xF0\x80\x81\x81"},
      {"a two-byte letter spread over three bytes", "\xE0\x83\x80"},
      {"a three-byte letter spread over four bytes", "\xF0\x84\xB8\x80"},
      {"the first surrogate", "\xED\xA0\x80"},
      {"the last surrogate", "\xED\xBF\xBF"},
      {"the first number beyond the last code point", "\xF4\x90\x80\x80"},
      {"a lead byte of five", "\xF8\x88\x80\x80\x80"},
      {"a byte that UTF-8 never uses", "\xFF"},
      {"a broken character behind good ones", "abc\xE6\xBC"},
      {"a broken character before good ones",
       "\xE6\xBC"
       "abc"},
  };
  for (const auto& row : kRows) EXPECT_FALSE(isAlphaNumeric(row.text)) << row.name;
}

}  // namespace
}  // namespace quazor
