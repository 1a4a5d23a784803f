#include "host/system/own_descriptor.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <charconv>
#include <string>
#include <system_error>

namespace quazor {

namespace fs = std::filesystem;

std::optional<int> ownDescriptor(fs::path file) {
  constexpr int kMaxLinks = 40;  // as many as the kernel follows
  const fs::path own = fs::path("/proc") / std::to_string(::getpid()) / "fd";
  for (int links = 0; links < kMaxLinks; ++links) {
    std::error_code error;
    const fs::path folder = fs::canonical(file.has_parent_path() ? file.parent_path() : fs::path("."), error);
    if (error) break;
    const std::string name = file.filename().string();
    if (folder == own) {
      int number = -1;
      const auto [end, problem] = std::from_chars(name.data(), name.data() + name.size(), number);
      if (problem != std::errc() || end != name.data() + name.size() || number < 0) break;
      return number;
    }
    const fs::path target = fs::read_symlink(folder / name, error);
    if (error) break;
    file = target.is_absolute() ? target : folder / target;
  }
  return std::nullopt;
}

int writableCopyOf(int descriptor) {
  const int mode = ::fcntl(descriptor, F_GETFL);
  if (mode < 0) return -1;
  if ((mode & O_ACCMODE) == O_RDONLY) {
    errno = EBADF;
    return -1;
  }
  return ::fcntl(descriptor, F_DUPFD_CLOEXEC, 0);
}

}  // namespace quazor
