// Serial queues: tasks per second with one and two producers, and the time in which an idle queue starts a task.
#include "benchmarks/serial_queue_peers.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <random>
#include <semaphore>
#include <string>
#include <thread>
#include <vector>

namespace quazor {
namespace {

// Each producer posts this many tasks at full speed and then waits for its last one.
constexpr int kBurst = 100'000;

template <class Queue>
void throughput(benchmark::State& state) {
  static std::unique_ptr<Queue> queue;
  static long counter;  // incremented by every task, synchronised only by the queue
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

using SteadyClock = std::chrono::steady_clock;

// The time in nanoseconds from the post to the first instruction of the task, after two idle milliseconds.
template <class Queue>
double nanosecondsToWake(Queue& queue) {
  std::this_thread::sleep_for(std::chrono::milliseconds(2));
  std::binary_semaphore done(0);
  SteadyClock::time_point started;
  const SteadyClock::time_point posted = SteadyClock::now();
  queue.post([&started, &done] {
    started = SteadyClock::now();
    done.release();
  });
  done.acquire();
  return std::chrono::duration<double, std::nano>(started - posted).count();
}

// A queue and its measurements.
struct WakeUps {
  std::string name;
  std::function<double()> measure;
  std::vector<double> samples;
};

template <class Queue>
WakeUps wakeUpsOf(const std::string& name) {
  return {name, [queue = std::make_shared<Queue>()] { return nanosecondsToWake(*queue); }, {}};
}

// The queues take turns in varying order, so that other activity of the machine affects all of them alike.
void wakeUp(benchmark::State& state) {
  std::vector<WakeUps> queues = {wakeUpsOf<QuazorQueue>("quazor"),
                                 wakeUpsOf<AsioStrand>("asio strand"),
                                 wakeUpsOf<AsioPool>("asio pool"),
                                 wakeUpsOf<TbbNode>("tbb node"),
                                 wakeUpsOf<MoodycamelBulk>("moodycamel bulk"),
                                 wakeUpsOf<MutexQueue>("mutex queue")};
  std::minstd_rand random(1);
  for (auto _ : state) {
    std::shuffle(queues.begin(), queues.end(), random);
    for (WakeUps& queue : queues) queue.samples.push_back(queue.measure());
  }
  for (WakeUps& queue : queues) {
    std::sort(queue.samples.begin(), queue.samples.end());
    state.counters[queue.name + " median_ns"] = quantile(queue.samples, 0.5);
    state.counters[queue.name + " p99_ns"] = quantile(queue.samples, 0.99);
  }
}

template <class Queue>
void registerThroughput(const std::string& name) {
  benchmark::RegisterBenchmark(("throughput/" + name).c_str(), throughput<Queue>)
      ->Threads(1)
      ->Threads(2)
      ->UseRealTime()
      ->Unit(benchmark::kMillisecond);
}

BENCHMARK(wakeUp)->Name("wake_up")->Iterations(500)->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  quazor::registerThroughput<quazor::QuazorQueue>("quazor");
  quazor::registerThroughput<quazor::AsioStrand>("asio strand");
  quazor::registerThroughput<quazor::AsioPool>("asio pool");
  quazor::registerThroughput<quazor::TbbNode>("tbb node");
  quazor::registerThroughput<quazor::MoodycamelBulk>("moodycamel bulk");
  quazor::registerThroughput<quazor::MutexQueue>("mutex queue");
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
