// On a Linux machine with a fake driver, the trace has exactly the frames that the driver filled and their handlers
// saw.
#include "backends/linux/capture/camera_frames.h"
#include "backends/linux/capture/linux_capture_for_tests.h"
#include "host/device/frame_rings.h"

#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <random>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// The time of the fake driver. Thread: any.
class DriverClock final : public Clock {
 public:
  explicit DriverClock(std::shared_ptr<FakeV4l2Api> kernel) : kernel_(std::move(kernel)) {}

  std::chrono::nanoseconds now() const override { return kernel_->now(); }
  Date date() const override { return {}; }
  void sleep(std::chrono::nanoseconds) override {}

 private:
  const std::shared_ptr<FakeV4l2Api> kernel_;
};

constexpr std::chrono::nanoseconds kOrigin = 999s;

// Two cameras whose driver fills buffers at random moments, with gaps, errors and stamps that go back.
// Thread: one at a time; handlers any.
class RandomCameras {
 public:
  explicit RandomCameras(std::uint64_t seed) : random_(seed) {
    rings_.begin(kOrigin);
    fake_.capture->traceFrames(rings_, std::make_shared<DriverClock>(fake_.kernel));
    for (std::size_t i = 0; i < expected_.size(); ++i) {
      fake_.kernel->with(fake_.nodes[i], [](FakeNode& node) { return node.delivers = false; });
      fake_.begin(i, [this, i](PixelBuffer& buffer, MediaTime time) { take(i, buffer, time); });
    }
  }

  void stream() {
    for (int i = 0; i < 60; ++i) {
      const std::size_t camera = random_() % expected_.size();
      const std::string& node = fake_.nodes[camera];
      switch (random_() % 8) {
        case 0: fake_.kernel->skip(node, static_cast<std::uint32_t>(random_() % 3)); break;
        case 1: fake_.kernel->produce(node, V4L2_BUF_FLAG_ERROR); break;
        case 2: handBackOne(camera); break;
        default: produce(camera); break;
      }
      ASSERT_TRUE(fake_.kernel->settle());
      fake_.kernel->passTime(std::chrono::nanoseconds(random_() % 40'000'000));
    }
    for (std::size_t i = 0; i < expected_.size(); ++i) EXPECT_EQ(fake_.stop(i), "done");
    EXPECT_EQ(FramePool::shared().held(), kept());
  }

  void compare() {
    FrameDrain drain(rings_);
    std::array<std::vector<TracedFrame>, 4> traced;
    drain.drain(true, [&traced](std::size_t stream, const TracedFrame& frame, std::uint64_t) {
      traced.at(stream).push_back(frame);
    });
    ASSERT_EQ(drain.size(), 4U);
    for (std::size_t i = 0; i < expected_.size(); ++i) {
      EXPECT_EQ(drain.nameOf(i), fake_.binding.cameras[i].port);
      EXPECT_FALSE(expected_[i].empty());
      EXPECT_EQ(traced[i].size(), expected_[i].size());
      EXPECT_TRUE(traced[i] == expected_[i]) << i;
    }
    EXPECT_TRUE(traced[3].empty());
    for (std::size_t i = 0; i < expected_.size(); ++i) {
      while (handBackOne(i)) {  // after the trace's end: without effect
      }
    }
  }

 private:
  struct Kept {
    PixelBuffer* buffer = nullptr;
    std::size_t place = 0;
  };

  void produce(std::size_t camera) {
    const std::chrono::nanoseconds ahead = std::chrono::milliseconds(static_cast<int>(random_() % 200) - 100);
    const std::chrono::nanoseconds now = fake_.kernel->now();
    const std::uint32_t number = fake_.kernel->with(fake_.nodes[camera], [&](FakeNode& node) {
      node.stampedAhead = ahead;
      return node.sequence;
    });
    const auto stamp = std::chrono::floor<std::chrono::microseconds>(now + ahead);  // V4L2 stamps in microseconds
    {
      const std::lock_guard lock(mutex_);
      expected_[camera].push_back({number, std::chrono::nanoseconds(stamp - kOrigin).count(), 0, std::nullopt});
      keepsNext_ = random_() % 3 == 0;
    }
    fake_.kernel->produce(fake_.nodes[camera]);
  }

  void take(std::size_t camera, PixelBuffer& buffer, MediaTime time) {
    const std::int64_t now = (fake_.kernel->now() - kOrigin).count();
    const std::lock_guard lock(mutex_);
    TracedFrame& frame = expected_[camera].back();
    EXPECT_EQ(time.value, frame.captured + kOrigin.count());
    frame.delivered = now;
    if (keepsNext_) {
      buffer.retain();
      kept_[camera].push_back({&buffer, expected_[camera].size() - 1});
    } else {
      frame.returned = now;  // the phone hands it back when this function returns
    }
  }

  bool handBackOne(std::size_t camera) {
    const std::lock_guard lock(mutex_);
    if (kept_[camera].empty()) return false;
    const Kept one = kept_[camera].back();
    kept_[camera].pop_back();
    expected_[camera][one.place].returned = (fake_.kernel->now() - kOrigin).count();
    one.buffer->release();
    return true;
  }

  std::size_t kept() const { return kept_[0].size() + kept_[1].size(); }

  std::mt19937_64 random_;
  FrameRings rings_{0};
  std::mutex mutex_;  // guards the three members below
  std::array<std::vector<TracedFrame>, 2> expected_;
  std::array<std::vector<Kept>, 2> kept_;
  bool keepsNext_ = false;
  FakeCameras fake_;  // whose handlers use the members above
};

TEST(TracedLinuxFramesTest, AreThoseOfTheDriver) {
  for (std::uint64_t seed = 0; seed < 100; ++seed) {
    RandomCameras cameras(seed);
    cameras.stream();
    cameras.compare();
    ASSERT_FALSE(testing::Test::HasFailure()) << "seed " << seed;
  }
}

}  // namespace
}  // namespace quazor
