#include "backends/simulated/capture/session_status.h"

#include <gtest/gtest.h>

#include <chrono>
#include <ostream>
#include <string>

namespace quazor {

void PrintTo(const SessionCount& count, std::ostream* out) { *out << count.offset << " + " << count.frameCount; }

namespace {

using namespace std::chrono_literals;

StreamRun run(std::chrono::nanoseconds started, double rate,
              std::optional<std::chrono::nanoseconds> stopped = std::nullopt) {
  return {started, stopped, microFrameRate(rate)};
}

Camera changed(void (*change)(Camera&)) {
  Camera camera;
  change(camera);
  return camera;
}

TEST(SessionStatus, CountsWholeFrames) {
  const struct {
    const char* name;
    Camera camera;
    StreamRun run;
    StreamRun master;
    std::chrono::nanoseconds now;
    SessionCount expected;
  } kRows[] = {
      {"2 s at 30 per second are 60 frames", {}, run(0s, 30), run(0s, 30), 2s, {0, 60}},
      {"a nanosecond less is a frame less", {}, run(0s, 30), run(0s, 30), 2s - 1ns, {0, 59}},
      {"a rate with decimals counts exactly", {}, run(0s, 29.97), run(0s, 29.97), 100s, {0, 2997}},
      {"292 years do not overflow",
       {},
       run(0s, 1000),
       run(0s, 1000),
       std::chrono::nanoseconds::max(),
       {0, 9'223'372'036'854}},
      {"time before the session does not count", {}, run(5s, 30), run(5s, 30), 7s, {0, 60}},
      {"the first frame needs its time", {}, run(0s, 10), run(0s, 10), 100ms, {0, 1}},
      {"before the first frame there is none", {}, run(0s, 10), run(0s, 10), 100ms - 1ns, {0, -1}},
      {"100 ms late at 30 per second is 3 frames late", {}, run(100ms, 30), run(0s, 30), 2s, {3, 57}},
      {"between two frames of the master it waits for the next", {}, run(100ms + 1ns, 30), run(0s, 30), 2s, {4, 56}},
      {"a camera that is early waits for the master", {}, run(0s, 30), run(1s, 30), 3s, {0, 60}},
      {"the camera's own offset adds",
       changed([](Camera& c) { c.firstFrameOffset = 2; }),
       run(100ms, 30),
       run(0s, 30),
       2s,
       {5, 55}},
      {"a master may have an offset too",
       changed([](Camera& c) { c.firstFrameOffset = 4; }),
       run(0s, 30),
       run(0s, 30),
       2s,
       {4, 56}},
      {"a slower camera has fewer frames",
       changed([](Camera& c) { c.firstFrameOffset = 30; }),
       run(0s, 10),
       run(0s, 30),
       3s,
       {30, 20}},
      {"a stop ends the counting", {}, run(0s, 30, 1s), run(0s, 30, 1s), 60s, {0, 30}},
      {"dropped frames do not count",
       changed([](Camera& c) {
         c.droppedFrames = {0, 7, 59, 60};
       }),
       run(0s, 30),
       run(0s, 30),
       2s,
       {0, 57}},
      {"every tenth frame dropped",
       changed([](Camera& c) { c.dropEvery = 10; }),
       run(0s, 30),
       run(0s, 30),
       2s,
       {0, 54}},
      {"a frame that is dropped for two reasons is missing once",
       changed([](Camera& c) {
         c.dropEvery = 10;
         c.droppedFrames = {9, 10};
       }),
       run(0s, 30),
       run(0s, 30),
       2s,
       {0, 53}},
      {"all frames dropped is no frame",
       changed([](Camera& c) { c.dropEvery = 1; }),
       run(0s, 30),
       run(0s, 30),
       2s,
       {0, -1}},
      {"a camera that delivers none",
       changed([](Camera& c) {
         c.deliversFrames = false;
         c.firstFrameOffset = 3;
       }),
       run(0s, 30),
       run(0s, 30),
       2s,
       {0, -1}},
      {"a run that ended before the session", {}, run(0s, 30, 1s), run(2s, 30), 4s, {0, -1}},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(countSession(row.camera, row.run, row.master, row.now), row.expected) << row.name;
  }
}

TEST(SessionStatus, OffsetAndFramesOfAHealthySessionAddUpToTheSameAtEveryMoment) {
  for (const double rate : {7.5, 23.976, 30.0, 240.0}) {
    for (std::chrono::nanoseconds now = 1s; now < 2s; now += 1'234'567ns) {
      const SessionCount master = countSession({}, run(1ms, rate), run(1ms, rate), now);
      for (const std::uint64_t offset : {0U, 1U, 5U}) {
        Camera camera;
        camera.firstFrameOffset = offset;
        const SessionCount slave = countSession(camera, run(33ms, rate), run(1ms, rate), now);
        ASSERT_EQ(slave.offset + slave.frameCount, master.offset + master.frameCount) << rate << " " << now.count();
      }
    }
  }
}

TEST(SessionStatus, RatesAreKeptToAMillionth) {
  EXPECT_EQ(microFrameRate(30), 30'000'000U);
  EXPECT_EQ(microFrameRate(29.97), 29'970'000U);
  EXPECT_EQ(microFrameRate(1e-9), 1U);
}

}  // namespace
}  // namespace quazor
