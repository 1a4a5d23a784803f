#include "diagnostics/report_channels/tessel_telemon_experiment.h"

#include "diagnostics/report_channels/expectations_for_tests.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <iterator>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using testing::ElementsAre;

struct Channel {
  ReportChannelDescription description;
  std::optional<Value> count;
};
using Channels = std::vector<Channel>;

// The channels of a facility, the outcome of its calls, and a list of the calls.
struct FacilityState {
  Channels channels;
  bool hasSet = true;
  bool hasSnapshot = true;
  DiagnosticErrorPtr setError;       // stored by the call for the set whether it succeeds or fails
  DiagnosticErrorPtr snapshotError;  // stored by the call for a snapshot whether it succeeds or fails
  std::vector<std::string> calls;
};

class FakeSnapshot final : public ReportSnapshot {
 public:
  FakeSnapshot(std::shared_ptr<FacilityState> state, const Channels& channels) : state_(std::move(state)) {
    for (const Channel& channel : channels) {
      samples_.emplace_back(
          ReportChannel(std::make_shared<ReportChannelDescription>(channel.description), channel.count));
    }
  }

  const std::vector<ReportSample>& samples() const override {
    state_->calls.push_back("samples");
    return samples_;
  }
  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& /*baseline*/,
                                                             DiagnosticErrorPtr* /*error*/) const override {
    state_->calls.push_back("snapshotWithBaseline");
    return nullptr;
  }

 private:
  std::shared_ptr<FacilityState> state_;
  std::vector<ReportSample> samples_;
};

class FakeChannelSet final : public ReportChannelSet {
 public:
  FakeChannelSet(std::shared_ptr<FacilityState> state, Channels channels)
      : state_(std::move(state)), channels_(std::move(channels)) {}

  std::shared_ptr<const ReportChannelSet> reportByFilteringChannels(const Predicate& keep) const override {
    Channels kept;
    for (const Channel& channel : channels_) {
      if (keep(channel.description)) kept.push_back(channel);
    }
    state_->calls.push_back("filter to " + std::to_string(kept.size()));
    return std::make_shared<FakeChannelSet>(state_, std::move(kept));
  }
  std::shared_ptr<const ReportSnapshot> snapshot(DiagnosticErrorPtr* error) const override {
    state_->calls.push_back("snapshot of " + std::to_string(channels_.size()));
    if (state_->snapshotError != nullptr) storeError(error, state_->snapshotError);
    if (!state_->hasSnapshot) return nullptr;
    return std::make_shared<FakeSnapshot>(state_, channels_);
  }

 private:
  std::shared_ptr<FacilityState> state_;
  Channels channels_;
};

class FakeFacility final : public ReportFacility {
 public:
  explicit FakeFacility(std::shared_ptr<FacilityState> state) : state_(std::move(state)) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override {
    state_->calls.push_back("simple channels");
    if (state_->setError != nullptr) storeError(error, state_->setError);
    if (!state_->hasSet) return nullptr;
    return std::make_shared<FakeChannelSet>(state_, state_->channels);
  }

 private:
  std::shared_ptr<FacilityState> state_;
};

Channel event(std::string name, std::optional<Value> count) {
  return {{"K42ISP", "K42ISP Events", std::move(name)}, std::move(count)};
}

class TesselTelemonExperiment : public testing::Test {
 protected:
  Platform platform() const {
    Platform platform;
    platform.reports = std::make_shared<FakeFacility>(facility);
    return platform;
  }
  std::unique_ptr<QZExperimentResult> run(DiagnosticErrorPtr* error) const {
    return QZTesselTelemonExperiment(platform()).run(error);
  }
  std::string toldRun() const {
    const auto result = run(nullptr);
    return result == nullptr ? "nothing" : told(*result);
  }
  // The error of a run that gives nothing, in place of the earlier one.
  DiagnosticErrorPtr failure() const {
    DiagnosticErrorPtr error = earlier;
    EXPECT_EQ(run(&error), nullptr);
    return error;
  }

  const std::shared_ptr<FacilityState> facility = std::make_shared<FacilityState>();
  const DiagnosticErrorPtr earlier = earlierError();
  const DiagnosticErrorPtr facilityError = makeError("FacilityErrorDomain", -5, "The kernel said no.");
};

TEST_F(TesselTelemonExperiment, DescribesItselfWithoutParameters) {
  const QZDescription description = QZTesselTelemonExperiment(platform()).experimentDescription();
  EXPECT_EQ(description.summary(), "Check for any Tessel Telemons.");
  EXPECT_TRUE(description.parameters().empty());
  EXPECT_TRUE(facility->calls.empty());
}

TEST_F(TesselTelemonExperiment, NeedsNoSetupAndHasNoTeardown) {
  const std::unique_ptr<QZExperiment> experiment = std::make_unique<QZTesselTelemonExperiment>(platform());
  DiagnosticErrorPtr error = earlier;
  EXPECT_TRUE(experiment->setupWithParameters(Dictionary(), nullptr, &error));
  EXPECT_EQ(error, earlier);
  EXPECT_EQ(dynamic_cast<QZTeardown*>(experiment.get()), nullptr);
  EXPECT_TRUE(facility->calls.empty());
}

TEST_F(TesselTelemonExperiment, SamplesTheFilteredChannelsOnce) {
  facility->channels = {event("a", 1), event("b", 2), {{"Camera", "K42ISP Events", "c"}, 3}};
  ASSERT_NE(run(nullptr), nullptr);
  EXPECT_THAT(facility->calls, ElementsAre("simple channels", "filter to 2", "snapshot of 2", "samples"));
}

TEST_F(TesselTelemonExperiment, RecordsEveryCountInEventsUnderTheChannelsNameInTheFacilitysOrder) {
  facility->channels = {event("Number Fenk NTC", 3), event("Number Dwna NTC", 0), event("Number ZE FAULT_A", 12)};
  DiagnosticErrorPtr error = earlier;
  const auto result = run(&error);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), "Number Fenk NTC = 3 events\nNumber Dwna NTC = 0 events\nNumber ZE FAULT_A = 12 events\n");
  EXPECT_TRUE(result->auxiliaryData().empty());
  EXPECT_EQ(error, earlier);
}

TEST_F(TesselTelemonExperiment, TakesTheChannelsOfThePresenceReport) {
  facility->channels = {
      {{"K42ISP", "K42ISP Events", "both exact"}, 1},
      {{"K42ISP", "K42ISP Events (front)", "longer subgroup"}, 2},
      {{"The K42ISP driver", "K42ISP Events", "longer group"}, 3},
      {{"Camera", "K42ISP Events", "another group"}, 4},
      {{"K42ISP", "K42ISP Power", "another subgroup"}, 5},
  };
  EXPECT_EQ(toldRun(), "both exact = 1 events\nlonger subgroup = 2 events\nlonger group = 3 events\n");
}

TEST_F(TesselTelemonExperiment, LeavesChannelsOutsideTheReportAloneEvenWithoutACount) {
  facility->channels = {{{"Camera", "K42ISP Events", "another group"}, std::nullopt}, event("a", 1)};
  EXPECT_EQ(toldRun(), "a = 1 events\n");
}

TEST_F(TesselTelemonExperiment, TakesTheLaterOfTwoChannelsWithOneName) {
  facility->channels = {
      event("twice", 1), event("once", 2), {{"K42ISP", "K42ISP Events (front)", "twice"}, 9}, event("last", 3)};
  EXPECT_EQ(toldRun(), "twice = 9 events\nonce = 2 events\nlast = 3 events\n");
}

TEST_F(TesselTelemonExperiment, ReadsACountOfAnyKindOfNumberAsADouble) {
  facility->channels = {event("negative", -7),  event("unsigned", std::numeric_limits<std::uint64_t>::max()),
                        event("double", 0.5),   event("float", 1.25F),
                        event("boolean", true), event("lowest", std::numeric_limits<std::int64_t>::min())};
  const auto result = run(nullptr);
  ASSERT_NE(result, nullptr);
  const struct {
    const char* name;
    double count;
  } rows[] = {{"negative", -7.0}, {"unsigned", 0x1p64}, {"double", 0.5},
              {"float", 1.25},    {"boolean", 1.0},     {"lowest", -0x1p63}};
  EXPECT_EQ(result->measurements().size(), std::size(rows));
  for (const auto& row : rows) {
    const Measurement* measured = result->measurements().find(row.name);
    ASSERT_NE(measured, nullptr) << row.name;
    EXPECT_EQ(*measured, Measurement(row.count, QZDimensionlessUnit::events())) << row.name;
  }
}

TEST_F(TesselTelemonExperiment, GivesAnEmptyResultWhenNoChannelMatches) {
  facility->channels = {{{"Camera", "Power", "a"}, 1}};
  DiagnosticErrorPtr error = earlier;
  const auto result = run(&error);
  ASSERT_NE(result, nullptr);
  EXPECT_TRUE(result->measurements().empty());
  EXPECT_TRUE(result->auxiliaryData().empty());
  EXPECT_EQ(error, earlier);
  EXPECT_THAT(facility->calls, ElementsAre("simple channels", "filter to 0", "snapshot of 0", "samples"));
}

TEST_F(TesselTelemonExperiment, FailsWithoutSimpleChannels) {
  facility->hasSet = false;
  facility->setError = facilityError;
  const DiagnosticErrorPtr error = failure();
  EXPECT_EQ(told(error),
            "QZTelemonErrorDomain 100 Could not get simple channels. "
            "{underlying-error: FacilityErrorDomain code -5: The kernel said no.}");
  EXPECT_EQ(error->underlyingError(), facilityError);
  EXPECT_THAT(facility->calls, ElementsAre("simple channels"));
}

TEST_F(TesselTelemonExperiment, FailsWithoutASnapshot) {
  facility->channels = {event("a", 1)};
  facility->hasSnapshot = false;
  facility->snapshotError = facilityError;
  const DiagnosticErrorPtr error = failure();
  EXPECT_EQ(told(error),
            "QZTelemonErrorDomain 100 Could not sample the report. "
            "{underlying-error: FacilityErrorDomain code -5: The kernel said no.}");
  EXPECT_EQ(error->underlyingError(), facilityError);
  EXPECT_THAT(facility->calls, ElementsAre("simple channels", "filter to 1", "snapshot of 1"));
}

TEST_F(TesselTelemonExperiment, FailsAtTheFirstChannelWithoutACount) {
  facility->channels = {event("a", 1), event("Number KT %@ %d", std::nullopt), event("b", std::nullopt)};
  EXPECT_EQ(told(failure()), "QZTelemonErrorDomain 100 Could not get the count of Number KT %@ %d.");
}

// An error that was stored before the call, or by a successful call, is not the cause.
TEST_F(TesselTelemonExperiment, GivesNoUnderlyingErrorThatTheFailedCallDidNotGive) {
  facility->hasSet = false;
  EXPECT_EQ(told(failure()), "QZTelemonErrorDomain 100 Could not get simple channels.");

  facility->hasSet = true;
  facility->setError = facilityError;
  facility->hasSnapshot = false;
  EXPECT_EQ(told(failure()), "QZTelemonErrorDomain 100 Could not sample the report.");

  facility->hasSnapshot = true;
  facility->snapshotError = facilityError;
  facility->channels = {event("a", std::nullopt)};
  EXPECT_EQ(told(failure()), "QZTelemonErrorDomain 100 Could not get the count of a.");
}

TEST_F(TesselTelemonExperiment, SucceedsWhenACallGaveAnErrorAndAResult) {
  facility->channels = {event("a", 1)};
  facility->setError = facilityError;
  facility->snapshotError = facilityError;
  DiagnosticErrorPtr error = earlier;
  const auto result = run(&error);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), "a = 1 events\n");
  EXPECT_EQ(error, earlier);
}

TEST_F(TesselTelemonExperiment, FailsJustSoForACallerThatWantsNoError) {
  facility->channels = {event("a", std::nullopt)};
  EXPECT_EQ(run(nullptr), nullptr);
  facility->snapshotError = facilityError;
  facility->hasSnapshot = false;
  EXPECT_EQ(run(nullptr), nullptr);
  facility->setError = facilityError;
  facility->hasSet = false;
  EXPECT_EQ(run(nullptr), nullptr);
}

TEST_F(TesselTelemonExperiment, UsesTheInstalledPlatformUnlessHandedAnother) {
  facility->channels = {event("installed", 1)};
  const Platform before = installedPlatform();
  installPlatform(platform());
  const auto result = QZTesselTelemonExperiment().run(nullptr);
  installPlatform(before);
  ASSERT_NE(result, nullptr);
  EXPECT_EQ(told(*result), "installed = 1 events\n");
}

}  // namespace
}  // namespace quazor
