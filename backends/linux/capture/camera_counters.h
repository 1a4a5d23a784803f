// The counters of a stream.
#pragma once

#include "backends/linux/binding/binding.h"
#include "backends/linux/capture/camera_controls.h"
#include "contract/diagnostic_error.h"
#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <optional>
#include <string_view>
#include <vector>

namespace quazor {

// Keys of ErrorCounters in addition to those of the binding.
namespace kernel_counter {
// Frames that the driver counted and did not deliver.
inline constexpr std::string_view kSequenceGaps = "SequenceGapCount";
// Buffers that the driver marked as damaged. They are neither counted as frames nor passed to handlers.
inline constexpr std::string_view kBadBuffers = "BufferErrorCount";
// Calls that the driver refused while the stream ran.
inline constexpr std::string_view kStreamErrors = "StreamErrorCount";
// Removals of the device while the stream ran.
inline constexpr std::string_view kDisconnects = "DisconnectCount";
// Frames with incomplete metadata.
inline constexpr std::string_view kMissingMetadata = "MetadataErrorCount";
}  // namespace kernel_counter

// The counts of a stream since its start.
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

  // Counts a buffer: its sequence number and, unless it is damaged, its frame. Sequence numbers wrap around at 2^32. A
  // number that is not higher than the last one is not a gap.
  void count(std::uint32_t sequence, std::chrono::nanoseconds timestamp, bool isBad);
};

// The number of frames of `interval` by which a camera's first frame came after the master's, rounded to the nearest;
// negative if it came before. 0 if either has no frame.
std::int64_t frameOffset(const FrameCounts& camera, const FrameCounts& master, FrameInterval interval);

// The counters of a binding, which are files and controls. Their values do not start at 0.
// Thread: one at a time.
class BoundCounters final {
 public:
  // Reads the initial values, which are subtracted later. Returns nothing and an error if one cannot be read.
  static std::optional<BoundCounters> begin(const std::vector<ErrorCounterBinding>& counters,
                                            const CameraControls& camera, DiagnosticErrorPtr* error);

  // Adds the increments to the dictionary. A value below its initial value was reset and counts from 0. Returns false
  // and an error if one cannot be read.
  bool addTo(Dictionary& dictionary, const CameraControls& camera, DiagnosticErrorPtr* error) const;

 private:
  struct Counter {
    ErrorCounterBinding binding;
    std::uint64_t base = 0;
  };

  std::vector<Counter> counters_;
};

// The ErrorCounters of a stream without counts: 0 for each counter that diagnostics read and the binding lacks, then
// the counters of the binding, then those of the kernel.
Dictionary errorCountersOf(const std::vector<ErrorCounterBinding>& bound);
void addKernelCounters(Dictionary& dictionary, const FrameCounts& counts);

}  // namespace quazor
