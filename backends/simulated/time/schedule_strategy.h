// Chooser: decides which of several things that could happen now happens first.
#pragma once

#include <cstddef>
#include <cstdint>

namespace quazor {

// One chooser and one program give one order of events: what it answers is all that is left open in a simulated run.
// A test hands in its own, say one that replays a list of choices, to steer a run into every order there is.
//
// Thread: one at a time.
class ScheduleStrategy {
 public:
  ScheduleStrategy() = default;
  ScheduleStrategy(const ScheduleStrategy&) = delete;
  ScheduleStrategy& operator=(const ScheduleStrategy&) = delete;
  virtual ~ScheduleStrategy();

  // Which of `count` things is next, from 0 to count - 1. Asked only when there is a choice: `count` is at least 2.
  virtual std::size_t choose(std::size_t count) = 0;
};

// Chooses by a seeded generator (SplitMix64, Steele, Lea and Flood 2014), written out here so that a seed means the
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
