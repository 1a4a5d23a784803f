#include "backends/linux/hid/hidraw_nodes.h"

#include "backends/linux/system/node_number.h"
#include "base/text/input_error.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <optional>
#include <string_view>
#include <system_error>
#include <utility>

namespace quazor {
namespace {

namespace fs = std::filesystem;

fs::path classDirectory(const HidrawRoots& roots) { return roots.sysfs / "class" / "hidraw"; }

std::optional<Bytes> contentOf(const fs::path& file) {
  std::ifstream stream(file, std::ios::binary);
  if (!stream) return std::nullopt;
  Bytes content;
  for (std::array<char, 4096> part; stream.read(part.data(), part.size()), stream.gcount() > 0;) {
    content.insert(content.end(), part.begin(), part.begin() + stream.gcount());
  }
  // Reading fails if the device is removed in the meantime.
  return stream.bad() ? std::nullopt : std::optional(std::move(content));
}

// The line "HID_NAME=..." of the device's uevent file.
std::string nameFrom(const fs::path& uevent) {
  constexpr std::string_view kKey = "HID_NAME=";
  std::ifstream stream(uevent);
  for (std::string line; std::getline(stream, line);) {
    if (line.starts_with(kKey)) return line.substr(kKey.size());
  }
  return {};
}

// The error number of opening the node; 0 if this user can.
int problemOfAccess(const fs::path& path) {
  return ::faccessat(AT_FDCWD, path.c_str(), R_OK | W_OK, AT_EACCESS) == 0 ? 0 : errno;
}

std::optional<HidrawNode> nodeOf(const HidrawRoots& roots, const std::string& name) {
  HidrawNode node;
  node.path = roots.devices / name;
  node.device = hidrawDevice(roots, node.path);
  if (node.device.empty()) return std::nullopt;
  std::optional<Bytes> descriptor = contentOf(node.device / "report_descriptor");
  if (!descriptor) return std::nullopt;
  node.rawDescriptor = *std::move(descriptor);
  node.name = nameFrom(node.device / "uevent");
  try {
    node.descriptor = parseHidReportDescriptor(node.rawDescriptor);
  } catch (const InputError& problem) {
    node.problem = problem.what();
  }
  if (const int problem = problemOfAccess(node.path); problem != 0) {
    node.noAccess = std::strerror(problem);
    node.isForbidden = problem == EACCES || problem == EPERM;
  }
  return node;
}

}  // namespace

bool hasHidraw(const HidrawRoots& roots) {
  std::error_code ignored;
  return fs::is_directory(classDirectory(roots), ignored);
}

fs::path hidrawDevice(const HidrawRoots& roots, const fs::path& path) {
  std::error_code gone;
  fs::path device = fs::canonical(classDirectory(roots) / path.filename() / "device", gone);
  return gone ? fs::path() : device;
}

std::vector<HidrawNode> hidrawNodes(const HidrawRoots& roots) {
  std::vector<std::pair<std::uint32_t, std::string>> names;
  std::error_code gone;
  for (fs::directory_iterator entry(classDirectory(roots), gone), end; !gone && entry != end; entry.increment(gone)) {
    const std::string name = entry->path().filename();
    if (const std::optional<std::uint32_t> number = nodeNumber(name, "hidraw")) names.emplace_back(*number, name);
  }
  std::ranges::sort(names);
  std::vector<HidrawNode> nodes;
  for (const auto& [number, name] : names) {
    if (std::optional<HidrawNode> node = nodeOf(roots, name)) nodes.push_back(*std::move(node));
  }
  return nodes;
}

}  // namespace quazor
