// The last owner of an experiment, and where and when the experiment is destroyed.
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"
#include "contract/log_channel.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "tests/support/fake_camera.h"

#include <gtest/gtest.h>

#include <chrono>
#include <future>
#include <memory>
#include <string_view>
#include <thread>

namespace quazor {
namespace {

constexpr double kShortestTimeout = 0.005;  // seconds
constexpr std::chrono::milliseconds kMaxDelay(100);

struct Moment {
  std::chrono::steady_clock::time_point time = std::chrono::steady_clock::now();
  std::thread::id thread = std::this_thread::get_id();
};

// Reports the log line of the timeout.
class TimeoutLog final : public LogBackend {
 public:
  void write(LogLevel, std::string_view, std::string_view, std::string_view text) override {
    if (text == "Timeout has been reached.") timeout_.set_value(Moment());
  }
  Moment timeout() { return timeout_.get_future().get(); }

 private:
  std::promise<Moment> timeout_;
};

// A clock owned only by the experiment, so it is destroyed with the experiment.
class LastClock final : public Clock {
 public:
  explicit LastClock(std::promise<Moment>& end) : end_(end) {}
  ~LastClock() override { end_.set_value(Moment()); }

  std::chrono::nanoseconds now() const override { return clock_.now(); }
  Date date() const override { return clock_.date(); }
  void sleep(std::chrono::nanoseconds duration) override { clock_.sleep(duration); }

 private:
  RealClock clock_;
  std::promise<Moment>& end_;
};

// An experiment whose run is over and had a timeout of a few milliseconds. During the lifetime of this object it is the
// only experiment that logs.
class RunWithTimeout {
 public:
  // The first frame ends the run, or else the timeout, in seconds.
  explicit RunWithTimeout(bool hasFrame, double timeout = kShortestTimeout) {
    sharedLog().setBackend(log_, LogLevel::kError);
    if (hasFrame) {
      stream_->onCall = [this](std::string_view call) {
        if (call == "start") stream_->deliver(buffer_, MediaTime{});
      };
    }
    experiment_ = std::make_shared<QZTesselFaultExperiment>(
        Platform{makeFakeCapture(stream_), std::make_shared<LastClock>(end_), std::make_shared<ThreadConcurrency>(),
                 std::make_shared<FakeReports>(fakeChannels(1), 5)});
    EXPECT_TRUE(experiment_->setupWithParameters({{"frameCount", 1}, {"timeout", timeout}}, nullptr, nullptr));
    const auto result = experiment_->run(nullptr);
    if (result == nullptr) {
      ADD_FAILURE() << "the run failed";
    } else if (hasFrame) {
      EXPECT_EQ(result->measurements().find("FrameCount")->value(), 1);
    } else {
      EXPECT_EQ(result->measurements().find("FrameCount")->value(), 0);
    }
  }
  RunWithTimeout(const RunWithTimeout&) = delete;
  RunWithTimeout& operator=(const RunWithTimeout&) = delete;
  ~RunWithTimeout() { sharedLog().setBackend(nullptr, LogLevel::kError); }

  // The number of owners of the experiment.
  long holders() const { return experiment_.use_count(); }
  // Releases it and returns the time just before that.
  Moment release() {
    const Moment moment;
    experiment_.reset();
    return moment;
  }
  // Waits for the timeout, and for the end of the experiment. May be called once each.
  Moment timeout() { return log_->timeout(); }
  Moment end() { return end_.get_future().get(); }

 private:
  const std::shared_ptr<TimeoutLog> log_ = std::make_shared<TimeoutLog>();
  const std::shared_ptr<FakeStream> stream_ = std::make_shared<FakeStream>();
  FakePixelBuffer buffer_;
  std::promise<Moment> end_;
  std::shared_ptr<QZTesselFaultExperiment> experiment_;
};

// A busy machine is late in some attempts only.
constexpr int kAttempts = 50;

TEST(PendingTimeout, TakesTheExperimentWithItWhenTheHostHasLetGo) {
  for (int i = 0; i < kAttempts; ++i) {
    // A longer timeout makes it more likely that the host on a busy machine releases the experiment first.
    RunWithTimeout run(true, (i + 1) * kShortestTimeout);
    const Moment released = run.release();
    const Moment timeout = run.timeout();
    const Moment end = run.end();
    if (released.time >= timeout.time || end.thread == std::this_thread::get_id()) continue;  // the host was late
    EXPECT_EQ(end.thread, timeout.thread);
    if (end.time - timeout.time < kMaxDelay) return;
  }
  FAIL() << "the experiment did not go in time";
}

TEST(PendingTimeout, LeavesTheExperimentToTheHostThatHoldsIt) {
  RunWithTimeout run(true);
  run.timeout();
  for (int i = 0; i < 30'000 && run.holders() > 1; ++i) std::this_thread::sleep_for(std::chrono::milliseconds(1));
  ASSERT_EQ(run.holders(), 1);
  run.release();
  EXPECT_EQ(run.end().thread, std::this_thread::get_id());
}

TEST(PendingTimeout, HoldsNothingAfterItHasEndedTheRun) {
  for (int i = 0; i < kAttempts; ++i) {
    RunWithTimeout run(false);
    const Moment timeout = run.timeout();
    run.release();  // at the moment at which the timeout releases it too
    if (run.end().time - timeout.time < kMaxDelay) return;
  }
  FAIL() << "the experiment did not go in time";
}

}  // namespace
}  // namespace quazor
