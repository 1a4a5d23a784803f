// Frames that the process of a run leaves in the memory that it shares with the host.
#include "host/device/frame_rings.h"
#include "host/run/isolation.h"
#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"
#include "host/testing/test_signals.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <functional>

namespace quazor {
namespace {

using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

class FramesOfRunsTest : public testing::Test {
 protected:
  // Runs `body`, which may deliver frames, in a process of its own, after the stage of loading has begun.
  void run(const std::function<void(RunEventSink& events)>& body, bool begins = true) {
    Diagnostic diagnostic;
    diagnostic.name = "One";
    const auto whole = [&](RunEventSink& events) {
      if (begins) events.onEvent(StageStarted{Stage::kLoad, momentAt(1)});
      body(events);
    };
    superviseRun(options_, signals_, diagnostic, {}, whole, shared_, progress_, events_);
  }

  void deliver(std::uint64_t count) const {
    const auto clock = std::make_shared<ManualClock>();
    shared_.frames->begin(clock->time);
    const auto stream = shared_.frames->addStream("wide", clock, WhenTraceIsFull::kLose);
    for (std::uint64_t i = 0; i < count; ++i) stream->deliver(i, clock->time);
  }

  const FramesTraced& frames() const {
    for (const RunEvent& event : events_.events) {
      if (const auto* const traced = std::get_if<FramesTraced>(&event)) return *traced;
    }
    static const FramesTraced none;
    return none;
  }

  const DefaultRequestsToEnd defaults_;
  WatchedSignals signals_;
  IsolationOptions options_;
  Progress progress_{nullptr};
  SharedRunState shared_{{}, {}, {}, std::make_shared<FrameRings>(0)};
  EventList events_;
};

TEST_F(FramesOfRunsTest, AreToldBeforeTheRunIsComplete) {
  run([this](RunEventSink& events) {
    deliver(3);
    events.onEvent(StageEnded{Stage::kLoad, std::nullopt, momentAt(2)});
    events.onEvent(DiagnosticCompleted{});
  });
  EXPECT_EQ(namesOf(events_.events), "stageBegan stageEnded frames diagnosticCompleted");
  EXPECT_EQ(frames().frames.size(), 3U);
}

TEST_F(FramesOfRunsTest, OutlastACrash) {
  run([this](RunEventSink& /*events*/) {
    deliver(5000);
    std::abort();
  });
  EXPECT_THAT(namesOf(events_.events), testing::MatchesRegex("stageBegan (log )*frames (log )*frames (log )*failed"));
  EXPECT_EQ(frames().stream, "wide");
  EXPECT_EQ(frames().frames.size(), 4096U);
}

TEST_F(FramesOfRunsTest, AreNotToldBeforeTheFirstStage) {
  run([this](RunEventSink& /*events*/) { deliver(5); }, false);
  EXPECT_THAT(namesOf(events_.events), Not(HasSubstr("frames")));
}

TEST_F(FramesOfRunsTest, AreNotTakenFromTheConnection) {
  run([](RunEventSink& events) { events.onEvent(FramesTraced{"wide", 1, {{1, 2, 3, 4}}, 0}); });
  EXPECT_EQ(namesOf(events_.events), "stageBegan failed");
}

TEST_F(FramesOfRunsTest, MayBeAnything) {
  run([this](RunEventSink& /*events*/) {
    deliver(10);
    const std::span<std::byte> memory = shared_.frames->memory();
    std::memset(memory.data(), 0x55, memory.size() / 2);
    std::abort();
  });
  EXPECT_THAT(namesOf(events_.events), EndsWith("failed"));
}

TEST_F(FramesOfRunsTest, AreOnlyToldOnRequest) {
  SharedRunState without;
  Diagnostic diagnostic;
  superviseRun(
      options_, signals_, diagnostic, {},
      [](RunEventSink& events) {
        events.onEvent(StageStarted{Stage::kLoad, momentAt(1)});
      },
      without, progress_, events_);
  EXPECT_EQ(namesOf(events_.events), "stageBegan failed");
}

}  // namespace
}  // namespace quazor
