// ScheduleStrategy: decides which of several possible events happens first.
#pragma once

#include <cstddef>
#include <cstdint>

namespace quazor {

// The strategy is the only source of nondeterminism in a simulated run: one strategy and one program give one order of
// events. A test can supply its own, for example one that replays a list of choices, to produce every possible order.
//
// Thread: one at a time.
class ScheduleStrategy {
 public:
  ScheduleStrategy() = default;
  ScheduleStrategy(const ScheduleStrategy&) = delete;
  ScheduleStrategy& operator=(const ScheduleStrategy&) = delete;
  virtual ~ScheduleStrategy();

  // Returns the index of the next event, from 0 to count - 1. Called only if there is a choice: `count` is at least 2.
  virtual std::size_t choose(std::size_t count) = 0;
};

// Chooses with a seeded generator (SplitMix64, Steele, Lea and Flood 2014), implemented here so that a seed gives the
// same order with every standard library.
// Thread: one at a time.
class RandomStrategy final : public ScheduleStrategy {
 public:
  explicit RandomStrategy(std::uint64_t seed) : state_(seed) {}

  std::size_t choose(std::size_t count) override;

 private:
  std::uint64_t state_;
};

}  // namespace quazor
