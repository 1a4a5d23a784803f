#include "host/error/nesting.h"

#include "base/json/json_limits.h"
#include "host/error/host_error.h"

#include <algorithm>
#include <utility>
#include <vector>

namespace quazor {

namespace {

// `levels` is the number of levels that may still follow. It bounds the recursion.
bool fits(const Value& value, int levels) {
  if (levels == 0) return false;
  const auto entryFits = [levels](const auto& entry) { return fits(entry.second, levels - 1); };
  if (const Array* const elements = value.array()) {
    return std::all_of(elements->begin(), elements->end(),
                       [levels](const Value& element) { return fits(element, levels - 1); });
  }
  if (const Dictionary* const entries = value.dictionary()) {
    return std::all_of(entries->begin(), entries->end(), entryFits);
  }
  const DiagnosticErrorPtr error = value.error();
  return error == nullptr || std::all_of(error->userInfo().begin(), error->userInfo().end(), entryFits);
}

std::string limitText() { return "nested more than " + std::to_string(kMaxValueLevels) + " levels deep"; }

}  // namespace

bool isWithinLevels(const Value& value) { return fits(value, kMaxValueLevels); }

DiagnosticErrorPtr errorOfDeepEntry(const std::string& key, const std::string& experiment) {
  return hostError(HostErrorCode::kTooDeep,
                   "the entry '" + key + "' in the result of " + experiment + " is " + limitText());
}

DiagnosticErrorPtr errorWithinLevels(DiagnosticErrorPtr error) {
  if (error == nullptr) return nullptr;
  const Dictionary& info = error->userInfo();
  const bool isShallow =
      std::all_of(info.begin(), info.end(), [](const auto& entry) { return isWithinLevels(entry.second); });
  if (isShallow) return error;
  std::vector<DiagnosticErrorPtr> kept = {error};  // the outermost first
  DiagnosticErrorPtr cause = error->underlyingError();
  for (; cause != nullptr && kept.size() <= kMaxCausesKept; cause = cause->underlyingError()) kept.push_back(cause);
  DiagnosticErrorPtr rebuilt =
      hostError(HostErrorCode::kTooDeep, "the rest of the error is left out, because it is " + limitText());
  for (auto one = kept.rbegin(); one != kept.rend(); ++one) {
    const DiagnosticError& same = **one;
    rebuilt = errorWithMessage(same.domain(), same.code(), same.localizedDescription(), std::move(rebuilt));
  }
  return rebuilt;
}

DiagnosticErrorPtr errorWithMore(const DiagnosticError& same, const std::string& more) {
  return errorWithMessage(same.domain(), same.code(), same.localizedDescription() + more, same.underlyingError());
}

}  // namespace quazor
