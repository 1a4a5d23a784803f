// What is known of the user's limits before anything runs.
#pragma once

#include "host/limits/user_limit.h"

#include <filesystem>
#include <string>
#include <vector>

namespace quazor {

// Sentences about the limits that are meant for diagnostics of which none is in `selected`. Those of profiles may be
// for others.
std::vector<std::string> limitsOfUnselected(const std::vector<UserLimit>& limits,
                                            const std::vector<std::string>& selected);

// Sentences about the limits that fit, or compare with, no result that the explanations in these directories list for
// the diagnostics to run. A diagnostic may have more results than are explained, so that such a limit is not wrong for
// sure. Nothing is said of a limit if no result of one of its diagnostics is explained, or the explanations cannot be
// read.
std::vector<std::string> limitsOnUnexplained(const std::vector<UserLimit>& limits,
                                             const std::vector<std::string>& diagnostics,
                                             const std::vector<std::filesystem::path>& directories);

}  // namespace quazor
