#include "backends/threads/watch.h"

#include <gtest/gtest.h>

#include <chrono>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

constexpr std::chrono::nanoseconds kNever = std::chrono::nanoseconds::max();

// The clock advances by 10 microseconds on each reading.
class WatchTest : public testing::Test {
 protected:
  // True if the watch called `ready`, which returns the given value.
  bool looks(bool ready, std::chrono::nanoseconds deadline = kNever) {
    bool asked = false;
    succeeded_ = watch_.spin(
        [&] {
          asked = true;
          return ready;
        },
        [this] { return now_ += 10us; }, deadline);
    return asked;
  }

  // The number of consecutive spins that are skipped before the next, unsuccessful one.
  int leftOut() {
    int count = 0;
    while (!looks(false)) ++count;
    return count;
  }

  Watch watch_;
  std::chrono::nanoseconds now_{};
  bool succeeded_ = false;
};

TEST_F(WatchTest, SeesAtOnceWhatIsReady) {
  EXPECT_TRUE(looks(true));
  EXPECT_TRUE(succeeded_);
  EXPECT_EQ(now_, 10us);
}

TEST_F(WatchTest, SeesWhatBecomesReadyMeanwhile) {
  EXPECT_TRUE(watch_.spin([this] { return now_ >= 30us; }, [this] { return now_ += 10us; }, kNever));
}

TEST_F(WatchTest, EndsAfterItsLongestTime) {
  EXPECT_TRUE(looks(false));
  EXPECT_FALSE(succeeded_);
  EXPECT_EQ(now_, 10us + Watch::kMaxLength);
}

TEST_F(WatchTest, EndsAtTheDeadline) {
  EXPECT_TRUE(looks(false, 20us));
  EXPECT_FALSE(succeeded_);
  EXPECT_EQ(now_, 20us);
}

TEST_F(WatchTest, LeavesOutTwiceAsManyAfterEachOneInVainUpToAThousand) {
  std::vector<int> counts;
  for (int i = 0; i < 14; ++i) counts.push_back(leftOut());
  EXPECT_EQ(counts, (std::vector<int>{0, 1, 2, 4, 8, 16, 32, 64, 128, 256, 512, 1024, 1024, 1024}));
}

TEST_F(WatchTest, LooksOutEachTimeAsLongAsItSucceeds) {
  for (int i = 0; i < 5; ++i) leftOut();
  while (!looks(true)) {
  }
  for (int i = 0; i < 100; ++i) ASSERT_TRUE(looks(true));
  EXPECT_EQ(leftOut(), 0);
  EXPECT_EQ(leftOut(), 1) << "after a success the count begins again";
}

}  // namespace
}  // namespace quazor
