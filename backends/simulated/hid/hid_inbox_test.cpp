#include "backends/simulated/hid/hid_inbox.h"

#include "backends/simulated/time/virtual_run_loop.h"
#include "backends/simulated/time/virtual_scheduler.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <memory>
#include <string_view>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;
using ::testing::ElementsAre;
using ::testing::SizeIs;

// An inbox on a loop in virtual time. Reports are recorded by their ID, errors as -1.
class HidInboxTest : public ::testing::Test {
 protected:
  HidInboxTest() { inbox_->setReceiver(receiver()); }
  ~HidInboxTest() override {
    if (inbox_ != nullptr) inbox_->retire();
    run();
  }

  HidDevice::InputReportCallback receiver() {
    return [this](std::uint8_t id, std::span<const std::uint8_t> data, const DiagnosticErrorPtr& error) {
      EXPECT_EQ(data.empty(), error != nullptr);
      seen_.push_back(error != nullptr ? -1 : id);
      if (onInput_) onInput_();
    };
  }
  void take(std::uint8_t id) { inbox_->take(std::make_shared<const HidInput>(HidInput{{id}, nullptr})); }
  void takeError() {
    inbox_->take(std::make_shared<const HidInput>(HidInput{{}, makeError("D", 1, "The sensor is hot.")}));
  }
  void schedule() { inbox_->schedule(*loop_, kRunLoopDefaultMode); }
  void unschedule() { inbox_->unschedule(*loop_, kRunLoopDefaultMode); }
  RunLoopResult run(std::string_view mode = kRunLoopDefaultMode) { return loop_->runInMode(mode, 0ns, false); }

  std::shared_ptr<VirtualScheduler> scheduler_ =
      std::make_shared<VirtualScheduler>(std::make_shared<RandomStrategy>(1));
  VirtualRunLoops loops_{scheduler_};
  RunLoop* loop_ = loops_.currentRunLoop();
  std::shared_ptr<HidInbox> inbox_ = std::make_shared<HidInbox>();
  std::vector<int> seen_;
  std::function<void()> onInput_;
};

TEST_F(HidInboxTest, WhatComesWhileNobodyCanReceiveItIsLost) {
  take(1);  // neither open nor scheduled
  inbox_->open();
  take(2);  // not scheduled
  takeError();
  schedule();
  take(3);
  inbox_->close();  // drops 3
  take(4);
  inbox_->open();
  take(5);
  unschedule();  // drops 5
  schedule();
  take(6);
  run();
  EXPECT_THAT(seen_, ElementsAre(6));
}

TEST_F(HidInboxTest, ALoopThatDoesNotRunLosesReportsButNoErrors) {
  inbox_->open();
  schedule();
  for (int i = 0; i < 70; ++i) take(static_cast<std::uint8_t>(i));
  takeError();
  run();
  run();
  ASSERT_THAT(seen_, SizeIs(65));
  EXPECT_EQ(seen_[63], 63);
  EXPECT_EQ(seen_[64], -1);
}

TEST_F(HidInboxTest, AReceiverThatMakesMoreComeDoesNotOutlastTheLimit) {
  inbox_->open();
  schedule();
  onInput_ = [this] { take(1); };  // endless
  take(1);
  EXPECT_EQ(run(), RunLoopResult::kTimedOut);
  EXPECT_THAT(seen_, SizeIs(HidInbox::kMaxInARound));
  onInput_ = nullptr;
}

TEST_F(HidInboxTest, ErrorsWaitForALoopWhileTheInboxIsOpen) {
  inbox_->open();
  take(1);
  takeError();
  schedule();
  take(2);
  takeError();
  unschedule();
  schedule();
  run();
  EXPECT_THAT(seen_, ElementsAre(-1, -1));
  takeError();
  inbox_->close();
  inbox_->open();
  run();
  EXPECT_THAT(seen_, SizeIs(2));
}

TEST_F(HidInboxTest, WhatWaitsIsHandledWhereTheInboxIsScheduledLater) {
  constexpr std::string_view kOther = "other";
  inbox_->open();
  schedule();
  take(7);
  inbox_->schedule(*loop_, kOther);
  unschedule();
  run(kOther);
  EXPECT_THAT(seen_, ElementsAre(7));
}

TEST_F(HidInboxTest, AUserThatIsGoneLeavesNothingInTheLoop) {
  inbox_->open();
  schedule();
  inbox_->schedule(*loop_, "narrow");
  take(1);
  const std::shared_ptr<HidInbox> held = inbox_;
  inbox_->retire();
  take(2);
  inbox_ = nullptr;
  EXPECT_EQ(loop_->runInMode(kRunLoopDefaultMode, 1s, false), RunLoopResult::kFinished);
  EXPECT_EQ(loop_->runInMode("narrow", 1s, false), RunLoopResult::kFinished);
  EXPECT_THAT(seen_, testing::IsEmpty());
}

TEST_F(HidInboxTest, TheReceiverGoesWithItsUser) {
  const auto token = std::make_shared<int>();
  inbox_->setReceiver([token](auto...) {});
  const std::shared_ptr<HidInbox> held = inbox_;
  inbox_->retire();
  EXPECT_EQ(token.use_count(), 1);
}

}  // namespace
}  // namespace quazor
