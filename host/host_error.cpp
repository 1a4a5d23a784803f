#include "host/host_error.h"

#include <exception>

namespace quazor {

DiagnosticErrorPtr hostError(HostErrorCode code, std::string message) {
  return errorWithMessage(QuazorHostErrorDomain, static_cast<std::int64_t>(code), std::move(message), nullptr);
}

DiagnosticErrorPtr errorOfCurrentException(std::string_view operation) {
  std::string message(operation);
  try {
    throw;
  } catch (const std::exception& exception) {
    message += " threw an exception: ";
    message += exception.what();
  } catch (...) {
    message += " threw something that is not a standard exception";
  }
  return hostError(HostErrorCode::kException, std::move(message));
}

}  // namespace quazor
