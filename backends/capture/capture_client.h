// What the capture objects share: the cameras, and one user of them.
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

// One user of the cameras: each device that a plug-in hands out. 0 is nobody.
using CaptureClientId = std::uint64_t;

enum class StreamPhase { kStopped, kRunning, kStopping };

// A camera as the service has it.
struct CameraSlot {
  std::shared_ptr<CameraBack> back;
  CameraSettings settings;
  CaptureClientId holder = 0;
  StreamPhase phase = StreamPhase::kStopped;
  bool freedByStop = false;         // the holder left while it was being stopped: the call that stops it frees it
  std::shared_ptr<CaptureRun> run;  // the present stretch, or else the last one of the session

  const CameraInfo& info() const { return back->info(); }
};

struct CaptureGroupSlot {
  CaptureGroupInfo info;
  std::vector<std::size_t> active;  // what ActiveStreams was set to
  Value masterConfiguration{Dictionary{}};
};

// All users of the service share it.
//
// Thread: any, holding `mutex`; what is const needs no lock.
struct CaptureSlots {
  explicit CaptureSlots(std::shared_ptr<CaptureBack> cameras);

  // Closes the camera and makes it nobody's.
  void release(CameraSlot& camera);
  // MulticamSessionStatus: an entry for every active stream of the configured groups; nothing when no session of
  // theirs has begun.
  std::optional<Dictionary> sessionStatus() const;

  const std::shared_ptr<CaptureBack> back;
  std::mutex mutex;
  std::vector<CameraSlot> cameras;
  std::vector<CaptureGroupSlot> groups;
  std::vector<std::size_t> configuredGroups;  // what MultiCamConfiguration was set to
  CaptureClientId lastClient = 0;
  // Values of properties that nobody uses any more. With a handler goes what its maker put into it, perhaps a capture
  // device: HeldSlots destroys them without the mutex.
  std::vector<Value> dropped;
};

// No stream of the group runs; `object` names whose property `key` is.
bool checkStopped(std::string_view object, std::string_view key, const CaptureSlots& slots,
                  const CaptureGroupSlot& group, const Refuser& refuse);

// Holds the mutex while it lives.
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

// One user of the cameras. A device, its groups and its streams share it; when the last of them is gone, the user's
// streams stop and others may have them.
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

  // For bodies of perform(). True when this user has control of the camera; else an error that says who has.
  bool checkControl(const CameraSlot& camera, const Refuser& refuse) const;

  // What follows takes the mutex itself, as it waits for handlers.
  bool start(std::size_t camera, DiagnosticErrorPtr* error);
  bool stop(std::size_t camera, DiagnosticErrorPtr* error);
  // Stops and gives back what the user has, and refuses every call from now on. False, with the first error, when a
  // stream could not be stopped as it should.
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
