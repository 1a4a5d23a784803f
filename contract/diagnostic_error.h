// DiagnosticError: the error reported by an operation that fails.
#pragma once

#include "contract/contract.h"
#include "contract/message_format.h"
#include "contract/value.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <utility>

namespace QUAZOR_CONTRACT {

// The domains of the errors that the host knows.
inline constexpr std::string_view QZErrorDomain = "QZErrorDomain";
inline constexpr std::string_view QZCapturePlugInErrorDomain = "QZCapturePlugInErrorDomain";
inline constexpr std::string_view QZTelemonErrorDomain = "QZTelemonErrorDomain";
inline constexpr std::string_view QZNimbeImageExperimentErrorDomain = "QZNimbeImageExperimentErrorDomain";

// The keys of an error's user info.
inline constexpr std::string_view localizedDescriptionKey = "localized-description";  // the message, a string
inline constexpr std::string_view underlyingErrorKey = "underlying-error";            // the error that caused this one

// An error: a domain, a code that is unique in the domain, and a dictionary with the message and, if another error
// caused this one, that error. Immutable; any thread may read it.
//
// The return value of an operation indicates failure, never its error: an out-argument may hold an error after
// a success, and may be empty after a failure.
// Thread: any.
class QUAZOR_EXPORT DiagnosticError {
 public:
  DiagnosticError(std::string_view domain, std::int64_t code, Dictionary userInfo);
  DiagnosticError(const DiagnosticError&) = default;
  DiagnosticError& operator=(const DiagnosticError&) = default;
  // Does not recurse, because a chain of errors may be long.
  ~DiagnosticError();

  const std::string& domain() const { return domain_; }
  std::int64_t code() const { return code_; }
  const Dictionary& userInfo() const { return userInfo_; }

  // The message, or a text with domain and code if the error has no message.
  std::string localizedDescription() const;
  // The error that caused this one, or null.
  DiagnosticErrorPtr underlyingError() const;
  // "message", "code", "domain" and, if there is an underlying error, "underlying-error" with that error's dictionary.
  Dictionary dictionaryRepresentation() const;

 private:
  std::string domain_;
  std::int64_t code_;
  Dictionary userInfo_;
};

// Creates an error with a message and, if `underlying` is not null, the error that caused it.
QUAZOR_EXPORT DiagnosticErrorPtr errorWithMessage(std::string_view domain, std::int64_t code, std::string message,
                                                  DiagnosticErrorPtr underlying);

// Creates an error whose message is built from a format (contract/message_format.h), without an underlying error.
template <class... Arguments>
DiagnosticErrorPtr makeError(std::string_view domain, std::int64_t code, MessageFormat<Arguments...> format,
                             const Arguments&... arguments) {
  return errorWithMessage(domain, code, formatMessage(format, arguments...), nullptr);
}

// Stores `error` in the caller's variable if the pointer is not null. A null error clears the variable.
inline void storeError(DiagnosticErrorPtr* out, DiagnosticErrorPtr error) {
  if (out != nullptr) *out = std::move(error);
}

// Builds and stores an error if the caller passed a pointer for it. `underlying` may be null.
template <class... Arguments>
void fail(DiagnosticErrorPtr* out, std::string_view domain, std::int64_t code, const DiagnosticErrorPtr& underlying,
          MessageFormat<Arguments...> format, const Arguments&... arguments) {
  if (out != nullptr) *out = errorWithMessage(domain, code, formatMessage(format, arguments...), underlying);
}

}  // namespace QUAZOR_CONTRACT
