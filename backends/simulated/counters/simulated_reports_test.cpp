#include "backends/simulated/counters/simulated_reports.h"

#include "backends/faults/operations.h"
#include "backends/simulated/errors/report_error.h"
#include "backends/simulated/phone_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <limits>
#include <memory>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;

ReportChannelConfig channel(const char* group, const char* subGroup, const char* name,
                            std::optional<std::uint64_t> count) {
  ReportChannelConfig config;
  config.group = group;
  config.subGroup = subGroup;
  config.name = name;
  config.count = count;
  return config;
}

class SimulatedReportsTest : public ::testing::Test {
 protected:
  using Set = std::shared_ptr<const ReportChannelSet>;
  using Snapshot = std::shared_ptr<const ReportSnapshot>;

  void make(std::vector<ReportChannelConfig> channels) {
    Scenario scenario = smallScenario();
    scenario.reports = std::move(channels);
    phone_.emplace(scenario, PhoneTime::kVirtual, 1);
    user_.emplace(*phone_);
    user_->control(user_->streams);
  }
  Set simple() { return phone_->platform().reports->reportWithOnlySimpleChannels(nullptr); }
  void pass(std::chrono::nanoseconds time) { phone_->platform().clock->sleep(time); }
  void fault(std::string operation) {
    Fault fault;
    fault.operation = std::move(operation);
    phone_->addFault(fault);
  }
  static std::vector<std::string> texts(const Snapshot& snapshot) {
    std::vector<std::string> texts;
    for (const ReportSample& sample : snapshot->samples()) {
      const ReportChannelDescription& description = sample.channel().channelDescription();
      texts.push_back(description.groupName + "/" + description.subGroupName + "/" + description.name + " " +
                      defaultText(sample.channel().count()));
    }
    return texts;
  }
  // Only the counts.
  static std::vector<std::string> counts(const Snapshot& snapshot) {
    std::vector<std::string> counts;
    for (const ReportSample& sample : snapshot->samples()) counts.push_back(defaultText(sample.channel().count()));
    return counts;
  }

  std::optional<SimulatedPhone> phone_;
  std::optional<PhoneUser> user_;
};

std::string reportRefusal(ReportErrorCode code, std::string_view message) {
  return formatMessage("%@ code %@: %@", SimulatedReportErrorDomain, static_cast<std::int64_t>(code), message);
}

TEST_F(SimulatedReportsTest, ASnapshotHasTheChannelsInTheScenariosOrder) {
  make({channel("B", "s", "x", 3), channel("A", "s", "x", std::nullopt), channel("B", "r", "a", 0)});
  EXPECT_THAT(texts(simple()->snapshot(nullptr)), ElementsAre("B/s/x 3", "A/s/x (null)", "B/r/a 0"));
}

TEST_F(SimulatedReportsTest, APhoneMayHaveNoChannels) {
  make({});
  EXPECT_THAT(texts(simple()->snapshot(nullptr)), testing::IsEmpty());
}

TEST_F(SimulatedReportsTest, FilteringMakesANewSetAndLeavesTheOldOne) {
  make({channel("A", "s", "x", 1), channel("A", "t", "y", 2), channel("B", "s", "z", 3)});
  const Set all = simple();
  const Set some = all->reportByFilteringChannels([](const auto& channel) { return channel.subGroupName == "s"; });
  const Set one = some->reportByFilteringChannels([](const auto& channel) { return channel.groupName == "B"; });
  EXPECT_THAT(counts(all->snapshot(nullptr)), ElementsAre("1", "2", "3"));
  EXPECT_THAT(counts(some->snapshot(nullptr)), ElementsAre("1", "3"));
  EXPECT_THAT(counts(one->snapshot(nullptr)), ElementsAre("3"));
}

TEST_F(SimulatedReportsTest, CountsGrowWhileAnyStreamRuns) {
  ReportChannelConfig growing = channel("A", "s", "growing", 5);
  growing.growth = 10;
  ReportChannelConfig stepping = channel("A", "s", "stepping", 0);
  stepping.steps = {{250ms, 1}, {1s, 7}};
  make({growing, stepping, channel("A", "s", "still", 2)});
  const Set set = simple();
  const auto now = [&] { return counts(set->snapshot(nullptr)); };
  pass(1s);
  EXPECT_THAT(now(), ElementsAre("5", "0", "2"));
  ASSERT_TRUE(user_->wide().start(nullptr));
  pass(250ms);
  EXPECT_THAT(now(), ElementsAre("7", "1", "2"));
  ASSERT_TRUE(user_->tele().start(nullptr));
  pass(250ms);
  ASSERT_TRUE(user_->wide().stop(nullptr));
  pass(500ms - 1ns);
  EXPECT_THAT(now(), ElementsAre("14", "1", "2"));
  pass(1ns);
  EXPECT_THAT(now(), ElementsAre("15", "8", "2"));
  ASSERT_TRUE(user_->device->invalidate(nullptr));
  pass(5s);
  EXPECT_THAT(now(), ElementsAre("15", "8", "2"));
}

TEST_F(SimulatedReportsTest, ADeltaIsTheLaterCountMinusTheBaselines) {
  ReportChannelConfig growing = channel("A", "s", "growing", 5);
  growing.growth = 10;
  ReportChannelConfig wrapping = channel("A", "s", "wrapping", std::numeric_limits<std::uint64_t>::max());
  wrapping.growth = 2;
  make({growing, channel("A", "s", "still", 9), channel("A", "s", "without", std::nullopt), wrapping});
  const Set set = simple();
  const Snapshot baseline = set->snapshot(nullptr);
  ASSERT_TRUE(user_->wide().start(nullptr));
  pass(2s);
  const Snapshot later = set->snapshot(nullptr);
  EXPECT_EQ(counts(later).back(), "3");
  EXPECT_THAT(texts(later->snapshotWithBaseline(*baseline, nullptr)),
              ElementsAre("A/s/growing 20", "A/s/still 0", "A/s/without (null)", "A/s/wrapping 4"));
}

TEST_F(SimulatedReportsTest, ABaselineMustBeOfTheSameChannels) {
  make({channel("A", "s", "x", 1), channel("A", "t", "y", 2)});
  const auto keepsS = [](const ReportChannelDescription& channel) { return channel.subGroupName == "s"; };
  const Set all = simple();
  const Snapshot whole = all->snapshot(nullptr);
  const Snapshot part = all->reportByFilteringChannels(keepsS)->snapshot(nullptr);
  const Snapshot samePart = all->reportByFilteringChannels(keepsS)->snapshot(nullptr);
  EXPECT_THAT(counts(part->snapshotWithBaseline(*samePart, nullptr)), ElementsAre("0"));
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return part->snapshotWithBaseline(*whole, error); }),
            reportRefusal(ReportErrorCode::kForeignBaseline,
                          "The baseline is a snapshot of other channels; take both snapshots of one set."));
}

TEST_F(SimulatedReportsTest, FaultsReachWhatCanFail) {
  make({channel("A", "s", "x", 1)});
  const Set set = simple();
  const Snapshot snapshot = set->snapshot(nullptr);
  for (const Operation& operation : kOperations) {
    if (operation.service == OperationService::kReports) fault(std::string(operation.name));
  }
  const auto injected = [](const std::string& what) {
    return reportRefusal(ReportErrorCode::kInjected, what + " failed.");
  };
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) {
              return phone_->platform().reports->reportWithOnlySimpleChannels(error);
            }),
            injected("ReportFacility.reportWithOnlySimpleChannels"));
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return set->snapshot(error); }),
            injected("ReportChannelSet.snapshot"));
  EXPECT_EQ(outcome([&](DiagnosticErrorPtr* error) { return snapshot->snapshotWithBaseline(*snapshot, error); }),
            injected("ReportSnapshot.snapshotWithBaseline"));
  for (const FaultStatus& status : phone_->faultStatus()) EXPECT_EQ(status.fired, 1U) << status.fault.operation;
}

TEST_F(SimulatedReportsTest, CallsAreObserved) {
  make({channel("A", "s", "x", 1), channel("A", "s", "y", 1)});
  std::vector<std::string> calls;
  phone_->observeCalls([&](const PlatformCall& call) {
    calls.push_back(call.operation + (call.detail.empty() ? "" : " " + call.detail));
  });
  const Set set = simple()->reportByFilteringChannels([](const auto& channel) { return channel.name == "x"; });
  const Snapshot baseline = set->snapshot(nullptr);
  static_cast<void>(set->snapshot(nullptr)->snapshotWithBaseline(*baseline, nullptr));
  EXPECT_THAT(calls, ElementsAre("ReportFacility.reportWithOnlySimpleChannels",
                                 "ReportChannelSet.reportByFilteringChannels 1", "ReportChannelSet.snapshot",
                                 "ReportChannelSet.snapshot", "ReportSnapshot.snapshotWithBaseline"));
}

TEST_F(SimulatedReportsTest, SnapshotsOutliveThePhone) {
  make({channel("A", "s", "x", 4)});
  const Set set = simple();
  user_.reset();
  phone_.reset();
  EXPECT_THAT(counts(set->snapshot(nullptr)), ElementsAre("4"));
}

TEST_F(SimulatedReportsTest, ErrorCountersGrowWithTheirStream) {
  Scenario scenario = smallScenario();
  scenario.cameras[0].errorCounters = Dictionary{{"SIFErrorCount", 10U}};
  scenario.cameras[0].errorCounterGrowth = Dictionary{{"SIFErrorCount", 4U}, {"NewErrorCount", 1U}};
  phone_.emplace(scenario, PhoneTime::kVirtual, 1);
  user_.emplace(*phone_);
  ASSERT_TRUE(user_->control({user_->streams[0]}));
  const auto read = [&] { return defaultText(user_->wide().valueForProperty(capture_key::ErrorCounters, nullptr)); };
  EXPECT_EQ(read(), "{SIFErrorCount = 10}");
  ASSERT_TRUE(user_->wide().start(nullptr));
  pass(1500ms);
  EXPECT_EQ(read(), "{SIFErrorCount = 16; NewErrorCount = 1}");
  ASSERT_TRUE(user_->wide().stop(nullptr));
  pass(5s);
  EXPECT_EQ(read(), "{SIFErrorCount = 16; NewErrorCount = 1}");
}

}  // namespace
}  // namespace quazor
