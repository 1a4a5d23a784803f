#include "backends/simulated/simulated_phone.h"

#include "backends/simulated/phone_for_tests.h"
#include "backends/simulated/time/simulation_stall.h"
#include "backends/threads/thread_concurrency.h"
#include "tests/support/thrown_text.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <stdexcept>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

Fault fault(std::string operation, FaultAction action, std::optional<std::string> object = std::nullopt) {
  Fault fault;
  fault.operation = std::move(operation);
  fault.action = action;
  fault.object = std::move(object);
  return fault;
}

// A clock that a test moves; it gives up a sleep that would never end.
class SteppedClock final : public Clock {
 public:
  struct NeverEnds {};

  std::chrono::nanoseconds now() const override { return now_; }
  Date date() const override { return Date(now_); }
  void sleep(std::chrono::nanoseconds duration) override {
    if (duration == std::chrono::nanoseconds::max()) throw NeverEnds{};
    now_ += duration;
  }

 private:
  std::chrono::nanoseconds now_ = 1h;
};

std::vector<std::string> callsOf(SimulatedPhone& phone, const std::function<void()>& action) {
  std::vector<std::string> calls;
  phone.observeCalls([&](const PlatformCall& call) {
    calls.push_back(call.operation + "|" + call.object + "|" + call.detail + "|" + (call.succeeded ? "+" : "-"));
  });
  action();
  phone.observeCalls(nullptr);
  return calls;
}

TEST(SimulatedPhone, ObserversSeeEveryCallInOrder) {
  SimulatedPhone phone(smallScenario(), PhoneTime::kVirtual, 1);
  const Platform platform = phone.platform();
  const std::vector<std::string> calls = callsOf(phone, [&] {
    const auto plugIn = platform.capture->createPlugIn();
    platform.capture->defaultPlugIn();
    const auto device = plugIn->device(nullptr);
    const CaptureStreams streams = *device->streams(nullptr);
    const auto group = device->synchronizedStreamsGroups(nullptr)->front();
    static_cast<void>(group->streams(nullptr));
    static_cast<void>(device->requestControlOfStreams({streams[0], nullptr}, nullptr));
    static_cast<void>(device->requestControlOfStreams({streams[0], streams[1]}, nullptr));
    static_cast<void>(group->setValue(Array{streams[0]}, capture_key::ActiveStreams, nullptr));
    static_cast<void>(group->valueForProperty(capture_key::SynchronizationMaster, nullptr));
    static_cast<void>(device->setValue(7, capture_key::MultiCamConfiguration, nullptr));
    static_cast<void>(device->valueForProperty(capture_key::MulticamSessionStatus, nullptr));
    static_cast<void>(streams[0]->setValue(1, capture_key::FormatIndex, nullptr));
    static_cast<void>(streams[0]->valueForProperty(capture_key::PortType, nullptr));
    static_cast<void>(streams[0]->start(nullptr));
    platform.clock->sleep(2500ms);
    static_cast<void>(streams[0]->stop(nullptr));
    static_cast<void>(device->relinquishControlOfStreams({streams[1]}, nullptr));
    static_cast<void>(device->invalidate(nullptr));
  });
  EXPECT_THAT(calls,
              testing::ElementsAre(
                  "CaptureService.createPlugIn|||+", "CaptureService.defaultPlugIn|||+", "CapturePlugIn.device|||+",
                  "CaptureDevice.streams|||+", "CaptureDevice.synchronizedStreamsGroups|||+",
                  "SynchronizedStreamsGroup.streams|back||+", "CaptureDevice.requestControlOfStreams||(wide, (null))|-",
                  "CaptureDevice.requestControlOfStreams||(wide, tele)|+",
                  "SynchronizedStreamsGroup.setValue|back|ActiveStreams = (stream wide (BackFacingCamera))|+",
                  "SynchronizedStreamsGroup.valueForProperty|back|SynchronizationMaster|+",
                  "CaptureDevice.setValue||MultiCamConfiguration = 7|-",
                  "CaptureDevice.valueForProperty||MulticamSessionStatus|-",
                  "CaptureStream.setValue|wide|FormatIndex = 1|+", "CaptureStream.valueForProperty|wide|PortType|+",
                  "CaptureStream.start|wide||+", "Clock.sleep||2.5|+", "CaptureStream.stop|wide||+",
                  "CaptureDevice.relinquishControlOfStreams||(tele)|+", "CaptureDevice.invalidate|||+"));
}

TEST(SimulatedPhone, FaultsReachEveryOperationThatCanFail) {
  SimulatedPhone phone(smallScenario(), PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  const auto plugIn = phone.platform().capture->createPlugIn();
  ASSERT_TRUE(user.configureSession());
  phone.addFault(fault("*", FaultAction::kNothing));
  const std::vector<std::string> calls = callsOf(phone, [&] {
    EXPECT_EQ(phone.platform().capture->createPlugIn(), nullptr);
    EXPECT_EQ(phone.platform().capture->defaultPlugIn(), nullptr);
    EXPECT_EQ(plugIn->device(nullptr), nullptr);
    EXPECT_EQ(user.device->streams(nullptr), std::nullopt);
    EXPECT_EQ(user.device->synchronizedStreamsGroups(nullptr), std::nullopt);
    EXPECT_FALSE(user.device->requestControlOfStreams({}, nullptr));
    EXPECT_FALSE(user.device->relinquishControlOfStreams({}, nullptr));
    EXPECT_FALSE(user.device->invalidate(nullptr));
    EXPECT_EQ(user.device->valueForProperty(capture_key::MultiCamConfiguration, nullptr), std::nullopt);
    EXPECT_FALSE(user.device->setValue(1, capture_key::MultiCamConfiguration, nullptr));
    EXPECT_EQ(user.back().streams(nullptr), std::nullopt);
    EXPECT_EQ(user.back().valueForProperty(capture_key::ActiveStreams, nullptr), std::nullopt);
    EXPECT_FALSE(user.back().setValue(Array{}, capture_key::ActiveStreams, nullptr));
    EXPECT_EQ(user.wide().valueForProperty(capture_key::PortType, nullptr), std::nullopt);
    EXPECT_FALSE(user.wide().setValue(1, capture_key::FormatIndex, nullptr));
    EXPECT_FALSE(user.wide().start(nullptr));
    EXPECT_FALSE(user.wide().stop(nullptr));
    phone.platform().clock->sleep(1s);
  });
  EXPECT_EQ(phone.faultStatus().back().fired, 17U);
  EXPECT_EQ(calls.size(), 18U);
}

TEST(SimulatedPhone, FaultsAreToldInTheOrderOfTheScenarioAndOfTheirAdding) {
  Scenario scenario = smallScenario();
  scenario.faults = {fault("CaptureStream.start", FaultAction::kNothing, "wide"),
                     fault("CaptureStream.start", FaultAction::kNothing, "tele")};
  SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  phone.addFault(fault("CaptureStream.stop", FaultAction::kNothing));
  const PhoneUser user(phone);
  for (int i = 0; i < 2; ++i) EXPECT_FALSE(user.tele().start(nullptr));
  const std::vector<FaultStatus> statuses = phone.faultStatus();
  ASSERT_EQ(statuses.size(), 3U);
  EXPECT_EQ(statuses[0].fault, scenario.faults[0]);
  EXPECT_EQ(statuses[0].fired, 0U);
  EXPECT_EQ(statuses[1].fault, scenario.faults[1]);
  EXPECT_EQ(statuses[1].fired, 2U);
  EXPECT_EQ(statuses[2].fault.operation, "CaptureStream.stop");
}

TEST(SimulatedPhone, ADelayedStartIsLateInTheSession) {
  Scenario scenario = smallScenario();
  Fault late = fault("CaptureStream.start", FaultAction::kDelay, "tele");
  late.seconds = 0.1;
  scenario.faults = {late};
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  ASSERT_TRUE(user.configureSession() && user.wide().start(nullptr) && user.tele().start(nullptr));
  phone.platform().clock->sleep(2s);
  EXPECT_EQ(user.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = 63}; "
            "BackFacingTelephotoCamera = {Offset = 3; FrameCount = 60}}");
}

TEST(SimulatedPhone, AHangInVirtualTimeEndsTheWait) {
  Scenario scenario = smallScenario();
  scenario.faults = {fault("CaptureStream.start", FaultAction::kHang)};
  const SimulatedPhone phone(scenario, PhoneTime::kVirtual, 1);
  const PhoneUser user(phone);
  phone.platform().clock->sleep(3s);
  EXPECT_EQ(thrownText<SimulationStall>([&] { return user.wide().start(nullptr); }),
            "The simulated phone waits for ever: CaptureStream.start of wide hangs, at 3 s of virtual time.");
}

TEST(SimulatedPhone, AHangOnAnotherClockSleepsForEver) {
  SimulatedPhone phone(smallScenario(), std::make_shared<SteppedClock>(), std::make_shared<ThreadConcurrency>());
  const PhoneUser user(phone);
  phone.addFault(fault("CaptureStream.start", FaultAction::kHang));
  EXPECT_THROW(static_cast<void>(user.wide().start(nullptr)), SteppedClock::NeverEnds);
  EXPECT_EQ(phone.scheduler(), nullptr);
}

TEST(SimulatedPhone, TheSessionRunsOnAnyClock) {
  const auto clock = std::make_shared<SteppedClock>();
  const SimulatedPhone phone(smallScenario(), clock, std::make_shared<ThreadConcurrency>());
  const PhoneUser user(phone);
  ASSERT_TRUE(user.configureSession() && user.wide().start(nullptr));
  clock->sleep(100ms);
  ASSERT_TRUE(user.tele().start(nullptr));
  clock->sleep(1900ms);
  EXPECT_EQ(user.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = 60}; "
            "BackFacingTelephotoCamera = {Offset = 3; FrameCount = 57}}");
  EXPECT_EQ(phone.platform().clock->date(), clock->date());
  EXPECT_EQ(phone.platform().clock->now(), 1h + 2s);
}

TEST(SimulatedPhone, InRealTimeFramesTakeRealTime) {
  Scenario scenario = smallScenario();
  scenario.cameras[0].actualFrameRate = 1000;
  const SimulatedPhone phone(scenario, PhoneTime::kReal, 1);
  const PhoneUser user(phone);
  ASSERT_TRUE(user.configureSession());
  const auto clock = phone.platform().clock;
  const auto before = clock->now();
  ASSERT_TRUE(user.wide().start(nullptr));
  const auto started = clock->now();
  clock->sleep(3ms);
  const auto stopping = clock->now();
  ASSERT_TRUE(user.wide().stop(nullptr));
  const auto stopped = clock->now();
  const std::optional<Value> status = user.device->valueForProperty(capture_key::MulticamSessionStatus, nullptr);
  const auto frames =
      toSigned(entryOf(entryOf(pointerTo(status), port_type::BackFacingCamera), capture_key::FrameCount));
  EXPECT_GE(frames, (stopping - started) / 1ms);
  EXPECT_LE(frames, (stopped - before) / 1ms);
  EXPECT_GE(frames, 3);
}

TEST(SimulatedPhone, ServicesOutliveThePhone) {
  auto phone = std::make_unique<SimulatedPhone>(smallScenario(), PhoneTime::kVirtual, 1);
  const Platform platform = phone->platform();
  const PhoneUser user(platform);
  phone.reset();
  ASSERT_TRUE(user.configureSession() && user.wide().start(nullptr) && user.tele().start(nullptr));
  platform.clock->sleep(1s);
  EXPECT_EQ(user.status(),
            "{BackFacingCamera = {Offset = 0; FrameCount = 30}; "
            "BackFacingTelephotoCamera = {Offset = 0; FrameCount = 30}}");
  const auto done = platform.concurrency->makeSemaphore(0);
  const auto queue = platform.concurrency->makeSerialQueue("queue", QualityOfService::kDefault);
  queue->asyncAfter(1s, [done] { done->signal(); });
  done->wait();
  EXPECT_EQ(platform.clock->now(), 2s);
}

TEST(SimulatedPhone, TasksThatArePendingGoWithThePhone) {
  auto phone = std::make_unique<SimulatedPhone>(smallScenario(), PhoneTime::kVirtual, 1);
  auto queue = phone->platform().concurrency->makeSerialQueue("queue", QualityOfService::kDefault);
  const auto token = std::make_shared<int>();
  SerialQueue& borrowed = *queue;
  borrowed.asyncAfter(1h, [token, own = std::move(queue), platform = phone->platform()] {});
  phone.reset();
  EXPECT_EQ(token.use_count(), 1);
}

TEST(SimulatedPhone, TheSeedDecidesTheOrderOfEvents) {
  const auto order = [](std::uint64_t seed) {
    const SimulatedPhone phone(smallScenario(), PhoneTime::kVirtual, seed);
    std::string ran;
    std::vector<std::shared_ptr<SerialQueue>> queues;
    for (char name = 'a'; name < 'i'; ++name) {
      queues.push_back(phone.platform().concurrency->makeSerialQueue("queue", QualityOfService::kDefault));
      queues.back()->async([&ran, name] { ran += name; });
    }
    phone.platform().clock->sleep(1s);
    return ran;
  };
  EXPECT_EQ(order(1), order(1));
  EXPECT_NE(order(1), order(2));
  EXPECT_EQ(order(1).size(), 8U);
}

TEST(SimulatedPhone, ScenariosThatContradictThemselvesAreRefused) {
  Scenario dangling = smallScenario();
  dangling.groups[0].cameras.push_back("wid");
  EXPECT_THROW(SimulatedPhone(dangling, PhoneTime::kVirtual, 1), std::invalid_argument);
  Scenario formatless = smallScenario();
  formatless.cameras[0].formats.clear();
  EXPECT_THROW(SimulatedPhone(formatless, PhoneTime::kVirtual, 1), std::invalid_argument);
}

}  // namespace
}  // namespace quazor
