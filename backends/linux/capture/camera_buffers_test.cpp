#include "backends/linux/capture/camera_buffers.h"

#include "tests/support/fake_v4l2_api.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <memory>

namespace quazor {
namespace {

// The time stamp of a buffer for which the driver says this time.
std::chrono::nanoseconds stampOf(std::int64_t seconds, std::int64_t microseconds) {
  const auto kernel = std::make_shared<FakeV4l2Api>();
  const std::string path = kernel->add(0, fakeCamera("fake:0"));
  CameraBuffers buffers(V4l2Device::open(kernel, path, nullptr));
  EXPECT_TRUE(buffers.prepare(2, nullptr) && buffers.streamOn(nullptr));
  kernel->produce(path);
  kernel->afterCall = [&](unsigned long request, void* argument) {
    if (request == VIDIOC_DQBUF) static_cast<v4l2_buffer*>(argument)->timestamp = {seconds, microseconds};
  };
  DequeuedBuffer buffer;
  EXPECT_EQ(buffers.dequeue(buffer), 0);
  kernel->afterCall = nullptr;
  return buffer.timestamp;
}

TEST(CameraBuffersTest, ATimeStampIsThatOfTheDriver) {
  EXPECT_EQ(stampOf(12, 345'678), std::chrono::microseconds(12'345'678));
}

TEST(CameraBuffersTest, ATimeStampThatIsNoTimeStaysWithinTheClock) {
  constexpr std::int64_t kMost = std::numeric_limits<std::int64_t>::max();
  constexpr std::int64_t kLeast = std::numeric_limits<std::int64_t>::min();
  const std::chrono::nanoseconds latest = std::chrono::seconds(4'000'000'000) + std::chrono::microseconds(999'999);
  EXPECT_EQ(stampOf(kMost, kMost), latest);
  EXPECT_EQ(stampOf(kMost / 1'000'000, 0), std::chrono::seconds(4'000'000'000));
  EXPECT_EQ(stampOf(kLeast, kLeast), std::chrono::nanoseconds(0));
}

}  // namespace
}  // namespace quazor
