#include "backends/linux/capture/linux_capture_for_tests.h"

namespace quazor {
namespace {

using Fake = FakeCameras;
using LinuxGroupTest = FakeCamerasTest;
using namespace std::chrono_literals;

Array arrayOf(const CaptureStreams& streams) { return Array(streams.begin(), streams.end()); }

Dictionary configuration(const Fake& fake) {
  return Dictionary{{text(capture_key::ActiveSynchronizedStreamsGroups), Array{fake.group}}};
}

// Takes control of the three back cameras and creates a session for them.
void synchronize(const Fake& fake) {
  for (std::size_t i = 0; i < 3; ++i) fake.prepare(i);
  ASSERT_EQ(fake.set(*fake.group, capture_key::ActiveStreams, arrayOf(fake.backStreams())), "done");
  ASSERT_EQ(fake.set(*fake.device, capture_key::MultiCamConfiguration, configuration(fake)), "done");
}

std::pair<std::int64_t, std::int64_t> status(const Fake& fake, std::string_view port) {
  const auto all = fake.device->valueForProperty(capture_key::MulticamSessionStatus, nullptr);
  const Value* const one = entryOf(pointerTo(all), port);
  return {toSigned(entryOf(one, capture_key::Offset)), toSigned(entryOf(one, capture_key::FrameCount))};
}

using Pair = std::pair<std::int64_t, std::int64_t>;

TEST_F(LinuxGroupTest, ALateStartIsAnOffsetInFramesFromTheMastersFirst) {
  synchronize(fake);
  ASSERT_EQ(fake.start(0), "done");
  ASSERT_EQ(fake.start(1), "done");
  fake.kernel->passTime(100ms);
  ASSERT_EQ(fake.start(2), "done");
  fake.kernel->passTime(990ms);
  EXPECT_EQ(status(fake, port_type::BackFacingCamera), Pair(0, 33));
  EXPECT_EQ(status(fake, port_type::BackFacingTelephotoCamera), Pair(0, 33));
  EXPECT_EQ(status(fake, port_type::BackFacingSuperWideCamera), Pair(3, 30));
}

TEST_F(LinuxGroupTest, ACameraThatCameBeforeTheMasterHasANegativeOffset) {
  synchronize(fake);
  ASSERT_EQ(fake.start(1), "done");
  fake.kernel->passTime(70ms);
  ASSERT_EQ(fake.start(0), "done");
  fake.kernel->passTime(990ms);
  EXPECT_EQ(status(fake, port_type::BackFacingTelephotoCamera).first, -2);
}

TEST_F(LinuxGroupTest, ACameraWithoutFramesHasRecordedNone) {
  fake.kernel->with(fake.nodes[1], [](FakeNode& node) { return node.delivers = false; });
  synchronize(fake);
  ASSERT_EQ(fake.start(0), "done");
  ASSERT_EQ(fake.start(1), "done");
  fake.kernel->passTime(990ms);
  EXPECT_EQ(status(fake, port_type::BackFacingTelephotoCamera), Pair(0, -1));
  EXPECT_EQ(status(fake, port_type::BackFacingSuperWideCamera), Pair(0, -1)) << "it was not even started";
}

}  // namespace
}  // namespace quazor
