// The host's own errors, and the calls into plug-ins that they guard.
#pragma once

#include "contract/diagnostic_error.h"

#include <cstdint>
#include <exception>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

// What the host itself finds wrong with a diagnostic, as opposed to what the diagnostic says of the hardware.
inline constexpr std::string_view QuazorHostErrorDomain = "QuazorHostErrorDomain";

// Codes of QuazorHostErrorDomain; they stand in reports, so a number keeps its meaning.
enum class HostErrorCode : std::int64_t {
  kNoErrorGiven = 1,     // an operation failed and gave no error
  kException = 2,        // an operation threw
  kNothingMade = 3,      // a factory returned null
  kNothingMeasured = 4,  // the analysis succeeded without one measured result
  kCannotBeJudged = 5,   // a measured result and its limit do not allow a judgement
  kCrashed = 6,          // a signal ended the plug-in's process
  kExited = 7,           // the plug-in ended its process itself
  kDeadline = 8,         // a stage took longer than its deadline
  kConnectionLost = 9,   // the plug-in's process closed or overwrote its connection to quazor
  kNotRecorded = 10,     // the record of the run could not be written
  kInterrupted = 11,     // the user interrupted the run
};

DiagnosticErrorPtr hostError(HostErrorCode code, std::string message);

// The error for an exception that came out of a plug-in. `operation` names what threw.
DiagnosticErrorPtr errorOfException(std::string_view operation, const std::exception_ptr& thrown);

// Calls into a plug-in: `call` gets a fresh error variable and returns whether it succeeded. Whatever it throws stops
// here. On failure `failure` becomes the error it gave, or one that says that it gave none.
template <class Call>
bool callPlugin(std::string_view operation, DiagnosticErrorPtr* failure, Call&& call) {
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
