#include "host/system/identity.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <set>
#include <string>

namespace quazor {
namespace {

TEST(RandomIdentifier, IsNeverTheSame) {
  std::set<std::string> seen;
  for (int i = 0; i < 1000; ++i) {
    const std::string one = randomIdentifier();
    EXPECT_EQ(one.size(), 32U);
    EXPECT_EQ(one.find_first_not_of("0123456789abcdef"), std::string::npos) << one;
    seen.insert(one);
  }
  EXPECT_EQ(seen.size(), 1000U);
}

TEST(NameOfThisMachine, IsThatOfTheKernel) {
  std::ifstream file("/proc/sys/kernel/hostname");
  std::string name;
  std::getline(file, name);
  EXPECT_EQ(nameOfThisMachine(), name);
}

}  // namespace
}  // namespace quazor
