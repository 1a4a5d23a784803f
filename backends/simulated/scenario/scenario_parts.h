// What several parts of a scenario's document are made of.
#pragma once

#include "backends/simulated/scenario/fault.h"
#include "base/json/json_cursor.h"

#include <cstdint>
#include <string>

namespace quazor {

// Both throw JsonProblem, "PATH: ...".

// A domain, a code and a message.
FaultError readError(const JsonCursor& cursor);
// The key of an entry that is a number from 0 to `highest`; `what` says of what: "a frame". `entry` is its value.
std::uint64_t readNumberKey(const std::string& key, const std::string& what, std::uint64_t highest,
                            const JsonCursor& entry);

}  // namespace quazor
