// A fake board: two sensors, a converter and a scaler between them and a video node, and a flash.
#pragma once

#include "backends/linux/binding/binding.h"
#include "tests/support/fake_v4l2_api.h"

#include <linux/media-bus-format.h>

#include <cstdint>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// The entities of the board by their places.
namespace board {
inline constexpr std::uint32_t kSensorA = 0;
inline constexpr std::uint32_t kSensorB = 1;
inline constexpr std::uint32_t kConverter = 2;
inline constexpr std::uint32_t kScaler = 3;
inline constexpr std::uint32_t kCamera = 4;
inline constexpr std::uint32_t kFlash = 5;
}  // namespace board

// Sensor A is linked to the converter by default, sensor B is not. The formats of the pads do not fit together until
// they are set.
class FakeBoard {
 public:
  explicit FakeBoard(std::shared_ptr<FakeV4l2Api> used = std::make_shared<FakeV4l2Api>()) : kernel(std::move(used)) {
    FakeNode node = fakeCamera("platform:fake-isp");
    node.hasIntervals = false;
    node.formats.erase(node.formats.begin());
    node.formats[0].busCode = MEDIA_BUS_FMT_Y8_1X8;
    node.formats.push_back(
        {fakeCode('R', 'G', 'B', '3'), "24-bit RGB", node.formats[0].sizes, MEDIA_BUS_FMT_RGB888_1X24});
    camera = kernel->add(0, node);
    for (const char* name : {"A", "B"}) sensors.push_back(kernel->addSubdevice(name[0] - 'A', sensor(name)));
    FakeNode lamp;
    lamp.controls = {{V4L2_CID_FLASH_LED_MODE, "LED Mode", 0, 2, 2},
                     {V4L2_CID_FLASH_TORCH_INTENSITY, "Intensity, Torch Mode", 0, 100, 5}};
    flash = kernel->addSubdevice(4, lamp);
    FakeMedia topology;
    const auto pad = [](bool isSource, std::uint32_t code) { return FakePad{isSource, {code, 640, 480}, {code}}; };
    const FakePad raw{
        true, {MEDIA_BUS_FMT_RGB888_1X24, 640, 480}, {MEDIA_BUS_FMT_RGB888_1X24, MEDIA_BUS_FMT_SBGGR8_1X8}};
    FakeEntity converter{"Converter",
                         MEDIA_ENT_F_PROC_VIDEO_PIXEL_ENC_CONV,
                         kernel->addSubdevice(2, {}),
                         {pad(false, MEDIA_BUS_FMT_SBGGR8_1X8), pad(true, MEDIA_BUS_FMT_Y8_1X8)}};
    converter.outputCode = MEDIA_BUS_FMT_Y8_1X8;
    FakeEntity scaler{"Scaler",
                      MEDIA_ENT_F_PROC_VIDEO_SCALER,
                      kernel->addSubdevice(3, {}),
                      {pad(false, MEDIA_BUS_FMT_Y8_1X8), pad(true, MEDIA_BUS_FMT_Y8_1X8)}};
    scaler.scales = true;
    topology.entities = {{"Sensor A", MEDIA_ENT_F_CAM_SENSOR, sensors[0], {raw}},
                         {"Sensor B", MEDIA_ENT_F_CAM_SENSOR, sensors[1], {raw}},
                         converter,
                         scaler,
                         {"Camera", MEDIA_ENT_F_IO_V4L, camera, {pad(false, 0)}},
                         {"Flash", MEDIA_ENT_F_FLASH, flash, {}}};
    for (FakeEntity& entity : topology.entities) entity.hasIntervals = entity.function == MEDIA_ENT_F_CAM_SENSOR;
    constexpr std::uint32_t kOn = MEDIA_LNK_FL_ENABLED;
    topology.links = {{board::kSensorA, 0, board::kConverter, 0, kOn},
                      {board::kSensorB, 0, board::kConverter, 0, 0},
                      {board::kConverter, 1, board::kScaler, 0, 0},
                      {board::kScaler, 1, board::kCamera, 0, kOn | MEDIA_LNK_FL_IMMUTABLE}};
    media = kernel->addMedia(0, topology);
  }

  // The camera with sensor B, 640 x 360 at 30 frames a second.
  static CameraBinding binding() {
    CameraBinding camera;
    camera.port = "BackFacingCamera";
    camera.node.name = "fake camera node";
    camera.width = 640;
    camera.height = 360;
    camera.formats = {{0, "GREY", 640, 360, FrameInterval{1, 30}}};
    camera.media = MediaBinding();
    camera.media->device.model = "Fake ISP";
    camera.media->links = {{{"Sensor A", 0}, {"Converter", 0}, false},
                           {{"Sensor B", 0}, {"Converter", 0}, true},
                           {{"Converter", 1}, {"Scaler", 0}, true},
                           {{"Scaler", 1}, {"Camera", 0}, true}};
    const PadFormat rawFormat{MEDIA_BUS_FMT_SBGGR8_1X8, 1280, 720};
    const PadFormat greyFormat{MEDIA_BUS_FMT_Y8_1X8, 1280, 720};
    camera.media->pads = {
        {{"Sensor B", 0}, rawFormat, {}, FrameInterval{1, 30}},
        {{"Converter", 0}, rawFormat, {}, {}},
        {{"Scaler", 0}, greyFormat, FrameArea{8, 4, 1264, 712}, {}},
        {{"Scaler", 1}, PadFormat{MEDIA_BUS_FMT_Y8_1X8, 640, 360}, {}, {}},
    };
    return camera;
  }

  std::vector<FakeLink> links() const {
    return kernel->with(media, [](const FakeNode& node) { return node.media->links; });
  }
  PadFormat format(std::uint32_t entity, std::uint32_t pad) const {
    return kernel->with(media, [&](const FakeNode& node) { return node.media->entities[entity].pads[pad].format; });
  }
  std::vector<std::string> history(const std::string& path) const {
    return kernel->with(path, [](const FakeNode& node) { return node.history; });
  }
  std::int64_t control(const std::string& path, std::uint32_t id) const {
    return kernel->with(path, [id](const FakeNode& node) {
      for (const FakeControl& one : node.controls) {
        if (one.id == id) return one.value;
      }
      return std::int64_t{-1};
    });
  }

  const std::shared_ptr<FakeV4l2Api> kernel;
  std::string camera;  // paths
  std::vector<std::string> sensors;
  std::string flash;
  std::string media;

 private:
  // 1280 x 720 pixels with blanking at 48 MHz.
  static FakeNode sensor(const std::string& name) {
    FakeNode node;
    node.card = name;
    node.controls = {{V4L2_CID_EXPOSURE, "Exposure", 0, 2000, 100},
                     {V4L2_CID_VBLANK, "Vertical Blanking", 40, 2000, 80},
                     {V4L2_CID_HBLANK, "Horizontal Blanking", 720, 720, 720},
                     {V4L2_CID_PIXEL_RATE, "Pixel Rate", 48'000'000, 48'000'000, 48'000'000, V4L2_CTRL_TYPE_INTEGER64}};
    return node;
  }
};

}  // namespace quazor
