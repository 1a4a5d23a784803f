// Serial queues: tasks per second with one and two producers, and how long an idle queue takes to start a task.
#include "benchmarks/serial_queue_peers.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <memory>
#include <semaphore>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

// Each producer posts this many tasks at full speed, and then waits until its last one has run.
constexpr int kBurst = 100'000;

template <class Queue>
void throughput(benchmark::State& state) {
  static std::unique_ptr<Queue> queue;
  static long counter;  // raised by every task, without any synchronisation but the queue's
  if (state.thread_index() == 0) {
    queue = std::make_unique<Queue>();
    counter = 0;
  }
  std::binary_semaphore done(0);
  for (auto _ : state) {  // the first and the last step wait for all producers
    Queue& target = *queue;
    for (int i = 1; i < kBurst; ++i) target.post([] { ++counter; });
    target.post([&done] {
      ++counter;
      done.release();
    });
    done.acquire();
  }
  state.SetItemsProcessed(state.iterations() * kBurst);
  if (state.thread_index() == 0) {
    if (counter != state.iterations() * kBurst * state.threads()) state.SkipWithError("tasks were lost or overlapped");
    queue.reset();
  }
}

double quantile(const std::vector<double>& sorted, double fraction) {
  return sorted[static_cast<std::size_t>(fraction * static_cast<double>(sorted.size() - 1))];
}

// From before the post to the first instruction of the task, after two milliseconds without work.
template <class Queue>
void wakeUp(benchmark::State& state) {
  using Clock = std::chrono::steady_clock;
  Queue queue;
  std::vector<double> samples;  // in nanoseconds
  for (auto _ : state) {
    std::this_thread::sleep_for(std::chrono::milliseconds(2));
    std::binary_semaphore done(0);
    Clock::time_point started;
    const Clock::time_point posted = Clock::now();
    queue.post([&started, &done] {
      started = Clock::now();
      done.release();
    });
    done.acquire();
    const std::chrono::duration<double> taken = started - posted;
    state.SetIterationTime(taken.count());
    samples.push_back(taken.count() * 1e9);
  }
  std::sort(samples.begin(), samples.end());
  state.counters["median_ns"] = quantile(samples, 0.5);
  state.counters["p99_ns"] = quantile(samples, 0.99);
}

template <class Queue>
void registerQueue(const std::string& name) {
  benchmark::RegisterBenchmark(("throughput/" + name).c_str(), throughput<Queue>)
      ->Threads(1)
      ->Threads(2)
      ->UseRealTime()
      ->Unit(benchmark::kMillisecond);
  benchmark::RegisterBenchmark(("wake_up/" + name).c_str(), wakeUp<Queue>)
      ->Iterations(100)
      ->UseManualTime()
      ->Unit(benchmark::kMicrosecond);
}

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  quazor::registerQueue<quazor::QuazorQueue>("quazor");
  quazor::registerQueue<quazor::AsioStrand>("asio strand");
  quazor::registerQueue<quazor::AsioPool>("asio pool");
  quazor::registerQueue<quazor::TbbNode>("tbb node");
  quazor::registerQueue<quazor::MoodycamelBulk>("moodycamel bulk");
  quazor::registerQueue<quazor::MutexQueue>("mutex queue");
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
