#include "backends/simulated/hid/simulated_hid.h"

#include "backends/faults/operations.h"
#include "backends/simulated/hid/sensor_user_for_tests.h"
#include "backends/simulated/simulated_phone.h"
#include "backends/simulated/time/simulation_stall.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::IsEmpty;
using ::testing::SizeIs;

Fault fault(std::string_view operation, FaultAction action) {
  Fault fault;
  fault.operation = operation;
  fault.action = action;
  return fault;
}

class SimulatedHidTest : public ::testing::Test {
 protected:
  void make(std::vector<HidDeviceConfig> sensors) {
    phone_.emplace(sensorScenario(std::move(sensors)), PhoneTime::kVirtual, 1);
  }

  std::optional<SimulatedPhone> phone_;
};

TEST_F(SimulatedHidTest, AManagerTellsWhatItsLastEnumerationFound) {
  make({testSensor()});
  const std::shared_ptr<HidManager> manager = phone_->platform().hid->createManager();
  EXPECT_EQ(manager->description(), "HID manager");
  EXPECT_THAT(manager->devices(), IsEmpty());
  manager->enumerateDevicesMatching({Dictionary{}});
  EXPECT_EQ(manager->devices(), manager->devices());
  EXPECT_THAT(manager->devices(), SizeIs(1));
  manager->enumerateDevicesMatching({});
  EXPECT_THAT(manager->devices(), IsEmpty());
}

TEST_F(SimulatedHidTest, CallsAreObserved) {
  make({testSensor()});
  std::vector<std::string> calls;
  phone_->observeCalls([&](const PlatformCall& call) {
    calls.push_back(call.operation + "|" + call.object + "|" + call.detail + "|" + (call.succeeded ? "+" : "-"));
  });
  RunLoop& loop = *phone_->platform().runLoops->currentRunLoop();
  const std::shared_ptr<HidManager> manager = phone_->platform().hid->createManager();
  manager->enumerateDevicesMatching({matchingUsage(65280, 36)});
  const std::shared_ptr<HidDevice> device = manager->devices().front();
  static_cast<void>(device->open(nullptr));
  static_cast<void>(device->open(nullptr));
  device->setInputReportCallback([](auto...) {});
  const std::array<std::uint8_t, 2> payload{0xAB, 0x01};
  static_cast<void>(device->setFeatureReportWithID(0xAB, payload, nullptr));
  device->scheduleWithRunLoop(loop, kRunLoopDefaultMode);
  device->setInputReportCallback(nullptr);
  device->unscheduleFromRunLoop(loop, kRunLoopDefaultMode);
  device->close(0);
  EXPECT_THAT(calls,
              testing::ElementsAre(
                  "RunLoops.currentRunLoop|||+", "HidService.createManager|||+",
                  "HidManager.enumerateDevicesMatching||({PrimaryUsagePage = 65280; PrimaryUsage = 36})|+",
                  "HidManager.devices||1|+", "HidDevice.open|sensor||+", "HidDevice.open|sensor||-",
                  "HidDevice.setInputReportCallback|sensor|receiver|+",
                  "HidDevice.setFeatureReportWithID|sensor|0xAB = " + defaultText(Bytes{0xAB, 1}) + "|+",
                  "HidDevice.scheduleWithRunLoop|sensor|default|+", "HidDevice.setInputReportCallback|sensor|(null)|+",
                  "HidDevice.unscheduleFromRunLoop|sensor|default|+", "HidDevice.close|sensor|0|+"));
}

TEST_F(SimulatedHidTest, FaultsReachEveryOperation) {
  make({testSensor()});
  const Platform platform = phone_->platform();
  const std::shared_ptr<HidManager> manager = platform.hid->createManager();
  manager->enumerateDevicesMatching({Dictionary{}});
  const std::shared_ptr<HidDevice> device = manager->devices().front();
  RunLoop& loop = *platform.runLoops->currentRunLoop();
  phone_->addFault(fault("*", FaultAction::kNothing));
  const std::array<std::uint8_t, 2> payload{0xAB, 0x01};
  EXPECT_EQ(platform.hid->createManager(), nullptr);
  manager->enumerateDevicesMatching({});  // has no effect: the found devices remain
  EXPECT_THAT(manager->devices(), IsEmpty());
  EXPECT_FALSE(device->open(nullptr));
  device->setInputReportCallback([](auto...) {});
  EXPECT_FALSE(device->setFeatureReportWithID(0xAB, payload, nullptr));
  device->scheduleWithRunLoop(loop, kRunLoopDefaultMode);
  device->unscheduleFromRunLoop(loop, kRunLoopDefaultMode);
  device->close(0);
  EXPECT_EQ(platform.runLoops->currentRunLoop(), nullptr);
  EXPECT_EQ(phone_->faultStatus().back().fired, 10U);
}

TEST_F(SimulatedHidTest, OperationsWithoutAnAnswerHaveNoEffectWhereAFaultMakesThemFail) {
  const struct {
    std::string_view operation;
    std::size_t images;    // images received in 55 ms; afterwards everything is stopped
    RunLoopResult result;  // of a later run
  } kRows[] = {
      {sensor_operation::kSetCallback, 0, RunLoopResult::kFinished},
      {sensor_operation::kSchedule, 0, RunLoopResult::kFinished},
      {sensor_operation::kUnschedule, 5, RunLoopResult::kTimedOut},
      {sensor_operation::kClose, 5, RunLoopResult::kFinished},
      {sensor_operation::kOpen, 0, RunLoopResult::kFinished},
  };
  for (const auto& row : kRows) {
    make({testSensor()});
    phone_->addFault(fault(row.operation, FaultAction::kFail));
    SensorUser user(phone_->platform());
    EXPECT_EQ(user.start(), row.operation != sensor_operation::kOpen) << row.operation;
    user.run(55ms);
    EXPECT_THAT(user.seen(), SizeIs(row.images)) << row.operation;
    user.unschedule();
    user.device->close(0);
    EXPECT_EQ(user.run(50ms), row.result) << row.operation;
    EXPECT_THAT(user.seen(), SizeIs(row.images)) << row.operation;
    EXPECT_GE(phone_->faultStatus().back().fired, 1U) << row.operation;
    phone_.reset();
  }
}

TEST_F(SimulatedHidTest, FaultsTellDevicesAndFeatureReportsApart) {
  HidDeviceConfig second = testSensor();
  second.name = "second";
  make({testSensor(), second});
  Fault refused = fault(sensor_operation::kSetFeature, FaultAction::kFail);
  refused.object = "second";
  refused.property = "0xAC";
  phone_->addFault(refused);
  SensorUser one(phone_->platform(), 0);
  SensorUser two(phone_->platform(), 1);
  EXPECT_TRUE(one.start());
  EXPECT_TRUE(two.device->open(nullptr) && two.set(0xAB, 1));
  DiagnosticErrorPtr error;
  const std::array<std::uint8_t, 2> payload{0xAC, 2};
  EXPECT_FALSE(two.device->setFeatureReportWithID(0xAC, payload, &error));
  EXPECT_EQ(defaultText(error),
            refusal(HidErrorCode::kInjected, "HidDevice.setFeatureReportWithID of second for 0xAC failed."));
}

TEST_F(SimulatedHidTest, CallsCanBeLateOrHang) {
  make({testSensor()});
  Fault late = fault(sensor_operation::kOpen, FaultAction::kDelay);
  late.seconds = 0.5;
  phone_->addFault(late);
  phone_->addFault(fault(sensor_operation::kClose, FaultAction::kHang));
  const std::shared_ptr<HidManager> manager = phone_->platform().hid->createManager();
  manager->enumerateDevicesMatching({Dictionary{}});
  const std::shared_ptr<HidDevice> device = manager->devices().front();
  EXPECT_TRUE(device->open(nullptr));
  EXPECT_EQ(phone_->platform().clock->now(), 500ms);
  EXPECT_THROW(device->close(0), SimulationStall);
}

TEST_F(SimulatedHidTest, TwoSensorsStreamSideBySide) {
  HidDeviceConfig second = testSensor();
  second.name = "second";
  second.rate = 50;
  make({testSensor(), second});
  SensorUser one(phone_->platform(), 0);
  SensorUser two(phone_->platform(), 1);
  ASSERT_TRUE(one.start() && two.start());
  one.run(105ms);
  EXPECT_THAT(one.seen(), SizeIs(10));
  EXPECT_THAT(two.seen(), SizeIs(5));
}

}  // namespace
}  // namespace quazor
