// QZCameraSyncExperiment: streams a group of cameras in lockstep and reports each camera's offset and frame count.
#pragma once

#include "contract/diagnostic_contract.h"
#include "platform/platform.h"

#include <memory>
#include <string>
#include <vector>

namespace quazor {

class CameraSession;

// For each port with a camera name (diagnostics/camera_sync/camera_names.h), the result contains the measurements
// CAMERA.FrameOffset and CAMERA.Frames, and the stream's counters in the auxiliary data ErrorCounters.
// Thread: the host's, as QZExperiment.
class QZCameraSyncExperiment final : public QZExperiment {
 public:
  // `ports` are port types; the first one must be the group's synchronisation master. formatIndexes[i] is the format
  // of ports[i]; `frameRate`, per second, is the minimum and the maximum frame rate of every stream.
  QZCameraSyncExperiment(std::vector<std::string> ports, Array formatIndexes, Value frameRate,
                         Platform platform = installedPlatform());

  const std::vector<std::string>& ports() const { return _ports; }
  void setPorts(std::vector<std::string> ports) { _ports = std::move(ports); }
  const Array& formatIndexes() const { return _formatIndexes; }
  void setFormatIndexes(Array formatIndexes) { _formatIndexes = std::move(formatIndexes); }
  const Value& frameRate() const { return _frameRate; }
  void setFrameRate(Value frameRate) { _frameRate = std::move(frameRate); }

  QZDescription experimentDescription() const override;
  // Parameter: "duration", the streaming time in seconds. Fails with QZErrorDomain code 5 if it is less than 2.
  bool setupWithParameters(const Dictionary& parameters, QZDiagnosticHost* host, DiagnosticErrorPtr* error) override;
  // Blocks for the duration. Fails with the codes of diagnostics/camera_sync/camera_session.h; after a refused frame
  // rate, and when a camera's frame count is negative, it returns null and empties `error`.
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) override;

 private:
  std::unique_ptr<QZExperimentResult> _runSession(CameraSession& session, DiagnosticErrorPtr* error);

  std::vector<std::string> _ports;
  Array _formatIndexes;
  Value _frameRate;
  Platform _platform;
  double _duration = 0;  // seconds
};

}  // namespace quazor
