// Streaming with a fake driver: frames, counters and every failure.
#include "backends/linux/capture/camera_frames.h"
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "backends/linux/video/v4l2_device.h"
#include "contract/log_channel.h"

#include <cerrno>
#include <thread>

namespace quazor {
namespace {

using Fake = FakeCameras;
using LinuxFramesTest = FakeCamerasTest;
using namespace std::chrono_literals;

constexpr std::size_t kInfrared = 3;

TEST_F(LinuxFramesTest, AFrameCarriesItsTimeStampAndItsMetadata) {
  fake.begin(kInfrared, seen.handler());
  fake.kernel->passTime(100ms);
  const std::vector<SeenFrame> frames = seen.wait(4);
  ASSERT_EQ(frames.size(), 4U);
  EXPECT_EQ(frames[0].time, 1'000'000'000'000);
  EXPECT_EQ(frames[3].time, 1'000'099'999'000) << "V4L2 stamps in microseconds";
  EXPECT_EQ(frames[0].metadata, (Dictionary{{"Fixed", 7}, {"Lit", 1U}}));
  EXPECT_EQ(fake.capture->framesDelivered(), 4U);
  EXPECT_EQ(fake.stop(kInfrared), "done");
  EXPECT_EQ(FramePool::shared().held(), 0U);
}

TEST_F(LinuxFramesTest, StampsInTheFutureAreTakenAsTheyAre) {
  fake.kernel->with(fake.nodes[kInfrared], [](FakeNode& node) { return node.stampedAhead = 30ms; });
  fake.begin(kInfrared, seen.handler());
  fake.kernel->passTime(10ms);
  EXPECT_EQ(seen.wait(1).at(0).time, 1'000'030'000'000);
  EXPECT_EQ(fake.counter(kInfrared, "MetadataErrorCount"), 0);
}

TEST_F(LinuxFramesTest, ADriverWithoutMonotonicStampsGetsTheMomentOfDelivery) {
  fake.kernel->with(fake.nodes[0], [](FakeNode& node) {
    node.timestampFlags = V4L2_BUF_FLAG_TIMESTAMP_UNKNOWN;
    return node.stampedAhead = 500s;
  });
  fake.begin(0, seen.handler());
  fake.kernel->passTime(0ms);
  fake.kernel->produce(fake.nodes[0]);
  EXPECT_EQ(seen.wait(1).at(0).time, 1'000'000'000'000);
}

TEST_F(LinuxFramesTest, TheMetadataNodeStreamsBeforeTheCameraSoThatFrameZeroHasItsPair) {
  fake.prepare(kInfrared);
  fake.handle(kInfrared, seen.handler());
  fake.kernel->failNext(fake.nodes[kInfrared], VIDIOC_STREAMON, EINVAL);
  EXPECT_EQ(fake.start(kInfrared),
            "1 VIDIOC_STREAMON on " + fake.nodes[kInfrared] + " failed: Invalid argument (EINVAL)");
  const std::vector<std::string> want{"STREAMON", "STREAMOFF"};
  EXPECT_EQ(fake.kernel->with(fake.metadataNode, [](auto& node) { return node.history; }), want);
}

TEST_F(LinuxFramesTest, AFrameWithoutItsPairComesLateAndWithoutTheFields) {
  fake.prepare(kInfrared);
  fake.handle(kInfrared, seen.handler());
  fake.kernel->with(fake.nodes[kInfrared], [](FakeNode& node) {
    node.metadataNode.clear();
    return node.delivers = false;
  });
  ASSERT_EQ(fake.start(kInfrared), "done");
  fake.kernel->produce(fake.nodes[kInfrared]);
  ASSERT_TRUE(fake.kernel->settle());
  EXPECT_EQ(fake.capture->framesDelivered(), 0U);
  fake.kernel->passTime(100ms);
  EXPECT_EQ(seen.wait(1).at(0).metadata, (Dictionary{{"Fixed", 7}}));
  EXPECT_EQ(fake.counter(kInfrared, "MetadataErrorCount"), 1);
}

TEST(LinuxFramesOwnMachineTest, AMetadataNodeThatFailsLeavesTheCameraStreaming) {
  for (const bool atQueue : {false, true}) {
    Fake fake;
    SeenFrames seen;
    fake.begin(kInfrared, seen.handler());
    if (atQueue) {
      fake.kernel->failNext(fake.metadataNode, VIDIOC_QBUF, EINVAL);
    } else {
      fake.kernel->breakStream(fake.metadataNode);
    }
    fake.kernel->passTime(330ms);
    EXPECT_EQ(seen.wait(10).size(), 10U);
    EXPECT_EQ(fake.counter(kInfrared, "StreamErrorCount"), 0);
    EXPECT_EQ(fake.counter(kInfrared, "MetadataErrorCount"), atQueue ? 0 : 10);
    EXPECT_EQ(fake.stop(kInfrared), "done");
  }
}

TEST_F(LinuxFramesTest, AMetadataNodeThatFailsIsToldInTheLog) {
  const auto log = std::make_shared<LogLines>();
  sharedLog().setBackend(log, LogLevel::kError);
  fake.begin(kInfrared, seen.handler());
  fake.kernel->breakStream(fake.metadataNode);
  fake.kernel->passTime(100ms);
  seen.wait(3);
  EXPECT_EQ(fake.stop(kInfrared), "done");
  sharedLog().setBackend(nullptr, LogLevel::kError);
  const std::vector<std::string> want{
      "FrontFacingInfraredCamera while streaming: LinuxErrorDomain code 1: VIDIOC_DQBUF "
      "on " +
      fake.metadataNode + " failed: Input/output error (EIO)"};
  EXPECT_EQ(log->lines(), want);
}

TEST_F(LinuxFramesTest, AMetadataNodeThatIsAlwaysReadyDoesNotKeepTheCameraWaiting) {
  fake.kernel->with(fake.metadataNode, [](FakeNode& node) { return node.mostBuffers = 1; });
  int dequeued = 0;  // read and written by the thread of the frames
  int dequeuedBefore = 0;
  fake.begin(kInfrared, [&](PixelBuffer&, MediaTime) { dequeuedBefore = dequeued; });
  ASSERT_TRUE(fake.kernel->settle());
  fake.kernel->beforeCall = [&](unsigned long request) {
    if (request == VIDIOC_DQBUF && ++dequeued <= 3) fake.kernel->produce(fake.metadataNode);
  };
  fake.kernel->passTime(0ms);
  fake.kernel->produce(fake.nodes[kInfrared]);
  ASSERT_TRUE(fake.kernel->settle());
  EXPECT_EQ(fake.stop(kInfrared), "done");
  fake.kernel->beforeCall = nullptr;
  EXPECT_EQ(dequeuedBefore, 3) << "one of the metadata, the frame, and the one that is not there yet";
}

TEST_F(LinuxFramesTest, ABufferThatIsKeptTakesNothingFromTheDriver) {
  std::vector<PixelBuffer*> kept;
  fake.begin(0, [&](PixelBuffer& buffer, MediaTime) {
    buffer.retain();
    kept.push_back(&buffer);
  });
  fake.kernel->passTime(990ms);
  EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 0);
  EXPECT_EQ(fake.stop(0), "done");
  fake.release();
  EXPECT_EQ(kept.size(), 30U);
  for (PixelBuffer* buffer : kept) {
    EXPECT_EQ(buffer->attachment(capture_key::MetadataDictionary), Value(Dictionary{}));
    buffer->release();
  }
  EXPECT_EQ(FramePool::shared().held(), 0U);
}

TEST_F(LinuxFramesTest, FewerBuffersThanAskedForAreEnough) {
  fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.mostBuffers = 1; });
  fake.begin(0);
  fake.kernel->passTime(990ms);
  EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 0);
  EXPECT_EQ(fake.stop(0), "done");
}

TEST_F(LinuxFramesTest, OneMetadataBufferIsEnough) {
  fake.kernel->with(fake.metadataNode, [](FakeNode& node) { return node.mostBuffers = 1; });
  fake.begin(kInfrared, seen.handler());
  fake.kernel->passTime(330ms);
  EXPECT_EQ(seen.wait(10).size(), 10U);
  EXPECT_EQ(fake.counter(kInfrared, "MetadataErrorCount"), 0);
}

TEST_F(LinuxFramesTest, GapsAndDamagedBuffersAreCountedAndDamagedOnesAreNoFrames) {
  fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.delivers = false; });
  fake.begin(0, seen.handler());
  fake.kernel->produce(fake.nodes[0]);
  fake.kernel->skip(fake.nodes[0], 4);
  fake.kernel->produce(fake.nodes[0], V4L2_BUF_FLAG_ERROR);
  fake.kernel->produce(fake.nodes[0]);
  EXPECT_EQ(seen.wait(2).size(), 2U);
  ASSERT_TRUE(fake.kernel->settle());
  EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 4);
  EXPECT_EQ(fake.counter(0, "BufferErrorCount"), 1);
  EXPECT_EQ(fake.stop(0), "done");
  EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 4) << "the counters stay";
}

TEST_F(LinuxFramesTest, ADisconnectIsCountedToldByTheStopAndOverWithTheNextUse) {
  fake.begin(0);
  fake.kernel->passTime(330ms);
  fake.kernel->disconnect(fake.nodes[0]);
  while (fake.counter(0, "DisconnectCount") == 0) std::this_thread::yield();
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 0);
  ASSERT_TRUE(fake.kernel->settle());
  const std::uint64_t polls = fake.kernel->pollsWithoutEffect();
  std::this_thread::sleep_for(5ms);
  EXPECT_EQ(fake.kernel->pollsWithoutEffect(), polls) << "the dead descriptor is not polled again";
  EXPECT_EQ(fake.stop(0), "9 VIDIOC_STREAMOFF on " + fake.nodes[0] + " failed: No such device (ENODEV)");
  ASSERT_TRUE(fake.device->relinquishControlOfStreams({fake.streams[0]}, nullptr));
  fake.prepare(0);
  EXPECT_EQ(fake.start(0), "done");
  EXPECT_EQ(fake.counter(0, "DisconnectCount"), 0);
}

TEST_F(LinuxFramesTest, AFatalErrorIsCountedAndTheStreamCanBeStartedAgain) {
  fake.begin(0);
  fake.kernel->breakStream(fake.nodes[0]);
  while (fake.counter(0, "StreamErrorCount") == 0) std::this_thread::yield();
  EXPECT_EQ(fake.stop(0), "done");
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 1);
  EXPECT_EQ(fake.start(0), "done");
  fake.kernel->passTime(330ms);
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 0);
  EXPECT_EQ(fake.stop(0), "done");
}

TEST_F(LinuxFramesTest, AnEventWithoutABufferEndsTheStreamInsteadOfTurningOver) {
  fake.kernel->with(fake.nodes[0], [](FakeNode& node) { return node.mostBuffers = 1; });
  fake.begin(0);
  ASSERT_TRUE(fake.kernel->settle());
  fake.kernel->failNext(fake.nodes[0], VIDIOC_QBUF, EINVAL);
  fake.kernel->produce(fake.nodes[0]);
  while (fake.counter(0, "StreamErrorCount") < 2) std::this_thread::yield();
  ASSERT_TRUE(fake.kernel->settle());
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 2) << "the buffer that was not taken back, then the dead queue";
  EXPECT_EQ(fake.stop(0), "done");
}

TEST_F(LinuxFramesTest, ABufferThatTheDriverDoesNotTakeBackIsOfferedAgain) {
  fake.begin(0);
  ASSERT_TRUE(fake.kernel->settle());
  fake.kernel->failNext(fake.nodes[0], VIDIOC_QBUF, EINVAL);
  fake.kernel->passTime(990ms);
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 1);
  EXPECT_EQ(fake.counter(0, "SequenceGapCount"), 0);
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](auto& node) { return node.queued.size(); }), 4U);
}

TEST(LinuxFramesOwnMachineTest, WhateverFailsAtTheStartLeavesNothingBusy) {
  Binding binding = fakeBinding();
  binding.cameras[kInfrared].errorCounters = {{"SIFErrorCount", {}, "Power"}};
  const struct {
    const char* name;
    unsigned long request;
    int after;
    const char* want;
  } rows[] = {
      {"format", VIDIOC_S_FMT, 0, "VIDIOC_S_FMT on"},
      {"trying a format", VIDIOC_TRY_FMT, 0, "VIDIOC_TRY_FMT on"},
      {"listing formats", VIDIOC_ENUM_FMT, 0, "VIDIOC_ENUM_FMT on"},
      {"rate", VIDIOC_S_PARM, 0, "VIDIOC_S_PARM on"},
      {"buffers", VIDIOC_REQBUFS, 0, "VIDIOC_REQBUFS on"},
      {"asking for the second buffer", VIDIOC_QUERYBUF, 1, "VIDIOC_QUERYBUF on"},
      {"queueing the second buffer", VIDIOC_QBUF, 1, "VIDIOC_QBUF on"},
      {"stream", VIDIOC_STREAMON, 0, "VIDIOC_STREAMON on"},
      {"lighting the projector", VIDIOC_S_EXT_CTRLS, 0, "VIDIOC_S_EXT_CTRLS of \"Power\" on"},
      {"reading a counter", VIDIOC_G_EXT_CTRLS, 0, "VIDIOC_G_EXT_CTRLS of \"Power\" on"},
  };
  for (const auto& row : rows) {
    Fake fake(binding);
    fake.prepare(kInfrared);
    ASSERT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2)), "done");
    SeenFrames seen;
    fake.handle(kInfrared, seen.handler());
    fake.kernel->failNext(fake.nodes[kInfrared], row.request, EIO, 1, row.after);
    EXPECT_EQ(fake.start(kInfrared),
              "1 " + std::string(row.want) + " " + fake.nodes[kInfrared] + " failed: Input/output error (EIO)");
    EXPECT_EQ(fake.kernel->guards(), 0) << row.name;
    EXPECT_EQ(fake.control(kStrobe), 0) << row.name;
    const auto other = V4l2Device::open(fake.kernel, fake.nodes[kInfrared], nullptr);
    EXPECT_TRUE(other->setFormat({1, {}, 640, 360}, nullptr)) << row.name << ": the next user gets EBUSY";
    EXPECT_EQ(fake.start(kInfrared), "done") << row.name;
    EXPECT_EQ(fake.stop(kInfrared), "done") << row.name;
    fake.release();
  }
}

TEST(LinuxFramesOwnMachineTest, WhatTheSystemRefusesAtTheStartLeavesNothingBusy) {
  struct Row {
    const char* name;
    void (*break_)(Fake&);
    const char* want;
  };
  const Row rows[] = {
      {"memory", [](Fake& fake) { fake.kernel->failNextMaps = 1; },
       "1 mmap on NODE failed: Cannot allocate memory (ENOMEM)"},
      {"no buffers at all",
       [](Fake& fake) {
         fake.kernel->with(fake.nodes[kInfrared], [](FakeNode& node) { return node.mostBuffers = 0; });
       },
       "1 VIDIOC_REQBUFS on NODE provided no buffers."},
      {"no process for the guard", [](Fake& fake) { fake.kernel->guardProblem = EAGAIN; },
       "1 guarding the projector on NODE failed: Resource temporarily unavailable (EAGAIN)"},
      {"no event for the thread", [](Fake& fake) { fake.kernel->makeEventProblem = EMFILE; },
       "1 eventfd on the capture device's thread failed: Too many open files (EMFILE)"},
      {"the metadata node's buffers",
       [](Fake& fake) { fake.kernel->failNext(fake.metadataNode, VIDIOC_REQBUFS, EINVAL); },
       "1 VIDIOC_REQBUFS on META failed: Invalid argument (EINVAL)"},
      {"a control of the metadata",
       [](Fake& fake) {
         fake.release();
         fake.binding.cameras[kInfrared].metadata.controls = {{"Gain", "Gain"}};
         fake.open();
         fake.prepare(kInfrared);
         fake.handle(kInfrared, [](PixelBuffer&, MediaTime) {});
         fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2));
       },
       "5 NODE has no control \"Gain\"."},
      {"a control that puts the projector out",
       [](Fake& fake) {
         fake.kernel->with(fake.nodes[kInfrared], [](FakeNode& node) { return node.controls[0].maximum = 1; });
       },
       "done"},
  };
  for (const Row& row : rows) {
    Fake fake;
    fake.prepare(kInfrared);
    fake.handle(kInfrared, [](PixelBuffer&, MediaTime) {});
    ASSERT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2)), "done");
    row.break_(fake);
    EXPECT_EQ(fake.start(kInfrared), fake.withPaths(row.want)) << row.name;
    fake.release();
    EXPECT_TRUE(fake.kernel->isIdle()) << row.name;
    EXPECT_EQ(fake.control(kStrobe), 0) << row.name;
  }
}

TEST(LinuxFramesOwnMachineTest, WhatFailsAtTheStopIsToldAndNothingStaysBusy) {
  for (const auto& [request, name] : {std::pair<unsigned long, const char*>{VIDIOC_STREAMOFF, "VIDIOC_STREAMOFF"},
                                      {VIDIOC_REQBUFS, "VIDIOC_REQBUFS"}}) {
    Fake fake;
    fake.begin(0);
    fake.kernel->failNext(fake.nodes[0], request, EIO);
    EXPECT_EQ(fake.stop(0), "1 " + std::string(name) + " on " + fake.nodes[0] + " failed: Input/output error (EIO)");
    EXPECT_EQ(fake.stop(0), "7 BackFacingCamera is not running; it cannot be stopped.");
    EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](auto& node) { return node.mapped; }), 0);
    fake.release();
  }
}

TEST_F(LinuxFramesTest, TheProjectorIsLitBeforeTheFirstFrameAndOutAfterTheLast) {
  fake.prepare(kInfrared);
  ASSERT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2, 1, 55)), "done");
  ASSERT_EQ(fake.start(kInfrared), "done");
  ASSERT_EQ(fake.stop(kInfrared), "done");
  const std::vector<std::string> want{"Strobe = 0", "guard began", "Power = 55",  "Strobe = 1",
                                      "STREAMON",   "Strobe = 0",  "guard ended", "STREAMOFF"};
  EXPECT_EQ(fake.kernel->with(fake.nodes[kInfrared], [](auto& node) { return node.history; }), want);
}

TEST_F(LinuxFramesTest, NothingIsGuardedWithoutAProjectorOrInTheDark) {
  fake.prepare(0);
  fake.prepare(kInfrared);
  ASSERT_EQ(fake.start(0), "done");
  ASSERT_EQ(fake.start(kInfrared), "done");
  EXPECT_EQ(fake.kernel->guards(), 0);
}

TEST_F(LinuxFramesTest, AProjectorThatCannotBePutOutIsToldAndLeftToTheGuard) {
  fake.prepare(kInfrared);
  ASSERT_EQ(fake.set(fake.infrared(), capture_key::InfraredLightSourceConfiguration, Fake::light(2)), "done");
  ASSERT_EQ(fake.start(kInfrared), "done");
  fake.kernel->failNext(fake.nodes[kInfrared], VIDIOC_S_EXT_CTRLS, EIO);
  EXPECT_EQ(fake.stop(kInfrared),
            "1 VIDIOC_S_EXT_CTRLS of \"Strobe\" on " + fake.nodes[kInfrared] + " failed: Input/output error (EIO)");
  EXPECT_EQ(fake.control(kStrobe), 0);
}

TEST(LinuxFramesOwnMachineTest, ACounterThatVanishesMakesTheCountersUnreadableDuringAndAfterTheStream) {
  Binding binding = fakeBinding();
  binding.cameras[kInfrared].errorCounters = {{"SIFErrorCount", {}, "Power"}};
  Fake fake(binding);
  fake.begin(kInfrared);
  EXPECT_EQ(fake.counter(kInfrared, "SIFErrorCount"), 0);
  fake.kernel->failNext(fake.nodes[kInfrared], VIDIOC_G_EXT_CTRLS, EIO, 100);
  const auto read = [&] {
    return outcome([&](auto* error) { return fake.infrared().valueForProperty(capture_key::ErrorCounters, error); });
  };
  const std::string want =
      "1 VIDIOC_G_EXT_CTRLS of \"Power\" on " + fake.nodes[kInfrared] + " failed: Input/output error (EIO)";
  EXPECT_EQ(read(), want);
  EXPECT_EQ(fake.stop(kInfrared), "done");
  EXPECT_EQ(read(), want);
}

}  // namespace
}  // namespace quazor
