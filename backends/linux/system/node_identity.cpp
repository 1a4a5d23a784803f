#include "backends/linux/system/node_identity.h"

#include "backends/linux/system/linux_error.h"

#include <sys/stat.h>

namespace quazor {

NodeIdentity NodeIdentity::of(const std::filesystem::path& entry) {
  constexpr std::int64_t kPerSecond = 1'000'000'000;
  struct stat status {};
  if (::stat(entry.c_str(), &status) != 0) return {entry};
  return {entry, status.st_ino, std::int64_t{status.st_ctim.tv_sec} * kPerSecond + status.st_ctim.tv_nsec};
}

bool isStillThere(const NodeIdentity& identity, const std::string& device, DiagnosticErrorPtr* error) {
  return NodeIdentity::of(identity.entry).number == identity.number || refuseReplaced(device, error);
}

bool refuseReplaced(const std::string& device, DiagnosticErrorPtr* error) {
  return refuseLinux(error, LinuxErrorCode::kDeviceGone, "%@ was replaced by another device before it was opened.",
                     device);
}

}  // namespace quazor
