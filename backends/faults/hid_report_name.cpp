#include "backends/faults/hid_report_name.h"

#include <array>
#include <cstddef>

namespace quazor {
namespace {

using Name = std::array<char, 4>;

constexpr std::array<Name, 256> makeNames() {
  constexpr std::string_view kDigits = "0123456789ABCDEF";
  std::array<Name, 256> names{};
  for (std::size_t id = 0; id < names.size(); ++id) names[id] = {'0', 'x', kDigits[id / 16], kDigits[id % 16]};
  return names;
}

constexpr std::array<Name, 256> kNames = makeNames();

}  // namespace

std::string_view hidReportName(std::uint8_t id) { return {kNames[id].data(), kNames[id].size()}; }

std::optional<std::uint8_t> hidReportNamed(std::string_view text) {
  for (std::size_t id = 0; id < kNames.size(); ++id) {
    if (hidReportName(static_cast<std::uint8_t>(id)) == text) return static_cast<std::uint8_t>(id);
  }
  return std::nullopt;
}

}  // namespace quazor
