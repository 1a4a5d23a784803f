#include "host/report/page/number_column.h"

#include <cstdint>
#include <vector>

#include <gtest/gtest.h>

namespace quazor {
namespace {

std::string columnOf(const std::vector<std::int64_t>& numbers) { return numberColumn(numbers); }

// Expected texts are `printf '\xNN...' | base64`.
TEST(NumberColumn, HasTheUsualDifferenceFirst) {
  EXPECT_EQ(columnOf({}), "AA==");                   // 0
  EXPECT_EQ(columnOf({5}), "AAo=");                  // 0, 10
  EXPECT_EQ(columnOf({5, 15, 25, 36}), "FAkAAAI=");  // 20; 5 - 10 is -5 and so 9; 0, 0; 1 is 2
}

TEST(NumberColumn, WritesGroupsOfSevenBits) {
  EXPECT_EQ(columnOf({64}), "AIAB");                                 // 128 is 0x80, 0x01
  EXPECT_EQ(columnOf({-64}), "AH8=");                                // 127
  EXPECT_EQ(columnOf({std::int64_t{1} << 61}), "AICAgICAgICAQA==");  // 2^62: eight groups of nothing and 0x40
}

}  // namespace
}  // namespace quazor
