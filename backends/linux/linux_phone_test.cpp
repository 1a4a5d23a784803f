#include "backends/linux/linux_phone.h"

#include "backends/linux/capture/linux_capture_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;

TEST(LinuxPhone, HasEveryServiceOnAMachineWithoutDevices) {
  const std::shared_ptr<LinuxCapture> capture = makeLinuxCapture(Binding());
  const LinuxPhone phone(Binding(), capture);
  const Platform platform = phone.platform();
  EXPECT_EQ(platform.capture, capture);
  EXPECT_NE(platform.clock, nullptr);
  EXPECT_NE(platform.concurrency, nullptr);
  EXPECT_NE(platform.hid, nullptr);
  ASSERT_NE(platform.reports, nullptr);
  EXPECT_NE(platform.reports->reportWithOnlySimpleChannels(nullptr), nullptr);
  ASSERT_NE(platform.framebuffer, nullptr);
  ASSERT_NE(platform.runLoops, nullptr);
  EXPECT_NE(platform.runLoops->currentRunLoop(), nullptr);
  EXPECT_THAT(phone.faultStatus(), testing::IsEmpty());
}

// Fake cameras of a machine whose binding has faults, and a user of them.
class FaultyLinuxPhoneTest : public ::testing::Test {
 protected:
  Fault& fault(std::string_view operation, FaultAction action) {
    Fault& added = cameras_.binding.faults.emplace_back();
    added.operation = operation;
    added.action = action;
    return added;
  }
  void open() {
    cameras_.binding.groups[0].name = "back";
    cameras_.release();
    cameras_.open();
    phone_ = std::make_unique<LinuxPhone>(cameras_.binding, cameras_.capture);
    cameras_.device = phone_->platform().capture->defaultPlugIn()->device(nullptr);
    cameras_.streams = *cameras_.device->streams(nullptr);
    cameras_.group = cameras_.device->synchronizedStreamsGroups(nullptr)->front();
  }
  std::vector<std::uint64_t> fired() const {
    std::vector<std::uint64_t> counts;
    for (const FaultStatus& status : phone_->faultStatus()) counts.push_back(status.fired);
    return counts;
  }

  FakeCameras cameras_;
  std::unique_ptr<LinuxPhone> phone_;
};

TEST_F(FaultyLinuxPhoneTest, AFaultFailsTheCameraOfItsPortWithAnErrorOfThisService) {
  fault("CaptureStream.start", FaultAction::kFail).object = port_type::BackFacingTelephotoCamera;
  open();
  cameras_.prepare(0);
  cameras_.prepare(1);
  EXPECT_EQ(cameras_.start(0), "done");
  EXPECT_EQ(cameras_.start(1), "12 CaptureStream.start of BackFacingTelephotoCamera failed.");
  EXPECT_EQ(cameras_.stop(0), "done");
  EXPECT_THAT(fired(), ElementsAre(1U));
}

TEST_F(FaultyLinuxPhoneTest, TheErrorOfAFaultIsGivenAsItIs) {
  fault("CaptureStream.start", FaultAction::kFail).error = FaultError{"LensErrorDomain", -3, "The lens is stuck."};
  open();
  cameras_.prepare(0);
  DiagnosticErrorPtr error;
  EXPECT_FALSE(cameras_.wide().start(&error));
  EXPECT_EQ(defaultText(error), "LensErrorDomain code -3: The lens is stuck.");
}

TEST_F(FaultyLinuxPhoneTest, GroupsAreSelectedByTheirNames) {
  fault("SynchronizedStreamsGroup.streams", FaultAction::kNothing).object = "front";
  fault("SynchronizedStreamsGroup.streams", FaultAction::kNothing).object = "back";
  open();
  EXPECT_EQ(cameras_.group->streams(nullptr), std::nullopt);
  EXPECT_THAT(fired(), ElementsAre(0U, 1U));
}

TEST_F(FaultyLinuxPhoneTest, ADelayTakesRealTime) {
  fault("CaptureStream.start", FaultAction::kDelay).seconds = 0.05;
  open();
  cameras_.prepare(0);
  const auto before = std::chrono::steady_clock::now();
  EXPECT_EQ(cameras_.start(0), "done");
  EXPECT_GE(std::chrono::steady_clock::now() - before, 50ms);
  EXPECT_EQ(cameras_.stop(0), "done");
}

TEST_F(FaultyLinuxPhoneTest, ASessionIsConfiguredThroughTheFaults) {
  fault("CaptureDevice.invalidate", FaultAction::kFail);
  open();
  ASSERT_EQ(cameras_.take(cameras_.backStreams()), "done");
  Array streams;
  for (const std::shared_ptr<CaptureStream>& stream : cameras_.backStreams()) streams.emplace_back(stream);
  ASSERT_EQ(cameras_.set(*cameras_.group, capture_key::ActiveStreams, streams), "done");
  EXPECT_EQ(cameras_.group->valueForProperty(capture_key::ActiveStreams, nullptr), Value(streams));
  EXPECT_EQ(cameras_.group->valueForProperty(capture_key::SynchronizationMaster, nullptr), Value(cameras_.streams[0]));
  EXPECT_EQ(cameras_.set(*cameras_.device, capture_key::MultiCamConfiguration,
                         Dictionary{{text(capture_key::ActiveSynchronizedStreamsGroups), Array{cameras_.group}}}),
            "done");
  EXPECT_THAT(fired(), ElementsAre(0U));
}

}  // namespace
}  // namespace quazor
