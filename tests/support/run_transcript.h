// RunTranscript: what a run did and what came of it, as text that a person can read and a test can compare.
#pragma once

#include "contract/diagnostic_contract.h"
#include "contract/diagnostic_error.h"
#include "contract/log_channel.h"

#include <memory>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// One ordered list of lines: every platform call as it returned, every log line as it was written.
//
//   back-wide set FormatIndex = 16
//   back-tele start -> failed
//   log error: Failed to start steam at BackFacingTelephotoCamera port! (null)
//
// From its making to its end it is the log's only back-end, at debug level; so only one may live at a time. One thread.
class RunTranscript {
 public:
  RunTranscript();
  RunTranscript(const RunTranscript&) = delete;
  RunTranscript& operator=(const RunTranscript&) = delete;
  ~RunTranscript();

  // Adds a platform call. `operation` is INTERFACE.OPERATION (CaptureStream.start); `object` names the object, and is
  // empty where there is only one; `detail` is a property key, KEY = VALUE of what was set, a list of streams, or the
  // seconds of a sleep.
  void addCall(std::string_view operation, std::string_view object, std::string_view detail, bool succeeded);

  // How many calls that can fail it holds: all but sleeps.
  std::size_t fallibleCalls() const { return fallibleCalls_; }
  // All lines, each with a line break at its end.
  std::string text() const;

 private:
  std::shared_ptr<std::vector<std::string>> lines_;  // shared with the log back-end
  std::size_t fallibleCalls_ = 0;
};

// The error that stands in the caller's place for an error before a run: what it holds afterwards tells whether the
// run left the place alone.
const DiagnosticErrorPtr& callersOwnError();

// An error and those that caused it, in one line: DOMAIN code N: message, caused by DOMAIN code N: message.
std::string errorChain(const DiagnosticErrorPtr& error);

// Whether the caller gives a place for an error; if so it holds callersOwnError().
enum class ErrorPlace { kGiven, kNone };

// Runs the experiment, which has been set up with a platform whose calls reach `transcript`, and tells all that its
// caller can see: the lines that the transcript has gained, then
//   returned a result | returned nothing
//   error untouched | error emptied | error (as errorChain()) | no place for an error
// and, of a result, every measurement and every entry of the auxiliary data, in their order:
//   BackWide.Frames = 60 frames
//   ErrorCounters = {BackWide = {I2CErrorCount = 0}}
std::string runAndTell(QZExperiment& experiment, ErrorPlace place, RunTranscript& transcript);

}  // namespace quazor
