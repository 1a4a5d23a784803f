// The projector fault experiment on real threads: all events that can end a run, concurrently and repeatedly. Also run
// it under the thread sanitizer; QUAZOR_THOROUGH in the environment requests many more rounds.
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "tests/support/effort.h"
#include "tests/support/fake_camera.h"

#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <iostream>
#include <map>
#include <memory>
#include <random>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

namespace quazor {
namespace {

constexpr std::size_t kThreads = 3;       // of the camera
constexpr std::size_t kFrames = 8;        // of each thread
constexpr std::size_t kMaxTimeout = 600;  // microseconds

// The parameters of a round: the frames that each thread delivers, in a burst or with pauses, the frame that ends a run
// without a bad one, and whether the host tears down before it releases the experiment.
struct Round {
  std::array<std::array<FrameKind, kFrames>, kThreads> frames{};
  bool hasPauses = false;
  std::uint64_t stopCount = 0;
  double timeout = 0;
  bool hostTearsDown = false;
  bool hasBadFrames = false;
};

// In half of the rounds frames fail on both queues concurrently: one is examined while the next one is received.
Round drawRound(std::minstd_rand& random) {
  Round round;
  const std::size_t most = kThreads * kFrames;
  if (random() % 2 == 0) {
    round.hasBadFrames = true;
    const std::size_t at = random() % (kFrames - 1);
    for (auto& frames : round.frames) {
      frames[at] = kFrameKinds[1 + random() % 2];
      frames[at + 1] = kFrameKinds[3 + random() % 3];
    }
  }
  round.hasPauses = random() % 2 == 0;
  // Usually close to the last frame that can end the run.
  round.stopCount = random() % 2 == 0 ? random() % most : most + random() % 2;
  round.timeout = 1e-6 * static_cast<double>(random() % kMaxTimeout);
  round.hostTearsDown = random() % 2 == 0;
  return round;
}

// Records the order of the calls to the stream.
struct StreamCalls {
  std::atomic<int> countersRead{0};
  std::atomic<int> stops{0};
  std::atomic<bool> stoppedBeforeCountersWereRead{false};
};

class ProjectorStress : public testing::Test {
 protected:
  ProjectorStress() {
    for (auto& buffers : buffers_) {
      for (auto& buffer : buffers) buffer = std::make_unique<FakePixelBuffer>();
    }
  }
  void TearDown() override {
    for (const auto& [end, count] : ends_) std::cout << "[stress] " << count << " rounds: " << end << '\n';
  }

  // Runs a round until nothing of it is left.
  void run(const Round& round) {
    calls_.countersRead = 0;
    calls_.stops = 0;
    for (auto& delivered : delivered_) delivered = 0;
    for (std::size_t i = 0; i < kThreads; ++i) {
      for (std::size_t j = 0; j < kFrames; ++j) buffers_[i][j]->renew(round.frames[i][j]);
    }
    const std::weak_ptr<void> watch = runExperiment(round);
    for (int i = 0; i < 600'000 && !watch.expired(); ++i) std::this_thread::sleep_for(std::chrono::microseconds(50));
    ASSERT_TRUE(watch.expired()) << "somebody still holds the experiment";
    EXPECT_EQ(calls_.countersRead, 1);
    EXPECT_EQ(calls_.stops, 1);
    EXPECT_FALSE(calls_.stoppedBeforeCountersWereRead);
    checkBuffers(round);
  }

 private:
  // Creates an experiment, runs it and releases it at once.
  std::weak_ptr<void> runExperiment(const Round& round) {
    std::vector<std::thread> threads;
    const auto stream = std::make_shared<FakeStream>();
    stream->onCall = [&](std::string_view call) {
      if (call == "start") {
        for (std::size_t i = 0; i < kThreads; ++i)
          threads.emplace_back([&, i] { deliver(i, round.hasPauses, *stream); });
      } else if (call == "get ErrorCounters") {
        ++calls_.countersRead;
      } else if (call == "stop") {
        ++calls_.stops;
        if (calls_.countersRead == 0) calls_.stoppedBeforeCountersWereRead = true;
      }
    };
    auto experiment = std::make_shared<QZTesselFaultExperiment>(
        Platform{makeFakeCapture(stream), std::make_shared<RealClock>(), std::make_shared<ThreadConcurrency>(),
                 std::make_shared<FakeReports>(channels_, 5)});
    const std::weak_ptr<void> watch = experiment;
    EXPECT_TRUE(experiment->setupWithParameters({{"frameCount", round.stopCount}, {"timeout", round.timeout}}, nullptr,
                                                nullptr));
    DiagnosticErrorPtr error;
    const auto result = experiment->run(&error);
    if (round.hostTearsDown) {
      EXPECT_TRUE(experiment->teardown(nullptr));
    }
    experiment.reset();
    checkOutcome(round, result.get(), error);
    for (std::thread& thread : threads) thread.join();
    return watch;
  }

  void deliver(std::size_t thread, bool hasPauses, FakeStream& stream) {
    std::size_t delivered = 0;
    while (delivered < kFrames && stream.deliver(*buffers_[thread][delivered], MediaTime{})) {
      ++delivered;
      // About as long as the processing queue needs to wake up; the system does not sleep for shorter times.
      if (hasPauses) std::this_thread::sleep_for(std::chrono::microseconds(1));
    }
    delivered_[thread] = delivered;
  }

  void checkOutcome(const Round& round, const QZExperimentResult* result, const DiagnosticErrorPtr& error) {
    if (result == nullptr) {
      ASSERT_NE(error, nullptr);
      EXPECT_TRUE(round.hasBadFrames);
      std::string text = error->localizedDescription();
      EXPECT_TRUE(error->code() == 206 || error->code() == 213) << text;
      for (const char digit : std::string_view("0123456789")) std::erase(text, digit);
      ++ends_[text];
      return;
    }
    EXPECT_EQ(error, nullptr);
    const Measurement* frames = result->measurements().find("FrameCount");
    ASSERT_NE(frames, nullptr);
    EXPECT_LE(frames->value(), static_cast<double>(kThreads * kFrames));
    EXPECT_EQ(result->measurements().size(), 8U);
    ASSERT_NE(result->measurements().find("Projector"), nullptr);
    EXPECT_EQ(result->measurements().find("Projector")->value(), 6);
    ++ends_[frames->value() < static_cast<double>(round.stopCount) ? "timeout" : "last frame, or timeout beside it"];
  }

  // A delivered buffer is released only if its frame was passed on.
  void checkBuffers(const Round& round) const {
    for (std::size_t i = 0; i < kThreads; ++i) {
      for (std::size_t j = 0; j < kFrames; ++j) {
        const int references = buffers_[i][j]->references();
        if (j >= delivered_[i]) {
          EXPECT_EQ(references, 0);
        } else if (round.frames[i][j] >= FrameKind::kWithoutMetadata) {
          EXPECT_EQ(references, 1);
        } else {
          EXPECT_TRUE(references == 0 || references == 1) << references;
        }
      }
    }
  }

  const FakeReports::Descriptions channels_ = fakeChannels(1);
  std::array<std::array<std::unique_ptr<FakePixelBuffer>, kFrames>, kThreads> buffers_;
  std::array<std::size_t, kThreads> delivered_{};  // written by each thread, read after the thread was joined
  StreamCalls calls_;
  std::map<std::string, int> ends_;
};

TEST_F(ProjectorStress, EndsOnceHoweverItsEndsMeet) {
  const int rounds = isThorough() ? 10'000 : 1'000;
  std::minstd_rand random(1);
  for (int i = 0; i < rounds; ++i) {
    run(drawRound(random));
    ASSERT_FALSE(HasFailure()) << "round " << i;
  }
}

}  // namespace
}  // namespace quazor
