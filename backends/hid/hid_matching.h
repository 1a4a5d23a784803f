// Which HID devices a user asks for.
#pragma once

#include "contract/value.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace quazor {

// What a collection or a control is for, by the HID usage tables; page 0xFF00 and above are the vendors'.
struct HidUsage {
  std::uint16_t page = 0;
  std::uint16_t usage = 0;

  bool operator==(const HidUsage&) const = default;
};

// Whether one of the dictionaries has no entry that a device with this primary usage lacks. A device whose usage is not
// known has no entries. Thread: any.
bool matchesHidDevice(const std::vector<Dictionary>& matching, const std::optional<HidUsage>& primary);

}  // namespace quazor
