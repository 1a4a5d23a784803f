#include "host/statistics/capability.h"
#include "host/statistics/control_rules.h"
#include "host/statistics/gauge.h"
#include "host/statistics/moments.h"
#include "host/statistics/proportion.h"
#include "host/statistics/trend.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <optional>
#include <string>
#include <vector>

namespace quazor {
namespace {

using testing::HasSubstr;

Moments momentsOf(const std::vector<double>& values) {
  Moments moments;
  for (const double value : values) moments.add(value);
  return moments;
}

TEST(WilsonInterval, IsExactAtItsEnds) {
  EXPECT_EQ(wilsonInterval(0, 0).low, 0);
  EXPECT_EQ(wilsonInterval(0, 0).high, 1);
  for (const std::uint64_t trials : {1U, 3U, 7U, 1'000'000U}) {
    EXPECT_EQ(wilsonInterval(0, trials).low, 0);
    EXPECT_EQ(wilsonInterval(trials, trials).high, 1);
    EXPECT_LT(wilsonInterval(0, trials).high, 1);
    EXPECT_NEAR(wilsonInterval(0, trials).high, 1 - wilsonInterval(trials, trials).low, 1e-12);
  }
}

TEST(ChanceOfAtLeast, IsTheUpperEndOfABinomialDistribution) {
  EXPECT_DOUBLE_EQ(chanceOfAtLeast(0, 0, 0.5), 1);
  EXPECT_DOUBLE_EQ(chanceOfAtLeast(0, 9, 0), 1);
  EXPECT_DOUBLE_EQ(chanceOfAtLeast(1, 9, 0), 0);
  EXPECT_DOUBLE_EQ(chanceOfAtLeast(9, 9, 1), 1);
  EXPECT_NEAR(chanceOfAtLeast(3, 3, 0.5), 0.125, 1e-15);
  EXPECT_NEAR(chanceOfAtLeast(2, 3, 0.5), 0.5, 1e-15);
  EXPECT_NEAR(chanceOfAtLeast(1, 1'000'000, 1e-6), 1 - std::exp(-1), 1e-6);
}

TEST(ChanceLimit, IsSharedByTheFigures) {
  EXPECT_DOUBLE_EQ(chanceLimit(0), 0.01);
  EXPECT_DOUBLE_EQ(chanceLimit(40), 0.00025);
}

TEST(TrendOf, TellsWhichWayAndHowSure) {
  const std::vector<double> up{1, 2, 3, 4, 5, 6, 7, 8, 9, 10};
  const std::optional<Trend> rising = trendOf(up);
  ASSERT_TRUE(rising);
  EXPECT_DOUBLE_EQ(rising->tau, 1);
  EXPECT_NEAR(rising->chance, 5.7e-5, 1e-6);  // 45 pairs: 45 / sqrt(10 * 9 * 25 / 18) = 4.02 deviations
  const std::optional<Trend> falling = trendOf({up.rbegin(), up.rend()});
  ASSERT_TRUE(falling);
  EXPECT_DOUBLE_EQ(falling->tau, -1);
  EXPECT_DOUBLE_EQ(falling->chance, rising->chance);
  const std::optional<Trend> none = trendOf({1, -1, 1, -1, 1, -1, 1, -1, 1, -1, 1});
  ASSERT_TRUE(none);
  EXPECT_NEAR(none->chance, 1, 1e-12);
}

TEST(TrendOf, NeedsTenValuesThatDiffer) {
  EXPECT_FALSE(trendOf({1, 2, 3, 4, 5, 6, 7, 8, 9}));
  EXPECT_FALSE(trendOf(std::vector<double>(20, 3)));
}

TEST(Moments, AreTheSameInParts) {
  Moments first = momentsOf({1, 2, 4});
  first.merge(momentsOf({}));
  first.merge(momentsOf({8, -16}));
  const Moments all = momentsOf({1, 2, 4, 8, -16});
  EXPECT_EQ(first.count(), 5U);
  EXPECT_DOUBLE_EQ(first.mean(), all.mean());
  EXPECT_DOUBLE_EQ(first.squares(), all.squares());
  EXPECT_EQ(first.low(), -16);
  EXPECT_EQ(first.high(), 8);
}

TEST(Moments, KeepASmallSpreadAroundALargeMean) {
  EXPECT_NEAR(momentsOf({1e9 + 1, 1e9 + 2, 1e9 + 3}).deviation(), 1, 1e-6);
  EXPECT_EQ(momentsOf({5}).deviation(), 0);
}

// The rules that the points break, each with the point.
std::string broken(const std::vector<double>& distances) {
  std::string text;
  for (const BrokenRule& one : brokenRules(distances)) {
    text += std::to_string(one.rule) + "@" + std::to_string(one.point) + " ";
  }
  return text;
}

TEST(BrokenRules, AreThoseOfWesternElectric) {
  EXPECT_EQ(broken({}), "");
  EXPECT_EQ(broken({3, -3, 0.5}), "");
  EXPECT_EQ(broken({0.5, -3.1}), "1@1 ");
  EXPECT_EQ(broken({2.1, 0, 2.1}), "2@2 ");
  EXPECT_EQ(broken({2.1, 2.1, 0}), "2@1 ");
  EXPECT_EQ(broken({2.1, -2.1, 0}), "");
  EXPECT_EQ(broken({2.1, 0, 0, 2.1}), "");
  EXPECT_EQ(broken({-1.1, -1.1, 0, -1.1, -1.1}), "3@4 ");
  EXPECT_EQ(broken({1.1, 1.1, 1.1, 0, -1.1}), "");
  EXPECT_EQ(broken({1.1, 1.1, 0, 0, 1.1, 1.1}), "");
  EXPECT_EQ(broken({-1, 1, 1, 1, 1, 1, 1, 1, 1}), "4@8 ");
  EXPECT_EQ(broken({1, 1, 1, 1, 1, 1, 1, 0}), "");
}

TEST(ControlChart, NeedsSpread) {
  EXPECT_FALSE(controlChart({}));
  EXPECT_FALSE(controlChart({momentsOf({1, 2})}));
  EXPECT_FALSE(controlChart({momentsOf({1, 1}), momentsOf({2, 2})}));
  EXPECT_FALSE(controlChart({momentsOf({1}), momentsOf({1})}));
}

TEST(ControlChart, TakesTheSpreadWithinGroupsOrElseBetweenNeighbours) {
  const auto within = controlChart({momentsOf({0, 2}), momentsOf({3, 5})});
  ASSERT_TRUE(within);
  EXPECT_EQ(within->centre, 2.5);
  EXPECT_DOUBLE_EQ(within->distances[0], -1.5);  // the deviation is the square root of 2, over two values
  const auto single = controlChart({momentsOf({0}), momentsOf({1.1283791670955126})});
  ASSERT_TRUE(single);
  EXPECT_DOUBLE_EQ(single->distances[1], 1.1283791670955126 / 2);
}

// A day at a station, a third of whose values are each of these around the mean.
CapabilityGroup groupOf(const std::string& day, double mean, std::uint64_t thirds) {
  CapabilityGroup group{"S", day, {}, 0, 0};
  for (std::uint64_t i = 0; i < thirds; ++i) group.values.merge(momentsOf({mean - 0.25, mean, mean + 0.25}));
  group.runs = group.fractional = group.values.count();
  return group;
}

TEST(Capability, IsTheDistanceToTheNearerLimit) {
  const std::vector<CapabilityGroup> groups{groupOf("1", 1, 5), groupOf("2", 1, 5)};
  const Capability both = capabilityOf(groups, -9, 2);
  ASSERT_EQ(both.refusal, "");
  EXPECT_DOUBLE_EQ(*both.cpk, 1 / (3 * both.within));
  EXPECT_DOUBLE_EQ(*both.ppk, 1 / (3 * both.values.deviation()));
  EXPECT_GT(both.within, both.values.deviation());  // of two groups, one more value is lost
  EXPECT_DOUBLE_EQ(*capabilityOf(groups, -9, std::nullopt).cpk, 10 / (3 * both.within));
  EXPECT_LT(*capabilityOf(groups, std::nullopt, 0).cpk, 0);
}

TEST(Capability, IsRefusedWhereItMeansNothing) {
  const std::vector<CapabilityGroup> good{groupOf("1", 1, 5), groupOf("2", 1, 5)};
  const auto refusal = [](const std::vector<CapabilityGroup>& groups, std::optional<double> upper = 2) {
    return capabilityOf(groups, std::nullopt, upper).refusal;
  };
  EXPECT_EQ(refusal(good), "");
  EXPECT_EQ(refusal(good, std::nullopt), "it has no limit with a bound");
  EXPECT_EQ(capabilityOf(good, 1, 1).refusal, "only one value meets its limit");
  EXPECT_EQ(refusal({}), "0 of the 25 runs that it takes");
  std::vector<CapabilityGroup> few = good;
  few[0].runs = 0;
  few[1].runs = 1;
  EXPECT_EQ(refusal(few), "1 of the 25 runs that it takes");
  std::vector<CapabilityGroup> counts = good;
  for (CapabilityGroup& one : counts) one.fractional = 0;
  EXPECT_THAT(refusal(counts), HasSubstr("all values are whole numbers"));
  EXPECT_EQ(refusal({{"S", "1", Moments(30, 0.5, 0, 0.5, 0.5), 30, 30}}), "all values are the same");
  EXPECT_EQ(refusal({{"S", "1", Moments(30, 0.5, 0, 0.5, 0.5), 30, 30}, {"S", "2", Moments(1, 2, 0, 2, 2), 1, 0}}),
            "there is no spread within any station and day");
  EXPECT_EQ(refusal({groupOf("1", 1, 5), groupOf("2", 3, 5)}),
            "the process is not stable: one day is more than 3 standard errors from the mean (rule 1, station S, 1)");
}

std::vector<GaugeReading> fullTable() {
  std::vector<GaugeReading> readings;
  for (int part = 0; part < 2; ++part) {
    for (int place = 0; place < 2; ++place) {
      for (int time = 0; time < 2; ++time) {
        readings.push_back({"P" + std::to_string(part), "S" + std::to_string(place), part * 10.0 + place + time / 8.0});
      }
    }
  }
  return readings;
}

TEST(GaugeStudy, TakesAFullTable) {
  const GaugeResult found = gaugeStudy(fullTable());
  ASSERT_TRUE(found.study) << found.refusal;
  EXPECT_EQ(found.study->repetitions, 2U);
  EXPECT_NEAR(found.study->repeatability, 1.0 / 128, 1e-12);
  EXPECT_NEAR(found.study->reproducibility, 0.5, 1e-12);
  EXPECT_NEAR(found.study->partToPart, 50, 1e-12);
}

TEST(GaugeStudy, IsRefusedOtherwise) {
  const auto without = [](auto&& leavesOut) {
    std::vector<GaugeReading> readings = fullTable();
    std::erase_if(readings, leavesOut);
    return gaugeStudy(readings).refusal;
  };
  EXPECT_THAT(gaugeStudy({}).refusal, HasSubstr("two phones"));
  EXPECT_THAT(without([](const auto& one) { return one.part == "P1"; }), HasSubstr("two phones"));
  EXPECT_THAT(without([](const auto& one) { return one.place == "S1"; }), HasSubstr("two stations"));
  EXPECT_THAT(without([](const auto& one) { return one.value != static_cast<int>(one.value); }),
              HasSubstr("measured twice"));
  EXPECT_EQ(without([](const auto& one) { return one.part == "P1" && one.place == "S1"; }),
            "the table is not full: phone P1 at station S1 has 0 of the 2 values that phone P0 at station S0 has");
  std::vector<GaugeReading> same = fullTable();
  for (GaugeReading& one : same) one.value = 1;
  EXPECT_THAT(gaugeStudy(same).refusal, HasSubstr("all repetitions gave the same value"));
}

}  // namespace
}  // namespace quazor
