#include "host/model/judge.h"

#include "contract/message_format.h"
#include "host/model/diagnostic_record.h"
#include "host/model/limit_check.h"

#include <cmath>
#include <utility>

namespace quazor {

namespace {

// Why the bound cannot be compared with the measurement; empty if it can.
std::string validateBound(std::string_view which, const QZBound& bound, const Measurement& measured) {
  const Measurement& value = bound.value();
  if (!std::isfinite(value.value())) return formatMessage("its %@ bound is %@", which, value.value());
  if (&value.unit() != &measured.unit()) {
    return formatMessage("its %@ bound is in '%@' but its value is in '%@'", which, value.unit().symbol(),
                         measured.unit().symbol());
  }
  return {};
}

std::string validateLimit(const QZLimit& limit, const Measurement& measured) {
  const QZBound* lower = limit.lowerBound().get();
  const QZBound* upper = limit.upperBound().get();
  if (lower != nullptr) {
    if (std::string problem = validateBound("lower", *lower, measured); !problem.empty()) return problem;
  }
  if (upper != nullptr) {
    if (std::string problem = validateBound("upper", *upper, measured); !problem.empty()) return problem;
  }
  if (lower != nullptr && upper != nullptr) {
    const double low = lower->value().value();
    const double high = upper->value().value();
    if (low > high || (low == high && (lower->open() || upper->open()))) return "no value can lie between its bounds";
  }
  if (!std::isfinite(measured.value())) return formatMessage("its value is %@", measured.value());
  return {};
}

bool isInside(const QZLimit& limit, double value) {
  const QZBound* lower = limit.lowerBound().get();
  const QZBound* upper = limit.upperBound().get();
  return (lower == nullptr || isInsideLower(value, lower->value().value(), lower->open())) &&
         (upper == nullptr || isInsideUpper(value, upper->value().value(), upper->open()));
}

// A result, or a limit of the user on it, can only make the verdict stricter. The first problem is kept.
void addTo(Judgement& judgement, ResultVerdict verdict, const std::string& problem) {
  if (judgement.problemCode) return;
  if (verdict == ResultVerdict::kFail) judgement.verdict = Verdict::kFail;
  if (verdict == ResultVerdict::kError) judgement = {Verdict::kError, HostErrorCode::kCannotBeJudged, problem};
}

}  // namespace

std::string_view nameOf(ResultVerdict verdict) {
  switch (verdict) {
    case ResultVerdict::kPass: return "pass";
    case ResultVerdict::kFail: return "fail";
    case ResultVerdict::kError: return "error";
    case ResultVerdict::kNone: break;
  }
  return "none";
}

std::string_view nameOf(Verdict verdict) {
  switch (verdict) {
    case Verdict::kPass: return "pass";
    case Verdict::kFail: return "fail";
    case Verdict::kSkip: return "skip";
    case Verdict::kError: break;
  }
  return "error";
}

bool isInsideLower(double value, double bound, bool open) { return open ? value > bound : value >= bound; }

bool isInsideUpper(double value, double bound, bool open) { return open ? value < bound : value <= bound; }

JudgedResult judgeResult(QZMeasuredResult result) {
  const std::optional<QZLimit>& limit = result.limit();
  if (!limit || (limit->lowerBound() == nullptr && limit->upperBound() == nullptr)) return {std::move(result)};
  if (const std::string problem = validateLimit(*limit, result.measurement()); !problem.empty()) {
    std::string text = formatMessage("the result %@ cannot be judged: %@", result.name(), problem);
    return {std::move(result), ResultVerdict::kError, std::move(text)};
  }
  const bool inside = isInside(*limit, result.measurement().value());
  return {std::move(result), inside ? ResultVerdict::kPass : ResultVerdict::kFail};
}

Judgement judge(const std::vector<JudgedResult>& results) {
  Judgement judgement;
  if (results.empty()) {
    judgement.problemCode = HostErrorCode::kNothingMeasured;
    judgement.problem = "nothing was measured";
    return judgement;
  }
  judgement.verdict = Verdict::kPass;
  for (const JudgedResult& one : results) addTo(judgement, one.verdict, one.problem);
  return judgement;
}

bool isUntouched(const DiagnosticRecord& record) {
  return record.error == nullptr && record.stages.empty() && record.measurements.empty() &&
         record.auxiliaryData.empty() && record.measuredResults.empty() && record.faults.empty();
}

RecordJudgement judgeRecord(const DiagnosticRecord& record, bool completed) {
  if (record.error != nullptr) return {Verdict::kError, record.error};
  if (record.skip && !completed && isUntouched(record)) return {Verdict::kSkip, nullptr};
  if (!completed) {
    return {Verdict::kError, hostError(HostErrorCode::kConnectionLost, "the run was not completed")};
  }
  if (record.experimentOnly) return {Verdict::kPass, nullptr};
  Judgement judgement = judge(record.measuredResults);
  for (const LimitCheck& check : limitChecksOf(record)) addTo(judgement, check.verdict(), check.problem);
  if (!judgement.problemCode) return {judgement.verdict, nullptr};
  return {Verdict::kError, hostError(*judgement.problemCode, judgement.problem)};
}

DiagnosticRecord judgedWith(DiagnosticRecord record, const std::vector<UserLimit>& limits) {
  record.limits = limitsFor(record.name, limits);
  RecordJudgement judgement = judgeRecord(record, true);
  record.verdict = judgement.verdict;
  record.error = std::move(judgement.error);
  return record;
}

}  // namespace quazor
