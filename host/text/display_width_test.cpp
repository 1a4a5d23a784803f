#include "host/text/display_width.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(WidthOf, CountsColumns) {
  struct Row {
    const char* name;
    std::string text;
    std::size_t width;
  };
  const Row rows[] = {
      {"nothing", "", 0},
      {"ASCII", "plain", 5},
      {"accented letters", "\u00E9t\u00E9", 3},
      {"a combining accent", "e\u0301t", 2},
      {"wide characters", "\u6D4B\u8BD5", 4},
      {"full-width letters", "\uFF21\uFF22", 4},
      {"a half-width katakana letter", "\uFF76", 1},
      {"a hangul syllable", "\uD55C", 2},
      {"the same syllable in parts", "\u1112\u1161\u11AB", 2},
      {"a picture", "\U0001F4F7", 2},
      {"characters beyond the basic plane", "\U00020000\U0001D400", 3},
      {"a joiner, which is invisible", "a\u200Db", 2},
      {"block elements", "\u2581\u2588", 2},
      {"colours", "\033[31mred\033[0m", 3},
      {"bytes that are not UTF-8", "a\xFF\xC3", 3},
      {"an escape that is no colour", "\033[2J", 4},
  };
  for (const Row& row : rows) EXPECT_EQ(widthOf(row.text), row.width) << row.name;
}

TEST(PrefixOfWidth, KeepsMarksAndDoesNotSplitCharacters) {
  EXPECT_EQ(prefixOfWidth("abc", 2), "ab");
  EXPECT_EQ(prefixOfWidth("abc", 9), "abc");
  EXPECT_EQ(prefixOfWidth("a\u6D4Bb", 2), "a");
  EXPECT_EQ(prefixOfWidth("e\u0301x", 1), "e\u0301");
  EXPECT_EQ(prefixOfWidth("abc", 0), "");
}

TEST(Shortened, EndsWithAnEllipsisIfItMust) {
  EXPECT_EQ(shortened("camera", 6), "camera");
  EXPECT_EQ(shortened("camera", 5), "ca...");
  EXPECT_EQ(shortened("\u6D4B\u8BD5\u6D4B", 5), "\u6D4B...");
  EXPECT_EQ(shortened("camera", 3), "cam");
  EXPECT_EQ(shortened("camera", 0), "");
}

}  // namespace
}  // namespace quazor
