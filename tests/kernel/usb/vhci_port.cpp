#include "tests/kernel/usb/vhci_port.h"

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <fstream>
#include <sstream>
#include <utility>

namespace quazor {
namespace {

constexpr int kFree = 4;
constexpr int kHighSpeed = 3;

}  // namespace

// A line of the table is "hs  0000 004 000 00000000 000000 0-0": kind, port, state, speed and more.
std::optional<int> freePort(const std::string& status) {
  std::istringstream lines(status);
  for (std::string line; std::getline(lines, line);) {
    std::istringstream words(line);
    std::string kind;
    int port = 0;
    int state = 0;
    if (words >> kind >> port >> state && kind == "hs" && state == kFree) return port;
  }
  return std::nullopt;
}

FileDescriptor attachToPort(const std::filesystem::path& controller) {
  std::ifstream file(controller / "status");
  std::ostringstream status;
  status << file.rdbuf();
  const std::optional<int> free = freePort(status.str());
  if (!free) {
    errno = file ? ENOSPC : ENOENT;
    return FileDescriptor();
  }
  std::array<int, 2> ends{-1, -1};
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) return FileDescriptor();
  FileDescriptor device(ends[0]);
  const FileDescriptor host(ends[1]);  // the kernel keeps its end open
  const FileDescriptor attach(::open((controller / "attach").c_str(), O_WRONLY | O_CLOEXEC));
  const int identity = *free + 1;
  const std::string line = std::to_string(*free) + ' ' + std::to_string(host.get()) + ' ' + std::to_string(identity) +
                           ' ' + std::to_string(kHighSpeed);
  if (!attach || ::write(attach.get(), line.data(), line.size()) != static_cast<ssize_t>(line.size())) {
    return FileDescriptor();
  }
  return device;
}

}  // namespace quazor
