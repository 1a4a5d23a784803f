#include "backends/simulated/time/virtual_services.h"

#include "backends/simulated/time/simulation_stall.h"
#include "backends/threads/concurrency_conformance.h"
#include "contract/message_format.h"
#include "tests/support/thrown_text.h"

#include <gtest/gtest.h>

#include <memory>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// Chooses the last of what there is.
class LastChooser final : public ScheduleStrategy {
 public:
  std::size_t choose(std::size_t count) override { return count - 1; }
};

template <class ChooserUnderTest>
std::shared_ptr<ScheduleStrategy> makeChooser() {
  return std::make_shared<ChooserUnderTest>();
}
template <>
std::shared_ptr<ScheduleStrategy> makeChooser<RandomStrategy>() {
  return std::make_shared<RandomStrategy>(7);
}

template <class ChooserUnderTest>
class VirtualUnderTest {
 public:
  std::shared_ptr<Concurrency> concurrency() { return std::make_shared<VirtualConcurrency>(scheduler_); }
  std::shared_ptr<Clock> clock() { return std::make_shared<VirtualClock>(scheduler_); }
  ~VirtualUnderTest() { scheduler_->discardPending(); }

 private:
  std::shared_ptr<VirtualScheduler> scheduler_ = std::make_shared<VirtualScheduler>(makeChooser<ChooserUnderTest>());
};

INSTANTIATE_TYPED_TEST_SUITE_P(VirtualTimeSeeded, ConcurrencyConformance, VirtualUnderTest<RandomStrategy>);

class VirtualServicesTest : public ::testing::Test {
 protected:
  std::shared_ptr<VirtualScheduler> scheduler_ = std::make_shared<VirtualScheduler>(std::make_shared<LastChooser>());
  VirtualClock clock_{scheduler_};
  VirtualConcurrency concurrency_{scheduler_};
};

TEST_F(VirtualServicesTest, TheClockBeginsAtZeroOnTheFirstOfJanuary2026) {
  EXPECT_EQ(clock_.now(), 0s);
  EXPECT_EQ(defaultText(clock_.date()), "2026-01-01 00:00:00 +0000");
  clock_.sleep(90s);
  EXPECT_EQ(clock_.now(), 90s);
  EXPECT_EQ(defaultText(clock_.date()), "2026-01-01 00:01:30 +0000");
}

TEST_F(VirtualServicesTest, TheDateSaturatesWithTheClock) {
  clock_.sleep(std::chrono::nanoseconds::max() - 1ns);
  EXPECT_EQ(clock_.date(), Date::max());
}

TEST_F(VirtualServicesTest, ASleepOfZeroOrLessLetsNothingHappen) {
  bool ran = false;
  const auto queue = concurrency_.makeSerialQueue("queue", QualityOfService::kDefault);
  queue->async([&] { ran = true; });
  clock_.sleep(0ns);
  clock_.sleep(-1s);
  EXPECT_FALSE(ran);
  clock_.sleep(1ns);
  EXPECT_TRUE(ran);
}

TEST_F(VirtualServicesTest, ASleepWithoutEndStalls) {
  EXPECT_THROW(clock_.sleep(std::chrono::nanoseconds::max()), SimulationStall);
}

TEST_F(VirtualServicesTest, ASemaphoreThatNothingWillSignalStalls) {
  const auto semaphore = concurrency_.makeSemaphore(1);
  semaphore->wait();
  EXPECT_EQ(thrownText<SimulationStall>([&] { semaphore->wait(); }),
            "The simulated phone waits for ever: a semaphore is waited for that nothing will signal, at 0 s of "
            "virtual time.");
}

TEST_F(VirtualServicesTest, TenMinutesPassInNoTime) {
  const auto queue = concurrency_.makeSerialQueue("queue", QualityOfService::kDefault);
  int frames = 0;
  for (int i = 1; i <= 18'000; ++i) queue->asyncAfter(i * 1s / 30, [&] { ++frames; });
  clock_.sleep(601s);
  EXPECT_EQ(frames, 18'000);
}

}  // namespace
}  // namespace quazor
