#include "backends/linux/capture/linux_capture.h"

#include "backends/capture/checked_capture.h"
#include "backends/linux/capture/camera_device.h"
#include "backends/linux/capture/camera_poller.h"
#include "backends/linux/system/linux_error.h"

#include <algorithm>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

constexpr LinuxErrorCode codeOf(CaptureRefusal reason) {
  switch (reason) {
    case CaptureRefusal::kNoDevice: return LinuxErrorCode::kNoDevice;
    case CaptureRefusal::kUnknownProperty:
    case CaptureRefusal::kReadOnlyProperty: return LinuxErrorCode::kNoSuchProperty;
    case CaptureRefusal::kWrongType:
    case CaptureRefusal::kOutOfRange:
    case CaptureRefusal::kForeignObject: return LinuxErrorCode::kBadValue;
    case CaptureRefusal::kUnsupported: return LinuxErrorCode::kNotSupported;
    case CaptureRefusal::kControlledByAnother: return LinuxErrorCode::kBusy;
    case CaptureRefusal::kNotControlled:
    case CaptureRefusal::kWrongState:
    case CaptureRefusal::kUnreadableProperty:
    case CaptureRefusal::kInvalidated: return LinuxErrorCode::kWrongState;
  }
  return LinuxErrorCode::kWrongState;
}

// The streams of one user and their thread. Thread: any.
class LinuxStreaming final : public StreamingBack {
 public:
  explicit LinuxStreaming(std::shared_ptr<V4l2Api> kernel) : poller_(std::move(kernel)) {}

  std::shared_ptr<CaptureRun> start(CameraBack& camera, const CameraSettings& settings,
                                    DiagnosticErrorPtr* error) override {
    std::shared_ptr<CameraRun> run = static_cast<LinuxCamera&>(camera).begin(settings, error);
    if (run == nullptr || poller_.add(run, error)) return run;
    run->end(nullptr);
    return nullptr;
  }
  void quiesce(CaptureRun& run) override { poller_.remove(static_cast<CameraRun&>(run)); }
  bool end(CaptureRun& run, DiagnosticErrorPtr* error) override { return static_cast<CameraRun&>(run).end(error); }

 private:
  CameraPoller poller_;
};

// V4L2 starts each camera separately. The hardware determines whether the cameras of a group are synchronised, and
// MulticamSessionStatus shows it. Thread: any, except prepareToOpen().
class LinuxCaptureBack final : public CaptureBack {
 public:
  LinuxCaptureBack(const Binding& binding, std::shared_ptr<LinuxCameras> shared) : shared_(std::move(shared)) {
    for (const CameraBinding& camera : binding.cameras) {
      cameras_.push_back(std::make_shared<LinuxCamera>(camera, shared_));
    }
    for (const GroupBinding& group : binding.groups) addGroup(group);
  }

  std::vector<std::shared_ptr<CameraBack>> cameras() const override { return cameras_; }
  std::vector<CaptureGroupInfo> groups() const override { return groups_; }
  std::unique_ptr<StreamingBack> makeStreaming() const override {
    return std::make_unique<LinuxStreaming>(shared_->kernel);
  }
  std::string missingDevice() const override {
    return cameras_.empty() ? "The binding names no camera, so there is no capture device." : "";
  }
  void prepareToOpen() override { shared_->nodes = videoNodes(shared_->kernel, shared_->roots, shared_->nodes); }
  void storeRefusal(DiagnosticErrorPtr* error, CaptureRefusal reason, std::string message) const override {
    failLinux(error, codeOf(reason), std::move(message));
  }

 private:
  // Skips a group with an unknown camera, which the reader of bindings rejects.
  void addGroup(const GroupBinding& group) {
    CaptureGroupInfo info;
    info.name = "group";
    bool isKnown = true;
    const auto indexOf = [&](const std::string& port) {
      const auto found = std::ranges::find(cameras_, port, [](const auto& camera) { return camera->info().port; });
      isKnown = isKnown && found != cameras_.end();
      return static_cast<std::size_t>(found - cameras_.begin());
    };
    for (const std::string& port : group.ports) {
      info.name += " " + port;
      info.cameras.push_back(indexOf(port));
    }
    info.master = indexOf(group.master);
    info.description = info.name;
    if (isKnown) groups_.push_back(std::move(info));
  }

  const std::shared_ptr<LinuxCameras> shared_;
  std::vector<std::shared_ptr<CameraBack>> cameras_;
  std::vector<CaptureGroupInfo> groups_;
};

// Thread: any.
class LinuxCaptureService final : public LinuxCapture {
 public:
  LinuxCaptureService(const Binding& binding, const std::shared_ptr<LinuxCameras>& shared)
      : shared_(shared), service_(makeCheckedCapture(std::make_shared<LinuxCaptureBack>(binding, shared))) {
    for (const CameraBinding& camera : binding.cameras) ports_.push_back(camera.port);
  }

  std::shared_ptr<CapturePlugIn> createPlugIn() override { return service_->createPlugIn(); }
  std::shared_ptr<CapturePlugIn> defaultPlugIn() override { return service_->defaultPlugIn(); }
  std::uint64_t framesDelivered() const override { return shared_->delivered->load(std::memory_order_relaxed); }
  void traceFrames(FrameTrace& trace, const std::shared_ptr<const Clock>& clock) override {
    for (const std::string& port : ports_) {
      shared_->traced[port] = trace.addStream(port, clock, WhenTraceIsFull::kLose);
    }
  }

 private:
  const std::shared_ptr<LinuxCameras> shared_;
  const std::shared_ptr<CaptureService> service_;
  std::vector<std::string> ports_;  // of the cameras
};

}  // namespace

std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding) {
  return makeLinuxCapture(binding, systemVideoKernel(), DeviceRoots());
}

std::shared_ptr<LinuxCapture> makeLinuxCapture(const Binding& binding, std::shared_ptr<V4l2Api> kernel,
                                               DeviceRoots roots) {
  return std::make_shared<LinuxCaptureService>(binding,
                                               std::make_shared<LinuxCameras>(std::move(kernel), std::move(roots)));
}

}  // namespace quazor
