#include "backends/simulated/capture/session_status.h"

#include <algorithm>
#include <cmath>

namespace quazor {
namespace {

// Large enough for a duration in nanoseconds times two frame rates: 63 + 30 + 30 bits.
__extension__ using Wide = __int128;

// The scale of nanoseconds times millionths of a frame per second.
constexpr Wide kFrameScale = Wide{1'000'000'000} * 1'000'000;

Wide wide(std::chrono::nanoseconds duration) { return duration.count(); }

Wide dividedUp(Wide dividend, Wide divisor) { return (dividend + divisor - 1) / divisor; }

// The number of lost frames among 0 to count - 1.
Wide dropped(const Camera& camera, Wide count) {
  const Wide every = static_cast<Wide>(camera.dropEvery);
  Wide lost = every == 0 ? 0 : count / every;
  for (const std::uint64_t number : camera.droppedFrames) {
    const Wide frame = static_cast<Wide>(number);
    const bool lostAnyway = every != 0 && (frame + 1) % every == 0;
    if (frame < count && !lostAnyway) ++lost;
  }
  return lost;
}

}  // namespace

MicroFrameRate microFrameRate(double framesPerSecond) {
  return std::max<MicroFrameRate>(1, static_cast<MicroFrameRate>(std::llround(framesPerSecond * 1e6)));
}

SessionCount countSession(const Camera& camera, const StreamRun& run, const StreamRun& master,
                          std::chrono::nanoseconds now) {
  constexpr SessionCount kNoFrames{0, -1};
  const Wide rate = static_cast<Wide>(run.rate);
  const Wide masterRate = static_cast<Wide>(master.rate);

  const Wide late = std::max(Wide{0}, wide(run.started) - wide(master.started));
  const Wide offset = dividedUp(late * masterRate, kFrameScale) + static_cast<Wide>(camera.firstFrameOffset);

  // The camera's streaming time since the master's frame with which it starts, in units of 1 / masterRate.
  const Wide streamed = (wide(run.stopped.value_or(now)) - wide(master.started)) * masterRate - offset * kFrameScale;
  if (!camera.deliversFrames || streamed <= 0) return kNoFrames;
  const Wide possible = streamed * rate / (masterRate * kFrameScale);
  const Wide delivered = possible - dropped(camera, possible);
  if (delivered == 0) return kNoFrames;
  return {static_cast<std::int64_t>(offset), static_cast<std::int64_t>(delivered)};
}

}  // namespace quazor
