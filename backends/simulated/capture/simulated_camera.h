// SimulatedCamera: a camera of the scenario as a back of the capture service.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/simulated/capture/capture_hardware.h"

#include <cstddef>
#include <memory>

namespace quazor {

// Thread: one at a time.
class SimulatedCamera final : public CameraBack {
 public:
  // The camera with that index.
  SimulatedCamera(std::shared_ptr<CaptureHardware> hardware, std::size_t index);

  std::size_t index() const { return index_; }

  const CameraInfo& info() const override { return info_; }
  std::optional<std::string> cameraName() const override { return info_.name; }
  bool open(CameraSettings&, DiagnosticErrorPtr*) override { return true; }
  void close() override {}
  std::optional<std::uint64_t> maxFormatIndex() const override { return state().camera.formats.size() - 1; }
  std::optional<double> maxFrameRate(const CameraSettings& settings) const override {
    return state().formatMaximum(settings);
  }
  bool applyFormat(const CameraSettings&, DiagnosticErrorPtr*) override { return true; }
  bool applyRates(const CameraSettings&, DiagnosticErrorPtr*) override { return true; }
  bool applyAutoExposure(const CameraSettings&, DiagnosticErrorPtr*) override { return true; }
  bool checkLightSource(const CameraSettings&, DiagnosticErrorPtr*) override { return true; }
  std::optional<Dictionary> errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const override;
  std::optional<SessionCount> sessionCount(const CaptureRun* run, const CaptureRun& master) const override;

 private:
  const CameraState& state() const { return hardware_->cameras[index_]; }

  const std::shared_ptr<CaptureHardware> hardware_;
  const std::size_t index_;
  const CameraInfo info_;
};

// Thread: any.
class SimulatedStreaming final : public StreamingBack {
 public:
  explicit SimulatedStreaming(std::shared_ptr<CaptureHardware> hardware) : hardware_(std::move(hardware)) {}

  std::shared_ptr<CaptureRun> start(CameraBack& camera, const CameraSettings& settings,
                                    DiagnosticErrorPtr* error) override;
  void quiesce(CaptureRun& run) override;
  bool end(CaptureRun& run, DiagnosticErrorPtr* error) override;

 private:
  const std::shared_ptr<CaptureHardware> hardware_;
};

}  // namespace quazor
