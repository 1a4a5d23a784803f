#include "host/text/name_pattern.h"

#include <fnmatch.h>

namespace quazor {

bool matchesName(const std::string& pattern, const std::string& name) {
  // fnmatch() would compare two names only up to a zero byte.
  return pattern == name || (isPattern(pattern) && fnmatch(pattern.c_str(), name.c_str(), FNM_NOESCAPE) == 0);
}

bool isPattern(const std::string& text) { return text.find_first_of("*?[") != std::string::npos; }

}  // namespace quazor
