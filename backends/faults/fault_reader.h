// Faults as JSON files give them.
#pragma once

#include "backends/faults/fault.h"
#include "base/json/json_cursor.h"

#include <optional>
#include <string>
#include <vector>

namespace quazor {

// What the faults of a platform may name. A list that is not there takes any name.
struct FaultTargets {
  std::vector<std::string> streams;
  std::vector<std::string> groups;
  std::optional<std::vector<std::string>> hidDevices;
  // Keys of properties.
  std::vector<std::string> deviceProperties;
  std::vector<std::string> groupProperties;
  std::vector<std::string> streamProperties;
  std::vector<std::string> registryProperties;
  std::optional<std::vector<std::string>> featureReports;  // as hidReportName() writes them; not there: any ID
};

// Both throw InputError, "PATH: ...", and are called on any thread.

// An array of faults, each with what it acts on checked against `targets`.
std::vector<Fault> readFaults(const JsonCursor& cursor, const FaultTargets& targets);
// A domain, a code and a message.
FaultError readFaultError(const JsonCursor& cursor);

}  // namespace quazor
