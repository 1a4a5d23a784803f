#include "backends/linux/system/node_number.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(NodeNumber, IsWhatFollowsTheKind) {
  EXPECT_EQ(nodeNumber("video0", "video"), 0U);
  EXPECT_EQ(nodeNumber("hidraw17", "hidraw"), 17U);
  EXPECT_EQ(nodeNumber("media4294967295", "media"), 4294967295U);
}

TEST(NodeNumber, IsMissingInOtherNames) {
  for (const char* name : {"", "video", "radio0", "v4l-subdev0", "video-1", "video1a", "video 1", "video4294967296"}) {
    EXPECT_FALSE(nodeNumber(name, "video")) << name;
  }
}

}  // namespace
}  // namespace quazor
