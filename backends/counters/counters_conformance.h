// Requirements on every report facility, as a typed test suite.
#pragma once

#include "contract/message_format.h"
#include "platform/report_facility.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {

// A channel and its count before and after UnderTest::advance(); nothing if it has no count at that time.
struct ConformanceChannel {
  std::string group;
  std::string subGroup;
  std::string name;
  std::optional<std::uint64_t> before;
  std::optional<std::uint64_t> after;
};

// A channel in an arbitrary group with a constant count.
inline ConformanceChannel steadyChannel(std::string name, std::uint64_t count) {
  return {"g", "s", std::move(name), count, count};
}

// A snapshot that does not belong to the facility under test.
class ForeignSnapshot final : public ReportSnapshot {
 public:
  const std::vector<ReportSample>& samples() const override { return samples_; }
  std::shared_ptr<const ReportSnapshot> snapshotWithBaseline(const ReportSnapshot& /*baseline*/,
                                                             DiagnosticErrorPtr* /*error*/) const override {
    return nullptr;
  }

 private:
  std::vector<ReportSample> samples_;
};

// UnderTest has:
//   void make(std::vector<ConformanceChannel>): creates the channels of the system, in this order; `before` and `after`
//     are both numbers or both nothing
//   std::shared_ptr<ReportFacility> facility(): with these channels
//   void advance(): moves all channels to their count after it
//   void failEnumeration(), void failSnapshot(): the next call fails with an error
//   void recover(): calls succeed again
template <class UnderTest>
class CountersConformance : public ::testing::Test {
 protected:
  using Set = std::shared_ptr<const ReportChannelSet>;
  using Snapshot = std::shared_ptr<const ReportSnapshot>;
  using Texts = std::vector<std::string>;

  Set make(std::vector<ConformanceChannel> channels) {
    under_test_.make(std::move(channels));
    return enumerate();
  }
  Set enumerate() {
    const Set set = under_test_.facility()->reportWithOnlySimpleChannels(nullptr);
    EXPECT_NE(set, nullptr);
    return set;
  }
  static Snapshot snapshotOf(const Set& set) {
    Snapshot snapshot = set->snapshot(nullptr);
    EXPECT_NE(snapshot, nullptr);
    return snapshot;
  }
  Texts deltaAfterAdvance(const Set& set) {
    const Snapshot baseline = snapshotOf(set);
    under_test_.advance();
    return texts(snapshotOf(set)->snapshotWithBaseline(*baseline, nullptr));
  }
  // "GROUP/SUBGROUP/NAME COUNT" of each sample.
  static Texts texts(const Snapshot& snapshot) {
    if (snapshot == nullptr) return {"no snapshot"};
    Texts texts;
    for (const ReportSample& sample : snapshot->samples()) {
      const ReportChannelDescription& one = sample.channel().channelDescription();
      texts.push_back(one.groupName + "/" + one.subGroupName + "/" + one.name + " " +
                      defaultText(sample.channel().count()));
    }
    return texts;
  }
  static Texts now(const Set& set) { return texts(snapshotOf(set)); }
  // Expects the call to fail and, if it receives an error variable, to set an error with a message.
  template <class Call>
  static void expectFailure(Call&& call, const char* what) {
    DiagnosticErrorPtr error;
    EXPECT_EQ(call(&error), nullptr) << what;
    EXPECT_TRUE(error != nullptr && !error->localizedDescription().empty()) << what;
  }

  UnderTest under_test_;
};

TYPED_TEST_SUITE_P(CountersConformance);

TYPED_TEST_P(CountersConformance, SamplesComeInTheOrderOfTheChannelsWithTheirNames) {
  const auto set = this->make({{"B", "s", "x", 3, 3}, {"A", "s t", "x", 0, 0}, {"B", "r", "Number a", 7, 7}});
  EXPECT_THAT(this->now(set), ::testing::ElementsAre("B/s/x 3", "A/s t/x 0", "B/r/Number a 7"));
}

TYPED_TEST_P(CountersConformance, CountsAreUnsignedNumbersOf64Bits) {
  const auto set = this->make({steadyChannel("most", std::numeric_limits<std::uint64_t>::max())});
  const std::optional<Value> count = this->snapshotOf(set)->samples().at(0).channel().count();
  ASSERT_TRUE(count && count->isNumber());
  EXPECT_EQ(toUnsigned(&*count), std::numeric_limits<std::uint64_t>::max());
}

TYPED_TEST_P(CountersConformance, AChannelWithoutACountIsSampledWithoutOne) {
  const auto set = this->make({{"g", "s", "none", std::nullopt, std::nullopt}, steadyChannel("one", 1)});
  EXPECT_THAT(this->now(set), ::testing::ElementsAre("g/s/none (null)", "g/s/one 1"));
  EXPECT_THAT(this->deltaAfterAdvance(set), ::testing::ElementsAre("g/s/none (null)", "g/s/one 0"));
}

TYPED_TEST_P(CountersConformance, ChannelsOfOneNameAreAllThere) {
  const auto set = this->make({{"A", "s", "x", 1, 1}, {"A", "t", "x", 2, 2}, {"A", "s", "x", 3, 3}});
  EXPECT_THAT(this->now(set), ::testing::ElementsAre("A/s/x 1", "A/t/x 2", "A/s/x 3"));
  const auto inS = set->reportByFilteringChannels([](const auto& one) { return one.subGroupName == "s"; });
  EXPECT_THAT(this->now(inS), ::testing::ElementsAre("A/s/x 1", "A/s/x 3"));
}

TYPED_TEST_P(CountersConformance, AFilterAsksForEveryChannelOfItsSetInOrder) {
  const auto set = this->make({steadyChannel("b", 1), steadyChannel("a", 2), steadyChannel("c", 3)});
  std::vector<std::string> asked;
  const auto ask = [&asked](bool keep) {
    return [&asked, keep](const ReportChannelDescription& one) {
      asked.push_back(one.groupName + "/" + one.subGroupName + "/" + one.name);
      return keep && one.name != "a";
    };
  };
  const auto filtered = set->reportByFilteringChannels(ask(true));
  EXPECT_THAT(asked, ::testing::ElementsAre("g/s/b", "g/s/a", "g/s/c"));
  asked.clear();
  static_cast<void>(filtered->reportByFilteringChannels(ask(false)));
  EXPECT_THAT(asked, ::testing::ElementsAre("g/s/b", "g/s/c"));
}

TYPED_TEST_P(CountersConformance, FilteringMakesANewSetAndLeavesTheOldOne) {
  const auto all = this->make({{"A", "s", "x", 1, 1}, {"A", "t", "y", 2, 2}, {"B", "s", "z", 3, 3}});
  const auto some = all->reportByFilteringChannels([](const auto& one) { return one.subGroupName == "s"; });
  const auto one = some->reportByFilteringChannels([](const auto& channel) { return channel.groupName == "B"; });
  EXPECT_THAT(this->now(one), ::testing::ElementsAre("B/s/z 3"));
  EXPECT_THAT(this->now(some), ::testing::ElementsAre("A/s/x 1", "B/s/z 3"));
  EXPECT_THAT(this->now(all), ::testing::ElementsAre("A/s/x 1", "A/t/y 2", "B/s/z 3"));
}

TYPED_TEST_P(CountersConformance, ASetWithoutChannelsHasSnapshotsWithoutSamples) {
  const auto full = this->make({steadyChannel("a", 1)});
  const auto filtered = full->reportByFilteringChannels([](const auto&) { return false; });
  EXPECT_THAT(this->now(filtered), ::testing::IsEmpty());
  EXPECT_THAT(this->deltaAfterAdvance(filtered), ::testing::IsEmpty());
  EXPECT_THAT(this->now(this->make({})), ::testing::IsEmpty());
}

TYPED_TEST_P(CountersConformance, ADifferenceIsTheLaterCountMinusTheBaselines) {
  constexpr std::uint64_t kMax = std::numeric_limits<std::uint64_t>::max();
  const struct {
    const char* what;
    std::uint64_t before;
    std::uint64_t after;
    const char* delta;
  } kRows[] = {
      {"no step", 5, 5, "0"},
      {"growth", 5, 9, "4"},
      {"growth by all 64 bits", 0, kMax, "18446744073709551615"},
      {"growth above what a double holds", 9007199254740993, 9007199254740996, "3"},
      {"growth by more than a signed number holds", 1, kMax - 1, "18446744073709551613"},
      {"a fall", 9, 5, "-4"},
      {"a fall to zero", 1'000'000, 0, "-1000000"},
      {"a fall by half of the numbers", std::uint64_t{1} << 63U, 0, "-9223372036854775808"},
      {"round the end", kMax, 4, "5"},
      {"a fall by more than half of the numbers", (std::uint64_t{1} << 63U) + 1, 0, "9223372036854775807"},
  };
  for (const auto& row : kRows) {
    const auto set = this->make({{"g", "s", "n", row.before, row.after}});
    EXPECT_THAT(this->deltaAfterAdvance(set), ::testing::ElementsAre("g/s/n " + std::string(row.delta))) << row.what;
  }
}

TYPED_TEST_P(CountersConformance, SnapshotsDoNotChange) {
  const auto set = this->make({{"g", "s", "n", 5, 9}});
  const auto baseline = this->snapshotOf(set);
  this->under_test_.advance();
  const auto later = this->snapshotOf(set);
  const auto delta = later->snapshotWithBaseline(*baseline, nullptr);
  EXPECT_THAT(this->texts(baseline), ::testing::ElementsAre("g/s/n 5"));
  EXPECT_THAT(this->texts(later), ::testing::ElementsAre("g/s/n 9"));
  EXPECT_THAT(this->texts(delta), ::testing::ElementsAre("g/s/n 4"));
  EXPECT_THAT(this->texts(baseline->snapshotWithBaseline(*later, nullptr)), ::testing::ElementsAre("g/s/n -4"));
  EXPECT_THAT(this->texts(later->snapshotWithBaseline(*later, nullptr)), ::testing::ElementsAre("g/s/n 0"));
}

TYPED_TEST_P(CountersConformance, ABaselineIsOfTheSameChannelsOfOneEnumeration) {
  const auto set = this->make({steadyChannel("a", 1), steadyChannel("b", 2)});
  const auto isA = [](const auto& one) { return one.name == "a"; };
  const auto later = this->snapshotOf(set->reportByFilteringChannels(isA));
  const auto equal = this->snapshotOf(set->reportByFilteringChannels(isA));
  EXPECT_THAT(this->texts(later->snapshotWithBaseline(*equal, nullptr)), ::testing::ElementsAre("g/s/a 0"));
  const auto refused = [&](const ReportSnapshot& baseline, const char* what) {
    this->expectFailure([&](DiagnosticErrorPtr* error) { return later->snapshotWithBaseline(baseline, error); }, what);
    EXPECT_EQ(later->snapshotWithBaseline(baseline, nullptr), nullptr) << what;
  };
  refused(*this->snapshotOf(set), "more channels");
  refused(*this->snapshotOf(set->reportByFilteringChannels([](const auto& one) { return one.name == "b"; })),
          "another channel");
  refused(*this->snapshotOf(this->enumerate()->reportByFilteringChannels(isA)), "another enumeration");
  refused(ForeignSnapshot(), "of another facility");
}

TYPED_TEST_P(CountersConformance, WhatCannotBeEnumeratedIsAnErrorAndMayBeAskedForAgain) {
  this->make({steadyChannel("a", 1)});
  const auto facility = this->under_test_.facility();
  this->under_test_.failEnumeration();
  this->expectFailure([&](DiagnosticErrorPtr* error) { return facility->reportWithOnlySimpleChannels(error); },
                      "with a place");
  this->under_test_.recover();
  this->under_test_.failEnumeration();
  EXPECT_EQ(facility->reportWithOnlySimpleChannels(nullptr), nullptr);
  this->under_test_.recover();
  EXPECT_THAT(this->now(this->enumerate()), ::testing::ElementsAre("g/s/a 1"));
}

TYPED_TEST_P(CountersConformance, AReadThatFailsFailsTheSnapshotAndMayBeTriedAgain) {
  const auto set = this->make({{"g", "s", "a", 1, 3}, steadyChannel("b", 2)});
  const auto baseline = this->snapshotOf(set);
  this->under_test_.failSnapshot();
  this->expectFailure([&](DiagnosticErrorPtr* error) { return set->snapshot(error); }, "with a place");
  this->under_test_.recover();
  this->under_test_.failSnapshot();
  EXPECT_EQ(set->snapshot(nullptr), nullptr);
  this->under_test_.recover();
  this->under_test_.advance();
  DiagnosticErrorPtr error = makeError("D", 1, "Here before.");
  const auto later = set->snapshot(&error);
  ASSERT_NE(later, nullptr);
  EXPECT_THAT(this->texts(later->snapshotWithBaseline(*baseline, &error)),
              ::testing::ElementsAre("g/s/a 2", "g/s/b 0"));
  EXPECT_EQ(error->domain(), "D");
}

TYPED_TEST_P(CountersConformance, SetsAndSnapshotsOutliveWhatTheyCameFrom) {
  auto set = this->make({{"g", "s", "n", 5, 9}});
  auto filtered = set->reportByFilteringChannels([](const auto&) { return true; });
  set = nullptr;
  const auto baseline = this->snapshotOf(filtered);
  this->under_test_.advance();
  auto later = this->snapshotOf(filtered);
  filtered = nullptr;
  const auto delta = later->snapshotWithBaseline(*baseline, nullptr);
  later = nullptr;
  EXPECT_THAT(this->texts(delta), ::testing::ElementsAre("g/s/n 4"));
}

REGISTER_TYPED_TEST_SUITE_P(CountersConformance, SamplesComeInTheOrderOfTheChannelsWithTheirNames,
                            CountsAreUnsignedNumbersOf64Bits, AChannelWithoutACountIsSampledWithoutOne,
                            ChannelsOfOneNameAreAllThere, AFilterAsksForEveryChannelOfItsSetInOrder,
                            FilteringMakesANewSetAndLeavesTheOldOne, ASetWithoutChannelsHasSnapshotsWithoutSamples,
                            ADifferenceIsTheLaterCountMinusTheBaselines, SnapshotsDoNotChange,
                            ABaselineIsOfTheSameChannelsOfOneEnumeration,
                            WhatCannotBeEnumeratedIsAnErrorAndMayBeAskedForAgain,
                            AReadThatFailsFailsTheSnapshotAndMayBeTriedAgain, SetsAndSnapshotsOutliveWhatTheyCameFrom);

}  // namespace quazor
