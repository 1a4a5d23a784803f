#include "contract/diagnostic_error.h"

#include "contract/flat_destruction.h"

#include <optional>
#include <utility>
#include <vector>

namespace QUAZOR_CONTRACT {

// cppcheck-suppress uninitMemberVar  // all are, below
DiagnosticError::DiagnosticError(std::string_view domain, std::int64_t code, Dictionary userInfo)
    : domain_(domain), code_(code), userInfo_(std::move(userInfo)) {}

DiagnosticError::~DiagnosticError() { destroyFlat(std::move(userInfo_)); }

std::string DiagnosticError::localizedDescription() const {
  const Value* message = userInfo_.find(localizedDescriptionKey);
  if (message != nullptr && message->string() != nullptr) return *message->string();
  return formatMessage("The operation failed (%@ error %@).", domain_, code_);
}

DiagnosticErrorPtr DiagnosticError::underlyingError() const {
  const Value* underlying = userInfo_.find(underlyingErrorKey);
  return underlying == nullptr ? nullptr : underlying->error();
}

Dictionary DiagnosticError::dictionaryRepresentation() const {
  std::vector<DiagnosticErrorPtr> causes;  // the nearest first
  for (DiagnosticErrorPtr cause = underlyingError(); cause != nullptr; cause = cause->underlyingError()) {
    causes.push_back(cause);
  }
  const auto entries = [](const DiagnosticError& error) {
    return Dictionary{{"message", error.localizedDescription()}, {"code", error.code()}, {"domain", error.domain()}};
  };
  // From the root cause outwards, without recursion, because a chain may be long.
  std::optional<Dictionary> representation;
  for (auto cause = causes.rbegin(); cause != causes.rend(); ++cause) {
    Dictionary outer = entries(**cause);
    if (representation) outer.set("underlying-error", std::move(*representation));
    representation = std::move(outer);
  }
  Dictionary own = entries(*this);
  if (representation) own.set("underlying-error", std::move(*representation));
  return own;
}

DiagnosticErrorPtr errorWithMessage(std::string_view domain, std::int64_t code, std::string message,
                                    DiagnosticErrorPtr underlying) {
  Dictionary userInfo{{std::string(localizedDescriptionKey), std::move(message)}};
  if (underlying != nullptr) userInfo.set(underlyingErrorKey, std::move(underlying));
  return std::make_shared<const DiagnosticError>(domain, code, std::move(userInfo));
}

}  // namespace QUAZOR_CONTRACT
