// CaptureClient: one user of the cameras, and the state that all users share.
#pragma once

#include "backends/capture/capture_back.h"
#include "contract/value.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

namespace quazor {

// A user of the cameras: each device that a plug-in returns is one. 0 is nobody.
using CaptureClientId = std::uint64_t;

enum class StreamPhase { kStopped, kRunning, kStopping };

// The service's state of a camera.
struct CameraSlot {
  std::shared_ptr<CameraBack> back;
  CameraSettings settings;
  CaptureClientId holder = 0;
  StreamPhase phase = StreamPhase::kStopped;
  bool freedByStop = false;         // the holder left during a stop: the call that stops the stream frees the camera
  std::shared_ptr<CaptureRun> run;  // the current run, or else the last one of the session

  const CameraInfo& info() const { return back->info(); }
};

struct CaptureGroupSlot {
  CaptureGroupInfo info;
  std::vector<std::size_t> active;  // the value of ActiveStreams
  Value masterConfiguration{Dictionary{}};
};

// Shared by all users of the service.
//
// Thread: any, holding `mutex`; const members need no lock.
struct CaptureSlots {
  explicit CaptureSlots(std::shared_ptr<CaptureBack> cameras);

  // Closes the camera and frees it.
  void release(CameraSlot& camera);
  // MulticamSessionStatus: an entry for every active stream of the configured groups; nothing if none of their sessions
  // has started.
  std::optional<Dictionary> sessionStatus() const;

  const std::shared_ptr<CaptureBack> back;
  std::mutex mutex;
  std::vector<CameraSlot> cameras;
  std::vector<CaptureGroupSlot> groups;
  std::vector<std::size_t> configuredGroups;  // the value of MultiCamConfiguration
  CaptureClientId lastClient = 0;
  // Values of properties that are no longer used. A handler may own other objects, even a capture device, so HeldSlots
  // destroys the values without the mutex.
  std::vector<Value> dropped;
};

// True if no stream of the group runs. `object` is the owner of the property `key`.
bool checkStopped(std::string_view object, std::string_view key, const CaptureSlots& slots,
                  const CaptureGroupSlot& group, const Refuser& refuse);

// Holds the mutex during its lifetime.
//
// Thread: one at a time.
class HeldSlots final {
 public:
  explicit HeldSlots(CaptureSlots& slots) : slots_(slots), lock_(slots.mutex) {}
  HeldSlots(const HeldSlots&) = delete;
  HeldSlots& operator=(const HeldSlots&) = delete;
  ~HeldSlots();

 private:
  CaptureSlots& slots_;
  std::unique_lock<std::mutex> lock_;
};

// One user of the cameras, shared by a device, its groups and its streams. When the last of them is destroyed, the
// user's streams stop and control is released.
//
// Thread: any.
class CaptureClient final {
 public:
  explicit CaptureClient(std::shared_ptr<CaptureSlots> slots);
  CaptureClient(const CaptureClient&) = delete;
  CaptureClient& operator=(const CaptureClient&) = delete;
  ~CaptureClient();

  CaptureClientId id() const { return id_; }
  CaptureSlots& slots() const { return *slots_; }

  // Makes a call: the result is that of body(refuse), which runs with the mutex held. After invalidate() the body does
  // not run and the call is refused: the result is false or nothing.
  template <class Body>
  std::invoke_result_t<Body&, const Refuser&> perform(DiagnosticErrorPtr* error, Body&& body) const {
    const HeldSlots held(*slots_);
    const Refuser refuse(*slots_->back, error);
    if (invalidated_) {
      refuse(CaptureRefusal::kInvalidated, "The capture device has been invalidated; ask for a new one.");
      return {};
    }
    return body(refuse);
  }

  // For the bodies of perform(). True if this user has control of the camera; otherwise stores an error that names the
  // user who has.
  bool checkControl(const CameraSlot& camera, const Refuser& refuse) const;

  // The functions below lock the mutex themselves, because they wait for handlers.
  bool start(std::size_t camera, DiagnosticErrorPtr* error);
  bool stop(std::size_t camera, DiagnosticErrorPtr* error);
  // Stops the streams, releases control and refuses all later calls. Returns false with the first error if a stop
  // fails.
  bool invalidate(DiagnosticErrorPtr* error);

 private:
  bool begin(CameraSlot& camera, const Refuser& refuse);
  bool end(CameraSlot& camera, DiagnosticErrorPtr* error);
  bool release(DiagnosticErrorPtr* error);

  const std::shared_ptr<CaptureSlots> slots_;
  const std::unique_ptr<StreamingBack> streaming_;
  const CaptureClientId id_;
  bool invalidated_ = false;  // guarded by the mutex
};

}  // namespace quazor
