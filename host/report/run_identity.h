// The identity of a run in reports: which run it was, of which phone, where, when and with what.
#pragma once

#include "host/model/run_event.h"

#include <nlohmann/json.hpp>

#include <cstdint>
#include <ostream>
#include <string>
#include <string_view>
#include <vector>

namespace quazor {

// The member "run" of JSON reports.
nlohmann::ordered_json runJson(const RunStarted& run);

// Prints which run it was, of which phone, and an empty line; nothing for a run without an ID. Of an analysis, also the
// run whose record it is of.
void printRun(std::ostream& out, const RunStarted& run);

// That the run was interrupted, or of an analysis that the recorded run was: "interrupted while A was running".
std::string interruptionText(const RunStarted& run, const std::string& interrupted);

// Appends columns for the run to every line of a CSV table. The seed of a line is that of its own entry, `seeds`, which
// has one for each line after the header.
std::string withRunColumns(const std::string& csv, const RunStarted& run, const std::vector<std::uint64_t>& seeds);

inline constexpr std::string_view kSimulatedPhone = "simulated phone";

// kSimulatedPhone or, if the phone was this machine, "Linux binding"; "unknown phone" if the record names none.
std::string phoneKind(const RunStarted& run);

// The serial number of the phone: the tag "serial"; empty if there is none.
std::string serialNumberOf(const RunStarted& run);

}  // namespace quazor
