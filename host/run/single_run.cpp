#include "host/run/single_run.h"

#include "host/model/record_builder.h"
#include "host/run/log_limit.h"
#include "host/system/shared_counter.h"
#include "host/text/timestamp.h"

namespace quazor {

DiagnosticRecord recordOfRun(const DescribedDiagnostic& described, const ResolvedParameters& parameters,
                             const RunOptions& runOptions, std::uint64_t seed, const IsolationOptions& isolation,
                             WatchedSignals* signals) {
  const Diagnostic& diagnostic = described.diagnostic;
  RecordBuilder builder;
  builder.onEvent(DiagnosticStarted{diagnostic.name, described.summary(), diagnostic.experimentName,
                                    diagnostic.analysisName, diagnostic.experimentOnly, parameters, seed, dateNow()});
  if (signals == nullptr) {
    SharedCounter leftOut;
    LimitedLog limited(builder, runOptions.logLimit, leftOut);
    runDiagnostic(diagnostic, parameters, runOptions, limited);
    if (leftOut.get() > 0) builder.onEvent(leftOutLine(leftOut.get(), limited.lastLine()));
  } else {
    Progress noProgress(nullptr);
    runIsolated(isolation, *signals, diagnostic, parameters, runOptions, nullptr, noProgress, builder);
  }
  for (const RunEvent& event : builder.ending(dateNow())) builder.onEvent(event);
  return builder.takeRecord();
}

}  // namespace quazor
