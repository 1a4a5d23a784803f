// LinuxCamera: one camera of the binding, with the video node that is its own while somebody has control of it.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/camera_run.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "contract/value.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

namespace quazor {

// What the cameras of a machine share.
//
// Thread: one at a time; what is const, any.
struct LinuxCameras {
  LinuxCameras(std::shared_ptr<V4l2Api> system, DeviceRoots deviceRoots)
      : kernel(std::move(system)), roots(std::move(deviceRoots)) {}

  const std::shared_ptr<V4l2Api> kernel;
  const DeviceRoots roots;
  const std::shared_ptr<DeliveredFrames> delivered = std::make_shared<DeliveredFrames>(0);
  std::vector<V4l2DeviceInfo> nodes;  // as they were before cameras were opened
};

// How far the driver's frame rate may be from the one that was asked for, as a share of it: 29.97 counts as 30.
inline constexpr double kRateTolerance = 0.002;

// The shortest fraction for a rate: of seconds, from frame to frame.
FrameInterval intervalFor(double framesPerSecond);

// Thread: one at a time.
class LinuxCamera final : public CameraBack {
 public:
  LinuxCamera(CameraBinding binding, std::shared_ptr<LinuxCameras> cameras);

  const CameraInfo& info() const override { return info_; }
  // Finds and opens the camera's nodes among those that there are, puts its projector out and sets the binding's
  // controls. Automatic exposure is as the driver has it.
  bool open(CameraSettings& settings, DiagnosticErrorPtr* error) override;
  void close() override;
  std::optional<std::uint64_t> maxFormatIndex() const override { return std::nullopt; }
  std::optional<double> maxFrameRate(const CameraSettings&) const override { return std::nullopt; }
  bool applyFormat(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  // The driver is asked as soon as both rates are known and do not contradict each other.
  bool applyRates(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  // Sets the control of that purpose where the camera has one. Without one, its exposure never changes by itself.
  bool applyAutoExposure(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  bool checkLightSource(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  std::optional<Dictionary> errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const override;
  std::optional<SessionCount> sessionCount(const CaptureRun* run, const CaptureRun& master) const override;

  // Format and rate are set once more: somebody else may have set others since, and a format may have changed the
  // rate. The stretch, which has begun; null, and an error, on failure. REQUIRES: open.
  std::shared_ptr<CameraRun> begin(const CameraSettings& settings, DiagnosticErrorPtr* error);

 private:
  const std::string& port() const { return binding_.port; }
  bool prepare(DiagnosticErrorPtr* error);
  bool exposesAutomatically() const;
  std::optional<FrameInterval> intervalOf(const CameraSettings& wanted, DiagnosticErrorPtr* error);
  std::vector<ControlSetting> lightOf(const Value& configuration) const;

  const CameraBinding binding_;
  const CameraInfo info_;
  const std::shared_ptr<LinuxCameras> cameras_;
  std::shared_ptr<V4l2Device> node_;
  std::shared_ptr<V4l2Device> metadataNode_;
};

}  // namespace quazor
