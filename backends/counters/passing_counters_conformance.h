// Requirements on a report facility whose channels appear and disappear, as a typed test suite.
#pragma once

#include "backends/counters/counters_conformance.h"

namespace quazor {

// UnderTest is that of CountersConformance, except that only one of `before` and `after` may be a number: the channel
// then appears or disappears in advance().
template <class UnderTest>
class PassingCountersConformance : public CountersConformance<UnderTest> {};

TYPED_TEST_SUITE_P(PassingCountersConformance);

TYPED_TEST_P(PassingCountersConformance, AChannelThatGoesAwayStaysInItsSetWithoutACount) {
  const auto set = this->make({{"g", "s", "goes", 5, std::nullopt}, {"g", "s", "stays", 1, 3}});
  const auto baseline = this->snapshotOf(set);
  this->under_test_.advance();
  const auto later = this->snapshotOf(set);
  EXPECT_THAT(this->texts(later), ::testing::ElementsAre("g/s/goes (null)", "g/s/stays 3"));
  EXPECT_THAT(this->texts(later->snapshotWithBaseline(*baseline, nullptr)),
              ::testing::ElementsAre("g/s/goes (null)", "g/s/stays 2"));
}

TYPED_TEST_P(PassingCountersConformance, AChannelThatGetsItsCountBetweenSnapshotsHasNoDifference) {
  const auto set = this->make({{"g", "s", "comes", std::nullopt, 7}, {"g", "s", "stays", 1, 3}});
  const auto baseline = this->snapshotOf(set);
  EXPECT_THAT(this->texts(baseline), ::testing::ElementsAre("g/s/comes (null)", "g/s/stays 1"));
  this->under_test_.advance();
  const auto later = this->snapshotOf(set);
  EXPECT_THAT(this->texts(later), ::testing::ElementsAre("g/s/comes 7", "g/s/stays 3"));
  EXPECT_THAT(this->texts(later->snapshotWithBaseline(*baseline, nullptr)),
              ::testing::ElementsAre("g/s/comes (null)", "g/s/stays 2"));
}

REGISTER_TYPED_TEST_SUITE_P(PassingCountersConformance, AChannelThatGoesAwayStaysInItsSetWithoutACount,
                            AChannelThatGetsItsCountBetweenSnapshotsHasNoDifference);

}  // namespace quazor
