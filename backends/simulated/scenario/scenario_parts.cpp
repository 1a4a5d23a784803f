#include "backends/simulated/scenario/scenario_parts.h"

#include <charconv>
#include <system_error>

namespace quazor {

std::uint64_t readNumberKey(const std::string& key, const std::string& what, std::uint64_t highest,
                            const JsonCursor& entry) {
  std::uint64_t number = 0;
  const auto [end, problem] = std::from_chars(key.data(), key.data() + key.size(), number);
  const bool fits =
      problem == std::errc() && end == key.data() + key.size() && number <= highest && key == std::to_string(number);
  if (!fits) entry.fail("the key must be the number of " + what + ", from 0 to " + std::to_string(highest) + ".");
  return number;
}

}  // namespace quazor
