#include "base/text/utf8.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(FirstUtf8Sequence, IsACharacterOrAsMuchAsOneCouldHaveBegunWith) {
  struct Row {
    const char* name;
    std::string_view text;
    std::size_t length;
    bool wellFormed;
  };
  constexpr Row kRows[] = {
      {"a letter", "ab", 1, true},
      {"zero", std::string_view("\0a", 2), 1, true},
      {"two bytes, the first", "\xC2\x80z", 2, true},
      {"two bytes, the last", "\xDF\xBFz", 2, true},
      {"three bytes, the first", "\xE0\xA0\x80z", 3, true},
      {"before the surrogates", "\xED\x9F\xBFz", 3, true},
      {"behind the surrogates", "\xEE\x80\x80z", 3, true},
      {"four bytes, the first", "\xF0\x90\x80\x80z", 4, true},
      {"the last of all", "\xF4\x8F\xBF\xBFz", 4, true},
      {"a byte that continues", "\x80\x80", 1, false},
      {"overlong, two bytes", "\xC1\xBF", 1, false},
      {"overlong, three bytes", "\xE0\x9F\xBF", 1, false},
      {"overlong, four bytes", "\xF0\x8F\xBF\xBF", 1, false},
      {"a surrogate", "\xED\xA0\x80", 1, false},
      {"beyond the last", "\xF4\x90\x80\x80", 1, false},
      {"no lead byte", "\xF5\x80\x80\x80", 1, false},
      {"cut off by the end", "\xF0\x9F\x93", 3, false},
      {"cut off by another character", "\xE2\x82\xC3\xA9", 2, false},
  };
  for (const Row& row : kRows) {
    const Utf8Sequence sequence = firstUtf8Sequence(row.text);
    EXPECT_EQ(sequence.length, row.length) << row.name;
    EXPECT_EQ(sequence.wellFormed, row.wellFormed) << row.name;
  }
}

TEST(FindInvalidUtf8, IsWhereTheFirstCharacterIsNotWellFormed) {
  EXPECT_EQ(findInvalidUtf8(""), std::nullopt);
  EXPECT_EQ(findInvalidUtf8("a\xC2\x80\xF0\x9F\x93\xB7z"), std::nullopt);
  EXPECT_EQ(findInvalidUtf8("\xFFz"), 0U);
  EXPECT_EQ(findInvalidUtf8("a\xC2\x80\x80z"), 3U);
  EXPECT_EQ(findInvalidUtf8("ab\xE2\x82"), 2U);
}

TEST(ContinuesUtf8, IsTrueOfAllButTheFirstByte) {
  const std::string_view text = "a\xC3\xA9\xF0\x9F\x93\xB7";
  const bool kExpected[] = {false, false, true, false, true, true, true};
  for (std::size_t i = 0; i < text.size(); ++i) EXPECT_EQ(continuesUtf8(text[i]), kExpected[i]) << i;
}

}  // namespace
}  // namespace quazor
