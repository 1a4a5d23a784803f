// Names in a sentence.
#pragma once

#include <cstddef>
#include <limits>
#include <string>
#include <vector>

namespace quazor {

// "A, B, C": at most that many of the names, and the number of the others: "A, B, C and 57 more".
std::string listText(const std::vector<std::string>& names, std::size_t most = std::numeric_limits<std::size_t>::max());

}  // namespace quazor
