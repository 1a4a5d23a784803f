// What it costs the path of a frame that the phone tells it to the record: from one call of a handler to the next, on a
// simulated phone in real time that delivers frames one behind the other, with the trace on and off. The rings are new
// for each of the runs, as they are for a diagnostic.
#include "backends/simulated/scenario/scenario.h"
#include "backends/simulated/simulated_phone.h"
#include "host/device/frame_rings.h"
#include "host/run/frame_teller.h"
#include "platform/capture_keys.h"
#include "platform/pixel_buffer.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using SteadyClock = std::chrono::steady_clock;

constexpr std::uint64_t kBatch = 1'000;  // a ring has room for it
constexpr const char* kCamera = "wide";

// A phone with one camera, whose own frames come too seldom to matter.
Scenario oneCamera() {
  Scenario scenario;
  Camera camera;
  camera.id = kCamera;
  camera.port = "BackFacingCamera";
  camera.formats.emplace_back().maximumFrameRate = 1;
  scenario.cameras.push_back(std::move(camera));
  return scenario;
}

// A handler that only notes when it is called.
// Thread: one at a time.
class Streaming {
 public:
  explicit Streaming(FrameTrace* trace) : phone_(oneCamera(), PhoneTime::kReal, 0) {
    if (trace != nullptr) phone_.traceFrames(*trace);
    calls_.reserve(kBatch);
    const auto handler =
        std::make_shared<PixelBufferHandler>([this](PixelBuffer&, MediaTime) { calls_.push_back(SteadyClock::now()); });
    const std::string output(capture_key::PrimaryScaler);
    const Dictionary handlers{{std::string(capture_key::PixelBufferHandler), handler}};
    device_ = phone_.platform().capture->createPlugIn()->device(nullptr);
    const CaptureStreams streams = *device_->streams(nullptr);
    isStarted_ = device_->requestControlOfStreams(streams, nullptr) &&
                 streams[0]->setValue(Dictionary{{output, true}}, capture_key::VideoOutputsEnabled, nullptr) &&
                 streams[0]->setValue(Dictionary{{output, handlers}}, capture_key::VideoOutputHandlers, nullptr) &&
                 streams[0]->start(nullptr);
  }
  Streaming(const Streaming&) = delete;
  Streaming& operator=(const Streaming&) = delete;
  ~Streaming() { static_cast<void>(device_->invalidate(nullptr)); }

  bool isStarted() const { return isStarted_; }

  // Adds the nanoseconds between the frames of a batch.
  void deliver(std::vector<double>& samples) {
    calls_.clear();
    phone_.deliverFrames(kCamera, kBatch);
    for (std::size_t i = 1; i < calls_.size(); ++i) {
      samples.push_back(std::chrono::duration<double, std::nano>(calls_[i] - calls_[i - 1]).count());
    }
  }

 private:
  SimulatedPhone phone_;
  std::vector<SteadyClock::time_point> calls_;
  std::shared_ptr<CaptureDevice> device_;
  bool isStarted_ = false;
};

double quantile(const std::vector<double>& sorted, double fraction) {
  return sorted[static_cast<std::size_t>(fraction * static_cast<double>(sorted.size() - 1))];
}

void frames(benchmark::State& state, bool isTraced) {
  FrameRings rings(TraceSetting::kDefaultFrames);
  FrameDrain drain(rings);
  Streaming run(isTraced ? &rings : nullptr);
  if (!run.isStarted()) return state.SkipWithError("the stream did not start");
  std::vector<double> samples;
  std::uint64_t told = 0;
  for (auto _ : state) {
    run.deliver(samples);
    drain.drain(false, [&told](std::size_t, const TracedFrame&, std::uint64_t) { ++told; });
  }
  const std::uint64_t expected = isTraced ? kBatch * static_cast<std::uint64_t>(state.iterations()) : 0;
  if (told < expected || samples.empty()) return state.SkipWithError("frames are missing");
  std::sort(samples.begin(), samples.end());
  state.counters["median_ns"] = quantile(samples, 0.5);
  state.counters["p99_ns"] = quantile(samples, 0.99);
}

BENCHMARK_CAPTURE(frames, off, false)->Name("frames/trace off")->Iterations(5);
BENCHMARK_CAPTURE(frames, on, true)->Name("frames/trace on")->Iterations(5);

}  // namespace
}  // namespace quazor

BENCHMARK_MAIN();
