// The judge: from measured results and their limits, and from all that is known of a run, to a verdict. Pure functions.
#pragma once

#include "contract/results.h"

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "host/error/host_error.h"

namespace quazor {

struct DiagnosticRecord;

enum class ResultVerdict { kPass, kFail, kNone };

// kFail is the hardware's; kError means that nobody knows what the hardware is like.
enum class Verdict { kPass, kFail, kError };

std::string_view nameOf(ResultVerdict verdict);  // "pass", "fail", "none"
std::string_view nameOf(Verdict verdict);        // "pass", "fail", "error"

// A measured result and the judge's word on it.
struct JudgedResult {
  QZMeasuredResult result;
  ResultVerdict verdict = ResultVerdict::kNone;
  std::string problem{};  // why the result cannot be judged; empty when it can
};

// A result without a limit, or whose limit sets no bound, is for information: kNone, whatever its value.
//
// A limited result is kPass inside its bounds and kFail outside; a closed bound's own value is inside, an open one's is
// outside. It cannot be judged, and is kFail with a problem, when its value is not finite, a bound is not finite or in
// another unit, or no value could lie between the bounds: that is a mistake of the plug-in, not of the hardware.
JudgedResult judgeResult(QZMeasuredResult result);

struct Judgement {
  Verdict verdict = Verdict::kError;
  std::optional<HostErrorCode> problemCode;  // set exactly when the verdict is kError
  std::string problem;                       // the first problem; empty when there is none
};

// kError when nothing was measured or a result cannot be judged, else kFail when a result fails, else kPass.
Judgement judge(const std::vector<JudgedResult>& results);

struct RecordJudgement {
  Verdict verdict = Verdict::kError;
  DiagnosticErrorPtr error;  // set exactly when the verdict is kError: the record's own, or the judge's
};

// kError when the run had an error, its plug-in's part was not completed, or its results cannot be judged; else what
// the results say. An experiment on its own is kPass when it was completed without an error: nothing of it is judged.
//
// The verdict that the record holds does not count.
RecordJudgement judgeRecord(const DiagnosticRecord& record, bool completed);

}  // namespace quazor
