// FramePairing: matches frames with their metadata buffers.
#pragma once

#include "backends/linux/binding/binding.h"
#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <deque>
#include <optional>
#include <string>
#include <vector>

namespace quazor {

// The time stamp and number that a driver gives a buffer.
struct BufferStamp {
  std::chrono::nanoseconds timestamp{0};
  std::uint32_t sequence = 0;
};

// A frame on its way to a handler.
struct CapturedFrame {
  std::chrono::nanoseconds timestamp{0};
  std::uint32_t sequence = 0;
  Dictionary controls;                              // control values read with the frame
  std::optional<std::vector<std::uint8_t>> paired;  // its metadata buffer, if any
};

// Frames and their metadata arrive in order, on two independent nodes. Most drivers stamp both from one reading of the
// clock but number them separately, and one node may continue after an earlier stream: their buffers are paired by time
// stamp. The driver of USB cameras gives both the same number, and may stamp them differently: those are paired by
// number.
//
// Thread: one at a time.
class FramePairing final {
 public:
  explicit FramePairing(MetadataPairing pairing = MetadataPairing::kTimestamp) : pairing_(pairing) {}

  // Time stamps that differ by at most this are equal: V4L2 rounds them to microseconds.
  static constexpr std::chrono::nanoseconds kTolerance = std::chrono::microseconds(2);
  // The maximum time that a frame waits for its metadata.
  static constexpr std::chrono::nanoseconds kMaxWait = std::chrono::milliseconds(100);

  void addFrame(CapturedFrame frame, std::chrono::nanoseconds now);
  void addMetadata(BufferStamp stamp, std::vector<std::uint8_t> contents);
  // Ends the metadata: frames no longer wait for it.
  void endMetadata() { ended_ = true; }

  // The next frame in order that has its metadata or no longer waits for it; nothing if none is ready.
  std::optional<CapturedFrame> next(std::chrono::nanoseconds now);
  // Why the last frame of next() has no metadata, for the log.
  std::string whyUnpaired(const CapturedFrame& frame) const;
  // When to call next() again even if nothing was added; nothing if no frame waits.
  std::optional<std::chrono::nanoseconds> deadline() const;

 private:
  struct Waiting {
    CapturedFrame frame;
    std::chrono::nanoseconds until;
  };
  struct Metadata {
    BufferStamp stamp;
    std::vector<std::uint8_t> contents;
  };

  static constexpr std::size_t kMaxMetadata = 64;

  // Negative if the metadata is of an earlier frame, positive if it is of a later one.
  int order(const BufferStamp& metadata, const CapturedFrame& frame) const;

  const MetadataPairing pairing_;
  std::optional<BufferStamp> last_;  // of the metadata
  std::deque<Waiting> frames_;
  std::deque<Metadata> metadata_;
  bool ended_ = false;
};

}  // namespace quazor
