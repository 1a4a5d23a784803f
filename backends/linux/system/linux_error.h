// Errors of the services on Linux: the operation, the device and the kernel's error.
#pragma once

#include "contract/diagnostic_error.h"
#include "contract/message_format.h"

#include <cerrno>
#include <cstdint>
#include <string>
#include <string_view>

namespace quazor {

inline constexpr std::string_view LinuxErrorDomain = "LinuxErrorDomain";

// Codes of LinuxErrorDomain. Records contain them, so the meaning of a number must not change.
enum class LinuxErrorCode : std::int64_t {
  kSystemCall = 1,    // a system call failed; the message contains the call, the device and the system's error
  kNoDevice = 2,      // no device of this machine matches the binding
  kAmbiguous = 3,     // more than one device matches
  kNoAccess = 4,      // the user lacks the permission to use the device
  kNotSupported = 5,  // the device or the driver does not support this
  kBadValue = 6,      // the value has the wrong type or is out of range
  kWrongState = 7,    // not possible now: without control of the stream, while it runs, after it was invalidated
  kBusy = 8,          // another process uses the device
  kDeviceGone = 9,    // the device was removed
  kNoSuchProperty = 10,
  kNoAnswer = 11,  // the device did not respond in time
  kInjected = 12   // a fault of the binding requested a failure and gave no error of its own
};

// True for the errno values that mean a missing permission.
inline bool isNoAccess(int number) { return number == EACCES || number == EPERM; }

// "EPIPE"; the number itself if it has no name.
std::string errorName(int number);

// Stores an error unless `error` is null.
void failLinux(DiagnosticErrorPtr* error, LinuxErrorCode code, std::string message);
// Like failLinux(), with a format; returns false.
template <class... Arguments>
bool refuseLinux(DiagnosticErrorPtr* error, LinuxErrorCode code, MessageFormat<Arguments...> format,
                 const Arguments&... arguments) {
  if (error != nullptr) failLinux(error, code, formatMessage<Arguments...>(format, arguments...));
  return false;
}
// Stores an error for a call that failed with `number` (errno). The number determines the code: EACCES and EPERM are
// kNoAccess, EBUSY is kBusy, ENODEV and ENXIO are kDeviceGone, all others are kSystemCall. The message is "CALL on
// OBJECT failed: TEXT (NAME)", for example "VIDIOC_STREAMON on /dev/video0 failed: Invalid argument (EINVAL)".
// `hint`, if there is one, follows after a colon.
void failSystemCall(DiagnosticErrorPtr* error, std::string_view call, std::string_view object, int number,
                    std::string_view hint = {});

}  // namespace quazor
