// The media controllers of a binding.
#include "backends/linux/binding/binding_for_tests.h"
#include "backends/linux/binding/media_bus_codes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <linux/media-bus-format.h>

#include <string>

namespace quazor {
namespace {

using ::testing::ElementsAre;

using BindingMediaTest = BindingTest;

std::string withMedia(const std::string& entries) {
  return withCamera("\"media\": {\"device\": {\"model\": \"m\"}, " + entries + "}");
}
std::string withLink(const std::string& entries) { return withMedia("\"links\": [{" + entries + "}]"); }
std::string withPad(const std::string& entries) { return withMedia("\"pads\": [{" + entries + "}]"); }

TEST_F(BindingMediaTest, ReadsAllThereIsToSay) {
  const Binding binding = read(withCamera(R"("controls": {"a sensor with a long name 4-0010:Exposure": 5},
    "media": {
      "device": {"driver": "dr", "model": "mo", "busInfo": "bu"},
      "links": [{"source": "A:0", "sink": "B: C:12"}, {"source": "A:0", "sink": "D:1", "enabled": false}],
      "pads": [{"pad": "A:0", "format": "SBGGR8_1X8", "size": {"width": 640, "height": 480},
                "crop": {"left": 1, "top": 0, "width": 3, "height": 4}, "interval": {"numerator": 1, "denominator": 30}},
               {"pad": "B: C:1", "format": "0xABCD", "size": {"width": 1, "height": 2}}],
      "subdevices": ["flash 1-0063", "lens"]
    })"));
  ASSERT_EQ(binding.cameras.size(), 1U);
  const CameraBinding& camera = binding.cameras[0];
  EXPECT_EQ(camera.controls.at(0).control, "a sensor with a long name 4-0010:Exposure");
  ASSERT_TRUE(camera.media);
  EXPECT_EQ(camera.media->device, (MediaDeviceMatch{"dr", "mo", "bu"}));
  EXPECT_THAT(camera.media->links,
              ElementsAre(LinkBinding{{"A", 0}, {"B: C", 12}, true}, LinkBinding{{"A", 0}, {"D", 1}, false}));
  ASSERT_EQ(camera.media->pads.size(), 2U);
  EXPECT_EQ(camera.media->pads[0].pad, (PadName{"A", 0}));
  EXPECT_EQ(camera.media->pads[0].format, (PadFormat{MEDIA_BUS_FMT_SBGGR8_1X8, 640, 480}));
  EXPECT_EQ(camera.media->pads[0].crop, (FrameArea{1, 0, 3, 4}));
  EXPECT_EQ(camera.media->pads[0].interval, (FrameInterval{1, 30}));
  EXPECT_EQ(camera.media->pads[1].format, (PadFormat{0xABCD, 1, 2}));
  EXPECT_EQ(camera.media->pads[1].crop, std::nullopt);
  EXPECT_THAT(camera.media->subdevices, ElementsAre("flash 1-0063", "lens"));
}

TEST_F(BindingMediaTest, ANodeCanBeNamed) {
  const Binding binding = read(R"({"title": "t", "cameras": {"BackFacingCamera":
              {"node": {"name": "RGB/YUV Capture"}, "size": {"width": 4, "height": 2}}}})");
  EXPECT_EQ(binding.cameras[0].node.name, "RGB/YUV Capture");
  EXPECT_FALSE(binding.cameras[0].media);
}

TEST_F(BindingMediaTest, RefusesWhatNoMediaControllerHas) {
  const std::string media = "cameras.BackFacingCamera.media";
  const Refused rows[] = {
      {"no device", withCamera(R"("media": {})"), "F:3: " + media + ": the key \"device\" is missing."},
      {"a number", withCamera(R"("media": {"device": {}})"),
       "F:3: " + media +
           ".device: give at least one of \"driver\", \"model\" and \"busInfo\"; 'quazor phone probe' shows them. The "
           "number of a media device changes from boot to boot."},
      {"a long driver", withCamera(R"("media": {"device": {"driver": "0123456789abcdef"}})"),
       "F:3: " + media +
           ".device.driver: a driver reports at most 15 characters here, and this has 16; 'quazor phone probe' shows "
           "the reported text."},
      {"a link without a pad", withLink(R"("source": "A", "sink": "B:0")"),
       "F:3: " + media + ".links[0].source: must be an entity and the number of its pad, such as \"imx219 4-0010:0\"."},
      {"a pad without an entity", withLink(R"("source": "A:0", "sink": ":0")"),
       "F:3: " + media + ".links[0].sink: must be an entity and the number of its pad, such as \"imx219 4-0010:0\"."},
      {"a pad that is no number", withLink(R"("source": "A:0", "sink": "B:0x")"),
       "F:3: " + media + ".links[0].sink: must be an entity and the number of its pad, such as \"imx219 4-0010:0\"."},
      {"a link twice", withMedia(R"("links": [{"source": "A:0", "sink": "B:0"},
        {"source": "A:0", "sink": "B:0", "enabled": false}])"),
       "F:4: " + media + ".links[1]: the link is listed twice; remove one."},
      {"a format without its size", withPad(R"("pad": "A:0", "format": "Y8_1X8")"),
       "F:3: " + media + ".pads[0]: the key \"size\" is missing."},
      {"a size without its format", withPad(R"("pad": "A:0", "size": {"width": 1, "height": 1})"),
       "F:3: " + media + ".pads[0]: the key \"format\" is missing."},
      {"an unknown format", withPad(R"("pad": "A:0", "format": "YUYV", "size": {"width": 1, "height": 1})"),
       "F:3: " + media +
           ".pads[0].format: must be the name of a media bus format of Linux, such as \"SRGGB10_1X10\", or its "
           "number, such as \"0x300F\"."},
      {"a pad without settings", withPad(R"("pad": "A:0")"),
       "F:3: " + media + ".pads[0]: give \"format\" and \"size\", \"crop\" or \"interval\" of the pad, or remove it."},
      {"an empty area", withPad(R"("pad": "A:0", "crop": {"left": 0, "top": 0, "width": 0, "height": 1})"),
       "F:3: " + media + ".pads[0].crop.width: must be an integer from 1 to 65536, not 0."},
      {"a sub-device twice", withMedia(R"("subdevices": ["a", "a"])"),
       "F:3: " + media + ".subdevices[1]: the sub-device is listed twice; remove one."},
      {"a long control", withCamera(R"("controls": {"entity:01234567890123456789012345678901": 1})"),
       "F:3: cameras.BackFacingCamera.controls.entity:01234567890123456789012345678901: "
       "\"entity:01234567890123456789012345678901\" is not a valid control name; names have at most 31 characters."},
  };
  for (const Refused& row : rows) EXPECT_EQ(problemOf(row.text), row.problem) << row.what;
}

TEST_F(BindingMediaTest, RefusesALinkThatTwoCamerasSetDifferently) {
  const auto withCameras = [](const std::string& model, const std::string& enabled) {
    const auto camera = [](const std::string& card, const std::string& device, const std::string& entries) {
      return R"({"node": {"card": ")" + card + R"("}, "size": {"width": 4, "height": 2},
                 "media": {"device": {"model": ")" +
             device + R"("}, "links": [{"source": "A:0", "sink": "B:0")" + entries + "}]}}";
    };
    return "{\"title\": \"t\", \"cameras\": {\"BackFacingCamera\": " + camera("a", "m", "") +
           ", \"FrontFacingCamera\": " + camera("b", model, enabled) + "}}";
  };
  EXPECT_THAT(
      problemOf(withCameras("m", ", \"enabled\": false")),
      ::testing::EndsWith("cameras.FrontFacingCamera.media.links[0]: \"BackFacingCamera\" enables this link; both "
                          "cameras could not be used together. Set it alike, or use two bindings."));
  EXPECT_EQ(problemOf(withCameras("m", "")), "nothing");
  EXPECT_EQ(problemOf(withCameras("n", ", \"enabled\": false")), "nothing");
}

TEST(MediaBusCodesTest, ACodeHasItsNameOrItsNumber) {
  EXPECT_EQ(mediaBusCodeOf("RGB888_1X24"), MEDIA_BUS_FMT_RGB888_1X24);
  EXPECT_EQ(mediaBusCodeOf("0x100A"), MEDIA_BUS_FMT_RGB888_1X24);
  EXPECT_EQ(mediaBusCodeOf("0x"), std::nullopt);
  EXPECT_EQ(mediaBusCodeOf("0x0"), std::nullopt);
  EXPECT_EQ(mediaBusCodeOf("0x1g"), std::nullopt);
  EXPECT_EQ(mediaBusCodeOf("0x123456789"), std::nullopt);
  EXPECT_EQ(mediaBusCodeOf(""), std::nullopt);
  EXPECT_EQ(mediaBusCodeText(MEDIA_BUS_FMT_SBGGR8_1X8), "SBGGR8_1X8");
  EXPECT_EQ(mediaBusCodeText(0xabcd), "0xABCD");
}

}  // namespace
}  // namespace quazor
