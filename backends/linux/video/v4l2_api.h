// V4l2Api: what the capture service asks of the system, so that a made-up driver can stand in for it.
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

// A control of a video node and the value that it is to get.
struct ControlValue {
  std::uint32_t control = 0;  // V4L2_CID_...
  std::int64_t value = 0;
  bool is64Bit = false;  // the control's type is V4L2_CTRL_TYPE_INTEGER64
};

// Sets controls of a video node when it is destroyed, and also when its process ends in any other way.
// Thread: one at a time.
class ControlGuard {
 public:
  ControlGuard() = default;
  ControlGuard(const ControlGuard&) = delete;
  ControlGuard& operator=(const ControlGuard&) = delete;
  virtual ~ControlGuard() = default;
};

// System calls, as the system has them, but for their results: what fails returns the negated error number, and a call
// that a signal interrupts is made again.
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
  virtual void close(int descriptor) = 0;
  // Takes the device for this descriptor alone, among those who ask for it in this way; -EWOULDBLOCK when it is taken.
  virtual int lock(int descriptor) = 0;
  virtual int ioctl(int descriptor, unsigned long request, void* argument) = 0;
  // Maps a buffer of the device; copies of the process do not have it. In `address` where it is.
  virtual int map(int descriptor, std::size_t length, std::int64_t offset, void** address) = 0;
  virtual void unmap(void* address, std::size_t length) = 0;
  // Waits for any of the descriptors; a negative timeout waits for ever. May return early, with nothing.
  virtual int poll(std::span<pollfd> descriptors, std::chrono::nanoseconds timeout) = 0;

  // A descriptor that polls as readable from signalEvent() to clearEvent(). To be closed.
  virtual int makeEvent() = 0;
  virtual void signalEvent(int event) = 0;
  virtual void clearEvent(int event) = 0;

  // The clock that buffers are stamped by (CLOCK_MONOTONIC).
  virtual std::chrono::nanoseconds now() = 0;

  // A guard that sets `off`, in this order, on the device at `path`. On failure null, and in `number` the error number.
  virtual std::unique_ptr<ControlGuard> guardControls(const std::string& path, const std::vector<ControlValue>& off,
                                                      int* number) = 0;
};

// Makes a call of the system until no signal interrupts it. Its result, or the negated error number.
template <class Call>
int uninterrupted(Call&& call) {
  int result = 0;
  do {
    result = call();
  } while (result < 0 && errno == EINTR);
  return result < 0 ? -errno : result;
}

// The running system's.
std::shared_ptr<V4l2Api> systemVideoKernel();

}  // namespace quazor
