#include "diagnostics/report_channels/expected_telemon_names.h"

#include "diagnostics/report_channels/expectations_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

TEST(ExpectedTelemonNames, AreTheChannelsOfTheModuleInTheirOrder) {
  EXPECT_THAT(expectedTelemonNames(), testing::ElementsAreArray(kModuleChannels));
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
