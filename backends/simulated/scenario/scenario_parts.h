// Helper functions for reading a scenario's document.
#pragma once

#include "base/json/json_cursor.h"

#include <cstdint>
#include <string>

namespace quazor {

// Parses a key that is a number from 0 to `highest`; `what` is the noun for messages, for example "a frame". `entry` is
// the key's value. Throws InputError: "PATH: ...".
std::uint64_t readNumberKey(const std::string& key, const std::string& what, std::uint64_t highest,
                            const JsonCursor& entry);

}  // namespace quazor
