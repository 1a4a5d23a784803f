#include "base/text/letter_case.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(LetterCase, MakesEveryEnglishLetterSmall) {
  EXPECT_EQ(withSmallLetters("FALSE alarm @[AZaz`{"), "false alarm @[azaz`{");
  EXPECT_EQ(withSmallLetters(".JSON \xC3\x84"), ".json \xC3\x84");
  EXPECT_EQ(withSmallLetters(""), "");
}

TEST(LetterCase, CapitalizesOnlyTheBeginning) {
  EXPECT_EQ(capitalized("a clause of two Words"), "A clause of two Words");
  EXPECT_EQ(capitalized("z"), "Z");
  EXPECT_EQ(capitalized("Already"), "Already");
}

TEST(LetterCase, LeavesABeginningThatIsNoEnglishLetter) {
  EXPECT_EQ(capitalized("`a"), "`a");
  EXPECT_EQ(capitalized("{a"), "{a");
  EXPECT_EQ(capitalized("\xC3\xA4rger"), "\xC3\xA4rger");
  EXPECT_EQ(capitalized(""), "");
}

}  // namespace
}  // namespace quazor
