// FrameTeller: tells the frames of a phone, and the tasks of queues, as events.
#pragma once

#include "host/device/frame_rings.h"
#include "host/model/run_event.h"

#include <chrono>
#include <cstdint>
#include <vector>

namespace quazor {

// What a run records about frames and tasks.
struct TraceSetting {
  static constexpr std::uint64_t kDefaultFrames = 100'000;

  bool isOn = false;
  std::uint64_t framesPerStep = kDefaultFrames;  // as in FrameRings
  bool tasks = false;                            // the tasks of the plug-in's queues, too
};

// Collects the frames of each stream and tells them when there are kMaxTracedFrames, or every ten seconds.
// Thread: one at a time.
class FrameTeller {
 public:
  // Both are borrowed.
  FrameTeller(const FrameRings& rings, RunEventSink& events) : drain_(rings), events_(events) {}

  // Returns true if the next call should come soon.
  bool update();
  // Tells everything that is left, after the phone's process has ended.
  void end();

 private:
  using Moment = std::chrono::steady_clock::time_point;

  struct Collected {
    FramesTraced event;
    Moment since{};  // of the first frame
  };

  bool collect(bool isLast);
  void tell(std::size_t stream);

  FrameDrain drain_;
  RunEventSink& events_;
  std::vector<Collected> collected_;  // of each stream
};

}  // namespace quazor
