// CameraSession: the streams of one camera sync run, and what is done to all of them at once.
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

// What one camera's session came to. Offset and frames keep the kind of number that the session status held.
struct CameraReport {
  Value offset;
  Value frames;
  Value errorCounters;
};

// Thread: the one of the run. A failure that ends the run, or that the run goes on from, is logged where it happens;
// what fails while a failed run is ended is not. A property that cannot be read counts as absent.
class CameraSession {
 public:
  // Finds the first of the device's groups that has a stream for every port, takes control of these streams, and sets
  // them up to run in lockstep, the first port's stream as the master. Nothing on failure; control that was taken is
  // then not given back.
  static std::optional<CameraSession> synchronize(std::shared_ptr<CaptureDevice> device,
                                                  const std::vector<std::string>& ports);

  // Sets format and frame rate of every stream, the stream at position i to formatIndexes[i]; stops at the first
  // failure. A refused format index stores an error, and so does one that is missing; a refused frame rate empties
  // `error`.
  bool configure(const Array& formatIndexes, const Value& frameRate, DiagnosticErrorPtr& error);
  // Starts every stream in order; stops at the first failure, which stores an error.
  bool start(DiagnosticErrorPtr& error);
  // The device's session status. On failure all streams are stopped and control is given back.
  std::optional<Value> status(DiagnosticErrorPtr& error);
  // Every camera's report, in the order of the ports. Nothing when one could not be had or a frame count was negative;
  // in the latter case alone `error` is empty.
  std::optional<std::vector<CameraReport>> reports(const Value& status, DiagnosticErrorPtr& error);
  // Stops every stream, last one first, then gives control back. Failures are logged and change nothing.
  void finish();
  // As finish(), for a failed run: what fails here is not even logged.
  void abandon();
  // Gives control of the streams back; a failure is not told.
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
