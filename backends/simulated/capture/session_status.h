// The arithmetic of a synchronised session: which frames came.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/simulated/scenario/scenario.h"

#include <chrono>
#include <cstdint>
#include <optional>

namespace quazor {

// Millionths of a frame per second; at least 1. All arithmetic on frames is exact, in integers of this and of
// nanoseconds: 2 s at 30 per second are 60 frames and 100 s at 29.97 are 2997.
using MicroFrameRate = std::uint64_t;

MicroFrameRate microFrameRate(double framesPerSecond);

// One stretch of a stream, from its start to its stop.
struct StreamRun {
  std::chrono::nanoseconds started{0};
  std::optional<std::chrono::nanoseconds> stopped;  // nothing while it runs
  MicroFrameRate rate = 1;
};

// What a camera has delivered by `now` in the session that its group's master began.
//
// The session begins when the master starts. A camera that starts later begins with the master's next frame, and then
// `firstFrameOffset` frames after that; a camera that started before the master waits for it. From there on its frame
// k comes (k + 1) / rate later, at its own rate. Dropped frames are not counted. For the master itself hand in its run
// twice. A camera without frames has offset 0.
SessionCount countSession(const Camera& camera, const StreamRun& run, const StreamRun& master,
                          std::chrono::nanoseconds now);

}  // namespace quazor
