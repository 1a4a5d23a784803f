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
  pairing.addMetadata(100ms, {1});
  EXPECT_EQ(next(pairing), StampedFrame(100, 1));
  pairing.addMetadata(133ms, {2});
  EXPECT_EQ(next(pairing), StampedFrame(-1, -1));
  pairing.addFrame(frameAt(133ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(133, 2));
}

TEST(FramePairingTest, AMicrosecondIsNoDifferenceAndMoreIsOne) {
  FramePairing pairing;
  pairing.addMetadata(99'999us, {1});
  pairing.addFrame(frameAt(100ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(100, 1));
  pairing.addFrame(frameAt(200ms), 0ms);
  pairing.addMetadata(200'003us, {2});
  EXPECT_EQ(next(pairing), StampedFrame(200, 0)) << "what is stamped 3 microseconds later belongs to another frame";
}

TEST(FramePairingTest, MetadataOfEarlierFramesIsDropped) {
  FramePairing pairing;
  pairing.addMetadata(33ms, {1});
  pairing.addMetadata(66ms, {2});
  pairing.addMetadata(100ms, {3});
  pairing.addFrame(frameAt(100ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(100, 3));
}

TEST(FramePairingTest, AFrameWhoseMetadataWasLostIsHandedOnWhenLaterOneComes) {
  FramePairing pairing;
  pairing.addFrame(frameAt(100ms), 0ms);
  pairing.addFrame(frameAt(133ms), 0ms);
  pairing.addMetadata(133ms, {2});
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
  for (int i = 0; i < 65; ++i) pairing.addMetadata(i * 1ms, {1});
  pairing.addFrame(frameAt(0ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(0, 0)) << "the oldest was dropped";
  pairing.addFrame(frameAt(1ms), 0ms);
  EXPECT_EQ(next(pairing), StampedFrame(1, 1));
}

}  // namespace
}  // namespace quazor
