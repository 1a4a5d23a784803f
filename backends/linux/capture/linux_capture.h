// The capture service on V4L2: cameras of a binding, each on a video node of its own.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/video/v4l2_api.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "platform/capture_service.h"

#include <cstdint>
#include <memory>

namespace quazor {

// docs/linux_capture.md says what each property and counter is here.
//
// A camera's node is looked for and opened when control of its stream is taken, and closed when that is given back, so
// a camera that was removed and came back is found again.
// Thread: any.
class LinuxCapture : public CaptureService {
 public:
  // How many frames the cameras have handed to handlers. Any thread.
  virtual std::uint64_t framesDelivered() const = 0;
};

std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding);
// The same, on another system than the running one.
std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding, std::shared_ptr<V4l2Api> kernel,
                                               DeviceRoots roots);

}  // namespace quazor
