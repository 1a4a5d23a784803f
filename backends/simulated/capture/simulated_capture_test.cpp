#include "backends/simulated/capture/simulated_capture.h"

#include "backends/simulated/phone_for_tests.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <string>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using Code = CaptureErrorCode;

class SimulatedCaptureTest : public ::testing::Test {
 protected:
  std::string request(const PhoneUser& user, const CaptureStreams& streams) {
    return outcome([&](DiagnosticErrorPtr* error) { return user.device->requestControlOfStreams(streams, error); });
  }
  std::string relinquish(const PhoneUser& user, const CaptureStreams& streams) {
    return outcome([&](DiagnosticErrorPtr* error) { return user.device->relinquishControlOfStreams(streams, error); });
  }
  std::string configure(const Value& value) {
    return outcome([&](DiagnosticErrorPtr* error) {
      return user_.device->setValue(value, capture_key::MultiCamConfiguration, error);
    });
  }
  static Value groups(Array list) { return Dictionary{{"ActiveSynchronizedStreamsGroups", std::move(list)}}; }

  SimulatedPhone phone_{smallScenario(), PhoneTime::kVirtual, 1};
  PhoneUser user_{phone_};
};

TEST_F(SimulatedCaptureTest, ObjectsDescribeThemselves) {
  const auto plugIn = phone_.platform().capture->createPlugIn();
  EXPECT_EQ(plugIn->description(), "capture plug-in");
  EXPECT_EQ(plugIn->device(nullptr)->description(), "capture device");
}

TEST_F(SimulatedCaptureTest, ARunningStreamIsNotGivenBack) {
  ASSERT_TRUE(user_.control({user_.streams[0]}) && user_.wide().start(nullptr));
  EXPECT_EQ(relinquish(user_, {user_.streams[0]}),
            refusal(Code::kWrongState, "wide is running; stop it before giving it back."));
}

TEST_F(SimulatedCaptureTest, StreamsOfOthersAreRefused) {
  const PhoneUser other(phone_);
  EXPECT_EQ(request(user_, {other.streams[0]}),
            refusal(Code::kForeignObject, "stream wide (BackFacingCamera) is not a stream of this device."));
  EXPECT_EQ(relinquish(user_, {nullptr}), refusal(Code::kForeignObject, "(null) is not a stream of this device."));
}

TEST_F(SimulatedCaptureTest, ConfigurationsThatDoNotFitAreRefusedAndChangeNothing) {
  ASSERT_TRUE(user_.configureSession());
  const PhoneUser other(phone_);
  constexpr const char* kShape =
      "capture device: MultiCamConfiguration must be a dictionary with exactly one entry, "
      "ActiveSynchronizedStreamsGroups, "
      "an array.";
  const struct {
    const char* name;
    Value value;
    Code code;
    const char* message;
  } kRows[] = {
      {"no dictionary", 1, Code::kWrongType, kShape},
      {"an empty dictionary", Dictionary{}, Code::kWrongType, kShape},
      {"no array", Dictionary{{"ActiveSynchronizedStreamsGroups", user_.groups[0]}}, Code::kWrongType, kShape},
      {"an entry more", Dictionary{{"ActiveSynchronizedStreamsGroups", Array{}}, {"Speed", 1}}, Code::kWrongType,
       kShape},
      {"no group", groups({"back"}), Code::kForeignObject,
       "capture device: ActiveSynchronizedStreamsGroups must contain groups of this device, not the string back."},
      {"a group of another user", groups({other.groups[0]}), Code::kForeignObject,
       "capture device: ActiveSynchronizedStreamsGroups must contain groups of this device, not group back."},
      {"a group twice", groups({user_.groups[0], user_.groups[0]}), Code::kOutOfRange,
       "capture device: ActiveSynchronizedStreamsGroups must contain a group once, not group back twice."},
      {"a group whose master is not active", groups({user_.groups[1]}), Code::kWrongState,
       "group selfie: its master front is not active; set ActiveStreams first."},
  };
  for (const auto& row : kRows) EXPECT_EQ(configure(row.value), refusal(row.code, row.message)) << row.name;
  EXPECT_EQ(user_.device->valueForProperty(capture_key::MultiCamConfiguration, nullptr), groups({user_.groups[0]}));
}

TEST_F(SimulatedCaptureTest, ASessionNeedsControlAndStreamsThatDoNotRun) {
  ASSERT_TRUE(user_.configureSession() && user_.tele().start(nullptr));
  EXPECT_EQ(configure(groups({user_.groups[0]})),
            refusal(Code::kWrongState, "capture device: MultiCamConfiguration cannot be set while tele is running."));
  ASSERT_TRUE(user_.tele().stop(nullptr));
  ASSERT_EQ(relinquish(user_, {user_.streams[1]}), "done");
  EXPECT_EQ(configure(groups({user_.groups[0]})),
            refusal(Code::kNotControlled, "tele is not under control; request control of it first."));
}

TEST_F(SimulatedCaptureTest, DevicePropertiesThatAreUnknownOrReadOnlyAreRefused) {
  const std::string unknown =
      refusal(Code::kUnknownProperty,
              "capture device has no property PortType; it has MultiCamConfiguration, MulticamSessionStatus.");
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return user_.device->valueForProperty("PortType", error); }),
            unknown);
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return user_.device->setValue(1, "PortType", error); }), unknown);
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) {
              return user_.device->setValue(1, capture_key::MulticamSessionStatus, error);
            }),
            refusal(Code::kReadOnlyProperty, "capture device: MulticamSessionStatus can only be read."));
}

TEST_F(SimulatedCaptureTest, TheStatusFollowsFromWhatWasStreamed) {
  const auto clock = phone_.platform().clock;
  ASSERT_TRUE(user_.configureSession() && user_.wide().start(nullptr));
  EXPECT_EQ(user_.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = -1}; "
            "BackFacingTelephotoCamera = {Offset = 0; FrameCount = -1}}");
  clock->sleep(100ms);
  ASSERT_TRUE(user_.tele().start(nullptr));
  clock->sleep(1900ms);
  EXPECT_EQ(user_.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = 60}; "
            "BackFacingTelephotoCamera = {Offset = 3; FrameCount = 57}}");
  ASSERT_TRUE(user_.tele().stop(nullptr));
  clock->sleep(1s);
  ASSERT_TRUE(user_.wide().stop(nullptr));
  clock->sleep(1s);
  EXPECT_EQ(user_.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = 90}; "
            "BackFacingTelephotoCamera = {Offset = 3; FrameCount = 57}}");
}

TEST_F(SimulatedCaptureTest, TheStatusCountsAtTheRateThatWasSet) {
  ASSERT_TRUE(user_.configureSession());
  for (const auto& stream : user_.backStreams()) {
    ASSERT_TRUE(stream->setValue(1, capture_key::FormatIndex, nullptr));
    ASSERT_TRUE(stream->setValue(10, capture_key::MinimumFrameRate, nullptr));
    ASSERT_TRUE(stream->setValue(50, capture_key::MaximumFrameRate, nullptr));
    ASSERT_TRUE(stream->start(nullptr));
  }
  phone_.platform().clock->sleep(2s);
  EXPECT_EQ(user_.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = 100}; "
            "BackFacingTelephotoCamera = {Offset = 0; FrameCount = 100}}");
}

TEST(SimulatedCaptureConfig, TheStatusFollowsTheCamerasOfTheScenario) {
  Scenario scenario = smallScenario();
  scenario.cameras[0].actualFrameRate = 29.5;
  scenario.cameras[1].inSessionStatus = false;
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  ASSERT_TRUE(user.configureSession() && user.wide().start(nullptr) && user.tele().start(nullptr));
  phone.platform().clock->sleep(2s);
  EXPECT_EQ(user.status(), "{BackFacingCamera = {Offset = 0; FrameCount = 59}}");
}

TEST(SimulatedCaptureConfig, APlugInThatDoesNotLoadIsNull) {
  Scenario scenario = smallScenario();
  scenario.device.plugInLoads = false;
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  EXPECT_EQ(phone.platform().capture->createPlugIn(), nullptr);
  EXPECT_EQ(phone.platform().capture->defaultPlugIn(), nullptr);
}

TEST(SimulatedCaptureConfig, APhoneWithoutADeviceSaysSo) {
  Scenario scenario = smallScenario();
  scenario.device.present = false;
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const auto plugIn = phone.platform().capture->createPlugIn();
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return plugIn->device(error); }),
            refusal(Code::kNoDevice, "The phone has no capture device."));
  EXPECT_EQ(plugIn->device(nullptr), nullptr);
}

}  // namespace
}  // namespace quazor
