// Handlers that call the service, and threads that concurrently stop, invalidate and take cameras.
#include "backends/linux/capture/linux_capture_for_tests.h"

#include <pthread.h>

#include <atomic>
#include <thread>

namespace quazor {
namespace {

using Fake = FakeCameras;
using LinuxFramesThreadsTest = FakeCamerasTest;
using namespace std::chrono_literals;

TEST_F(LinuxFramesThreadsTest, AHandlerMayReadStopAndLetGoOfEverything) {
  std::mutex mutex;
  std::condition_variable changed;
  bool done = false;
  std::string stopped;
  std::string again;
  fake.begin(0, [&](PixelBuffer&, MediaTime) {
    stopped = fake.stop(0);
    again = fake.stop(0);
    EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 0);
    fake.release();
    const std::lock_guard lock(mutex);
    done = true;
    changed.notify_all();
  });
  fake.kernel->produce(fake.nodes[0]);
  std::unique_lock lock(mutex);
  ASSERT_TRUE(changed.wait_for(lock, 1min, [&] { return done; }));
  EXPECT_EQ(stopped, "done");
  EXPECT_EQ(again, "7 BackFacingCamera is not running; it cannot be stopped.");
  for (int i = 0; i < 30'000 && !fake.kernel->isIdle(); ++i) std::this_thread::sleep_for(1ms);
  EXPECT_TRUE(fake.kernel->isIdle());
}

TEST_F(LinuxFramesThreadsTest, AHandlerMayLetGoOfAStreamThatRuns) {
  fake.begin(0, [&](PixelBuffer&, MediaTime) { fake.release(); });
  fake.kernel->produce(fake.nodes[0]);
  for (int i = 0; i < 30'000 && !fake.kernel->isIdle(); ++i) std::this_thread::sleep_for(1ms);
  EXPECT_TRUE(fake.kernel->isIdle());
}

// Blocks a handler until open() is called.
class Gate {
 public:
  void enter() {
    std::unique_lock lock(mutex_);
    entered_ = true;
    changed_.notify_all();
    changed_.wait(lock, [this] { return open_; });
  }
  void awaitEntry() {
    std::unique_lock lock(mutex_);
    changed_.wait(lock, [this] { return entered_; });
  }
  void open() {
    const std::lock_guard lock(mutex_);
    open_ = true;
    changed_.notify_all();
  }

 private:
  std::mutex mutex_;
  std::condition_variable changed_;
  bool entered_ = false;
  bool open_ = false;
};

TEST_F(LinuxFramesThreadsTest, ASystemWithoutMemoryForAThreadIsTold) {
  pthread_attr_t before;
  pthread_attr_t huge;
  ASSERT_EQ(::pthread_getattr_default_np(&before), 0);
  ASSERT_EQ(::pthread_attr_init(&huge), 0);
  ASSERT_EQ(::pthread_attr_setstacksize(&huge, std::size_t{1} << 48), 0);
  ASSERT_EQ(::pthread_setattr_default_np(&huge), 0);
  fake.prepare(0);
  EXPECT_EQ(fake.start(0),
            "1 pthread_create on the capture device's thread failed: Resource temporarily unavailable (EAGAIN)");
  ::pthread_setattr_default_np(&before);
  EXPECT_EQ(fake.start(0), "done");
}

TEST_F(LinuxFramesThreadsTest, AStopWaitsForTheHandlerThatRuns) {
  Gate gate;
  std::atomic<bool> left = false;
  fake.begin(0, [&](PixelBuffer&, MediaTime) {
    gate.enter();
    std::this_thread::sleep_for(3ms);
    left = true;
  });
  fake.kernel->produce(fake.nodes[0]);
  gate.awaitEntry();
  std::thread opener([&] {
    std::this_thread::sleep_for(3ms);
    gate.open();
  });
  EXPECT_EQ(fake.stop(0), "done");
  EXPECT_TRUE(left);
  opener.join();
}

TEST_F(LinuxFramesThreadsTest, InvalidatingWaitsForTheHandlerThatStops) {
  Gate gate;
  fake.kernel->beforeCall = [&gate](unsigned long request) {
    if (request == VIDIOC_STREAMOFF) gate.enter();
  };
  fake.begin(0, [&](PixelBuffer&, MediaTime) { fake.stop(0); });
  fake.kernel->produce(fake.nodes[0]);
  gate.awaitEntry();
  std::thread opener([&gate] {
    std::this_thread::sleep_for(5ms);
    gate.open();
  });
  EXPECT_TRUE(fake.device->invalidate(nullptr));
  EXPECT_EQ(fake.kernel->with(fake.nodes[0], [](auto& node) { return node.opened; }), 0);
  opener.join();
}

TEST_F(LinuxFramesThreadsTest, WhatIsInvalidatedWhileItIsStoppedIsFreeAfterTheStopAndTheNextUsersThen) {
  Gate gate;
  fake.kernel->beforeCall = [&gate](unsigned long request) {
    if (request == VIDIOC_STREAMOFF) gate.enter();
  };
  fake.begin(0);
  std::thread stopper([this] { EXPECT_EQ(fake.stop(0), "done"); });
  gate.awaitEntry();
  EXPECT_TRUE(fake.device->invalidate(nullptr));
  gate.open();
  stopper.join();
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
  fake.device = fake.capture->defaultPlugIn()->device(nullptr);
  fake.streams = *fake.device->streams(nullptr);
  fake.begin(0);
  ASSERT_EQ(fake.stop(0), "done");
  EXPECT_EQ(fake.set(fake.wide(), capture_key::FormatIndex, 1), "done") << "it is still under control";
}

TEST(LinuxFramesThreadsOwnMachineTest, WhileAHandlerStopsOneThreadMayInvalidateAndAnotherTakeTheCamera) {
  for (int i = 0; i < 30; ++i) {
    Fake fake;
    Gate gate;
    fake.begin(0, [&](PixelBuffer&, MediaTime) {
      gate.enter();
      fake.stop(0);
    });
    fake.kernel->produce(fake.nodes[0]);
    gate.awaitEntry();
    std::thread taker([capture = fake.capture] {
      const auto device = capture->createPlugIn()->device(nullptr);
      const CaptureStreams wide{device->streams(nullptr)->at(0)};
      while (!device->requestControlOfStreams(wide, nullptr)) std::this_thread::yield();
      EXPECT_TRUE(wide[0]->start(nullptr));
      EXPECT_TRUE(wide[0]->stop(nullptr));
    });
    gate.open();
    EXPECT_TRUE(fake.device->invalidate(nullptr));
    taker.join();
    fake.release();
    EXPECT_TRUE(fake.kernel->isIdle());
  }
}

TEST_F(LinuxFramesThreadsTest, WhileOneThreadStopsAHandlerMayInvalidate) {
  Gate gate;
  std::string stopped;
  fake.begin(0, [&](PixelBuffer&, MediaTime) {
    gate.enter();
    static_cast<void>(fake.device->invalidate(nullptr));
  });
  fake.kernel->produce(fake.nodes[0]);
  gate.awaitEntry();
  std::thread stopper([&] { stopped = fake.stop(0); });
  std::this_thread::sleep_for(5ms);  // usually it waits for the handler by then
  gate.open();
  stopper.join();
  EXPECT_TRUE(stopped == "done" || stopped == "7 The capture device has been invalidated; ask for a new one.")
      << stopped;
  fake.release();
  EXPECT_TRUE(fake.kernel->isIdle());
}

}  // namespace
}  // namespace quazor
