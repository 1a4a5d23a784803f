// The content of a HID device's report descriptor (USB HID 1.11, section 6.2.2).
#pragma once

#include "backends/hid/hid_matching.h"

#include <cstdint>
#include <map>
#include <span>
#include <vector>

namespace quazor {

struct HidReportDescriptor {
  // The largest report that Linux takes, in bytes.
  static constexpr std::uint32_t kMaxReport = 16384;

  // One for each top-level collection, in their order; the first is the device's primary one. A collection without a
  // usage has page 0, usage 0.
  std::vector<HidUsage> topLevel;
  // False: reports carry no ID, and what is said of report 0 holds for the only one.
  bool numbered = false;
  // The length of each report in bytes, with the byte of its ID where reports are numbered, by ID.
  std::map<std::uint8_t, std::uint32_t> inputReports;
  std::map<std::uint8_t, std::uint32_t> featureReports;
};

// Reads a report descriptor. Throws InputError when it is damaged; what() says in a few words what is wrong, and at
// which byte.
HidReportDescriptor parseHidReportDescriptor(std::span<const std::uint8_t> bytes);

}  // namespace quazor
