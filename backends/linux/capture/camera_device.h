// LinuxCamera: one camera of the binding. It has its video node open while a user has control of it.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/capture/frame_trace.h"
#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/camera_controls.h"
#include "backends/linux/capture/camera_rate.h"
#include "backends/linux/capture/camera_run.h"
#include "backends/linux/media/media_pipeline.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "contract/value.h"

#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// State shared by the cameras of a machine.
//
// Thread: one at a time; any for the const members.
struct LinuxCameras {
  LinuxCameras(std::shared_ptr<V4l2Api> system, DeviceRoots deviceRoots)
      : kernel(std::move(system)), roots(std::move(deviceRoots)), media(kernel, roots) {}

  const std::shared_ptr<V4l2Api> kernel;
  const DeviceRoots roots;
  const std::shared_ptr<DeliveredFrames> delivered = std::make_shared<DeliveredFrames>(0);
  std::map<std::string, std::shared_ptr<TracedStream>> traced;  // by port; empty: the frames are not traced
  std::vector<V4l2DeviceInfo> nodes;                            // as found before the cameras were opened
  MediaDevices media;
};

// Thread: one at a time.
class LinuxCamera final : public CameraBack {
 public:
  LinuxCamera(CameraBinding binding, std::shared_ptr<LinuxCameras> cameras);

  const CameraInfo& info() const override { return info_; }
  // The driver's card and bus: "Integrated Webcam (usb-0000:00:14.0-1)".
  std::optional<std::string> cameraName() const override;
  // Finds and opens the nodes of the camera, prepares its path through a media controller, switches its projector off
  // and sets the controls of the binding. Automatic exposure keeps the driver's setting.
  bool open(CameraSettings& settings, DiagnosticErrorPtr* error) override;
  void close() override;
  std::optional<std::uint64_t> maxFormatIndex() const override { return std::nullopt; }
  std::optional<double> maxFrameRate(const CameraSettings&) const override { return std::nullopt; }
  bool applyFormat(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  // Sets the rate in the driver as soon as both rates are known and do not contradict each other.
  bool applyRates(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  // Sets the exposure control if the camera has one. A camera without one never adjusts its exposure.
  bool applyAutoExposure(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  bool checkLightSource(const CameraSettings& wanted, DiagnosticErrorPtr* error) override;
  std::optional<Dictionary> errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const override;
  std::optional<SessionCount> sessionCount(const CaptureRun* run, const CaptureRun& master) const override;

  // Starts streaming; returns null and an error on failure. Sets links, pads, format and rate again, because another
  // process may have changed them, or the format may have changed the rate. REQUIRES: open.
  std::shared_ptr<CameraRun> begin(const CameraSettings& settings, DiagnosticErrorPtr* error);

 private:
  const std::string& port() const { return binding_.port; }
  bool openNodes(DiagnosticErrorPtr* error);
  bool openControls(DiagnosticErrorPtr* error);
  bool checkMetadata(const V4l2Device& node, DiagnosticErrorPtr* error) const;
  bool exposesAutomatically() const;
  VideoMode modeOf(const CameraSettings& settings) const;
  const FormatBinding* formatOf(const CameraSettings& settings) const;
  std::optional<FrameInterval> intervalOf(const CameraSettings& wanted, DiagnosticErrorPtr* error);
  std::vector<ControlSetting> lightOf(const Value& configuration) const;

  const CameraBinding binding_;
  const CameraInfo info_;
  const std::shared_ptr<LinuxCameras> cameras_;
  std::shared_ptr<V4l2Device> node_;
  std::shared_ptr<V4l2Device> metadataNode_;
  std::unique_ptr<MediaPipeline> pipeline_;  // null if the binding has none
  std::shared_ptr<const CameraControls> controls_;
};

}  // namespace quazor
