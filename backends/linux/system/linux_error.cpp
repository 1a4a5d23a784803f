#include "backends/linux/system/linux_error.h"

#include <cerrno>
#include <cstring>
#include <utility>

namespace quazor {

namespace {

LinuxErrorCode codeOf(int number) {
  switch (number) {
    case EACCES:
    case EPERM: return LinuxErrorCode::kNoAccess;
    case EBUSY: return LinuxErrorCode::kBusy;
    case ENODEV:
    case ENXIO: return LinuxErrorCode::kDeviceGone;
    default: return LinuxErrorCode::kSystemCall;
  }
}

}  // namespace

std::string errorName(int number) {
  const char* const name = ::strerrorname_np(number);
  return name != nullptr ? name : std::to_string(number);
}

void failLinux(DiagnosticErrorPtr* error, LinuxErrorCode code, std::string message) {
  if (error != nullptr)
    *error = errorWithMessage(LinuxErrorDomain, static_cast<std::int64_t>(code), std::move(message), nullptr);
}

void failSystemCall(DiagnosticErrorPtr* error, std::string_view call, std::string_view object, int number,
                    std::string_view hint) {
  std::string message(call);
  message += " on ";
  message += object;
  message += " failed: ";
  message += std::strerror(number);
  message += " (";
  message += errorName(number);
  message += ")";
  if (!hint.empty()) message += ": ";
  message += hint;
  failLinux(error, codeOf(number), std::move(message));
}

}  // namespace quazor
