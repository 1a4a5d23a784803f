// From all that is known of a diagnostic's run to its verdict. A pure function.
#pragma once

#include "host/model/diagnostic_record.h"

namespace quazor {

struct RecordJudgement {
  Verdict verdict = Verdict::kError;
  DiagnosticErrorPtr error;  // set exactly when the verdict is kError: the record's own, or the judge's
};

// kError when the run had an error, its plug-in's part was not completed, or its results cannot be judged; else what
// the results say (host/model/judge.h). An experiment on its own is kPass when it was completed without an error:
// nothing of it is judged.
//
// What the record says of verdicts, its own and its results', does not count.
RecordJudgement judgeRecord(const DiagnosticRecord& record, bool completed);

}  // namespace quazor
