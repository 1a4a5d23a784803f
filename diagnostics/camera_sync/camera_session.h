// CameraSession: the streams of one camera sync run, and operations on all of them.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/value.h"
#include "platform/capture_service.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The errors of a camera sync run, in QZCapturePlugInErrorDomain.
namespace camera_sync_error {
inline constexpr std::int64_t kNoDevice = 200;
inline constexpr std::int64_t kStartRefused = 204;
inline constexpr std::int64_t kFormatRefused = 209;
inline constexpr std::int64_t kNoErrorCounters = 210;
inline constexpr std::int64_t kNotSynchronized = 214;
inline constexpr std::int64_t kNoSessionStatus = 215;
}  // namespace camera_sync_error

// The session result of one camera. Offset and frames keep the numeric type of the session status; those that it lacks
// are measured as 0.
struct CameraReport {
  std::optional<Value> offset;
  std::optional<Value> frames;
  Value errorCounters;
};

// Thread: the one of the run. Logs each failure that ends the run or is tolerated, but not the failures while a failed
// run is cleaned up. A property that cannot be read counts as absent.
class CameraSession {
 public:
  // Finds the device's first group that has a stream for every port, acquires control of these streams, and configures
  // them to run in lockstep with the first port's stream as the master. Returns nothing on failure; control that was
  // acquired is then not released.
  static std::optional<CameraSession> synchronize(std::shared_ptr<CaptureDevice> device,
                                                  const std::vector<std::string>& ports);

  // Sets format and frame rate of every stream, using formatIndexes[i] for the stream at position i; stops at the first
  // failure. A rejected or missing format index stores an error; a rejected frame rate clears `error`.
  bool configure(const Array& formatIndexes, const Value& frameRate, DiagnosticErrorPtr& error);
  // Starts every stream in order; stops at the first failure, which stores an error.
  bool start(DiagnosticErrorPtr& error);
  // Returns the device's session status. On failure it stops all streams and releases control.
  std::optional<Value> status(DiagnosticErrorPtr& error);
  // Returns the report of every camera, in the order of the ports. Returns nothing if one is unavailable, or if a frame
  // count is negative; only in the latter case `error` is empty.
  std::optional<std::vector<CameraReport>> reports(const Value& status, DiagnosticErrorPtr& error);
  // Stops every stream in reverse order, then releases control. Failures are only logged.
  void finish();
  // Like finish(), for a failed run: failures are not logged.
  void abandon();
  // Releases control of the streams. Ignores failures.
  void relinquish();

 private:
  CameraSession(std::shared_ptr<CaptureDevice> device, std::vector<std::string> ports);

  bool chooseGroup(const SynchronizedStreamsGroups& groups);
  bool takeStreams();
  bool activate();
  Dictionary enableMultipleOutputs();
  bool configureSlaves(const Dictionary& configurations);
  bool configureSlavesByPort(const Dictionary& configurations);
  bool configureStream(std::size_t position, const Value* formatIndex, const Value& frameRate,
                       DiagnosticErrorPtr& error);
  std::optional<CameraReport> report(std::size_t position, const Value& status, DiagnosticErrorPtr& error,
                                     bool& countsAreValid);

  std::shared_ptr<CaptureDevice> device_;
  std::vector<std::string> ports_;
  std::shared_ptr<SynchronizedStreamsGroup> group_;
  CaptureStreams streams_;  // in the order of ports_
};

}  // namespace quazor
