#include "host/plugin/null_platform.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

using namespace std::chrono_literals;

TEST(NullPlatform, HasEveryServiceAndNothingBehindIt) {
  const Platform platform = nullPlatform();
  EXPECT_EQ(platform.capture->createPlugIn(), nullptr);
  EXPECT_EQ(platform.capture->defaultPlugIn(), nullptr);
  EXPECT_EQ(platform.reports->reportWithOnlySimpleChannels(nullptr), nullptr);
  EXPECT_EQ(platform.hid->createManager(), nullptr);
  EXPECT_EQ(platform.framebuffer->mainDisplay(), nullptr);
  EXPECT_EQ(platform.runLoops->currentRunLoop(), nullptr);
}

TEST(NullPlatform, NeverBlocks) {
  const Platform platform = nullPlatform();
  platform.clock->sleep(std::chrono::hours(1));
  EXPECT_EQ(platform.clock->now(), 0ns);
  EXPECT_EQ(platform.clock->date(), Date());
  const std::shared_ptr<Semaphore> semaphore = platform.concurrency->makeSemaphore(0);
  semaphore->wait();
  semaphore->signal();
}

TEST(NullPlatform, DestroysTasksWithoutRunningThem) {
  const auto queue = nullPlatform().concurrency->makeSerialQueue("label", QualityOfService::kDefault);
  const auto watched = std::make_shared<int>(0);
  queue->async([watched] { ++*watched; });
  queue->asyncAfter(1s, [watched] { ++*watched; });
  EXPECT_EQ(watched.use_count(), 1);
  EXPECT_EQ(*watched, 0);
}

}  // namespace
}  // namespace quazor
