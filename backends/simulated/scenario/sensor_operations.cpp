#include "backends/simulated/scenario/sensor_operations.h"

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

}  // namespace quazor
