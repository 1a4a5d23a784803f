// Shell patterns for the names of diagnostics, results and phones.
#pragma once

#include <string>

namespace quazor {

// True if `pattern` equals or matches `name`.
bool matchesName(const std::string& pattern, const std::string& name);

// True if the text contains a special character of patterns.
bool isPattern(const std::string& text);

}  // namespace quazor
