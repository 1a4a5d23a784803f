// FramePairing: finds for each frame the metadata buffer that belongs to it.
#pragma once

#include "contract/value.h"

#include <chrono>
#include <cstdint>
#include <deque>
#include <optional>
#include <vector>

namespace quazor {

// A frame on its way to the handlers.
struct CapturedFrame {
  std::chrono::nanoseconds timestamp{0};
  Dictionary controls;                              // what was read with it
  std::optional<std::vector<std::uint8_t>> paired;  // the metadata buffer with its time stamp, when it came
};

// Frames and metadata come in the order of their time stamps, on two nodes that do not wait for each other. Sequence
// numbers do not tell which belong together: each node counts for itself, and one may start where an earlier stream
// ended. Time stamps do, as drivers stamp both from one reading of the clock.
//
// Thread: one at a time.
class FramePairing final {
 public:
  // Stamps that differ by at most this are the same moment: V4L2 gives them in microseconds.
  static constexpr std::chrono::nanoseconds kTolerance = std::chrono::microseconds(2);
  // How long a frame waits for its metadata.
  static constexpr std::chrono::nanoseconds kMaxWait = std::chrono::milliseconds(100);

  void addFrame(CapturedFrame frame, std::chrono::nanoseconds now);
  void addMetadata(std::chrono::nanoseconds timestamp, std::vector<std::uint8_t> contents);
  // No metadata will come any more: frames no longer wait.
  void endMetadata() { ended_ = true; }

  // The next frame to hand on, in order: it has its metadata, or that will not come. Nothing when none is ready.
  std::optional<CapturedFrame> next(std::chrono::nanoseconds now);
  // When next() is to be asked again though nothing was added; nothing when no frame waits.
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
