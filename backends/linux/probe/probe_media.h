// Finds how frames can reach a camera's video node through a media controller.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/media/media_device.h"
#include "backends/linux/video/v4l2_device_info.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A path from a sensor to a video node.
struct ProbedPath {
  std::string text;         // user-readable: its entities
  MediaBinding media;       // links and pads to set
  std::uint32_t width = 0;  // of the frames at the video node
  std::uint32_t height = 0;
  VideoFormat format;    // of the video node
  bool hasRate = false;  // the node's intervals or the sensor's blanking set the rate
};

// The longest side of a picture in a binding.
inline constexpr std::uint32_t kMaxSide = 65536;

// The text as a binding can have it; nothing if it is empty, or cut within a character.
std::optional<std::string> bindableText(const std::string& text);

// The entry "media" of a camera in a binding.
nlohmann::ordered_json mediaEntry(const MediaBinding& media);

// The media controllers of a machine. Nothing is changed: formats are only tried.
//
// Thread: one at a time.
class MediaProbe final {
 public:
  MediaProbe(std::shared_ptr<V4l2Api> kernel, const DeviceRoots& roots);

  // True if the node gets its frames over links that a program sets.
  bool isBehindLinks(const V4l2DeviceInfo& node) const;
  // The path with the fewest changes that fits together. Returns nothing and the reason if there is none.
  std::optional<ProbedPath> pathTo(const V4l2DeviceInfo& node, std::string* reason) const;

 private:
  struct Controller {
    MediaDeviceInfo info;
    std::shared_ptr<MediaDevice> device;
  };

  const Controller* controllerOf(const V4l2DeviceInfo& node) const;

  const std::shared_ptr<V4l2Api> kernel_;
  std::vector<Controller> controllers_;  // those that can be opened
};

}  // namespace quazor
