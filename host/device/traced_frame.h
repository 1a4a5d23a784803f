// TracedFrame: when a frame of a phone's camera was captured, delivered and handed back.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>

namespace quazor {

// Times are in nanoseconds since the diagnostic began, by the phone's clock.
struct TracedFrame {
  std::int64_t number = 0;                 // as the camera counts
  std::int64_t captured = 0;               // as the camera says
  std::int64_t delivered = 0;              // to the plug-in's handler
  std::optional<std::int64_t> returned{};  // nothing: it was not handed back before it was told

  friend bool operator==(const TracedFrame&, const TracedFrame&) = default;
};

// What rows tell. A task of a serial queue is told as a frame is: its number is that of its thread, it is captured when
// it is posted, delivered when it begins, and returned when it has ended.
enum class TracedKind { kFrames, kTasks };

// The largest number and time, and the negative of the smallest time: their differences fit 64 bits.
inline constexpr std::int64_t kMaxTraced = (std::int64_t{1} << 62) - 1;

// The largest number of frames that are told at once.
inline constexpr std::size_t kMaxTracedFrames = 4096;

}  // namespace quazor
