#include "backends/simulated/time/schedule_strategy.h"

#include <gtest/gtest.h>

#include <cstddef>
#include <set>
#include <vector>

namespace quazor {
namespace {

std::vector<std::size_t> choices(std::uint64_t seed, std::size_t count, int times) {
  RandomStrategy chooser(seed);
  std::vector<std::size_t> choices;
  for (int i = 0; i < times; ++i) choices.push_back(chooser.choose(count));
  return choices;
}

TEST(RandomStrategy, ASeedMeansTheSameChoicesEverywhere) {
  // The generator's published first outputs for seed 1234567 are 6457827717110365317, 3203168211198807973,
  // 9817491932198370423, 4593380528125082431, 16408922859458223821.
  EXPECT_EQ(choices(1234567, 1000, 5), (std::vector<std::size_t>{317, 973, 423, 431, 821}));
}

TEST(RandomStrategy, EveryChoiceIsMade) {
  for (const std::size_t count : {2U, 3U, 7U}) {
    const std::vector<std::size_t> made = choices(1, count, 200);
    std::set<std::size_t> all;
    for (std::size_t i = 0; i < count; ++i) all.insert(i);
    EXPECT_EQ(std::set<std::size_t>(made.begin(), made.end()), all) << count;
  }
}

TEST(RandomStrategy, AnotherSeedMeansOtherChoices) { EXPECT_NE(choices(1, 2, 64), choices(2, 2, 64)); }

}  // namespace
}  // namespace quazor
