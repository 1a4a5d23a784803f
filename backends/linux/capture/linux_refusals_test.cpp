// What drivers refuse, and what the service says about it.
#include "backends/linux/capture/linux_capture_for_tests.h"

#include <cerrno>

namespace quazor {
namespace {

using Fake = FakeCameras;
using LinuxRefusalsTest = FakeCamerasTest;

TEST(LinuxRefusalsOwnMachineTest, AUsbBusWithoutBandwidthIsNoFullDisk) {
  constexpr std::string_view kHint =
      ": the USB bus has too little bandwidth left for this stream. Use a smaller size, a lower rate, a compressed "
      "format or another bus.";
  Fake fake;
  for (const unsigned long request : {VIDIOC_STREAMON, VIDIOC_REQBUFS}) {
    for (const bool isUsb : {true, false}) {
      fake.kernel->with(fake.nodes[0],
                        [isUsb](FakeNode& node) { return node.bus = isUsb ? "usb-0000:00:14.0-1" : "fake:0"; });
      Binding binding = fake.binding;
      binding.cameras[0].node.busInfo = isUsb ? "usb-0000:00:14.0-1" : "fake:0";
      fake.release();
      fake.binding = binding;
      fake.open();
      fake.prepare(0);
      fake.kernel->failNext(fake.nodes[0], request, ENOSPC);
      const std::string call = request == VIDIOC_STREAMON ? "VIDIOC_STREAMON" : "VIDIOC_REQBUFS";
      EXPECT_EQ(fake.start(0), "1 " + call + " on " + fake.nodes[0] + " failed: No space left on device (ENOSPC)" +
                                   (isUsb ? std::string(kHint) : ""));
    }
  }
}

TEST_F(LinuxRefusalsTest, AFailingPollEndsTheStreamsAndDoesNotSpin) {
  fake.begin(0);
  fake.kernel->passTime(std::chrono::milliseconds(100));
  fake.kernel->pollProblem = ENOMEM;
  fake.kernel->produce(fake.nodes[0]);  // wakes the thread
  for (int i = 0; i < 1000 && fake.counter(0, "StreamErrorCount") == 0; ++i) {
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
  }
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 1);
  EXPECT_EQ(fake.kernel->failedPolls, 1);
  EXPECT_EQ(fake.stop(0), "done");
  fake.kernel->pollProblem = 0;
  EXPECT_EQ(fake.start(0), "done") << "the thread goes on";
  fake.kernel->passTime(std::chrono::milliseconds(100));
  EXPECT_EQ(fake.counter(0, "StreamErrorCount"), 0);
  EXPECT_EQ(fake.stop(0), "done");
}

TEST(LinuxRefusalsOwnMachineTest, AnotherFormatOfTheMetadataIsRefused) {
  Binding binding = fakeBinding();
  binding.cameras[3].metadata.format = "UVCH";
  Fake fake(binding);
  const std::string refused =
      "5 FrontFacingInfraredCamera: the binding's fields are those of the metadata format UVCH, but "
      "META has the format ";
  EXPECT_EQ(fake.take(3), fake.withPaths(refused + "FAKE."));
  fake.kernel->failNext(fake.metadataNode, VIDIOC_G_FMT, ENOTTY);
  EXPECT_EQ(fake.take(3), fake.withPaths(refused + "that it does not report."));
  fake.kernel->with(fake.metadataNode,
                    [](FakeNode& node) { return node.metadataFormat.dataformat = fakeCode('U', 'V', 'C', 'H'); });
  EXPECT_EQ(fake.take(3), "done");
}

TEST(LinuxRefusalsOwnMachineTest, MetadataFieldsBeyondTheBuffersAreRefused) {
  Binding binding = fakeBinding();
  binding.cameras[3].metadata.fields = {{"Within", 62, 2, 0, {}}, {"Beyond", 61, 4, 0, {}}};
  Fake fake(binding);
  EXPECT_EQ(fake.take(3),
            fake.withPaths("5 FrontFacingInfraredCamera: the metadata field \"Beyond\" ends at byte 65, but "
                           "the buffers of META (format FAKE) have 64."));
  EXPECT_EQ(fake.kernel->with(fake.nodes[3], [](FakeNode& node) { return node.opened; }), 0);
}

}  // namespace
}  // namespace quazor
