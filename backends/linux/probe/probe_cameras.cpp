#include "backends/linux/probe/probe_cameras.h"

#include "backends/linux/probe/probe_media.h"
#include "backends/linux/system/linux_error.h"
#include "contract/message_format.h"
#include "platform/capture_keys.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <optional>
#include <set>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

// The ports in the order in which cameras are assigned to them, with the format index that the camera diagnostics set.
struct PortToBind {
  std::string_view port;
  std::uint32_t formatIndex = 0;
};
constexpr std::array kPorts{
    PortToBind{port_type::BackFacingCamera, 16}, PortToBind{port_type::BackFacingTelephotoCamera, 14},
    PortToBind{port_type::BackFacingSuperWideCamera, 9}, PortToBind{port_type::FrontFacingCamera, 1},
    PortToBind{port_type::FrontFacingInfraredCamera, 0}};
constexpr double kDefaultRate = 30;
// The size for a camera that supports any size, and the maximum for others.
constexpr std::uint32_t kDefaultWidth = 640;
constexpr std::uint32_t kDefaultHeight = 480;
constexpr std::uint64_t kMaxPixels = std::uint64_t{1920} * 1080;

bool isDefaultRate(const FrameInterval& interval) { return std::abs(interval.framesPerSecond() - kDefaultRate) < 0.01; }

bool reachesDefaultRate(const FrameSize& size) {
  const auto isBelow = [](const FrameInterval& interval) { return interval.framesPerSecond() < kDefaultRate; };
  if (std::ranges::any_of(size.intervals, isDefaultRate)) return true;
  return size.anyIntervalBetween && std::ranges::any_of(size.intervals, isBelow) &&
         !std::ranges::all_of(size.intervals, isBelow);
}

std::string rateText(const FrameInterval& interval) {
  return formatMessage("%@", std::round(interval.framesPerSecond() * 100) / 100);
}

std::string ratesText(const FrameSize& size) {
  std::string text;
  for (const FrameInterval& interval : size.intervals) {
    if (!text.empty()) text += size.anyIntervalBetween ? " to " : ", ";
    text += rateText(interval);
  }
  return text.empty() ? "rates that the driver does not report" : text + " frames a second";
}

std::string sizeText(const FrameSize& size) {
  std::string text = formatMessage("%@x%@", size.width, size.height);
  if (size.maximumWidth > size.width || size.maximumHeight > size.height) {
    text += formatMessage(" to %@x%@", size.maximumWidth, size.maximumHeight);
  }
  return text + " at " + ratesText(size);
}

std::vector<std::string> sizeTexts(const VideoFormat& format) {
  std::vector<std::string> texts;
  for (const FrameSize& size : format.sizes) texts.push_back(sizeText(size));
  return texts;
}

// Consecutive formats with equal sizes share one line.
void tellFormats(const std::vector<VideoFormat>& formats, std::vector<std::string>* lines) {
  for (std::size_t begin = 0; begin < formats.size();) {
    const std::vector<std::string> sizes = sizeTexts(formats[begin]);
    std::size_t end = begin;
    std::string codes;
    for (; end < formats.size() && sizeTexts(formats[end]) == sizes; ++end) codes += " " + formats[end].fourcc;
    lines->push_back(
        end - begin == 1
            ? formatMessage("    format %@:%@ (%@)", formats[begin].index, codes, formats[begin].description)
            : formatMessage("    formats %@ to %@:%@", formats[begin].index, formats[end - 1].index, codes));
    for (const std::string& size : sizes) lines->push_back("      " + size);
    begin = end;
  }
}

void tellControls(const std::vector<VideoControl>& controls, std::vector<std::string>* lines) {
  std::string names;
  for (const VideoControl& control : controls) names += (names.empty() ? "" : ", ") + control.name;
  if (!names.empty()) lines->push_back("    controls: " + names);
}

// How a camera is used for a format index.
struct ChosenMode {
  const VideoFormat* format = nullptr;
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  std::optional<FrameInterval> interval;  // of the default rate, as the driver reports it
  bool hasDefaultRate = false;
};

ChosenMode modeOf(const VideoFormat& format, const FrameSize& size) {
  ChosenMode mode{&format,
                  std::clamp(kDefaultWidth, size.width, std::max(size.width, size.maximumWidth)),
                  std::clamp(kDefaultHeight, size.height, std::max(size.height, size.maximumHeight)),
                  {},
                  reachesDefaultRate(size)};
  const auto usual = std::ranges::find_if(size.intervals, isDefaultRate);
  if (usual != size.intervals.end() && usual->numerator > 0) mode.interval = *usual;
  return mode;
}

// The largest size at the default rate, or the largest one; nothing if the format has no usable size.
std::optional<ChosenMode> bestModeOf(const VideoFormat& format) {
  std::optional<ChosenMode> chosen;
  std::pair<bool, std::uint64_t> best;
  for (const FrameSize& size : format.sizes) {
    const ChosenMode mode = modeOf(format, size);
    if (std::min(mode.width, mode.height) == 0 || std::max(mode.width, mode.height) > kMaxSide) continue;
    const std::uint64_t pixels = std::uint64_t{mode.width} * mode.height;
    const std::pair<bool, std::uint64_t> worth{mode.hasDefaultRate, pixels <= kMaxPixels ? pixels : 1};
    if (chosen && worth <= best) continue;
    best = worth;
    chosen = mode;
  }
  return chosen;
}

// A binding can name the format only if its code is text.
bool canBeNamed(const VideoFormat& format) {
  return std::ranges::all_of(format.fourcc, [](char one) { return one >= ' ' && one <= '~'; });
}

// The mode for a format index of the diagnostics: among the formats at the default rate, or else all formats, the one
// whose index is nearest. Nothing if no format is usable.
std::optional<ChosenMode> modeFor(std::uint32_t index, const std::vector<VideoFormat>& formats) {
  std::optional<ChosenMode> chosen;
  std::pair<bool, std::uint32_t> best;
  for (const VideoFormat& format : formats) {
    const std::optional<ChosenMode> mode = bestModeOf(format);
    const std::uint32_t distance = std::max(format.index, index) - std::min(format.index, index);
    if (!mode || (distance > 0 && !canBeNamed(format))) continue;
    const std::pair<bool, std::uint32_t> cost{!mode->hasDefaultRate, distance};
    if (chosen && cost >= best) continue;
    best = cost;
    chosen = mode;
  }
  return chosen;
}

// True if the driver's own format with that index has the size of `mode` at the default rate, if `mode` has that rate.
bool isDriversOwn(std::uint32_t index, const ChosenMode& mode, const std::vector<VideoFormat>& formats) {
  const auto own = std::ranges::find(formats, index, &VideoFormat::index);
  if (own == formats.end()) return false;
  return own->index == mode.format->index || std::ranges::any_of(own->sizes, [&](const FrameSize& size) {
           const ChosenMode other = modeOf(*own, size);
           return other.width == mode.width && other.height == mode.height &&
                  (other.hasDefaultRate || !mode.hasDefaultRate);
         });
}

Json sizeEntry(const ChosenMode& mode) { return {{"width", mode.width}, {"height", mode.height}}; }

Json formatEntry(const ChosenMode& mode) {
  Json entry = {{"format", mode.format->fourcc}, {"size", sizeEntry(mode)}};
  if (mode.interval) {
    entry["interval"] = {{"numerator", mode.interval->numerator}, {"denominator", mode.interval->denominator}};
  }
  return entry;
}

class CameraProbe {
 public:
  CameraProbe(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots, std::vector<std::string>* lines)
      : kernel_(kernel), nodes_(videoNodes(kernel, roots)), media_(kernel, roots), lines_(lines) {}

  ProbedCameras run() {
    if (nodes_.empty()) {
      tell("  none: no driver offers a video node (/dev/video*). Is the camera connected, and its driver loaded?");
    }
    for (const V4l2DeviceInfo& node : nodes_) {
      tell("  " + textOf(node));
      if (node.problem != nullptr) {
        tellProblem(*node.problem);
      } else if (node.kind == VideoNodeKind::kCamera) {
        probeCamera(node);
      } else if (node.kind == VideoNodeKind::kMetadata) {
        tellMetadata(node);
      } else {
        tell("    unsuitable: it does not capture video to mapped buffers");
      }
    }
    return {std::move(cameras_), forbidden_};
  }

 private:
  void tell(std::string line) const { lines_->push_back(std::move(line)); }

  void tellProblem(const DiagnosticError& problem) {
    tell("    unsuitable: " + problem.localizedDescription());
    if (problem.code() == static_cast<std::int64_t>(LinuxErrorCode::kNoAccess)) {
      forbidden_ = true;
      tell("    Its group, usually \"video\", may use it; docs/linux.md has a udev rule for another group.");
    }
  }

  void probeCamera(const V4l2DeviceInfo& node) {
    DiagnosticErrorPtr error;
    const std::optional<VideoNodeDetails> details = detailsOf(kernel_, node, &error);
    if (!details) return tellProblem(*error);
    const std::vector<VideoFormat>& formats = details->formats;
    const bool isTaken = cameras_.size() == kPorts.size();
    std::optional<ChosenMode> mode;
    std::optional<ProbedPath> path;
    std::string reason = "its driver reports no format, or no usable size";
    if (media_.isBehindLinks(node)) {
      path = media_.pathTo(node, &reason);
      if (path && contradicts(path->media.links)) {
        reason = "its links contradict those of another camera in the binding below";
        path.reset();
      }
      if (path) mode = modeOf(*path);
    } else {
      mode = modeFor(isTaken ? 0 : kPorts.at(cameras_.size()).formatIndex, formats);
      // An interval in the binding forbids all other rates: it is only for a driver that cannot be asked for a rate.
      if (mode && details->hasInterval) mode->interval.reset();
    }
    tellUse(node, mode, path, formats, reason);
    if (mode && !mode->hasDefaultRate) {
      tell("    Its formats have no size at 30 frames a second, the rate that the camera diagnostics use.");
    }
    tellFormats(formats, lines_);
    tellControls(details->controls, lines_);
    if (!details->undescribedControls.empty()) {
      tell("    The driver does not describe the controls " + details->undescribedControls + "; they cannot be used.");
    }
  }

  // A path fits only the size of its pads. Its rate is believed if nothing sets it.
  static ChosenMode modeOf(const ProbedPath& path) {
    ChosenMode mode{&path.format, path.width, path.height, {}, true};
    if (!path.hasRate) mode.interval = FrameInterval{1, static_cast<std::uint32_t>(kDefaultRate)};
    return mode;
  }

  bool contradicts(const std::vector<LinkBinding>& links) const {
    return std::ranges::any_of(links, [this](LinkBinding link) {
      link.enabled = !link.enabled;
      return std::ranges::find(links_, link) != links_.end();
    });
  }

  void tellUse(const V4l2DeviceInfo& node, const std::optional<ChosenMode>& mode, const std::optional<ProbedPath>& path,
               const std::vector<VideoFormat>& formats, const std::string& reason) {
    const std::optional<VideoNodeMatch> match = matchOf(node);
    const bool isTaken = cameras_.size() == kPorts.size();
    if (!mode) {
      tell("    unsuitable: " + reason);
    } else if (!bindableText(node.driver) && !bindableText(node.card) && !bindableText(node.busInfo)) {
      tell("    unsuitable: its driver reports nothing that a binding could use to identify it");
    } else if (!match) {
      tell(
          "    unsuitable: another camera has the same driver, card, bus and device, so a binding cannot distinguish "
          "them");
    } else if (isTaken) {
      tell("    suitable, but all ports are taken; use it instead of another camera in the binding below");
    } else {
      bind(*match, *mode, path, formats);
    }
  }

  // The shortest match that selects only this camera: what the driver reports, then the USB interface, then the name of
  // the node, then the place in sysfs. Nothing if there is none.
  std::optional<VideoNodeMatch> matchOf(const V4l2DeviceInfo& node) const {
    VideoNodeMatch match{bindableText(node.driver), bindableText(node.card), bindableText(node.busInfo), {}, {}};
    const auto isOnly = [&] {
      return std::ranges::count_if(nodes_, [&](const V4l2DeviceInfo& other) {
               return other.kind == node.kind && matches(other, match);
             }) == 1;
    };
    if (isOnly()) return match;
    match.usbInterface = node.usbInterface;
    if (isOnly()) return match;
    match.name = bindableText(node.systemName);
    if (isOnly()) return match;
    match.name.reset();
    match.path = bindableText(node.device);
    return isOnly() ? std::optional(match) : std::nullopt;
  }

  void bind(const VideoNodeMatch& node, const ChosenMode& mode, const std::optional<ProbedPath>& path,
            const std::vector<VideoFormat>& formats) {
    const auto [port, formatIndex] = kPorts.at(cameras_.size());
    tell("    suitable: " + std::string(port) + " in the binding below; check which camera it really is");
    Json match = Json::object();
    if (node.driver) match["driver"] = *node.driver;
    if (node.card) match["card"] = *node.card;
    if (node.busInfo) match["busInfo"] = *node.busInfo;
    if (node.usbInterface) match["usbInterface"] = *node.usbInterface;
    if (node.name) match["name"] = *node.name;
    if (node.path) match["path"] = *node.path;
    Json camera = {{"node", std::move(match)}, {"size", sizeEntry(mode)}};
    // Index 0 is that of a stream whose format was never set.
    for (const std::uint32_t index : std::set{std::uint32_t{0}, formatIndex}) {
      if ((!path && isDriversOwn(index, mode, formats)) || !canBeNamed(*mode.format)) continue;
      camera["formats"][std::to_string(index)] = formatEntry(mode);
      tell(formatMessage("    format index %@ of the diagnostics: %@ of %@x%@", index, mode.format->fourcc, mode.width,
                         mode.height));
    }
    if (path) {
      tell("    Its frames come through a media controller, from " + path->text +
           "; the binding below sets links and pads.");
      if (!path->hasRate) {
        tell("    Its driver reports no frame rate. The binding says 30 a second; correct its \"interval\"s.");
      }
      camera["media"] = mediaEntry(path->media);
      links_.insert(links_.end(), path->media.links.begin(), path->media.links.end());
    }
    cameras_[std::string(port)] = std::move(camera);
  }

  void tellMetadata(const V4l2DeviceInfo& node) const {
    const V4l2DeviceInfo* const camera = cameraOf(node);
    if (camera == nullptr) return tell("    metadata, but no camera is on the same bus");
    tell("    metadata of " + camera->path.string() +
         ", which is on the same bus; a binding's \"metadata\" can use it, with the fields of its buffers");
    if (node.usbInterface && camera->usbInterface == node.usbInterface) {
      tell(formatMessage("    Both are of USB interface %@; add \"usbInterface\" to their nodes.", *node.usbInterface));
    }
  }

  // The camera of the same device, or else of the same bus. Drivers make a camera's node before that of its metadata,
  // so of several it is the last one before.
  const V4l2DeviceInfo* cameraOf(const V4l2DeviceInfo& metadata) const {
    const V4l2DeviceInfo* found = nullptr;
    bool isSameDevice = false;
    bool isBefore = true;
    for (const V4l2DeviceInfo& node : nodes_) {
      if (&node == &metadata) isBefore = false;
      if (node.kind != VideoNodeKind::kCamera || node.problem != nullptr || node.busInfo != metadata.busInfo) continue;
      const bool isOfDevice = !node.device.empty() && node.device == metadata.device;
      if (found != nullptr && (isOfDevice ? isSameDevice && !isBefore : isSameDevice || !isBefore)) continue;
      found = &node;
      isSameDevice = isOfDevice;
    }
    return found;
  }

  const std::shared_ptr<V4l2Api>& kernel_;
  const std::vector<V4l2DeviceInfo> nodes_;
  const MediaProbe media_;
  std::vector<LinkBinding> links_;  // of the cameras in the binding
  std::vector<std::string>* const lines_;
  Json cameras_ = Json::object();
  bool forbidden_ = false;
};

}  // namespace

ProbedCameras probeCameras(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots,
                           std::vector<std::string>* lines) {
  return CameraProbe(kernel, roots, lines).run();
}

}  // namespace quazor
