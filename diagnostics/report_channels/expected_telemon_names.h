// The report channels that a good depth camera module publishes.
#pragma once

#include <string_view>
#include <vector>

namespace quazor {

// The names of the fault latches and thermistors of the module: 60 different names in a fixed order. Each call returns
// a new list; the texts are never destroyed. Any thread.
std::vector<std::string_view> expectedTelemonNames();

}  // namespace quazor
