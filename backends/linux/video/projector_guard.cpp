#include "backends/linux/video/projector_guard.h"

#include "backends/linux/system/file_descriptor.h"

#include <fcntl.h>
#include <linux/videodev2.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstddef>
#include <cstdint>
#include <utility>

namespace quazor {
namespace {

bool isKept(const GuardDescriptors& kept, int descriptor) {
  return descriptor == kept.connection || descriptor == kept.guarded || descriptor == kept.device;
}

// The number that a name in /proc/self/fd is; -1 for "." and "..".
int numberOf(const char* name) {
  int number = 0;
  for (; *name != '\0'; ++name) {
    if (*name < '0' || *name > '9') return -1;
    number = number * 10 + (*name - '0');
  }
  return number;
}

// An entry as getdents64(2) returns it. readdir(3) may allocate memory, which a copy of a process with several threads
// must not do.
struct DirectoryEntry {
  std::uint64_t number;
  std::int64_t offset;
  std::uint16_t length;
  std::uint8_t type;
  char name[1];
};

// Closes what the folder lists. Returns false if there is no such folder.
bool closeListed(const GuardDescriptors& kept) {
  const int folder = ::open("/proc/self/fd", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
  if (folder < 0) return false;
  alignas(DirectoryEntry) std::array<char, 4096> entries;
  // Closing changes the list, so it is read again from its beginning until there is nothing left to close.
  for (bool closed = true; closed;) {
    closed = false;
    ::lseek(folder, 0, SEEK_SET);
    long length = 0;
    while ((length = ::syscall(SYS_getdents64, folder, entries.data(), entries.size())) > 0) {
      for (long at = 0; at < length;) {
        const auto* const entry = reinterpret_cast<const DirectoryEntry*>(entries.data() + at);
        const int descriptor = numberOf(entry->name);
        at += entry->length;
        if (descriptor < 0 || descriptor == folder || isKept(kept, descriptor)) continue;
        closed = ::close(descriptor) == 0 || closed;
      }
    }
  }
  ::close(folder);
  return true;
}

void closePossible(const GuardDescriptors& kept) {
  constexpr rlim_t kMost = 1U << 20;
  rlimit limit{};
  const rlim_t end = ::getrlimit(RLIMIT_NOFILE, &limit) == 0 ? std::min(limit.rlim_cur, kMost) : kMost;
  for (int descriptor = 0; descriptor < static_cast<int>(end); ++descriptor) {
    if (!isKept(kept, descriptor)) ::close(descriptor);
  }
}

// True if both are the same device, or the same file if they are no devices.
bool isSameDevice(int one, int other) {
  struct stat first {};
  struct stat second {};
  if (::fstat(one, &first) != 0 || ::fstat(other, &second) != 0) return false;
  if (S_ISCHR(first.st_mode) && S_ISCHR(second.st_mode)) return first.st_rdev == second.st_rdev;
  return first.st_dev == second.st_dev && first.st_ino == second.st_ino;
}

// Runs in the new process; sends a byte when it is ready.
[[noreturn]] void becomeGuard(const GuardDescriptors& descriptors, const std::vector<ControlValue>& values,
                              ControlSetter set) {
  ::setsid();
  ::prctl(PR_SET_NAME, kProjectorGuardName);
  closeAllBut(descriptors, &closeRange);
  const char ready = 0;
  ::send(descriptors.connection, &ready, 1, MSG_NOSIGNAL);
  guardControlsUntilEnd(descriptors, values.data(), values.size(), set);
  ::_exit(0);
}

class ProjectorGuard final : public ControlGuard {
 public:
  ProjectorGuard(pid_t process, FileDescriptor connection) : process_(process), connection_(std::move(connection)) {}
  ~ProjectorGuard() override {
    // A forked copy of this process may also hold the connection, so closing it is not enough.
    const char end = 0;
    ::send(connection_.get(), &end, 1, MSG_NOSIGNAL);
    while (::waitpid(process_, nullptr, 0) < 0 && errno == EINTR) continue;
  }

 private:
  const pid_t process_;
  const FileDescriptor connection_;
};

}  // namespace

int closeRange(unsigned int first, unsigned int last) {
  return static_cast<int>(::syscall(SYS_close_range, first, last, 0U));
}

void closeAllBut(const GuardDescriptors& kept, RangeCloser close) {
  std::array<int, 3> numbers{kept.connection, kept.guarded, kept.device};
  std::ranges::sort(numbers);
  bool closed = true;
  unsigned int first = 0;
  for (const int number : numbers) {
    const auto one = static_cast<unsigned int>(number);
    if (first < one) closed = close(first, one - 1) == 0 && closed;
    first = one + 1;
  }
  closed = close(first, ~0U) == 0 && closed;
  if (!closed && !closeListed(kept)) closePossible(kept);
}

void setVideoControl(int descriptor, const ControlValue& value) {
  v4l2_ext_control control{};
  control.id = value.control;
  if (value.is64Bit) {
    control.value64 = value.value;
  } else {
    control.value = static_cast<std::int32_t>(value.value);
  }
  v4l2_ext_controls controls{};
  controls.which = V4L2_CTRL_WHICH_CUR_VAL;
  controls.count = 1;
  controls.controls = &control;
  while (::ioctl(descriptor, VIDIOC_S_EXT_CTRLS, &controls) < 0 && errno == EINTR) continue;
}

void guardControlsUntilEnd(const GuardDescriptors& descriptors, const ControlValue* values, std::size_t count,
                           ControlSetter set) {
  std::array<pollfd, 2> ends{{{descriptors.connection, POLLIN, 0}, {descriptors.guarded, POLLIN, 0}}};
  while (::poll(ends.data(), ends.size(), -1) < 0 && errno == EINTR) continue;
  for (std::size_t i = 0; i < count; ++i) set(descriptors.device, values[i]);
}

std::unique_ptr<ControlGuard> startProjectorGuard(const GuardedDevice& guardedDevice,
                                                  const std::vector<ControlValue>& values, ControlSetter set,
                                                  int* number) {
  // Opens the device again: a duplicate of our descriptor would keep its buffers in use after we have closed it.
  const FileDescriptor device(::open(guardedDevice.path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC));
  if (device && guardedDevice.descriptor >= 0 && !isSameDevice(device.get(), guardedDevice.descriptor)) {
    *number = ENODEV;
    return nullptr;
  }
  const FileDescriptor guarded(device ? static_cast<int>(::syscall(SYS_pidfd_open, ::getpid(), 0U)) : -1);
  std::array<int, 2> ends{-1, -1};
  if (!guarded || ::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) {
    *number = errno;
    return nullptr;
  }
  FileDescriptor ours(ends[0]);
  FileDescriptor theirs(ends[1]);

  // Blocks all signals before the fork: the guard must not receive one before it blocks them itself.
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  ::pthread_sigmask(SIG_SETMASK, &all, &before);
  const pid_t process = ::fork();
  if (process == 0) becomeGuard({theirs.get(), guarded.get(), device.get()}, values, set);
  *number = process < 0 ? errno : 0;
  ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
  if (process < 0) return nullptr;

  // Waits for the guard to close the descriptors that it inherited, which keep our devices open.
  theirs.reset();
  char ready = 0;
  ssize_t said = -1;
  while ((said = ::read(ours.get(), &ready, 1)) < 0 && errno == EINTR) continue;
  auto guard = std::make_unique<ProjectorGuard>(process, std::move(ours));
  if (said == 1) return guard;
  *number = ECHILD;  // the guard ended before it was ready
  return nullptr;
}

}  // namespace quazor
