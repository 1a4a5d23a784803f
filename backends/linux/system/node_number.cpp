#include "backends/linux/system/node_number.h"

#include <charconv>
#include <system_error>

namespace quazor {

std::optional<std::uint32_t> nodeNumber(std::string_view name, std::string_view kind) {
  if (!name.starts_with(kind)) return std::nullopt;
  name.remove_prefix(kind.size());
  std::uint32_t number = 0;
  const char* const end = name.data() + name.size();
  const auto [rest, problem] = std::from_chars(name.data(), end, number);
  return problem == std::errc() && rest == end ? std::optional(number) : std::nullopt;
}

}  // namespace quazor
