// The attempts and repetitions of a run: which of them count, and the verdict and exit code that follow.
#pragma once

#include "host/error/exit_code.h"
#include "host/model/diagnostic_record.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace quazor {

// What the user allows in a run with exit code 0.
struct ExitRules {
  bool allowSkips = false;
  bool acceptFlaky = false;  // a pass after an error
};

// The seed of an attempt in a repetition, both from 1 or 0 for none. The first ones have the seed of the run, so that
// they go on as without these options.
std::uint64_t seedOf(std::uint64_t seed, std::uint64_t repetition, std::uint64_t attempt);

// True if an entry is one of several possible attempts or repetitions.
bool hasTrials(const std::vector<DiagnosticRecord>& records);

// True if the diagnostic ended in an error that another attempt may not have: not if it was interrupted, if nothing
// could be run at all, if the record cannot be written, or if a result is outside its limits in spite of the error.
bool mayTryAgain(const DiagnosticRecord& record);

// True for an error that a later attempt of the same diagnostic, in the same repetition, replaced by a pass or a
// failure. A failure is never superseded, nor is an error with a result outside its limits.
bool isSuperseded(const std::vector<DiagnosticRecord>& records, std::size_t index);

// True for an attempt after which there was another.
bool hasLaterAttempt(const std::vector<DiagnosticRecord>& records, std::size_t index);

// True for a pass or a failure after an error.
bool isFlaky(const DiagnosticRecord& record);

// "", " (repetition 2)", " (attempt 3)" or " (repetition 2, attempt 3)". Says nothing of the first attempt in the first
// repetition, so that it has the same name as the diagnostic of a run without these options.
std::string trialSuffix(const DiagnosticRecord& record);

// The verdict of a run, from the entries of its record alone. An error takes precedence over a failure, and a failure
// over a skip. A diagnostic that is flaky is an error unless `acceptFlaky`. A run of nothing passes.
Verdict runVerdictOf(const std::vector<DiagnosticRecord>& records, bool acceptFlaky);

// The exit code for that verdict. That all were skipped is never allowed.
ExitCode exitCodeOf(const std::vector<DiagnosticRecord>& records, const ExitRules& rules = {});

}  // namespace quazor
