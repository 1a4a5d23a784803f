// MediaTime: the time stamp of a frame or event of a stream.
#pragma once

#include "contract/contract.h"

#include <cstdint>

namespace QUAZOR_CONTRACT {

// A rational time stamp.
struct MediaTime {
  static constexpr std::uint32_t kValid = 1;  // a flag; the others are the capture service's own

  std::int64_t value = 0;
  std::int32_t timescale = 1;
  std::uint32_t flags = kValid;
  std::int64_t epoch = 0;

  double seconds() const { return static_cast<double>(value) / static_cast<double>(timescale); }

  friend bool operator==(const MediaTime&, const MediaTime&) = default;
};

}  // namespace QUAZOR_CONTRACT
