// Reads faults from JSON.
#pragma once

#include "backends/faults/fault.h"
#include "base/json/json_cursor.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The objects and properties that the faults of a platform may name. A missing list allows any name or, for feature
// reports, any ID.
struct FaultTargets {
  std::vector<std::string> streams;
  std::vector<std::string> groups;
  std::optional<std::vector<std::string>> hidDevices;
  std::optional<std::vector<std::string>> registryProperties;
  std::optional<std::vector<std::string>> featureReports;  // in the form of hidReportName()
};

// Both throw InputError: "PATH: ...". Any thread.

// Reads an array of faults and checks their selectors against `targets`.
std::vector<Fault> readFaults(const JsonCursor& cursor, const FaultTargets& targets);
// Reads a domain, a code and a message.
FaultError readFaultError(const JsonCursor& cursor);

}  // namespace quazor
