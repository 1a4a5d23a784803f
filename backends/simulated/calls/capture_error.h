// The errors of the simulated capture service.
#pragma once

#include "contract/diagnostic_error.h"

#include <cstdint>
#include <string_view>

namespace quazor {

inline constexpr std::string_view SimulatedCaptureErrorDomain = "SimulatedCaptureErrorDomain";

// The codes of the domain. Messages name the object, the property and the value, and say what would be right.
enum class CaptureErrorCode : std::int64_t {
  kInjected = 1,             // a fault of the scenario asked for a failure and gave no error of its own
  kNoDevice = 2,             // the phone has no capture device
  kUnknownProperty = 3,      // the object has no property of that name
  kReadOnlyProperty = 4,     // the property cannot be set
  kWrongType = 5,            // the value is not of the property's type
  kOutOfRange = 6,           // the value is of the right type but not one the property takes
  kUnsupported = 7,          // this camera or group cannot do that
  kNotControlled = 8,        // the caller has no control of the stream
  kControlledByAnother = 9,  // another user has control of the stream
  kWrongState = 10,          // not now: the stream runs, or does not run, or something has to be set first
  kUnreadableProperty = 11,  // the property has no value to read
  kForeignObject = 12,       // the stream or group belongs to another device, or to no device
  kInvalidated = 13          // the device has been invalidated
};

// Tells a refusal: stores an error of the service where the caller asked for one, and is false.
template <class... Arguments>
bool refuse(DiagnosticErrorPtr* error, CaptureErrorCode code, MessageFormat<Arguments...> format,
            const Arguments&... arguments) {
  fail(error, SimulatedCaptureErrorDomain, static_cast<std::int64_t>(code), nullptr, format, arguments...);
  return false;
}

}  // namespace quazor
