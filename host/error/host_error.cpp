#include "host/error/host_error.h"

#include <string>
#include <utility>

namespace quazor {

DiagnosticErrorPtr hostError(HostErrorCode code, std::string message) {
  return errorWithMessage(QuazorHostErrorDomain, static_cast<std::int64_t>(code), std::move(message), nullptr);
}

bool isHostError(const DiagnosticErrorPtr& error) {
  return error != nullptr && error->domain() == QuazorHostErrorDomain;
}

bool isHostError(const DiagnosticErrorPtr& error, HostErrorCode code) {
  return isHostError(error) && error->code() == static_cast<std::int64_t>(code);
}

DiagnosticErrorPtr errorOfException(std::string_view operation, const std::exception_ptr& thrown) {
  std::string message(operation);
  try {
    std::rethrow_exception(thrown);
  } catch (const std::exception& exception) {
    const char* const what = exception.what();
    message += what == nullptr ? " threw an exception without a text" : std::string(" threw an exception: ") + what;
  } catch (...) {
    message += " threw something that is not a standard exception";
  }
  return hostError(HostErrorCode::kException, std::move(message));
}

}  // namespace quazor
