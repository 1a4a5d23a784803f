#include "backends/simulated/errors/injected_error.h"

#include "backends/faults/operations.h"
#include "backends/simulated/errors/capture_error.h"
#include "backends/simulated/errors/hid_error.h"
#include "backends/simulated/errors/report_error.h"

#include <utility>

namespace quazor {

DiagnosticErrorPtr simulatedInjectedError(const CallSite& site, std::string sentence) {
  const Operation* const operation = findOperation(site.operation);
  switch (operation == nullptr ? OperationService::kCapture : operation->service) {
    case OperationService::kReports:
      return errorWithMessage(SimulatedReportErrorDomain, static_cast<std::int64_t>(ReportErrorCode::kInjected),
                              std::move(sentence), nullptr);
    case OperationService::kSensors:
      return errorWithMessage(SimulatedHidErrorDomain, static_cast<std::int64_t>(HidErrorCode::kInjected),
                              std::move(sentence), nullptr);
    case OperationService::kCapture: break;
  }
  return errorWithMessage(SimulatedCaptureErrorDomain, static_cast<std::int64_t>(CaptureErrorCode::kInjected),
                          std::move(sentence), nullptr);
}

}  // namespace quazor
