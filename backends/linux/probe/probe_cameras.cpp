#include "backends/linux/probe/probe_cameras.h"

#include "backends/linux/system/linux_error.h"
#include "contract/message_format.h"
#include "platform/capture_keys.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <optional>
#include <utility>

namespace quazor {
namespace {

using Json = nlohmann::ordered_json;

constexpr std::array kPorts{port_type::BackFacingCamera, port_type::BackFacingTelephotoCamera,
                            port_type::BackFacingSuperWideCamera, port_type::FrontFacingCamera,
                            port_type::FrontFacingInfraredCamera};
constexpr double kDefaultRate = 30;
// The size for a camera that supports any size, and the maximum for others.
constexpr std::uint32_t kDefaultWidth = 640;
constexpr std::uint32_t kDefaultHeight = 480;
constexpr std::uint64_t kMaxPixels = std::uint64_t{1920} * 1080;
constexpr std::uint32_t kMaxSide = 65536;  // the maximum of a binding

bool reachesUsualRate(const FrameSize& size) {
  bool below = false;
  bool above = false;
  for (const FrameInterval& interval : size.intervals) {
    const double rate = interval.framesPerSecond();
    if (std::abs(rate - kDefaultRate) < 0.01) return true;
    (rate < kDefaultRate ? below : above) = true;
  }
  return size.anyIntervalBetween && below && above;
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

// The size for the starter binding: the largest one at the default rate, or the largest one.
std::optional<std::pair<std::uint32_t, std::uint32_t>> chosenSize(const VideoNodeDetails& details) {
  std::optional<std::pair<std::uint32_t, std::uint32_t>> chosen;
  std::pair<bool, std::uint64_t> best;
  if (details.formats.empty()) return chosen;
  for (const FrameSize& size : details.formats.front().sizes) {
    const std::uint32_t width = std::clamp(kDefaultWidth, size.width, std::max(size.width, size.maximumWidth));
    const std::uint32_t height = std::clamp(kDefaultHeight, size.height, std::max(size.height, size.maximumHeight));
    if (std::min(width, height) == 0 || std::max(width, height) > kMaxSide) continue;
    const std::uint64_t pixels = std::uint64_t{width} * height;
    const std::pair<bool, std::uint64_t> worth{reachesUsualRate(size), pixels <= kMaxPixels ? pixels : 1};
    if (chosen && worth <= best) continue;
    best = worth;
    chosen = {width, height};
  }
  return chosen;
}

bool isSameMatch(const V4l2DeviceInfo& a, const V4l2DeviceInfo& b) {
  return a.driver == b.driver && a.card == b.card && a.busInfo == b.busInfo;
}

class CameraProbe {
 public:
  CameraProbe(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots, std::vector<std::string>* lines)
      : kernel_(kernel), nodes_(videoNodes(kernel, roots)), lines_(lines) {}

  Json run() {
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
        tell("    unsuitable: it does not capture video to mapped buffers, or uses several planes");
      }
    }
    return std::move(cameras_);
  }

 private:
  void tell(std::string line) const { lines_->push_back(std::move(line)); }

  void tellProblem(const DiagnosticError& problem) const {
    tell("    unsuitable: " + problem.localizedDescription());
    if (problem.code() == static_cast<std::int64_t>(LinuxErrorCode::kNoAccess)) {
      tell("    Its group, usually \"video\", may use it; docs/linux.md has a udev rule for another group.");
    }
  }

  void probeCamera(const V4l2DeviceInfo& node) {
    DiagnosticErrorPtr error;
    const std::optional<VideoNodeDetails> details = detailsOf(kernel_, node, &error);
    if (!details) return tellProblem(*error);
    const auto isLikeIt = [&node](const V4l2DeviceInfo& other) {
      return other.kind == VideoNodeKind::kCamera && other.problem == nullptr && isSameMatch(other, node);
    };
    const auto size = chosenSize(*details);
    if (!size) {
      tell("    unsuitable: its driver reports no format, or no usable size for the first one");
    } else if (node.driver.empty() && node.card.empty() && node.busInfo.empty()) {
      tell("    unsuitable: its driver reports nothing that a binding could use to identify it");
    } else if (std::ranges::count_if(nodes_, isLikeIt) > 1) {
      tell("    unsuitable: another camera has the same driver, card and bus, so a binding cannot distinguish them");
    } else if (cameras_.size() == kPorts.size()) {
      tell("    suitable, but all ports are taken; use it instead of another camera in the binding below");
    } else {
      bind(node, *size);
    }
    if (size && std::ranges::none_of(details->formats.front().sizes, reachesUsualRate)) {
      tell("    Its first format has no size at 30 frames a second, the rate that the camera diagnostics use.");
    }
    tellFormats(details->formats, lines_);
    tellControls(details->controls, lines_);
  }

  void bind(const V4l2DeviceInfo& node, std::pair<std::uint32_t, std::uint32_t> size) {
    const std::string port(kPorts.at(cameras_.size()));
    tell("    suitable: " + port + " in the binding below; check which camera it really is");
    Json match = Json::object();
    if (!node.driver.empty()) match["driver"] = node.driver;
    if (!node.card.empty()) match["card"] = node.card;
    if (!node.busInfo.empty()) match["busInfo"] = node.busInfo;
    cameras_[port] = {{"node", std::move(match)}, {"size", {{"width", size.first}, {"height", size.second}}}};
  }

  void tellMetadata(const V4l2DeviceInfo& node) const {
    for (const V4l2DeviceInfo& camera : nodes_) {
      if (camera.kind != VideoNodeKind::kCamera || camera.busInfo != node.busInfo || camera.problem != nullptr)
        continue;
      return tell("    metadata of " + camera.path.string() +
                  ", which is on the same bus; a binding's \"metadata\" "
                  "can use it, with the fields of its buffers");
    }
    tell("    metadata, but no camera is on the same bus");
  }

  const std::shared_ptr<V4l2Api>& kernel_;
  const std::vector<V4l2DeviceInfo> nodes_;
  std::vector<std::string>* const lines_;
  Json cameras_ = Json::object();
};

}  // namespace

Json probeCameras(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots, std::vector<std::string>* lines) {
  return CameraProbe(kernel, roots, lines).run();
}

}  // namespace quazor
