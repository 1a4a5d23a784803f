// What attempts and repetitions add to reports.
#pragma once

#include "host/model/diagnostic_record.h"

#include <nlohmann/json.hpp>

#include <ostream>
#include <string>
#include <vector>

namespace quazor {

// "repetition 4 of 10, pass in attempt 2 of 3". Empty without these options. The first attempt is only told if it ended
// in an error.
std::string trialText(const DiagnosticRecord& record);

// Prints how often each diagnostic passed, and a table of its results that varied; nothing if nothing was repeated.
void printVariation(std::ostream& out, const std::vector<DiagnosticRecord>& records);

// The same for one JSON document; an array.
nlohmann::ordered_json variationJson(const std::vector<DiagnosticRecord>& records);

}  // namespace quazor
