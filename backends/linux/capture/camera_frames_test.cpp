#include "backends/linux/capture/camera_frames.h"

#include "platform/capture_keys.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(FramePoolTest, ABufferIsOutUntilItsLastReferenceIsGivenBack) {
  FramePool pool;
  PixelBuffer& buffer = pool.take(Value(1));
  buffer.retain();
  buffer.release();
  EXPECT_EQ(pool.held(), 1U);
  buffer.release();
  EXPECT_EQ(pool.held(), 0U);
}

TEST(FramePoolTest, ABufferThatCameBackIsHandedOutAgainWithOtherMetadata) {
  FramePool pool;
  PixelBuffer& first = pool.take(Value(1));
  first.release();
  PixelBuffer& second = pool.take(Value(2));
  EXPECT_EQ(&first, &second);
  EXPECT_EQ(second.attachment(capture_key::MetadataDictionary), Value(2));
}

TEST(FramePoolTest, ABufferThatIsNeverGivenBackHindersNoOther) {
  FramePool pool;
  PixelBuffer& kept = pool.take(Value(1));
  PixelBuffer& other = pool.take(Value(2));
  EXPECT_NE(&kept, &other);
  EXPECT_EQ(kept.attachment(capture_key::MetadataDictionary), Value(1));
  EXPECT_EQ(pool.held(), 2U);
}

TEST(FramePoolTest, OnlyMetadataIsAttached) {
  FramePool pool;
  EXPECT_EQ(pool.take(Value(1)).attachment("Depth"), std::nullopt);
}

TEST(FramePoolTest, ThereIsOneForTheProcess) { EXPECT_EQ(&FramePool::shared(), &FramePool::shared()); }

}  // namespace
}  // namespace quazor
