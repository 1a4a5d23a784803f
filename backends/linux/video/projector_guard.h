// A separate process that switches the projector off when this process ends.
#pragma once

#include "backends/linux/video/v4l2_api.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Sets one control of an open device. Called in the guard's process, so it may only call async-signal-safe functions.
using ControlSetter = void (*)(int descriptor, const ControlValue& value);

// Uses VIDIOC_S_EXT_CTRLS.
void setVideoControl(int descriptor, const ControlValue& value);

struct GuardedDevice {
  std::string path;
  int descriptor = -1;  // the same device, opened by the caller; -1: any device is guarded
};

// Starts a process that waits until this process destroys the guard or ends for any reason. It then sets the values on
// the device, in order, and exits. Destroying the guard waits for that.
//
// The process has its own session, so signals to our process group do not reach it, and it blocks all signals that can
// be blocked. Its only descriptors are the device, opened again, one end of a connection, and a pidfd (pidfd_open(2)),
// which signals the end of this process even if a forked copy survives. Returns null and an error number in `number` on
// failure.
std::unique_ptr<ControlGuard> startProjectorGuard(const GuardedDevice& device, const std::vector<ControlValue>& values,
                                                  ControlSetter set, int* number);

// The descriptors of the guard's process.
struct GuardDescriptors {
  int connection = -1;
  int guarded = -1;  // pidfd of the process whose end it waits for
  int device = -1;
};

// Closes the descriptors from `first` to `last`; returns 0, or -1 and an error number in errno.
using RangeCloser = int (*)(unsigned int first, unsigned int last);

// Uses close_range(2).
int closeRange(unsigned int first, unsigned int last);

// Closes all descriptors except those three, with `close` or, if that fails as it does before Linux 5.9, one by one.
// Async- signal-safe.
void closeAllBut(const GuardDescriptors& kept, RangeCloser close);

// The main function of the guard's process: waits for a byte, the end of the connection or the end of the guarded
// process, then sets the values.
void guardControlsUntilEnd(const GuardDescriptors& descriptors, const ControlValue* values, std::size_t count,
                           ControlSetter set);

// The name of the guard's process in process lists (at most 15 characters).
inline constexpr const char* kProjectorGuardName = "quazor-dark";

}  // namespace quazor
