#include "host/device/frame_rings.h"

#include "host/testing/test_phone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <map>
#include <optional>
#include <random>
#include <set>
#include <thread>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::size_t kHalf = FrameRings::kFramesOfRing / 2;

struct TakenFrame {
  std::size_t stream = 0;
  TracedFrame frame;
  std::uint64_t step = 1;

  friend bool operator==(const TakenFrame&, const TakenFrame&) = default;
};

class FrameRingsTest : public testing::Test {
 protected:
  // Rings with the streams "wide" and "tele", whose times count from 7 s.
  void make(std::uint64_t framesPerStep = 0, WhenTraceIsFull whenFull = WhenTraceIsFull::kLose) {
    rings_ = std::make_unique<FrameRings>(framesPerStep);
    rings_->begin(7s);
    wide_ = rings_->addStream("wide", clock_, whenFull);
    tele_ = rings_->addStream("tele", clock_, whenFull);
    drain_.emplace(*rings_);
  }

  // What is taken in one call.
  std::vector<TakenFrame> take(bool isLast = false) {
    std::vector<TakenFrame> taken;
    drain_->drain(isLast, [&taken](std::size_t stream, const TracedFrame& frame, std::uint64_t step) {
      taken.push_back({stream, frame, step});
    });
    return taken;
  }

  std::vector<std::int64_t> numbers(bool isLast = false) {
    std::vector<std::int64_t> numbers;
    for (const TakenFrame& one : take(isLast)) numbers.push_back(one.frame.number);
    return numbers;
  }

  // Delivers a frame and hands it back.
  static void pass(TracedStream& stream, std::uint64_t number) {
    if (const std::optional<std::uint64_t> place = stream.deliver(number, 7s)) stream.handBack(*place);
  }

  std::shared_ptr<ManualClock> clock_ = std::make_shared<ManualClock>();  // at 7 s
  std::unique_ptr<FrameRings> rings_;
  std::shared_ptr<TracedStream> wide_;
  std::shared_ptr<TracedStream> tele_;
  std::optional<FrameDrain> drain_;
};

TEST_F(FrameRingsTest, TellTheTimesOfEachFrameOfEachStream) {
  make();
  EXPECT_THAT(take(), IsEmpty());
  clock_->time = 7s + 100ns;
  const std::uint64_t first = *wide_->deliver(4, 7s + 90ns);
  const std::uint64_t other = *tele_->deliver(0, 6s);
  clock_->time = 7s + 200ns;
  wide_->handBack(first);
  tele_->handBack(other);
  EXPECT_THAT(take(),
              ElementsAre(TakenFrame{0, {4, 90, 100, 200}, 1}, TakenFrame{1, {0, -1'000'000'000, 100, 200}, 1}));
  EXPECT_EQ(drain_->nameOf(0), "wide");
  EXPECT_EQ(drain_->nameOf(1), "tele");
  EXPECT_THAT(take(true), IsEmpty());
  EXPECT_EQ(drain_->takeLost(0), 0U);
}

TEST_F(FrameRingsTest, KeepAFrameUntilItIsHandedBackOrTheLastIsTaken) {
  make();
  const std::uint64_t held = *wide_->deliver(0, 7s);
  pass(*wide_, 1);
  EXPECT_THAT(take(), IsEmpty());
  wide_->handBack(held);
  EXPECT_THAT(numbers(), ElementsAre(0, 1));
  const std::uint64_t late = *wide_->deliver(2, 7s);
  EXPECT_THAT(take(true), ElementsAre(TakenFrame{0, {2, 0, 0, std::nullopt}, 1}));
  wide_->handBack(late);
  EXPECT_THAT(take(true), IsEmpty());
}

TEST_F(FrameRingsTest, KeepAFrameThatIsHeldOnlyWhileHalfOfTheRingIsFree) {
  make();
  const std::uint64_t held = *wide_->deliver(0, 7s);
  for (std::size_t i = 1; i < kHalf; ++i) pass(*wide_, i);
  EXPECT_THAT(take(), IsEmpty());
  pass(*wide_, kHalf);
  const std::vector<TakenFrame> taken = take();
  ASSERT_EQ(taken.size(), kHalf + 1);
  EXPECT_EQ(taken[0].frame, (TracedFrame{0, 0, 0, std::nullopt}));
  EXPECT_EQ(taken[1].frame, (TracedFrame{1, 0, 0, 0}));
  // Its place belongs to another frame later.
  for (std::size_t i = 0; i < FrameRings::kFramesOfRing - 1 - kHalf; ++i) pass(*wide_, 1);
  const std::uint64_t again = *wide_->deliver(2, 7s);
  EXPECT_EQ(again % FrameRings::kFramesOfRing, held % FrameRings::kFramesOfRing);
  clock_->time += 5ns;
  wide_->handBack(held);
  EXPECT_EQ(take(true).back().frame, (TracedFrame{2, 0, 0, std::nullopt}));
}

// How many bytes of the memory need not be provided any more.
std::size_t residentBytes(std::span<std::byte> memory) {
  const auto page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
  std::vector<unsigned char> pages(memory.size() / page + 1);
  EXPECT_EQ(::mincore(memory.data(), memory.size(), pages.data()), 0);
  return page * static_cast<std::size_t>(std::ranges::count_if(pages, [](unsigned char one) { return one % 2 != 0; }));
}

TEST_F(FrameRingsTest, HaveTheirMemoryBeforeTheFirstFrameUnlessFramesWait) {
  if (::madvise(nullptr, 0, MADV_POPULATE_WRITE) != 0) GTEST_SKIP() << "the kernel is older than 5.14";
  constexpr std::size_t kLeast = 2 * FrameRings::kFramesOfRing * 4 * sizeof(std::int64_t);
  make();
  EXPECT_GT(residentBytes(rings_->memory()), kLeast);
  make(0, WhenTraceIsFull::kWait);
  EXPECT_LT(residentBytes(rings_->memory()), kLeast / 10);
}

TEST_F(FrameRingsTest, CountWhatFindsNoRoom) {
  make();
  for (std::size_t i = 0; i < FrameRings::kFramesOfRing + 7; ++i) pass(*wide_, i);
  EXPECT_EQ(numbers().size(), FrameRings::kFramesOfRing);
  EXPECT_EQ(drain_->takeLost(0), 7U);
  EXPECT_EQ(drain_->takeLost(0), 0U);
  EXPECT_EQ(drain_->takeLost(1), 0U);
  pass(*wide_, 99);
  EXPECT_THAT(numbers(), ElementsAre(99));
}

TEST_F(FrameRingsTest, WaitForRoomIfNothingMayBeLost) {
  make(0, WhenTraceIsFull::kWait);
  constexpr std::size_t kFrames = 5 * FrameRings::kFramesOfRing;
  std::thread phone([this] {
    for (std::size_t i = 0; i < kFrames; ++i) pass(*wide_, i);
  });
  std::vector<std::int64_t> all;
  while (all.size() < kFrames) {
    for (const std::int64_t number : numbers()) all.push_back(number);
  }
  phone.join();
  for (std::size_t i = 0; i < all.size(); ++i) ASSERT_EQ(all[i], static_cast<std::int64_t>(i));
  EXPECT_EQ(drain_->takeLost(0), 0U);
}

TEST_F(FrameRingsTest, TellEverySecondFrameAfterManyAndThenEveryFourth) {
  make(4);
  // The steps count the frames of all streams: 4 of every frame, then 8 of every second one, then 16 of every fourth.
  std::map<std::uint64_t, std::size_t> steps;
  for (std::size_t i = 0; i < 28; ++i) pass(i % 2 == 0 ? *wide_ : *tele_, i / 2);
  std::vector<std::vector<std::int64_t>> told(2);
  for (const TakenFrame& one : take()) {
    told[one.stream].push_back(one.frame.number);
    ++steps[one.step];
  }
  EXPECT_THAT(told[0], ElementsAre(0, 1, 2, 4, 8, 12));
  EXPECT_EQ(told[0], told[1]);
  EXPECT_EQ(steps, (std::map<std::uint64_t, std::size_t>{{1, 4}, {2, 4}, {4, 4}}));
  EXPECT_EQ(drain_->takeLost(0), 0U);
}

TEST_F(FrameRingsTest, TellTasksAsFramesAndCountThemOnTheirOwn) {
  make(4);
  const std::shared_ptr<TracedStream> queue = rings_->addQueue("wide", clock_, WhenTraceIsFull::kLose);
  const std::shared_ptr<TracedStream> other = rings_->addQueue("wide", clock_, WhenTraceIsFull::kLose);
  for (std::uint64_t i = 0; i < 4; ++i) pass(*wide_, i);
  for (std::uint64_t i = 10; i < 14; ++i) pass(*queue, i);
  EXPECT_EQ(numbers(), (std::vector<std::int64_t>{0, 1, 2, 3, 10, 11, 12, 13}));
  for (std::uint64_t i = 14; i < 18; ++i) pass(*queue, i);
  EXPECT_EQ(numbers(), (std::vector<std::int64_t>{14, 16}));
  EXPECT_EQ(drain_->kindOf(0), TracedKind::kFrames);
  EXPECT_EQ(drain_->kindOf(2), TracedKind::kTasks);
  EXPECT_EQ(drain_->nameOf(0), "wide");
  EXPECT_EQ(drain_->nameOf(2), "wide");
  EXPECT_EQ(drain_->nameOf(3), "wide (2)");
}

TEST_F(FrameRingsTest, HaveAtMostSoManyStreams) {
  make();
  for (std::size_t i = 2; i < FrameRings::kMaxStreams; ++i) {
    EXPECT_NE(rings_->addStream("wide", clock_, WhenTraceIsFull::kLose), nullptr);
  }
  EXPECT_EQ(drain_->withoutRing(), 0U);
  EXPECT_EQ(rings_->addStream("late", clock_, WhenTraceIsFull::kLose), nullptr);
  EXPECT_EQ(rings_->addStream("later", clock_, WhenTraceIsFull::kLose), nullptr);
  EXPECT_EQ(drain_->withoutRing(), 2U);
  take();
  ASSERT_EQ(drain_->size(), FrameRings::kMaxStreams);
  EXPECT_EQ(drain_->nameOf(2), "wide (2)");
  EXPECT_EQ(drain_->nameOf(3), "wide (3)");
}

TEST_F(FrameRingsTest, CutALongName) {
  make();
  rings_->addStream(std::string(1000, 'x'), clock_, WhenTraceIsFull::kLose);
  take();
  EXPECT_EQ(drain_->nameOf(2), std::string(FrameRings::kMaxName, 'x'));
}

TEST_F(FrameRingsTest, KeepTimesWithinWhatARecordCanHold) {
  make();
  constexpr std::chrono::nanoseconds kLast = std::chrono::nanoseconds::max();
  wide_->deliver(UINT64_MAX, kLast);
  wide_->deliver(0, std::chrono::nanoseconds::min());
  const std::vector<TakenFrame> taken = take(true);
  EXPECT_EQ(taken[0].frame, (TracedFrame{kMaxTraced, kMaxTraced, 0, std::nullopt}));
  EXPECT_EQ(taken[1].frame, (TracedFrame{0, -kMaxTraced, 0, std::nullopt}));
}

TEST_F(FrameRingsTest, OutlastTheProcessThatDelivers) {
  make();
  const pid_t child = ::fork();
  if (child == 0) {
    clock_->time += 3ns;
    pass(*wide_, 1);
    wide_->deliver(2, 7s);
    ::_exit(7);
  }
  int status = 0;
  ASSERT_EQ(::waitpid(child, &status, 0), child);
  EXPECT_THAT(take(true), ElementsAre(TakenFrame{0, {1, 0, 3, 3}, 1}, TakenFrame{0, {2, 0, 3, std::nullopt}, 1}));
}

// A clock that counts its calls. Thread: any.
class CountingClock final : public Clock {
 public:
  std::chrono::nanoseconds now() const override { return std::chrono::nanoseconds(++time_); }
  Date date() const override { return {}; }
  void sleep(std::chrono::nanoseconds) override {}

 private:
  mutable std::atomic<std::int64_t> time_{0};
};

// Frames of one stream that several threads deliver and others hand back, while the host takes them.
TEST(FrameRingsThreadsTest, LoseNothingAndKeepTheOrder) {
  constexpr std::uint64_t kThreads = 4;
  constexpr std::uint64_t kFrames = 20'000;
  FrameRings rings(0);
  rings.begin(0ns);
  const auto stream = rings.addStream("wide", std::make_shared<CountingClock>(), WhenTraceIsFull::kWait);
  std::vector<std::vector<std::atomic<std::uint64_t>>> handed(kThreads);
  for (auto& places : handed) places = std::vector<std::atomic<std::uint64_t>>(kFrames);
  std::vector<std::thread> threads;
  for (std::uint64_t i = 0; i < kThreads; ++i) {
    threads.emplace_back([&stream, &places = handed[i], i] {
      for (std::uint64_t k = 0; k < kFrames; ++k) places[k] = *stream->deliver(k * kThreads + i, 0ns) + 1;
    });
    threads.emplace_back([&stream, &places = handed[i]] {
      for (std::uint64_t k = 0; k < kFrames; ++k) {
        while (places[k] == 0) std::this_thread::yield();
        if (k % 7 != 0) stream->handBack(places[k] - 1);
      }
    });
  }
  FrameDrain drain(rings);
  std::set<std::int64_t> numbers;
  std::int64_t last = 0;
  std::uint64_t returned = 0;
  const FrameDrain::Take take = [&](std::size_t, const TracedFrame& frame, std::uint64_t) {
    EXPECT_GT(frame.delivered, last);
    last = frame.delivered;
    numbers.insert(frame.number);
    if (!frame.returned) return;
    EXPECT_GT(*frame.returned, frame.delivered);
    EXPECT_NE(frame.number / static_cast<std::int64_t>(kThreads) % 7, 0);
    ++returned;
  };
  while (numbers.size() + FrameRings::kFramesOfRing / 2 < kThreads * kFrames) drain.drain(false, take);
  for (std::thread& thread : threads) thread.join();
  drain.drain(true, take);
  EXPECT_EQ(numbers.size(), kThreads * kFrames);
  EXPECT_GT(returned, 0U);
  EXPECT_EQ(drain.takeLost(0), 0U);
}

// Whatever a plug-in writes to the memory, the host takes no more frames than there is room for, and a record can hold
// them.
TEST(FrameDrainTest, WithstandsAnythingInItsMemory) {
  std::mt19937_64 random(5);
  const auto clock = std::make_shared<ManualClock>();
  for (int round = 0; round < 12; ++round) {
    FrameRings rings(0);
    const std::span<std::byte> memory = rings.memory();
    const auto stream = rings.addStream("wide", clock, WhenTraceIsFull::kLose);
    for (std::uint64_t i = 0; i < FrameRings::kFramesOfRing; ++i) stream->deliver(i, 7s);
    FrameDrain drain(rings);
    for (int call = 0; call < 4; ++call) {
      // In some rounds the beginning stays, with the number of streams, or small numbers are likely.
      const std::size_t begin = round % 3 == 0 ? 0 : 64;
      for (std::size_t at = begin; at + 8 <= memory.size(); at += 8 * (1 + random() % (round % 2 == 0 ? 3 : 400))) {
        const std::uint64_t word = random() % 4 == 0 ? random() % 70 : random();
        std::memcpy(memory.data() + at, &word, sizeof word);
      }
      std::map<std::size_t, std::vector<TracedFrame>> taken;
      drain.drain(call == 3, [&taken](std::size_t index, const TracedFrame& frame, std::uint64_t step) {
        taken[index].push_back(frame);
        EXPECT_TRUE(std::has_single_bit(step));
      });
      ASSERT_LE(drain.size(), FrameRings::kMaxStreams);
      std::set<std::pair<TracedKind, std::string>> names;
      for (std::size_t i = 0; i < drain.size(); ++i) {
        names.emplace(drain.kindOf(i), drain.nameOf(i));
        EXPECT_LE(drain.nameOf(i).size(), FrameRings::kMaxName + 5);
        drain.takeLost(i);
      }
      EXPECT_EQ(names.size(), drain.size());
      for (const auto& [index, frames] : taken) {
        EXPECT_LE(frames.size(), FrameRings::kFramesOfRing);
        EXPECT_TRUE(std::is_sorted(frames.begin(), frames.end(), [](const TracedFrame& one, const TracedFrame& other) {
          return one.delivered < other.delivered;
        }));
        for (const TracedFrame& frame : frames) {
          EXPECT_GE(frame.number, 0);
          for (const std::int64_t value : {frame.number, frame.captured, frame.delivered, frame.returned.value_or(0)}) {
            EXPECT_LE(value, kMaxTraced);
            EXPECT_GE(value, -kMaxTraced);
          }
        }
      }
    }
  }
}

}  // namespace
}  // namespace quazor
