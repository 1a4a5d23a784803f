#include "tests/support/call_failures.h"

#include <stdexcept>

namespace quazor {

Fault failing(Fault fault, bool hasError, const FaultError& error) {
  fault.action = hasError ? FaultAction::kFail : FaultAction::kNothing;
  if (hasError) fault.error = error;
  return fault;
}

std::string benchCause(bool hasError) { return hasError ? ", caused by BenchErrorDomain code 7: Broken." : ""; }

void replaceAll(std::string& text, std::string_view from, std::string_view to) {
  for (std::size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size())) {
    text.replace(at, from.size(), to);
  }
}

std::string toldWithoutPlace(std::string told) {
  std::size_t at = told.find("\nerror ");
  if (at == std::string::npos) throw std::invalid_argument("there is no error in " + told);
  for (; at != std::string::npos; at = told.find("\nerror ", at + 1)) {
    told.replace(at + 1, told.find('\n', at + 1) - at - 1, "no place for an error");
  }
  return told;
}

std::function<void(const PlatformCall&)> addingTo(RunTranscript& transcript) {
  return [&transcript](const PlatformCall& call) {
    transcript.addCall(call.operation, call.object, call.detail, call.succeeded);
  };
}

}  // namespace quazor
