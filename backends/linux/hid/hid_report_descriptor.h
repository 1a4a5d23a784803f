// The content of a HID device's report descriptor (USB HID 1.11, section 6.2.2).
#pragma once

#include "backends/hid/hid_matching.h"

#include <cstdint>
#include <map>
#include <span>
#include <vector>

namespace quazor {

struct HidReportDescriptor {
  // The largest report that Linux supports, in bytes.
  static constexpr std::uint32_t kMaxReport = 16384;

  // The usages of the top-level collections, in order; the first is the device's primary one. A collection without a
  // usage has page 0 and usage 0.
  std::vector<HidUsage> topLevel;
  // False: reports have no ID, and the entries for ID 0 describe the only report.
  bool numbered = false;
  // The length of each report in bytes by its ID, including the ID byte if reports are numbered.
  std::map<std::uint8_t, std::uint32_t> inputReports;
  std::map<std::uint8_t, std::uint32_t> featureReports;
};

// Parses a report descriptor. Throws InputError if it is damaged; what() briefly names the problem and its offset.
HidReportDescriptor parseHidReportDescriptor(std::span<const std::uint8_t> bytes);

}  // namespace quazor
