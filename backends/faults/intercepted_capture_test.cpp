#include "backends/faults/intercepted_capture.h"

#include "tests/support/scripted_capture.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using ::testing::ElementsAre;

// A device of two streams and their group.
class InterceptedCaptureTest : public ::testing::Test {
 protected:
  InterceptedCaptureTest() {
    calls_->observe([this](const PlatformCall& call) { seen_.push_back(call.object + '|' + call.detail); });
  }

  static std::shared_ptr<ScriptedGroup> makeGroup(const CaptureStreams& streams) {
    auto group = std::make_shared<ScriptedGroup>("pair");
    group->members = streams;
    return group;
  }
  static std::shared_ptr<ScriptedDevice> makeDevice(const CaptureStreams& streams,
                                                    const std::shared_ptr<ScriptedGroup>& group) {
    auto device = std::make_shared<ScriptedDevice>("device");
    device->members = streams;
    device->groups = {group};
    return device;
  }

  const CaptureStreams inner_{std::make_shared<ScriptedStream>("a"), std::make_shared<ScriptedStream>("b")};
  const std::shared_ptr<ScriptedGroup> innerGroup_ = makeGroup({inner_[1], inner_[0]});
  const std::shared_ptr<ScriptedDevice> innerDevice_ = makeDevice(inner_, innerGroup_);
  const std::shared_ptr<CallInterceptor> calls_ =
      std::make_shared<CallInterceptor>(std::vector<Fault>{}, nullptr, nullptr, nullptr);
  const std::shared_ptr<CaptureService> service_ =
      interceptedCapture(std::make_shared<ScriptedCapture>(innerDevice_), calls_,
                         std::make_shared<const ObjectNames>(ObjectNames{{"wide"}, {"back"}, nullptr}));
  const std::shared_ptr<CaptureDevice> device_ = service_->createPlugIn()->device(nullptr);
  const CaptureStreams streams_ = *device_->streams(nullptr);
  const std::shared_ptr<SynchronizedStreamsGroup> group_ = device_->synchronizedStreamsGroups(nullptr)->front();
  std::vector<std::string> seen_;
};

TEST_F(InterceptedCaptureTest, TheGroupHasTheDevicesOwnStreams) {
  EXPECT_THAT(*group_->streams(nullptr), ElementsAre(streams_[1], streams_[0]));
}

// As a device of its own does: who holds it may leave its streams and groups to it.
TEST_F(InterceptedCaptureTest, ADeviceKeepsItsStreamsAndGroupsForAsLongAsItLives) {
  const auto service = interceptedCapture(std::make_shared<ScriptedCapture>(innerDevice_), calls_,
                                          std::make_shared<const ObjectNames>());
  std::shared_ptr<CaptureDevice> device = service->createPlugIn()->device(nullptr);
  const std::weak_ptr<CaptureStream> stream = device->streams(nullptr)->front();
  std::shared_ptr<SynchronizedStreamsGroup> group = device->synchronizedStreamsGroups(nullptr)->front();
  const std::weak_ptr<SynchronizedStreamsGroup> sameGroup = group;
  group.reset();
  EXPECT_EQ(stream.lock(), device->streams(nullptr)->front());
  ASSERT_EQ(sameGroup.lock(), device->synchronizedStreamsGroups(nullptr)->front());

  group = sameGroup.lock();
  device.reset();
  EXPECT_EQ(group->streams(nullptr)->back(), stream.lock());
  group.reset();
  EXPECT_TRUE(stream.expired());
  EXPECT_TRUE(sameGroup.expired());
}

TEST_F(InterceptedCaptureTest, ObjectsInPropertiesAreTheServicesOwnOnTheOneSideAndInterceptedOnTheOther) {
  ASSERT_TRUE(group_->setValue(Array{streams_[1], streams_[0]}, "ActiveStreams", nullptr));
  EXPECT_EQ(innerGroup_->properties, (Dictionary{{"ActiveStreams", Array{inner_[1], inner_[0]}}}));
  EXPECT_EQ(group_->valueForProperty("ActiveStreams", nullptr), Value(Array{streams_[1], streams_[0]}));

  ASSERT_TRUE(device_->setValue(Dictionary{{"Groups", Array{group_}}, {"Count", 1}}, "Configuration", nullptr));
  EXPECT_EQ(innerDevice_->properties,
            (Dictionary{{"Configuration", Dictionary{{"Groups", Array{innerGroup_}}, {"Count", 1}}}}));
  EXPECT_EQ(device_->valueForProperty("Configuration", nullptr),
            Value(Dictionary{{"Groups", Array{group_}}, {"Count", 1}}));
  innerGroup_->properties.set("SynchronizationMaster", inner_[0]);
  EXPECT_EQ(group_->valueForProperty("SynchronizationMaster", nullptr), Value(streams_[0]));
}

TEST_F(InterceptedCaptureTest, ControlIsAskedForTheServicesOwnStreams) {
  const auto foreign = std::make_shared<ScriptedStream>("foreign");
  ASSERT_TRUE(device_->requestControlOfStreams({streams_[0], streams_[1], foreign}, nullptr));
  EXPECT_THAT(innerDevice_->controlled, ElementsAre(inner_[0], inner_[1], foreign));
  ASSERT_TRUE(device_->relinquishControlOfStreams({streams_[0]}, nullptr));
  EXPECT_THAT(innerDevice_->controlled, ElementsAre(inner_[1], foreign));
}

TEST_F(InterceptedCaptureTest, WhatHasNoNameIsCalledByItsDescription) {
  seen_.clear();
  static_cast<void>(streams_[0]->start(nullptr));
  static_cast<void>(streams_[1]->start(nullptr));
  static_cast<void>(group_->streams(nullptr));
  static_cast<void>(device_->requestControlOfStreams(streams_, nullptr));
  EXPECT_THAT(seen_, ElementsAre("wide|", "b|", "back|", "|(wide, b)"));
}

TEST_F(InterceptedCaptureTest, AGroupKeepsItsStreamsNames) {
  seen_.clear();
  const std::shared_ptr<SynchronizedStreamsGroup> group =
      service_->defaultPlugIn()->device(nullptr)->synchronizedStreamsGroups(nullptr)->front();
  EXPECT_EQ(group, group_);
  static_cast<void>(group->streams(nullptr)->back()->stop(nullptr));
  EXPECT_EQ(seen_.back(), "wide|");
}

TEST_F(InterceptedCaptureTest, FaultsReachGroups) {
  for (const char* operation : {"SynchronizedStreamsGroup.streams", "SynchronizedStreamsGroup.valueForProperty",
                                "SynchronizedStreamsGroup.setValue"}) {
    Fault fault;
    fault.operation = operation;
    fault.object = "back";
    fault.action = FaultAction::kNothing;
    calls_->addFault(fault);
  }
  EXPECT_EQ(group_->streams(nullptr), std::nullopt);
  EXPECT_FALSE(group_->setValue(1, "ActiveStreams", nullptr));
  EXPECT_EQ(innerGroup_->properties, Dictionary{});
  innerGroup_->properties.set("ActiveStreams", 1);
  EXPECT_EQ(group_->valueForProperty("ActiveStreams", nullptr), std::nullopt);
  for (const FaultStatus& status : calls_->faultStatus()) EXPECT_EQ(status.fired, 1U) << status.fault.operation;
}

}  // namespace
}  // namespace quazor
