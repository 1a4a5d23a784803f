// The arithmetic of a synchronised session: the frames that each camera delivers.
#pragma once

#include "backends/capture/capture_back.h"
#include "backends/simulated/scenario/scenario.h"

#include <chrono>
#include <cstdint>
#include <optional>

namespace quazor {

// Millionths of a frame per second; at least 1. All arithmetic on frames uses integers of this unit and of nanoseconds
// and is exact: 2 s at 30 per second are 60 frames and 100 s at 29.97 are 2997.
using MicroFrameRate = std::uint64_t;

MicroFrameRate microFrameRate(double framesPerSecond);

// One streaming run, from start to stop.
struct StreamRun {
  std::chrono::nanoseconds started{0};
  std::optional<std::chrono::nanoseconds> stopped;  // nothing while it runs
  MicroFrameRate rate = 1;
};

// The frames that a camera has delivered by `now` in the session of its group's master.
//
// The session begins when the master starts. A camera that starts later begins with the master's next frame, plus
// `firstFrameOffset` frames; a camera that started before the master waits for it. From then on its frame k arrives (k
// + 1) / rate later, at its own rate. Dropped frames are not counted. For the master itself, pass its run twice. A
// camera without frames has offset 0.
SessionCount countSession(const Camera& camera, const StreamRun& run, const StreamRun& master,
                          std::chrono::nanoseconds now);

}  // namespace quazor
