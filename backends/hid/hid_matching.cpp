#include "backends/hid/hid_matching.h"

#include "platform/hid.h"

#include <algorithm>

namespace quazor {
namespace {

bool isNumber(const Value& value, std::uint16_t number) {
  return value.isNumber() && toDouble(&value) == static_cast<double>(number);
}

}  // namespace

bool matchesHidDevice(const std::vector<Dictionary>& matching, const std::optional<HidUsage>& primary) {
  return std::ranges::any_of(matching, [&primary](const Dictionary& wanted) {
    return std::ranges::all_of(wanted, [&primary](const auto& entry) {
      const auto& [key, value] = entry;
      return primary && ((key == kHidPrimaryUsagePage && isNumber(value, primary->page)) ||
                         (key == kHidPrimaryUsage && isNumber(value, primary->usage)));
    });
  });
}

}  // namespace quazor
