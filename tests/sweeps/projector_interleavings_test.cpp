// Frames, events, errors and timeout of the projector fault experiment in every possible order.
#include "backends/simulated/time/virtual_scheduler.h"
#include "tests/support/effort.h"
#include "tests/sweeps/projector_trace.h"
#include "tests/sweeps/projector_virtual_run.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <iostream>
#include <set>
#include <string>
#include <vector>

namespace quazor {
namespace {

#if defined(QUAZOR_THREAD_SANITIZER)
constexpr bool kHasThreadSanitizer = true;
#else
constexpr bool kHasThreadSanitizer = false;
#endif

std::string textOf(const std::vector<std::string>& lines) {
  std::string text;
  for (const std::string& line : lines) text += "\n  " + line;
  return text;
}

std::vector<std::size_t> choicesOf(const EveryOrder& orders) {
  std::vector<std::size_t> choices;
  for (const auto& [choice, count] : orders.choices()) choices.push_back(choice);
  return choices;
}

TEST(EveryOrderTest, LeadsIntoEachOrderOnce) {
  const auto orders = std::make_shared<EveryOrder>();
  std::set<std::string> seen;
  std::size_t runs = 0;
  do {
    VirtualScheduler scheduler(orders);
    std::string order;
    const auto letters = scheduler.makeStrand();
    const auto digits = scheduler.makeStrand();
    for (const char letter : {'a', 'b'}) scheduler.submit(letters, [&order, letter] { order += letter; });
    for (const char digit : {'1', '2', '3'}) scheduler.submit(digits, [&order, digit] { order += digit; });
    scheduler.blockUntil(std::chrono::seconds(1), "the end");
    seen.insert(order);
    ++runs;
  } while (orders->toNextOrder());
  EXPECT_EQ(runs, 10U);  // the binomial coefficient of 5 and 2
  EXPECT_EQ(seen.size(), 10U);
  EXPECT_TRUE(seen.contains("a12b3"));
}

// Runs plans in every order and counts the runs. A thorough run takes some minutes in an optimised build. Otherwise the
// larger plans are omitted; the others are still run in every order.
class ProjectorInterleavings : public testing::Test {
 protected:
  void TearDown() override {
    std::cout << "[interleavings] " << testing::UnitTest::GetInstance()->current_test_info()->name() << ": " << plans_
              << " plans, " << orders_ << " interleavings\n";
  }

  void tryEveryOrder(const ProjectorPlan& plan) {
    if (HasFatalFailure()) return;
    ++plans_;
    const auto orders = std::make_shared<EveryOrder>();
    const auto scheduler = std::make_shared<VirtualScheduler>(orders);
    do {
      const ProjectorRun run = runVirtually(plan, scheduler);
      ++orders_;
      const std::string problem = problemOf(plan, run);
      ASSERT_EQ(problem, "") << describe(plan) << "\nchoices " << testing::PrintToString(choicesOf(*orders))
                             << textOf(run.lines);
    } while (orders->toNextOrder());
  }

  void tryOneOrder(const ProjectorPlan& plan, std::uint64_t seed) {
    ++plans_;
    ++orders_;
    const ProjectorRun run =
        runVirtually(plan, std::make_shared<VirtualScheduler>(std::make_shared<RandomStrategy>(seed)));
    const std::string problem = problemOf(plan, run);
    ASSERT_EQ(problem, "") << describe(plan) << textOf(run.lines);
  }

  std::size_t plans_ = 0;
  std::size_t orders_ = 0;
};

// `count` simultaneous frames; frame number `bad`, from 1, is of that kind, and all others are lit.
std::vector<Delivery> frames(std::size_t count, std::size_t bad, FrameKind kind) {
  std::vector<Delivery> deliveries(count);
  if (bad != 0) deliveries[bad - 1].kind = kind;
  return deliveries;
}

// Calls `use` with every combination of up to `most` frames, including one bad frame, and of the stop count.
template <class Use>
void forEachPlan(std::size_t most, const std::vector<FrameKind>& kinds, Use use) {
  for (std::size_t count = 0; count <= most; ++count) {
    for (std::size_t bad = 0; bad <= count; ++bad) {
      for (const FrameKind kind : kinds) {
        if (bad == 0 && kind != kinds.front()) continue;
        for (std::uint64_t stopCount = 0; stopCount <= 4; ++stopCount) {
          ProjectorPlan plan;
          plan.deliveries = frames(count, bad, kind);
          plan.stopCount = stopCount;
          use(plan);
        }
      }
    }
  }
}

const std::vector<FrameKind> kOneOfEach{FrameKind::kUnlit, FrameKind::kWithoutMetadata};
const std::vector<FrameKind> kAllBad(kFrameKinds.begin() + 1, kFrameKinds.end());

// The timeout expires after everything else: the frames race with each other and with the host.
TEST_F(ProjectorInterleavings, WithATimeoutAfterAllFrames) {
  forEachPlan(isThorough() ? 4 : 3, kOneOfEach, [this](const ProjectorPlan& plan) { tryEveryOrder(plan); });
}

ProjectorPlan withTimeoutAtAnyMoment(ProjectorPlan plan) {
  plan.timeout = 0;
  plan.timerIsSlow = true;
  return plan;
}

TEST_F(ProjectorInterleavings, WithATimeoutAtAnyMoment) {
  forEachPlan(isThorough() ? 4 : 2, kOneOfEach,
              [this](const ProjectorPlan& plan) { tryEveryOrder(withTimeoutAtAnyMoment(plan)); });
}

TEST_F(ProjectorInterleavings, WithMoreFramesABadOneAndATimeoutAtAnyMoment) {
  ProjectorPlan plan;
  plan.deliveries = frames(isThorough() ? 4 : 3, 2, FrameKind::kUnlit);
  plan.stopCount = 3;
  tryEveryOrder(withTimeoutAtAnyMoment(plan));
}

// The timeout expires after the first frames have been processed and at the same time as the other frames.
TEST_F(ProjectorInterleavings, WithATimeoutAmidTheFrames) {
  forEachPlan(isThorough() ? 4 : 3, kOneOfEach, [this](ProjectorPlan plan) {
    plan.timeout = 1;
    for (std::size_t before = 0; before < plan.deliveries.size(); ++before) {
      for (std::size_t i = before; i < plan.deliveries.size(); ++i) plan.deliveries[i].at = std::chrono::seconds(1);
      tryEveryOrder(plan);
      plan.deliveries[before].at = std::chrono::seconds(0);
    }
  });
}

// A frame may arrive, be counted and be examined before start() has returned, during a stop, and while another frame is
// being read.
TEST_F(ProjectorInterleavings, WithASlowCameraAndATimeoutAtOnce) {
  if (kHasThreadSanitizer) GTEST_SKIP() << "it would take a lock that is held while others go on for a mistake";
  forEachPlan(isThorough() ? 3 : 1, kOneOfEach, [this](ProjectorPlan plan) {
    plan.timeout = 0;
    plan.cameraIsSlow = true;
    tryEveryOrder(plan);
  });
}

TEST_F(ProjectorInterleavings, OfEveryTwoBadFrames) {
  for (const FrameKind first : kAllBad) {
    for (const FrameKind second : kAllBad) {
      ProjectorPlan plan;
      plan.deliveries = frames(2, 1, first);
      plan.deliveries[1].kind = second;
      plan.stopCount = 3;
      tryEveryOrder(withTimeoutAtAnyMoment(plan));
      if (!isThorough()) continue;
      // With a lit frame before, between and after them.
      for (std::size_t lit = 0; lit < 3; ++lit) {
        ProjectorPlan larger = plan;
        larger.deliveries.insert(larger.deliveries.begin() + static_cast<std::ptrdiff_t>(lit), Delivery{});
        tryEveryOrder(withTimeoutAtAnyMoment(larger));
      }
    }
  }
}

TEST_F(ProjectorInterleavings, WithAStreamThatFailsItsStopOrHasNoCounters) {
  for (const bool stops : {true, false}) {
    forEachPlan(2, kOneOfEach, [&](ProjectorPlan plan) {
      plan.stops = stops;
      plan.countersAreRead = !stops;
      tryEveryOrder(withTimeoutAtAnyMoment(plan));
    });
  }
}

TEST_F(ProjectorInterleavings, OfTwoThreadsOfTheCameraWithEvents) {
  for (const FrameKind kind : kFrameKinds) {
    ProjectorPlan plan;
    plan.deliveries = frames(4, 2, kind);
    plan.deliveries[1].thread = 1;
    plan.deliveries[2].isEvent = true;
    plan.deliveries[3].thread = 1;
    plan.stopCount = 2;
    plan.timeout = 1;
    tryEveryOrder(plan);
  }
}

// A larger random plan for the seed.
ProjectorPlan drawPlan(std::uint64_t seed) {
  RandomStrategy random(seed);
  const auto chance = [&random](std::size_t oneIn) { return random.choose(oneIn) == 0; };
  ProjectorPlan plan;
  const std::size_t threads = 1 + random.choose(3);
  const std::size_t count = 6 + random.choose(15);
  const std::size_t badOneIn = 4 + random.choose(60);
  std::chrono::nanoseconds at{0};
  for (std::size_t i = 0; i < count; ++i) {
    Delivery delivery;
    delivery.isEvent = chance(6);
    if (chance(badOneIn)) delivery.kind = kAllBad[random.choose(kAllBad.size())];
    delivery.thread = random.choose(threads);
    if (!chance(3)) at += std::chrono::milliseconds(33);  // otherwise simultaneous with the previous frame
    delivery.at = at;
    plan.deliveries.push_back(delivery);
  }
  plan.stopCount = random.choose(count + 4);
  const std::chrono::duration<double> end = at;
  plan.timeout = chance(2) ? end.count() * 2 + 1 : 0.033 * static_cast<double>(random.choose(count + 2));
  plan.timerIsSlow = chance(2);
  plan.cameraIsSlow = chance(3) && !kHasThreadSanitizer;
  plan.stops = !chance(8);
  plan.countersAreRead = !chance(8);
  return plan;
}

TEST_F(ProjectorInterleavings, OfLargerSeededRuns) {
  const int seeds = isThorough() ? 100'000 : roundsOf(5'000);
  for (int i = 0; i < seeds; ++i) {
    const auto seed = static_cast<std::uint64_t>(i);
    tryOneOrder(drawPlan(seed), seed);
    ASSERT_FALSE(HasFatalFailure()) << "seed " << seed;
  }
}

}  // namespace
}  // namespace quazor
