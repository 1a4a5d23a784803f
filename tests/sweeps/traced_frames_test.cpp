// On every installed simulated phone, the trace has exactly the frames that a user of the cameras sees.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "host/device/frame_rings.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"
#include "tests/support/shipped_scenario.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <iterator>
#include <map>
#include <memory>
#include <optional>
#include <random>
#include <string>
#include <vector>

namespace quazor {
namespace {

using namespace std::chrono_literals;

// The variable QUAZOR_SEEDS is for longer runs by hand.
std::uint64_t seedsToTry() {
  const char* const text = std::getenv("QUAZOR_SEEDS");
  return text == nullptr ? 8 : std::strtoull(text, nullptr, 10);
}

// One camera as its user sees it.
struct SeenStream {
  std::chrono::nanoseconds started{};
  std::vector<TracedFrame> frames;
  std::map<PixelBuffer*, std::size_t> kept;  // buffers that were not handed back, and their frames
  std::vector<std::uint64_t> held;           // the numbers of the frames whose buffers are in use
};

// A user of all cameras of a phone in virtual time. It keeps some buffers for a while or for ever, takes its time with
// others, and notes what happens with its own clock.
// Thread: one at a time.
class CameraUser {
 public:
  CameraUser(const Scenario& scenario, std::uint64_t seed) : scenario_(scenario), random_(seed) {
    scenario_.faults.clear();
    phone_ = std::make_unique<SimulatedPhone>(scenario_, PhoneTime::kVirtual, seed);
    clock_ = phone_->platform().clock;
    clock_->sleep(std::chrono::nanoseconds(seed * 977));
    origin_ = clock_->now();
    clock_->sleep(13ns);
    rings_.begin(origin_);
    phone_->traceFrames(rings_);
    seen_.resize(scenario_.cameras.size());
  }

  // Streams twice with all cameras.
  void stream() {
    const std::shared_ptr<CapturePlugIn> plugIn = phone_->platform().capture->createPlugIn();
    device_ = plugIn == nullptr ? nullptr : plugIn->device(nullptr);
    if (device_ == nullptr) return;
    streams_ = *device_->streams(nullptr);
    ASSERT_EQ(streams_.size(), seen_.size());
    static_cast<void>(device_->requestControlOfStreams(streams_, nullptr));
    for (std::size_t i = 0; i < streams_.size(); ++i) handle(i);
    for (const std::chrono::nanoseconds duration : {std::chrono::nanoseconds(500ms), std::chrono::nanoseconds(90ms)}) {
      for (std::size_t i = 0; i < streams_.size(); ++i) {
        seen_[i].started = clock_->now() - origin_;
        static_cast<void>(streams_[i]->start(nullptr));
      }
      clock_->sleep(duration);
      for (const auto& stream : streams_) static_cast<void>(stream->stop(nullptr));
      clock_->sleep(50ms);  // for frames that come after the stop
    }
  }

  std::size_t compare() {
    std::vector<std::vector<TracedFrame>> traced(seen_.size());
    FrameDrain drain(rings_);
    drain.drain(true, [&traced](std::size_t stream, const TracedFrame& frame, std::uint64_t step) {
      EXPECT_EQ(step, 1U);
      traced.at(stream).push_back(frame);
    });
    EXPECT_EQ(drain.size(), seen_.size());
    std::size_t frames = 0;
    for (std::size_t i = 0; i < seen_.size(); ++i) {
      EXPECT_EQ(drain.nameOf(i), scenario_.cameras[i].id);
      EXPECT_EQ(traced[i].size(), seen_[i].frames.size());
      EXPECT_TRUE(traced[i] == seen_[i].frames) << drain.nameOf(i);
      EXPECT_EQ(drain.takeLost(i), 0U);
      frames += traced[i].size();
    }
    return frames;
  }

 private:
  void handle(std::size_t index) {
    const std::string output(capture_key::PrimaryScaler);
    const auto handler = std::make_shared<PixelBufferHandler>(
        [this, index](PixelBuffer& buffer, MediaTime time) { take(index, buffer, time); });
    CaptureStream& stream = *streams_[index];
    static_cast<void>(stream.setValue(Dictionary{{output, true}}, capture_key::VideoOutputsEnabled, nullptr));
    static_cast<void>(
        stream.setValue(Dictionary{{output, Dictionary{{std::string(capture_key::PixelBufferHandler), handler}}}},
                        capture_key::VideoOutputHandlers, nullptr));
  }

  std::int64_t now() const { return (clock_->now() - origin_).count(); }

  // The phone says which buffers of the camera are in use; one of them is new.
  std::int64_t numberOfNewFrame(std::size_t index) {
    std::vector<std::uint64_t> held;
    for (const SimulatedPhone::HeldBuffer& one : phone_->buffersHeld()) {
      if (one.camera == scenario_.cameras[index].id) held.push_back(one.frame);
    }
    std::vector<std::uint64_t> added;
    std::ranges::sort(seen_[index].held);
    std::ranges::set_difference(held, seen_[index].held, std::back_inserter(added));
    EXPECT_EQ(added.size(), 1U);
    seen_[index].held.push_back(added.at(0));
    return static_cast<std::int64_t>(added.at(0));
  }

  void forget(SeenStream& seen, std::int64_t number) {
    seen.held.erase(std::ranges::find(seen.held, static_cast<std::uint64_t>(number)));
  }

  void take(std::size_t index, PixelBuffer& buffer, MediaTime time) {
    SeenStream& seen = seen_[index];
    const std::size_t place = seen.frames.size();
    EXPECT_EQ(time.timescale, 1'000'000'000);
    const std::int64_t number = numberOfNewFrame(index);
    seen.frames.push_back({number, seen.started.count() + time.value, now(), std::nullopt});
    if (random_() % 8 == 0) clock_->sleep(std::chrono::nanoseconds(random_() % 5'000'000));
    if (random_() % 6 == 0) {
      buffer.retain();
      seen.kept.emplace(&buffer, place);
      return;
    }
    if (random_() % 4 == 0 && !seen.kept.empty()) {
      const auto [kept, itsPlace] = *seen.kept.begin();
      seen.kept.erase(seen.kept.begin());
      seen.frames[itsPlace].returned = now();
      forget(seen, seen.frames[itsPlace].number);
      kept->release();
    }
    seen.frames[place].returned = now();  // the phone hands it back when this function returns
    forget(seen, number);
  }

  Scenario scenario_;
  std::mt19937_64 random_;
  FrameRings rings_{0};
  std::vector<SeenStream> seen_;
  std::unique_ptr<SimulatedPhone> phone_;
  std::shared_ptr<Clock> clock_;
  std::chrono::nanoseconds origin_{};
  std::shared_ptr<CaptureDevice> device_;
  CaptureStreams streams_;
};

TEST(TracedFramesTest, AreThoseThatAUserSeesOnEveryPhone) {
  const std::uint64_t seeds = seedsToTry();
  ASSERT_GT(seeds, 0U);
  std::size_t phones = 0;
  std::size_t frames = 0;
  for (const std::string& name : shippedScenarios()) {
    const Scenario scenario = shippedScenario(name);
    ++phones;
    for (std::uint64_t seed = 0; seed < seeds; ++seed) {
      CameraUser user(scenario, seed);
      user.stream();
      frames += user.compare();
      ASSERT_FALSE(testing::Test::HasFailure()) << name << ", seed " << seed;
    }
  }
  EXPECT_GT(phones, 150U);
  EXPECT_GT(frames, 10 * phones * seeds);
}

}  // namespace
}  // namespace quazor
