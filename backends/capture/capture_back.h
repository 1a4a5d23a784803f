// What a backend gives to the capture service that every backend shares (checked_capture.h): the cameras themselves.
//
// A back asks nothing about users, control, phases or kinds of values: the front has checked all that before it calls.
#pragma once

#include "backends/capture/camera_settings.h"
#include "backends/capture/capture_refusal.h"
#include "contract/diagnostic_error.h"
#include "contract/message_format.h"
#include "contract/value.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// A camera's part in a session.
struct SessionCount {
  std::int64_t offset = 0;      // frames of the master before the camera's first
  std::int64_t frameCount = 0;  // frames that came since; -1 when none did

  friend bool operator==(const SessionCount&, const SessionCount&) = default;
};

// What never changes about a camera.
struct CameraInfo {
  std::string name;         // in messages
  std::string port;         // its port type (platform/capture_keys.h)
  std::string description;  // of its stream
  bool hasProjector = false;
  bool hasMultipleOutputs = true;          // takes MultipleOutputSupportEnabled
  bool isSlaveOfAnyConfiguration = false;  // else a slave streams at the master's rate, and skips nothing
};

struct CaptureGroupInfo {
  std::string name;                  // in messages
  std::string description;           // of the group
  std::vector<std::size_t> cameras;  // indexes, in the group's order
  std::size_t master = 0;            // the index of one of them
  bool takesMasterConfiguration = true;
};

// One stretch of a stream, from its start to its stop. The front keeps the last one, for what it counted.
//
// Thread: any.
class CaptureRun {
 public:
  CaptureRun() = default;
  CaptureRun(const CaptureRun&) = delete;
  CaptureRun& operator=(const CaptureRun&) = delete;
  virtual ~CaptureRun();
};

// Thread: one at a time.
class CameraBack {
 public:
  CameraBack() = default;
  CameraBack(const CameraBack&) = delete;
  CameraBack& operator=(const CameraBack&) = delete;
  virtual ~CameraBack();

  virtual const CameraInfo& info() const = 0;

  // Control of the stream is taken: makes the camera ready. The settings are new; the back may change what the camera
  // has another way. On failure nothing is left open.
  virtual bool open(CameraSettings& settings, DiagnosticErrorPtr* error) = 0;
  // Control is given back. Called after open(), while the stream does not run.
  virtual void close() = 0;

  // The highest format index, and the highest rate of the format that is set; nothing when only the driver can tell.
  virtual std::optional<std::uint64_t> maxFormatIndex() const = 0;
  virtual std::optional<double> maxFrameRate(const CameraSettings& settings) const = 0;

  // Does what the settings that are to be say, and is true when they may be kept. REQUIRES, for each: open.
  virtual bool applyFormat(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;
  virtual bool applyRates(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;
  virtual bool applyAutoExposure(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;
  // The light comes with the stream's start; here it is only checked whether it can.
  virtual bool checkLightSource(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;

  // ErrorCounters; `run` is the present stretch or the last one, or null.
  virtual std::optional<Dictionary> errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const = 0;
  // The camera's part in the session of `master`; nothing when the status leaves the camera out. `run` as above.
  virtual std::optional<SessionCount> sessionCount(const CaptureRun* run, const CaptureRun& master) const = 0;
};

// The streams of one user.
//
// Thread: any. start() comes with the service's mutex held; what waits for handlers comes without.
class StreamingBack {
 public:
  StreamingBack() = default;
  StreamingBack(const StreamingBack&) = delete;
  StreamingBack& operator=(const StreamingBack&) = delete;
  virtual ~StreamingBack();

  // The stretch, which has begun; null, and an error, on failure. REQUIRES: the camera is open.
  virtual std::shared_ptr<CaptureRun> start(CameraBack& camera, const CameraSettings& settings,
                                            DiagnosticErrorPtr* error) = 0;
  // When it returns no handler runs, but one that is on this very thread, or will run. May be called more than once.
  virtual void quiesce(CaptureRun& run) = 0;
  // Ends the stretch, once, after quiesce(). False, with the first error, when not all went as it should.
  virtual bool end(CaptureRun& run, DiagnosticErrorPtr* error) = 0;
};

// Thread: any, but for what comes with a camera.
class CaptureBack {
 public:
  CaptureBack() = default;
  CaptureBack(const CaptureBack&) = delete;
  CaptureBack& operator=(const CaptureBack&) = delete;
  virtual ~CaptureBack();

  // The same at every call.
  virtual std::vector<std::shared_ptr<CameraBack>> cameras() const = 0;
  virtual std::vector<CaptureGroupInfo> groups() const = 0;
  virtual std::unique_ptr<StreamingBack> makeStreaming() const = 0;

  virtual bool plugInLoads() const { return true; }
  // Why there is no capture device; empty when there is one.
  virtual std::string missingDevice() const { return {}; }
  // Cameras are about to be opened, several perhaps.
  virtual void prepareToOpen() {}

  // Stores the backend's own error for the refusal. REQUIRES: `error` is not null.
  virtual void storeRefusal(DiagnosticErrorPtr* error, CaptureRefusal reason, std::string message) const = 0;
};

// The caller's place for an error, and whose error comes there.
//
// Thread: one at a time.
class Refuser {
 public:
  Refuser(const CaptureBack& back, DiagnosticErrorPtr* error) : back_(back), error_(error) {}

  // Stores the refusal where the caller gave a place for one, and is false.
  template <class... Arguments>
  bool operator()(CaptureRefusal reason, MessageFormat<Arguments...> format, const Arguments&... arguments) const {
    if (error_ != nullptr) back_.storeRefusal(error_, reason, formatMessage<Arguments...>(format, arguments...));
    return false;
  }
  DiagnosticErrorPtr* error() const { return error_; }

 private:
  const CaptureBack& back_;
  DiagnosticErrorPtr* const error_;
};

}  // namespace quazor
