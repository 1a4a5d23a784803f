// What varied between the repetitions of a run.
#pragma once

#include "host/model/diagnostic_record.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// How the repetitions of a diagnostic ended. An attempt that was followed by another one is not counted.
struct VerdictCounts {
  std::size_t passed = 0;  // in the first attempt
  std::size_t flaky = 0;   // passed after an error
  std::size_t failed = 0;
  std::size_t errors = 0;
  std::size_t skipped = 0;

  std::size_t all() const { return passed + flaky + failed + errors + skipped; }
};

// Of all records, or of one repetition.
VerdictCounts verdictCountsOf(const std::vector<DiagnosticRecord>& records,
                              std::optional<std::uint64_t> repetition = std::nullopt);

// A result, or a measurement of an experiment on its own, whose value was not the same every time. The least, middle
// and greatest value are those of the finite values; they are not a number if there is none, and then the repetitions
// are 0.
struct VaryingResult {
  std::string name;
  std::string unit;
  std::size_t values = 0;  // that were compared, also those that are not finite
  double minimum = 0;
  double median = 0;
  double maximum = 0;
  std::uint64_t minimumRepetition = 0;  // the first with that value
  std::uint64_t maximumRepetition = 0;
  // Of the values that at most a quarter of all are, the first repetition with the one that is farthest from the usual
  // one: from the most frequent value if half of all are that, otherwise from the median. A value that is not finite is
  // farther than any that is. 0 if every value is more frequent.
  std::uint64_t outlierRepetition = 0;
  std::uint64_t outlierSeed = 0;
  std::optional<QZLimit> limit;       // the first that it had
  std::vector<UserLimit> userLimits;  // those of the user that fit it
};

struct DiagnosticVariation {
  std::string name;
  VerdictCounts verdicts;
  std::vector<VaryingResult> varying;  // in the order of the results
  std::size_t constant = 0;            // the number of results that never varied
};

// One for each diagnostic or experiment that was repeated, in the order in which they began. Results count only where
// the diagnostic ended without an error. Results of one name in one entry are told apart by their place.
std::vector<DiagnosticVariation> variationOf(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
