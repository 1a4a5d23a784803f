#include "backends/linux/capture/camera_rate.h"

#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <cerrno>
#include <cmath>

namespace quazor {
namespace {

double rounded(double rate) { return std::round(rate * 1000) / 1000; }

// A sensor reads width + horizontal blanking pixels a line, and height + vertical blanking lines a frame.
// `request` has its size.
std::optional<FrameInterval> setBlanking(V4l2Device& camera, const RateRequest& request, DiagnosticErrorPtr* error) {
  const std::optional<VideoControl> vertical = camera.describe(V4L2_CID_VBLANK, error);
  if (!vertical) return std::nullopt;
  const auto pixels = camera.read(*camera.controlOfId(V4L2_CID_PIXEL_RATE), error);
  const auto horizontal = pixels ? camera.read(*camera.controlOfId(V4L2_CID_HBLANK), error) : std::nullopt;
  if (!horizontal) return std::nullopt;
  const double linesPerSecond = static_cast<double>(*pixels) / static_cast<double>(request.width + *horizontal);
  const auto rateOf = [&](std::int64_t blanking) {
    return linesPerSecond / static_cast<double>(request.height + blanking);
  };
  const double exact = linesPerSecond / request.interval.framesPerSecond() - request.height;
  const double step = static_cast<double>(std::max<std::uint64_t>(vertical->step, 1));
  const double steps = std::round((exact - static_cast<double>(vertical->minimum)) / step);
  const std::int64_t blanking = vertical->minimum + std::llround(steps * step);
  if (!takes(*vertical, blanking)) {
    refuseLinux(error, LinuxErrorCode::kNotSupported,
                "%@: %@ does not support %@ between frames in this format; its blanking controls allow %@ to %@ frames "
                "per second.",
                request.port, camera.path(), textOf(request.interval), rounded(rateOf(vertical->maximum)),
                rounded(rateOf(vertical->minimum)));
    return std::nullopt;
  }
  if (!camera.set(*vertical, blanking, error)) return std::nullopt;
  return intervalFor(rateOf(blanking));
}

}  // namespace

FrameInterval intervalFor(double framesPerSecond) {
  const double whole = std::round(framesPerSecond);
  if (whole > 0 && std::abs(framesPerSecond - whole) < 1e-6) return {1, static_cast<std::uint32_t>(whole)};
  return {1000, static_cast<std::uint32_t>(std::lround(framesPerSecond * 1000))};
}

std::optional<FrameInterval> setRate(V4l2Device& camera, const CameraControls& controls, const RateRequest& request,
                                     DiagnosticErrorPtr* error) {
  FrameInterval interval = request.interval;
  const int result = camera.setInterval(&interval);
  if (result == 0) return interval;
  if (result != ENOTTY) {
    failSystemCall(error, "VIDIOC_S_PARM", camera.path(), result);
    return std::nullopt;
  }
  if (request.isOfBinding) return interval;
  const auto sensor = controls.deviceWith({V4L2_CID_VBLANK, V4L2_CID_HBLANK, V4L2_CID_PIXEL_RATE});
  if (sensor != nullptr) {
    RateRequest ofSensor = request;
    if (const Subdevice* const subdevice = controls.subdeviceOf(*sensor)) {
      const std::optional<PadFormat> format = subdevice->format(0, error);
      if (!format) return std::nullopt;
      ofSensor.width = format->width;
      ofSensor.height = format->height;
    }
    return setBlanking(*sensor, ofSensor, error);
  }
  refuseLinux(error, LinuxErrorCode::kNotSupported,
              "%@: the frame rate of %@ cannot be set: its driver has neither VIDIOC_S_PARM nor controls for blanking "
              "and pixel rate. If its rate is fixed or set by other controls, give the \"interval\" of format index %@ "
              "in the binding.",
              request.port, camera.path(), request.formatIndex);
  return std::nullopt;
}

}  // namespace quazor
