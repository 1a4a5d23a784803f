// What several parts of a scenario's document are made of.
#pragma once

#include "base/json/json_cursor.h"

#include <cstdint>
#include <string>

namespace quazor {

// The key of an entry that is a number from 0 to `highest`; `what` says of what: "a frame". `entry` is its value.
// Throws InputError, "PATH: ...".
std::uint64_t readNumberKey(const std::string& key, const std::string& what, std::uint64_t highest,
                            const JsonCursor& entry);

}  // namespace quazor
