#include "backends/linux/video/v4l2_device_info.h"

#include "backends/linux/system/linux_error.h"
#include "backends/linux/system/node_number.h"
#include "backends/linux/video/v4l2_device.h"

#include <algorithm>
#include <charconv>
#include <fstream>
#include <string_view>
#include <system_error>

namespace quazor {
namespace {

std::string firstLineOf(const std::filesystem::path& file) {
  std::ifstream stream(file);
  std::string line;
  std::getline(stream, line);
  return line;
}

// As on the running system, whatever the folder of sysfs is.
std::string deviceOf(const std::filesystem::path& entry, const std::filesystem::path& sysfs) {
  std::error_code problem;
  const std::filesystem::path device = std::filesystem::canonical(entry / "device", problem);
  if (problem) return {};
  return (std::filesystem::path("/sys") / device.lexically_relative(std::filesystem::canonical(sysfs, problem)))
      .string();
}

std::optional<std::uint32_t> usbInterfaceOf(const std::filesystem::path& entry) {
  const std::string line = firstLineOf(entry / "device" / "bInterfaceNumber");
  std::uint32_t number = 0;
  const auto [end, problem] = std::from_chars(line.data(), line.data() + line.size(), number, 16);
  if (problem != std::errc() || end != line.data() + line.size()) return std::nullopt;
  return number;
}

// Null if the node is not known, or was not usable.
const V4l2DeviceInfo* knownNode(const std::vector<V4l2DeviceInfo>& known, const V4l2DeviceInfo& node) {
  const auto isSame = [&node](const V4l2DeviceInfo& one) {
    return one.path == node.path && one.identity == node.identity && one.problem == nullptr;
  };
  const auto found = std::ranges::find_if(known, isSame);
  return found == known.end() ? nullptr : &*found;
}

void ask(const std::shared_ptr<V4l2Api>& kernel, V4l2DeviceInfo& node) {
  const auto opened = V4l2Device::inspect(kernel, node.path.string(), &node.problem);
  if (opened == nullptr) return;
  const v4l2_capability& capability = opened->capability();
  node.driver = fixedText(capability.driver);
  node.card = fixedText(capability.card);
  node.busInfo = fixedText(capability.bus_info);
  node.capabilities = opened->capabilities();
  node.kind = opened->kind();
}

template <class Wanted, class Found>
bool fits(const std::optional<Wanted>& wanted, const Found& found) {
  return !wanted || found == *wanted;
}

std::string_view nameOf(VideoNodeKind kind) { return kind == VideoNodeKind::kMetadata ? "metadata node" : "camera"; }

std::string listOf(const std::vector<const V4l2DeviceInfo*>& nodes) {
  std::string list;
  for (const V4l2DeviceInfo* node : nodes) list += (list.empty() ? "" : ", ") + textOf(*node);
  return list;
}

std::vector<const V4l2DeviceInfo*> unopened(const std::vector<V4l2DeviceInfo>& nodes) {
  std::vector<const V4l2DeviceInfo*> found;
  for (const V4l2DeviceInfo& node : nodes) {
    if (node.problem != nullptr) found.push_back(&node);
  }
  return found;
}

}  // namespace

std::vector<V4l2DeviceInfo> videoNodes(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots,
                                       const std::vector<V4l2DeviceInfo>& known) {
  std::vector<std::pair<std::uint32_t, V4l2DeviceInfo>> numbered;
  std::error_code problem;
  std::filesystem::directory_iterator entry(roots.sysfs / "class" / "video4linux", problem);
  for (; !problem && entry != std::filesystem::directory_iterator(); entry.increment(problem)) {
    const std::string name = entry->path().filename().string();
    const std::optional<std::uint32_t> number = nodeNumber(name, "video");  // radios and sub-devices have other names
    if (!number) continue;
    V4l2DeviceInfo node;
    node.path = roots.dev / name;
    node.systemName = firstLineOf(entry->path() / "name");
    node.device = deviceOf(entry->path(), roots.sysfs);
    node.usbInterface = usbInterfaceOf(entry->path());
    node.identity = NodeIdentity::of(entry->path());
    if (const V4l2DeviceInfo* const same = knownNode(known, node)) {
      node = *same;
    } else {
      ask(kernel, node);
    }
    numbered.emplace_back(*number, std::move(node));
  }
  std::ranges::sort(numbered, {}, [](const auto& one) { return one.first; });
  std::vector<V4l2DeviceInfo> nodes;
  nodes.reserve(numbered.size());
  for (auto& [number, node] : numbered) nodes.push_back(std::move(node));
  return nodes;
}

std::optional<VideoNodeDetails> detailsOf(const std::shared_ptr<V4l2Api>& kernel, const V4l2DeviceInfo& node,
                                          DiagnosticErrorPtr* error) {
  const auto opened = V4l2Device::open(kernel, node.path.string(), error);
  if (opened == nullptr) return std::nullopt;
  return VideoNodeDetails{opened->formats(), opened->controls(), opened->undescribedControls(),
                          opened->interval(nullptr).has_value()};
}

bool matches(const V4l2DeviceInfo& node, const VideoNodeMatch& match) {
  return node.problem == nullptr && fits(match.driver, node.driver) && fits(match.card, node.card) &&
         fits(match.busInfo, node.busInfo) && fits(match.usbInterface, node.usbInterface) &&
         fits(match.path, node.device) && fits(match.name, node.systemName);
}

std::optional<V4l2DeviceInfo> findVideoNode(const std::vector<V4l2DeviceInfo>& nodes, VideoNodeKind kind,
                                            const VideoNodeMatch& match, const std::string& purpose,
                                            DiagnosticErrorPtr* error) {
  std::vector<const V4l2DeviceInfo*> ofKind;
  std::vector<const V4l2DeviceInfo*> fitting;
  for (const V4l2DeviceInfo& node : nodes) {
    if (node.problem != nullptr || node.kind != kind) continue;
    ofKind.push_back(&node);
    if (matches(node, match)) fitting.push_back(&node);
  }
  if (fitting.size() == 1) return *fitting.front();

  std::string text = purpose + ": ";
  text += fitting.empty() ? "no " : "more than one ";
  text += std::string(nameOf(kind)) + " is " + textOf(match) + "; ";
  if (!fitting.empty()) {
    failLinux(error, LinuxErrorCode::kAmbiguous, text + "there are " + listOf(fitting) + ".");
    return std::nullopt;
  }
  text += ofKind.empty() ? "there is none" : "there are " + listOf(ofKind);
  const std::vector<const V4l2DeviceInfo*> closed = unopened(nodes);
  if (!closed.empty()) text += "; these could not be opened: " + listOf(closed);
  const bool noAccess = std::ranges::any_of(closed, [](const V4l2DeviceInfo* node) {
    return node->problem->code() == static_cast<std::int64_t>(LinuxErrorCode::kNoAccess);
  });
  failLinux(error, noAccess ? LinuxErrorCode::kNoAccess : LinuxErrorCode::kNoDevice, text + ".");
  return std::nullopt;
}

std::string textOf(const V4l2DeviceInfo& node) {
  if (node.problem != nullptr) return node.path.string() + " (" + node.problem->localizedDescription() + ")";
  return node.path.string() + " (driver " + node.driver + ", card " + node.card + ", bus " + node.busInfo +
         (node.usbInterface ? ", USB interface " + std::to_string(*node.usbInterface) : "") + ")";
}

std::string textOf(const VideoNodeMatch& match) {
  std::string text;
  const auto add = [&text](std::string_view name, const std::optional<std::string>& wanted) {
    if (!wanted) return;
    if (!text.empty()) text += ", ";
    text += name;
    text += " " + *wanted;
  };
  add("driver", match.driver);
  add("card", match.card);
  add("bus", match.busInfo);
  if (match.usbInterface) add("USB interface", std::to_string(*match.usbInterface));
  add("path", match.path);
  add("name", match.name);
  return text.empty() ? "any" : text;
}

}  // namespace quazor
