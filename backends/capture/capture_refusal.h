// The reasons why the capture service refuses a call, independent of the backend.
#pragma once

namespace quazor {

// Each backend has its own error codes for these; messages contain the object, the property and the value.
enum class CaptureRefusal {
  kNoDevice,             // there is no capture device
  kUnknownProperty,      // the object has no property with that name
  kReadOnlyProperty,     // the property cannot be set
  kWrongType,            // the value has the wrong type
  kOutOfRange,           // the value has the right type but is not allowed
  kUnsupported,          // this camera or group does not support it
  kNotControlled,        // the caller has no control of the stream
  kControlledByAnother,  // another user has control of the stream
  kWrongState,           // not possible now: the stream runs or does not run, or something must be set first
  kUnreadableProperty,   // the property has no value to read
  kForeignObject,        // the stream or group belongs to another device, or to no device
  kInvalidated           // the device has been invalidated
};

}  // namespace quazor
