#include "diagnostics/report_channels/expected_telemon_names.h"

#include "diagnostics/report_channels/expectations_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <set>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

TEST(ExpectedTelemonNames, AreTheChannelsOfTheModuleInTheirOrder) {
  EXPECT_THAT(expectedTelemonNames(), testing::ElementsAreArray(moduleChannels()));
}

// FNV-1a of the names, each followed by a newline.
std::uint64_t digestOf(const std::vector<std::string_view>& names) {
  std::uint64_t digest = 0xCBF29CE484222325;
  const auto add = [&digest](char unit) { digest = (digest ^ static_cast<unsigned char>(unit)) * 0x100000001B3; };
  for (const std::string_view name : names) {
    for (const char unit : name) add(unit);
    add('\n');
  }
  return digest;
}

// Detects a mistake that was made in both the list and the healthy phone, because the digest is independent of them.
TEST(ExpectedTelemonNames, HaveTheDigestOfTheModulesNames) {
  EXPECT_EQ(digestOf(expectedTelemonNames()), 0x50B3B86CB83EA2A2U);
}

TEST(ExpectedTelemonNames, AreSixtyDifferentOnes) {
  const std::vector<std::string_view> names = expectedTelemonNames();
  EXPECT_EQ(names.size(), 60U);
  EXPECT_EQ(std::set<std::string_view>(names.begin(), names.end()).size(), 60U);
}

TEST(ExpectedTelemonNames, AreANewListOnEveryCall) {
  std::vector<std::string_view> names = expectedTelemonNames();
  names.clear();
  EXPECT_EQ(expectedTelemonNames().size(), 60U);
}

}  // namespace
}  // namespace quazor
