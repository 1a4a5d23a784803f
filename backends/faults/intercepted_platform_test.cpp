#include "backends/faults/intercepted_platform.h"

#include "backends/faults/operations.h"
#include "backends/simulated/time/simulation_stall.h"
#include "backends/simulated/time/virtual_services.h"
#include "backends/threads/real_clock.h"
#include "tests/support/fake_camera.h"
#include "tests/support/fake_sensor.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::IsEmpty;

// The time of a platform and its kind of hang.
struct TestTime {
  std::shared_ptr<Clock> clock;
  CallInterceptor::Hang hang;
};

TestTime virtualTime() {
  const auto scheduler = std::make_shared<VirtualScheduler>(std::make_shared<RandomStrategy>(1));
  return {std::make_shared<VirtualClock>(scheduler), [scheduler](std::string_view what) { scheduler->stall(what); }};
}

TestTime realTime() {
  const auto clock = std::make_shared<RealClock>();
  return {clock, sleepForEver(clock)};
}

// An observed call in one line.
std::string lineOf(const PlatformCall& call) {
  return call.operation + '|' + call.object + '|' + call.detail + '|' + (call.succeeded ? '+' : '-');
}

// Fake services behind interceptors, in virtual time by default.
class InterceptedPlatformTest : public ::testing::Test {
 protected:
  void intercept(Platform platform, ObjectNames names, TestTime time = virtualTime()) {
    calls_ = std::make_shared<CallInterceptor>(
        std::vector<Fault>{}, time.clock, time.hang, [](const CallSite&, std::string sentence) {
          return errorWithMessage("BenchErrorDomain", 1, std::move(sentence), nullptr);
        });
    calls_->observe([this](const PlatformCall& call) { seen_.push_back(lineOf(call)); });
    platform.clock = std::move(time.clock);
    platform_ = interceptedPlatform(platform, calls_, std::move(names));
  }
  Fault& addFault(std::string_view operation, FaultAction action) {
    fault_ = {};
    fault_.operation = operation;
    fault_.action = action;
    return fault_;
  }
  // Activates the prepared fault.
  void act() { calls_->addFault(fault_); }
  void act(std::string_view operation, FaultAction action) {
    addFault(operation, action);
    act();
  }
  std::vector<std::uint64_t> fired() const {
    std::vector<std::uint64_t> fired;
    for (const FaultStatus& status : calls_->faultStatus()) fired.push_back(status.fired);
    return fired;
  }
  std::vector<std::string> takeSeen() { return std::exchange(seen_, {}); }

  std::shared_ptr<CallInterceptor> calls_;
  Platform platform_;
  std::vector<std::string> seen_;
  Fault fault_;
};

// "done", or the error message.
template <class Call>
std::string outcomeOf(Call&& call) {
  DiagnosticErrorPtr error;
  if (static_cast<bool>(call(&error))) return error == nullptr ? "done" : "done, with an error";
  return error == nullptr ? "failed" : defaultText(error);
}

class CameraUnderFaults : public InterceptedPlatformTest {
 protected:
  void open(TestTime time = virtualTime()) {
    Platform platform;
    platform.capture = makeFakeCapture(inner_);
    platform.reports = std::make_shared<FakeReports>(fakeChannels(2), 5);
    intercept(std::move(platform), {{"infrared"}, {}}, std::move(time));
    device_ = platform_.capture->createPlugIn()->device(nullptr);
    ASSERT_NE(device_, nullptr);
    stream_ = device_->streams(nullptr)->front();
    takeSeen();
  }
  std::string start() {
    return outcomeOf([this](auto* error) { return stream_->start(error); });
  }

  const std::shared_ptr<FakeStream> inner_ = std::make_shared<FakeStream>();
  std::shared_ptr<CaptureDevice> device_;
  std::shared_ptr<CaptureStream> stream_;
};

TEST_F(CameraUnderFaults, WithoutFaultsEveryCallIsMadeAndTold) {
  open();
  EXPECT_EQ(stream_->description(), "stream");
  EXPECT_TRUE(device_->requestControlOfStreams({stream_, inner_}, nullptr));
  EXPECT_TRUE(stream_->setValue(16, capture_key::FormatIndex, nullptr));
  EXPECT_EQ(stream_->valueForProperty(capture_key::PortType, nullptr), Value(port_type::FrontFacingInfraredCamera));
  EXPECT_EQ(start(), "done");
  EXPECT_TRUE(stream_->stop(nullptr));
  EXPECT_TRUE(device_->relinquishControlOfStreams({stream_}, nullptr));
  EXPECT_TRUE(device_->setValue(1, capture_key::MultiCamConfiguration, nullptr));
  EXPECT_EQ(device_->valueForProperty(capture_key::MulticamSessionStatus, nullptr), std::nullopt);
  EXPECT_THAT(*device_->synchronizedStreamsGroups(nullptr), IsEmpty());
  EXPECT_TRUE(device_->invalidate(nullptr));
  platform_.clock->sleep(250ms);
  EXPECT_THAT(takeSeen(),
              ElementsAre("CaptureDevice.requestControlOfStreams||(infrared, stream)|+",
                          "CaptureStream.setValue|infrared|FormatIndex = 16|+",
                          "CaptureStream.valueForProperty|infrared|PortType|+", "CaptureStream.start|infrared||+",
                          "CaptureStream.stop|infrared||+", "CaptureDevice.relinquishControlOfStreams||(infrared)|+",
                          "CaptureDevice.setValue||MultiCamConfiguration = 1|+",
                          "CaptureDevice.valueForProperty||MulticamSessionStatus|-",
                          "CaptureDevice.synchronizedStreamsGroups|||+", "CaptureDevice.invalidate|||+",
                          "Clock.sleep||0.25|+"));
}

TEST_F(CameraUnderFaults, AFaultedCallDoesNotReachTheService) {
  open();
  std::vector<std::string> reached;
  inner_->onCall = [&](std::string_view call) { reached.emplace_back(call); };
  act("CaptureStream.start", FaultAction::kFail);
  EXPECT_EQ(start(), "BenchErrorDomain code 1: CaptureStream.start of infrared failed.");
  EXPECT_THAT(reached, IsEmpty());
  EXPECT_THAT(takeSeen(), ElementsAre("CaptureStream.start|infrared||-"));
  EXPECT_THAT(fired(), ElementsAre(1U));
}

TEST_F(CameraUnderFaults, SelectorsAndOccurrencesPickTheCall) {
  open();
  Fault& fault = addFault("CaptureStream.setValue", FaultAction::kNothing);
  fault.object = "infrared";
  fault.property = capture_key::FormatIndex;
  fault.occurrence = 2;
  act();
  EXPECT_TRUE(stream_->setValue(true, capture_key::AEEnabled, nullptr));
  EXPECT_TRUE(stream_->setValue(1, capture_key::FormatIndex, nullptr));
  EXPECT_EQ(outcomeOf([&](auto* error) { return stream_->setValue(2, capture_key::FormatIndex, error); }), "failed");
  EXPECT_TRUE(stream_->setValue(3, capture_key::FormatIndex, nullptr));
  EXPECT_THAT(fired(), ElementsAre(1U));
}

TEST_F(CameraUnderFaults, DelaysTakeVirtualTime) {
  open();
  addFault("CaptureStream.start", FaultAction::kDelay).seconds = 3600;
  act();
  const std::chrono::nanoseconds before = platform_.clock->now();
  EXPECT_EQ(start(), "done");
  EXPECT_EQ(platform_.clock->now() - before, 1h);
  EXPECT_THAT(takeSeen(), ElementsAre("CaptureStream.start|infrared||+"));  // the delay is not a sleep of the caller
}

TEST_F(CameraUnderFaults, DelaysTakeRealTime) {
  open(realTime());
  addFault("CaptureStream.start", FaultAction::kDelay).seconds = 0.05;
  act();
  const auto before = std::chrono::steady_clock::now();
  EXPECT_EQ(start(), "done");
  EXPECT_GE(std::chrono::steady_clock::now() - before, 50ms);
}

TEST_F(CameraUnderFaults, AHangEndsVirtualTime) {
  open();
  act("CaptureStream.start", FaultAction::kHang);
  try {
    start();
    FAIL() << "the call returned";
  } catch (const SimulationStall& stall) {
    EXPECT_THAT(stall.what(), ::testing::HasSubstr("CaptureStream.start of infrared hangs"));
  }
  EXPECT_THAT(takeSeen(), IsEmpty());
}

// A clock that throws instead of sleeping forever.
class ImpatientClock final : public Clock {
 public:
  struct Waited {
    std::chrono::nanoseconds duration;
  };
  std::chrono::nanoseconds now() const override { return 0ns; }
  Date date() const override { return {}; }
  void sleep(std::chrono::nanoseconds duration) override { throw Waited{duration}; }
};

TEST_F(CameraUnderFaults, AHangInRealTimeSleepsByTheClockForEver) {
  const auto clock = std::make_shared<ImpatientClock>();
  open({clock, sleepForEver(clock)});
  act("CaptureStream.start", FaultAction::kHang);
  try {
    start();
    FAIL() << "the call returned";
  } catch (const ImpatientClock::Waited& waited) {
    EXPECT_EQ(waited.duration, std::chrono::nanoseconds::max());
  }
}

TEST_F(CameraUnderFaults, EveryCaptureOperationCanBeMadeToFail) {
  open();
  const std::shared_ptr<CapturePlugIn> plugIn = platform_.capture->defaultPlugIn();
  act("*", FaultAction::kNothing);
  takeSeen();
  EXPECT_EQ(platform_.capture->createPlugIn(), nullptr);
  EXPECT_EQ(platform_.capture->defaultPlugIn(), nullptr);
  EXPECT_EQ(plugIn->device(nullptr), nullptr);
  EXPECT_EQ(device_->streams(nullptr), std::nullopt);
  EXPECT_EQ(device_->synchronizedStreamsGroups(nullptr), std::nullopt);
  EXPECT_FALSE(device_->requestControlOfStreams({}, nullptr));
  EXPECT_FALSE(device_->relinquishControlOfStreams({}, nullptr));
  EXPECT_FALSE(device_->invalidate(nullptr));
  EXPECT_EQ(device_->valueForProperty("a", nullptr), std::nullopt);
  EXPECT_FALSE(device_->setValue(1, "a", nullptr));
  EXPECT_EQ(stream_->valueForProperty("a", nullptr), std::nullopt);
  EXPECT_FALSE(stream_->setValue(1, "a", nullptr));
  EXPECT_FALSE(stream_->start(nullptr));
  EXPECT_FALSE(stream_->stop(nullptr));
  EXPECT_THAT(fired(), ElementsAre(14U));
  EXPECT_EQ(takeSeen().size(), 14U);
}

TEST_F(CameraUnderFaults, TheSameStreamIsTheSameObjectOnEveryPath) {
  open();
  EXPECT_EQ(device_->streams(nullptr)->front(), stream_);
  EXPECT_EQ(platform_.capture->defaultPlugIn()->device(nullptr), device_);
  EXPECT_EQ(platform_.capture->createPlugIn()->device(nullptr), device_);
}

TEST_F(CameraUnderFaults, WhatNobodyHoldsIsLetGo) {
  open();
  const std::weak_ptr<CaptureDevice> device = device_;
  const std::weak_ptr<CaptureStream> stream = stream_;
  device_.reset();
  EXPECT_TRUE(device.expired());
  stream_.reset();
  EXPECT_TRUE(stream.expired());
  EXPECT_EQ(platform_.capture->createPlugIn()->device(nullptr)->streams(nullptr)->front()->description(), "stream");
}

TEST_F(CameraUnderFaults, ReportsAreFilteredSampledAndSubtractedUnderFaults) {
  open();
  const auto all = platform_.reports->reportWithOnlySimpleChannels(nullptr);
  const auto events = all->reportByFilteringChannels(
      [](const ReportChannelDescription& channel) { return channel.subGroupName == "K42ISP Events"; });
  const auto earlier = events->snapshot(nullptr);
  const auto later = events->snapshot(nullptr);
  EXPECT_EQ(later->samples().size(), 2U);
  const auto growth = later->snapshotWithBaseline(*earlier, nullptr);
  ASSERT_NE(growth, nullptr);
  EXPECT_EQ(growth->samples().front().channel().count(), Value(5U));
  for (const std::string_view operation : {report_operation::kSimpleChannels, report_operation::kSnapshot,
                                           report_operation::kDelta, report_operation::kFilter}) {
    act(operation, FaultAction::kFail);
  }
  EXPECT_EQ(outcomeOf([&](auto* error) { return platform_.reports->reportWithOnlySimpleChannels(error); }),
            "BenchErrorDomain code 1: ReportFacility.reportWithOnlySimpleChannels failed.");
  EXPECT_EQ(outcomeOf([&](auto* error) { return events->snapshot(error); }),
            "BenchErrorDomain code 1: ReportChannelSet.snapshot failed.");
  EXPECT_EQ(outcomeOf([&](auto* error) { return later->snapshotWithBaseline(*earlier, error); }),
            "BenchErrorDomain code 1: ReportSnapshot.snapshotWithBaseline failed.");
  EXPECT_NE(all->reportByFilteringChannels([](const ReportChannelDescription&) { return false; }), nullptr);
  EXPECT_THAT(fired(), ElementsAre(1U, 1U, 1U, 0U));
  EXPECT_THAT(
      takeSeen(),
      ElementsAre("ReportFacility.reportWithOnlySimpleChannels|||+", "ReportChannelSet.reportByFilteringChannels||2|+",
                  "ReportChannelSet.snapshot|||+", "ReportChannelSet.snapshot|||+",
                  "ReportSnapshot.snapshotWithBaseline|||+", "ReportFacility.reportWithOnlySimpleChannels|||-",
                  "ReportChannelSet.snapshot|||-", "ReportSnapshot.snapshotWithBaseline|||-",
                  "ReportChannelSet.reportByFilteringChannels||0|+"));
}

class SensorUnderFaults : public InterceptedPlatformTest {
 protected:
  SensorUnderFaults() {
    intercept(sensor_.platform(), {{}, {}, [](const HidDevice&) { return std::string("near"); }});
  }
  std::shared_ptr<HidDevice> find() {
    const std::shared_ptr<HidManager> manager = platform_.hid->createManager();
    manager->enumerateDevicesMatching({Dictionary{{"PrimaryUsage", 36}}});
    return manager->devices().front();
  }

  FakeSensor sensor_{{}};
};

TEST_F(SensorUnderFaults, WithoutFaultsEveryCallIsMadeAndTold) {
  const std::shared_ptr<HidDevice> device = find();
  EXPECT_EQ(device->description(), "sensor");
  EXPECT_TRUE(device->open(nullptr));
  device->setInputReportCallback([](auto, auto, const auto&) {});
  EXPECT_TRUE(sensor_.device->hasReceiver());
  EXPECT_TRUE(device->setFeatureReportWithID(0xAB, Bytes{0xAB, 1}, nullptr));
  RunLoop* const loop = platform_.runLoops->currentRunLoop();
  EXPECT_EQ(loop, &sensor_.loop);
  device->scheduleWithRunLoop(*loop, kRunLoopDefaultMode);
  EXPECT_TRUE(sensor_.device->isScheduled());
  device->unscheduleFromRunLoop(*loop, kRunLoopDefaultMode);
  device->setInputReportCallback(nullptr);
  device->close(0);
  EXPECT_FALSE(sensor_.device->isOpen());
  const auto registry = platform_.framebuffer->mainDisplay()->registryService();
  EXPECT_NE(registry->registryProperty("DSPLY Debug Info"), std::nullopt);
  EXPECT_EQ(registry->registryProperty("Colour"), std::nullopt);
  EXPECT_THAT(
      takeSeen(),
      ElementsAre(
          "HidService.createManager|||+", "HidManager.enumerateDevicesMatching||({PrimaryUsage = 36})|+",
          "HidManager.devices||1|+", "HidDevice.open|near||+", "HidDevice.setInputReportCallback|near|receiver|+",
          "HidDevice.setFeatureReportWithID|near|0xAB = ab01|+", "RunLoops.currentRunLoop|||+",
          "HidDevice.scheduleWithRunLoop|near|default|+", "HidDevice.unscheduleFromRunLoop|near|default|+",
          "HidDevice.setInputReportCallback|near|(null)|+", "HidDevice.close|near|0|+",
          "FramebufferService.mainDisplay|||+", "Display.registryService|||+",
          "RegistryService.registryProperty||DSPLY Debug Info|+", "RegistryService.registryProperty||Colour|-"));
}

TEST_F(SensorUnderFaults, AFailedCallHasNoEffect) {
  const std::shared_ptr<HidDevice> device = find();
  const auto display = platform_.framebuffer->mainDisplay();
  const auto registry = display->registryService();
  EXPECT_TRUE(device->open(nullptr));
  act("*", FaultAction::kFail);
  device->setInputReportCallback([](auto, auto, const auto&) {});
  EXPECT_FALSE(sensor_.device->hasReceiver());
  device->scheduleWithRunLoop(sensor_.loop, kRunLoopDefaultMode);
  EXPECT_FALSE(sensor_.device->isScheduled());
  EXPECT_EQ(outcomeOf([&](auto* error) {
              return device->setFeatureReportWithID(0x0C, Bytes{0x0C, 1}, error);
            }),
            "BenchErrorDomain code 1: HidDevice.setFeatureReportWithID of near for 0x0C failed.");
  device->close(0);
  EXPECT_TRUE(sensor_.device->isOpen());
  EXPECT_EQ(platform_.hid->createManager(), nullptr);
  EXPECT_EQ(platform_.runLoops->currentRunLoop(), nullptr);
  EXPECT_EQ(platform_.framebuffer->mainDisplay(), nullptr);
  EXPECT_EQ(display->registryService(), nullptr);
  EXPECT_EQ(registry->registryProperty("DSPLY Debug Info"), std::nullopt);
  EXPECT_THAT(fired(), ElementsAre(9U));
}

TEST_F(SensorUnderFaults, HiddenDevicesAreStillCountedForTheObserver) {
  const std::shared_ptr<HidManager> manager = platform_.hid->createManager();
  takeSeen();
  act("HidManager.devices", FaultAction::kNothing);
  EXPECT_THAT(manager->devices(), IsEmpty());
  EXPECT_THAT(takeSeen(), ElementsAre("HidManager.devices||1|-"));
}

TEST_F(SensorUnderFaults, TheSameDeviceIsTheSameObject) { EXPECT_EQ(find(), find()); }

TEST_F(SensorUnderFaults, WhatIsMissingStaysMissing) {
  sensor_.hasDisplay = false;
  sensor_.hasHidManager = false;
  sensor_.hasRunLoop = false;
  EXPECT_EQ(platform_.framebuffer->mainDisplay(), nullptr);
  EXPECT_EQ(platform_.hid->createManager(), nullptr);
  EXPECT_EQ(platform_.runLoops->currentRunLoop(), nullptr);
  EXPECT_EQ(platform_.capture, nullptr);
  EXPECT_EQ(platform_.reports, nullptr);
}

}  // namespace
}  // namespace quazor
