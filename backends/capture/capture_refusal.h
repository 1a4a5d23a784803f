// Why the capture service refuses a call, whatever cameras stand behind it.
#pragma once

namespace quazor {

// Each backend has error codes of its own for these; messages name the object, the property and the value.
enum class CaptureRefusal {
  kNoDevice,             // there is no capture device
  kUnknownProperty,      // the object has no property of that name
  kReadOnlyProperty,     // the property cannot be set
  kWrongType,            // the value is not of the property's type
  kOutOfRange,           // the value is of the right type but not one the property takes
  kUnsupported,          // this camera or group cannot do that
  kNotControlled,        // the caller has no control of the stream
  kControlledByAnother,  // another user has control of the stream
  kWrongState,           // not now: the stream runs, or does not run, or something has to be set first
  kUnreadableProperty,   // the property has no value to read
  kForeignObject,        // the stream or group belongs to another device, or to no device
  kInvalidated           // the device has been invalidated
};

}  // namespace quazor
