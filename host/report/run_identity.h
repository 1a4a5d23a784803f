// The identity of a run in reports: which run it was, of which phone, where, when and with what.
#pragma once

#include "host/model/run_event.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <string>
#include <vector>

namespace quazor {

// The member "run" of JSON reports.
nlohmann::ordered_json runJson(const RunStarted& run);

// Appends columns for the run to every line of a CSV table. The seed of a line is that of its own entry, `seeds`, which
// has one for each line after the header.
std::string withRunColumns(const std::string& csv, const RunStarted& run, const std::vector<std::uint64_t>& seeds);

// The serial number of the phone: the tag "serial"; empty if there is none.
std::string serialNumberOf(const RunStarted& run);

}  // namespace quazor
