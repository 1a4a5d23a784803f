// Run loops: wake-ups per second between two threads, signals per second from one thread to another, and runs per
// second that handle one source and are stopped by it.
#include "benchmarks/run_loop_peers.h"

#include <benchmark/benchmark.h>

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <semaphore>
#include <string>
#include <thread>
#include <utility>

namespace quazor {
namespace {

constexpr std::size_t kSources = 32;

// A thread whose loop runs during the lifetime of this object. `handler` is called on the thread, except for the last
// signal.
template <class Loop>
class LoopThread {
 public:
  explicit LoopThread(std::function<void()> handler, std::size_t sources = 1)
      : thread_([this, work = std::move(handler), sources] {
          Loop* self = nullptr;
          Loop loop(
              [&] {
                if (closing_.load()) {
                  self->stop();
                } else {
                  work();
                }
              },
              sources);
          self = &loop;
          loop_.store(&loop);
          loop_.notify_one();
          loop.run();
        }) {
    loop_.wait(nullptr);
  }
  LoopThread(const LoopThread&) = delete;
  LoopThread& operator=(const LoopThread&) = delete;
  ~LoopThread() {
    closing_.store(true);
    signal();
    thread_.join();
  }

  void signal(std::size_t source = 0) { loop_.load(std::memory_order_relaxed)->signal(source); }

 private:
  std::atomic<Loop*> loop_{nullptr};
  std::atomic<bool> closing_{false};
  std::thread thread_;
};

// Signals the other thread, whose handler signals back: two wake-ups.
template <class Loop>
void wakeUps(benchmark::State& state) {
  Loop here([] {});
  LoopThread<Loop> there([&here] { here.signal(); });
  for (auto _ : state) {
    there.signal();
    here.runOnce();
  }
  state.SetItemsProcessed(state.iterations() * 2);
}

// Signals one source after the other at full speed, and none again before all have been handled.
template <class Loop>
void signals(benchmark::State& state) {
  std::size_t handled = 0;
  std::binary_semaphore done(0);
  LoopThread<Loop> there(
      [&] {
        if (++handled % kSources == 0) done.release();
      },
      kSources);
  for (auto _ : state) {
    for (std::size_t source = 0; source < kSources; ++source) there.signal(source);
    done.acquire();
  }
  state.SetItemsProcessed(static_cast<std::int64_t>(state.iterations() * kSources));
}

template <class Loop>
void stoppedRuns(benchmark::State& state) {
  Loop* here = nullptr;
  Loop loop([&here] { here->stop(); });
  here = &loop;
  for (auto _ : state) {
    loop.signal();
    loop.run();
  }
  state.SetItemsProcessed(state.iterations());
}

template <class Loop>
void registerLoop(const std::string& name) {
  benchmark::RegisterBenchmark(("wake_ups/" + name).c_str(), wakeUps<Loop>)->UseRealTime();
  benchmark::RegisterBenchmark(("signals/" + name).c_str(), signals<Loop>)->UseRealTime();
  benchmark::RegisterBenchmark(("stopped_runs/" + name).c_str(), stoppedRuns<Loop>)->UseRealTime();
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  quazor::registerLoop<quazor::QuazorLoop>("quazor");
  quazor::registerLoop<quazor::DescriptorLoop>("quazor descriptors");
  quazor::registerLoop<quazor::GLibLoop>("glib");
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
