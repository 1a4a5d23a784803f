// LinuxCamera: one camera of the binding, with the video node that stands for it while somebody has control of it.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/camera_run.h"
#include "backends/linux/video/v4l2_device_info.h"
#include "contract/value.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <vector>

namespace quazor {

// One user of the cameras: each device that a plug-in hands out. 0 is nobody.
using LinuxUserId = std::uint64_t;

// The stream's properties, as they were set, so that they read back as the kind of number they were.
struct CameraSettings {
  Value formatIndex{0U};
  std::optional<Value> minimumRate;
  std::optional<Value> maximumRate;
  Value multipleOutputs{false};
  Value slaveConfiguration{Dictionary{}};
  Value autoExposure{true};
  Value lightSource = darkness();
  Value outputConfigurations{Dictionary{}};
  Value outputsEnabled{Dictionary{}};
  Value outputHandlers{Dictionary{}};

  // The InfraredLightSourceConfiguration that lets nothing fire.
  static Value darkness();
  // The frame handler of the primary output; null when it is not enabled or has none.
  std::shared_ptr<PixelBufferHandler> frameHandler() const;
};

enum class CameraPhase { kStopped, kRunning, kStopping };

// How far the driver's frame rate may be from the one that was asked for, as a share of it: 29.97 counts as 30.
inline constexpr double kRateTolerance = 0.002;

// The shortest fraction for a rate: of seconds, from frame to frame.
FrameInterval intervalFor(double framesPerSecond);

// Holds no rules of who may do what when; the capture objects have those.
//
// Thread: one at a time.
class LinuxCamera final {
 public:
  explicit LinuxCamera(CameraBinding binding) : binding_(std::move(binding)) {}

  const CameraBinding& binding() const { return binding_; }
  const std::string& port() const { return binding_.port; }
  const CameraSettings& settings() const { return settings_; }
  CameraSettings& settings() { return settings_; }

  LinuxUserId holder = 0;
  CameraPhase phase = CameraPhase::kStopped;
  bool freedByStop = false;  // the holder let go of it while it was being stopped; who stops it frees it
  // The present stretch, or else the last one.
  std::shared_ptr<CameraRun> run;

  // Finds and opens the camera's nodes among those that there are, puts its projector out and sets the binding's
  // controls. On failure nothing is left open. The settings are new; automatic exposure is as the driver has it.
  bool open(const std::shared_ptr<V4l2Api>& kernel, const std::vector<V4l2DeviceInfo>& nodes,
            DiagnosticErrorPtr* error);
  void close();

  // REQUIRES, for what follows: open. Each changes the setting only when the driver did as it was told.
  bool setFormatIndex(const Value& index, DiagnosticErrorPtr* error);
  // Minimum and maximum rate. The driver is asked as soon as both are known and do not contradict each other.
  bool setRates(const std::optional<Value>& minimum, const std::optional<Value>& maximum, DiagnosticErrorPtr* error);
  // Sets the control of that purpose where the camera has one. Without one, its exposure never changes by itself.
  bool setAutoExposure(const Value& enabled, DiagnosticErrorPtr* error);
  bool setLightSource(const Value& configuration, DiagnosticErrorPtr* error);
  // Format and rate are set anew: somebody else may have set others since, and a format may have changed the rate.
  // The stretch, which has begun; null, and an error, on failure.
  std::shared_ptr<CameraRun> begin(std::shared_ptr<DeliveredFrames> delivered, DiagnosticErrorPtr* error);

 private:
  bool prepare(DiagnosticErrorPtr* error);
  bool exposesAutomatically() const;
  bool applyFormat(const Value& index, DiagnosticErrorPtr* error);
  std::optional<FrameInterval> applyRates(const std::optional<Value>& minimum, const std::optional<Value>& maximum,
                                          DiagnosticErrorPtr* error);
  std::vector<ControlSetting> lightOf(const Value& configuration) const;

  const CameraBinding binding_;
  CameraSettings settings_;
  std::shared_ptr<V4l2Device> node_;
  std::shared_ptr<V4l2Device> metadataNode_;
};

}  // namespace quazor
