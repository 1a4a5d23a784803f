// What a stream counts.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/video/v4l2_device.h"
#include "contract/diagnostic_error.h"
#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// In ErrorCounters, beside those that the binding names.
namespace kernel_counter {
// Frames that the driver counted and did not deliver.
inline constexpr std::string_view kSequenceGaps = "SequenceGapCount";
// Buffers that the driver marked as damaged. They are no frames: they are not counted and not handed to handlers.
inline constexpr std::string_view kBadBuffers = "BufferErrorCount";
// Calls that the driver refused while the stream ran.
inline constexpr std::string_view kStreamErrors = "StreamErrorCount";
// The device was removed while the stream ran.
inline constexpr std::string_view kDisconnects = "DisconnectCount";
// Frames whose metadata was not complete.
inline constexpr std::string_view kMissingMetadata = "MetadataErrorCount";
}  // namespace kernel_counter

// What has come of a stream since it began.
// Thread: one at a time; any number may read while none writes.
struct FrameCounts {
  std::uint64_t frames = 0;
  std::optional<std::chrono::nanoseconds> first;  // the first frame's time stamp
  std::optional<std::uint32_t> lastSequence;      // of the last buffer
  std::uint64_t sequenceGaps = 0;
  std::uint64_t badBuffers = 0;
  std::uint64_t streamErrors = 0;
  std::uint64_t disconnects = 0;
  std::uint64_t missingMetadata = 0;

  // Counts a buffer: its sequence number and, unless it is damaged, its frame. Numbers wrap around at 2^32; one that
  // is the last one again, or lower, tells of no gap.
  void count(std::uint32_t sequence, std::chrono::nanoseconds timestamp, bool isBad);
};

// By how many frames of `interval` a camera's first frame came after the master's: rounded to the nearest, negative
// when it came before. 0 while either has none.
std::int64_t frameOffset(const FrameCounts& camera, const FrameCounts& master, FrameInterval interval);

// The counters that a binding names: files and controls, whose numbers count from an unknown moment.
// Thread: one at a time.
class BoundCounters final {
 public:
  // What they are at the start of a stream; from there on they count. Nothing, and an error, when one cannot be read.
  static std::optional<BoundCounters> begin(const std::vector<ErrorCounterBinding>& counters, const V4l2Device& node,
                                            DiagnosticErrorPtr* error);

  // By how much they have grown; one that is below what it was has begun anew, from 0. False, and an error, when one
  // cannot be read.
  bool addTo(Dictionary& dictionary, const V4l2Device& node, DiagnosticErrorPtr* error) const;

 private:
  struct Counter {
    ErrorCounterBinding binding;
    std::uint64_t base = 0;
  };

  std::vector<Counter> counters_;
};

// ErrorCounters of a stream that has counted nothing: the counters that diagnostics read are 0 where the binding names
// none, then the binding's, then those of the kernel.
Dictionary errorCountersOf(const std::vector<ErrorCounterBinding>& bound);
void addKernelCounters(Dictionary& dictionary, const FrameCounts& counts);

}  // namespace quazor
