#include "backends/linux/media/media_device.h"

#include "backends/linux/system/linux_error.h"
#include "backends/linux/system/node_number.h"
#include "backends/linux/video/v4l2_device.h"
#include "contract/log_channel.h"
#include "contract/message_format.h"

#include <algorithm>
#include <fstream>
#include <string_view>
#include <system_error>
#include <utility>

namespace quazor {
namespace {

// Controllers have some dozens of entities; the limit stops a driver that tells nonsense.
constexpr std::uint32_t kMaxItems = 65536;

MediaDeviceInfo ask(V4l2Api& kernel, const std::filesystem::path& path) {
  MediaDeviceInfo info;
  info.path = path;
  const int descriptor = kernel.openForQueries(path.string());
  if (descriptor < 0) {
    failSystemCall(&info.problem, "open", path.string(), -descriptor);
    return info;
  }
  media_device_info answer{};
  const int result = kernel.ioctl(descriptor, MEDIA_IOC_DEVICE_INFO, &answer);
  kernel.close(descriptor);
  if (result < 0) {
    failSystemCall(&info.problem, "MEDIA_IOC_DEVICE_INFO", path.string(), -result);
    return info;
  }
  info.driver = fixedText(answer.driver);
  info.model = fixedText(answer.model);
  info.busInfo = fixedText(answer.bus_info);
  return info;
}

std::string textOf(const MediaDeviceMatch& match) {
  std::string text;
  const auto add = [&text](std::string_view name, const std::optional<std::string>& wanted) {
    if (!wanted) return;
    text += (text.empty() ? "" : ", ") + std::string(name) + " " + *wanted;
  };
  add("driver", match.driver);
  add("model", match.model);
  add("bus", match.busInfo);
  return text;
}

std::string linkText(const PadName& source, const PadName& sink) {
  return formatMessage("\"%@\" -> \"%@\"", textOf(source), textOf(sink));
}

std::string listOf(const std::vector<std::string>& texts) {
  std::string list;
  for (const std::string& text : texts) list += (list.empty() ? "" : ", ") + text;
  return list.empty() ? "none" : list;
}

}  // namespace

std::vector<MediaDeviceInfo> mediaDevices(const std::shared_ptr<V4l2Api>& kernel, const DeviceRoots& roots) {
  std::vector<std::pair<std::uint32_t, MediaDeviceInfo>> numbered;
  std::error_code problem;
  std::filesystem::directory_iterator entry(roots.sysfs / "bus" / "media" / "devices", problem);
  for (; !problem && entry != std::filesystem::directory_iterator(); entry.increment(problem)) {
    const std::string name = entry->path().filename().string();
    if (const auto number = nodeNumber(name, "media")) {
      const NodeIdentity identity = NodeIdentity::of(entry->path());
      numbered.emplace_back(*number, ask(*kernel, roots.dev / name));
      numbered.back().second.identity = identity;
    }
  }
  std::ranges::sort(numbered, {}, [](const auto& one) { return one.first; });
  std::vector<MediaDeviceInfo> devices;
  devices.reserve(numbered.size());
  for (auto& [number, device] : numbered) devices.push_back(std::move(device));
  return devices;
}

bool matches(const MediaDeviceInfo& device, const MediaDeviceMatch& match) {
  const auto fits = [](const std::optional<std::string>& wanted, const std::string& found) {
    return !wanted || *wanted == found;
  };
  return device.problem == nullptr && fits(match.driver, device.driver) && fits(match.model, device.model) &&
         fits(match.busInfo, device.busInfo);
}

std::string textOf(const MediaDeviceInfo& device) {
  if (device.problem != nullptr) return device.path.string() + " (" + device.problem->localizedDescription() + ")";
  return device.path.string() + " (driver " + device.driver + ", model " + device.model + ", bus " + device.busInfo +
         ")";
}

std::shared_ptr<MediaDevice> MediaDevice::opened(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots,
                                                 const std::filesystem::path& path, int descriptor,
                                                 DiagnosticErrorPtr* error) {
  if (descriptor < 0) {
    failSystemCall(error, "open", path.string(), -descriptor);
    return nullptr;
  }
  std::shared_ptr<MediaDevice> device(new MediaDevice(std::move(kernel), std::move(roots), path, descriptor));
  return device->readGraph(error) ? device : nullptr;
}

std::shared_ptr<MediaDevice> MediaDevice::open(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots,
                                               const std::filesystem::path& path, DiagnosticErrorPtr* error) {
  const int descriptor = kernel->open(path.string());
  return opened(std::move(kernel), std::move(roots), path, descriptor, error);
}

std::shared_ptr<MediaDevice> MediaDevice::inspect(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots,
                                                  const std::filesystem::path& path, DiagnosticErrorPtr* error) {
  const int descriptor = kernel->openForQueries(path.string());
  return opened(std::move(kernel), std::move(roots), path, descriptor, error);
}

MediaDevice::MediaDevice(std::shared_ptr<V4l2Api> kernel, DeviceRoots roots, std::filesystem::path path, int descriptor)
    : kernel_(std::move(kernel)), roots_(std::move(roots)), path_(std::move(path)), descriptor_(descriptor) {}

MediaDevice::~MediaDevice() {
  for (auto link = changed_.rbegin(); link != changed_.rend(); ++link) {
    const int result = setFlags(link->before, link->before.flags);
    if (result == 0) continue;
    DiagnosticErrorPtr error;
    failSystemCall(&error, "setting back the link " + link->name, path_.string(), result);
    logDefault("%@", error);
  }
  kernel_->close(descriptor_);
}

bool MediaDevice::readGraph(DiagnosticErrorPtr* error) {
  std::optional<MediaGraph> read = graphNow(error);
  if (read) graph_ = std::move(*read);
  return read.has_value();
}

bool MediaDevice::hasStill(const MediaEntity& entity, DiagnosticErrorPtr* error) const {
  const std::optional<MediaGraph> now = graphNow(error);
  if (!now) return false;
  const MediaEntity* const found = now->entity(entity.id);
  return (found != nullptr && found->name == entity.name && found->node == entity.node) ||
         refuseReplaced(entity.node.string() + " (\"" + entity.name + "\")", error);
}

std::optional<MediaGraph> MediaDevice::graphNow(DiagnosticErrorPtr* error) const {
  const std::optional<MediaTopology> read = topology(error);
  if (!read) return std::nullopt;
  return MediaGraph(*read, [this](std::uint32_t major, std::uint32_t minor) -> std::filesystem::path {
    const std::string number = std::to_string(major) + ":" + std::to_string(minor);
    std::ifstream file(roots_.sysfs / "dev" / "char" / number / "uevent");
    constexpr std::string_view kKey = "DEVNAME=";
    for (std::string line; std::getline(file, line);) {
      if (line.starts_with(kKey)) return roots_.dev / line.substr(kKey.size());
    }
    return {};
  });
}

// The topology may grow between the question for its size and the one for its contents.
std::optional<MediaTopology> MediaDevice::topology(DiagnosticErrorPtr* error) const {
  constexpr int kAttempts = 5;
  int result = 0;
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    media_v2_topology asked{};
    result = kernel_->ioctl(descriptor_, MEDIA_IOC_G_TOPOLOGY, &asked);
    if (result < 0) break;
    MediaTopology topology;
    const auto makeRoom = [](auto& items, std::uint32_t count) {
      items.resize(std::min(count, kMaxItems));
      return reinterpret_cast<std::uintptr_t>(items.data());
    };
    asked.ptr_entities = makeRoom(topology.entities, asked.num_entities);
    asked.ptr_interfaces = makeRoom(topology.interfaces, asked.num_interfaces);
    asked.ptr_pads = makeRoom(topology.pads, asked.num_pads);
    asked.ptr_links = makeRoom(topology.links, asked.num_links);
    asked.num_entities = static_cast<std::uint32_t>(topology.entities.size());
    asked.num_interfaces = static_cast<std::uint32_t>(topology.interfaces.size());
    asked.num_pads = static_cast<std::uint32_t>(topology.pads.size());
    asked.num_links = static_cast<std::uint32_t>(topology.links.size());
    const std::uint64_t version = asked.topology_version;
    result = kernel_->ioctl(descriptor_, MEDIA_IOC_G_TOPOLOGY, &asked);
    if (result == 0 && asked.topology_version == version) return topology;
    if (result < 0 && result != -ENOSPC) break;
  }
  failSystemCall(error, "MEDIA_IOC_G_TOPOLOGY", path_.string(), result == 0 ? EAGAIN : -result);
  return std::nullopt;
}

const MediaEntity* MediaDevice::entity(const std::string& name, const std::string& purpose,
                                       DiagnosticErrorPtr* error) const {
  const std::vector<const MediaEntity*> found = graph_.named(name);
  if (found.size() == 1) return found.front();
  if (!found.empty()) {
    refuseLinux(error, LinuxErrorCode::kAmbiguous, "%@: %@ has %@ entities \"%@\".", purpose, path_.string(),
                found.size(), name);
    return nullptr;
  }
  std::vector<std::string> names;
  for (const MediaEntity& one : graph_.entities()) names.push_back("\"" + one.name + "\"");
  refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: %@ has no entity \"%@\"; its entities are %@.", purpose,
              path_.string(), name, listOf(names));
  return nullptr;
}

const MediaLink* MediaDevice::findLink(const LinkBinding& wanted, const std::string& purpose,
                                       DiagnosticErrorPtr* error) const {
  const MediaEntity* const source = entity(wanted.source.entity, purpose, error);
  const MediaEntity* const sink = source == nullptr ? nullptr : entity(wanted.sink.entity, purpose, error);
  if (sink == nullptr) return nullptr;
  const MediaLink* const link = graph_.link({source->id, wanted.source.pad}, {sink->id, wanted.sink.pad});
  if (link != nullptr) return link;
  std::vector<std::string> links;
  for (const MediaLink& one : graph_.links()) {
    if (one.source.entity != source->id && one.sink.entity != sink->id) continue;
    links.push_back(linkText(graph_.nameOf(one.source), graph_.nameOf(one.sink)));
  }
  refuseLinux(error, LinuxErrorCode::kNotSupported, "%@: %@ has no link %@; those from \"%@\" and to \"%@\" are %@.",
              purpose, path_.string(), linkText(wanted.source, wanted.sink), source->name, sink->name, listOf(links));
  return nullptr;
}

bool MediaDevice::setLink(const LinkBinding& wanted, const std::string& purpose, DiagnosticErrorPtr* error) {
  const MediaLink* const link = findLink(wanted, purpose, error);
  if (link == nullptr) return false;
  if (link->isEnabled() == wanted.enabled) return true;
  const std::string name = linkText(wanted.source, wanted.sink);
  if (link->isImmutable()) {
    return refuseLinux(error, LinuxErrorCode::kNotSupported,
                       "%@: the link %@ of %@ cannot be changed; it is always %@.", purpose, name, path_.string(),
                       link->isEnabled() ? "enabled" : "disabled");
  }
  const MediaLink before = *link;
  const std::uint32_t enabled = MEDIA_LNK_FL_ENABLED;
  const int result = setFlags(before, wanted.enabled ? before.flags | enabled : before.flags & ~enabled);
  if (result != 0) {
    failSystemCall(error, purpose + ": MEDIA_IOC_SETUP_LINK of " + name, path_.string(), result);
    return false;
  }
  const auto isSame = [&before](const ChangedLink& one) {
    return one.before.source == before.source && one.before.sink == before.sink;
  };
  if (std::ranges::none_of(changed_, isSame)) changed_.push_back({before, name});
  return readGraph(error);
}

// 0 or the error number.
int MediaDevice::setFlags(const MediaLink& link, std::uint32_t flags) const {
  const auto describe = [](PadPlace place, std::uint32_t padFlags) {
    media_pad_desc pad{};
    pad.entity = place.entity;
    pad.index = static_cast<std::uint16_t>(place.pad);
    pad.flags = padFlags;
    return pad;
  };
  media_link_desc description{};
  description.source = describe(link.source, MEDIA_PAD_FL_SOURCE);
  description.sink = describe(link.sink, MEDIA_PAD_FL_SINK);
  description.flags = flags;
  return -kernel_->ioctl(descriptor_, MEDIA_IOC_SETUP_LINK, &description);
}

std::shared_ptr<MediaDevice> MediaDevices::open(const MediaDeviceMatch& match, const std::string& purpose,
                                                DiagnosticErrorPtr* error) {
  const std::vector<MediaDeviceInfo> devices = mediaDevices(kernel_, roots_);
  std::vector<std::string> texts;
  std::vector<const MediaDeviceInfo*> fitting;
  bool noAccess = false;
  for (const MediaDeviceInfo& device : devices) {
    texts.push_back(textOf(device));
    if (matches(device, match)) fitting.push_back(&device);
    noAccess = noAccess || (device.problem != nullptr &&
                            device.problem->code() == static_cast<std::int64_t>(LinuxErrorCode::kNoAccess));
  }
  if (fitting.size() != 1) {
    const LinuxErrorCode code = !fitting.empty() ? LinuxErrorCode::kAmbiguous
                                : noAccess       ? LinuxErrorCode::kNoAccess
                                                 : LinuxErrorCode::kNoDevice;
    refuseLinux(error, code, "%@: %@ media controller is %@; there are %@.", purpose,
                fitting.empty() ? "no" : "more than one", textOf(match), listOf(texts));
    return nullptr;
  }
  std::weak_ptr<MediaDevice>& known = opened_[fitting.front()->path];
  if (std::shared_ptr<MediaDevice> device = known.lock()) return device->readGraph(error) ? device : nullptr;
  const MediaDeviceInfo& found = *fitting.front();
  std::shared_ptr<MediaDevice> device = MediaDevice::open(kernel_, roots_, found.path, error);
  if (device == nullptr || !isStillThere(found.identity, textOf(found), error)) return nullptr;
  known = device;
  return device;
}

}  // namespace quazor
