// What the capture objects share: the cameras, and one user of them.
#pragma once

#include "backends/linux/capture/camera_checks.h"
#include "backends/linux/capture/camera_device.h"

#include <cstddef>
#include <memory>
#include <mutex>
#include <type_traits>
#include <vector>

namespace quazor {

struct LinuxGroupState {
  GroupBinding binding;
  std::vector<std::size_t> cameras;  // indexes, in the group's order
  std::size_t master = 0;            // the index of one of them
  std::vector<std::size_t> active;   // what ActiveStreams was set to
  Value masterConfiguration{Dictionary{}};
};

// All users of the service share it.
// Thread: any, holding `mutex`; what is const needs no lock.
struct LinuxCameras {
  // A group that names no camera of the binding is left out; the reader of bindings refuses those.
  LinuxCameras(const Binding& binding, std::shared_ptr<V4l2Api> kernel, DeviceRoots roots);

  // MulticamSessionStatus: an entry for every active stream of the configured groups; nothing when no session of
  // theirs has begun.
  std::optional<Dictionary> sessionStatus() const;

  const std::shared_ptr<V4l2Api> kernel;
  const DeviceRoots roots;
  const std::shared_ptr<DeliveredFrames> delivered = std::make_shared<DeliveredFrames>(0);

  // Closes the camera and makes it nobody's.
  void release(LinuxCamera& camera);

  std::mutex mutex;
  std::vector<std::unique_ptr<LinuxCamera>> cameras;
  std::vector<LinuxGroupState> groups;
  std::vector<std::size_t> configuredGroups;  // what MultiCamConfiguration was set to
  LinuxUserId lastUser = 0;
  // Values of properties that nobody uses any more. With a handler goes what its maker put into it, perhaps a capture
  // device: HeldCameras destroys them without the mutex.
  std::vector<Value> dropped;
};

// Holds the mutex while it lives.
// Thread: one at a time.
class HeldCameras final {
 public:
  explicit HeldCameras(LinuxCameras& cameras) : cameras_(cameras), lock_(cameras.mutex) {}
  HeldCameras(const HeldCameras&) = delete;
  HeldCameras& operator=(const HeldCameras&) = delete;
  ~HeldCameras();

 private:
  LinuxCameras& cameras_;
  std::unique_lock<std::mutex> lock_;
};

// One user of the cameras. A device, its groups and its streams share it; when the last of them is gone, the user's
// streams stop and others may have them.
// Thread: any.
class LinuxCaptureClient final {
 public:
  explicit LinuxCaptureClient(std::shared_ptr<LinuxCameras> cameras);
  LinuxCaptureClient(const LinuxCaptureClient&) = delete;
  LinuxCaptureClient& operator=(const LinuxCaptureClient&) = delete;
  ~LinuxCaptureClient();

  LinuxUserId id() const { return id_; }
  LinuxCameras& cameras() const { return *cameras_; }

  // Runs the body with the cameras' mutex held; after invalidate() it is not run and the call is refused.
  template <class Body>
  std::invoke_result_t<Body&> perform(DiagnosticErrorPtr* error, Body&& body) const {
    const HeldCameras held(*cameras_);
    if (invalidated_) {
      refuseLinux(error, LinuxErrorCode::kWrongState, "The capture device has been invalidated; ask for a new one.");
      return {};
    }
    return body();
  }

  // For bodies of perform(). True when this user has control of the camera; else an error that says who has.
  bool checkControl(const LinuxCamera& camera, DiagnosticErrorPtr* error) const;

  // What follows takes the mutex itself, as it waits for the thread that calls handlers.
  bool start(std::size_t camera, DiagnosticErrorPtr* error);
  bool stop(std::size_t camera, DiagnosticErrorPtr* error);
  // Stops and gives back what the user has, and refuses every call from now on. False, with the first error, when a
  // stream could not be stopped as it should.
  bool invalidate(DiagnosticErrorPtr* error);

 private:
  bool release(DiagnosticErrorPtr* error);

  const std::shared_ptr<LinuxCameras> cameras_;
  const LinuxUserId id_;
  CameraPoller poller_;
  bool invalidated_ = false;  // guarded by the cameras' mutex
};

}  // namespace quazor
