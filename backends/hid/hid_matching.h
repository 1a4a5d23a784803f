// Matching of HID devices.
#pragma once

#include "contract/value.h"

#include <cstdint>
#include <optional>
#include <vector>

namespace quazor {

// The purpose of a collection or a control according to the HID usage tables; pages from 0xFF00 are vendor-defined.
struct HidUsage {
  std::uint16_t page = 0;
  std::uint16_t usage = 0;

  bool operator==(const HidUsage&) const = default;
};

// True if all entries of one of the dictionaries match a device with this primary usage. A device whose usage is
// unknown has no entries. Thread: any.
bool matchesHidDevice(const std::vector<Dictionary>& matching, const std::optional<HidUsage>& primary);

}  // namespace quazor
