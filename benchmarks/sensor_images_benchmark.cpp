// The cost of an image of the display sensor: parsing its record, compared with a plain copy of the stored samples, and
// the way of a report from the device's callback through stream and experiment.
#include "diagnostics/sensor_images/nimbe_image_experiment.h"
#include "tests/support/fake_sensor.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>

namespace quazor {
namespace {

constexpr std::size_t kKeptSize = 384;
constexpr std::size_t kKeptOffset = 16;

NimbeImageRecord imageRecord() {
  NimbeImageRecord record{};
  const Bytes report = imageReport(1);
  std::copy(report.begin(), report.end(), record.begin());
  return record;
}

// Both loops make the compiler assume that the record has changed and that the stored data is read.
void copySamples(benchmark::State& state) {
  NimbeImageRecord record = imageRecord();
  for (auto _ : state) {
    benchmark::DoNotOptimize(record.data());
    std::array<std::uint8_t, kKeptSize> kept;
    std::memcpy(kept.data(), record.data() + kKeptOffset, kKeptSize);
    benchmark::DoNotOptimize(kept.data());
    benchmark::ClobberMemory();
  }
}

void readRecord(benchmark::State& state) {
  NimbeImageRecord record = imageRecord();
  for (auto _ : state) {
    benchmark::DoNotOptimize(record.data());
    QZNimbeCorvaneImage image(record);
    benchmark::DoNotOptimize(&image);
    benchmark::ClobberMemory();
  }
}

// Converted as in the result: every sample becomes a Value.
void readValues(benchmark::State& state) {
  const QZNimbeCorvaneImage image(imageRecord());
  for (auto _ : state) {
    benchmark::DoNotOptimize(image.dScanI());
    benchmark::DoNotOptimize(image.dScanQ());
  }
}

// The images are kept, as in every run, so a run gets as many reports as a long capture.
void callback(benchmark::State& state) {
  FakeSensor sensor({});
  const auto experiment = std::make_shared<QZNimbeImageExperiment>(sensor.platform());
  const Bytes report = imageReport(1);
  sensor.loop.at(std::chrono::nanoseconds(0), [&] {
    for (auto _ : state) sensor.device->deliver(kNimbeImageReportID, report);
    sensor.loop.stop();
  });
  const auto expected = static_cast<std::size_t>(state.max_iterations);
  const bool ready = experiment->setupWithParameters({{"images", -1}, {"timeout", 1}}, nullptr, nullptr);
  const auto result = ready ? experiment->run(nullptr) : nullptr;
  const Value* images = result == nullptr ? nullptr : result->auxiliaryData().find("images");
  if (images == nullptr || images->array()->size() != expected) state.SkipWithError("images are missing");
}

BENCHMARK(copySamples)->Name("record/copy of 384 bytes");
BENCHMARK(readRecord)->Name("record/read");
BENCHMARK(readValues)->Name("record/samples as values");
BENCHMARK(callback)->Name("callback")->Iterations(10'000);

}  // namespace
}  // namespace quazor

BENCHMARK_MAIN();
