#include "base/text/name_list.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(NameList, JoinsAllNames) {
  EXPECT_EQ(listText({}), "");
  EXPECT_EQ(listText({"A"}), "A");
  EXPECT_EQ(listText({"A", "B", "C"}), "A, B, C");
}

TEST(NameList, CountsWhatItLeavesOut) {
  EXPECT_EQ(listText({"A", "B", "C"}, 3), "A, B, C");
  EXPECT_EQ(listText({"A", "B", "C"}, 2), "A, B and 1 more");
  EXPECT_EQ(listText({"A", "B", "C", "D"}, 1), "A and 3 more");
}

}  // namespace
}  // namespace quazor
