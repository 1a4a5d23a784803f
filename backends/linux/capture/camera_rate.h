// The rate of a camera: by the driver's intervals, or by the blanking of its sensor.
#pragma once

#include "backends/linux/capture/camera_controls.h"
#include "backends/linux/video/v4l2_device.h"
#include "contract/diagnostic_error.h"

#include <cstdint>
#include <optional>
#include <string>

namespace quazor {

// The tolerance of a frame rate, relative to the requested one: 29.97 is accepted for 30.
inline constexpr double kRateTolerance = 0.002;

// The shortest exact fraction for a rate: seconds per frame.
FrameInterval intervalFor(double framesPerSecond);

// A requested interval.
struct RateRequest {
  std::string port;  // for messages
  std::uint32_t formatIndex = 0;
  std::uint32_t width = 0;
  std::uint32_t height = 0;
  FrameInterval interval;
  bool isOfBinding = false;  // the binding gives the interval for the format
};

// Requests the interval and returns the one that the driver has set, which may differ. If the driver sets no intervals,
// an interval of the binding is believed; without one, the sensor's vertical blanking is set. Returns nothing and an
// error if all that fails.
std::optional<FrameInterval> setRate(V4l2Device& camera, const CameraControls& controls, const RateRequest& request,
                                     DiagnosticErrorPtr* error);

}  // namespace quazor
