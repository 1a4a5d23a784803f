// A process beside ours that puts the light out when ours ends.
#pragma once

#include "backends/linux/video/v4l2_api.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace quazor {

// Sets one control of an open device. Called in the guard's process, where only async-signal-safe functions may be.
using ControlSetter = void (*)(int descriptor, const ControlValue& value);

// VIDIOC_S_EXT_CTRLS.
void setVideoControl(int descriptor, const ControlValue& value);

// Starts a process that waits: when this process destroys the guard, or ends in whatever way, it sets
// the values on the device at `path`, in order, and ends. Destroying the guard waits until that is done.
//
// The process is in a session of its own, so that a signal to our group does not reach it, blocks all signals that can
// be blocked, and has no descriptors but the device's, opened anew, the end of a connection, and one that tells of the
// end of this process, also where a copy of it lives on (pidfd_open(2)). On failure null, and in `number` the error
// number.
std::unique_ptr<ControlGuard> startProjectorGuard(const std::string& path, const std::vector<ControlValue>& values,
                                                  ControlSetter set, int* number);

// What the guard's process is left with.
struct GuardDescriptors {
  int connection = -1;
  int guarded = -1;  // of the process whose end it waits for
  int device = -1;
};

// The work of the guard's process once it is set up: waits for a byte or the end of the connection, or for the end of
// the process, then sets the values.
void guardControlsUntilEnd(const GuardDescriptors& descriptors, const ControlValue* values, std::size_t count,
                           ControlSetter set);

// The name that the guard's process has in process lists (at most 15 characters).
inline constexpr const char* kProjectorGuardName = "quazor-dark";

}  // namespace quazor
