// Cases that the conformance suites cannot produce: a loop is destroyed while another thread is about to wake it.
#include "backends/threads/basic_run_loop.h"

#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <memory>

namespace quazor {
namespace {

// Waking destroys the loop, like a thread that ends before the waking call has returned.
class LastWakeUp final : public RunLoopWaiter {
 public:
  LastWakeUp(std::unique_ptr<BasicRunLoop>& loop, bool& is_gone) : loop_(loop), is_gone_(is_gone) {}
  ~LastWakeUp() override { is_gone_ = true; }

  std::chrono::nanoseconds now() override { return {}; }
  void wait(std::chrono::nanoseconds, const std::function<bool()>&) override { FAIL() << "nothing runs here"; }
  void wake() override {
    bool& is_gone = is_gone_;
    loop_.reset();
    EXPECT_FALSE(is_gone) << "the loop took the waiter with it";
  }

 private:
  std::unique_ptr<BasicRunLoop>& loop_;
  bool& is_gone_;
};

class BasicRunLoopTest : public ::testing::Test {
 protected:
  void makeLoop() { loop_ = std::make_unique<BasicRunLoop>(std::make_shared<LastWakeUp>(loop_, waiter_is_gone_)); }

  bool waiter_is_gone_ = false;
  std::unique_ptr<BasicRunLoop> loop_;
};

TEST_F(BasicRunLoopTest, AStopOutlastsTheLoopThatItEnds) {
  makeLoop();
  loop_->stop();
  EXPECT_EQ(loop_, nullptr);
  EXPECT_TRUE(waiter_is_gone_);
}

TEST_F(BasicRunLoopTest, ASignalOutlastsTheLoopThatItEnds) {
  makeLoop();
  auto source = loop_->makeSource([] {});
  loop_->addSource(source, kRunLoopDefaultMode);
  source->signal();
  EXPECT_EQ(loop_, nullptr);
  EXPECT_FALSE(waiter_is_gone_);
  source.reset();
  EXPECT_TRUE(waiter_is_gone_);
}

}  // namespace
}  // namespace quazor
