// Encodes the image reports of the simulated sensors.
#pragma once

#include "backends/simulated/scenario/hid_config.h"
#include "contract/value.h"

#include <chrono>
#include <cstddef>
#include <cstdint>

namespace quazor {

inline constexpr std::uint8_t kHidImageReportID = 0x76;
inline constexpr std::size_t kHidImageReportLength = 792;

// The input report with that number, sent at `now` on the phone's clock. `shape` contains its differences from a normal
// image report, and no error.
//
// Wire form, little-endian: [0] ID  [4] frame ID, u32  [12] milliseconds, u32  [16] 48 I samples, s32  [208] 48 Q
// samples, s32  [400] a second block of I and Q, here the first one negated  [788] degrees Celsius, float. The bytes in
// between are reserved; they are not 0 here, so that nobody relies on their value.
Bytes hidInputReport(const HidImages& images, const HidReportShape& shape, std::uint64_t number,
                     std::chrono::nanoseconds now);

}  // namespace quazor
