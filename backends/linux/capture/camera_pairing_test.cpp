#include "backends/linux/capture/camera_pairing.h"

#include <gtest/gtest.h>

#include <utility>

namespace quazor {
namespace {

using namespace std::chrono_literals;

CapturedFrame frameAt(std::chrono::nanoseconds timestamp) {
  CapturedFrame frame;
  frame.timestamp = timestamp;
  return frame;
}

// The time stamp of the next frame and the first byte of its metadata: 0 without metadata, -1 and -1 if no frame is
// ready.
std::pair<std::int64_t, int> next(FramePairing& pairing, std::chrono::nanoseconds now = 0ms) {
  const std::optional<CapturedFrame> frame = pairing.next(now);
  if (!frame) return {-1, -1};
  return {frame->timestamp / 1ms, frame->paired ? frame->paired->front() : 0};
}

using StampedFrame = std::pair<std::int64_t, int>;

TEST(FramePairingTest, AFrameGetsTheMetadataOfItsTimeStampWhicheverComesFirst) {
  FramePairing pairing;
  pairing.addFrame(frameAt(100ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(-1, -1));
  pairing.addMetadata({100ms, 0}, {1});
  EXPECT_EQ(next(pairing), StampedFrame(100, 1));
  pairing.addMetadata({133ms, 0}, {2});
  EXPECT_EQ(next(pairing), StampedFrame(-1, -1));
  pairing.addFrame(frameAt(133ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(133, 2));
}

TEST(FramePairingTest, AMicrosecondIsNoDifferenceAndMoreIsOne) {
  FramePairing pairing;
  pairing.addMetadata({99'999us, 0}, {1});
  pairing.addFrame(frameAt(100ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(100, 1));
  pairing.addFrame(frameAt(200ms), 0ms);
  pairing.addMetadata({200'003us, 0}, {2});
  EXPECT_EQ(next(pairing), StampedFrame(200, 0)) << "what is stamped 3 microseconds later belongs to another frame";
}

TEST(FramePairingTest, MetadataOfEarlierFramesIsDropped) {
  FramePairing pairing;
  pairing.addMetadata({33ms, 0}, {1});
  pairing.addMetadata({66ms, 0}, {2});
  pairing.addMetadata({100ms, 0}, {3});
  pairing.addFrame(frameAt(100ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(100, 3));
}

TEST(FramePairingTest, AFrameWhoseMetadataWasLostIsHandedOnWhenLaterOneComes) {
  FramePairing pairing;
  pairing.addFrame(frameAt(100ms), 0ms);
  pairing.addFrame(frameAt(133ms), 0ms);
  pairing.addMetadata({133ms, 0}, {2});
  EXPECT_EQ(next(pairing), StampedFrame(100, 0));
  EXPECT_EQ(next(pairing), StampedFrame(133, 2));
}

TEST(FramePairingTest, AFrameWaitsForABoundedTime) {
  FramePairing pairing;
  EXPECT_EQ(pairing.deadline(), std::nullopt);
  pairing.addFrame(frameAt(100ms), 1000ms);
  EXPECT_EQ(pairing.deadline(), 1100ms);
  EXPECT_EQ(next(pairing, 1099ms), StampedFrame(-1, -1));
  EXPECT_EQ(next(pairing, 1100ms), StampedFrame(100, 0));
  EXPECT_EQ(pairing.deadline(), std::nullopt);
}

TEST(FramePairingTest, NothingIsWaitedForWhenNoMetadataWillCome) {
  FramePairing pairing;
  pairing.addFrame(frameAt(100ms), 0ms);
  pairing.endMetadata();
  EXPECT_EQ(next(pairing), StampedFrame(100, 0));
}

TEST(FramePairingTest, MetadataOfACameraThatDeliversNothingIsNotKeptForEver) {
  FramePairing pairing;
  for (int i = 0; i < 65; ++i) pairing.addMetadata({i * 1ms, 0}, {1});
  pairing.addFrame(frameAt(0ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(0, 0)) << "the oldest was dropped";
  pairing.addFrame(frameAt(1ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(1, 1));
}

TEST(FramePairingTest, FramesOfOneNumberingArePairedByIt) {
  FramePairing pairing(MetadataPairing::kSequence);
  const auto frame = [](std::uint32_t sequence) {
    CapturedFrame made = frameAt(sequence * 1ms);
    made.sequence = sequence;
    return made;
  };
  pairing.addFrame(frame(4294967295), 0ms);
  pairing.addFrame(frame(0), 0ms);
  pairing.addFrame(frame(1), 0ms);
  pairing.addMetadata({7ms, 4294967294}, {9});
  pairing.addMetadata({7ms, 4294967295}, {1});
  pairing.addMetadata({7ms, 1}, {3});
  EXPECT_EQ(next(pairing), StampedFrame(4294967295, 1)) << "the number before it is dropped";
  EXPECT_EQ(next(pairing), StampedFrame(0, 0)) << "its metadata was lost, and the numbers wrap around";
  EXPECT_EQ(next(pairing), StampedFrame(1, 3));
}

TEST(FramePairingTest, TheCauseOfAMissingPairIsNamed) {
  CapturedFrame frame = frameAt(100ms);
  frame.sequence = 19;
  FramePairing byTime;
  EXPECT_EQ(byTime.whyUnpaired(frame), "the metadata node has delivered no buffer");
  byTime.addMetadata({103ms, 19}, {1});
  EXPECT_EQ(
      byTime.whyUnpaired(frame),
      "no metadata buffer has its time stamp; that of the last one differs by 3000 microseconds, with the sequence "
      "number 19 to the frame's 19. If the driver stamps both differently, set \"pairing\" of the binding's "
      "\"metadata\" to \"sequence\"");
  FramePairing bySequence(MetadataPairing::kSequence);
  bySequence.addMetadata({100ms, 20}, {1});
  EXPECT_EQ(
      bySequence.whyUnpaired(frame),
      "no metadata buffer has its sequence number 19; the last one has 20. If the driver numbers both separately, "
      "set \"pairing\" of the binding's \"metadata\" to \"timestamp\"");
}

}  // namespace
}  // namespace quazor
