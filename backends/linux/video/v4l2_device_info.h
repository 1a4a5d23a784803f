// The video nodes of this machine: what they are, what they can do, and which of them a binding means.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/video/v4l2_api.h"
#include "contract/diagnostic_error.h"

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// Seconds from frame to frame.
struct FrameInterval {
  std::uint32_t numerator = 0;
  std::uint32_t denominator = 1;

  double framesPerSecond() const { return static_cast<double>(denominator) / static_cast<double>(numerator); }
  friend bool operator==(const FrameInterval&, const FrameInterval&) = default;
};

// A frame size, or, when the highest differs from the lowest, all sizes between them.
struct FrameSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint32_t highestWidth = 0;
  std::uint32_t highestHeight = 0;
  std::vector<FrameInterval> intervals;  // those that there are, or the shortest and the longest
  bool anyIntervalBetween = false;
};

struct VideoFormat {
  std::uint32_t index = 0;  // the driver's, which FormatIndex means
  std::string code;         // four characters, as "YUYV"
  std::string text;         // the driver's name for it
  std::vector<FrameSize> sizes;
};

struct VideoControl {
  std::uint32_t id = 0;
  std::uint32_t type = 0;  // V4L2_CTRL_TYPE_...
  std::string name;
  std::int64_t lowest = 0;
  std::int64_t highest = 0;
  std::int64_t usual = 0;  // the driver's default
};

enum class VideoNodeKind {
  kCamera,    // captures video to buffers that a program maps
  kMetadata,  // captures metadata in the same way
  kOther      // what the capture service does not use: outputs, radios, cameras that only read() or have several planes
};

struct V4l2DeviceInfo {
  std::filesystem::path path;  // as /dev/video0
  std::string systemName;      // what sysfs calls it, as "vivid-000-vid-cap"
  // What follows is empty when the node cannot be opened; then `problem` says why.
  std::string driver;
  std::string card;
  std::string busInfo;
  std::uint32_t capabilities = 0;  // V4L2_CAP_..., the node's own
  VideoNodeKind kind = VideoNodeKind::kOther;
  DiagnosticErrorPtr problem;
};

// What a camera or metadata node offers besides.
struct VideoNodeDetails {
  std::vector<VideoFormat> formats;
  std::vector<VideoControl> controls;
};

// Where the system tells of its devices and where they are.
struct DeviceRoots {
  std::filesystem::path sysfs = "/sys";
  std::filesystem::path dev = "/dev";
};

// All video nodes, by their numbers. A machine without any gives none.
std::vector<V4l2DeviceInfo> videoNodes(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots = {});

// Asks the node's driver. Nothing, and an error, when it cannot be opened.
std::optional<VideoNodeDetails> detailsOf(const std::shared_ptr<V4l2Api>& kernel, const V4l2DeviceInfo& node,
                                          DiagnosticErrorPtr* error);

// Whether the node is what the binding means; one that cannot be opened is not.
bool matches(const V4l2DeviceInfo& node, const VideoNodeMatch& match);

// The one node of that kind that the binding means. Nothing, and an error that lists what there is, when there is none
// (kNoDevice, or kNoAccess when only nodes that may not be opened are left) or more than one (kAmbiguous). `purpose`
// begins the message, as "BackFacingCamera".
std::optional<V4l2DeviceInfo> findVideoNode(const std::vector<V4l2DeviceInfo>& nodes, VideoNodeKind kind,
                                            const VideoNodeMatch& match, const std::string& purpose,
                                            DiagnosticErrorPtr* error);

// One line that tells the node to a person: "/dev/video0 (driver vivid, card vivid, bus platform:vivid-000)".
std::string textOf(const V4l2DeviceInfo& node);
// "driver vivid, bus platform:vivid-000"; "any" when it asks for nothing.
std::string textOf(const VideoNodeMatch& match);

}  // namespace quazor
