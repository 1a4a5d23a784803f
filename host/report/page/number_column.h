// Numbers as a text, for the script that draws plots.
#pragma once

#include <cstdint>
#include <span>
#include <string>

namespace quazor {

// A column of integers as Base64 of their differences: first a number that is near most of the differences, then each
// number less the one before it (0 before the first) and less that one. Each is folded to a natural number (0, -1, 1,
// -2, ... are 0, 1, 2, 3, ...) and written in groups of 7 bits, the lowest first; all groups of a number but the last
// have the highest bit set. No number may be beyond 2^61.
std::string numberColumn(std::span<const std::int64_t> numbers);

}  // namespace quazor
