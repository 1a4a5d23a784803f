#include "backends/linux/projector_guard.h"

#include "backends/linux/file_descriptor.h"

#include <fcntl.h>
#include <linux/close_range.h>
#include <linux/videodev2.h>
#include <sys/ioctl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
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

struct Connection {
  FileDescriptor ours;
  FileDescriptor theirs;
};

// Returns 0 or the error number.
int connect(Connection& connection) {
  std::array<int, 2> ends{};
  if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends.data()) != 0) return errno;
  connection = {FileDescriptor(ends[0]), FileDescriptor(ends[1])};
  return 0;
}

// Waits for a byte or for the end of the connection.
void await(int connection) {
  char any = 0;
  while (::read(connection, &any, 1) < 0 && errno == EINTR) continue;
}

void closeRange(unsigned int first, unsigned int last) {
  if (first <= last) ::syscall(SYS_close_range, first, last, 0U);
}

// Closes every descriptor but the two.
void closeAllBut(int one, int other) {
  const auto low = static_cast<unsigned int>(std::min(one, other));
  const auto high = static_cast<unsigned int>(std::max(one, other));
  if (low > 0) closeRange(0, low - 1);
  closeRange(low + 1, high - 1);
  closeRange(high + 1, ~0U);
}

// In the new process. Closing the last of its copies tells our process that it is ready. The priority helps it to come
// before whoever looks for processes that were left behind; without the right to it, it is as good as any other.
[[noreturn]] void becomeGuard(int connection, int device, const std::vector<ControlValue>& values, ControlSetter set) {
  ::setsid();
  ::prctl(PR_SET_NAME, kProjectorGuardName);
  ::setpriority(PRIO_PROCESS, 0, -20);
  closeAllBut(connection, device);
  guardControlsUntilEnd(connection, device, values.data(), values.size(), set);
  ::_exit(0);
}

class ProjectorGuard final : public ControlGuard {
 public:
  ProjectorGuard(pid_t process, FileDescriptor connection) : process_(process), connection_(std::move(connection)) {}
  ~ProjectorGuard() override {
    // A copy of this process may have the connection open too, so that closing it would not be noticed.
    const char end = 0;
    ::send(connection_.get(), &end, 1, MSG_NOSIGNAL);
    while (::waitpid(process_, nullptr, 0) < 0 && errno == EINTR) continue;
  }

 private:
  const pid_t process_;
  const FileDescriptor connection_;
};

}  // namespace

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

void guardControlsUntilEnd(int connection, int device, const ControlValue* values, std::size_t count,
                           ControlSetter set) {
  await(connection);
  for (std::size_t i = 0; i < count; ++i) set(device, values[i]);
}

std::unique_ptr<ControlGuard> startProjectorGuard(const std::string& path, const std::vector<ControlValue>& values,
                                                  ControlSetter set, int* number) {
  // Opened anew: a copy of our descriptor would keep its buffers in use after we have closed it.
  const FileDescriptor device(::open(path.c_str(), O_RDWR | O_NONBLOCK | O_CLOEXEC));
  if (!device) {
    *number = errno;
    return nullptr;
  }
  Connection life;
  Connection ready;
  *number = connect(life);
  if (*number == 0) *number = connect(ready);
  if (*number != 0) return nullptr;

  // The guard is born with all signals blocked: one that came before it could block them would end it.
  sigset_t all;
  sigset_t before;
  sigfillset(&all);
  ::pthread_sigmask(SIG_SETMASK, &all, &before);
  const pid_t process = ::fork();
  if (process == 0) becomeGuard(life.theirs.get(), device.get(), values, set);
  *number = process < 0 ? errno : 0;
  ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
  if (process < 0) return nullptr;

  // Until the guard has closed what it inherited, it keeps our devices open.
  ready.theirs.reset();
  await(ready.ours.get());
  return std::make_unique<ProjectorGuard>(process, std::move(life.ours));
}

}  // namespace quazor
