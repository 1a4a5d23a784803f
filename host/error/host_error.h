// The host's own errors, and a wrapper for calls into plug-ins.
#pragma once

#include "contract/diagnostic_error.h"

#include <cfenv>
#include <cstdint>
#include <exception>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

// Errors that the host detects in a diagnostic, as opposed to errors that the diagnostic reports.
inline constexpr std::string_view QuazorHostErrorDomain = "QuazorHostErrorDomain";

// Codes of QuazorHostErrorDomain. Reports contain them, so the meaning of a number must not change.
enum class HostErrorCode : std::int64_t {
  kNoErrorGiven = 1,         // an operation failed and gave no error
  kException = 2,            // an operation threw
  kNothingMade = 3,          // a factory returned null
  kNothingMeasured = 4,      // the analysis succeeded without a measured result
  kCannotBeJudged = 5,       // a measured result cannot be compared with its limit
  kCrashed = 6,              // a signal terminated the plug-in process
  kExited = 7,               // the plug-in exited from its process
  kDeadline = 8,             // a stage took longer than its deadline
  kConnectionLost = 9,       // the plug-in's process closed or overwrote its connection to quazor, or lost its guard
  kNotRecorded = 10,         // the record of the run could not be written
  kInterrupted = 11,         // the user interrupted the run
  kNoProcess = 12,           // the process for the diagnostic could not be created
  kTooDeep = 13,             // the plug-in gave a value that is nested too deeply to be recorded
  kLimitWithoutResult = 14,  // a user-defined limit fits no result of the run
  kPluginRefused = 15,       // a file in a folder of plug-ins was refused, so none of its code ran or counts
  kParameterMissing = 16,    // a required parameter has no value
  kBadRange = 17,            // the plug-in gives a range of a parameter that is nonsense
};

DiagnosticErrorPtr hostError(HostErrorCode code, std::string message);

// True if the host detected the error. False for null.
bool isHostError(const DiagnosticErrorPtr& error);
// The same, with this code.
bool isHostError(const DiagnosticErrorPtr& error, HostErrorCode code);

// The error for an exception thrown by a plug-in. `operation` is the name of the operation that threw.
DiagnosticErrorPtr errorOfException(std::string_view operation, const std::exception_ptr& thrown);

// Restores the floating-point environment at its end. Code of a plug-in may leave another rounding behind, or a
// processor that takes very small numbers for 0.
//
// Thread: the one that made it.
class FloatingPointGuard {
 public:
  FloatingPointGuard() { std::fegetenv(&before_); }
  FloatingPointGuard(const FloatingPointGuard&) = delete;
  FloatingPointGuard& operator=(const FloatingPointGuard&) = delete;
  ~FloatingPointGuard() { std::fesetenv(&before_); }

 private:
  std::fenv_t before_{};
};

// Calls into a plug-in. `call` receives an empty error variable and returns whether it succeeded. Catches all
// exceptions. On failure `failure` is set to the error of the call, or to kNoErrorGiven if it gave none.
template <class Call>
bool callPlugin(std::string_view operation, DiagnosticErrorPtr* failure, Call&& call) {
  const FloatingPointGuard guard;
  DiagnosticErrorPtr error;
  try {
    if (std::forward<Call>(call)(&error)) return true;
  } catch (...) {
    *failure = errorOfException(operation, std::current_exception());
    return false;
  }
  if (error == nullptr) {
    error = hostError(HostErrorCode::kNoErrorGiven, std::string(operation) + " failed without giving an error");
  }
  *failure = std::move(error);
  return false;
}

}  // namespace quazor
