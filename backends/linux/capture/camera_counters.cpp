#include "backends/linux/capture/camera_counters.h"

#include "backends/linux/system/linux_error.h"
#include "platform/capture_keys.h"

#include <array>
#include <cerrno>
#include <charconv>
#include <cmath>
#include <fstream>
#include <string>
#include <system_error>

namespace quazor {
namespace {

// Read by the diagnostics of the infrared camera.
constexpr std::array<std::string_view, 6> kDefaultCounters{
    capture_key::I2CErrorCount, capture_key::MIPIErrorCount, "LPDPErrorCount", "UARTErrorCount", "SIFErrorCount",
    "ProjectorErrorCount"};

std::optional<std::uint64_t> numberIn(const std::filesystem::path& file, DiagnosticErrorPtr* error) {
  errno = 0;
  std::ifstream stream(file);
  std::string text;
  if (!(stream >> text)) {
    failSystemCall(error, "reading a number", file.string(), errno == 0 ? ENODATA : errno);
    return std::nullopt;
  }
  std::uint64_t number = 0;
  const char* const end = text.data() + text.size();
  const auto [parsed, problem] = std::from_chars(text.data(), end, number);
  if (problem == std::errc() && parsed == end) return number;
  failLinux(error, LinuxErrorCode::kBadValue, file.string() + " has no number: " + text);
  return std::nullopt;
}

std::optional<std::uint64_t> read(const ErrorCounterBinding& binding, const CameraControls& camera,
                                  DiagnosticErrorPtr* error) {
  if (binding.file) return numberIn(*binding.file, error);
  const std::optional<CameraControl> control = camera.control(binding.control.value_or(""), error);
  const std::optional<std::int64_t> value = control ? control->read(error) : std::nullopt;
  if (!value) return std::nullopt;
  return static_cast<std::uint64_t>(*value);
}

}  // namespace

void FrameCounts::count(std::uint32_t sequence, std::chrono::nanoseconds timestamp, bool isBad) {
  constexpr std::uint32_t kBackwards = 1U << 31;
  if (lastSequence) {
    const std::uint32_t step = sequence - *lastSequence;
    if (step > 1 && step < kBackwards) sequenceGaps += step - 1;
  }
  lastSequence = sequence;
  if (isBad) {
    ++badBuffers;
    return;
  }
  if (!first) first = timestamp;
  ++frames;
}

std::int64_t frameOffset(const FrameCounts& camera, const FrameCounts& master, FrameInterval interval) {
  if (!camera.first || !master.first || interval.numerator == 0) return 0;
  const std::chrono::duration<double> later = *camera.first - *master.first;
  return std::llround(later.count() * interval.framesPerSecond());
}

std::optional<BoundCounters> BoundCounters::begin(const std::vector<ErrorCounterBinding>& counters,
                                                  const CameraControls& camera, DiagnosticErrorPtr* error) {
  BoundCounters begun;
  for (const ErrorCounterBinding& binding : counters) {
    const std::optional<std::uint64_t> base = read(binding, camera, error);
    if (!base) return std::nullopt;
    begun.counters_.push_back({binding, *base});
  }
  return begun;
}

bool BoundCounters::addTo(Dictionary& dictionary, const CameraControls& camera, DiagnosticErrorPtr* error) const {
  for (const Counter& counter : counters_) {
    const std::optional<std::uint64_t> value = read(counter.binding, camera, error);
    if (!value) return false;
    dictionary.set(counter.binding.name, *value >= counter.base ? *value - counter.base : *value);
  }
  return true;
}

Dictionary errorCountersOf(const std::vector<ErrorCounterBinding>& bound) {
  Dictionary counters;
  for (const std::string_view name : kDefaultCounters) counters.set(name, 0U);
  for (const ErrorCounterBinding& counter : bound) counters.set(counter.name, 0U);
  addKernelCounters(counters, FrameCounts());
  return counters;
}

void addKernelCounters(Dictionary& dictionary, const FrameCounts& counts) {
  dictionary.set(kernel_counter::kSequenceGaps, counts.sequenceGaps);
  dictionary.set(kernel_counter::kBadBuffers, counts.badBuffers);
  dictionary.set(kernel_counter::kStreamErrors, counts.streamErrors);
  dictionary.set(kernel_counter::kDisconnects, counts.disconnects);
  dictionary.set(kernel_counter::kMissingMetadata, counts.missingMetadata);
}

}  // namespace quazor
