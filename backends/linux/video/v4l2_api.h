// V4l2Api: the system calls on video nodes and media controllers, replaceable by a fake driver.
#pragma once

#include <poll.h>

#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace quazor {

// A control of a video node and the value to set.
struct ControlValue {
  std::uint32_t control = 0;  // V4L2_CID_...
  std::int64_t value = 0;
  bool is64Bit = false;  // the control's type is V4L2_CTRL_TYPE_INTEGER64
};

// Sets controls of a video node when it is destroyed, and also if the process ends in any other way.
// Thread: one at a time.
class ControlGuard {
 public:
  ControlGuard() = default;
  ControlGuard(const ControlGuard&) = delete;
  ControlGuard& operator=(const ControlGuard&) = delete;
  virtual ~ControlGuard() = default;
};

// Thin wrappers of system calls. They return a negated error number on failure and restart after a signal.
//
// Thread: any.
class V4l2Api {
 public:
  V4l2Api() = default;
  V4l2Api(const V4l2Api&) = delete;
  V4l2Api& operator=(const V4l2Api&) = delete;
  virtual ~V4l2Api() = default;

  // Opens a device for reading and writing, without blocking calls. Returns the descriptor.
  virtual int open(const std::string& path) = 0;
  // Opens a device for queries only. A driver may refuse some calls on such a descriptor, and a user needs only the
  // permission to read.
  virtual int openForQueries(const std::string& path) = 0;
  virtual void close(int descriptor) = 0;
  // Locks the device for this descriptor among all callers of this function; -EWOULDBLOCK if it is locked.
  virtual int lock(int descriptor) = 0;
  virtual int ioctl(int descriptor, unsigned long request, void* argument) = 0;
  // Maps a buffer of the device and stores its address in `address`. Forked copies of the process do not inherit it.
  virtual int map(int descriptor, std::size_t length, std::int64_t offset, void** address) = 0;
  virtual void unmap(void* address, std::size_t length) = 0;
  // Waits for any of the descriptors; a negative timeout means no limit. May return early without an event.
  virtual int poll(std::span<pollfd> descriptors, std::chrono::nanoseconds timeout) = 0;

  // A descriptor that is readable from signalEvent() until clearEvent(). The caller closes it.
  virtual int makeEvent() = 0;
  virtual void signalEvent(int event) = 0;
  virtual void clearEvent(int event) = 0;

  // The clock of buffer time stamps (CLOCK_MONOTONIC).
  virtual std::chrono::nanoseconds now() = 0;

  // A guard that sets `off`, in this order, on the device at `path`, which must be the one that is open with
  // `descriptor`. Returns null and an error number in `number` on failure: ENODEV if it is another device.
  virtual std::unique_ptr<ControlGuard> guardControls(const std::string& path, int descriptor,
                                                      const std::vector<ControlValue>& off, int* number) = 0;
};

// Repeats a system call while signals interrupt it. Returns its result, or the negated error number.
template <class Call>
int uninterrupted(Call&& call) {
  int result = 0;
  do {
    result = call();
  } while (result < 0 && errno == EINTR);
  return result < 0 ? -errno : result;
}

// The calls of the running system.
std::shared_ptr<V4l2Api> systemVideoKernel();

}  // namespace quazor
