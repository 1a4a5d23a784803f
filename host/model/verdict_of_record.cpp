#include "host/model/verdict_of_record.h"

#include "host/error/host_error.h"

namespace quazor {

RecordJudgement judgeRecord(const DiagnosticRecord& record, bool completed) {
  if (record.error != nullptr) return {Verdict::kError, record.error};
  if (!completed) {
    return {Verdict::kError, hostError(HostErrorCode::kConnectionLost, "the run was not completed")};
  }
  if (record.experimentOnly) return {Verdict::kPass, nullptr};
  std::vector<QZMeasuredResult> results;
  results.reserve(record.measuredResults.size());
  for (const JudgedResult& one : record.measuredResults) results.push_back(one.result);
  const Judgement judgement = judge(results);
  if (!judgement.problemCode) return {judgement.verdict, nullptr};
  return {Verdict::kError, hostError(*judgement.problemCode, judgement.problem)};
}

}  // namespace quazor
