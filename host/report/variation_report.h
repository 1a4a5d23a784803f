// What attempts and repetitions add to reports.
#pragma once

#include "host/model/diagnostic_record.h"

#include <nlohmann/json.hpp>

#include <cstddef>
#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// "repetition 4 of 10, pass in attempt 2 of 3". Empty without these options. The first attempt is only told if it ended
// in an error.
std::string trialText(const DiagnosticRecord& record);
// The same, with the seed of a repetition that failed or ended in an error, by which it can be run alone.
std::string trialTextWithSeed(const DiagnosticRecord& record);

// True for a record that a text report only counts unless it is verbose: of a repetition of a diagnostic that passed at
// once and without a warning, or was skipped.
bool isOnlyCounted(const DiagnosticRecord& record);

// Prints "Repetition 4 of 10: 3 passed, 1 failed" if the record before `end` is the last of a repetition of
// diagnostics.
void printRepetitionEnd(std::ostream& out, const std::vector<DiagnosticRecord>& records, std::size_t end);

// Prints how often each diagnostic passed, and a table of its results that varied, with rounded numbers
// unless they are to be `whole`; nothing if nothing was repeated.
void printVariation(std::ostream& out, const std::vector<DiagnosticRecord>& records, bool whole);

// The same for one JSON document; an array.
nlohmann::ordered_json variationJson(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
