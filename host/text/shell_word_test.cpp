#include "host/text/shell_word.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(ShellWord, QuotesOnlyWhatTheShellWouldReadOtherwise) {
  EXPECT_EQ(shellWord("BackTele.Total"), "BackTele.Total");
  EXPECT_EQ(shellWord("Domain:206"), "Domain:206");
  EXPECT_EQ(shellWord("I2C Errors"), "'I2C Errors'");
  EXPECT_EQ(shellWord("it's"), R"('it'\''s')");
  EXPECT_EQ(shellWord("$(x)"), "'$(x)'");
  EXPECT_EQ(shellWord(""), "''");
}

}  // namespace
}  // namespace quazor
