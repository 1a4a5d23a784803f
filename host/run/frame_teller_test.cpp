#include "host/run/frame_teller.h"

#include "host/testing/test_events.h"
#include "host/testing/test_phone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <string>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

class FrameTellerTest : public testing::Test {
 protected:
  void make(std::uint64_t framesPerStep = 0) {
    rings_ = std::make_unique<FrameRings>(framesPerStep);
    rings_->begin(clock_->time);
    stream_ = rings_->addStream("wide", clock_, WhenTraceIsFull::kLose);
    teller_ = std::make_unique<FrameTeller>(*rings_, events_);
  }

  void pass(std::size_t count) {
    for (std::size_t i = 0; i < count; ++i) {
      if (const auto place = stream_->deliver(next_++, clock_->time)) stream_->handBack(*place);
    }
  }

  // "STREAM STEP FRAMES LOST" of each event.
  std::vector<std::string> told() {
    std::vector<std::string> texts;
    for (const RunEvent& event : events_.events) {
      const auto* const traced = std::get_if<FramesTraced>(&event);
      texts.push_back(traced == nullptr
                          ? std::get<Logged>(event).line.text
                          : traced->stream + " " + std::to_string(traced->step) + " " +
                                std::to_string(traced->frames.size()) + " " + std::to_string(traced->lost));
    }
    events_.events.clear();
    return texts;
  }

  EventList events_;
  std::shared_ptr<ManualClock> clock_ = std::make_shared<ManualClock>();
  std::unique_ptr<FrameRings> rings_;
  std::shared_ptr<TracedStream> stream_;
  std::unique_ptr<FrameTeller> teller_;
  std::uint64_t next_ = 0;
};

TEST_F(FrameTellerTest, TellsAsManyFramesAtOnceAsAnEventHolds) {
  make();
  pass(kMaxTracedFrames - 1);
  EXPECT_TRUE(teller_->update());
  EXPECT_THAT(told(), IsEmpty());
  pass(2);
  EXPECT_FALSE(teller_->update());
  const auto first = std::get<FramesTraced>(events_.events.at(0));
  EXPECT_EQ(first.frames.front().number, 0);
  EXPECT_EQ(first.frames.back().number, 4095);
  EXPECT_THAT(told(), ElementsAre("wide 1 4096 0"));
  pass(5000);
  teller_->end();
  EXPECT_THAT(told(), ElementsAre("wide 1 4096 0", "wide 1 905 0"));
}

TEST_F(FrameTellerTest, TellsNothingOfAStreamWithoutFrames) {
  make();
  teller_->update();
  teller_->end();
  EXPECT_THAT(told(), IsEmpty());
}

TEST_F(FrameTellerTest, TellsEachStepInAnEventOfItsOwn) {
  make(10);
  pass(70);
  teller_->end();
  EXPECT_THAT(told(), ElementsAre("wide 1 10 0", "wide 2 10 0", "wide 4 10 0"));
}

TEST_F(FrameTellerTest, TellsWhatWasLostOnce) {
  make();
  pass(FrameRings::kFramesOfRing + 3);
  teller_->update();
  EXPECT_THAT(told(), ElementsAre("wide 1 4096 3", "wide 1 4096 0"));
  pass(FrameRings::kFramesOfRing + 4);
  teller_->end();
  EXPECT_THAT(told(), ElementsAre("wide 1 4096 4", "wide 1 4096 0"));
}

TEST_F(FrameTellerTest, SaysHowManyStreamsAreNotRecorded) {
  make();
  for (std::size_t i = 1; i < FrameRings::kMaxStreams + 2; ++i) {
    rings_->addStream(std::to_string(i), clock_, WhenTraceIsFull::kLose);
  }
  teller_->end();
  EXPECT_THAT(told(), ElementsAre("2 more streams or queues are not recorded: there are more than 64"));
}

}  // namespace
}  // namespace quazor
