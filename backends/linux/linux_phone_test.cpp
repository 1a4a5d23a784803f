#include "backends/linux/linux_phone.h"

#include <gtest/gtest.h>

namespace quazor {
namespace {

TEST(LinuxPlatform, HasEveryServiceOnAMachineWithoutDevices) {
  const std::shared_ptr<LinuxCapture> capture = makeLinuxCapture(Binding());
  const Platform platform = linuxPlatform(Binding(), capture);
  EXPECT_EQ(platform.capture, capture);
  EXPECT_NE(platform.clock, nullptr);
  EXPECT_NE(platform.concurrency, nullptr);
  EXPECT_NE(platform.hid, nullptr);
  ASSERT_NE(platform.reports, nullptr);
  EXPECT_NE(platform.reports->reportWithOnlySimpleChannels(nullptr), nullptr);
  ASSERT_NE(platform.framebuffer, nullptr);
  ASSERT_NE(platform.runLoops, nullptr);
  EXPECT_NE(platform.runLoops->currentRunLoop(), nullptr);
}

}  // namespace
}  // namespace quazor
