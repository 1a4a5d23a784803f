// The cost of report channels in a projector fault run: filter, two snapshots, their difference and the result, for
// phones with few and with very many channels.
#include "diagnostics/projector_fault/fixed_clock_for_tests.h"
#include "diagnostics/projector_fault/tessel_fault_experiment.h"
#include "platform/concurrency.h"
#include "tests/support/fake_camera.h"

#include <benchmark/benchmark.h>
#include <malloc.h>
#include <time.h>

#include <chrono>
#include <cstddef>
#include <limits>
#include <memory>
#include <string_view>
#include <utility>

namespace quazor {
namespace {

// The processor time of this thread, which performs the whole run, so other processes have no influence.
std::chrono::nanoseconds processorTime() {
  timespec used{};
  clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
  return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
}

// Runs everything at once on the calling thread, including delayed tasks.
class ImmediateQueue final : public SerialQueue {
 public:
  void async(Task task) override { task(); }
  void asyncAfter(std::chrono::nanoseconds, Task task) override { task(); }
};

class NoSemaphore final : public Semaphore {
 public:
  void signal() override {}
  void wait() override {}
};

class ImmediateConcurrency final : public Concurrency {
 public:
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view, QualityOfService) override {
    return std::make_shared<ImmediateQueue>();
  }
  std::shared_ptr<Semaphore> makeSemaphore(long) override { return std::make_shared<NoSemaphore>(); }
};

// Records the thread's processor time when it is called.
class TimedReports final : public ReportFacility {
 public:
  explicit TimedReports(FakeReports::Descriptions channels) : reports_(std::move(channels), 5) {}

  std::shared_ptr<const ReportChannelSet> reportWithOnlySimpleChannels(DiagnosticErrorPtr* error) override {
    asked = processorTime();
    return reports_.reportWithOnlySimpleChannels(error);
  }

  std::chrono::nanoseconds asked{};

 private:
  FakeReports reports_;
};

// Everything from the run's first call of the report facility on; its timeout ends the stream at once. The run uses
// half of the facility's channels.
void channels(benchmark::State& state) {
  const auto count = static_cast<std::size_t>(state.range(0));
  const auto reports = std::make_shared<TimedReports>(fakeChannels(count));
  const Platform platform{makeFakeCapture(std::make_shared<FakeStream>()), std::make_shared<FixedClock>(),
                          std::make_shared<ImmediateConcurrency>(), reports};
  const auto run = [&]() -> double {
    const auto experiment = std::make_shared<QZTesselFaultExperiment>(platform);
    auto result = experiment->run(nullptr);
    const std::chrono::duration<double> taken = processorTime() - reports->asked;
    if (result == nullptr || result->measurements().size() != count + 7) state.SkipWithError("the run failed");
    return taken.count();
  };
  // The first run allocates its memory page by page from the kernel, so it is shown separately.
  const double first = run();
  double seconds = 0;
  for (auto _ : state) {
    const double taken = run();
    state.SetIterationTime(taken);
    seconds += taken;
  }
  const double runs = static_cast<double>(state.iterations());
  state.counters["ns_per_channel"] = 1e9 * seconds / runs / static_cast<double>(count);
  state.counters["first_ns_per_channel"] = 1e9 * first / static_cast<double>(count);
}

BENCHMARK(channels)
    ->Name("channels")
    ->Arg(60)
    ->Arg(10'000)
    ->Arg(1'000'000)
    ->UseManualTime()
    ->Unit(benchmark::kMicrosecond);

}  // namespace
}  // namespace quazor

int main(int argc, char** argv) {
  // Keeps freed memory in the process, so that the kernel's page allocation does not distort the figures.
  mallopt(M_MMAP_MAX, 0);
  mallopt(M_TRIM_THRESHOLD, std::numeric_limits<int>::max());
  benchmark::Initialize(&argc, argv);
  if (benchmark::ReportUnrecognizedArguments(argc, argv)) return 2;
  benchmark::RunSpecifiedBenchmarks();
  return 0;
}
