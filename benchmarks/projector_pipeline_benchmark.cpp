// The processing of frames in the projector fault experiment: how long a frame blocks the camera, the throughput in
// frames per second, and whether memory stays constant during an hour of frames.
#include "backends/threads/real_clock.h"
#include "backends/threads/thread_concurrency.h"
#include "benchmarks/projector_pipeline_peer.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "host/device/frame_rings.h"
#include "tests/support/fake_camera.h"

#include <benchmark/benchmark.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <fstream>
#include <memory>
#include <semaphore>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace quazor {
namespace {

using SteadyClock = std::chrono::steady_clock;

// Real queues that the benchmark can also access.
class OpenConcurrency final : public Concurrency {
 public:
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label, QualityOfService quality) override {
    auto queue = threads_.makeSerialQueue(label, quality);
    (quality == QualityOfService::kBackground ? processing : receiving) = queue;
    return queue;
  }
  std::shared_ptr<Semaphore> makeSemaphore(long count) override { return threads_.makeSemaphore(count); }

  std::shared_ptr<SerialQueue> receiving;
  std::shared_ptr<SerialQueue> processing;

 private:
  ThreadConcurrency threads_;
};

// As many buffers as a camera has, used in turn.
class BufferPool {
 public:
  PixelBuffer& next() { return buffers_[next_++ % buffers_.size()]; }
  // The number of references not yet released.
  int references() const {
    int references = 0;
    for (const FakePixelBuffer& buffer : buffers_) references += buffer.references();
    return references;
  }

 private:
  std::array<FakePixelBuffer, 64> buffers_;
  std::size_t next_ = 0;
};

// An experiment that streams on its own host thread until frame number `stopCount`.
class StreamingExperiment {
 public:
  explicit StreamingExperiment(std::uint64_t stopCount) {
    stream_->onCall = [this](std::string_view call) {
      if (call == "start") started_.release();
    };
    experiment_ = std::make_shared<QZTesselFaultExperiment>(
        Platform{makeFakeCapture(stream_), std::make_shared<RealClock>(), concurrency_,
                 std::make_shared<FakeReports>(fakeChannels(60), 0)});
    static_cast<void>(
        experiment_->setupWithParameters({{"frameCount", stopCount}, {"timeout", 1e9}}, nullptr, nullptr));
    host_ = std::thread([this] { succeeded_ = experiment_->run(nullptr) != nullptr; });
    started_.acquire();
  }

  void handleFrame(PixelBuffer& buffer, MediaTime time) { stream_->frameHandler()(buffer, time); }
  // Waits for the end of the run.
  void waitForEnd() { host_.join(); }
  bool failed() const { return !succeeded_; }

  // Waits until all delivered frames have been examined.
  void drain() {
    std::binary_semaphore done(0);
    concurrency_->receiving->async([&] { concurrency_->processing->async([&done] { done.release(); }); });
    done.acquire();
  }
  SerialQueue& processing() { return *concurrency_->processing; }

 private:
  std::shared_ptr<FakeStream> stream_ = std::make_shared<FakeStream>();
  std::shared_ptr<OpenConcurrency> concurrency_ = std::make_shared<OpenConcurrency>();
  std::shared_ptr<QZTesselFaultExperiment> experiment_;
  std::binary_semaphore started_{0};
  std::atomic<bool> succeeded_{false};
  std::thread host_;
};

MediaTime timeOf(std::uint64_t frame) { return MediaTime{static_cast<std::int64_t>(frame), 30}; }

void check(benchmark::State& state, bool failed, const BufferPool& pool) {
  if (failed) state.SkipWithError("the run failed");
  if (pool.references() != 0) state.SkipWithError("buffers were kept");
}

// Keeps a queue busy with consecutive tasks of 20 microseconds during its lifetime.
class Saturation {
 public:
  explicit Saturation(SerialQueue& queue) : queue_(queue) { post(); }
  Saturation(const Saturation&) = delete;
  Saturation& operator=(const Saturation&) = delete;
  ~Saturation() {
    on_ = false;
    ended_.acquire();
  }

 private:
  void post() {
    queue_.async([this] {
      const auto end = SteadyClock::now() + std::chrono::microseconds(20);
      while (SteadyClock::now() < end) {
      }
      if (on_) {
        post();
      } else {
        ended_.release();
      }
    });
  }

  SerialQueue& queue_;
  std::atomic<bool> on_{true};
  std::binary_semaphore ended_{0};
};

double quantile(const std::vector<double>& sorted, double fraction) {
  return sorted[static_cast<std::size_t>(fraction * static_cast<double>(sorted.size() - 1))];
}

// From the call of the frame handler to its return, with frames in immediate succession or with a pause in between. The
// processing queue is busy all the time.
void handler(benchmark::State& state, std::chrono::microseconds pause) {
  const auto frames = static_cast<std::uint64_t>(state.max_iterations);
  StreamingExperiment run(frames);
  BufferPool pool;
  std::vector<double> samples;  // in nanoseconds
  samples.reserve(frames);
  {
    const Saturation saturation(run.processing());
    std::uint64_t frame = 0;
    for (auto _ : state) {
      PixelBuffer& buffer = pool.next();
      const MediaTime time = timeOf(++frame);
      const SteadyClock::time_point called = SteadyClock::now();
      run.handleFrame(buffer, time);
      const std::chrono::duration<double> taken = SteadyClock::now() - called;
      state.SetIterationTime(taken.count());
      samples.push_back(taken.count() * 1e9);
      if (pause.count() != 0) std::this_thread::sleep_for(pause);
    }
  }
  run.waitForEnd();
  check(state, run.failed(), pool);
  std::sort(samples.begin(), samples.end());
  state.counters["median_ns"] = quantile(samples, 0.5);
  state.counters["p99_ns"] = quantile(samples, 0.99);
}

// The intake of a frame each millisecond: how long it blocks the camera, told to the record or not. Frames of both
// kinds take turns in small groups, so that whatever else the machine does slows both alike.
void intake(benchmark::State& state) {
  constexpr std::uint64_t kGroup = 32;
  const auto frames = static_cast<std::uint64_t>(state.max_iterations);
  FrameRings rings(0);
  FrameDrain drain(rings);
  const auto clock = std::make_shared<RealClock>();
  rings.begin(clock->now());
  const std::shared_ptr<TracedStream> traced = rings.addStream("camera", clock, WhenTraceIsFull::kLose);
  StreamingExperiment run(frames);
  BufferPool pool;
  std::array<std::vector<double>, 2> samples;  // in nanoseconds: not told, told
  for (auto& kind : samples) kind.reserve(frames);
  std::uint64_t told = 0;
  const FrameDrain::Take take = [&told](std::size_t, const TracedFrame&, std::uint64_t) { ++told; };
  {
    const Saturation saturation(run.processing());
    std::uint64_t frame = 0;
    for (auto _ : state) {
      const bool isTold = frame / kGroup % 2 == 1;
      PixelBuffer& buffer = pool.next();
      const MediaTime time = timeOf(++frame);
      const SteadyClock::time_point called = SteadyClock::now();
      const TracedDelivery delivery(isTold ? traced : nullptr, frame, std::chrono::nanoseconds(0));
      run.handleFrame(buffer, time);
      const std::chrono::duration<double> taken = SteadyClock::now() - called;
      state.SetIterationTime(taken.count());
      samples[isTold ? 1 : 0].push_back(taken.count() * 1e9);
      delivery.handBack();  // where the diagnostic lets go of the frame, which is not the camera's thread
      if (frame % kGroup == 0) drain.drain(false, take);
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
  }
  run.waitForEnd();
  drain.drain(true, take);
  check(state, run.failed(), pool);
  if (told != samples[1].size()) state.SkipWithError("frames are missing");
  for (auto& kind : samples) std::sort(kind.begin(), kind.end());
  state.counters["off_median_ns"] = quantile(samples[0], 0.5);
  state.counters["on_median_ns"] = quantile(samples[1], 0.5);
  state.counters["off_p99_ns"] = quantile(samples[0], 0.99);
  state.counters["on_p99_ns"] = quantile(samples[1], 0.99);
}

constexpr std::uint64_t kBurst = 100'000;

// From the first frame's handler to the end of the run, which the last frame causes.
template <class Pipeline>
double secondsFor(Pipeline& pipeline, BufferPool& pool) {
  const SteadyClock::time_point begin = SteadyClock::now();
  for (std::uint64_t frame = 1; frame <= kBurst; ++frame) pipeline.handleFrame(pool.next(), timeOf(frame));
  pipeline.waitForEnd();
  return std::chrono::duration<double>(SteadyClock::now() - begin).count();
}

void framesOfTheExperiment(benchmark::State& state) {
  for (auto _ : state) {
    StreamingExperiment run(kBurst);
    BufferPool pool;
    state.SetIterationTime(secondsFor(run, pool));
    check(state, run.failed(), pool);
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(kBurst) * state.iterations());
}

void framesOfAsio(benchmark::State& state) {
  const RealClock clock;
  for (auto _ : state) {
    const auto pipeline = std::make_shared<AsioPipeline>(kBurst, clock);
    BufferPool pool;
    state.SetIterationTime(secondsFor(*pipeline, pool));
    pipeline->join();
    check(state, pipeline->failed(), pool);
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(kBurst) * state.iterations());
}

// The resident memory of the process in KiB ("statm" in proc(5)).
double residentKilobytes() {
  std::ifstream statm("/proc/self/statm");
  long total = 0;
  long resident = 0;
  statm >> total >> resident;
  return static_cast<double>(resident) * static_cast<double>(sysconf(_SC_PAGESIZE)) / 1024;
}

// An hour at 30 frames per second, in bursts of one second as fast as the pipeline accepts them.
void memory(benchmark::State& state) {
  constexpr std::uint64_t kHour = 108'000;
  constexpr std::uint64_t kSecond = 30;
  constexpr std::uint64_t kWarm = 9'000;  // five minutes
  for (auto _ : state) {
    StreamingExperiment run(kHour);
    BufferPool pool;
    double warm = 0;
    double most = 0;
    for (std::uint64_t frame = 1; frame <= kHour; ++frame) {
      run.handleFrame(pool.next(), timeOf(frame));
      if (frame % kSecond != 0) continue;
      run.drain();
      if (frame == kWarm) warm = residentKilobytes();
      if (frame >= kWarm && frame % kWarm == 0) most = std::max(most, residentKilobytes());
    }
    run.waitForEnd();
    check(state, run.failed(), pool);
    state.counters["resident_kb"] = warm;
    state.counters["growth_kb"] = most - warm;
  }
}

BENCHMARK_CAPTURE(handler, one behind the other, std::chrono::microseconds(0))
    ->Name("handler/one behind the other")
    ->Iterations(20'000)
    ->UseManualTime();
BENCHMARK_CAPTURE(handler, with a pause, std::chrono::microseconds(1'000))
    ->Name("handler/every millisecond")
    ->Iterations(500)
    ->UseManualTime();
BENCHMARK(intake)->Name("intake/every millisecond")->Iterations(12'000)->UseManualTime();
BENCHMARK(framesOfTheExperiment)->Name("frames/quazor")->Iterations(5)->UseManualTime()->Unit(benchmark::kMillisecond);
BENCHMARK(framesOfAsio)->Name("frames/asio strands")->Iterations(5)->UseManualTime()->Unit(benchmark::kMillisecond);
BENCHMARK(memory)->Name("memory/an hour of frames")->Iterations(1)->Unit(benchmark::kMillisecond);

}  // namespace
}  // namespace quazor

BENCHMARK_MAIN();
