// The judge: pure functions that derive a verdict from measured results, their limits and the rest of a run.
#pragma once

#include "contract/results.h"
#include "host/limits/user_limit.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/error/host_error.h"

namespace quazor {

struct DiagnosticRecord;

enum class ResultVerdict { kPass, kFail, kError, kNone };

// kFail means that the hardware is faulty; kError means that the state of the hardware is unknown.
// kSkip means that it was not run.
enum class Verdict { kPass, kFail, kError, kSkip };

std::string_view nameOf(ResultVerdict verdict);  // "pass", "fail", "error", "none"
std::string_view nameOf(Verdict verdict);        // "pass", "fail", "error", "skip"

// True if a value is on the inner side of an interval's bound. The bound itself is inside unless it is open.
bool isInsideLower(double value, double bound, bool open);
bool isInsideUpper(double value, double bound, bool open);

// A measured result and its verdict.
struct JudgedResult {
  QZMeasuredResult result;
  ResultVerdict verdict = ResultVerdict::kNone;
  std::string problem{};  // why the result cannot be judged; empty if it can
};

// A result without a limit, or with a limit without bounds, is informational: kNone, whatever its value.
//
// A limited result is kPass inside its bounds and kFail outside; the value of a closed bound is inside, that of an open
// one outside. A result cannot be judged, and is kError with a problem, if its value is not finite, a bound is not
// finite or has another unit, or no value can lie between the bounds. That is a defect of the plug-in, not of the
// hardware.
JudgedResult judgeResult(QZMeasuredResult result);

struct Judgement {
  Verdict verdict = Verdict::kError;
  std::optional<HostErrorCode> problemCode;  // set exactly when the verdict is kError
  std::string problem;                       // the first problem; empty when there is none
};

// kError if nothing was measured or a result cannot be judged; otherwise kFail if a result fails, else kPass.
Judgement judge(const std::vector<JudgedResult>& results);

// True if the record has neither an error nor anything that a plug-in did.
bool isUntouched(const DiagnosticRecord& record);

struct RecordJudgement {
  Verdict verdict = Verdict::kError;
  DiagnosticErrorPtr error;  // set exactly when the verdict is kError: the record's own, or the judge's
};

// kError if the run had an error, the plug-in's part was not completed, or the results cannot be judged or compared
// with the user's limits; otherwise what the results and these limits say. An experiment that runs alone is kPass if it
// was completed without an error: it is not judged.
//
// kSkip if the diagnostic was skipped and nothing of it was begun.
//
// The verdict that the record holds does not count.
RecordJudgement judgeRecord(const DiagnosticRecord& record, bool completed);

// A run that has ended and was judged without the user's limits, judged with those of `limits` that are for it.
DiagnosticRecord judgedWith(DiagnosticRecord record, const std::vector<UserLimit>& limits);

}  // namespace quazor
