// What a USB camera of the rig offers, and its faults.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// A size of pictures, and the frame rates at which the camera offers it; the first is its default.
struct UvcFrame {
  std::uint16_t width = 0;
  std::uint16_t height = 0;
  std::vector<std::uint32_t> rates;
};

struct UvcFormat {
  std::string code;  // YUYV, NV12, GREY or MJPG
  std::vector<UvcFrame> frames;

  bool isCompressed() const { return code == "MJPG"; }
};

// Four formats, whose sizes and rates differ.
std::vector<UvcFormat> defaultUvcFormats();

// The bytes of a picture. A compressed one takes a twentieth of the picture's pixels.
std::uint32_t pictureBytes(const UvcFormat& format, const UvcFrame& frame);

// The time between two frames in units of 100 ns, as descriptors write it.
std::uint32_t intervalOfRate(std::uint32_t rate);

// The moments at which a camera can be unplugged, apart from those in a stream.
enum class UvcMoment { kCommit, kStart, kStop };

// Frames are counted from 0 in each stream. "Every N" means the frames N - 1, 2 N - 1, ...; 0 means none.
struct UvcFaults {
  std::set<std::pair<std::string, std::string>> stalls;  // control and request, such as "contrast" and "GET_DEF"
  std::uint64_t damagedEvery = 0;                        // a payload has the error bit
  std::uint64_t shortEvery = 0;                          // half of the picture is missing
  std::uint64_t lateEvery = 0;
  std::chrono::milliseconds lateBy{0};
  std::optional<std::uint64_t> muteAfter;       // no more frames after so many
  std::optional<std::uint64_t> unpluggedAfter;  // after so many frames
  std::optional<UvcMoment> unpluggedAt;
};

struct UvcCameraConfig {
  std::string name = "Rig Camera";
  std::string serial = "1";
  std::uint8_t functions = 1;  // cameras in the device
  bool isBulk = false;         // else isochronous
  std::vector<UvcFormat> formats = defaultUvcFormats();
  UvcFaults faults;
};

}  // namespace quazor
