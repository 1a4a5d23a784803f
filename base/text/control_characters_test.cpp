#include "base/text/control_characters.h"

#include <gtest/gtest.h>

#include <string>

namespace quazor {
namespace {

TEST(ControlCharacters, AreThoseThatTerminalsInterpret) {
  for (unsigned point = 0; point < 0x100; ++point) {
    const char low = static_cast<char>(point);
    const char second = static_cast<char>(0x80U | (point & 0x3FU));
    const std::string character =
        point < 0x80 ? std::string(1, low) : std::string(point < 0xC0 ? "\xC2" : "\xC3") + second;
    const bool expected = point < 0x20 || (point >= 0x7F && point < 0xA0);
    EXPECT_EQ(isControlCharacter(character), expected) << point;
    EXPECT_EQ(hasControlCharacter("a" + character + "b"), expected) << point;
  }
}

TEST(ControlCharacters, AreNoPartsOfOtherCharactersAndNoSingleBytes) {
  for (const char* text : {"", "\xE2\x82\x80", "\xC3\x80", "\x80", "\x9B", "\xC2", "a\xC2z"}) {
    EXPECT_FALSE(hasControlCharacter(text)) << text;
  }
}

TEST(ControlCharacters, AreFoundAfterWhatIsNoUtf8) { EXPECT_TRUE(hasControlCharacter("\xC2\xC2\x9B")); }

}  // namespace
}  // namespace quazor
