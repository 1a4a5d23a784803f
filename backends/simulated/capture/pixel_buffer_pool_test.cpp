#include "backends/simulated/capture/pixel_buffer_pool.h"

#include "platform/capture_keys.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using Held = PixelBufferPool::Held;

TEST(PixelBufferPoolTest, ABufferIsOutUntilItsLastReferenceIsGivenBack) {
  PixelBufferPool pool;
  PixelBuffer& buffer = pool.take(2, 7, std::nullopt);
  buffer.retain();
  buffer.release();
  EXPECT_THAT(pool.held(), ElementsAre(Held{2, 7}));
  buffer.release();
  EXPECT_THAT(pool.held(), IsEmpty());
  EXPECT_EQ(pool.strayReleases(), 0U);
}

TEST(PixelBufferPoolTest, HeldBuffersAreToldByCameraAndFrame) {
  PixelBufferPool pool;
  pool.take(1, 9, std::nullopt);
  pool.take(0, 5, std::nullopt);
  pool.take(1, 2, std::nullopt);
  EXPECT_THAT(pool.held(), ElementsAre(Held{0, 5}, Held{1, 2}, Held{1, 9}));
}

TEST(PixelBufferPoolTest, CountsWhatItHasHandedOut) {
  PixelBufferPool pool;
  EXPECT_EQ(pool.taken(), 0U);
  pool.take(0, 0, std::nullopt).release();
  pool.take(1, 0, std::nullopt);
  EXPECT_EQ(pool.taken(), 2U);
}

TEST(PixelBufferPoolTest, BuffersAreUsedAgain) {
  PixelBufferPool pool;
  PixelBuffer& first = pool.take(0, 0, Value("old"));
  first.release();
  PixelBuffer& second = pool.take(0, 1, std::nullopt);
  EXPECT_EQ(&first, &second);
  EXPECT_EQ(second.attachment(capture_key::MetadataDictionary), std::nullopt);
  EXPECT_NE(&second, &pool.take(0, 2, std::nullopt));
}

TEST(PixelBufferPoolTest, OnlyTheMetadataIsAttached) {
  PixelBufferPool pool;
  const PixelBuffer& buffer = pool.take(0, 0, Value(17));
  EXPECT_EQ(buffer.attachment(capture_key::MetadataDictionary), Value(17));
  EXPECT_EQ(buffer.attachment(capture_key::InfraredLightSource), std::nullopt);
}

TEST(PixelBufferPoolTest, MetadataIsLetGoWithTheBuffer) {
  class Token final : public Object {
   public:
    std::string description() const override { return "token"; }
  };
  PixelBufferPool pool;
  auto token = std::make_shared<Token>();
  const std::weak_ptr<Token> weak = token;
  PixelBuffer& buffer = pool.take(0, 0, Value(std::move(token)));
  ASSERT_FALSE(weak.expired());
  buffer.release();
  EXPECT_TRUE(weak.expired());
}

TEST(PixelBufferPoolTest, AReleaseTooManyIsCountedAndHasNoOtherEffect) {
  PixelBufferPool pool;
  PixelBuffer& buffer = pool.take(0, 0, std::nullopt);
  buffer.release();
  buffer.release();
  EXPECT_EQ(pool.strayReleases(), 1U);
  EXPECT_NE(&pool.take(0, 1, std::nullopt), &pool.take(0, 2, std::nullopt));
}

TEST(PixelBufferPoolTest, ManyThreadsMayUseIt) {
  PixelBufferPool pool;
  std::vector<std::thread> threads;
  for (std::size_t camera = 0; camera < 4; ++camera) {
    threads.emplace_back([&pool, camera] {
      for (std::uint64_t frame = 0; frame < 2000; ++frame) {
        PixelBuffer& buffer = pool.take(camera, frame, Value(1));
        buffer.retain();
        buffer.release();
        buffer.release();
      }
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_THAT(pool.held(), IsEmpty());
  EXPECT_EQ(pool.strayReleases(), 0U);
}

}  // namespace
}  // namespace quazor
