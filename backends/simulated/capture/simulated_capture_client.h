// What the objects of one capture device share.
#pragma once

#include "backends/faults/call_interceptor.h"
#include "backends/simulated/capture/capture_hardware.h"

#include <memory>
#include <mutex>
#include <type_traits>
#include <utility>
#include <vector>

namespace quazor {

// One user of the capture hardware. A device, its groups and its streams share it; when the last of them is gone, the
// user's streams stop and others may have them.
//
// Thread: any.
class SimulatedCaptureClient final {
 public:
  SimulatedCaptureClient(std::shared_ptr<CaptureHardware> hardware, std::shared_ptr<CallInterceptor> calls);
  SimulatedCaptureClient(const SimulatedCaptureClient&) = delete;
  SimulatedCaptureClient& operator=(const SimulatedCaptureClient&) = delete;
  ~SimulatedCaptureClient();

  // Makes a call of one of the user's objects, as CallInterceptor::perform does. The body runs with the hardware's
  // mutex held; after invalidate() it does not run and the call is refused.
  template <class Detail, class Body>
  std::invoke_result_t<Body&> perform(const CallSite& site, DiagnosticErrorPtr* error, Detail&& detail,
                                      Body&& body) const {
    return perform(site, error, detail, body, [] {});
  }
  // The same; when the body has succeeded, `afterwards` runs, without the mutex, before the call returns.
  template <class Detail, class Body, class Afterwards>
  std::invoke_result_t<Body&> perform(const CallSite& site, DiagnosticErrorPtr* error, Detail&& detail, Body&& body,
                                      Afterwards&& afterwards) const {
    return calls_->perform(site, error, detail, [&]() -> std::invoke_result_t<Body&> {
      std::unique_lock lock(hardware_->mutex);
      if (!checkValid(error)) return {};
      std::invoke_result_t<Body&> result = body();
      lock.unlock();
      if (static_cast<bool>(result)) afterwards();
      return result;
    });
  }

  CaptureUserId id() const { return id_; }

  // What follows is for bodies of perform(), and for the making of the user's objects.
  CaptureHardware& hardware() const { return *hardware_; }
  // True when this user has control of the camera's stream; else stores an error that says who has.
  bool checkControl(const CameraState& camera, DiagnosticErrorPtr* error) const;
  // Gives back what the user has and refuses every call from now on. As CaptureHardware::release.
  std::vector<std::shared_ptr<FrameDelivery>> invalidate();

 private:
  bool checkValid(DiagnosticErrorPtr* error) const;

  const std::shared_ptr<CaptureHardware> hardware_;
  const std::shared_ptr<CallInterceptor> calls_;
  const CaptureUserId id_;
  bool invalidated_ = false;  // guarded by the hardware's mutex
};

}  // namespace quazor
