#include "diagnostics/camera_sync/camera_names.h"

#include "platform/capture_keys.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(CameraNames, EveryPortTypeHasItsName) {
  EXPECT_EQ(cameraNameForPortType(port_type::BackFacingCamera), "BackWide");
  EXPECT_EQ(cameraNameForPortType(port_type::FrontFacingCamera), "Front");
  EXPECT_EQ(cameraNameForPortType(port_type::BackFacingTelephotoCamera), "BackTele");
  EXPECT_EQ(cameraNameForPortType(port_type::FrontFacingInfraredCamera), "FrontInfrared");
  EXPECT_EQ(cameraNameForPortType(port_type::BackFacingSuperWideCamera), "BackSuperWide");
}

TEST(CameraNames, AnyOtherPortTypeHasNone) {
  for (const std::string_view stranger :
       {"", "BackFacing", "BackFacingCamera2", "backFacingCamera", " BackFacingCamera", "SideFacingCamera"}) {
    EXPECT_EQ(cameraNameForPortType(stranger), std::nullopt) << stranger;
  }
}

TEST(CameraNames, AKeyJoinsCameraAndQuantityWithOnePoint) {
  EXPECT_EQ(cameraKey("BackWide", kFrameOffsetQuantity), "BackWide.FrameOffset");
  EXPECT_EQ(cameraKey("BackWide", kFramesQuantity), "BackWide.Frames");
  EXPECT_EQ(cameraKey("FrontInfrared", kTotalQuantity), "FrontInfrared.Total");
}

}  // namespace
}  // namespace quazor
