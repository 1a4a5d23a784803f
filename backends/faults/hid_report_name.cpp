#include "backends/faults/hid_report_name.h"

#include "base/text/hexadecimal.h"

#include <array>
#include <cstddef>
#include <string>

namespace quazor {
namespace {

std::array<std::string, 256> makeNames() {
  std::array<std::string, 256> names;
  for (std::size_t id = 0; id < names.size(); ++id) names[id] = hexadecimalNumber(id, 2);
  return names;
}

}  // namespace

std::string_view hidReportName(std::uint8_t id) {
  static const std::array<std::string, 256> kNames = makeNames();
  return kNames[id];
}

std::optional<std::uint8_t> hidReportNamed(std::string_view text) {
  for (std::size_t id = 0; id <= 0xFF; ++id) {
    if (hidReportName(static_cast<std::uint8_t>(id)) == text) return static_cast<std::uint8_t>(id);
  }
  return std::nullopt;
}

}  // namespace quazor
