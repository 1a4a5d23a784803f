// The capture service on V4L2: the cameras of a binding, each with its own video node.
#pragma once

#include "backends/capture/frame_trace.h"
#include "backends/linux/binding/binding.h"
#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "platform/capture_service.h"

#include <cstdint>
#include <memory>

namespace quazor {

// docs/linux_capture.md describes the meaning of each property and counter.
//
// The node of a camera is looked up and opened when a user takes control of its stream, and closed when control is
// released. A camera that was reconnected is therefore found again.
// Thread: any.
class LinuxCapture : public CaptureService {
 public:
  // The number of frames passed to handlers. Thread: any.
  virtual std::uint64_t framesDelivered() const = 0;
  // Tells the trace each frame that is delivered from now on, under the port of its camera. Called before a device is
  // made. `clock` is the steady clock, as the kernel's time stamps are.
  virtual void traceFrames(FrameTrace& trace, const std::shared_ptr<const Clock>& clock) = 0;
};

std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding);
// The same, on another system than the running one.
std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding, std::shared_ptr<V4l2Api> kernel,
                                               DeviceRoots roots);

}  // namespace quazor
