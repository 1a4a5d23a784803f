// RunTranscript: the calls and results of a run, as text that people can read and tests can compare.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/diagnostic_error.h"
#include "contract/log_channel.h"

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// An ordered list of lines: every platform call when it returns, and every log line.
//
//   back-wide set FormatIndex = 16
//   back-tele start -> failed
//   log error: Failed to start steam at BackFacingTelephotoCamera port! (null)
//
// During its lifetime it is the log's only backend, at debug level, so only one may exist at a time. One thread.
class RunTranscript {
 public:
  RunTranscript();
  RunTranscript(const RunTranscript&) = delete;
  RunTranscript& operator=(const RunTranscript&) = delete;
  ~RunTranscript();

  // Adds a platform call. `operation` is INTERFACE.OPERATION (CaptureStream.start). `object` is the name of the object,
  // empty if there is only one. `detail` is a property key, KEY = VALUE for a setter, a list of streams, or the seconds
  // of a sleep.
  void addCall(std::string_view operation, std::string_view object, std::string_view detail, bool succeeded);

  // The number of calls that can fail, which are all except sleeps.
  std::size_t fallibleCalls() const { return fallibleCalls_; }
  // All lines, each with a line end.
  std::string text() const;

 private:
  std::shared_ptr<std::vector<std::string>> lines_;  // shared with the log backend
  std::size_t fallibleCalls_ = 0;
};

// The content of a caller's error variable before a run: it shows afterwards whether the run changed the variable.
const DiagnosticErrorPtr& callersOwnError();

// An error and its underlying errors on one line: DOMAIN code N: message, caused by DOMAIN code N: message.
std::string errorChain(const DiagnosticErrorPtr& error);

// Whether the caller passes an error variable; if so, it contains callersOwnError().
enum class ErrorPlace { kGiven, kNone };

// Runs the experiment, which was set up with a platform whose calls reach `transcript`, and returns all that its caller
// can observe: the new lines of the transcript, then
//   returned a result | returned nothing
//   error untouched | error emptied | error (as errorChain()) | no place for an error
// and, for a result, every measurement and every entry of the auxiliary data in order:
//   BackWide.Frames = 60 frames
//   ErrorCounters = {BackWide = {I2CErrorCount = 0}}
std::string runAndTell(QZExperiment& experiment, ErrorPlace place, RunTranscript& transcript);

}  // namespace quazor
