// Compares measured results with the limits that the user set.
#pragma once

#include "contract/results.h"
#include "host/limits/user_limit.h"
#include "host/model/judge.h"

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

struct DiagnosticRecord;

// The comparison of one result with one limit.
struct LimitCheck {
  UserLimit limit;
  QZMeasuredResult result;
  std::size_t index = 0;  // of the result, among those of the record
  bool passed = false;
  std::string problem{};  // why they were not compared; empty if they were
  bool skipped = false;   // not compared because the result is an error by its own limit, which counts once

  // False if a failure only causes a warning.
  bool counts() const { return limit.severity == LimitSeverity::kFail; }
  // What the check adds to the verdict on its result: kPass unless it counts and did not pass, kError if the result
  // cannot be compared.
  ResultVerdict verdict() const;
  // True if it causes a warning.
  bool warns() const { return !passed && !skipped && !counts(); }
  // "pass", "fail", "error" if they cannot be compared, "warn", or "skip".
  std::string_view verdictName() const;
};

// True if the limit is meant for this diagnostic.
bool appliesTo(const UserLimit& limit, const std::string& diagnostic);

// The limits for this diagnostic.
std::vector<UserLimit> limitsFor(const std::string& diagnostic, const std::vector<UserLimit>& limits);

// Those of `limits` whose pattern fits the result of that name.
std::vector<UserLimit> limitsFitting(const std::string& result, const std::vector<UserLimit>& limits);

// Compares every result of the record with every one of its limits that fits it by name, in the order of the results.
std::vector<LimitCheck> limitChecksOf(const DiagnosticRecord& record);

// True if a result is outside its own limits or outside one of the user's, whatever else went wrong.
bool hasFailedResult(const DiagnosticRecord& record);

// The verdict on a result by its own limit and by the checks of it. A check can only make it stricter.
ResultVerdict verdictOf(const JudgedResult& one, const std::vector<LimitCheck>& checksOfIt);

// Those of `checks` that compare the result at `index`.
std::vector<LimitCheck> checksOfResult(const std::vector<LimitCheck>& checks, std::size_t index);

// True if both are limits on the same results of these records or, in any records, on those of the same names or
// patterns.
bool areOnSameResults(const UserLimit& one, const UserLimit& other, const std::vector<DiagnosticRecord>& records);

// The number of checks that only warn.
std::size_t warningsIn(const std::vector<LimitCheck>& checks);

// The limit as plain bounds in the unit of the result, with labelOf() as its name; nothing for a relation. All bounds
// are finite.
std::optional<QZLimit> boundsOf(const LimitCheck& check);

// Adds the bounds that the limit has.
void addBounds(const std::optional<QZLimit>& limit, std::vector<double>& thresholds);

// The limits that fit no result in any of the records. Not those that are meant for a diagnostic that ended in an
// error, because the run is one then. A limit of a profile is not one of them if all diagnostics for which it is meant
// were skipped, or none of them was selected.
std::vector<UserLimit> limitsWithoutResult(const std::vector<UserLimit>& limits,
                                           const std::vector<DiagnosticRecord>& records);

// True for the entry that reports a limit without a result: it is no diagnostic.
bool isOfLimit(const DiagnosticRecord& record);

// Why a limit for none of the diagnostics protects nothing, with the nearest of their names.
std::string unselectedText(const UserLimit& limit, const std::vector<std::string>& diagnostics);

// "; did you mean 'NAME'?" with the nearest result or, for a pattern or a last part alone such as "Totals", a pattern
// that fits several. Empty if none is near.
std::string didYouMeanResult(const std::string& asked, const std::vector<std::string>& names);

// The error of a limit without a result, with the reason.
DiagnosticErrorPtr errorOfLimitWithoutResult(const UserLimit& limit, const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
