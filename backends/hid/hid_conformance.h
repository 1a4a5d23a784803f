// Requirements on every HID service, as a typed test suite.
#pragma once

#include "contract/message_format.h"
#include "platform/concurrency.h"
#include "platform/hid.h"
#include "platform/run_loop.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace quazor {

// A device of the system: its primary usage page and usage.
struct ConformanceDevice {
  std::uint16_t page = 0xFF00;
  std::uint16_t usage = 0x24;
};

// An input from a device other than a report.
enum class ConformanceEvent { kError, kRemoval };

inline Dictionary hidUsage(Value page, Value usage) {
  return {{std::string(kHidPrimaryUsagePage), std::move(page)}, {std::string(kHidPrimaryUsage), std::move(usage)}};
}

// UnderTest has:
//   void connect(std::vector<ConformanceDevice>, std::map<int, ConformanceEvent>): creates a new system with these
//     devices, in this order. The map contains the inputs that are not reports, by number, starting at 1. All devices
//     have the feature report 0xAB of two bytes.
//   std::shared_ptr<HidManager> manager()
//   void arrive(int count): delivers that many inputs from the only device, which is open. They are numbered from 1
//     for the lifetime of the system. A report has ID 0x76 and its number, little-endian, in bytes 4 to 7.
//   RunLoops& runLoops(), Concurrency& concurrency(): also before connect()
template <class UnderTest>
class HidConformance : public ::testing::Test {
 protected:
  using Device = std::shared_ptr<HidDevice>;
  using Events = std::map<int, ConformanceEvent>;
  static constexpr std::string_view kOtherMode = "org.quazor.other";

  ~HidConformance() override { drop(); }

  // Connects one device whose receiver records inputs: "1" for the report with that number, or "error".
  void connect(const Events& events = {}) {
    drop();
    under_test_.connect({ConformanceDevice{}}, events);
    device_ = only();
    device_->setInputReportCallback(receiver());
  }
  void openAndSchedule(const Events& events = {}) {
    connect(events);
    ASSERT_TRUE(device_->open(nullptr));
    schedule();
  }
  // Releases the device, which may be scheduled, and lets its loop release it.
  void drop() {
    device_ = nullptr;
    run();
    run(kOtherMode);
  }
  std::vector<Device> find(const std::vector<Dictionary>& matching = {Dictionary{}}) {
    const std::shared_ptr<HidManager> manager = under_test_.manager();
    manager->enumerateDevicesMatching(matching);
    return manager->devices();
  }
  Device only() {
    const std::vector<Device> devices = find();
    EXPECT_EQ(devices.size(), 1U);
    return devices.at(0);
  }
  RunLoop& loop() { return *under_test_.runLoops().currentRunLoop(); }
  void schedule(std::string_view mode = kRunLoopDefaultMode) { device_->scheduleWithRunLoop(loop(), mode); }
  void unschedule(std::string_view mode = kRunLoopDefaultMode) { device_->unscheduleFromRunLoop(loop(), mode); }
  RunLoopResult run(std::string_view mode = kRunLoopDefaultMode) {
    return loop().runInMode(mode, std::chrono::nanoseconds::zero(), false);
  }
  // True if the loop has no source to wait for.
  bool isIdle(std::string_view mode = kRunLoopDefaultMode) {
    return loop().runInMode(mode, std::chrono::milliseconds(1), false) == RunLoopResult::kFinished;
  }
  // Makes the call on another thread, which has its own loop, and waits for it to return.
  void onOtherThread(const std::function<void(RunLoop&)>& call) {
    const auto done = under_test_.concurrency().makeSemaphore(0);
    const auto queue = under_test_.concurrency().makeSerialQueue("other", QualityOfService::kDefault);
    queue->async([this, &call, &done] {
      call(*under_test_.runLoops().currentRunLoop());
      done->signal();
    });
    done->wait();
  }
  HidDevice::InputReportCallback receiver() {
    return [this](std::uint8_t id, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
      seen_.push_back(textOf(id, data, error));
      if (onInput_) onInput_();
    };
  }
  static std::string textOf(std::uint8_t id, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
    if (error != nullptr) return id == 0 && data.empty() ? "error" : "error with a report";
    if (id != 0x76 || data.size() < 8 || data[0] != id) return "unknown report";
    return std::to_string(data[4] | data[5] << 8 | data[6] << 16);
  }
  std::vector<std::string> takeSeen() { return std::exchange(seen_, {}); }
  bool setFeature(DiagnosticErrorPtr* error, const Bytes& payload = {0xAB, 1}) {
    return device_->setFeatureReportWithID(0xAB, payload, error);
  }
  // Expects the call to fail and, if it receives an error variable, to set an error with a message.
  template <class Call>
  static void expectFailure(Call&& call, const char* what) {
    DiagnosticErrorPtr error;
    EXPECT_FALSE(call(&error)) << what;
    EXPECT_TRUE(error != nullptr && !error->localizedDescription().empty()) << what;
    EXPECT_FALSE(call(nullptr)) << what;
  }
  void expectOpenFails(const char* what) {
    expectFailure([this](DiagnosticErrorPtr* error) { return device_->open(error); }, what);
  }

  UnderTest under_test_;
  Device device_;
  std::vector<std::string> seen_;
  std::function<void()> onInput_;
};

TYPED_TEST_SUITE_P(HidConformance);

TYPED_TEST_P(HidConformance, ADictionaryMatchesDevicesThatHaveAllItsEntries) {
  this->under_test_.connect({{0xFF00, 0x24}, {0xFF00, 0x25}, {0x01, 0x30}}, {});
  std::map<std::string, int> numbers;
  for (const auto& device : this->find()) numbers.emplace(device->description(), static_cast<int>(numbers.size()));
  ASSERT_EQ(numbers.size(), 3U);
  const struct {
    const char* name;
    std::vector<Dictionary> matching;
    std::vector<int> found;
  } kRows[] = {
      {"page and usage", {hidUsage(0xFF00, 0x24)}, {0}},
      {"unsigned numbers", {hidUsage(0xFF00U, 0x25U)}, {1}},
      {"doubles", {hidUsage(65280.0, 36.0)}, {0}},
      {"a double between", {hidUsage(65280, 36.5)}, {}},
      {"another usage", {hidUsage(0xFF00, 0x26)}, {}},
      {"another page", {hidUsage(2, 0x24)}, {}},
      {"beyond 16 bits", {hidUsage(0x1FF00, 0x24)}, {}},
      {"negative", {hidUsage(-256, 0x24)}, {}},
      {"texts", {hidUsage("65280", "36")}, {}},
      {"page and usage exchanged", {hidUsage(0x24, 0xFF00)}, {}},
      {"only the page", {{{std::string(kHidPrimaryUsagePage), 0xFF00}}}, {0, 1}},
      {"only the usage", {{{std::string(kHidPrimaryUsage), 0x30}}}, {2}},
      {"no entry", {Dictionary{}}, {0, 1, 2}},
      {"an unknown entry", {{{std::string(kHidPrimaryUsage), 0x24}, {"Product", "x"}}}, {}},
      {"several dictionaries", {hidUsage(1, 0x30), hidUsage(0xFF00, 0x24)}, {0, 2}},
      {"dictionaries that match the same", {Dictionary{}, Dictionary{}, hidUsage(0xFF00, 0x24)}, {0, 1, 2}},
      {"no dictionary", {}, {}},
  };
  for (const auto& row : kRows) {
    std::vector<int> found;
    for (const auto& device : this->find(row.matching)) found.push_back(numbers.at(device->description()));
    EXPECT_EQ(found, row.found) << row.name;
  }
}

TYPED_TEST_P(HidConformance, ASystemMayHaveNoDevices) {
  this->under_test_.connect({}, {});
  EXPECT_THAT(this->find(), ::testing::IsEmpty());
}

TYPED_TEST_P(HidConformance, AManagerTellsWhatItsLastEnumerationFound) {
  this->under_test_.connect({{0xFF00, 0x24}, {0xFF00, 0x25}}, {});
  const std::shared_ptr<HidManager> manager = this->under_test_.manager();
  EXPECT_THAT(manager->devices(), ::testing::IsEmpty());
  manager->enumerateDevicesMatching({Dictionary{}});
  EXPECT_THAT(manager->devices(), ::testing::SizeIs(2));
  EXPECT_EQ(manager->devices(), manager->devices());
  manager->enumerateDevicesMatching({hidUsage(0xFF00, 0x25)});
  EXPECT_THAT(manager->devices(), ::testing::SizeIs(1));
  manager->enumerateDevicesMatching({});
  EXPECT_THAT(manager->devices(), ::testing::IsEmpty());
}

TYPED_TEST_P(HidConformance, ADeviceOutlivesItsManager) {
  this->under_test_.connect({ConformanceDevice{}}, {});
  EXPECT_TRUE(this->only()->open(nullptr));
}

TYPED_TEST_P(HidConformance, ADeviceOpensOnceUntilItIsClosed) {
  this->connect();
  this->device_->close(0);
  DiagnosticErrorPtr error = makeError("D", 1, "Here before.");
  EXPECT_TRUE(this->device_->open(&error));
  EXPECT_EQ(error->domain(), "D");
  this->expectOpenFails("open already");
  this->device_->close(0);
  this->device_->close(0);
  EXPECT_TRUE(this->device_->open(nullptr));
}

TYPED_TEST_P(HidConformance, TwoUsersMayHaveADeviceOpen) {
  this->connect();
  const auto other = this->only();
  EXPECT_TRUE(this->device_->open(nullptr));
  EXPECT_TRUE(other->open(nullptr));
  other->close(0);
  this->expectOpenFails("still open");
  EXPECT_TRUE(this->setFeature(nullptr));
}

TYPED_TEST_P(HidConformance, FeatureReportsNeedAnOpenDeviceAndTheirID) {
  this->connect();
  const auto fails = [this](const char* what, const Bytes& payload) {
    this->expectFailure([&](DiagnosticErrorPtr* error) { return this->setFeature(error, payload); }, what);
  };
  fails("not opened", {0xAB, 1});
  ASSERT_TRUE(this->device_->open(nullptr));
  DiagnosticErrorPtr error = makeError("D", 1, "Here before.");
  EXPECT_TRUE(this->setFeature(&error));
  EXPECT_EQ(error->domain(), "D");
  fails("empty", {});
  fails("of another ID", {0xAC, 1});
  EXPECT_TRUE(this->setFeature(nullptr));
  this->device_->close(0);
  fails("closed", {0xAB, 1});
}

TYPED_TEST_P(HidConformance, ReportsReachTheReceiverInOrderWhenTheLoopRuns) {
  this->openAndSchedule();
  this->under_test_.arrive(3);
  EXPECT_THAT(this->seen_, ::testing::IsEmpty());
  EXPECT_EQ(this->run(), RunLoopResult::kTimedOut);
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1", "2", "3"));
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty());
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("4"));
}

TYPED_TEST_P(HidConformance, ReportsThatComeWhileTheDeviceIsNotScheduledOrNotOpenAreLost) {
  this->connect();
  ASSERT_TRUE(this->device_->open(nullptr));
  this->under_test_.arrive(2);
  this->schedule();
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("3"));
  this->under_test_.arrive(1);
  this->unschedule();
  this->under_test_.arrive(1);
  this->run();
  this->schedule();
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("6"));
  this->under_test_.arrive(1);
  this->device_->close(0);
  this->run();
  ASSERT_TRUE(this->device_->open(nullptr));
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("8"));
}

TYPED_TEST_P(HidConformance, ADeviceMayBeScheduledBeforeItIsOpened) {
  this->connect();
  this->schedule();
  EXPECT_FALSE(this->isIdle());
  ASSERT_TRUE(this->device_->open(nullptr));
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1"));
}

TYPED_TEST_P(HidConformance, SchedulingTwiceIsSchedulingOnce) {
  this->openAndSchedule();
  this->under_test_.arrive(1);
  this->schedule();
  this->unschedule(TestFixture::kOtherMode);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1"));
  this->unschedule();
  this->unschedule();
  EXPECT_TRUE(this->isIdle());
}

TYPED_TEST_P(HidConformance, EveryModeOfALoopHandlesWhatWaits) {
  this->openAndSchedule();
  this->under_test_.arrive(1);
  this->schedule(TestFixture::kOtherMode);
  this->run(TestFixture::kOtherMode);
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1"));
  this->under_test_.arrive(1);
  this->unschedule();
  EXPECT_TRUE(this->isIdle());
  this->run(TestFixture::kOtherMode);
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("2"));
}

TYPED_TEST_P(HidConformance, WhatOneModeLeavesWaitsForTheOther) {
  this->openAndSchedule();
  this->schedule(TestFixture::kOtherMode);
  this->onInput_ = [this] { this->unschedule(); };
  this->under_test_.arrive(2);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1"));
  this->run(TestFixture::kOtherMode);
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("2"));
}

TYPED_TEST_P(HidConformance, OfTwoLoopsTheOneThatRunsGetsTheReports) {
  this->openAndSchedule();
  this->onOtherThread([this](RunLoop& other) {
    this->device_->scheduleWithRunLoop(other, kRunLoopDefaultMode);
    this->under_test_.arrive(2);
    other.runInMode(kRunLoopDefaultMode, std::chrono::nanoseconds::zero(), false);
    EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1", "2"));
    this->under_test_.arrive(1);
    this->device_->unscheduleFromRunLoop(other, kRunLoopDefaultMode);
    EXPECT_EQ(other.runInMode(kRunLoopDefaultMode, std::chrono::milliseconds(1), false), RunLoopResult::kFinished);
  });
  EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty());
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("3"));
}

TYPED_TEST_P(HidConformance, WithoutAReceiverReportsAreLost) {
  this->openAndSchedule();
  this->device_->setInputReportCallback(nullptr);
  this->under_test_.arrive(2);
  this->run();
  this->device_->setInputReportCallback(this->receiver());
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("3"));
}

TYPED_TEST_P(HidConformance, AReceiverMayReplaceItselfAndGoesWhenItHasReturned) {
  this->openAndSchedule();
  bool gone = false;
  std::shared_ptr<void> guard(nullptr, [&gone](void*) { gone = true; });
  this->device_->setInputReportCallback([this, &gone, held = std::move(guard)](auto...) {
    this->device_->setInputReportCallback(this->receiver());
    EXPECT_FALSE(gone);
  });
  this->under_test_.arrive(2);
  this->run();
  EXPECT_TRUE(gone);
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("2"));
}

TYPED_TEST_P(HidConformance, AReceiverMayEndItsOwnReports) {
  const struct {
    const char* name;
    std::function<void()> act;
    bool leavesTheLoop;
  } kRows[] = {
      {"unscheduling", [this] { this->unschedule(); }, true},
      {"closing", [this] { this->device_->close(0); }, false},
      {"removing the receiver", [this] { this->device_->setInputReportCallback(nullptr); }, false},
      {"destroying the device", [this] { this->device_ = nullptr; }, true},
  };
  for (const auto& row : kRows) {
    this->onInput_ = nullptr;
    this->openAndSchedule();
    this->onInput_ = row.act;
    this->under_test_.arrive(2);
    this->run();
    EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1")) << row.name;
    EXPECT_EQ(this->isIdle(), row.leavesTheLoop) << row.name;
    EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty()) << row.name;
  }
}

TYPED_TEST_P(HidConformance, AReceiverMayRunTheLoopAndGetTheNextReportThere) {
  this->openAndSchedule();
  this->onInput_ = [this] {
    const std::string mine = this->seen_.back();
    if (this->seen_.size() < 3) this->run();
    this->seen_.push_back("after " + mine);
  };
  this->under_test_.arrive(3);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1", "2", "3", "after 3", "after 2", "after 1"));
}

TYPED_TEST_P(HidConformance, ADeviceThatIsDroppedLeavesItsLoops) {
  this->openAndSchedule();
  this->schedule(TestFixture::kOtherMode);
  this->under_test_.arrive(1);
  this->device_ = nullptr;
  EXPECT_TRUE(this->isIdle());
  EXPECT_TRUE(this->isIdle(TestFixture::kOtherMode));
  EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty());
}

TYPED_TEST_P(HidConformance, AnErrorComesInPlaceOfAReport) {
  this->openAndSchedule({{2, ConformanceEvent::kError}});
  this->under_test_.arrive(1);
  this->run();
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1", "error"));
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty());
  this->device_->close(0);
  ASSERT_TRUE(this->device_->open(nullptr));
  this->under_test_.arrive(1);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("3"));
}

TYPED_TEST_P(HidConformance, ARemovedDeviceGivesWhatWaitsAndThenOneError) {
  this->openAndSchedule({{3, ConformanceEvent::kRemoval}});
  this->under_test_.arrive(3);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("1", "2", "error"));
  this->run();
  this->unschedule();
  this->schedule();
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty());
  this->expectFailure([this](DiagnosticErrorPtr* error) { return this->setFeature(error); }, "a feature report");
  this->device_->close(0);
  this->expectOpenFails("gone");
  EXPECT_THAT(this->find(), ::testing::IsEmpty());
}

TYPED_TEST_P(HidConformance, ADeviceThatWasRemovedBeforeItIsScheduledTellsSo) {
  this->connect({{2, ConformanceEvent::kRemoval}});
  ASSERT_TRUE(this->device_->open(nullptr));
  this->under_test_.arrive(2);
  this->schedule();
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("error"));
}

TYPED_TEST_P(HidConformance, ARemovalThatIsNotHandledIsToldWhereTheDeviceIsScheduledNext) {
  this->openAndSchedule({{2, ConformanceEvent::kRemoval}});
  this->under_test_.arrive(2);
  this->unschedule();
  this->schedule(TestFixture::kOtherMode);
  this->run(TestFixture::kOtherMode);
  EXPECT_THAT(this->takeSeen(), ::testing::ElementsAre("error"));
}

TYPED_TEST_P(HidConformance, AClosedDeviceTellsNothingOfItsRemoval) {
  this->openAndSchedule({{2, ConformanceEvent::kRemoval}});
  this->under_test_.arrive(2);
  this->device_->close(0);
  this->run();
  EXPECT_THAT(this->takeSeen(), ::testing::IsEmpty());
}

REGISTER_TYPED_TEST_SUITE_P(
    HidConformance, ADictionaryMatchesDevicesThatHaveAllItsEntries, ASystemMayHaveNoDevices,
    AManagerTellsWhatItsLastEnumerationFound, ADeviceOutlivesItsManager, ADeviceOpensOnceUntilItIsClosed,
    TwoUsersMayHaveADeviceOpen, FeatureReportsNeedAnOpenDeviceAndTheirID, ReportsReachTheReceiverInOrderWhenTheLoopRuns,
    ReportsThatComeWhileTheDeviceIsNotScheduledOrNotOpenAreLost, ADeviceMayBeScheduledBeforeItIsOpened,
    SchedulingTwiceIsSchedulingOnce, EveryModeOfALoopHandlesWhatWaits, WhatOneModeLeavesWaitsForTheOther,
    OfTwoLoopsTheOneThatRunsGetsTheReports, WithoutAReceiverReportsAreLost,
    AReceiverMayReplaceItselfAndGoesWhenItHasReturned, AReceiverMayEndItsOwnReports,
    AReceiverMayRunTheLoopAndGetTheNextReportThere, ADeviceThatIsDroppedLeavesItsLoops, AnErrorComesInPlaceOfAReport,
    ARemovedDeviceGivesWhatWaitsAndThenOneError, ADeviceThatWasRemovedBeforeItIsScheduledTellsSo,
    ARemovalThatIsNotHandledIsToldWhereTheDeviceIsScheduledNext, AClosedDeviceTellsNothingOfItsRemoval);

}  // namespace quazor
