#include "backends/simulated/capture/frame_delivery.h"
#include "backends/simulated/capture/streaming_for_tests.h"
#include "backends/simulated/phone_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <mutex>
#include <optional>
#include <thread>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// A rendezvous of threads with a timeout.
class Gate {
 public:
  void open() {
    const std::lock_guard lock(mutex_);
    open_ = true;
    changed_.notify_all();
  }
  // Waits for `count` callers; returns false after a few seconds.
  bool meet(int count) {
    std::unique_lock lock(mutex_);
    ++came_;
    changed_.notify_all();
    return changed_.wait_for(lock, 1min, [&] { return came_ >= count; });
  }
  bool pass() {
    std::unique_lock lock(mutex_);
    return changed_.wait_for(lock, 1min, [&] { return open_; });
  }

 private:
  std::mutex mutex_;
  std::condition_variable changed_;
  bool open_ = false;
  int came_ = 0;
};

class FrameDeliveryOnThreadsTest : public ::testing::Test {
 protected:
  template <class Change>
  void make(Change&& change) {
    Scenario scenario = smallScenario();
    scenario.cameras[2].actualFrameRate = 1000;
    change(scenario.cameras[2]);
    phone_.emplace(scenario, PhoneTime::kReal, 0);
    stream_.emplace(*phone_);
  }

  // Waits for all handlers to return, because buffers are released after them.
  void settle() {
    const auto deadline = std::chrono::steady_clock::now() + 1min;
    while (!phone_->buffersHeld().empty()) {
      ASSERT_LT(std::chrono::steady_clock::now(), deadline) << "a buffer was never given back";
      std::this_thread::yield();
    }
  }

  std::optional<SimulatedPhone> phone_;
  std::optional<StreamUser> stream_;
};

TEST_F(FrameDeliveryOnThreadsTest, FramesComeUntilTheStop) {
  make([](Camera&) {});
  Gate three;
  stream_->onFrame = [&, count = 0]() mutable {
    if (++count == 3) three.open();
  };
  ASSERT_TRUE(stream_->start());
  ASSERT_TRUE(three.pass());
  ASSERT_TRUE(stream_->stop());
  const std::size_t count = stream_->frames().size();
  EXPECT_GE(count, 3U);
  std::this_thread::sleep_for(5ms);
  EXPECT_EQ(stream_->frames().size(), count);
  EXPECT_EQ(stream_->frames()[2].time.value, 3'000'000);
  EXPECT_THAT(phone_->buffersHeld(), ::testing::IsEmpty());
}

TEST_F(FrameDeliveryOnThreadsTest, AStopWaitsForTheHandlerThatRuns) {
  make([](Camera&) {});
  Gate entered;
  std::atomic<bool> left = false;
  stream_->onFrame = [&] {
    entered.open();
    std::this_thread::sleep_for(5ms);
    left = true;
  };
  ASSERT_TRUE(stream_->start());
  ASSERT_TRUE(entered.pass());
  ASSERT_TRUE(stream_->stop());
  EXPECT_TRUE(left);
}

TEST_F(FrameDeliveryOnThreadsTest, AStopThatDoesNotWaitReturnsWhileAHandlerRuns) {
  make([](Camera& camera) { camera.delivery.stopWaitsForHandlers = false; });
  Gate entered;
  Gate stopped;
  Gate left;
  stream_->onFrame = [&] {
    entered.open();
    if (stopped.pass()) left.open();
  };
  ASSERT_TRUE(stream_->start());
  ASSERT_TRUE(entered.pass());
  ASSERT_TRUE(stream_->stop());
  stopped.open();
  EXPECT_TRUE(left.pass());
  settle();
}

TEST_F(FrameDeliveryOnThreadsTest, AHandlerMayStopItsStream) {
  make([](Camera&) {});
  Gate stopped;
  stream_->onFrame = [&] {
    EXPECT_TRUE(stream_->stop());
    stopped.open();
  };
  ASSERT_TRUE(stream_->start());
  EXPECT_TRUE(stopped.pass());
  settle();
}

TEST_F(FrameDeliveryOnThreadsTest, AHandlerMayAskItsStreamWhileAnotherThreadStopsIt) {
  make([](Camera&) {});
  Gate entered;
  Gate asked;
  stream_->onFrame = [&] {
    entered.open();
    std::this_thread::sleep_for(2ms);
    if (stream_->stream().valueForProperty(capture_key::PortType, nullptr)) asked.open();
  };
  ASSERT_TRUE(stream_->start());
  ASSERT_TRUE(entered.pass());
  ASSERT_TRUE(stream_->stop());
  EXPECT_TRUE(asked.pass());
}

TEST_F(FrameDeliveryOnThreadsTest, SeveralQueuesDeliverAtOnce) {
  make([](Camera& camera) { camera.delivery.queues = 2; });
  Gate both;
  Gate done;
  std::atomic<bool> alone = false;
  stream_->onFrame = [&] {
    if (!both.meet(2)) alone = true;
    done.open();
  };
  ASSERT_TRUE(stream_->start());
  EXPECT_TRUE(done.pass());
  ASSERT_TRUE(stream_->stop());
  EXPECT_FALSE(alone);
}

}  // namespace
}  // namespace quazor
