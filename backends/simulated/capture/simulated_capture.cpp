#include "backends/simulated/capture/simulated_capture.h"

#include "backends/capture/checked_capture.h"
#include "backends/simulated/capture/simulated_camera.h"
#include "backends/simulated/errors/capture_error.h"

#include <stdexcept>
#include <string>
#include <utility>

namespace quazor {
namespace {

std::size_t indexOf(const Scenario& scenario, const std::string& id) {
  for (std::size_t i = 0; i < scenario.cameras.size(); ++i) {
    if (scenario.cameras[i].id == id) return i;
  }
  throw std::invalid_argument("The scenario has no camera " + id + ".");
}

CaptureGroupInfo infoOfGroup(const CameraGroup& group, const Scenario& scenario) {
  CaptureGroupInfo info;
  info.name = group.id;
  info.description = "group " + group.id;
  for (const std::string& camera : group.cameras) info.cameras.push_back(indexOf(scenario, camera));
  info.master = indexOf(scenario, group.master);
  info.takesMasterConfiguration = group.masterConfiguration;
  return info;
}

// Thread: any.
class SimulatedCaptureBack final : public CaptureBack {
 public:
  SimulatedCaptureBack(const Scenario& scenario, std::shared_ptr<CaptureHardware> hardware)
      : hardware_(std::move(hardware)) {
    for (std::size_t i = 0; i < hardware_->cameras.size(); ++i) {
      cameras_.push_back(std::make_shared<SimulatedCamera>(hardware_, i));
    }
    for (const CameraGroup& group : scenario.groups) groups_.push_back(infoOfGroup(group, scenario));
  }

  std::vector<std::shared_ptr<CameraBack>> cameras() const override { return cameras_; }
  std::vector<CaptureGroupInfo> groups() const override { return groups_; }
  std::unique_ptr<StreamingBack> makeStreaming() const override {
    return std::make_unique<SimulatedStreaming>(hardware_);
  }
  bool plugInLoads() const override { return hardware_->device.plugInLoads; }
  std::string missingDevice() const override {
    return hardware_->device.present ? "" : "The phone has no capture device.";
  }
  void storeRefusal(DiagnosticErrorPtr* error, CaptureRefusal reason, std::string message) const override {
    failSimulatedCapture(error, captureErrorCode(reason), std::move(message));
  }

 private:
  const std::shared_ptr<CaptureHardware> hardware_;
  std::vector<std::shared_ptr<CameraBack>> cameras_;
  std::vector<CaptureGroupInfo> groups_;
};

}  // namespace

std::shared_ptr<CaptureService> makeSimulatedCapture(const Scenario& scenario,
                                                     std::shared_ptr<CaptureHardware> hardware) {
  return makeCheckedCapture(std::make_shared<SimulatedCaptureBack>(scenario, std::move(hardware)));
}

}  // namespace quazor
