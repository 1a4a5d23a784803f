#include "backends/simulated/capture/frame_delivery.h"

#include "backends/simulated/capture/streaming_for_tests.h"
#include "backends/simulated/phone_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdint>
#include <set>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

TEST(FrameTimeTest, IsExactAndRoundedUpToTheNanosecond) {
  const struct {
    const char* name;
    double rate;
    std::uint64_t frame;
    std::int64_t nanoseconds;
  } kRows[] = {
      {"the first frame comes one interval after the start", 30, 0, 33'333'334},
      {"whole seconds are whole", 30, 89, 3'000'000'000},
      {"a fast camera", 1000, 0, 1'000'000},
      {"a rate with decimals", 29.97, 2996, 100'000'000'000},
      {"a time beyond the clock saturates", 0.000001, 1'000'000'000'000, std::numeric_limits<std::int64_t>::max()},
  };
  for (const auto& row : kRows) {
    EXPECT_EQ(frameTime(microFrameRate(row.rate), row.frame).count(), row.nanoseconds) << row.name;
  }
}

class FrameDeliveryTest : public ::testing::Test {
 protected:
  // A phone whose camera "front" `change` modifies, and a user of its stream.
  template <class Change>
  void make(Change&& change, std::uint64_t seed = 1) {
    Scenario scenario = smallScenario();
    change(scenario.cameras[2]);
    phone_.emplace(scenario, PhoneTime::kVirtual, seed);
    stream_.emplace(*phone_);
  }
  void make() {
    make([](Camera&) {});
  }
  void pass(std::chrono::nanoseconds time) { phone_->platform().clock->sleep(time); }

  std::optional<SimulatedPhone> phone_;
  std::optional<StreamUser> stream_;
};

TEST_F(FrameDeliveryTest, FramesComeAtTheirTimesAndTellThem) {
  make();
  pass(1s);
  ASSERT_TRUE(stream_->start());
  pass(101ms);
  const std::vector<StreamUser::Frame> frames = stream_->frames();
  ASSERT_THAT(frames, SizeIs(3));
  EXPECT_EQ(frames[0].arrived, 1s + 33'333'334ns);
  EXPECT_EQ(frames[0].time, (MediaTime{33'333'334, 1'000'000'000, MediaTime::kValid, 0}));
  EXPECT_EQ(frames[2].arrived, 1'100ms);
  EXPECT_EQ(frames[2].time.seconds(), 0.1);
}

TEST_F(FrameDeliveryTest, FramesComeAtTheRateTheHardwareRuns) {
  make([](Camera& camera) { camera.actualFrameRate = 10; });
  ASSERT_TRUE(stream_->start());
  pass(1001ms);
  EXPECT_THAT(stream_->frames(), SizeIs(10));
}

TEST_F(FrameDeliveryTest, NothingComesWithoutAnEnabledOutputOrWithoutAHandler) {
  const struct {
    const char* name;
    const char* key;
    Value value;
  } kRows[] = {
      {"never enabled", "VideoOutputsEnabled", Dictionary{}},
      {"disabled", "VideoOutputsEnabled", Dictionary{{"PrimaryScaler", false}}},
      {"no handlers", "VideoOutputHandlers", Dictionary{}},
      {"an output without handlers", "VideoOutputHandlers", Dictionary{{"PrimaryScaler", Dictionary{}}}},
  };
  for (const auto& row : kRows) {
    make();
    ASSERT_TRUE(stream_->set(row.key, row.value)) << row.name;
    ASSERT_TRUE(stream_->start()) << row.name;
    pass(1s);
    EXPECT_THAT(stream_->frames(), IsEmpty()) << row.name;
    EXPECT_THAT(stream_->events(), IsEmpty()) << row.name;
    EXPECT_EQ(phone_->deliverFrames("front", 3), 0U) << row.name;
  }
}

TEST_F(FrameDeliveryTest, ACameraThatDeliversNothingStillTellsOfEvents) {
  make([](Camera& camera) {
    camera.deliversFrames = false;
    camera.delivery.events = {{10ms, 4}};
  });
  ASSERT_TRUE(stream_->start());
  pass(1s);
  EXPECT_THAT(stream_->frames(), IsEmpty());
  EXPECT_THAT(stream_->events(), SizeIs(1));
}

TEST_F(FrameDeliveryTest, EventsComeAtTheirTimes) {
  make([](Camera& camera) { camera.delivery.events = {{50ms, 7}, {20ms, -1}}; });
  ASSERT_TRUE(stream_->start());
  pass(1s);
  ASSERT_THAT(stream_->events(), SizeIs(2));
  EXPECT_EQ(stream_->events()[0], (StreamUser::Event{20ms, -1, {20'000'000, 1'000'000'000}}));
  EXPECT_EQ(stream_->events()[1], (StreamUser::Event{50ms, 7, {50'000'000, 1'000'000'000}}));
}

TEST_F(FrameDeliveryTest, DroppedFramesDoNotCome) {
  make([](Camera& camera) {
    camera.droppedFrames = {1};
    camera.dropEvery = 3;
  });
  ASSERT_TRUE(stream_->start());
  pass(201ms);
  EXPECT_THAT(stream_->numbers(), ElementsAre(0, 3, 4));
}

TEST_F(FrameDeliveryTest, TimeStampsChangeForOneFrameOrEveryNth) {
  make([](Camera& camera) {
    camera.actualFrameRate = 10;
    camera.delivery.timeStamps = {{1, 2, 5ms, true}, {3, 0, -150ms, true}, {4, 0, 0ms, false}};
  });
  ASSERT_TRUE(stream_->start());
  pass(601ms);
  std::vector<std::int64_t> milliseconds;
  std::vector<std::uint32_t> flags;
  for (const StreamUser::Frame& frame : stream_->frames()) {
    milliseconds.push_back(frame.time.value / 1'000'000);
    flags.push_back(frame.time.flags);
  }
  EXPECT_THAT(milliseconds, ElementsAre(100, 205, 300, 255, 500, 605));
  EXPECT_THAT(flags, ElementsAre(1U, 1U, 1U, 1U, 0U, 1U));
  EXPECT_EQ(stream_->frames()[3].arrived, 400ms);
}

TEST_F(FrameDeliveryTest, ABurstComesAtTheTimeOfItsLastFrame) {
  make([](Camera& camera) {
    camera.actualFrameRate = 10;
    camera.delivery.bursts = {{1, 3}};
  });
  ASSERT_TRUE(stream_->start());
  pass(501ms);
  std::vector<std::pair<std::chrono::nanoseconds, std::int64_t>> times;
  for (const StreamUser::Frame& frame : stream_->frames()) times.emplace_back(frame.arrived, frame.time.value);
  EXPECT_THAT(times,
              ElementsAre(std::pair(100ms, 100'000'000), std::pair(400ms, 200'000'000), std::pair(400ms, 300'000'000),
                          std::pair(400ms, 400'000'000), std::pair(500ms, 500'000'000)));
}

TEST_F(FrameDeliveryTest, SeveralQueuesDeliverInAnyOrder) {
  std::set<std::vector<std::uint64_t>> orders;
  for (std::uint64_t seed = 0; seed < 50; ++seed) {
    make(
        [](Camera& camera) {
          camera.delivery.queues = 3;
          camera.delivery.bursts = {{0, 3}};
        },
        seed);
    ASSERT_TRUE(stream_->start());
    pass(101ms);
    ASSERT_THAT(stream_->numbers(), ::testing::UnorderedElementsAre(0, 1, 2));
    orders.insert(stream_->numbers());
  }
  EXPECT_EQ(orders.size(), 6U);
}

TEST_F(FrameDeliveryTest, NoFrameComesAfterAStop) {
  make();
  ASSERT_TRUE(stream_->start());
  pass(101ms);
  const std::shared_ptr<SerialQueue> queue =
      phone_->platform().concurrency->makeSerialQueue("test", QualityOfService::kDefault);
  bool stopped = false;
  queue->async([&] { stopped = stream_->stop(); });
  pass(1ns);
  ASSERT_TRUE(stopped);
  const std::size_t before = stream_->frames().size();
  pass(1s);
  EXPECT_THAT(stream_->frames(), SizeIs(before));
}

TEST_F(FrameDeliveryTest, AHandlerMayStopItsStream) {
  make();
  stream_->onFrame = [&] { EXPECT_TRUE(stream_->stop()); };
  ASSERT_TRUE(stream_->start());
  pass(1s);
  EXPECT_THAT(stream_->frames(), SizeIs(1));
}

TEST_F(FrameDeliveryTest, FramesMayComeLate) {
  make([](Camera& camera) { camera.delivery.framesAfterStop = 2; });
  ASSERT_TRUE(stream_->start());
  pass(101ms);
  ASSERT_TRUE(stream_->stop());
  EXPECT_THAT(stream_->numbers(), ElementsAre(0, 1, 2));
  pass(1s);
  EXPECT_THAT(stream_->numbers(), ElementsAre(0, 1, 2, 3, 4));
}

TEST_F(FrameDeliveryTest, EveryStartBeginsAnew) {
  make();
  for (int run = 0; run < 2; ++run) {
    ASSERT_TRUE(stream_->start());
    pass(40ms);
    ASSERT_TRUE(stream_->stop());
    pass(1s);
  }
  EXPECT_THAT(stream_->numbers(), ElementsAre(0, 0));
}

TEST_F(FrameDeliveryTest, FramesEndWithTheDevice) {
  make();
  ASSERT_TRUE(stream_->start());
  pass(40ms);
  ASSERT_TRUE(stream_->user.device->invalidate(nullptr));
  pass(1s);
  EXPECT_THAT(stream_->frames(), SizeIs(1));
}

TEST_F(FrameDeliveryTest, HandlersGoWithTheControlOfTheStream) {
  make();
  const std::weak_ptr<Object> handler = stream_->handler();
  ASSERT_FALSE(handler.expired());
  stream_->forgetHandlers();
  ASSERT_FALSE(handler.expired());
  ASSERT_TRUE(stream_->user.device->relinquishControlOfStreams({stream_->user.streams[2]}, nullptr));
  EXPECT_TRUE(handler.expired());
}

TEST_F(FrameDeliveryTest, BuffersThatAreKeptAreTold) {
  make();
  ASSERT_TRUE(stream_->start());
  stream_->keep = {1};
  pass(101ms);
  EXPECT_THAT(phone_->buffersHeld(), ElementsAre(SimulatedPhone::HeldBuffer{"front", 1}));
  ASSERT_THAT(stream_->kept(), SizeIs(1));
  stream_->kept()[0]->release();
  EXPECT_THAT(phone_->buffersHeld(), IsEmpty());
  EXPECT_EQ(phone_->strayReleases(), 0U);
}

TEST_F(FrameDeliveryTest, FramesCanBePushed) {
  make([](Camera& camera) { camera.deliversFrames = false; });
  EXPECT_EQ(phone_->deliverFrames("front", 5), 0U);
  ASSERT_TRUE(stream_->start());
  EXPECT_EQ(phone_->deliverFrames("front", 3), 3U);
  EXPECT_EQ(phone_->deliverFrames("front", 2), 2U);
  EXPECT_THAT(stream_->numbers(), ElementsAre(0, 1, 2, 3, 4));
  EXPECT_EQ(phone_->framesDelivered(), 5U);
  EXPECT_THAT(phone_->buffersHeld(), IsEmpty());
  stream_->onFrame = [&] { stream_->stop(); };
  EXPECT_EQ(phone_->deliverFrames("front", 9), 1U);
  EXPECT_THROW(phone_->deliverFrames("rear", 1), std::invalid_argument);
}

TEST_F(FrameDeliveryTest, ACameraWithoutAProjectorHasEmptyMetadata) {
  make();
  ASSERT_TRUE(stream_->start());
  pass(40ms);
  EXPECT_THAT(stream_->metadata(), ElementsAre("{}"));
}

TEST_F(FrameDeliveryTest, TheProjectorFiresWhenItIsConfiguredTo) {
  for (const int mode : {0, 2}) {
    make([](Camera& camera) { camera.projector.emplace(); });
    const Dictionary configuration{{"Mode", mode}, {"StructuredLightPattern", 1}, {"StructuredLightCurrent", 0}};
    ASSERT_TRUE(stream_->set("InfraredLightSourceConfiguration", configuration));
    ASSERT_TRUE(stream_->start());
    pass(40ms);
    ASSERT_THAT(stream_->frames(), SizeIs(1));
    EXPECT_EQ(stream_->frames()[0].metadata, Value(healthyMetadata(mode == 2))) << mode;
  }
}

TEST_F(FrameDeliveryTest, FramesMayHaveSpecialMetadata) {
  make([](Camera& camera) {
    Projector& projector = camera.projector.emplace();
    for (const auto& [key, value] : healthyMetadata(true)) projector.metadata.without.push_back(key);
    projector.metadata.overrides = {{"a", 1}, {"b", 2}};
    projector.frames[1].overrides = {{"b", "x"}, {"c", 3.5}};
    projector.frames[1].without = {"a"};
    projector.frames[2].attachment = FrameAttachment::kMissing;
    projector.frames[3].attachment = FrameAttachment::kText;
    projector.frames[4].attachment = FrameAttachment::kNumber;
  });
  ASSERT_TRUE(stream_->start());
  pass(201ms);
  EXPECT_THAT(stream_->metadata(),
              ElementsAre("{a = 1; b = 2}", "{b = x; c = 3.5}", "(null)", "metadata", "17", "{a = 1; b = 2}"));
}

}  // namespace
}  // namespace quazor
