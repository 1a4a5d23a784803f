// The errors of the simulated capture service.
#pragma once

#include "backends/capture/capture_refusal.h"
#include "contract/diagnostic_error.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace quazor {

inline constexpr std::string_view SimulatedCaptureErrorDomain = "SimulatedCaptureErrorDomain";

// The codes of the domain. Messages name the object, the property, the value and what is allowed.
enum class CaptureErrorCode : std::int64_t {
  kInjected = 1,             // a fault of the scenario requested a failure and gave no error of its own
  kNoDevice = 2,             // the phone has no capture device
  kUnknownProperty = 3,      // the object has no property with that name
  kReadOnlyProperty = 4,     // the property cannot be set
  kWrongType = 5,            // the value has the wrong type
  kOutOfRange = 6,           // the value has the right type but is not allowed
  kUnsupported = 7,          // this camera or group does not support it
  kNotControlled = 8,        // the caller has no control of the stream
  kControlledByAnother = 9,  // another user has control of the stream
  kWrongState = 10,          // not possible now: the stream runs or does not run, or something must be set first
  kUnreadableProperty = 11,  // the property has no value to read
  kForeignObject = 12,       // the stream or group belongs to another device, or to no device
  kInvalidated = 13          // the device has been invalidated
};

// Stores an error of the service unless `error` is null.
inline void failSimulatedCapture(DiagnosticErrorPtr* error, CaptureErrorCode code, std::string message) {
  if (error == nullptr) return;
  *error = errorWithMessage(SimulatedCaptureErrorDomain, static_cast<std::int64_t>(code), std::move(message), nullptr);
}

constexpr CaptureErrorCode captureErrorCode(CaptureRefusal reason) {
  switch (reason) {
    case CaptureRefusal::kNoDevice: return CaptureErrorCode::kNoDevice;
    case CaptureRefusal::kUnknownProperty: return CaptureErrorCode::kUnknownProperty;
    case CaptureRefusal::kReadOnlyProperty: return CaptureErrorCode::kReadOnlyProperty;
    case CaptureRefusal::kWrongType: return CaptureErrorCode::kWrongType;
    case CaptureRefusal::kOutOfRange: return CaptureErrorCode::kOutOfRange;
    case CaptureRefusal::kUnsupported: return CaptureErrorCode::kUnsupported;
    case CaptureRefusal::kNotControlled: return CaptureErrorCode::kNotControlled;
    case CaptureRefusal::kControlledByAnother: return CaptureErrorCode::kControlledByAnother;
    case CaptureRefusal::kWrongState: return CaptureErrorCode::kWrongState;
    case CaptureRefusal::kUnreadableProperty: return CaptureErrorCode::kUnreadableProperty;
    case CaptureRefusal::kForeignObject: return CaptureErrorCode::kForeignObject;
    case CaptureRefusal::kInvalidated: return CaptureErrorCode::kInvalidated;
  }
  return CaptureErrorCode::kWrongState;
}

}  // namespace quazor
