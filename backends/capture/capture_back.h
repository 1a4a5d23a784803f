// CaptureBack: the cameras of a backend, for the capture service shared by all backends (checked_capture.h).
//
// A back does not check users, control, phases or types of values: the front has checked them before it calls.
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
  std::int64_t frameCount = 0;  // frames since then; -1 if there are none

  friend bool operator==(const SessionCount&, const SessionCount&) = default;
};

// The constant properties of a camera.
struct CameraInfo {
  std::string name;         // for messages
  std::string port;         // its port type (platform/capture_keys.h)
  std::string description;  // of its stream
  bool hasProjector = false;
  bool hasMultipleOutputs = true;          // supports MultipleOutputSupportEnabled
  bool isSlaveOfAnyConfiguration = false;  // false: a slave must stream at the master's rate without skipping
};

struct CaptureGroupInfo {
  std::string name;                  // for messages
  std::string description;           // of the group
  std::vector<std::size_t> cameras;  // indexes, in the group's order
  std::size_t master = 0;            // the index of one of the cameras
  bool takesMasterConfiguration = true;
};

// One streaming run, from start to stop. The front keeps the last one for its counts.
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
  // What the system calls the camera; nothing if that is known only while it is open.
  virtual std::optional<std::string> cameraName() const = 0;

  // Called when a user takes control of the stream: prepares the camera. The settings are new; the back may change them
  // to the values that the camera has. On failure nothing may stay open.
  virtual bool open(CameraSettings& settings, DiagnosticErrorPtr* error) = 0;
  // Called when control is released, after open() and while the stream does not run.
  virtual void close() = 0;

  // The highest format index, and the highest rate of the current format; nothing if only the driver knows.
  virtual std::optional<std::uint64_t> maxFormatIndex() const = 0;
  virtual std::optional<double> maxFrameRate(const CameraSettings& settings) const = 0;

  // Apply the new settings; they are kept if the result is true. REQUIRES, for each: open.
  virtual bool applyFormat(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;
  virtual bool applyRates(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;
  virtual bool applyAutoExposure(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;
  // Only checks the light source configuration; the light is switched on when the stream starts.
  virtual bool checkLightSource(const CameraSettings& wanted, DiagnosticErrorPtr* error) = 0;

  // ErrorCounters. `run` is the current or the last streaming run, or null.
  virtual std::optional<Dictionary> errorCounters(const CaptureRun* run, DiagnosticErrorPtr* error) const = 0;
  // The camera's part in the session of `master`; nothing if the status omits the camera. `run` as above.
  virtual std::optional<SessionCount> sessionCount(const CaptureRun* run, const CaptureRun& master) const = 0;
};

// The streams of one user.
//
// Thread: any. start() is called with the service's mutex held; functions that wait for handlers are called without it.
class StreamingBack {
 public:
  StreamingBack() = default;
  StreamingBack(const StreamingBack&) = delete;
  StreamingBack& operator=(const StreamingBack&) = delete;
  virtual ~StreamingBack();

  // Returns the started run; null and an error on failure. REQUIRES: the camera is open.
  virtual std::shared_ptr<CaptureRun> start(CameraBack& camera, const CameraSettings& settings,
                                            DiagnosticErrorPtr* error) = 0;
  // After it returns, no handler runs, except on the calling thread, or will run. May be called more than once.
  virtual void quiesce(CaptureRun& run) = 0;
  // Ends the run. Called once, after quiesce(). Returns false with the first error if a step fails.
  virtual bool end(CaptureRun& run, DiagnosticErrorPtr* error) = 0;
};

// Thread: any, but for what comes with a camera.
class CaptureBack {
 public:
  CaptureBack() = default;
  CaptureBack(const CaptureBack&) = delete;
  CaptureBack& operator=(const CaptureBack&) = delete;
  virtual ~CaptureBack();

  // Returns the same cameras in every call.
  virtual std::vector<std::shared_ptr<CameraBack>> cameras() const = 0;
  virtual std::vector<CaptureGroupInfo> groups() const = 0;
  virtual std::unique_ptr<StreamingBack> makeStreaming() const = 0;

  virtual bool plugInLoads() const { return true; }
  // Why there is no capture device; empty if there is one.
  virtual std::string missingDevice() const { return {}; }
  // Called before one or several cameras are opened.
  virtual void prepareToOpen() {}

  // Stores the backend's error for the refusal. REQUIRES: `error` is not null.
  virtual void storeRefusal(DiagnosticErrorPtr* error, CaptureRefusal reason, std::string message) const = 0;
};

// The caller's error variable and the backend whose errors are stored in it.
//
// Thread: one at a time.
class Refuser {
 public:
  Refuser(const CaptureBack& back, DiagnosticErrorPtr* error) : back_(back), error_(error) {}

  // Stores the refusal unless the caller passed null, and returns false.
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
