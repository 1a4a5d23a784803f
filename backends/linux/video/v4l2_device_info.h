// The video nodes of this machine, their capabilities, and which of them a binding selects.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/system/node_identity.h"
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

// A frame size or, if the maximum differs from the minimum, a range of sizes.
struct FrameSize {
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::uint32_t maximumWidth = 0;
  std::uint32_t maximumHeight = 0;
  std::vector<FrameInterval> intervals;  // all intervals, or the shortest and the longest
  bool anyIntervalBetween = false;
};

struct VideoFormat {
  std::uint32_t index = 0;  // the driver's index, used as FormatIndex
  std::string fourcc;       // four characters, for example "YUYV"
  std::string description;  // the driver's name for the format
  std::vector<FrameSize> sizes;
};

struct VideoControl {
  std::uint32_t id = 0;
  std::uint32_t type = 0;  // V4L2_CTRL_TYPE_...
  std::string name;
  std::int64_t minimum = 0;
  std::int64_t maximum = 0;
  std::int64_t defaultValue = 0;
  std::uint64_t step = 1;
  std::uint32_t flags = 0;  // V4L2_CTRL_FLAG_...
};

enum class VideoNodeKind {
  kCamera,    // captures video to buffers that can be mapped
  kMetadata,  // captures metadata to buffers that can be mapped
  kOther      // not supported: outputs, radios, and cameras with only read()
};

struct V4l2DeviceInfo {
  NodeIdentity identity;
  std::filesystem::path path;  // for example /dev/video0
  std::string systemName;      // the name in sysfs, for example "vivid-000-vid-cap"
  std::string device;          // the path in sysfs of the device it is part of, "/sys/devices/..."; empty if unknown
  std::optional<std::uint32_t> usbInterface;  // the number of that device if it is a USB interface
  // The members below are empty if the node cannot be opened; `problem` then gives the reason.
  std::string driver;
  std::string card;
  std::string busInfo;
  std::uint32_t capabilities = 0;  // V4L2_CAP_... of the node
  VideoNodeKind kind = VideoNodeKind::kOther;
  DiagnosticErrorPtr problem;
};

// The formats and controls of a camera or metadata node.
struct VideoNodeDetails {
  std::vector<VideoFormat> formats;
  std::vector<VideoControl> controls;
  std::string undescribedControls;  // V4l2Device::undescribedControls()
  bool hasInterval = false;         // the driver tells its interval, and then sets it, too
};

// The directories of the system's devices.
struct DeviceRoots {
  std::filesystem::path sysfs = "/sys";
  std::filesystem::path dev = "/dev";
};

// All video nodes, sorted by number; empty if the machine has none. Opens only those that are not among `known`, or
// could not be opened then: opening a node may wake a device that sleeps.
std::vector<V4l2DeviceInfo> videoNodes(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots = {},
                                       const std::vector<V4l2DeviceInfo>& known = {});

// Queries the node's driver. Returns nothing and an error if the node cannot be opened.
std::optional<VideoNodeDetails> detailsOf(const std::shared_ptr<V4l2Api>& kernel, const V4l2DeviceInfo& node,
                                          DiagnosticErrorPtr* error);

// True if the binding selects the node; a node that cannot be opened never matches.
bool matches(const V4l2DeviceInfo& node, const VideoNodeMatch& match);

// The only node of that kind that the binding selects. Returns nothing and an error that lists the candidates if none
// matches (kNoDevice, or kNoAccess if all remaining nodes lack permission) or several do (kAmbiguous). The message
// begins with `purpose`, for example "BackFacingCamera".
std::optional<V4l2DeviceInfo> findVideoNode(const std::vector<V4l2DeviceInfo>& nodes, VideoNodeKind kind,
                                            const VideoNodeMatch& match, const std::string& purpose,
                                            DiagnosticErrorPtr* error);

// A user-readable line: "/dev/video0 (driver vivid, card vivid, bus platform:vivid-000)".
std::string textOf(const V4l2DeviceInfo& node);
// "driver vivid, bus platform:vivid-000"; "any" if it matches everything.
std::string textOf(const VideoNodeMatch& match);

}  // namespace quazor
