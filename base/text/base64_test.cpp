#include "base/text/base64.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

// Those of RFC 4648.
TEST(Base64, OfTheTestVectors) {
  constexpr std::string_view kVectors[][2] = {{"", ""},
                                              {"f", "Zg=="},
                                              {"fo", "Zm8="},
                                              {"foo", "Zm9v"},
                                              {"foob", "Zm9vYg=="},
                                              {"fooba", "Zm9vYmE="},
                                              {"foobar", "Zm9vYmFy"}};
  for (const auto& [bytes, text] : kVectors) EXPECT_EQ(base64(bytes), text);
}

TEST(Base64, OfBytesThatAreNoText) { EXPECT_EQ(base64(std::string_view("\xFF\xFE\0\xFB", 4)), "//4A+w=="); }

}  // namespace
}  // namespace quazor
