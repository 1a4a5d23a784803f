// Errors of the services on Linux: what was asked of which device, and what the kernel answered.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/message_format.h"

#include <cerrno>
#include <cstdint>
#include <string>
#include <string_view>

namespace quazor {

inline constexpr std::string_view LinuxErrorDomain = "LinuxErrorDomain";

// Codes of LinuxErrorDomain; they stand in records, so a number keeps its meaning.
enum class LinuxErrorCode : std::int64_t {
  kSystemCall = 1,    // the kernel refused a call; the message has the call, the device and the system's error
  kNoDevice = 2,      // nothing on this machine is what the binding says
  kAmbiguous = 3,     // more than one device is
  kNoAccess = 4,      // the device is there, and this user may not use it
  kNotSupported = 5,  // the device or the driver cannot do this
  kBadValue = 6,      // the value is of the wrong kind or out of range
  kWrongState = 7,    // not now: without control of the stream, while it runs, after it was invalidated
  kBusy = 8,          // somebody else uses the device
  kDeviceGone = 9,    // the device was removed
  kNoSuchProperty = 10,
  kNoAnswer = 11,  // the device did not answer in time
  kInjected = 12   // a fault of the binding asked for a failure and gave no error of its own
};

// True of the errors (errno) of a caller who lacks permission.
inline bool isNoAccess(int number) { return number == EACCES || number == EPERM; }

// Stores an error where `error` is not null.
void failLinux(DiagnosticErrorPtr* error, LinuxErrorCode code, std::string message);
// The same, made by a format; false.
template <class... Arguments>
bool refuseLinux(DiagnosticErrorPtr* error, LinuxErrorCode code, MessageFormat<Arguments...> format,
                 const Arguments&... arguments) {
  if (error != nullptr) failLinux(error, code, formatMessage<Arguments...>(format, arguments...));
  return false;
}
// Stores one for a call that failed with `number` (errno). The code follows from the number: EACCES and EPERM are
// kNoAccess, EBUSY is kBusy, ENODEV and ENXIO are kDeviceGone, everything else is kSystemCall. The message is
// "CALL on OBJECT failed: TEXT (NAME)", as "VIDIOC_STREAMON on /dev/video0 failed: Invalid argument (EINVAL)".
void failSystemCall(DiagnosticErrorPtr* error, std::string_view call, std::string_view object, int number);

}  // namespace quazor
