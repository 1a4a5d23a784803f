// Faults as JSON files give them.
#pragma once

#include "backends/faults/fault.h"
#include "base/json/json_cursor.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// What the faults of a platform may name. A list that is not there takes any name, that of
// feature reports any ID.
struct FaultTargets {
  std::vector<std::string> streams;
  std::vector<std::string> groups;
  std::optional<std::vector<std::string>> hidDevices;
  std::optional<std::vector<std::string>> registryProperties;
  std::optional<std::vector<std::string>> featureReports;  // as hidReportName() writes them
};

// Both throw InputError, "PATH: ...", and are called on any thread.

// An array of faults, each with what it acts on checked against `targets`.
std::vector<Fault> readFaults(const JsonCursor& cursor, const FaultTargets& targets);
// A domain, a code and a message.
FaultError readFaultError(const JsonCursor& cursor);

}  // namespace quazor
