#include "host/model/incomplete_run.h"

#include "host/error/host_error.h"

#include <cstddef>
#include <cstdint>
#include <map>

namespace quazor {

namespace {

bool saysItWasInterrupted(const DiagnosticRecord& record) {
  return record.error != nullptr && record.error->domain() == QuazorHostErrorDomain &&
         record.error->code() == static_cast<std::int64_t>(HostErrorCode::kInterrupted);
}

}  // namespace

UnrecordedDiagnostics unrecordedDiagnosticsOf(const RunStarted& run, const std::vector<DiagnosticRecord>& records,
                                              const std::optional<std::string>& interrupted) {
  UnrecordedDiagnostics unrecorded;
  std::map<std::string, std::size_t> begun;
  for (const DiagnosticRecord& record : records) ++begun[record.name];
  if (interrupted && (records.empty() || !saysItWasInterrupted(records.back()))) {
    unrecorded.interrupted = *interrupted;
    ++begun[*interrupted];
  }
  for (const std::string& name : run.names) {
    std::size_t& left = begun[name];
    if (left == 0) {
      unrecorded.neverRun.push_back(name);
    } else {
      --left;
    }
  }
  return unrecorded;
}

DiagnosticErrorPtr interruptionOf(const RunStarted& run, const std::string& interrupted) {
  const std::string idle =
      run.ofExperiments ? "interrupted while no experiment was running" : "interrupted while no diagnostic was running";
  return hostError(HostErrorCode::kInterrupted, interrupted.empty() ? idle : interrupted + " was interrupted");
}

}  // namespace quazor
