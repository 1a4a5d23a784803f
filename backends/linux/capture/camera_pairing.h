// FramePairing: matches frames with their metadata buffers.
#pragma once

#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <deque>
#include <optional>
#include <vector>

namespace quazor {

// A frame on its way to a handler.
struct CapturedFrame {
  std::chrono::nanoseconds timestamp{0};
  Dictionary controls;                              // control values read with the frame
  std::optional<std::vector<std::uint8_t>> paired;  // the metadata buffer with the same time stamp, if any
};

// Frames and metadata arrive in the order of their time stamps, on two independent nodes. Sequence numbers cannot match
// them, because each node has its own, and one may continue after an earlier stream. Time stamps can, because drivers
// stamp both from one reading of the clock.
//
// Thread: one at a time.
class FramePairing final {
 public:
  // Time stamps that differ by at most this are equal: V4L2 rounds them to microseconds.
  static constexpr std::chrono::nanoseconds kTolerance = std::chrono::microseconds(2);
  // The maximum time that a frame waits for its metadata.
  static constexpr std::chrono::nanoseconds kMaxWait = std::chrono::milliseconds(100);

  void addFrame(CapturedFrame frame, std::chrono::nanoseconds now);
  void addMetadata(std::chrono::nanoseconds timestamp, std::vector<std::uint8_t> contents);
  // Ends the metadata: frames no longer wait for it.
  void endMetadata() { ended_ = true; }

  // The next frame in order that has its metadata or no longer waits for it; nothing if none is ready.
  std::optional<CapturedFrame> next(std::chrono::nanoseconds now);
  // When to call next() again even if nothing was added; nothing if no frame waits.
  std::optional<std::chrono::nanoseconds> deadline() const;

 private:
  struct Waiting {
    CapturedFrame frame;
    std::chrono::nanoseconds until;
  };
  struct Metadata {
    std::chrono::nanoseconds timestamp;
    std::vector<std::uint8_t> contents;
  };

  static constexpr std::size_t kMaxMetadata = 64;

  std::deque<Waiting> frames_;
  std::deque<Metadata> metadata_;
  bool ended_ = false;
};

}  // namespace quazor
