#include "backends/linux/capture/camera_metadata.h"

#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>

namespace quazor {
namespace {

TEST(CameraMetadataTest, AFieldIsLittleEndianShiftedAndMasked) {
  const std::vector<std::uint8_t> buffer{0x10, 0x32, 0x54, 0x76, 0x98, 0xba, 0xdc, 0xfe};
  const struct {
    const char* name;
    MetadataField field;
    std::optional<std::uint64_t> want;
  } rows[] = {
      {"a byte", {"", 1, 1, 0, {}}, 0x32},
      {"two bytes", {"", 1, 2, 0, {}}, 0x5432},
      {"all eight", {"", 0, 8, 0, {}}, 0xfedcba9876543210},
      {"shifted", {"", 1, 2, 4, {}}, 0x543},
      {"shifted, then masked", {"", 1, 2, 4, 0xf}, 0x3},
      {"shifted out", {"", 0, 8, 64, {}}, 0},
      {"the last byte", {"", 7, 1, 0, {}}, 0xfe},
      {"beyond the end", {"", 7, 2, 0, {}}, std::nullopt},
      {"far beyond the end", {"", 0xffffffff, 8, 0, {}}, std::nullopt},
  };
  for (const auto& row : rows) EXPECT_EQ(fieldIn(buffer, row.field), row.want) << row.name;
}

class CameraMetadataNodeTest : public testing::Test {
 protected:
  CameraMetadataNodeTest() {
    FakeNode camera = fakeCamera("fake:0");
    camera.controls = {{V4L2_CID_BRIGHTNESS, "Brightness", 0, 255, 12}};
    path_ = kernel_->add(0, std::move(camera));
    node_ = V4l2Device::open(kernel_, path_, nullptr);
    binding_.constants = Dictionary{{"A", 1}, {"B", 2}, {"C", 3}};
    binding_.fields = {{"B", 0, 1, 0, {}}, {"D", 1, 1, 0, {}}};
    binding_.controls = {{"D", "Brightness"}};
  }

  std::string made(const CapturedFrame& frame, bool wantComplete) {
    bool complete = !wantComplete;
    const auto metadata = CameraMetadata::make(binding_, CameraControls(node_), nullptr);
    const std::string text = defaultText(metadata->dictionaryOf(frame, &complete));
    EXPECT_EQ(complete, wantComplete);
    return text;
  }

  std::shared_ptr<FakeV4l2Api> kernel_ = std::make_shared<FakeV4l2Api>();
  std::string path_;
  std::shared_ptr<V4l2Device> node_;
  MetadataBinding binding_;
};

TEST_F(CameraMetadataNodeTest, TheLaterOfConstantsFieldsAndControlsHolds) {
  CapturedFrame frame;
  frame.paired = {20, 30};
  frame.controls = CameraMetadata::make(binding_, CameraControls(node_), nullptr)->readControls();
  EXPECT_EQ(made(frame, true), "{A = 1; B = 20; C = 3; D = 12}");
}

TEST_F(CameraMetadataNodeTest, WhatDidNotComeIsLeftOutEvenWhereAConstantHasTheKey) {
  CapturedFrame frame;
  frame.controls = Dictionary{{"D", 12}};
  EXPECT_EQ(made(frame, false), "{A = 1; C = 3; D = 12}") << "no buffer";
  frame.paired = {20};
  EXPECT_EQ(made(frame, false), "{A = 1; B = 20; C = 3; D = 12}") << "a short buffer";
  frame.paired = {20, 30};
  kernel_->failNext(path_, VIDIOC_G_EXT_CTRLS, EIO);
  frame.controls = CameraMetadata::make(binding_, CameraControls(node_), nullptr)->readControls();
  EXPECT_EQ(made(frame, false), "{A = 1; B = 20; C = 3}") << "a control that could not be read";
}

TEST_F(CameraMetadataNodeTest, AControlThatTheCameraDoesNotHaveIsRefused) {
  binding_.controls = {{"D", "Darkness"}};
  EXPECT_EQ(outcome([&](auto* error) { return CameraMetadata::make(binding_, CameraControls(node_), error); }),
            "5 " + path_ + " has no control \"Darkness\".");
}

}  // namespace
}  // namespace quazor
