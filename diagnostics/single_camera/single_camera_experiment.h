// QZSingleCameraExperiment: streams one camera of any kind and measures its frames.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/parameter_range.h"
#include "platform/platform.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace quazor {

// The domain of the experiment's errors.
inline constexpr std::string_view SingleCameraErrorDomain = "SingleCameraErrorDomain";
namespace single_camera_error {
inline constexpr std::int64_t kNoDevice = 1;
inline constexpr std::int64_t kNoCamera = 2;
inline constexpr std::int64_t kControlRefused = 3;
inline constexpr std::int64_t kSettingRefused = 4;
inline constexpr std::int64_t kStartRefused = 5;
inline constexpr std::int64_t kStopRefused = 6;
inline constexpr std::int64_t kNoErrorCounters = 7;
}  // namespace single_camera_error

class FrameRecorder;

// The result contains the measurements of single_camera_names.h: what the frames' time stamps say, how long the camera
// was silent at both ends of the stream, and by how much each of the stream's error counters grew. Its auxiliary data
// says which camera it was.
// Thread: the host's, as QZExperiment; frames arrive on threads of the capture service.
class QZSingleCameraExperiment final : public QZExperiment, public QZTeardown, public QZParameterRanges {
 public:
  explicit QZSingleCameraExperiment(Platform platform = installedPlatform());

  QZDescription experimentDescription() const override;
  OrderedMap<QZParameterRange> parameterRanges() const override;
  // Parameters, all optional: "duration" of the stream in seconds, 3; "camera", its position among the device's
  // streams, 0; "frameRate" to ask for, per second, 30; "formatIndex", 0. Fails
  // with QZErrorDomain code 5 if one is out of range.
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  // Blocks for the duration. Fails with the codes above.
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;
  // Releases the device, which stops the camera if it still runs.
  bool teardown(DiagnosticErrorPtr* error) override;

 private:
  bool openStream(DiagnosticErrorPtr* error);
  // The position, the port and the name of the camera, for people.
  std::string cameraText() const;
  bool configureStream(const std::shared_ptr<FrameRecorder>& recorder, DiagnosticErrorPtr* error);
  std::optional<Value> errorCounters(DiagnosticErrorPtr* error);
  std::unique_ptr<QZExperimentResult> stream(FrameRecorder& recorder, DiagnosticErrorPtr* error);

  const Platform platform_;
  double duration_ = 3;    // seconds
  double frameRate_ = 30;  // per second
  std::uint64_t camera_ = 0;
  std::uint64_t formatIndex_ = 0;
  std::string cameraText_;
  std::shared_ptr<CaptureDevice> device_;
  std::shared_ptr<CaptureStream> stream_;
};

}  // namespace quazor
